#include "imu/ImuThermalCalibrator.h"

#include <cmath>

#include "framework/CommandOptions.h"
#include "framework/ParseNumber.h"
#include "ssc/Log.h"
#include "ssc/Ticks.h"

namespace {

constexpr const char* kUsage = "Usage: vantle imu-thermal [OPTIONS] SECONDS\n";
constexpr const char* kOptions = R"(Options:

  --bump-bsize BSIZE  (Deprecated) Specify the bucket size for the bump
                      detection algorithm. Default is 50. --use-old-bump
                      enables this option.

  --bump-thold THOLD  Specify the bucket mean difference threshold for the
                      bump detection algorithm. Default is 0.01.

  --bump-tbrng TBRNG  Specify the temperature range of each bucket in
                      Celsius. Default is 0.1. --use-old-bump disables
                      this option.

  --help, -h          Print this help and exit.

  --no-validate-temp  Do not validate the temperature range. This option
  -i                  is only for testing purposes.

  --use-old-bump      Use the deprecated bump detection algorithm.

Arguments:

  SECONDS             Duration of the calibration in seconds.

)";

// Long options without a letter of their own.
enum LongOption : int { kBumpBucketSize = 256, kBumpThreshold, kBumpTemperatureRange, kUseOldBump };
constexpr option kLongOptions[] = {
    {"bump-bsize", required_argument, nullptr, kBumpBucketSize},
    {"bump-thold", required_argument, nullptr, kBumpThreshold},
    {"bump-tbrng", required_argument, nullptr, kBumpTemperatureRange},
    {"help", no_argument, nullptr, 'h'},
    {"no-validate-temp", no_argument, nullptr, 'i'},
    {"use-old-bump", no_argument, nullptr, kUseOldBump},
    {nullptr, 0, nullptr, 0},
};

constexpr std::int32_t kDefaultBucketSize = 50;
constexpr float kDefaultTemperatureRange = 0.1F;
constexpr float kDefaultThreshold = 0.01F;

constexpr const char* kAccel = "accel";
constexpr const char* kGyro = "gyro";
constexpr const char* kMag = "mag";
constexpr const char* kPressure = "pressure";
constexpr const char* kTemperature = "sensor_temperature";
constexpr float kRateHz = 20.0F;
constexpr float kTemperatureRateHz = 1.0F;

// Values of an event.
constexpr std::size_t kVectorAxes = 3;
constexpr std::size_t kPressureAxes = 1;
constexpr int kValuesWithRaw = 6;  // three calibrated, then three raw ones

bool parsePositive(const char* text, float* value) {
  return parseFloat(text, value) == ssc::kOk && *value > 0 && std::isfinite(*value);
}

bool parsePositive(const char* text, std::int32_t* value) {
  return parseInt(text, value) == ssc::kOk && *value > 0;
}

}  // namespace

ImuThermalCalibrator::ImuThermalCalibrator(ssc::Connection* hubConnection)
    : Calibrator(hubConnection, kUsage, kOptions) {}

int ImuThermalCalibrator::Run(const Arguments& arguments) {
  if (arguments.reset) return Reset();
  int result = ParseArgs(arguments);
  if (result == kHelpPrinted) return ssc::kOk;
  if (result == ssc::kOk) result = LookupSuids();
  return result == ssc::kOk ? Calibrate() : result;
}

// Raw values come behind the calibrated ones on these handsets; on the others a stored model corrects what
// is streamed.
bool ImuThermalCalibrator::hasRawValues() const {
  return deviceType == DeviceType::p2m2 || deviceType == DeviceType::t5h5 ||
         deviceType == DeviceType::rufael || deviceType == DeviceType::whiskel;
}

bool ImuThermalCalibrator::isInertial(const ssc::SensorUid& suid) const {
  return suid == accelSuid_ || suid == gyroSuid_;
}

bool ImuThermalCalibrator::isTemperature(const ssc::SensorUid& suid) const {
  return suid == imuTemperatureSuid_ || suid == magTemperatureSuid_ || suid == pressureTemperatureSuid_;
}

