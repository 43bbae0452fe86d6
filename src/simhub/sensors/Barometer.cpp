#include "simhub/sensors/Barometer.h"

#include "simhub/RegistryValues.h"

namespace simhub {

void Barometer::Read(Time time, std::vector<float>* values) {
  double pressure = TheWorld().ScalarAt(WorldSignal::kPressure, time);
  Err(time, {&pressure, 1});
  values->push_back(static_cast<float>(pressure - bias_));
}

void Barometer::ApplyCalibration(const sns_registry_data& group) {
  const std::vector<float> bias = registryFloats(group, "bias");
  bias_ = Config().calibrated && !bias.empty() ? bias.front() : 0;
}

}  // namespace simhub
