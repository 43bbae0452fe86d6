// The positional procedure of imu-multipoint: a mean for each step, and the fit over all of them.
#include <algorithm>
#include <cmath>

#include "framework/RegistryItems.h"
#include "imu/ImuMultipointCalibrator.h"
#include "imu/ImuMultipointRegistry.h"
#include "imu/ImuMultipointSamples.h"
#include "ssc/DevicePath.h"
#include "ssc/Log.h"
#include "ssc/RegistryUtil.h"

namespace {

constexpr std::size_t kAxes = 3;

SampleData firstValues(const SampleData& values, std::size_t count) {
  SampleData first = values;
  first.resize(count);
  return first;
}

bool isFinite(const SampleData& values) {
  return std::all_of(values.begin(), values.end(), [](float value) { return std::isfinite(value); });
}

SampleData toSampleData(const std::array<float, 3>& values) {
  return SampleData(values.begin(), values.end());
}

/// The first element, with its axis, that is too large. `what` is "Accelerometer %c-axis scale" and the like.
int checkTolerance(const char* sensor, const char* quantity, const SampleData& values, float limit) {
  if (!(limit > 0)) return ssc::kOk;
  for (std::size_t axis = 0; axis < std::min(values.size(), kAxes); ++axis) {
    if (!(std::fabs(values[axis]) > limit)) continue;
    ssc::log(ssc::kLogError, "%s %c-axis %s is out of tolerance: |%.*f| > %.*f", sensor, axisLetter(axis),
             quantity, 6, static_cast<double>(values[axis]), 6, static_cast<double>(limit));
    return ssc::kInvalid;
  }
  return ssc::kOk;
}

}  // namespace

int ImuMultipointCalibrator::AppendMultipointData() {
  ssc::say("Saving data to file...\n");
  const ImuPosition position{firstValues(GetAccelMean(), kAxes), firstValues(GetGyroMean(), kAxes),
                             firstValues(GetTempMean(), 1)};
  int result = RequireFinite("The accelerometer's mean", position.accel.toVector());
  if (result == ssc::kOk) result = RequireFinite("The gyroscope's mean", position.gyro.toVector());
  if (result == ssc::kOk) result = RequireFinite("The temperature's mean", position.temp.toVector());
  if (result != ssc::kOk) return result;
  switch (appendPosition(position, ssc::devicePath(kImuDataFile),
                         step_ == kFirst ? FileStart::kTruncate : FileStart::kKeep)) {
    case FileResult::kOk:
      return ssc::kOk;
    case FileResult::kCannotOpen:
      ssc::log(ssc::kLogError, "Failed to open IMU calibration data file");
      return ssc::kNotPermitted;
    default:
      ssc::log(ssc::kLogError, "Failed to write data to file");
      return ssc::kShortFile;
  }
}

int ImuMultipointCalibrator::ReadMultipointData() {
  ssc::say("Retrieving previous data...\n");
  std::vector<ImuPosition> positions;
  const FileResult result = readPositions(ssc::devicePath(kImuDataFile), &positions);
  if (result == FileResult::kCannotOpen) {
    ssc::log(ssc::kLogError, "Failed to open IMU calibration data file");
    return ssc::kNotPermitted;
  }
  means_.clear();
  for (const ImuPosition& position : positions) {
    means_[accelSuid_].push_back(position.accel);
    means_[gyroSuid_].push_back(position.gyro);
    means_[temperatureSuid_].push_back(position.temp);
  }
  // No step writes a number that is not finite.
  const bool isSound = std::all_of(positions.begin(), positions.end(), [](const ImuPosition& position) {
    return isFinite(position.accel) && isFinite(position.gyro) && isFinite(position.temp);
  });
  if (result == FileResult::kIncomplete || !isSound) {
    ssc::log(ssc::kLogError, "Previous data is malformed or incomplete");
    return ssc::kNoData;
  }
  if (result == FileResult::kTooLarge) {
    ssc::log(ssc::kLogError, "IMU calibration data file is larger than %zu bytes", kMaxImuFileBytes);
    return ssc::kInvalid;
  }
  if (result == FileResult::kOk) return ssc::kOk;
  ssc::log(ssc::kLogError, "Failed to read data from file");
  return ssc::kShortFile;
}

int ImuMultipointCalibrator::solvePositions() {
  int result = ReadMultipointData();
  if (result == ssc::kOk) result = CalibrateAccel();
  if (result == ssc::kOk) result = CalibrateGyro();
  if (result == ssc::kOk && !dryRun) NotifyOrWarn({accelSuid_, gyroSuid_});
  return result;
}

