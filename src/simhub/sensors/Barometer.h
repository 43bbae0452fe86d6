#pragma once

#include "simhub/Sensor.h"

namespace simhub {

/// One value: the air pressure in hPa. The calibrated stream has the first number of the registry's "bias"
/// subtracted, the raw one never.
class Barometer final : public Sensor {
 public:
  using Sensor::Sensor;
  void Read(Time time, std::vector<float>* values) override;
  void ApplyCalibration(const sns_registry_data& group) override;

 private:
  double bias_ = 0;  ///< hPa
};

}  // namespace simhub
