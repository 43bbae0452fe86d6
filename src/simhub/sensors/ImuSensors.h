// The two sensors of an inertial measurement unit. Their registry group holds "corr_mat" (3×3) and "bias"
// (3), which handset families apply in one of two ways (the parameter bias_first):
//
//   0: calibrated = corr_mat · reading − bias
//   1: calibrated = corr_mat · (reading − bias)
#pragma once

#include <array>

#include "simhub/Sensor.h"

namespace simhub {

/// Three values, or six: the calibrated ones and then those they were made from (the parameter with_raw).
class ImuSensor : public Sensor {
 public:
  using Axes = std::array<double, 3>;

  ImuSensor(const SensorConfig& config, const SensorSurroundings& surroundings);
  void Read(Time time, std::vector<float>* values) override;
  void ApplyCalibration(const sns_registry_data& group) override;

 protected:
  /// What a perfect sensor would read.
  [[nodiscard]] virtual Axes Truth(Time time) const = 0;

 private:
  /// Adds the outlier, if this reading is one.
  void addOutlier(Axes* reading);
  [[nodiscard]] Axes calibrate(const Axes& reading) const;

  const bool withRaw_;
  const bool biasFirst_;
  const std::uint64_t outlierCount_;
  const std::uint64_t outlierEvery_;
  const double outlierSize_;
  ErrorModel::Matrix correction_ = ErrorModel::kIdentity;
  Axes bias_{};
  std::uint64_t readings_ = 0;
  std::uint64_t outliers_ = 0;
};

/// m/s²: what holds the handset against gravity, and the world's other acceleration.
class Accelerometer final : public ImuSensor {
 public:
  using ImuSensor::ImuSensor;

 private:
  [[nodiscard]] Axes Truth(Time time) const override;
};

/// rad/s.
class Gyroscope final : public ImuSensor {
 public:
  using ImuSensor::ImuSensor;

 private:
  [[nodiscard]] Axes Truth(Time time) const override;
};

}  // namespace simhub
