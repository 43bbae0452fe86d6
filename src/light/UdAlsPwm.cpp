#include "light/UdAlsPwm.h"

#include <limits>

#include "light/UdAlsFiles.h"

float pwmBoundary(const std::vector<SampleData>& records) {
  float least = std::numeric_limits<float>::max();
  float brightness = std::numeric_limits<float>::quiet_NaN();
  for (const SampleData& record : records) {
    if (!(record[kUdAlsMeanClear] <= least)) continue;
    least = record[kUdAlsMeanClear];
    brightness = record[kUdAlsBrightness];
  }
  return brightness;
}
