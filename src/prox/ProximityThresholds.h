// The near and far thresholds of a proximity sensor, in raw counts (0 to 255, more the nearer the target)
// and 32-bit float. The sensor reports near from the near threshold on, and far again from the far threshold
// down: between them it keeps its state, so that a target at rest does not flicker.
#pragma once

#include <optional>
#include <vector>

#include "framework/Sample.h"

/// At least this much must the near threshold lie above the far one.
inline constexpr float kMinThresholdSeparation = 10.0F;

/// Which of the two a calibration sets.
enum class ProximityMode { kNear, kFar };

/// The mean of the samples' raw counts, rounded to whole counts, halves away from zero. Not a number for no
/// samples.
[[nodiscard]] float proximityThreshold(const std::vector<Sample>& samples);

/// Where the other mode's threshold has to go when this mode's becomes `threshold`: nothing when `other` is
/// far enough away.
///
/// The two ends of the scale are treated differently on purpose. A far threshold never goes below
/// min(threshold, 10); a near one stops at 245, or at `threshold` itself when that is 245 or more, so that
/// close to either end the two can lie closer than the separation.
[[nodiscard]] std::optional<float> displacedThreshold(ProximityMode mode, float threshold, float other);
