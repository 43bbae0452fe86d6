// Means and deviations of samples. All sums run in 32-bit float in the samples' order: the rounding is part
// of the results that handsets have stored for years.
#pragma once

#include <vector>

#include "framework/Sample.h"

/// The mean of the samples' first values. Not a number for no samples, or when a sample has no value.
[[nodiscard]] float sampleFloatMean(const std::vector<Sample>& samples);

/// The mean of each element; the first sample fixes the dimension. Empty for no samples.
[[nodiscard]] SampleData sampleDataMean(const std::vector<Sample>& samples);

/// The standard deviation of the samples' first values about `mean`, with Bessel's correction (n − 1). Not a
/// number for one sample; 0 for none.
[[nodiscard]] float sampleStdev(const std::vector<Sample>& samples, float mean);

/// The same for each element.
[[nodiscard]] SampleData sampleStdev(const std::vector<Sample>& samples, const SampleData& mean);

/// The value, or the positive not-a-number for any. 0/0 is a negative one on x86 and a positive one on the
/// handset: printed, they would differ.
[[nodiscard]] float withPlainNan(float value);
