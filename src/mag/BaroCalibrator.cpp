#include "mag/BaroCalibrator.h"

#include <cmath>

#include "framework/CommandOptions.h"
#include "framework/ParseNumber.h"
#include "framework/RegistryItems.h"
#include "framework/Statistics.h"
#include "ssc/Log.h"
#include "ssc/RegistryUtil.h"

namespace {

constexpr const char* kUsage = "Usage: vantle baro [-h] [-l LIMIT] [-t SECONDS] PRESSURE\n";
// "biase" is an old slip that stays: the text is compared by scripts.
constexpr const char* kOptions = R"(Options:
  -h           Print this help and exit.
  -l LIMIT     Verify that the calculated biase is not greater than LIMIT.
  -t SECONDS   Specify the number of seconds to spend collecting samples.
                 Default is 2 seconds.
Arguments:
  PRESSURE     Reference pressure in hecto-Pascals (hPa).

)";

constexpr const char* kGroupSuffix = "_0_platform.pressure.fac_cal";
constexpr const char* kBias = "bias";           // vector of one: hPa, subtracted by the driver
constexpr const char* kMeanTemp = "mean_temp";  // °C during the calibration

constexpr const char* kPressure = "pressure";
constexpr const char* kPressureRaw = "pressure_raw";
constexpr const char* kTemperature = "sensor_temperature";
constexpr float kPressureRateHz = 20.0F;
constexpr float kTemperatureRateHz = 5.0F;

constexpr int kDefaultSeconds = 2;
constexpr float kNotGiven = -1.0F;
constexpr float kMaxNoiseHpa = 0.2F;

}  // namespace

BaroMeasurement measureBaro(const std::vector<Sample>& samples, float referenceHpa, float appliedBiasHpa) {
  BaroMeasurement measurement;
  measurement.mean = sampleFloatMean(samples);
  measurement.stdev = sampleStdev(samples, measurement.mean);
  measurement.bias = measurement.mean - referenceHpa + appliedBiasHpa;
  return measurement;
}

BaroCalibrator::BaroCalibrator(ssc::Connection* hubConnection)
    : Calibrator(hubConnection, kUsage, kOptions) {}

int BaroCalibrator::Run(const Arguments& arguments) {
  if (arguments.reset) return Reset();
  int result = ParseArgs(arguments);
  if (result == kHelpPrinted) return ssc::kOk;
  if (result == ssc::kOk) result = LookupSuids();
  return result == ssc::kOk ? Calibrate() : result;
}

int BaroCalibrator::ParseArgs(const Arguments& arguments) {
  referencePressure_ = kNotGiven;
  limit_ = kNotGiven;
  seconds_ = kDefaultSeconds;
  CopyGlobalOptions(arguments);

  CommandOptions options(arguments, "hl:t:");
  for (int option; (option = options.Next()) != CommandOptions::kEnd;) {
    switch (option) {
      case 't':
        if (parseInt(options.argument(), &seconds_) != ssc::kOk || seconds_ <= 0) {
          return UsageError("SECONDS must be a positive integer");
        }
        break;
      case 'l':
        if (parseFloat(options.argument(), &limit_) != ssc::kOk || !(limit_ > 0) || std::isinf(limit_)) {
          return UsageError("LIMIT must be a positive number");
        }
        break;
      case 'h':
        PrintUsage(false);
        return kHelpPrinted;
      default:
        return InvalidOption(arguments, option);
    }
  }

  const auto& words = options.words();
  if (words.empty()) return UsageError("No reference pressure was specified");
  // The message says "positive", but zero passes: a vacuum chamber is a reference too.
  if (parseFloat(words[0], &referencePressure_) != ssc::kOk || !(referencePressure_ >= 0) ||
      std::isinf(referencePressure_)) {
    return UsageError("PRESSURE must be a positive number");
  }
  IgnoreExtraArguments(words, 1);
  return ssc::kOk;
}

int BaroCalibrator::LookupSuids() {
  ssc::say("Searching for barometer...\n");
  std::map<std::string, ssc::SensorUid> suids;
  const int result = LookupSuidsByName({kPressure, kTemperature}, &suids, &packageName_,
                                       SNS_STD_SENSOR_STREAM_TYPE_STREAMING);
  if (result != ssc::kOk) {
    ssc::log(ssc::kLogError, "Unable to look up the barometer and its temperature sensor. Error = %d",
             result);
    return result;
  }
  pressureSuid_ = suids[kPressure];
  temperatureSuid_ = suids[kTemperature];
  raw_ = LookupCompanion(pressureSuid_, kPressureRaw, SNS_STD_SENSOR_STREAM_TYPE_STREAMING, &pressureSuid_);
  SetSensorInfo(pressureSuid_, raw_ ? "Barometer Raw" : "Barometer", kPressureRateHz);
  SetSensorInfo(temperatureSuid_, "Barometer Temperature", kTemperatureRateHz);
  return ssc::kOk;
}

