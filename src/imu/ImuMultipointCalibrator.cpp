#include "imu/ImuMultipointCalibrator.h"

#include <algorithm>
#include <set>

#include "framework/Statistics.h"
#include "imu/ImuMultipointSamples.h"
#include "ssc/DevicePath.h"
#include "ssc/Log.h"
#include "ssc/WorkingFile.h"

namespace {

constexpr const char* kAccel = "accel";
constexpr const char* kGyro = "gyro";
constexpr const char* kTemperature = "sensor_temperature";
constexpr float kPerPhaseRateHz = 400.0F;
constexpr float kPositionalRateHz = 20.0F;
constexpr float kTemperatureRateHz = 1.0F;

// Collection runs a little over the asked time, so that the last whole second of readings has arrived.
constexpr std::chrono::milliseconds kCollectionMargin{200};

constexpr int kNeededAccuracy = 3;
constexpr int kAxes = 3;
// Events of the per-phase handsets: three calibrated values, then the three they were made from.
constexpr int kCalibratedAndRaw = 6;

// The leading blanks align the printed names.
constexpr const char* kAccelLabel = "ACCEL";
constexpr const char* kGyroLabel = " GYRO";
constexpr const char* kTemperatureLabel = " TEMP";

}  // namespace

void ClearIntermediateFiles() {
  static const std::array<const char*, 1> files{kImuDataFile};
  ssc::log(ssc::kLogInfo, "Clearing existing intermediate IMU calibration data.");
  for (const char* file : files) {
    ssc::log(ssc::kLogDebug, "Removing file: %s", file);
    const int result = ssc::removeWorkingFile(ssc::devicePath(file));
    if (result == ssc::kOk) continue;
    // Whoever calibrates has to know: the step goes on all the same.
    ssc::log(ssc::kLogWarn, "Unable to remove file: %s: %s", file, std::strerror(-result));
    ssc::log(ssc::kLogWarn, "What it holds of an earlier calibration will be taken for this one's");
  }
}

int ImuMultipointCalibrator::Run(const Arguments& arguments) {
  if (arguments.reset) return Reset();
  int result = ParseArgs(arguments);
  if (result == kHelpPrinted) return ssc::kOk;
  if (result == ssc::kOk) result = LookupSuids();
  return result == ssc::kOk ? Calibrate() : result;
}

bool ImuMultipointCalibrator::isPerPhase() const {
  return deviceType == DeviceType::p2m2 || deviceType == DeviceType::t5h5 ||
         deviceType == DeviceType::rufael || deviceType == DeviceType::whiskel;
}

int ImuMultipointCalibrator::LookupSuids() {
  ssc::say("Searching for IMU...\n");
  std::map<std::string, ssc::SensorUid> suids;
  const int result = LookupSuidsByName({kAccel, kGyro, kTemperature}, &suids, &packageName_,
                                       SNS_STD_SENSOR_STREAM_TYPE_STREAMING);
  if (result != ssc::kOk) {
    ssc::log(ssc::kLogError, "Unable to look up the IMU and its temperature sensor. Error = %d", result);
    return result;
  }
  accelSuid_ = suids[kAccel];
  gyroSuid_ = suids[kGyro];
  temperatureSuid_ = suids[kTemperature];
  // The per-phase procedure takes short events in, and says what is wrong with their means.
  const std::size_t minimumValues = isPerPhase() ? 1 : kAxes;
  const float rateHz = isPerPhase() ? kPerPhaseRateHz : kPositionalRateHz;
  SetSensorInfo(accelSuid_, "Accelerometer", rateHz, minimumValues);
  SetSensorInfo(gyroSuid_, "Gyroscope", rateHz, minimumValues);
  SetSensorInfo(temperatureSuid_, "IMU Temperature", kTemperatureRateHz);
  return ssc::kOk;
}

