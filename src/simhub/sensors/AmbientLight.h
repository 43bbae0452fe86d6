#pragma once

#include "simhub/Sensor.h"

namespace simhub {

/// One value: the illuminance in lux. Its filter is not quite the eye's: it sees some infrared, and light of
/// another colour temperature than 5000 K a little brighter or darker. The calibrated stream is multiplied by
/// the registry's "scale", in thousandths, and, where the sensor is one that corrects, by its "corr_factor",
/// which is else left to whoever reads the stream.
class AmbientLight final : public Sensor {
 public:
  using Sensor::Sensor;
  void Read(Time time, std::vector<float>* values) override;
  void ApplyCalibration(const sns_registry_data& group) override;

 private:
  double factor_ = 1;
};

}  // namespace simhub
