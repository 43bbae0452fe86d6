#include "simhub/sensors/AmbientLight.h"

#include <algorithm>

#include "simhub/RegistryValues.h"

namespace simhub {
namespace {

constexpr double kNeutralScale = 1000;
constexpr double kReferenceKelvin = 5000;  // a light source of this colour temperature is seen as it is

}  // namespace

void AmbientLight::Read(Time time, std::vector<float>* values) {
  const double offWhite =
      (TheWorld().ScalarAt(WorldSignal::kColorTemperature, time) - kReferenceKelvin) / 1000;
  double lux = TheWorld().ScalarAt(WorldSignal::kIlluminance, time);
  lux *= 1 + Config().Parameter("color_temperature_slope") * offWhite;
  lux *= 1 + Config().Parameter("infrared_leak") * TheWorld().ScalarAt(WorldSignal::kIrShare, time);
  Err(time, {&lux, 1});
  values->push_back(static_cast<float>(std::max(0.0, lux) * factor_));
}

void AmbientLight::ApplyCalibration(const sns_registry_data& group) {
  factor_ = 1;
  if (!Config().calibrated) return;
  factor_ *= registryFloat(group, "scale").value_or(kNeutralScale) / kNeutralScale;
  if (Config().Parameter("corrects") != 0) factor_ *= registryFloat(group, "corr_factor").value_or(1);
}

}  // namespace simhub
