#include "simhub/sensors/LuxEstimate.h"

#include <algorithm>
#include <cmath>
#include <string>

#include "simhub/RegistryValues.h"
#include "simhub/sensors/DisplayLight.h"

namespace simhub {
namespace {

constexpr std::array<const char*, kFilteredChannels> kChannelLetters{"c", "r", "g", "b"};

}  // namespace

LuxCalibration readLuxCalibration(const sns_registry_data& group) {
  LuxCalibration calibration;
  const auto read = [&group](const std::string& item, double* value) {
    *value = registryNumber(group, item).value_or(*value);
  };
  read("scale", &calibration.scale);
  read("delay", &calibration.delayMs);
  read("pwm_boundary", &calibration.pwmBoundary);
  for (std::size_t channel = 0; channel < kFilteredChannels; ++channel) {
    const std::string letter = kChannelLetters[channel];
    read(letter + "_coeff", &calibration.coefficients[channel]);
    GainRatios& ratios = calibration.gainRatios[channel];
    for (std::size_t i = 0; i < ratios.size(); ++i) {
      const int gain = kLowestCalibratedGain + static_cast<int>(i);
      read(letter + "_gain_ratio_" + std::to_string(gain), &ratios[i]);
    }
    const auto atZero = registryNumber(group, "pattern_w_" + letter + "_coef0");
    const auto slope = registryNumber(group, "pattern_w_" + letter + "_coef1");
    if (atZero && slope) calibration.pattern[channel] = BrightnessLine{*atZero, *slope};
  }
  return calibration;
}

double gainRatio(const GainRatios& ratios, int gain) {
  const int first = kLowestCalibratedGain;
  const int last = first + static_cast<int>(ratios.size()) - 1;
  if (gain >= first && gain <= last) return ratios[static_cast<std::size_t>(gain - first)];
  return std::ldexp(1.0, last + 1 - gain);
}

double estimateLux(const std::array<double, kFilteredChannels>& counts, const DisplayPicture& picture,
                   const LuxCalibration& calibration) {
  double sum = 0;
  for (std::size_t channel = 0; channel < kFilteredChannels; ++channel) {
    double outside = counts[channel];
    if (picture.brightness > 0) {
      outside -= picture.pulses * pulseShare(picture.brightness, calibration.pwmBoundary);
      if (const auto& line = calibration.pattern[channel]) {
        outside -= picture.share[channel] * (line->atZero + line->slope * picture.brightness);
      }
    }
    sum += calibration.coefficients[channel] * outside;
  }
  return std::max(0.0, calibration.scale * sum);
}

}  // namespace simhub
