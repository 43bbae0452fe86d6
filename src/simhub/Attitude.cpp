#include "simhub/Attitude.h"

#include <cmath>
#include <numbers>

namespace simhub {
namespace {

struct Angle {
  explicit Angle(double degrees)
      : sine(std::sin(degrees * std::numbers::pi / 180)),
        cosine(std::cos(degrees * std::numbers::pi / 180)) {}
  double sine;
  double cosine;
};

}  // namespace

Vector3 roomToHandset(const Vector3& pose, const Vector3& vector) {
  const Angle roll(pose[0]);
  const Angle pitch(pose[1]);
  const Angle yaw(pose[2]);
  // The attitude turns a handset's vector into the room's by roll, pitch, yaw; here each is undone in turn.
  const double x1 = yaw.cosine * vector[0] + yaw.sine * vector[1];
  const double y1 = -yaw.sine * vector[0] + yaw.cosine * vector[1];
  const double x2 = pitch.cosine * x1 - pitch.sine * vector[2];
  const double z2 = pitch.sine * x1 + pitch.cosine * vector[2];
  return {x2, roll.cosine * y1 + roll.sine * z2, -roll.sine * y1 + roll.cosine * z2};
}

}  // namespace simhub
