#include "simhub/Signal.h"

#include <algorithm>
#include <cmath>
#include <utility>

namespace simhub {
namespace {

/// How much of a move is done, 0 to 1, `seconds` after it began.
double progress(const SignalMove& move, double seconds) {
  switch (move.shape) {
    case SignalMove::Shape::kStep:
      return 1;
    case SignalMove::Shape::kRamp:
      return move.duration > 0 ? std::clamp(seconds / move.duration, 0.0, 1.0) : 1;
    case SignalMove::Shape::kApproach:
      return move.duration > 0 ? -std::expm1(-seconds / move.duration) : 1;
  }
  return 1;
}

SignalValue during(const SignalMove& move, const SignalValue& origin, double seconds) {
  const double done = progress(move, seconds);
  if (done == 1) return move.target;
  SignalValue value{};
  for (std::size_t i = 0; i < value.size(); ++i) value[i] = origin[i] + (move.target[i] - origin[i]) * done;
  return value;
}

}  // namespace

Signal::Signal(const SignalValue& start, std::vector<SignalMove> moves)
    : start_(start), moves_(std::move(moves)) {
  SignalValue origin = start_;
  for (std::size_t i = 0; i < moves_.size(); ++i) {
    if (i > 0) origin = during(moves_[i - 1], origins_[i - 1], moves_[i].at - moves_[i - 1].at);
    origins_.push_back(origin);
  }
}

SignalValue Signal::At(double seconds) const {
  const auto next = std::upper_bound(moves_.begin(), moves_.end(), seconds,
                                     [](double time, const SignalMove& move) { return time < move.at; });
  if (next == moves_.begin()) return start_;
  const auto index = static_cast<std::size_t>(next - moves_.begin() - 1);
  return during(moves_[index], origins_[index], seconds - moves_[index].at);
}

}  // namespace simhub
