#include "mag/MagCalibrator.h"

#include <algorithm>
#include <array>
#include <cmath>

#include "framework/CommandOptions.h"
#include "framework/ParseNumber.h"
#include "framework/RegistryItems.h"
#include "framework/Statistics.h"
#include "mag/MagBias.h"
#include "ssc/Log.h"
#include "ssc/RegistryUtil.h"

namespace {

constexpr const char* kUsage = "Usage: vantle mag [-h] [-l LIMIT] [-t SECONDS] [--] REF_X REF_Y REF_Z\n";
constexpr const char* kOptions = R"(Options:
  -h          Print this help and exit.
  -l LIMIT    Verify that calculated biases are not greater than LIMIT.
  -t SECONDS  Collect samples for the given number of seconds.
                Default is 2.
  -u          Calculate the bias with an uncorrected mean, calculated by
                multiplying by the inverse of the correction matrix on the
                left.
Arguments:
  REF_X       X-value of the reference magnetic field in microteslas.
  REF_Y       Y-value of the reference magnetic field in microteslas.
  REF_Z       Z-value of the reference magnetic field in microteslas.

Note: To enter any negative reference values, "--" is required.

)";

constexpr const char* kGroupSuffix = "_0_platform.mag.fac_cal";
constexpr const char* kBias = "bias";           // vector of three: µT, subtracted by the driver
constexpr const char* kCorrMat = "corr_mat";    // 3×3: the driver's soft-iron correction
constexpr const char* kMeanTemp = "mean_temp";  // °C during the calibration

constexpr const char* kMag = "mag";
constexpr const char* kMagRaw = "mag_raw";
constexpr const char* kTemperature = "sensor_temperature";
constexpr float kMagRateHz = 50.0F;
constexpr float kTemperatureRateHz = 5.0F;

constexpr std::size_t kAxes = 3;
constexpr int kDefaultSeconds = 2;
constexpr float kMaxNoiseMicrotesla = 2.0F;

// How vectors are printed.
constexpr int kWidth = 14;
constexpr int kPrecision = 6;

std::string format(const SampleData& vector) { return vector.format(kWidth, kPrecision); }

/// Not-a-number, the deviation of a single sample, passes: the operator asked for so short a collection.
int checkNoise(const SampleData& stdev) {
  const auto* const noisy =
      std::find_if(stdev.begin(), stdev.end(), [](float each) { return each >= kMaxNoiseMicrotesla; });
  if (noisy == stdev.end()) return ssc::kOk;
  ssc::log(ssc::kLogError, "Sample noise is too high: %.*f >= %.*f", kPrecision, static_cast<double>(*noisy),
           kPrecision, static_cast<double>(kMaxNoiseMicrotesla));
  return ssc::kInvalid;
}

}  // namespace

MagCalibrator::MagCalibrator(ssc::Connection* hubConnection) : Calibrator(hubConnection, kUsage, kOptions) {}

int MagCalibrator::Run(const Arguments& arguments) {
  CopyGlobalOptions(arguments);
  if (arguments.reset) return Reset();
  int result = ParseArgs(arguments);
  if (result == kHelpPrinted) return ssc::kOk;
  if (result == ssc::kOk) result = LookupSuids();
  return result == ssc::kOk ? Calibrate() : result;
}

int MagCalibrator::ParseArgs(const Arguments& arguments) {
  seconds_ = kDefaultSeconds;
  limit_ = 0;
  CommandOptions options(arguments, "hl:t:u");
  for (int option; (option = options.Next()) != CommandOptions::kEnd;) {
    switch (option) {
      case 'h':
        PrintUsage(false);
        return kHelpPrinted;
      case 'l':
        if (parseFloat(options.argument(), &limit_) != ssc::kOk || !(limit_ > 0) || std::isinf(limit_)) {
          return UsageError("LIMIT must be a positive number");
        }
        break;
      case 't':
        if (parseInt(options.argument(), &seconds_) != ssc::kOk || seconds_ < 1) {
          return UsageError("SECONDS must be a positive integer");
        }
        break;
      case 'u':
        // The bias takes the correction matrix into account in any case.
        ssc::log(ssc::kLogWarn, "'%s' command option '-u' has been deprecated", arguments.command.c_str());
        break;
      default:
        return InvalidOption(arguments, option);
    }
  }
  return parseReference(options.words());
}

