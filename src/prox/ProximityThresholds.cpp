#include "prox/ProximityThresholds.h"

#include <algorithm>
#include <cmath>

#include "framework/Statistics.h"

namespace {

constexpr float kTopOfScale = 255.0F;
constexpr float kRoomForSeparation = 2 * kMinThresholdSeparation;  // from the end of the scale

float farBelow(float nearThreshold) {
  return nearThreshold > kRoomForSeparation ? nearThreshold - kMinThresholdSeparation
                                            : std::min(nearThreshold, kMinThresholdSeparation);
}

float nearAbove(float farThreshold) {
  const float room = kTopOfScale - farThreshold;
  if (room > kRoomForSeparation) return farThreshold + kMinThresholdSeparation;
  return room > kMinThresholdSeparation ? kTopOfScale - kMinThresholdSeparation : farThreshold;
}

}  // namespace

float proximityThreshold(const std::vector<Sample>& samples) { return std::round(sampleFloatMean(samples)); }

std::optional<float> displacedThreshold(ProximityMode mode, float threshold, float other) {
  const bool isNear = mode == ProximityMode::kNear;
  const float separation = isNear ? threshold - other : other - threshold;
  if (!(separation < kMinThresholdSeparation)) return std::nullopt;
  return isNear ? farBelow(threshold) : nearAbove(threshold);
}
