// A quantity of the simulated world over time: a value that holds from the start, then moves that begin at
// given times. A move goes to its target at once (a step), linearly over a time (a ramp) or exponentially
// with a time constant (an approach, from whatever value the signal had when the move began). A move ends the
// one before it.
#pragma once

#include <array>
#include <cstddef>
#include <span>
#include <vector>

namespace simhub {

inline constexpr std::size_t kMaxSignalDimension = 4;
using SignalValue = std::array<double, kMaxSignalDimension>;  ///< elements past the dimension are 0

struct SignalMove {
  enum class Shape { kStep, kRamp, kApproach };
  double at = 0;  ///< s since the hub's start
  SignalValue target{};
  Shape shape = Shape::kStep;
  double duration = 0;  ///< s: a ramp's length, an approach's time constant
};

class Signal {
 public:
  Signal() = default;
  explicit Signal(const SignalValue& start) : start_(start) {}
  /// `moves` in order of their times.
  Signal(const SignalValue& start, std::vector<SignalMove> moves);

  /// The value at `seconds` since the hub's start.
  [[nodiscard]] SignalValue At(double seconds) const;

 private:
  SignalValue start_{};
  std::vector<SignalMove> moves_;
  std::vector<SignalValue> origins_;  ///< the value when each move begins
};

}  // namespace simhub
