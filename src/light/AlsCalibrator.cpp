#include "light/AlsCalibrator.h"

#include <cmath>

#include "framework/CommandOptions.h"
#include "framework/ParseNumber.h"
#include "framework/RegistryItems.h"
#include "light/LuxScale.h"
#include "ssc/Log.h"
#include "ssc/RegistryUtil.h"

namespace {

// Without -c, which only the options name: scripts compare this line.
constexpr const char* kUsage = "Usage: vantle als [-h] [-s SAMPLES] [-v PERCENT] LUX\n";
constexpr const char* kOptions = R"(Options:
  -c           Print corrected lux samples.
  -h           Print this help and exit.
  -s SAMPLES   Specify the number of samples to collect. Five (5) samples are
                 collected by default.
  -v PERCENT   Verify calibration at the reference lux under the given
                 tolerance. Performs no calibration.
Arguments:
  LUX          Reference lux

)";

constexpr const char* kGroupSuffix = "_0_platform.als.fac_cal";
constexpr const char* kScale = "scale";  // float, 1000 is neutral; multiplied by the driver
constexpr const char* kCorrectionFactor =
    "corr_factor";  // float, optional; multiplied by readers of the stream

constexpr const char* kAmbientLight = "ambient_light";
constexpr std::int32_t kRateHz = 10;
/// Beyond what the samples themselves take: the sensor needs a while to become accurate.
constexpr std::int32_t kExtraSeconds = 3;

constexpr std::int32_t kDefaultSamples = 5;
constexpr float kNotGiven = -1.0F;
constexpr float kMaxPercent = 100.0F;
constexpr float kMinMeanLux = 1.0F;
constexpr float kNoCorrection = 1.0F;

}  // namespace

AlsCalibrator::AlsCalibrator(ssc::Connection* hubConnection) : Calibrator(hubConnection, kUsage, kOptions) {}

int AlsCalibrator::Run(const Arguments& arguments) {
  if (arguments.reset) return Reset();
  int result = ParseArgs(arguments);
  if (result == kHelpPrinted) return ssc::kOk;
  if (result == ssc::kOk) result = LookupSuid();
  if (result != ssc::kOk) return result;
  return verifyPercent > 0 ? Verify() : Calibrate();
}

void AlsCalibrator::setDefaults() {
  correctedOnly = false;
  referenceLux = kNotGiven;
  sampleCount = kDefaultSamples;
  verifyPercent = 0;
}

int AlsCalibrator::ParseArgs(const Arguments& arguments) {
  setDefaults();
  CopyGlobalOptions(arguments);
  if (deviceType != DeviceType::o1v1) return UnsupportedDevice(arguments);
  std::vector<const char*> words;
  const int result = parseOptions(arguments, &words);
  return result == ssc::kOk ? parseReference(words) : result;
}

int AlsCalibrator::parseOptions(const Arguments& arguments, std::vector<const char*>* words) {
  CommandOptions options(arguments, "chs:v:");
  for (int option; (option = options.Next()) != CommandOptions::kEnd;) {
    switch (option) {
      case 'c':
        correctedOnly = true;
        break;
      case 'h':
        PrintUsage(false);
        return kHelpPrinted;
      case 's':
        if (parseInt(options.argument(), &sampleCount) != ssc::kOk || sampleCount <= 0) {
          return UsageError("SAMPLES must be a positive integer");
        }
        break;
      case 'v':
        if (parseFloat(options.argument(), &verifyPercent) != ssc::kOk || !(verifyPercent > 0) ||
            verifyPercent > kMaxPercent) {
          return UsageError("PERCENT must be in the range (0.0, 100.0]");
        }
        break;
      default:
        return InvalidOption(arguments, option);
    }
  }
  *words = options.words();
  return ssc::kOk;
}

