#pragma once

#include "simhub/Sensor.h"

namespace simhub {

/// Three values: the magnetic field in µT along the handset's axes, as it turns in the room. The error
/// model's bias is the handset's hard iron, its soft iron A lies in the way of the field:  raw = A · field +
/// bias.
///
/// The calibrated stream undoes both by the registry:  C · (raw − b), with the matrix C of "corr_mat" and the
/// vector b of "bias". It is the field when C is the inverse of A and b the hard iron.
class Magnetometer final : public Sensor {
 public:
  using Sensor::Sensor;
  void Read(Time time, std::vector<float>* values) override;
  void ApplyCalibration(const sns_registry_data& group) override;

 private:
  std::array<double, 3> bias_{};  ///< µT
  ErrorModel::Matrix correction_ = ErrorModel::kIdentity;
};

}  // namespace simhub
