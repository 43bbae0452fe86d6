// The temperatures of a thermal calibration: whether the handset warmed up as it has to, and which
// temperature each sample of a sensor was taken at.
#pragma once

#include <cstddef>
#include <vector>

#include "framework/Sample.h"

/// °C, of a temperature sensor's first values.
struct TemperatureSpan {
  float first = 0;
  float last = 0;
  float highest = 0;
};

/// At least one sample, each with at least one value.
[[nodiscard]] TemperatureSpan temperatureSpan(const std::vector<Sample>& samples);

inline constexpr float kMinTemperatureRise = 7.0F;  ///< °C, from the first to the last sample
inline constexpr float kMaxTemperature = 60.0F;     ///< °C

enum class TemperatureVerdict { kGood, kRiseTooLow, kTooHot };

/// The rise counts from the first to the last sample: a handset that warmed up and cooled again has not
/// shown a drift that belongs to one state of warmth. Too low a rise is reported before too high a maximum.
[[nodiscard]] TemperatureVerdict judgeTemperatures(const TemperatureSpan& span);

/// Which samples of a sensor have a temperature, and which one. The samples are first … first + size − 1.
struct InterpolatedTemperatures {
  std::size_t first = 0;      ///< samples before are earlier than the first temperature
  std::vector<float> values;  ///< °C
};

/// Gives each sample a temperature on the straight line between the temperature before it and the one after
/// it.
///
/// The times go in double, their differences and everything else in 32-bit float. A sample at the time of a
/// temperature before it gets exactly that temperature. The last temperature ends the interpolation:
/// samples at its time or later have none. Both lists are in order of time; samples with equal times are
/// fine, and lists out of order give temperatures that make no sense, but harm nothing else.
[[nodiscard]] InterpolatedTemperatures interpolateTemperatures(const std::vector<Sample>& samples,
                                                               const std::vector<Sample>& temperatures);
