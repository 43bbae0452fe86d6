// What the light sensor under the display makes of its channels: lux, by the calibration in the registry.
#pragma once

#include <array>
#include <cstddef>
#include <optional>

#include "proto/sns_registry.pb.h"

namespace simhub {

inline constexpr std::size_t kFilteredChannels = 4;  // clear, red, green, blue; infrared is not part of lux

/// The coefficients of channels that see the colours as they are designed to. Light that is the same in all
/// of them, as infrared is, counts next to nothing.
inline constexpr std::array<double, kFilteredChannels> kDesignCoefficients{1.0, -0.711, 1.729, -1.999};

/// Channel reading at the highest gain over that at settings 8, 9 and 10.
inline constexpr int kLowestCalibratedGain = 8;
using GainRatios = std::array<double, 3>;
inline constexpr GainRatios kDesignGainRatios{8, 4, 2};

/// A straight line over the display's brightness levels.
struct BrightnessLine {
  double atZero = 0;
  double slope = 0;
};

struct LuxCalibration {
  double scale = 1;
  std::array<GainRatios, kFilteredChannels> gainRatios{kDesignGainRatios, kDesignGainRatios,
                                                       kDesignGainRatios, kDesignGainRatios};
  double delayMs = 0;  ///< of triggered integrations
  std::array<double, kFilteredChannels> coefficients = kDesignCoefficients;
  double pwmBoundary = 0;  ///< brightness level below which the display is taken to be dimmed by pulses
  /// What a white picture adds to each channel, in counts; nothing where it is not taken off.
  std::array<std::optional<BrightnessLine>, kFilteredChannels> pattern;
};

/// Items that are missing or no numbers count as those of a new handset.
[[nodiscard]] LuxCalibration readLuxCalibration(const sns_registry_data& group);

/// What the counts of a reading are multiplied by to be those at the highest gain: the registry's ratio for
/// settings 8 to 10, the nominal power of two for those below.
[[nodiscard]] double gainRatio(const GainRatios& ratios, int gain);

/// What the sensor is told of the display.
struct DisplayPicture {
  double brightness = 0;                                    ///< level; 0: off
  std::array<double, kFilteredChannels> share{1, 1, 1, 1};  ///< of white, as each channel sees it
  double pulses = 0;  ///< counts that the display's pulses add at the lowest brightness
};

/// The illuminance in lux, never negative. `counts` are at the highest gain and in the sensor's own
/// integration time.
///
///   scale · Σ coefficient · (counts − pulses · pulse share below the boundary − share · pattern line)
[[nodiscard]] double estimateLux(const std::array<double, kFilteredChannels>& counts,
                                 const DisplayPicture& picture, const LuxCalibration& calibration);

}  // namespace simhub
