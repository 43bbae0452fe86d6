#include "imu/ImuThermalTemperatures.h"

#include <algorithm>

namespace {

float reading(const Sample& temperature) { return temperature.values[0]; }

float interpolate(double time, const Sample& low, const Sample& high) {
  if (low.time == high.time) return reading(high);
  const auto sinceLow = static_cast<float>(time - low.time);
  const auto interval = static_cast<float>(high.time - low.time);
  return reading(low) + (sinceLow / interval) * (reading(high) - reading(low));
}

}  // namespace

TemperatureSpan temperatureSpan(const std::vector<Sample>& samples) {
  TemperatureSpan span{reading(samples.front()), reading(samples.back()), reading(samples.front())};
  for (const Sample& sample : samples) span.highest = std::max(span.highest, reading(sample));
  return span;
}

TemperatureVerdict judgeTemperatures(const TemperatureSpan& span) {
  if (span.last - span.first < kMinTemperatureRise) return TemperatureVerdict::kRiseTooLow;
  return span.highest > kMaxTemperature ? TemperatureVerdict::kTooHot : TemperatureVerdict::kGood;
}

InterpolatedTemperatures interpolateTemperatures(const std::vector<Sample>& samples,
                                                 const std::vector<Sample>& temperatures) {
  InterpolatedTemperatures result;
  if (temperatures.empty()) {
    result.first = samples.size();
    return result;
  }
  auto sample = std::find_if(samples.begin(), samples.end(),
                             [&](const Sample& s) { return s.time >= temperatures.front().time; });
  result.first = static_cast<std::size_t>(sample - samples.begin());
  if (sample == samples.end()) return result;
  auto high = std::find_if(temperatures.begin(), temperatures.end(),
                           [&](const Sample& t) { return t.time >= sample->time; });
  if (high == temperatures.end()) return result;
  auto low = high == temperatures.begin() ? high : high - 1;

  result.values.reserve(static_cast<std::size_t>(samples.end() - sample));
  for (;;) {
    result.values.push_back(interpolate(sample->time, *low, *high));
    if (++sample == samples.end()) return result;
    while (high->time <= sample->time) {
      low = high;
      if (++high == temperatures.end()) return result;
    }
  }
}