int AlsCalibrator::parseReference(const std::vector<const char*>& words) {
  if (words.empty()) return UsageError("No reference lux was specified");
  // Darkness is a reference too.
  if (parseFloat(words[0], &referenceLux) != ssc::kOk || !(referenceLux >= 0) || std::isinf(referenceLux)) {
    return UsageError("Reference lux must be a non-negative number");
  }
  IgnoreExtraArguments(words, 1);
  return ssc::kOk;
}

int AlsCalibrator::LookupSuid() {
  if (!suid.IsZero() && !sensorName.empty()) return ssc::kOk;
  ssc::say("Searching for ambient light sensor...\n");
  std::map<std::string, ssc::SensorUid> suids;
  const int result =
      LookupSuidsByName({kAmbientLight}, &suids, &sensorName, SNS_STD_SENSOR_STREAM_TYPE_STREAMING);
  if (result != ssc::kOk) {
    ssc::log(ssc::kLogError, "Unable to find streaming ambient light sensor");
    return result;
  }
  suid = suids[kAmbientLight];
  SetSensorInfo(suid, "Ambient Light", static_cast<float>(kRateHz));
  return ssc::kOk;
}

std::string AlsCalibrator::groupName() const { return sensorName + kGroupSuffix; }

bool AlsCalibrator::OnSensorEvent(const ssc::SensorUid& eventSuid, std::uint64_t timestamp,
                                  const sns_std_sensor_event& event) {
  if (eventSuid != suid) return false;
  if (hasEnoughSamples()) return true;
  if (event.status() != SNS_STD_SENSOR_SAMPLE_STATUS_ACCURACY_HIGH) {
    ssc::log(ssc::kLogDebug, "Dropping ALS sample (%.3f)", static_cast<double>(event.data(0)));
    return false;
  }
  Calibrator::OnSensorEvent(eventSuid, timestamp, event);
  return hasEnoughSamples();
}

bool AlsCalibrator::hasEnoughSamples() const {
  const auto collected = samples.find(suid);
  return collected != samples.end() && collected->second.size() >= static_cast<std::size_t>(sampleCount);
}

float AlsCalibrator::correctionFactorOf(const sns_registry_data& data) const {
  if (correctedOnly || ssc::RegistryUtil::FindDataItem(kCorrectionFactor, data) == nullptr) {
    return kNoCorrection;
  }
  return floatItem(kCorrectionFactor, data);
}

int AlsCalibrator::Calibrate() {
  ssc::say("ALS calibration begins at %.3f lux.\n", static_cast<double>(referenceLux));
  return Conclude("ALS calibration", measureAndStore());
}

int AlsCalibrator::measureAndStore() {
  ssc::say("Reading registry...\n");
  sns_registry_data data;
  int result = ssc::RegistryUtil(connection).Read(groupName(), &data);
  if (result != ssc::kOk) return result;
  const float correctionFactor = correctionFactorOf(data);
  result = requireItem(kScale, data);
  if (result != ssc::kOk) return result;
  const float previousScale = floatItem(kScale, data);

  float mean = 0;
  result = measure(correctionFactor, &mean);
  if (result != ssc::kOk) return result;
  if (mean < kMinMeanLux) {
    ssc::log(ssc::kLogError, "Average ALS sample is too low. Please increase the reference lux.");
    return ssc::kInvalid;
  }
  reportPreviousScale(previousScale);
  const float scale = luxScale(previousScale, referenceLux, mean);
  ssc::say("SCALE: %14.6f\n", static_cast<double>(scale));
  result = RequireFinite("The scale of the ambient light sensor", {scale});
  if (result != ssc::kOk) return result;
  return SkipsWrite() ? ssc::kOk : store(scale, &data);
}

int AlsCalibrator::collect(float correctionFactor) {
  const int result = CollectSamples(std::chrono::seconds(sampleCount / kRateHz + kExtraSeconds), false);
  // What a failed collection has brought is shown all the same, and corrected alike.
  const auto collected = samples.find(suid);
  if (collected != samples.end()) correctLux(correctionFactor, &collected->second);
  PrintSamples();
  if (result == ssc::kTimedOut) ssc::log(ssc::kLogError, "Timed out waiting for ALS samples");
  return result == ssc::kOk ? RequireSamples(suid) : result;
}

