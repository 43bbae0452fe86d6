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

constexpr const char* kScale = "scale";  // float, 1000 is neutral; multiplied by the driver

constexpr std::int32_t kRateHz = 10;
/// Beyond what the samples themselves take: the sensor needs a while to become accurate.
constexpr std::int32_t kExtraSeconds = 3;

constexpr float kNotGiven = -1.0F;
constexpr float kMinMeanLux = 1.0F;

}  // namespace

AlsCalibrator::AlsCalibrator(ssc::Connection* hubConnection)
    : AmbientLightCommand(
          hubConnection, kUsage, kOptions,
          {.dataType = "ambient_light", .rateHz = kRateHz, .valuesPerEvent = 1, .defaultSamples = 5}) {
  // A collection that fails otherwise than by its time ends without a message: scripts compare the output.
  hubTroubleLevel = ssc::kLogDebug;
}

int AlsCalibrator::Run(const Arguments& arguments) {
  if (arguments.reset) return Reset();
  int result = ParseArgs(arguments);
  if (result == kHelpPrinted) return ssc::kOk;
  if (result == ssc::kOk) result = LookupSuid();
  if (result != ssc::kOk) return result;
  return IsVerifying() ? Verify() : Calibrate();
}

int AlsCalibrator::ParseArgs(const Arguments& arguments) {
  SetDefaults(arguments);
  referenceLux = kNotGiven;
  if (deviceType != DeviceType::o1v1) return UnsupportedDevice(arguments);
  CommandOptions options(arguments, "chs:v:");
  for (int option; (option = options.Next()) != CommandOptions::kEnd;) {
    const int result = HandleOption(arguments, option, options.argument());
    if (result != ssc::kOk) return result;
  }
  return parseReference(options.words());
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

int AlsCalibrator::Calibrate() {
  ssc::say("ALS calibration begins at %.3f lux.\n", static_cast<double>(referenceLux));
  return Conclude("ALS calibration", measureAndStore());
}

int AlsCalibrator::measureAndStore() {
  ssc::say("Reading registry...\n");
  sns_registry_data data;
  int result = ssc::RegistryUtil(connection).Read(GroupName(), &data);
  if (result != ssc::kOk) return result;
  const float correctionFactor = CorrectionFactorOf(data);
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
  *mean = measurement.mean;
  return ReportMeasurement(measurement);
}

void AlsCalibrator::reportPreviousScale(float previousScale) const {
  if (previousScale == kNeutralLuxScale) return;
  ssc::log(ssc::kLogWarn, "The ALS has an existing calibration%s",
           dryRun ? "" : " which will be overwritten");
  ssc::log(ssc::kLogWarn, "PREV_SCALE: %14.6f", static_cast<double>(previousScale));
}

int AlsCalibrator::store(float scale, sns_registry_data* data) {
  setFloatItem(kScale, scale, data);
  int result = WriteRegistry(GroupName(), *data, WriteFailure::kLeftToCaller);
  if (result != ssc::kOk) return result;
  ssc::log(ssc::kLogDebug, "Notifying ALS of completed calibration");
  // Unlike in most commands this failure is the command's, although the scale is stored: the line has to
  // reboot the handset before it goes on.
  result = RequestReread();
  if (result != ssc::kOk) {
    ssc::log(ssc::kLogWarn,
             "ALS notification failed; device may require reboot for calibration to take effect");
  }
  return result;
}

int AlsCalibrator::Verify() {
  ssc::say("Verifying ALS calibration at %.3f lux.\n", static_cast<double>(referenceLux));
  return Conclude("ALS verification", measureAndCompare());
}

int AlsCalibrator::measureAndCompare() {
  float correctionFactor = 0;
  int result = ReadCorrectionFactor(&correctionFactor);
  if (result != ssc::kOk) return result;
  float mean = 0;
  result = measure(correctionFactor, &mean);
  return result == ssc::kOk ? CompareWithReference(mean, referenceLux) : result;
}

int AlsCalibrator::Reset() {
  return RestoreDefaults([](sns_registry_data* data) {
    const int result = requireItem(kScale, *data);
    if (result == ssc::kOk) setFloatItem(kScale, kNeutralLuxScale, data);
    return result;
  });
}
