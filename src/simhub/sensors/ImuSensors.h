// The two sensors of an inertial measurement unit. Their registry group holds "corr_mat" (3×3) and "bias"
// (3), which handset families apply in one of two ways (the parameter bias_first):
//
//   0: calibrated = corr_mat · steady − bias
//   1: calibrated = corr_mat · (steady − bias)
//
// where the thermal model has taken the drift off the reading, at the temperature T in °C:
//
//   steady = reading − scale · T
//
// The scale is the group dynamic.fac_cal.WORD.thermal.scale, which belongs to the handset, not to the chip.
// The model's bias is the reading at 0 °C, gravity included, and so nothing that could be taken off.
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
  void LoadCalibration(const RegistryReader& read) override;
  void ApplyCalibration(const sns_registry_data& group) override;

 protected:
  /// What a perfect sensor would read.
  [[nodiscard]] virtual Axes Truth(Time time) const = 0;
  /// What the sensor is called in the names of the thermal model's groups.
  [[nodiscard]] virtual const char* ThermalWord() const = 0;

 private:
  /// Adds the outlier, if this reading is one.
  void addOutlier(Axes* reading);
  [[nodiscard]] Axes calibrate(Axes reading, double temperature) const;

  const bool withRaw_;
  const bool biasFirst_;
  const std::uint64_t outlierCount_;
  const std::uint64_t outlierEvery_;
  const double outlierSize_;
  ErrorModel::Matrix correction_ = ErrorModel::kIdentity;
  Axes bias_{};
  Axes thermalScale_{};  ///< per °C
  std::uint64_t readings_ = 0;
  std::uint64_t outliers_ = 0;
};

/// m/s²: what holds the handset against gravity, and the world's other acceleration.
class Accelerometer final : public ImuSensor {
 public:
  using ImuSensor::ImuSensor;

 private:
  [[nodiscard]] Axes Truth(Time time) const override;
  [[nodiscard]] const char* ThermalWord() const override { return "accel"; }
};

/// rad/s.
class Gyroscope final : public ImuSensor {
 public:
  using ImuSensor::ImuSensor;

 private:
  [[nodiscard]] Axes Truth(Time time) const override;
  [[nodiscard]] const char* ThermalWord() const override { return "gyro"; }
};

}  // namespace simhub
