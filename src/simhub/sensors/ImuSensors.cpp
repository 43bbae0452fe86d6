#include "simhub/sensors/ImuSensors.h"

#include <algorithm>
#include <numbers>

#include "simhub/Pose.h"
#include "simhub/RegistryValues.h"

namespace simhub {
namespace {

constexpr double kRadiansPerDegree = std::numbers::pi / 180;

ImuSensor::Axes multiply(const ErrorModel::Matrix& matrix, const ImuSensor::Axes& vector) {
  ImuSensor::Axes product;
  for (std::size_t row = 0; row < 3; ++row) {
    product[row] =
        matrix[3 * row] * vector[0] + matrix[3 * row + 1] * vector[1] + matrix[3 * row + 2] * vector[2];
  }
  return product;
}

ImuSensor::Axes minus(const ImuSensor::Axes& a, const ImuSensor::Axes& b) {
  return {a[0] - b[0], a[1] - b[1], a[2] - b[2]};
}

void append(const ImuSensor::Axes& axes, std::vector<float>* values) {
  for (const double value : axes) values->push_back(static_cast<float>(value));
}

ImuSensor::Axes firstThree(const SignalValue& value) { return {value[0], value[1], value[2]}; }

}  // namespace

ImuSensor::ImuSensor(const SensorConfig& config, const SensorSurroundings& surroundings)
    : Sensor(config, surroundings),
      withRaw_(config.Parameter("with_raw") == 1),
      biasFirst_(config.Parameter("bias_first") == 1),
      outlierCount_(static_cast<std::uint64_t>(config.Parameter("outliers"))),
      outlierEvery_(static_cast<std::uint64_t>(config.Parameter("outlier_every"))),
      outlierSize_(config.Parameter("outlier_size")) {}

void ImuSensor::Read(Time time, std::vector<float>* values) {
  Axes reading = Truth(time);
  Err(time, reading);
  addOutlier(&reading);
  const double temperature = TheWorld().ScalarAt(WorldSignal::kTemperature, time);
  append(withRaw_ || Config().calibrated ? calibrate(reading, temperature) : reading, values);
  if (withRaw_) append(reading, values);
}

void ImuSensor::addOutlier(Axes* reading) {
  ++readings_;
  if (outliers_ >= outlierCount_ || readings_ % outlierEvery_ != 0) return;
  ++outliers_;
  (*reading)[0] += outlierSize_;
}

ImuSensor::Axes ImuSensor::calibrate(Axes reading, double temperature) const {
  for (std::size_t axis = 0; axis < reading.size(); ++axis)
    reading[axis] -= thermalScale_[axis] * temperature;
  if (biasFirst_) return multiply(correction_, minus(reading, bias_));
  return minus(multiply(correction_, reading), bias_);
}

void ImuSensor::LoadCalibration(const RegistryReader& read) {
  Sensor::LoadCalibration(read);
  const std::vector<float> scale =
      registryFloats(read(std::string("dynamic.fac_cal.") + ThermalWord() + ".thermal.scale"));
  thermalScale_ = {};
  if (scale.size() == thermalScale_.size()) std::copy(scale.begin(), scale.end(), thermalScale_.begin());
}

void ImuSensor::ApplyCalibration(const sns_registry_data& group) {
  const std::vector<float> matrix = registryFloats(group, "corr_mat");
  const std::vector<float> bias = registryFloats(group, "bias");
  correction_ = ErrorModel::kIdentity;
  bias_ = {};
  if (matrix.size() == correction_.size()) std::copy(matrix.begin(), matrix.end(), correction_.begin());
  if (bias.size() == bias_.size()) std::copy(bias.begin(), bias.end(), bias_.begin());
}

ImuSensor::Axes Accelerometer::Truth(Time time) const {
  Axes force = toHandsetFrame(TheWorld().At(WorldSignal::kPose, time),
                              {0, 0, TheWorld().ScalarAt(WorldSignal::kGravity, time)});
  const SignalValue other = TheWorld().At(WorldSignal::kAcceleration, time);
  for (std::size_t axis = 0; axis < force.size(); ++axis) force[axis] += other[axis];
  return force;
}

ImuSensor::Axes Gyroscope::Truth(Time time) const {
  Axes rate = firstThree(TheWorld().At(WorldSignal::kRotationRate, time));
  for (double& value : rate) value *= kRadiansPerDegree;
  return rate;
}

}  // namespace simhub
