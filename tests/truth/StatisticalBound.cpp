#include "truth/StatisticalBound.h"

#include <cmath>
#include <limits>

namespace truth {

double floatRounding(double level) {
  const auto value = static_cast<float>(std::fabs(level));
  return (static_cast<double>(std::nextafter(value, std::numeric_limits<float>::infinity())) -
          static_cast<double>(value)) /
         2;
}

MeanError meanError(double noise, double step, std::size_t count, double level) {
  const auto n = static_cast<double>(count);
  MeanError error;
  error.deviation = std::sqrt((noise * noise + step * step / 12) / n);
  double sum = 0;
  for (std::size_t i = 1; i <= count; ++i) sum += floatRounding(level * static_cast<double>(i));
  error.rounding = sum / n + floatRounding(level);
  return error;
}

double deviationsFor(std::size_t trials) {
  // Both tails of one number may hold kFalseAlarm / trials; the tail falls with the distance.
  const double tail = kFalseAlarm / static_cast<double>(trials);
  double low = 0;
  double high = 40;
  for (int i = 0; i < 100; ++i) {
    const double middle = (low + high) / 2;
    (std::erfc(middle / std::sqrt(2.0)) > tail ? low : high) = middle;
  }
  return high;
}

Range varianceRatioRange(std::size_t freedom, std::size_t trials) {
  const double spread = 2 / (9 * static_cast<double>(freedom));
  const double reach = deviationsFor(trials) * std::sqrt(spread);
  const auto cube = [](double x) { return x * x * x; };
  return {cube(std::fmax(0, 1 - spread - reach)), cube(1 - spread + reach)};
}

}  // namespace truth
