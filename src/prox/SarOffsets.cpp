#include "prox/SarOffsets.h"

std::optional<SarOffsetFault> checkSarOffsets(const SarOffsets& offsets) {
  if (offsets.top > kMaxSarOffset) return SarOffsetFault::kTopTooHigh;
  if (offsets.bottom > kMaxSarOffset) return SarOffsetFault::kBottomTooHigh;
  return std::nullopt;
}

SarOffsets maxSarOffsets(const SarOffsets& offsets) {
  return {offsets.top + kSarOffsetMargin, offsets.bottom + kSarOffsetMargin};
}
