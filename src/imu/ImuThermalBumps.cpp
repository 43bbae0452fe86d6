#include "imu/ImuThermalBumps.h"

#include <algorithm>
#include <cmath>
#include <limits>
#include <map>
#include <optional>

namespace {

constexpr std::size_t kAxes = 3;

/// The sum of a group. It starts at negative zero, which leaves every first term as it is.
struct Group {
  std::array<float, kAxes> sum{-0.0F, -0.0F, -0.0F};
  std::uint32_t count = 0;

  void Add(const Sample& sample) {
    const std::size_t axes = std::min(sample.values.size(), kAxes);
    for (std::size_t k = 0; k < axes; ++k) sum[k] += sample.values[k];
    ++count;
  }
};

SampleData meanOf(const Group& group) {
  SampleData mean(group.sum.begin(), group.sum.end());
  mean /= static_cast<float>(group.count);
  return mean;
}

/// The first element beyond the threshold. Not a number is beyond nothing.
std::optional<float> firstJump(const SampleData& difference, float threshold) {
  const auto jump = std::find_if(difference.begin(), difference.end(),
                                 [&](float element) { return std::fabs(element) > threshold; });
  return jump == difference.end() ? std::nullopt : std::optional(*jump);
}

struct Range {
  float low = std::numeric_limits<float>::infinity();
  float high = -std::numeric_limits<float>::infinity();
};

Range finiteRange(const std::vector<float>& temperatures) {
  Range range;
  for (const float temperature : temperatures) {
    if (!std::isfinite(temperature)) continue;
    range.low = std::min(range.low, temperature);
    range.high = std::max(range.high, temperature);
  }
  return range;
}

/// Groups by their index. Those without a sample have no entry: a narrow range makes very many of them.
using Groups = std::map<std::uint64_t, Group>;

/// The first index that a 64-bit integer cannot hold.
constexpr float kIndexLimit = 0x1p63F;

void compareGroups(const Groups& groups, float threshold, BumpSearch* search) {
  for (const auto& [index, group] : groups) {
    search->bins.push_back({index, meanOf(group)});
    if (search->bins.size() == 1) continue;
    const SampleData& previous = search->bins[search->bins.size() - 2].mean;
    const std::optional<float> jump = firstJump(search->bins.back().mean - previous, threshold);
    if (!jump) continue;
    search->outcome = BumpSearch::Outcome::kBump;
    search->jump = *jump;
    return;
  }
}

}  // namespace

BumpSearch findBumpByTemperature(const std::vector<Sample>& samples, const std::vector<float>& temperatures,
                                 float range, float threshold) {
  BumpSearch search;
  const Range span = finiteRange(temperatures);
  const float last = (span.high - span.low) / range;  // the index of the highest temperature
  if (!(span.low < span.high) || last < 1) {
    search.outcome = BumpSearch::Outcome::kTooFewGroups;
    return search;
  }
  if (!(last < kIndexLimit)) {
    search.outcome = BumpSearch::Outcome::kTooManyGroups;
    return search;
  }
  Groups groups;
  const std::size_t count = std::min(samples.size(), temperatures.size());
  for (std::size_t i = 0; i < count; ++i) {
    if (!std::isfinite(temperatures[i])) continue;
    groups[static_cast<std::uint64_t>((temperatures[i] - span.low) / range)].Add(samples[i]);
  }
  compareGroups(groups, threshold, &search);
  return search;
}

BumpSearch findBumpByTime(const std::vector<Sample>& samples, std::int32_t size, float threshold) {
  BumpSearch search;
  const auto groupSize = static_cast<std::size_t>(size);
  if (samples.size() / 2 < groupSize) {
    search.outcome = BumpSearch::Outcome::kTooFewGroups;
    return search;
  }
  SampleData previous;
  for (std::size_t end = groupSize; end <= samples.size(); end += groupSize) {
    Group group;
    for (std::size_t i = end - groupSize; i < end; ++i) group.Add(samples[i]);
    const SampleData sum(group.sum.begin(), group.sum.end());
    SampleData difference = sum - previous;
    difference /= static_cast<float>(size);
    if (const std::optional<float> jump =
            end == groupSize ? std::nullopt : firstJump(difference, threshold)) {
      search.outcome = BumpSearch::Outcome::kBump;
      search.jump = *jump;
      return search;
    }
    previous = sum;
  }
  return search;
}
