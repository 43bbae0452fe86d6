// What the steps of a calibration of the light sensor under the display lead to: from the working file's
// records to the registry.
#include <array>
#include <cstdio>

#include "framework/RegistryItems.h"
#include "light/TruncateToInt.h"
#include "light/UdAlsCalibrator.h"
#include "light/UdAlsFiles.h"
#include "light/UdAlsLux.h"
#include "light/UdAlsPattern.h"
#include "light/UdAlsPwm.h"
#include "ssc/Log.h"
#include "ssc/RegistryUtil.h"

namespace {

constexpr const char* kScale = "scale";               // float; the driver multiplies the lux by it
constexpr const char* kPwmBoundary = "pwm_boundary";  // a brightness; an integer here, a float after a reset

/// The rate that is asked for: a verification waits no longer than a sound sensor needs.
constexpr std::int32_t kVerifiedSamplesPerSecond = 5;
constexpr std::chrono::seconds kExtraTime{3};

constexpr const char* kCalibration = "Calibration";

struct Channel {
  const char* name;   ///< as items are called after it
  const char* label;  ///< in what is printed
  std::size_t index;  ///< in a record
};

constexpr Channel kColors[] = {{"c", "C", kUdAlsMeanClear},
                               {"r", "R", kUdAlsMeanRed},
                               {"g", "G", kUdAlsMeanGreen},
                               {"b", "B", kUdAlsMeanBlue}};
constexpr Channel kInfrared{"ir", "IR", kUdAlsMeanInfrared};

int gainOf(std::size_t i) { return kFirstCalibratedGain + static_cast<int>(i); }

/// What stands behind a name that ends in the gain, so that the numbers stand in a column.
const char* gapBehind(std::size_t i) { return gainOf(i) < 10 ? "  " : " "; }

void printGainMeans(const char* label, const GainMeans& means) {
  for (std::size_t i = 0; i < means.size(); ++i) {
    ssc::say("gain_%d_%s_mean%s%14.6f\n", gainOf(i), label, gapBehind(i), static_cast<double>(means[i]));
  }
}

std::string gainItem(const char* channel, std::size_t i) {
  return std::string(channel) + "_gain_ratio_" + std::to_string(gainOf(i));
}

std::string patternItem(const Channel& channel, std::size_t coefficient) {
  return std::string("pattern_w_") + channel.name + "_coef" + std::to_string(coefficient);
}

}  // namespace

int UdAlsCalibrator::loadRecords(std::size_t least, const char* what, std::vector<SampleData>* records) {
  const int result = LoadData(records);
  if (result != ssc::kOk || records->size() >= least) return result;
  ssc::log(ssc::kLogError, "Insufficient data to compute %s", what);
  return ssc::kNoData;
}

int UdAlsCalibrator::store(const std::function<int(sns_registry_data*)>& change, const std::string& shown) {
  ssc::say("Reading registry...\n");
  sns_registry_data data;
  int result = ssc::RegistryUtil(connection).Read(GroupName(), &data);
  if (result == ssc::kOk) result = change(&data);
  if (result != ssc::kOk) return result;
  ssc::say("Writing registry...\n%s", shown.c_str());
  result = WriteRegistryGroups({{GroupName(), &data}});
  if (result == ssc::kOk) NotifyOrWarn({suid});
  return result;
}

// Lux.

int UdAlsCalibrator::CalibrateLux() { return Conclude(kCalibration, calibrateLux()); }

int UdAlsCalibrator::calibrateLux() {
  std::vector<SampleData> records;
  int result = loadRecords(1, "lux coefficients", &records);
  if (result != ssc::kOk) return result;
  sns_registry_data data;
  result = ssc::RegistryUtil(connection).Read(GroupName(), &data);
  if (result != ssc::kOk) return result;
  const float scale = udAlsLuxScale(records);
  ssc::say("LUX_SCALE: %14.6f\n", static_cast<double>(scale));
  result = RequireFinite("The scale of the ambient light sensor", {scale});
  if (result != ssc::kOk || SkipsWrite()) return result;
  setFloatItem(kScale, scale, &data);
  result = WriteRegistry(GroupName(), data);
  if (result == ssc::kOk) NotifyOrWarn({suid});
  return result;
}

int UdAlsCalibrator::Verify() {
  ssc::say("Verifying ALS calibration at %.3f lux.\n", static_cast<double>(words_.referenceLux));
  return Conclude("Verification", measureAndCompare());
}

int UdAlsCalibrator::measureAndCompare() {
  float correctionFactor = 0;
  int result = ReadCorrectionFactor(&correctionFactor);
  if (result != ssc::kOk) return result;
  result = collect(std::chrono::seconds(sampleCount / kVerifiedSamplesPerSecond) + kExtraTime, false);
  if (result != ssc::kOk) return result;
  correctLux(correctionFactor, &samples[suid]);
  PrintSamples();
  const LuxMeasurement measurement = measureLux(samples[suid]);
  result = ReportMeasurement(measurement);
  if (result == ssc::kOk) result = CompareWithReference(measurement.mean, words_.referenceLux);
  // Logged whatever came out: a handset that failed is what one wants to look into.
  for (const Sample& sample : samples[suid]) (void)SaveDataToCsv(kUdAlsLuxLog, sample.values);
  return result;
}

