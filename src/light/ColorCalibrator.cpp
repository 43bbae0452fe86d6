// The command itself: its words, its steps, its sensors. What it computes from the records, and how it
// verifies, is in the files beside this one.
#include "light/ColorCalibrator.h"

#include <cerrno>
#include <cmath>
#include <cstdio>
#include <cstring>

#include <unistd.h>

#include "framework/CommandOptions.h"
#include "framework/ParseNumber.h"
#include "light/ColorFiles.h"
#include "light/ColorRecord.h"
#include "ssc/DevicePath.h"
#include "ssc/Log.h"

namespace {

constexpr const char* kUsage = "Usage: vantle color [-CchWw] [-s SAMPLES] [-v PERCENT] [LUX CCT]\n";
constexpr const char* kOptions = R"(Options:

  -c           Clear previously collected data. This option should be
               specified on the first step of the calibration procedure.

  -C           Clear previously collected data *without* collecting samples.

  -h           Print this help and exit.

  -s SAMPLES   Specify the number of samples to collect. Ten (10) samples are
               collected by default.

  -v PERCENT   Verify calibration at the reference values under the given
               tolerance.

  -w           Compute and write calibration parameters after collecting
               samples for the given reference values.

  -W           Compute and write calibration parameters based on previously
               collected data *without* collecting samples.

Arguments:

  LUX          Reference lux. If this argument is missing, it is assumed the
               sensor is currently stimulated with an IR-only light source.

  CCT          Reference correlated color temperature. If this argument is
               missing, it is assumed the sensor is currently stimulated with
               an IR-only light source.

)";

constexpr const char* kColorRaw = "color_raw";
constexpr const char* kAmbientLightRaw = "ambient_light_raw";
constexpr float kRateHz = 10.0F;
/// Readings with an infrared come five times a second, every other time.
constexpr std::int32_t kIrRateHz = 5;
/// Beyond what the samples themselves take: the sensors need a while to become accurate.
constexpr std::int32_t kExtraSeconds = 3;

constexpr std::int32_t kDefaultSamples = 10;
constexpr float kNotGiven = -1.0F;
constexpr float kMaxPercent = 100.0F;

bool parseReference(const char* word, float* reference) {
  return parseFloat(word, reference) == ssc::kOk && *reference >= 0 && !std::isinf(*reference);
}

}  // namespace

ColorCalibrator::ColorCalibrator(ssc::Connection* hubConnection)
    : Calibrator(hubConnection, kUsage, kOptions) {}

int ColorCalibrator::Run(const Arguments& arguments) {
  if (arguments.reset) return Reset();
  int result = ParseArgs(arguments);
  if (result == kHelpPrinted) return ssc::kOk;
  if (result != ssc::kOk) return result;
  if (clearOnly) return removeDataFile();
  result = FindSensors();
  if (result != ssc::kOk) return result;
  if (isVerifying()) return Verify();
  if (!writeOnly) result = CollectData();
  return result == ssc::kOk && writeAfterCollect ? Calibrate() : result;
}

// Arguments.

void ColorCalibrator::setDefaults() {
  clearData = false;
  clearOnly = false;
  referenceCct = kNotGiven;
  referenceLux = kNotGiven;
  sampleCount = kDefaultSamples;
  verifyPercent = 0;
  writeAfterCollect = false;
  writeOnly = false;
}

int ColorCalibrator::ParseArgs(const Arguments& arguments) {
  setDefaults();
  CopyGlobalOptions(arguments);
  if (deviceType != DeviceType::p2m2) return UnsupportedDevice(arguments);
  std::vector<const char*> words;
  const int result = parseOptions(arguments, &words);
  return result == ssc::kOk ? parseReferences(words) : result;
}

int ColorCalibrator::parseOptions(const Arguments& arguments, std::vector<const char*>* words) {
  CommandOptions options(arguments, ":Cchs:v:Ww");
  for (int option; (option = options.Next()) != CommandOptions::kEnd;) {
    switch (option) {
      case 'C':
        clearOnly = true;
        break;
      case 'c':
        clearData = true;
        break;
      case 'W':
        writeOnly = true;
        writeAfterCollect = true;
        break;
      case 'w':
        writeAfterCollect = true;
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
      case ':':
        // Names the colon, not the option that lacks its argument: scripts compare this line.
        return UsageError("Missing argument to option '%c'", option);
      default:
        return InvalidOption(arguments, option);
    }
  }
  *words = options.words();
  return ssc::kOk;
}

int ColorCalibrator::parseReferences(const std::vector<const char*>& words) {
  if (!words.empty() && !parseReference(words[0], &referenceLux)) {
    return UsageError("Reference lux must be a non-negative number");
  }
  if (words.size() > 1 && !parseReference(words[1], &referenceCct)) {
    return UsageError("Reference CCT must be a non-negative number");
  }
  IgnoreExtraArguments(words, 2);
  if (words.empty()) {
    if (isVerifying()) return UsageError("No reference lux was specified");
    referenceLux = 0;  // the infrared lamp
  }
  if (words.size() < 2) {
    if (isVerifying()) return UsageError("No reference CCT was specified");
    referenceCct = 0;
  }
  return ssc::kOk;
}

