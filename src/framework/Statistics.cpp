#include "framework/Statistics.h"

#include <cmath>
#include <cstdint>
#include <limits>

namespace {

/// A sample without a value makes the statistic not a number, so that nobody stores it.
float firstValue(const Sample& sample) {
  return sample.values.empty() ? std::numeric_limits<float>::quiet_NaN() : sample.values[0];
}

/// n − 1, counted in 64 bits: for no samples it wraps to a huge divisor, which makes the deviation 0.
float besselDivisor(const std::vector<Sample>& samples) {
  return static_cast<float>(static_cast<std::uint64_t>(samples.size()) - 1U);
}

}  // namespace

float withPlainNan(float value) {
  return std::isnan(value) ? std::numeric_limits<float>::quiet_NaN() : value;
}

float sampleFloatMean(const std::vector<Sample>& samples) {
  float sum = 0;
  for (const Sample& sample : samples) sum += firstValue(sample);
  return withPlainNan(sum / static_cast<float>(samples.size()));
}

SampleData sampleDataMean(const std::vector<Sample>& samples) {
  SampleData mean;
  for (const Sample& sample : samples) mean += sample.values;
  const auto count = static_cast<float>(samples.size());
  for (float& value : mean) value = withPlainNan(value / count);
  return mean;
}

float sampleStdev(const std::vector<Sample>& samples, float mean) {
  float sum = 0;
  for (const Sample& sample : samples) {
    const float difference = firstValue(sample) - mean;
    sum += difference * difference;
  }
  return withPlainNan(std::sqrt(sum / besselDivisor(samples)));
}

SampleData sampleStdev(const std::vector<Sample>& samples, const SampleData& mean) {
  SampleData sum;
  for (const Sample& sample : samples) {
    SampleData squared = sample.values - mean;
    squared *= squared;
    sum += squared;
  }
  sum /= besselDivisor(samples);
  for (float& value : sum) value = withPlainNan(std::sqrt(value));
  return sum;
}
