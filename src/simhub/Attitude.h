#pragma once

#include <array>

namespace simhub {

using Vector3 = std::array<double, 3>;

/// A vector of the room (x east, y north, z up) as the handset sees it in the attitude `pose`: roll about x,
/// then pitch about y, then yaw about z, in degrees. All zero lies face up, top to the north.
[[nodiscard]] Vector3 roomToHandset(const Vector3& pose, const Vector3& vector);

}  // namespace simhub
