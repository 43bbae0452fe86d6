#include "light/UdAlsGain.h"

#include "framework/Statistics.h"
#include "light/UdAlsFiles.h"

namespace {

constexpr GainRatios kNominalRatios{8.0F, 4.0F, 2.0F};

}  // namespace

GainMeans meansByGain(const std::vector<SampleData>& records, std::size_t index) {
  GainMeans means{};
  for (const SampleData& record : records) {
    // Compared before it is cut to an integer: a damaged record may hold any number.
    const float setting = record[kUdAlsMeanGain] + 0.5F - static_cast<float>(kFirstCalibratedGain);
    if (setting >= 0 && setting < static_cast<float>(kCalibratedGains)) {
      means[static_cast<std::size_t>(setting)] = record[index];
    }
  }
  return means;
}

GainRatios gainRatios(const GainMeans& means) {
  GainRatios ratios = kNominalRatios;
  for (std::size_t i = 0; i < ratios.size(); ++i) {
    if (means[i] > 0) ratios[i] = withPlainNan(means.back() / means[i]);
  }
  return ratios;
}
