#include "simhub/sensors/Color.h"

#include <algorithm>
#include <cmath>

#include "simhub/RegistryValues.h"

namespace simhub {
namespace {

enum Channel : std::size_t { kRed, kGreen, kBlue, kClear, kIr };

// The line of color temperature over blue / red.
constexpr double kLineOffset = 1000;  // K
constexpr double kLineSlope = 4500;   // K
constexpr double kLowestKelvin = 1500;

// At gain step 0.
constexpr double kCountsPerLux = 0.1;  // of green
constexpr double kCountsPerWatt = 20;  // per m², of infrared

constexpr double kLuxPerWatt = 250;  // of the visible part of a source
constexpr double kMostIrShare = 0.99;

constexpr int kTopGain = 10;
constexpr double kFullScale = 65535;
/// The gain leaves room for noise.
constexpr double kUsedScale = 0.8 * kFullScale;
constexpr float kNoIr = -1;

}  // namespace

ColorChip::Counts ColorChip::see(Time time) const {
  const double lux = TheWorld().ScalarAt(WorldSignal::kIlluminance, time);
  const double kelvin = std::max(kLowestKelvin, TheWorld().ScalarAt(WorldSignal::kColorTemperature, time));
  const double share = std::min(kMostIrShare, TheWorld().ScalarAt(WorldSignal::kIrShare, time));
  const double blueOverRed = (kelvin - kLineOffset) / kLineSlope;

  Counts counts;
  auto& [red, green, blue, clear, ir] = counts.values;
  ir = kCountsPerWatt *
       (TheWorld().ScalarAt(WorldSignal::kInfrared, time) + lux / kLuxPerWatt * share / (1 - share));
  const double leak = Config().Parameter("infrared_crosstalk") * ir;
  // Warm light has more red for the same illuminance.
  red = kCountsPerLux * lux * 1.6 / (0.4 + blueOverRed);
  blue = red * blueOverRed + leak;
  red += leak;
  green = kCountsPerLux * lux + leak;
  clear = red + green + blue;
  const double brightest = std::max(clear, ir);
  while (counts.gain < kTopGain && std::ldexp(brightest, counts.gain + 1) <= kUsedScale) ++counts.gain;
  for (double& value : counts.values) value = std::ldexp(value, counts.gain);
  return counts;
}

void ColorChip::push(double first, const Counts& counts, std::vector<float>* values) {
  hasIr_ = !hasIr_;
  const auto count = [&](Channel channel) {
    return static_cast<float>(std::clamp(counts.values[channel], 0.0, kFullScale));
  };
  for (const float value :
       {static_cast<float>(first), count(kClear), count(kRed), hasIr_ ? 0.0F : count(kGreen), count(kBlue),
        hasIr_ ? count(kIr) : kNoIr, static_cast<float>(counts.gain)}) {
    values->push_back(value);
  }
}

void Color::Read(Time time, std::vector<float>* values) {
  Counts counts = see(time);
  Err(time, counts.values);
  const double red = counts.values[kRed];
  push(red > 0 ? offset_ + slope_ * counts.values[kBlue] / red : 0, counts, values);
}

void Color::ApplyCalibration(const sns_registry_data& group) {
  offset_ = kLineOffset;
  slope_ = kLineSlope;
  if (!Config().calibrated) return;
  const auto offset = registryFloat(group, "ratio_coef0");
  const auto slope = registryFloat(group, "ratio_coef1");
  // 0 and 1 are no line but the mark that there is none.
  if (!offset || !slope || (*offset == 0 && *slope == 1)) return;
  offset_ = *offset;
  slope_ = *slope;
}

void ColorLight::Read(Time time, std::vector<float>* values) {
  double lux = TheWorld().ScalarAt(WorldSignal::kIlluminance, time);
  Err(time, {&lux, 1});
  push(std::max(0.0, lux) * factor_, see(time), values);
}

void ColorLight::ApplyCalibration(const sns_registry_data& group) {
  factor_ = Config().calibrated ? registryFloat(group, "scale").value_or(1) : 1;
}

}  // namespace simhub
