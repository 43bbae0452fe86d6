#pragma once

#include <cstdint>

/// The handset families whose calibration differs. The values are part of the interface to scripts and logs.
enum class DeviceType : std::int32_t {
  o1v1 = 0,
  p2m2 = 1,
  e4d4 = 2,
  t5h5 = 3,
  rufael = 4,
  whiskel = 5,
  invalid = 6,
};
