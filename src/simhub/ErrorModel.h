// How a sensor errs, with known truth. For a true reading t at temperature T:
//
//   r = S · A · t + b + k · (T − T0) + n · gauss,    then rounded to a multiple of q
//
// S scale and misalignment, A soft iron (both 3×3, acting on the first three values; a reading of one or two
// values uses their diagonal), b bias (a magnetometer's hard iron), k temperature slope, T0 reference
// temperature, n noise, q quantisation step. Double precision.
#pragma once

#include <array>
#include <cstddef>
#include <span>

#include "simhub/NoiseGenerator.h"

namespace simhub {

inline constexpr std::size_t kMaxChannels = 8;

struct ErrorModel {
  using Matrix = std::array<double, 9>;  ///< row order
  static constexpr Matrix kIdentity{1, 0, 0, 0, 1, 0, 0, 0, 1};

  std::array<double, kMaxChannels> bias{};
  Matrix scale = kIdentity;
  Matrix softIron = kIdentity;
  std::array<double, kMaxChannels> temperatureSlope{};  ///< per °C
  double referenceTemperature = 25;                     ///< °C
  double quantisation = 0;                              ///< 0: none
  std::array<double, kMaxChannels> noise{};             ///< standard deviation

  /// Turns the truth into a reading, in place. At most kMaxChannels values; one number is drawn from
  /// `generator` for each, also where the noise is 0, so that a change of one channel's noise leaves the
  /// others' alone.
  void Apply(std::span<double> values, double temperature, NoiseGenerator& generator) const;
};

}  // namespace simhub