int ImuMultipointCalibrator::CalibrateAccel() {
  ssc::say("Computing accelerometer parameters...\n");
  const std::vector<SampleData>& means = means_[accelSuid_];
  if (means.size() < kMinPositions) {
    ssc::log(ssc::kLogError, "Only %zu of %d positions have been measured", means.size(),
             static_cast<int>(kMinPositions));
    ssc::log(ssc::kLogWarn, "Calibration is not complete");
    return ssc::kNoData;
  }
  const std::string group = packageName_ + kAccelGroupSuffix;
  sns_registry_data data;
  int result = ssc::RegistryUtil(connection).Read(group, &data);
  AxisCorrection current;
  if (result == ssc::kOk) result = readAccelCorrection(data, &current);
  if (result != ssc::kOk) return result;

  // The readings were already corrected by what is stored.
  const AxisCorrection correction = composeCorrections(current, fitAccel(means, gravity_));
  result = checkAccelCorrection(correction);
  if (result != ssc::kOk || SkipsWrite()) return result;

  ssc::say("Writing accelerometer calibration to registry...\n");
  setMatrixItem(kCorrectionMatrix, {correction.scale.begin(), correction.scale.end()}, &data);
  setVectorItem(kBias, {correction.bias.begin(), correction.bias.end()}, &data);
  setFloatItem(kMeanTemp, positionsTemperature(), &data);
  return writeGroup(group, data);
}

int ImuMultipointCalibrator::readAccelCorrection(const sns_registry_data& data,
                                                 AxisCorrection* current) const {
  int result = requireItem(kCorrectionMatrix, data, "accel");
  if (result == ssc::kOk) result = requireItem(kBias, data, "accel");
  std::vector<float> scale;
  std::vector<float> bias;
  if (result == ssc::kOk) result = readDiagonalItem(kCorrectionMatrix, data, &scale);
  if (result == ssc::kOk) result = readVectorItem(kBias, kAxes, data, &bias);
  if (result != ssc::kOk) return result;
  std::copy(scale.begin(), scale.end(), current->scale.begin());
  std::copy(bias.begin(), bias.end(), current->bias.begin());
  if (*current == AxisCorrection()) return ssc::kOk;
  ssc::log(ssc::kLogWarn, "The accelerometer has an existing calibration%s",
           dryRun ? "" : " which may be overwritten");
  ssc::log(ssc::kLogWarn, "PREV_ACCEL_SCALE:%s", toSampleData(current->scale).format(14, 6).c_str());
  // "BiAS" is an old slip that stays: scripts look for it.
  ssc::log(ssc::kLogWarn, "PREV_ACCEL_BiAS: %s", toSampleData(current->bias).format(14, 6).c_str());
  return ssc::kOk;
}

int ImuMultipointCalibrator::checkAccelCorrection(const AxisCorrection& correction) const {
  const SampleData scale = toSampleData(correction.scale);
  const SampleData bias = toSampleData(correction.bias);
  ssc::say("ACCEL_SCALE:%s\n", scale.format(14, 6).c_str());
  ssc::say("ACCEL_BIAS: %s\n", bias.format(14, 6).c_str());
  int result = RequireFinite("The accelerometer's scale", scale.toVector());
  if (result == ssc::kOk) result = RequireFinite("The accelerometer's bias", bias.toVector());
  // The scale itself is held against the limit, not its distance from 1.
  if (result == ssc::kOk) result = checkTolerance("Accelerometer", "scale", scale, limits_.accelScale);
  if (result == ssc::kOk) result = checkTolerance("Accelerometer", "bias", bias, limits_.accelBias);
  return result;
}

int ImuMultipointCalibrator::CalibrateGyro() {
  ssc::say("Computing gyroscope biases...\n");
  const std::string group = packageName_ + kGyroGroupSuffix;
  sns_registry_data data;
  int result = ssc::RegistryUtil(connection).Read(group, &data);
  if (result == ssc::kOk) result = requireItem(kBias, data, "gyro");
  std::vector<float> currentBias;
  if (result == ssc::kOk) result = readVectorItem(kBias, kAxes, data, &currentBias);
  if (result != ssc::kOk) return result;
  const SampleData current(currentBias);
  if (!(current == SampleData{0, 0, 0})) {
    ssc::log(ssc::kLogWarn, "The gyroscope has an existing calibration%s",
             dryRun ? "" : " which may be overwritten");
    ssc::log(ssc::kLogWarn, "PREV_GYRO_BIAS:%s", current.format(14, 6).c_str());
  }

  const SampleData bias = current + meanOf(means_[gyroSuid_]);
  ssc::say(" GYRO_BIAS: %s\n", bias.format(14, 6).c_str());
  result = RequireFinite("The gyroscope's bias", bias.toVector());
  if (result == ssc::kOk) result = checkTolerance("Gyroscope", "bias", bias, limits_.gyroBias);
  if (result != ssc::kOk || SkipsWrite()) return result;

  ssc::say("Writing gyroscope calibration to registry...\n");
  setVectorItem(kBias, bias.toVector(), &data);
  setFloatItem(kMeanTemp, positionsTemperature(), &data);
  return writeGroup(group, data);
}

float ImuMultipointCalibrator::positionsTemperature() const {
  const SampleData mean = meanOf(means_.at(temperatureSuid_));
  return mean.empty() ? 0.0F : mean[0];
}

int ImuMultipointCalibrator::writeGroup(const std::string& group, const sns_registry_data& data) const {
  ssc::RegistryUtil registry(connection);
  return StoreGroup(registry, group, data);
}