int ImuThermalCalibrator::ParseArgs(const Arguments& arguments) {
  bumpBucketSize_ = kDefaultBucketSize;
  bumpTemperatureRange_ = kDefaultTemperatureRange;
  bumpThreshold_ = kDefaultThreshold;
  durationSeconds_ = -1;
  skipTemperatureCheck_ = false;
  useOldBumpDetector_ = false;
  CopyGlobalOptions(arguments);

  CommandOptions options(arguments, "hi", kLongOptions);
  for (int option; (option = options.Next()) != CommandOptions::kEnd;) {
    const int result = takeOption(arguments, option, options.argument());
    if (result != ssc::kOk) return result;
  }
  const auto& words = options.words();
  if (words.empty()) return UsageError("Missing required SECONDS argument");
  if (!parsePositive(words[0], &durationSeconds_)) {
    return UsageError("SECONDS must be a positive integer");
  }
  IgnoreExtraArguments(words, 1);
  return ssc::kOk;
}

int ImuThermalCalibrator::takeOption(const Arguments& arguments, int option, const char* argument) {
  switch (option) {
    case kBumpBucketSize:
      if (!parsePositive(argument, &bumpBucketSize_)) return UsageError("BSIZE must be a positive integer");
      return ssc::kOk;
    case kBumpThreshold:
      if (!parsePositive(argument, &bumpThreshold_)) return UsageError("THOLD must be a positive number");
      return ssc::kOk;
    case kBumpTemperatureRange:
      if (!parsePositive(argument, &bumpTemperatureRange_)) {
        return UsageError("TBRNG must be a positive number");
      }
      return ssc::kOk;
    case kUseOldBump:
      useOldBumpDetector_ = true;
      return ssc::kOk;
    case 'i':
      skipTemperatureCheck_ = true;
      return ssc::kOk;
    case 'h':
      PrintUsage(false);
      return kHelpPrinted;
    default:
      return InvalidOption(arguments, option);
  }
}

int ImuThermalCalibrator::LookupSuids() {
  ssc::say("Looking up sensors...\n");
  std::map<std::string, ssc::SensorUid> suids;
  int result =
      LookupSuidsByName({kAccel, kGyro, kTemperature}, &suids, nullptr, SNS_STD_SENSOR_STREAM_TYPE_STREAMING);
  if (result != ssc::kOk) {
    ssc::log(ssc::kLogError,
             "Unable to look up the accelerometer, gyroscope and temperature sensor. Error = %d", result);
    return result;
  }
  accelSuid_ = suids[kAccel];
  gyroSuid_ = suids[kGyro];
  imuTemperatureSuid_ = suids[kTemperature];
  // A handset that ought to send raw values and does not is told apart here, however few values there are.
  const std::size_t needed = hasRawValues() ? 0 : kVectorAxes;
  SetSensorInfo(accelSuid_, "Accelerometer", kRateHz, needed);
  SetSensorInfo(gyroSuid_, "Gyroscope", kRateHz, needed);
  SetSensorInfo(imuTemperatureSuid_, "IMU Temperature", kTemperatureRateHz);
  if (DeviceHasMagTemp()) {
    result = lookupWithTemperature(kMag, "Magnetometer", kVectorAxes, &magSuid_, &magTemperatureSuid_);
    if (result != ssc::kOk) return result;
  }
  return lookupWithTemperature(kPressure, "Barometer", kPressureAxes, &pressureSuid_,
                               &pressureTemperatureSuid_);
}

int ImuThermalCalibrator::lookupWithTemperature(const char* dataType, const char* name, std::size_t axes,
                                                ssc::SensorUid* sensor, ssc::SensorUid* temperature) {
  std::map<std::string, ssc::SensorUid> suids;
  const int result =
      LookupSuidsByName({dataType, kTemperature}, &suids, nullptr, SNS_STD_SENSOR_STREAM_TYPE_STREAMING);
  if (result != ssc::kOk) {
    ssc::log(ssc::kLogError, "Unable to look up the %s sensor and its temperature sensor. Error = %d",
             dataType, result);
    return result;
  }
  *sensor = suids[dataType];
  *temperature = suids[kTemperature];
  SetSensorInfo(*sensor, name, kRateHz, axes);
  SetSensorInfo(*temperature, std::string(name) + " Temperature", kTemperatureRateHz);
  return ssc::kOk;
}

