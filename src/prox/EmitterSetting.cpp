#include "prox/EmitterSetting.h"

#include <algorithm>
#include <cmath>

float pulsesForTarget(float target, float pulses, std::int32_t count, float rawSum) {
  return target * pulses * static_cast<float>(count) / rawSum;
}

float storedPulseNumber(float pulses) {
  // Compared as a float: the rounded value may be beyond every integer.
  const float rounded = std::round(pulses);
  return rounded < 2 ? 0 : std::min(rounded - 1, kMaxStoredPulseNumber);
}

float currentForTarget(float target, std::int64_t wholeAverage, std::int64_t current) {
  return target / static_cast<float>(wholeAverage) * static_cast<float>(current);
}

std::int64_t limitedPulseCurrent(float current) {
  // Limited before the fraction is cut off, which gives the same and keeps the value within the integers.
  return static_cast<std::int64_t>(
      std::clamp(current + 0.5F, static_cast<float>(kMinPulseCurrent), static_cast<float>(kMaxPulseCurrent)));
}

std::optional<std::int64_t> wholeNumber(float value) {
  constexpr float kBeyond = 9223372036854775808.0F;  // 2^63
  if (!(value >= -kBeyond && value < kBeyond)) return std::nullopt;
  return static_cast<std::int64_t>(value);
}
