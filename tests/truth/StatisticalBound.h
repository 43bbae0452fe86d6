// How far a mean may be from the truth. Bounds follow from the noise that a scenario injects and from the
// number of readings; none is tuned to what the program prints.
#pragma once

#include <cstddef>

namespace truth {

/// The error of the mean of `count` readings near `level`, each with Gaussian noise and rounded to a
/// quantisation step.
struct MeanError {
  /// Standard deviation: sqrt((noise² + step²/12) / count). Noise of several steps makes the rounding errors
  /// of the readings uniform and independent of each other.
  double deviation = 0;
  /// What adding up in 32-bit float may add at most: half a unit in the last place for every partial sum, and
  /// for the quotient.
  double rounding = 0;
};

[[nodiscard]] MeanError meanError(double noise, double step, std::size_t count, double level);

/// Half a unit in the last place of a 32-bit float near `level`: what storing a value there may change.
[[nodiscard]] double floatRounding(double level);

/// So many standard deviations that, of `trials` independent Gaussian numbers, one lies further out with
/// probability kFalseAlarm.
[[nodiscard]] double deviationsFor(std::size_t trials);
inline constexpr double kFalseAlarm = 1e-6;

/// The range that a chi-squared number of `freedom` degrees, divided by them, leaves on each side with
/// probability kFalseAlarm / `trials` / 2 (Wilson and Hilferty's approximation: its cube root is Gaussian).
struct Range {
  double low = 0;
  double high = 0;
};
[[nodiscard]] Range varianceRatioRange(std::size_t freedom, std::size_t trials);

}  // namespace truth
