#include "light/UdAlsLux.h"

#include "framework/Statistics.h"
#include "light/UdAlsFiles.h"

float udAlsLuxScale(const std::vector<SampleData>& records) {
  float sum = 0;
  for (const SampleData& record : records) {
    const float mean = record[kUdAlsMeanLux];
    if (mean > 0) sum += record[kUdAlsReferenceLux] / mean;
  }
  return withPlainNan(sum / static_cast<float>(records.size()));
}
