#include "simhub/sensors/Thermometer.h"

namespace simhub {

void Thermometer::Read(Time time, std::vector<float>* values) {
  double temperature = TheWorld().ScalarAt(WorldSignal::kTemperature, time);
  Err(time, {&temperature, 1});
  values->push_back(static_cast<float>(temperature));
}

}  // namespace simhub