int ColorCalibrator::removeDataFile() {
  ssc::say("Removing data file...\n");
  // Where there is none, that is a failure too.
  if (::unlink(ssc::devicePath(kColorDataFile).c_str()) == 0) return ssc::kOk;
  ssc::log(ssc::kLogError, "Unable to remove color calibration data file: %s", std::strerror(errno));
  return ssc::kNotPermitted;
}

// Sensors.

int ColorCalibrator::FindSensors() {
  // Unlike the other lines, this one is not for the log file.
  std::fputs("Searching for sensors...\n", stdout);
  std::fflush(stdout);
  std::map<std::string, ssc::SensorUid> suids;
  const int result = LookupSuidsByName({kColorRaw, kAmbientLightRaw}, &suids, &sensorName,
                                       SNS_STD_SENSOR_STREAM_TYPE_STREAMING);
  if (result != ssc::kOk) {
    ssc::log(ssc::kLogError, "Unable to look up the color sensor and its light sensor. Error = %d", result);
    return result;
  }
  colorSuid = suids[kColorRaw];
  alsSuid = suids[kAmbientLightRaw];
  SetSensorInfo(colorSuid, "Color", kRateHz, color_reading::kCount);
  SetSensorInfo(alsSuid, "Ambient Light", kRateHz, color_reading::kCount);
  return ssc::kOk;
}

std::string ColorCalibrator::alsGroup() const { return sensorName + "_platform.als.fac_cal"; }
std::string ColorCalibrator::colorGroup() const { return sensorName + "_platform.color.fac_cal"; }

bool ColorCalibrator::OnSensorEvent(const ssc::SensorUid& suid, std::uint64_t timestamp,
                                    const sns_std_sensor_event& event) {
  if (suid != colorSuid && suid != alsSuid) return false;
  // What still comes before the command goes on must neither add to the means nor start afresh.
  if (hasEnoughSamples()) return true;
  if (event.status() != SNS_STD_SENSOR_SAMPLE_STATUS_ACCURACY_HIGH) {
    ssc::log(ssc::kLogDebug, "Dropping low-accuracy sample (%.*f)", 6, static_cast<double>(event.data(0)));
    return false;
  }
  std::vector<Sample>& collected = samples[suid];
  if (!collected.empty() &&
      collected.back().values[color_reading::kGain] != event.data(color_reading::kGain)) {
    collected.clear();
    irCounts_[suid] = 0;
  }
  Calibrator::OnSensorEvent(suid, timestamp, event);
  if (hasIr(collected.back().values)) ++irCounts_[suid];
  return hasEnoughSamples();
}

bool ColorCalibrator::hasEnoughSamples() const {
  for (const ssc::SensorUid& suid : {colorSuid, alsSuid}) {
    const auto count = irCounts_.find(suid);
    if (count == irCounts_.end() || count->second < sampleCount) return false;
  }
  return true;
}

// A step.

int ColorCalibrator::CollectData() {
  const int result = collectRecord();
  if (isVerifying()) return result;
  if (result != ssc::kOk) return Conclude("Calibration", result);
  if (!writeAfterCollect) ssc::say("Please proceed to the next step.\n");
  return ssc::kOk;
}

int ColorCalibrator::collectRecord() {
  const int result = collect();
  if (result != ssc::kOk) return result;
  const SampleData means = colorMeans(samples[alsSuid], samples[colorSuid]);
  // Means that are not complete have no lines of their own, and are refused.
  if (means.size() < color_means::kCount) return SaveData(means);
  if (!isVerifying()) printMeans(means);
  // Kept, such a record would spoil the calibration of all the others.
  const int finite = RequireFinite("A mean of the color sensor or its light sensor", meansThatCount(means));
  return finite == ssc::kOk ? SaveData(means) : finite;
}

int ColorCalibrator::collect() {
  {
    const std::lock_guard<std::mutex> guard(mutex);
    irCounts_.clear();
  }
  const int result =
      CollectSamples(std::chrono::seconds(sampleCount / kIrRateHz + kExtraSeconds), !isVerifying());
  if (result == ssc::kTimedOut) {
    for (const auto& [suid, info] : sensorInfo) {
      if (irCounts_[suid] >= sampleCount) continue;
      ssc::log(ssc::kLogError, "Only %d of %d %s samples were received in time", irCounts_[suid], sampleCount,
               info.name.c_str());
    }
    return result;
  }
  if (const int collected = RequireCollected(result); collected != ssc::kOk) return collected;
  const int enough = RequireSamples(colorSuid);
  return enough == ssc::kOk ? RequireSamples(alsSuid) : enough;
}

void ColorCalibrator::printMeans(const SampleData& means) const {
  constexpr const char* kLines[] = {"LUX_MEAN:  %14.6f\n", "CCT_MEAN:  %14.6f\n",  "C_MEAN:    %14.6f\n",
                                    "R_MEAN:    %14.6f\n", "G_MEAN:    %14.6f\n",  "B_MEAN:    %14.6f\n",
                                    "IR_MEAN:   %14.6f\n", "GAIN:      %14.6f\n\n"};
  static_assert(std::size(kLines) == color_means::kCount);
  for (std::size_t i = 0; i < means.size(); ++i) ssc::say(kLines[i], static_cast<double>(means[i]));
}