// Gain.

int UdAlsCalibrator::GainCalibrate() { return Conclude(kCalibration, calibrateGain()); }

int UdAlsCalibrator::calibrateGain() {
  std::vector<SampleData> records;
  const int result = loadRecords(2, "gain ratio", &records);
  if (result != ssc::kOk) return result;
  std::vector<std::pair<const char*, GainRatios>> ratios;
  for (const Channel& channel : kColors) {
    const GainMeans means = meansByGain(records, channel.index);
    // Every channel's lines are labelled "c": scripts count them.
    printGainMeans(kColors[0].name, means);
    ratios.emplace_back(channel.name, gainRatios(means));
  }
  return storeGainRatios(ratios);
}

int UdAlsCalibrator::IRGainCalibrate() { return Conclude(kCalibration, calibrateIrGain()); }

/// As the other channels' gains, on the infrared channel alone.
int UdAlsCalibrator::calibrateIrGain() {
  std::vector<SampleData> records;
  const int result = loadRecords(2, "IR gain ratio", &records);
  if (result != ssc::kOk) return result;
  const GainMeans means = meansByGain(records, kInfrared.index);
  printGainMeans(kInfrared.name, means);
  return storeGainRatios({{kInfrared.name, gainRatios(means)}});
}

int UdAlsCalibrator::storeGainRatios(const std::vector<std::pair<const char*, GainRatios>>& channels) {
  std::string shown;
  for (const auto& [name, ratios] : channels) {
    const int result = RequireFinite("A gain ratio", {ratios.begin(), ratios.end()});
    if (result != ssc::kOk) return result;
    for (std::size_t i = 0; i < ratios.size(); ++i) {
      std::array<char, 96> line;
      std::snprintf(line.data(), line.size(), "%s%s%14.6f\n", gainItem(name, i).c_str(), gapBehind(i),
                    static_cast<double>(ratios[i]));
      shown += line.data();
    }
  }
  if (SkipsWrite()) return ssc::kOk;
  return store(
      [&channels](sns_registry_data* data) {
        // Items that are missing are made in this order.
        for (const auto& [name, ratios] : channels) {
          for (std::size_t i = ratios.size(); i-- > 0;) {
            setFloatItem(gainItem(name, i).c_str(), ratios[i], data);
          }
        }
        return ssc::kOk;
      },
      shown);
}

// The display.

int UdAlsCalibrator::PwmCalibrate() { return Conclude(kCalibration, calibratePwm()); }

int UdAlsCalibrator::calibratePwm() {
  std::vector<SampleData> records;
  int result = loadRecords(2, "PWM boundary", &records);
  if (result != ssc::kOk) return result;
  const float brightness = pwmBoundary(records);
  result = RequireFinite("The brightness of the PWM boundary", {brightness});
  if (result != ssc::kOk) return result;
  const std::int32_t boundary = truncateToInt(brightness);
  ssc::say("PWM boundary: %d\n", boundary);
  if (SkipsWrite()) return ssc::kOk;
  return store([boundary](sns_registry_data* data) {
    setIntItem(kPwmBoundary, boundary, data);
    return ssc::kOk;
  });
}

int UdAlsCalibrator::ScreenPatternCalibrate() { return Conclude(kCalibration, calibratePattern()); }

/// What each channel reads of the display's own light, as a straight line over the display's brightness.
int UdAlsCalibrator::calibratePattern() {
  std::vector<SampleData> records;
  int result = loadRecords(2, "screen pattern coefficients", &records);
  if (result != ssc::kOk) return result;
  std::vector<SampleData> lines;
  for (const Channel& channel : kColors) {
    SampleData line;
    if (!fitPattern(records, channel.index, &line)) {
      ssc::log(ssc::kLogError, "Insufficient data to compute linear pattern fit");
      return ssc::kNoData;
    }
    ssc::say("PATTERN_%s FIT:%s\n", channel.label, line.format(14, 6).c_str());
    result = RequireFinite("A coefficient of the screen pattern", line.toVector());
    if (result != ssc::kOk) return result;
    lines.push_back(line);
  }
  if (SkipsWrite()) return ssc::kOk;
  return store([&lines](sns_registry_data* data) {
    for (std::size_t i = 0; i < lines.size(); ++i) {
      for (std::size_t j = 0; j < lines[i].size(); ++j) {
        setFloatItem(patternItem(kColors[i], j).c_str(), lines[i][j], data);
      }
    }
    return ssc::kOk;
  });
}
