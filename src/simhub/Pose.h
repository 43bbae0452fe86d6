#pragma once

#include <array>

#include "simhub/Signal.h"

namespace simhub {

using Vector3 = std::array<double, 3>;

/// A vector of the room (x east, y north, z up) as the handset's axes see it. `pose` is the world's signal:
/// the handset lay face up with its top to the north, and was turned about the room's x axis by its first
/// number (roll), then about y by the second (pitch), then about z by the third (yaw); in degrees.
[[nodiscard]] Vector3 toHandsetFrame(const SignalValue& pose, const Vector3& room);

}  // namespace simhub
