// The per-phase procedure of imu-multipoint: the record of a step, and what the last step makes of all
// records.
#include <algorithm>
#include <array>
#include <utility>

#include "framework/RegistryItems.h"
#include "framework/Statistics.h"
#include "imu/ImuMultipointCalibrator.h"
#include "imu/ImuMultipointRegistry.h"
#include "imu/ImuMultipointSamples.h"
#include "ssc/DevicePath.h"
#include "ssc/Log.h"
#include "ssc/RegistryUtil.h"

namespace {

// Six poses and three rotations.
constexpr std::size_t kMinRecords = kStationaryPhases.size() + kRotationPhases.size();

bool hasDimension(const char* what, const SampleData& values, std::size_t dimension) {
  if (values.size() == dimension) return true;
  ssc::log(ssc::kLogError, "%s has invalid dimension (%d) when converting to CalibrationInfo", what,
           static_cast<int>(values.size()));
  return false;
}

void copyTo(std::array<double, 3>* record, const SampleData& values) {
  std::copy(values.begin(), values.end(), record->begin());
}

void logRecord(const ImuCalibrationInfo& info) {
  ssc::log(ssc::kLogDebug, "CalibrationInfo::accel_mean: %s", ArrayToString(info.accel_mean, "").c_str());
  ssc::log(ssc::kLogDebug, "CalibrationInfo::gyro_mean: %s", ArrayToString(info.gyro_mean, "").c_str());
  ssc::log(ssc::kLogDebug, "CalibrationInfo::temp_mean: %f", info.temp_mean);
  ssc::log(ssc::kLogDebug, "CalibrationInfo::rotation_integration_time: %f", info.rotation_integration_time);
  ssc::log(ssc::kLogDebug, "CalibrationInfo::rotation_integration: %s",
           ArrayToString(info.rotation_integration, "").c_str());
}

void traceToLog(const std::string& text) { ssc::log(ssc::kLogDebug, "%s", text.c_str()); }

template <class Values>
SampleData toFloats(const Values& values) {
  SampleData floats;
  for (const double value : values) floats.push_back(static_cast<float>(value));
  return floats;
}

/// The label is as wide as the padding behind the colon expects.
void PrintScaleAndBiasForFactoryScript(const std::string& label, const Matrix3by3<double>& scale,
                                       const std::array<double, 3>& bias) {
  ssc::say("%s_SCALE: %s\n", label.c_str(), toFloats(scale.elements()).format(14, 6).c_str());
  ssc::say("%s_BIAS:  %s\n", label.c_str(), toFloats(bias).format(14, 6).c_str());
}

/// How the messages about a sensor's registry group call it.
struct GroupNames {
  const char* suffix;
  const char* owner;
};
constexpr GroupNames kAccelGroup{kAccelGroupSuffix, "accel"};
// "gryo" is an old slip that stays: scripts look for it.
constexpr GroupNames kGyroGroup{kGyroGroupSuffix, "gryo"};

int updateRegistry(ssc::Connection* connection, const std::string& packageName, const GroupNames& names,
                   const Matrix3by3<double>& scale, const std::array<double, 3>& bias, double temperature) {
  const std::string group = packageName + names.suffix;
  ssc::RegistryUtil registry(connection);
  sns_registry_data data;
  int result = registry.Read(group, &data);
  if (result == ssc::kOk) result = requireItem(kCorrectionMatrix, data, names.owner);
  if (result == ssc::kOk) result = requireItem(kBias, data, names.owner);
  if (result != ssc::kOk) return result;
  setMatrixItem(kCorrectionMatrix, toFloats(scale.elements()).toVector(), &data);
  setVectorItem(kBias, toFloats(bias).toVector(), &data);
  setFloatItem(kMeanTemp, static_cast<float>(temperature), &data);
  result = registry.Write(group, data);
  if (result != ssc::kOk) ssc::log(ssc::kLogError, "Failed to write data to %s registry", names.owner);
  return result;
}

}  // namespace

// The record of a step.

ImuMultipointCalibrator::CalibrationInfo ImuMultipointCalibrator::GenerateCalibrationInfo() const {
  ssc::log(ssc::kLogInfo, "Generating calibration info (phase: %s)", phase_.c_str());
  CalibrationInfo info;
  info.status = ssc::kInvalid;
  if (!parseImuPhase(phase_)) {
    ssc::log(ssc::kLogError, "Invalid phase string to populate calibration info structure");
    return info;
  }
  info.phase = phase_;
  const SampleData accelMean = GetAccelMean();
  const SampleData gyroMean = GetGyroMean();
  const SampleData tempMean = GetTempMean();
  const SampleData rotation =
      useGyroRate_ ? measureSteadyRate() : measureRotation(&info.rotation_integration_time);
  if (rotation.empty()) {
    ssc::log(ssc::kLogError, "unable to obtain rotation data from gyro calibration");
    return info;
  }
  if (!hasDimension("accel_mean", accelMean, 3) || !hasDimension("gyro_mean", gyroMean, 3) ||
      !hasDimension("temp_mean", tempMean, 1) || !hasDimension("measured_rotation", rotation, 3)) {
    return info;
  }
  copyTo(&info.accel_mean, accelMean);
  copyTo(&info.gyro_mean, gyroMean);
  info.temp_mean = static_cast<double>(tempMean[0]);
  copyTo(&info.rotation_integration, rotation);
  logRecord(info);
  if (!info.IsFinite()) {
    // It would come back as zeros, and be taken for a measurement.
    ssc::log(ssc::kLogError, "Calibration info of phase %s has values that are not finite", phase_.c_str());
    return info;
  }
  info.status = ssc::kOk;
  return info;
}