bool ImuThermalCalibrator::OnSensorEvent(const ssc::SensorUid& suid, std::uint64_t timestamp,
                                         const sns_std_sensor_event& event) {
  const bool inertial = isInertial(suid);
  if (inertial && event.status() < SNS_STD_SENSOR_SAMPLE_STATUS_ACCURACY_HIGH) {
    ssc::log(ssc::kLogDebug, "sample status (%d) below accuracy level (%d), dropping", event.status(),
             SNS_STD_SENSOR_SAMPLE_STATUS_ACCURACY_HIGH);
    return false;
  }
  if (inertial && hasRawValues() && event.data_size() < kValuesWithRaw) {
    ssc::log(ssc::kLogError, "raw data not available on IMU sensors");
    return true;
  }
  if (!isUsable(suid, ssc::ticksToSeconds(timestamp), event)) return false;
  updateProgress();
  if (!inertial || !hasRawValues()) return Calibrator::OnSensorEvent(suid, timestamp, event);
  // The drift is in the raw values: the calibrated ones have a stored model taken off.
  rawEvent_.Clear();
  rawEvent_.set_status(event.status());
  for (int i = kValuesWithRaw / 2; i < kValuesWithRaw; ++i) rawEvent_.add_data(event.data(i));
  return Calibrator::OnSensorEvent(suid, timestamp, rawEvent_);
}

bool ImuThermalCalibrator::isUsable(const ssc::SensorUid& suid, double time,
                                    const sns_std_sensor_event& event) {
  if (isTemperature(suid) && !std::isfinite(event.data(0))) {
    rejectSample(suid, Rejection::kNoTemperature);
    return false;
  }
  // Interpolation needs each sensor's samples in order.
  const std::vector<Sample>& before = samples[suid];
  if (!before.empty() && time < before.back().time) {
    rejectSample(suid, Rejection::kBackInTime);
    return false;
  }
  return true;
}

void ImuThermalCalibrator::rejectSample(const ssc::SensorUid& suid, Rejection why) {
  if (!rejectionsSaid_.emplace(suid, why).second) return;
  ssc::log(ssc::kLogWarn, "Dropping %s samples %s (this is said once)", sensorInfo[suid].name.c_str(),
           why == Rejection::kNoTemperature ? "that are no temperature" : "whose time runs backwards");
}

void ImuThermalCalibrator::updateProgress() {
  // Looked for, not made: a silent thermometer is not to be among the sensors whose samples are printed.
  const auto found = samples.find(imuTemperatureSuid_);
  const bool isKnown = found != samples.end() && !found->second.empty();
  progress_.Update(connection->clock().now(),
                   isKnown ? std::optional(found->second.back().values[0]) : std::nullopt);
}

int ImuThermalCalibrator::Calibrate() {
  ssc::say("IMU thermal calibration begins.\n");
  return Conclude("IMU thermal calibration", measureAndStore());
}

int ImuThermalCalibrator::measureAndStore() {
  int result = collect();
  if (result != ssc::kOk) return result;
  if (!skipTemperatureCheck_) result = ValidateTemperatures();
  if (result != ssc::kOk) return result;
  ssc::say("Checking for bumps...\n");
  result = useOldBumpDetector_ ? DetectBumpsByTime() : DetectBumpsByTemperature();
  if (result != ssc::kOk) return result;
  // The accelerometer's model is stored before the gyroscope's is computed, and stays when that fails.
  result = CalibrateSensor(accelSuid_);
  if (result == ssc::kOk) result = CalibrateSensor(gyroSuid_);
  if (result != ssc::kOk) return result;
  // For information only: whatever comes of these two, the calibration stands.
  if (DeviceHasMagTemp())
    (void)CorrelateTemperature(magSuid_, magTemperatureSuid_, "  MAG", nullptr, nullptr);
  (void)CorrelateTemperature(pressureSuid_, pressureTemperatureSuid_, " BARO", nullptr, nullptr);
  return ssc::kOk;
}

int ImuThermalCalibrator::collect() {
  const std::chrono::seconds duration(durationSeconds_);
  if (!quiet) progress_.Start(connection->clock().now(), duration);
  const int result = CollectSamples(duration, true);
  progress_.End();
  return RequireCollected(result);
}
