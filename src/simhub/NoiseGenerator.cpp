#include "simhub/NoiseGenerator.h"

#include <cmath>
#include <numbers>

namespace simhub {
namespace {

/// Uniform in (0, 1]: 53 random bits, never 0, so that its logarithm is finite.
double uniform(std::mt19937_64& engine) { return (static_cast<double>(engine() >> 11) + 1) * 0x1p-53; }

}  // namespace

double NoiseGenerator::Next() {
  if (hasSpare_) {
    hasSpare_ = false;
    return spare_;
  }
  const double radius = std::sqrt(-2 * std::log(uniform(engine_)));
  const double angle = 2 * std::numbers::pi * uniform(engine_);
  spare_ = radius * std::sin(angle);
  hasSpare_ = true;
  return radius * std::cos(angle);
}

}  // namespace simhub