bool ImuMultipointCalibrator::OnSensorEvent(const ssc::SensorUid& suid, std::uint64_t timestamp,
                                            const sns_std_sensor_event& event) {
  const bool isTraced = ssc::logLevel() >= ssc::kLogVerbose;
  const bool isAccel = suid == accelSuid_;
  const bool isGyro = suid == gyroSuid_;
  if (isTraced) {
    const char* const source = isAccel                    ? "accel"
                               : isGyro                   ? "gyro"
                               : suid == temperatureSuid_ ? "temp"
                                                          : "other";
    ssc::log(ssc::kLogVerbose, "%s sample (status: %d): %s", source, static_cast<int>(event.status()),
             ArrayToString(event.data(), "").c_str());
  }
  if (event.status() < kNeededAccuracy) {
    ssc::log(ssc::kLogDebug, "sample status (%d) below accuracy level (%d), dropping",
             static_cast<int>(event.status()), kNeededAccuracy);
    return false;
  }
  if (!isPerPhase() || event.data_size() < kCalibratedAndRaw) {
    return Calibrator::OnSensorEvent(suid, timestamp, event);
  }
  rawEvent_.set_status(event.status());
  rawEvent_.mutable_data()->Assign(event.data().begin() + kAxes, event.data().begin() + kCalibratedAndRaw);
  if (isTraced) {
    ssc::log(ssc::kLogVerbose, "%s raw data sample : %s",
             isAccel  ? "accel"
             : isGyro ? "gyro"
                      : "unknown",
             ArrayToString(rawEvent_.data(), "").c_str());
  }
  return Calibrator::OnSensorEvent(suid, timestamp, rawEvent_);
}

int ImuMultipointCalibrator::Calibrate() {
  ssc::say("%s IMU multi-point calibration.\n", step_ == kFirst ? "Beginning" : "Continuing");
  const int result = runStep();
  if (result == ssc::kOk && step_ != kLast) {
    ssc::say("Completed data collection for current position.\n");
    return result;
  }
  return Conclude("IMU multi-point calibration", result);
}

int ImuMultipointCalibrator::runStep() {
  int result = ssc::kOk;
  if (isPerPhase()) {
    if (step_ == kFirst) ClearIntermediateFiles();
    // A step without a phase collects nothing: "first" then only clears, "last" only solves.
    if (parseImuPhase(phase_)) result = collectPhase();
  } else {
    result = collectPosition();
  }
  if (result != ssc::kOk || step_ != kLast) return result;
  return isPerPhase() ? solvePhases() : solvePositions();
}

int ImuMultipointCalibrator::collect() {
  const int result =
      RequireCollected(CollectSamples(std::chrono::seconds(seconds_) + kCollectionMargin, false));
  if (result != ssc::kOk) return result;
  PrintSamples();
  return ssc::kOk;
}

int ImuMultipointCalibrator::collectPhase() {
  int result = collect();
  if (result == ssc::kOk) result = VerifyPosition();
  if (result == ssc::kOk) result = CleanData();
  if (result == ssc::kOk) result = VerifyStandardDeviations();
  if (result != ssc::kOk) return result;
  const CalibrationInfo info = GenerateCalibrationInfo();
  return info.status == ssc::kOk ? AppendCalibrationInfoToFile(info, kImuDataFile) : info.status;
}

int ImuMultipointCalibrator::collectPosition() {
  int result = collect();
  if (result == ssc::kOk) result = VerifyStandardDeviations();
  // A position that nothing was measured in would be one of zeros.
  if (result == ssc::kOk && means_.empty()) result = notEnoughSamples(kAccelLabel);
  return result == ssc::kOk ? AppendMultipointData() : result;
}

// Checking what was collected.

int ImuMultipointCalibrator::notEnoughSamples(const char* label) {
  ssc::log(ssc::kLogError, "Not enough %s samples were collected", label);
  return ssc::kNoData;
}

SampleData ImuMultipointCalibrator::meanOfSensor(const ssc::SensorUid& suid) const {
  const auto stored = means_.find(suid);
  if (stored != means_.end() && !stored->second.empty()) return stored->second.front();
  const auto collected = samples.find(suid);
  return collected == samples.end() ? SampleData() : sampleDataMean(collected->second);
}

int ImuMultipointCalibrator::VerifyPosition() const {
  ssc::log(ssc::kLogInfo, "verifying device position for phase: %s", phase_.c_str());
  const auto phase = parseImuPhase(phase_);
  if (!phase) {
    ssc::log(ssc::kLogError, "No valid position is provided to the program");
    return ssc::kInvalid;
  }
  if (!phase->stationary) return ssc::kOk;
  ssc::log(ssc::kLogDebug, "Validating accel data during stationary phase: %s", phase_.c_str());
  if (ValidateStationaryAccel(GetAccelMean())) return ssc::kOk;
  ssc::log(ssc::kLogError, "Stationary accel data validation failed");
  return ssc::kInvalid;
}

