#pragma once

#include <cstdint>
#include <random>

namespace simhub {

/// White Gaussian noise of its own seed: Box-Muller on the Mersenne twister, so that the same seed gives the
/// same numbers with every standard library (std::normal_distribution is free to differ).
class NoiseGenerator {
 public:
  explicit NoiseGenerator(std::uint64_t seed) : engine_(seed) {}

  /// The next number: mean 0, standard deviation 1.
  [[nodiscard]] double Next();

 private:
  std::mt19937_64 engine_;
  double spare_ = 0;
  bool hasSpare_ = false;
};

}  // namespace simhub