SampleData ImuMultipointCalibrator::measureRotation(double* integrationTime) const {
  const auto collected = samples.find(gyroSuid_);
  if (collected == samples.end()) return {};
  MeasuredRotation measured = integrateRotation(collected->second);
  *integrationTime = measured.integrationTime;
  return std::move(measured.rotation);
}

SampleData ImuMultipointCalibrator::measureSteadyRate() const {
  ssc::log(ssc::kLogInfo, "Filling calibration info with gyro rate instead of integrated angle.");
  const auto collected = samples.find(gyroSuid_);
  if (collected == samples.end()) return {};
  SteadyRate steady = findSteadyRate(collected->second, constRateWindow_);
  if (steady.fault == SteadyRate::Fault::kTooFewValues) {
    ssc::log(ssc::kLogError, "observed gyro sample with dimension less than 3, calibration terminated");
  }
  if (steady.windowFound) {
    ssc::log(ssc::kLogInfo, "const_rate_window: %.2f (start: %.2f, end: %.2f) gyro avg on rotating axis: %f",
             static_cast<double>(constRateWindow_), steady.start, steady.end,
             static_cast<double>(steady.rate[steady.axis]));
  }
  if (steady.fault == SteadyRate::Fault::kFluctuation) {
    ssc::log(ssc::kLogError,
             "Heavy fluctuation detected on gyro data during steady rotating phase, please check if rotation "
             "station is functioning properly");
    ssc::log(ssc::kLogDebug, "The rates about the %c-axis differ by %f rad/s, more than %f rad/s",
             axisLetter(steady.axis), static_cast<double>(steady.fluctuation),
             static_cast<double>(steady.allowedFluctuation));
  } else if (steady.fault == SteadyRate::Fault::kNoSamples) {
    ssc::log(
        ssc::kLogDebug,
        "None of %zu gyro samples is of a steady rotation: their mean rate about the %c-axis is %f rad/s",
        collected->second.size(), axisLetter(steady.axis),
        static_cast<double>(withPlainNan(steady.meanRate)));
  }
  return steady.fault == SteadyRate::Fault::kNone ? std::move(steady.rate) : SampleData();
}

int ImuMultipointCalibrator::AppendCalibrationInfoToFile(const CalibrationInfo& info, const char* path) {
  ssc::log(ssc::kLogInfo, "Appending calibration info to file: %s", path);
  bool dropped = false;
  const FileResult result = appendCalibrationInfo(info, ssc::devicePath(path), &dropped);
  if (result == FileResult::kCannotOpen) {
    ssc::log(ssc::kLogError, "Failed to open file to write calibration info to");
    return ssc::kNotPermitted;
  }
  if (dropped) ssc::log(ssc::kLogWarn, "Dropped an unfinished record at the end of %s", path);
  ssc::log(ssc::kLogDebug, "\"%s\" >> \"%s\"", info.ToString().c_str(), path);
  if (result == FileResult::kOk) return ssc::kOk;
  ssc::log(ssc::kLogError, "Failed to write calibration info to file");
  return ssc::kNotPermitted;
}

std::vector<ImuMultipointCalibrator::CalibrationInfo>
ImuMultipointCalibrator::ReadCalibrationInfoListFromFile(const char* path) {
  ssc::log(ssc::kLogInfo, "Reading calibration info from: %s", path);
  std::vector<CalibrationInfo> records;
  switch (readCalibrationInfos(ssc::devicePath(path), &records)) {
    case FileResult::kOk:
      break;
    case FileResult::kTooLarge:
      ssc::log(ssc::kLogError, "Calibration info file is larger than %zu bytes", kMaxImuFileBytes);
      break;
    case FileResult::kCannotOpen:
      // The writer's words, here too: scripts know them.
      ssc::log(ssc::kLogError, "Failed to open file to write calibration info to");
      break;
    default:
      ssc::log(ssc::kLogError, "Failed to read calibration info from file");
      break;
  }
  return records;
}

// The last step.

int ImuMultipointCalibrator::solvePhases() {
  const std::vector<CalibrationInfo> records = ReadCalibrationInfoListFromFile(kImuDataFile);
  if (records.size() < kMinRecords) {
    ssc::log(ssc::kLogError, "Calibration input is invalid.");
    return ssc::kInvalid;
  }
  ssc::log(ssc::kLogDebug, "Calibration Info:");
  for (const CalibrationInfo& record : records) ssc::log(ssc::kLogDebug, " %s", record.ToString().c_str());
  // The accelerometer's result stands when the gyroscope's fails: they are two sensors.
  int result = calibrateAccelPhases(records);
  if (result == ssc::kOk) result = calibrateGyroPhases(records);
  if (result != ssc::kOk) return result;
  // In a dry run too: the sensors then just read again what they have.
  NotifyOrWarn({accelSuid_, gyroSuid_});
  return ssc::kOk;
}