int MagCalibrator::parseReference(const std::vector<const char*>& words) {
  reference_.clear();
  for (std::size_t i = 0; i < std::min(kAxes, words.size()); ++i) {
    float value = 0;
    if (parseFloat(words[i], &value) != ssc::kOk) {
      return UsageError("Failed to parse '%s' as a reference value", words[i]);
    }
    reference_.push_back(value);
  }
  IgnoreExtraArguments(words, kAxes);
  if (reference_.size() < kAxes) {
    return UsageError("%d reference values are required; %zu %s provided", static_cast<int>(kAxes),
                      reference_.size(), reference_.size() == 1 ? "was" : "were");
  }
  return ssc::kOk;
}

int MagCalibrator::LookupSuids() {
  ssc::say("Searching for magnetometer...\n");
  std::vector<std::string> dataTypes{kMag};
  if (DeviceHasMagTemp()) dataTypes.emplace_back(kTemperature);
  std::map<std::string, ssc::SensorUid> suids;
  const int result =
      LookupSuidsByName(dataTypes, &suids, &packageName_, SNS_STD_SENSOR_STREAM_TYPE_STREAMING);
  if (result != ssc::kOk) {
    ssc::log(ssc::kLogError, "Unable to look up the magnetometer%s. Error = %d",
             DeviceHasMagTemp() ? " and its temperature sensor" : "", result);
    return result;
  }
  magSuid_ = suids[kMag];
  raw_ = LookupCompanion(magSuid_, kMagRaw, SNS_STD_SENSOR_STREAM_TYPE_STREAMING, &magSuid_);
  SetSensorInfo(magSuid_, raw_ ? "Magnetometer Raw" : "Magnetometer", kMagRateHz, kAxes);
  if (DeviceHasMagTemp()) {
    temperatureSuid_ = suids[kTemperature];
    SetSensorInfo(temperatureSuid_, "Magnetometer Temperature", kTemperatureRateHz);
  }
  return ssc::kOk;
}

bool MagCalibrator::OnSensorEvent(const ssc::SensorUid& suid, std::uint64_t timestamp,
                                  const sns_std_sensor_event& event) {
  if (suid == magSuid_ && event.status() != SNS_STD_SENSOR_SAMPLE_STATUS_ACCURACY_HIGH) {
    ssc::log(ssc::kLogDebug, "Dropping %sMag sample. Status = %d", raw_ ? "Raw " : "",
             static_cast<int>(event.status()));
    return false;
  }
  return Calibrator::OnSensorEvent(suid, timestamp, event);
}

std::string MagCalibrator::groupName() const { return packageName_ + kGroupSuffix; }

int MagCalibrator::Calibrate() {
  ssc::say("Magnetometer calibration (dry run = %d) begins with %s samples.\n", dryRun ? 1 : 0,
           raw_ ? "raw" : "calibrated");
  return Conclude("Magnetometer calibration", measureAndStore());
}

int MagCalibrator::measureAndStore() {
  sns_registry_data data;
  int result = ssc::RegistryUtil(connection).Read(groupName(), &data);
  if (result != ssc::kOk) return result;
  Stored stored;
  result = readStored(data, &stored);
  if (result == ssc::kOk) result = collect();
  if (result != ssc::kOk) return result;
  reportPreviousBias(stored.bias);

  const SampleData mean = sampleDataMean(samples[magSuid_]);
  const SampleData stdev = sampleStdev(samples[magSuid_], mean);
  const float temperature = DeviceHasMagTemp() ? sampleFloatMean(samples[temperatureSuid_]) : 0.0F;
  ssc::say("MEAN: %s\n", format(mean).c_str());
  ssc::say("STDEV:%s\n", format(stdev).c_str());
  result = checkNoise(stdev);
  if (result != ssc::kOk) return result;

  const SampleData bias = computeBias(mean, stored);
  ssc::say("BIAS: %s\n", format(bias).c_str());
  if (DeviceHasMagTemp()) ssc::say("TEMP:   %14.6f\n", static_cast<double>(temperature));
  result = checkBias(bias);
  if (result == ssc::kOk) result = RequireFinite("The magnetometer's temperature", {temperature});
  if (result != ssc::kOk || SkipsWrite()) return result;
  return store(bias, temperature, &data);
}