int AlsCalibrator::measure(float correctionFactor, float* mean) {
  const int result = collect(correctionFactor);
  if (result != ssc::kOk) return result;
  const LuxMeasurement measurement = measureLux(samples[suid]);
  ssc::say("MEAN:  %14.6f\n", static_cast<double>(measurement.mean));
  if (sampleCount >= 2) ssc::say("STDEV: %14.6f\n", static_cast<double>(measurement.stdev));
  *mean = measurement.mean;
  // An infinite mean would make a harmless looking scale of 0; one that is not a number would pass every
  // comparison.
  return RequireFinite("The mean of the ambient light", {measurement.mean});
}

void AlsCalibrator::reportPreviousScale(float previousScale) const {
  if (previousScale == kNeutralLuxScale) return;
  ssc::log(ssc::kLogWarn, "The ALS has an existing calibration%s",
           dryRun ? "" : " which will be overwritten");
  ssc::log(ssc::kLogWarn, "PREV_SCALE: %14.6f", static_cast<double>(previousScale));
}

int AlsCalibrator::store(float scale, sns_registry_data* data) {
  setFloatItem(kScale, scale, data);
  int result = WriteRegistry(groupName(), *data, WriteFailure::kLeftToCaller);
  if (result != ssc::kOk) return result;
  ssc::log(ssc::kLogDebug, "Notifying ALS of completed calibration");
  // Unlike in most commands this failure is the command's, although the scale is stored: the line has to
  // reboot the handset before it goes on.
  result = requestReread();
  if (result != ssc::kOk) {
    ssc::log(ssc::kLogWarn,
             "ALS notification failed; device may require reboot for calibration to take effect");
  }
  return result;
}

/// The factory test makes the sensor read its calibration again. Its answer is not waited for.
int AlsCalibrator::requestReread() { return SendRequest(MakeFactoryTestRequest(suid)); }

int AlsCalibrator::Verify() {
  ssc::say("Verifying ALS calibration at %.3f lux.\n", static_cast<double>(referenceLux));
  return Conclude("ALS verification", measureAndCompare());
}

int AlsCalibrator::measureAndCompare() {
  float correctionFactor = kNoCorrection;
  if (!correctedOnly) {
    ssc::say("Reading registry...\n");
    sns_registry_data data;
    const int result = ssc::RegistryUtil(connection).Read(groupName(), &data);
    if (result != ssc::kOk) return result;
    correctionFactor = correctionFactorOf(data);
  }
  float mean = 0;
  const int result = measure(correctionFactor, &mean);
  if (result != ssc::kOk) return result;
  const float difference = differencePercent(mean, referenceLux);
  ssc::say("DIFF:  %14.6f%%\n", static_cast<double>(difference));
  if (isWithinTolerance(difference, verifyPercent)) return ssc::kOk;
  ssc::say("Difference exceeds |%.3f%%| tolerance.\n", static_cast<double>(verifyPercent));
  return ssc::kInvalid;
}

int AlsCalibrator::Reset() {
  int result = LookupSuid();
  if (result != ssc::kOk) return result;
  ssc::RegistryUtil registry(connection);
  sns_registry_data data;
  result = registry.Read(groupName(), &data);
  if (result != ssc::kOk) return result;
  ssc::say("Resetting ALS calibration...\n");
  result = requireItem(kScale, data);
  if (result != ssc::kOk) return result;
  setFloatItem(kScale, kNeutralLuxScale, &data);
  result = registry.Write(groupName(), data);
  if (result != ssc::kOk) return result;
  result = requestReread();
  if (result != ssc::kOk) ssc::say("Reboot device for default calibration to take effect.\n");
  return result;
}