std::string BaroCalibrator::groupName() const { return packageName_ + kGroupSuffix; }

int BaroCalibrator::Calibrate() {
  ssc::say("Barometer calibration begins with %s samples.\n", raw_ ? "Raw" : "Calibrated");
  return Conclude("Barometer calibration", measureAndStore());
}

int BaroCalibrator::measureAndStore() {
  sns_registry_data data;
  int result = ssc::RegistryUtil(connection).Read(groupName(), &data);
  if (result != ssc::kOk) return result;
  std::vector<float> previous;
  result = readVectorItem(kBias, 1, data, &previous);
  if (result != ssc::kOk) return result;
  const float previousBias = previous[0];

  result = RequireCollected(CollectSamples(std::chrono::seconds(seconds_), true));
  if (result != ssc::kOk) return result;
  for (const ssc::SensorUid& suid : {pressureSuid_, temperatureSuid_}) {
    result = RequireSamples(suid);
    if (result != ssc::kOk) return result;
  }
  reportPreviousBias(previousBias);

  // The calibrated stream already has the stored bias subtracted.
  const BaroMeasurement measurement =
      measureBaro(samples[pressureSuid_], referencePressure_, raw_ ? 0.0F : previousBias);
  const float temperature = sampleFloatMean(samples[temperatureSuid_]);
  result = check(measurement, temperature);
  if (result != ssc::kOk) return result;
  return SkipsWrite() ? ssc::kOk : store(measurement.bias, temperature, &data);
}

void BaroCalibrator::reportPreviousBias(float previousBias) const {
  if (previousBias == 0) return;
  ssc::log(ssc::kLogWarn, "The barometer has an existing calibration%s",
           dryRun ? "" : " which will be overwritten");
  ssc::log(ssc::kLogWarn, "PREV_BIAS: %14.6f", static_cast<double>(previousBias));
}

int BaroCalibrator::check(const BaroMeasurement& measurement, float temperature) const {
  ssc::say("MEAN:  %14.6f\n", static_cast<double>(measurement.mean));
  ssc::say("STDEV: %14.6f\n", static_cast<double>(measurement.stdev));
  // Not-a-number, the deviation of a single sample, passes: the operator asked for so short a collection.
  if (measurement.stdev >= kMaxNoiseHpa) {
    ssc::log(ssc::kLogError, "Sample noise is too high: %.3f >= %.3f", static_cast<double>(measurement.stdev),
             static_cast<double>(kMaxNoiseHpa));
    return ssc::kInvalid;
  }
  ssc::say("BIAS:  %14.6f\n", static_cast<double>(measurement.bias));
  ssc::say("TEMP:  %14.6f\n", static_cast<double>(temperature));
  if (limit_ > 0 && std::fabs(measurement.bias) > limit_) {
    ssc::log(ssc::kLogError, "Bias is too large: |%.3f| > %.3f", static_cast<double>(measurement.bias),
             static_cast<double>(limit_));
    return ssc::kInvalid;
  }
  const int result = RequireFinite("The barometer's bias", {measurement.bias});
  return result != ssc::kOk ? result : RequireFinite("The barometer's temperature", {temperature});
}

int BaroCalibrator::store(float bias, float temperature, sns_registry_data* data) {
  setVectorItem(kBias, {bias}, data);
  setFloatItem(kMeanTemp, temperature, data);
  const int result = WriteRegistry(groupName(), *data);
  if (result != ssc::kOk) return result;
  NotifyOrWarn({pressureSuid_});
  return ssc::kOk;
}

int BaroCalibrator::Reset() {
  int result = LookupSuids();
  if (result != ssc::kOk) return result;
  ssc::RegistryUtil registry(connection);
  sns_registry_data data;
  result = registry.Read(groupName(), &data);
  if (result != ssc::kOk) return result;
  ssc::say("Resetting barometer calibration...\n");
  // Of whatever kind: a reset is how a broken item is repaired.
  result = requireItem(kBias, data);
  if (result != ssc::kOk) return result;
  setVectorItem(kBias, {0.0F}, &data);
  setFloatItem(kMeanTemp, 0.0F, &data);
  result = StoreGroup(registry, groupName(), data);
  if (result == ssc::kOk) ssc::say("Reboot device for default calibration to take effect.\n");
  return result;
}