int MagCalibrator::readStored(const sns_registry_data& data, Stored* stored) {
  std::vector<float> bias;
  int result = readVectorItem(kBias, kAxes, data, &bias);
  if (result != ssc::kOk) return result;
  std::vector<float> correction;
  result = readMatrixItem(kCorrMat, data, &correction);
  if (result != ssc::kOk) return result;
  ssc::log(ssc::kLogDebug, "CORR_MAT:%s", format(SampleData(correction)).c_str());

  std::array<float, Matrix3by3<float>::kElements> elements;
  std::copy_n(correction.begin(), elements.size(), elements.begin());
  stored->bias = SampleData(bias);
  stored->inverseCorrection = Matrix3by3<float>(elements).Inverse();
  ssc::log(ssc::kLogDebug, "INV_MAT:\n%s", stored->inverseCorrection.ToString("").c_str());
  return ssc::kOk;
}

int MagCalibrator::collect() {
  int result = RequireCollected(CollectSamples(std::chrono::seconds(seconds_), true));
  if (result != ssc::kOk) return result;
  result = RequireSamples(magSuid_);
  return result == ssc::kOk && DeviceHasMagTemp() ? RequireSamples(temperatureSuid_) : result;
}

void MagCalibrator::reportPreviousBias(const SampleData& previousBias) const {
  if (std::all_of(previousBias.begin(), previousBias.end(), [](float each) { return each == 0; })) return;
  ssc::log(ssc::kLogWarn, "The magnetometer has an existing calibration%s",
           dryRun ? "" : " which may be overwritten");
  ssc::log(ssc::kLogWarn, "PREV_BIAS:%s", format(previousBias).c_str());
}

SampleData MagCalibrator::computeBias(const SampleData& mean, const Stored& stored) const {
  return raw_ ? biasOfRawMean(mean, stored.inverseCorrection, reference_)
              : biasOfCalibratedMean(mean, stored.inverseCorrection, reference_, stored.bias);
}

int MagCalibrator::checkBias(const SampleData& bias) const {
  for (std::size_t axis = 0; limit_ > 0 && axis < kAxes; ++axis) {
    if (std::fabs(bias[axis]) > limit_) {
      ssc::log(ssc::kLogError, "%c-axis bias is too large: |%.*f| > %.*f", "XYZ"[axis], kPrecision,
               static_cast<double>(bias[axis]), kPrecision, static_cast<double>(limit_));
      return ssc::kInvalid;
    }
  }
  return RequireFinite("The magnetometer's bias", bias.toVector());
}

int MagCalibrator::store(const SampleData& bias, float temperature, sns_registry_data* data) {
  setVectorItem(kBias, bias.toVector(), data);
  if (DeviceHasMagTemp()) setFloatItem(kMeanTemp, temperature, data);
  const int result = WriteRegistry(groupName(), *data);
  if (result == ssc::kOk) NotifyOrWarn({magSuid_});
  return result;
}

int MagCalibrator::Reset() {
  int result = LookupSuids();
  if (result != ssc::kOk) return result;
  ssc::RegistryUtil registry(connection);
  sns_registry_data data;
  result = registry.Read(groupName(), &data);
  if (result != ssc::kOk) return result;
  ssc::say("Resetting magnetometer calibration...\n");
  // Of whatever kind: a reset is how a broken item is repaired.
  result = requireItem(kBias, data);
  if (result != ssc::kOk) return result;
  setVectorItem(kBias, {0.0F, 0.0F, 0.0F}, &data);
  if (DeviceHasMagTemp()) setFloatItem(kMeanTemp, 0.0F, &data);
  result = StoreGroup(registry, groupName(), data);
  if (result == ssc::kOk) ssc::say("Reboot device for default calibration to take effect.\n");
  return result;
}
