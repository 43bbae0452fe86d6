#include "light/ColorRecord.h"

#include <algorithm>
#include <iterator>

#include "framework/Statistics.h"

namespace {

std::vector<Sample> samplesThat(bool (*has)(const SampleData&), const std::vector<Sample>& samples) {
  std::vector<Sample> found;
  std::copy_if(samples.begin(), samples.end(), std::back_inserter(found),
               [has](const Sample& sample) { return has(sample.values); });
  return found;
}

}  // namespace

bool hasIr(const SampleData& reading) { return reading[color_reading::kIr] >= 0; }
bool hasGreen(const SampleData& reading) { return reading[color_reading::kIr] < 0; }

SampleData colorMeans(const std::vector<Sample>& light, const std::vector<Sample>& color) {
  SampleData means;
  if (!light.empty()) means.push_back(sampleFloatMean(light));
  const SampleData green = sampleDataMean(samplesThat(hasGreen, color));
  const SampleData others = sampleDataMean(samplesThat(hasIr, color));
  // A sensor may add values of its own behind those that are known.
  for (std::size_t i = 0; i < std::min<std::size_t>(others.size(), color_reading::kCount); ++i) {
    if (i != color_reading::kGreen) {
      means.push_back(withPlainNan(others[i]));
    } else if (!green.empty()) {
      means.push_back(withPlainNan(green[i]));
    }
  }
  return means;
}

std::vector<float> meansThatCount(const SampleData& means) {
  using namespace color_means;
  return {means[kLux], means[kClear], means[kRed], means[kBlue], means[kIr], means[kGain]};
}

SampleData colorRecord(float referenceLux, float referenceCct, const SampleData& means) {
  SampleData record{referenceLux, referenceCct};
  for (std::size_t i = 0; i < color_means::kCount; ++i) {
    if (i != color_means::kGreen) record.push_back(means[i]);
  }
  return record;
}

std::string colorLogLine(float referenceLux, float referenceCct, const SampleData& means) {
  std::string line = std::to_string(referenceLux) + "," + std::to_string(referenceCct);
  for (std::size_t i = color_means::kClear; i < color_means::kCount; ++i) {
    line += "," + std::to_string(means[i]);
  }
  return line + "\n";
}