bool ImuMultipointCalibrator::ValidateStationaryAccel(const SampleData& accelMean) const {
  const auto phase = parseImuPhase(phase_);
  // A silent accelerometer, whose mean is empty, is in no pose either.
  if (!phase || accelMean.size() < kAxes) return false;
  const auto axis = axisOutOfPose(*phase, accelMean);
  if (!axis) return true;
  ssc::log(ssc::kLogError, "Accel data out of range (phase = %s, accel_mean[%c] = %f)", phase_.c_str(),
           axisLetter(*axis), static_cast<double>(withPlainNan(accelMean[*axis])));
  return false;
}

namespace {

int removeOutliersOf(std::vector<Sample>* samples) {
  const std::size_t removed = removeOutliers(samples, OutlierRemoval(), [](const Outlier& outlier) {
    const SampleData& values = outlier.sample.values;
    if (values.size() != outlier.expectedSize) {
      ssc::log(ssc::kLogError, "Sample data dimension (%zu) != stdev dimension (%zu)", values.size(),
               outlier.expectedSize);
    } else {
      ssc::log(ssc::kLogWarn, "removing outlier sample: %s", ArrayToString(values, "").c_str());
    }
  });
  if (removed > kMaxOutliers) {
    ssc::log(ssc::kLogError, "Too many outliers (%d)", static_cast<int>(removed));
    return ssc::kInvalid;
  }
  if (removed > 0) {
    ssc::log(ssc::kLogWarn, "%d outlier samples are removed", static_cast<int>(removed));
  }
  return ssc::kOk;
}

}  // namespace

int ImuMultipointCalibrator::CleanData() {
  ssc::log(ssc::kLogInfo, "Cleaning data...");
  const auto phase = parseImuPhase(phase_);
  if (!phase || !phase->stationary) return ssc::kOk;
  ssc::log(ssc::kLogDebug, "Removing outliers in accel data (phase: %s)", phase_.c_str());
  const int result = removeOutliersOf(&samples[accelSuid_]);
  if (result != ssc::kOk) return result;
  ssc::log(ssc::kLogDebug, "Removing outliers in gyro data (phase: %s)", phase_.c_str());
  return removeOutliersOf(&samples[gyroSuid_]);
}

int ImuMultipointCalibrator::VerifyStandardDeviations() {
  ssc::say("Verifying data...\n");
  // Where nothing came at all there is nothing to verify: the next step says what it misses.
  if (samples.empty()) return ssc::kOk;
  // A sensor that sent nothing is missing in `samples`, but not here.
  for (const ssc::SensorUid& suid : std::set<ssc::SensorUid>{accelSuid_, gyroSuid_, temperatureSuid_}) {
    int result = ssc::kOk;
    if (suid == accelSuid_) {
      result = verifySensor(suid, kAccelLabel, limits_.accelStdev);
    } else if (suid == gyroSuid_) {
      result = verifySensor(suid, kGyroLabel, limits_.gyroStdev);
    } else {
      result = verifySensor(suid, kTemperatureLabel, 0);
    }
    if (result != ssc::kOk) return result;
  }
  return ssc::kOk;
}

int ImuMultipointCalibrator::verifySensor(const ssc::SensorUid& suid, const char* label, float stdevLimit) {
  const bool hasStdev = suid != temperatureSuid_;
  const std::vector<Sample>& itsSamples = samples[suid];
  if (itsSamples.size() < (hasStdev ? 2U : 1U)) return notEnoughSamples(label);
  const SampleData mean = sampleDataMean(itsSamples);
  ssc::say("%s_MEAN: %s\n", label, mean.format(14, 6).c_str());
  means_[suid] = {mean};
  if (!hasStdev) return ssc::kOk;
  const SampleData stdev = sampleStdev(itsSamples, mean);
  ssc::say("%s_STDEV:%s\n", label, stdev.format(14, 6).c_str());
  return checkStdev(label, stdev, stdevLimit);
}

int ImuMultipointCalibrator::checkStdev(const char* label, const SampleData& stdev, float limit) {
  if (!(limit > 0)) return ssc::kOk;
  for (std::size_t axis = 0; axis < std::min<std::size_t>(stdev.size(), kAxes); ++axis) {
    if (!(stdev[axis] > limit)) continue;
    ssc::log(ssc::kLogError, "%s %c-axis standard deviation is too large (%.*f > %.*f)", label,
             axisLetter(axis), 6, static_cast<double>(stdev[axis]), 6, static_cast<double>(limit));
    return ssc::kInvalid;
  }
  return ssc::kOk;
}
