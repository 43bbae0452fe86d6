#pragma once

#include <cmath>
#include <cstdint>
#include <limits>

/// The value without its fraction. What lies outside the range becomes its nearest end, not a number 0.
[[nodiscard]] inline std::int32_t truncateToInt(float value) {
  constexpr std::int32_t kLeast = std::numeric_limits<std::int32_t>::min();
  constexpr std::int32_t kMost = std::numeric_limits<std::int32_t>::max();
  if (std::isnan(value)) return 0;
  // 2^31 itself is the first float beyond the range.
  if (value >= -static_cast<float>(kLeast)) return kMost;
  if (value <= static_cast<float>(kLeast)) return kLeast;
  return static_cast<std::int32_t>(value);
}