int ImuMultipointCalibrator::calibrateAccelPhases(const std::vector<CalibrationInfo>& records) {
  const AccelCalibrationInput input = GenerateAccelCalibrationInput(records);
  if (!input.valid) {
    ssc::log(ssc::kLogError, "Cannot extract accel calibration input.");
    return ssc::kInvalid;
  }
  ssc::log(ssc::kLogInfo, "%s", input.ToString().c_str());
  const AccelCalibrationOutput output = CalibrateAccel2019(input);
  if (!output.valid) {
    ssc::log(ssc::kLogError, "Failed to compute accel calibration output.");
    return ssc::kInvalid;
  }
  ssc::log(ssc::kLogInfo, "%s", output.ToString().c_str());
  PrintScaleAndBiasForFactoryScript("ACCEL", output.scale, output.bias);
  int result = requireFinite("The accelerometer's", output.scale, output.bias, output.temperature);
  if (result != ssc::kOk || dryRun) return result;
  result = UpdateAccelRegistry(output);
  if (result != ssc::kOk) {
    // "regsitry" is an old slip that stays, here and below.
    ssc::log(ssc::kLogError, "Failed to write accel calibration output to regsitry");
  }
  return result;
}

int ImuMultipointCalibrator::calibrateGyroPhases(const std::vector<CalibrationInfo>& records) {
  const GyroCalibrationInput input = GenerateGyroCalibrationInput(records);
  if (!input.valid) {
    ssc::log(ssc::kLogError, "Cannot extract gyro calibration input.");
    return ssc::kInvalid;
  }
  ssc::log(ssc::kLogInfo, "%s", input.ToString().c_str());
  const GyroCalibrationOutput output = CalibrateGyro2019(input);
  if (!output.valid) {
    ssc::log(ssc::kLogError, "Failed to compute gyro calibration output.");
    return ssc::kInvalid;
  }
  ssc::log(ssc::kLogInfo, "%s", output.ToString().c_str());
  PrintScaleAndBiasForFactoryScript("GYRO", output.scale, output.bias);
  int result = requireFinite("The gyroscope's", output.scale, output.bias, output.temperature);
  if (result != ssc::kOk || dryRun) return result;
  result = UpdateGyroRegistry(output);
  if (result != ssc::kOk) ssc::log(ssc::kLogError, "Failed to write gyro calibration output to regsitry");
  return result;
}

int ImuMultipointCalibrator::requireFinite(const std::string& whose, const Matrix3by3<double>& scale,
                                           const std::array<double, 3>& bias, double temperature) {
  int result = RequireFinite((whose + " scale").c_str(), toFloats(scale.elements()).toVector());
  if (result == ssc::kOk) result = RequireFinite((whose + " bias").c_str(), toFloats(bias).toVector());
  if (result != ssc::kOk) return result;
  return RequireFinite((whose + " temperature").c_str(), {static_cast<float>(temperature)});
}

AccelCalibrationInput ImuMultipointCalibrator::GenerateAccelCalibrationInput(
    const std::vector<CalibrationInfo>& records) const {
  ssc::log(ssc::kLogInfo, "Generating accel calibration input");
  return makeAccelInput(records, accelReference_);
}

AccelCalibrationOutput ImuMultipointCalibrator::CalibrateAccel2019(const AccelCalibrationInput& input) {
  ssc::log(ssc::kLogInfo, "Calibrating accelerometer");
  return solveAccel(input, traceToLog);
}

int ImuMultipointCalibrator::UpdateAccelRegistry(const AccelCalibrationOutput& output) const {
  return updateRegistry(connection, packageName_, kAccelGroup, output.scale, output.bias, output.temperature);
}

GyroCalibrationInput ImuMultipointCalibrator::GenerateGyroCalibrationInput(
    const std::vector<CalibrationInfo>& records) const {
  ssc::log(ssc::kLogInfo, "Generating gyro calibration input");
  GyroCalibrationInput input = makeGyroInput(records, gyroReference_);
  if (!input.fault.empty()) ssc::log(ssc::kLogError, "%s", input.fault.c_str());
  return input;
}

GyroCalibrationOutput ImuMultipointCalibrator::CalibrateGyro2019(const GyroCalibrationInput& input) {
  ssc::log(ssc::kLogInfo, "Calibrating gyroscope");
  GyroCalibrationOutput output = solveGyro(input, traceToLog);
  if (!output.valid) {
    ssc::log(ssc::kLogError, "Mixed input of rotation angle and angular rate from previous phases");
  }
  return output;
}

int ImuMultipointCalibrator::UpdateGyroRegistry(const GyroCalibrationOutput& output) const {
  return updateRegistry(connection, packageName_, kGyroGroup, output.scale, output.bias, output.temperature);
}
