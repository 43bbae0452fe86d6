// The offsets that a SAR sensor subtracts from its two electrodes, in counts and 32-bit float. The driver has
// 14 bits for each.
#pragma once

#include <optional>

struct SarOffsets {
  float top = 0;
  float bottom = 0;
};

/// The largest offset of a sound sensor with nothing near it.
inline constexpr float kMaxSarOffset = 16353.0F;
/// What a stored offset leaves for drift: with it the largest is 16383, the most that 14 bits hold.
inline constexpr float kSarOffsetMargin = 30.0F;

/// Which offset cannot be stored.
enum class SarOffsetFault { kTopTooHigh, kBottomTooHigh };

/// Nothing when both can be stored. The top is looked at first.
[[nodiscard]] std::optional<SarOffsetFault> checkSarOffsets(const SarOffsets& offsets);

/// What the compensation may never exceed: the offsets with their margin.
[[nodiscard]] SarOffsets maxSarOffsets(const SarOffsets& offsets);
