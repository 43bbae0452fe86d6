// What an ambient light sensor's samples under a known illuminance say. All in lux and 32-bit float.
//
// The sensor reports L = E · s · S / 1000 for an illuminance E, where s is its own error and S the stored
// scale. Under the reference illuminance R the mean M then asks for S' = S · R / M.
#pragma once

#include <vector>

#include "framework/Sample.h"

/// The stored scale of a sensor that nobody has calibrated.
inline constexpr float kNeutralLuxScale = 1000.0F;

struct LuxMeasurement {
  float mean = 0;   ///< not a number for no samples
  float stdev = 0;  ///< not a number for a single sample
};

[[nodiscard]] LuxMeasurement measureLux(const std::vector<Sample>& samples);

/// Multiplies each sample's first value, its lux; the others stay.
void correctLux(float factor, std::vector<Sample>* samples);

/// previousScale × referenceLux / meanLux. The multiplication comes first: its rounding is part of the
/// stored result.
[[nodiscard]] float luxScale(float previousScale, float referenceLux, float meanLux);

/// How far the mean lies above the reference, in percent of the reference. Infinite, or not a number, for a
/// reference of 0. Of whatever quantity.
[[nodiscard]] float differencePercent(float mean, float reference);

/// A difference that equals the tolerance is within it, and so is one that is not a number (no light under a
/// reference of 0).
[[nodiscard]] bool isWithinTolerance(float percent, float tolerancePercent);
