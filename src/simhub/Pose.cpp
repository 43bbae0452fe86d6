#include "simhub/Pose.h"

#include <cmath>
#include <numbers>

namespace simhub {
namespace {

struct Turn {
  double cosine;
  double sine;
};

/// Multiples of 90° are exact: a handset that lies flat has no trace of gravity on its other axes.
Turn turnBy(double degrees) {
  const double quarters = std::fmod(degrees / 90, 4);
  if (quarters == std::floor(quarters)) {
    constexpr std::array<double, 4> kCosines{1, 0, -1, 0};
    const auto quarter = static_cast<std::size_t>(static_cast<int>(quarters) & 3);
    return {kCosines[quarter], kCosines[(quarter + 3) & 3]};
  }
  const double radians = degrees * std::numbers::pi / 180;
  return {std::cos(radians), std::sin(radians)};
}

}  // namespace

Vector3 toHandsetFrame(const SignalValue& pose, const Vector3& room) {
  const Turn roll = turnBy(pose[0]);
  const Turn pitch = turnBy(pose[1]);
  const Turn yaw = turnBy(pose[2]);
  // The turns backwards, the last one first.
  const Vector3 unyawed{yaw.cosine * room[0] + yaw.sine * room[1], yaw.cosine * room[1] - yaw.sine * room[0],
                        room[2]};
  const Vector3 unpitched{pitch.cosine * unyawed[0] - pitch.sine * unyawed[2], unyawed[1],
                          pitch.cosine * unyawed[2] + pitch.sine * unyawed[0]};
  return {unpitched[0], roll.cosine * unpitched[1] + roll.sine * unpitched[2],
          roll.cosine * unpitched[2] - roll.sine * unpitched[1]};
}

}  // namespace simhub
