#pragma once

#include <vector>

#include "framework/SampleData.h"

/// One timestamped reading. The values stand in the order in which the sensor sends them.
struct Sample {
  Sample() = default;
  template <class Iterator>
  Sample(double timeSeconds, Iterator first, Iterator last) : time(timeSeconds), values(first, last) {}

  double time = 0;  ///< s, of the hub's clock
  SampleData values;
};

/// `a` plus the sample's values, by the rule of sums of SampleData.
[[nodiscard]] inline SampleData operator+(SampleData a, const Sample& sample) {
  a += sample.values;
  return a;
}
