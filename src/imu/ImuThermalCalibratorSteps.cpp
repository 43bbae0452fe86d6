// What imu-thermal does with the samples it has collected: validation, bumps, the models and their storing.
#include <algorithm>
#include <cerrno>
#include <cinttypes>
#include <cmath>
#include <cstring>

#include <unistd.h>

#include "framework/RegistryItems.h"
#include "imu/ImuThermalBumps.h"
#include "imu/ImuThermalCalibrator.h"
#include "imu/ImuThermalFit.h"
#include "imu/ImuThermalTemperatures.h"
#include "ssc/Log.h"
#include "ssc/RegistryUtil.h"

namespace {

constexpr int kFieldWidth = 14;
constexpr int kPrecision = 6;

constexpr const char* kGroupPrefix = "dynamic.fac_cal.";
constexpr const char* kGroupInfix = ".thermal.";
constexpr const char* kScale = "scale";
constexpr const char* kBias = "bias";

std::string groupName(const std::string& sensorWord, const char* itemWord) {
  return kGroupPrefix + sensorWord + kGroupInfix + itemWord;
}

/// The model's values as they are printed.
std::string formatted(const SampleData& values) { return values.format(kFieldWidth, kPrecision); }

}  // namespace

/// A thermal model as the registry has it. Its groups are plain vectors: their items are the axes.
struct ImuThermalCalibrator::StoredModel {
  std::string scaleGroup;
  std::string biasGroup;
  sns_registry_data scale;
  sns_registry_data bias;
};

int ImuThermalCalibrator::ValidateTemperatures() {
  const int result = RequireSamples(imuTemperatureSuid_);
  if (result != ssc::kOk) return result;
  const TemperatureSpan span = temperatureSpan(samples[imuTemperatureSuid_]);
  const auto first = static_cast<double>(span.first);
  const auto last = static_cast<double>(span.last);
  const auto highest = static_cast<double>(span.highest);
  ssc::say("Validating temperatures...\n");
  ssc::log(ssc::kLogDebug, "T_0=%.2f, T_f=%.2f, T_max=%.2f", first, last, highest);
  switch (judgeTemperatures(span)) {
    case TemperatureVerdict::kRiseTooLow:
      ssc::log(ssc::kLogError, "Temperature delta is too low (%.2f-%.2f < %.2f)", last, first,
               static_cast<double>(kMinTemperatureRise));
      return ssc::kInvalid;
    case TemperatureVerdict::kTooHot:
      ssc::log(ssc::kLogError, "Maximum temperature was too high (%.2f > %.2f)", highest,
               static_cast<double>(kMaxTemperature));
      return ssc::kInvalid;
    case TemperatureVerdict::kGood:
      break;
  }
  return ssc::kOk;
}

int ImuThermalCalibrator::DetectBumpsByTemperature() {
  InterpolateTemperature(accelSuid_, imuTemperatureSuid_);
  const BumpSearch search = findBumpByTemperature(samples[accelSuid_], temperatures_[accelSuid_],
                                                  bumpTemperatureRange_, bumpThreshold_);
  for (const TemperatureBin& bin : search.bins) {
    ssc::log(ssc::kLogDebug, "bin %" PRIu64 " mean = %.3f, %.3f, %.3f", bin.index,
             static_cast<double>(bin.mean[0]), static_cast<double>(bin.mean[1]),
             static_cast<double>(bin.mean[2]));
  }
  switch (search.outcome) {
    case BumpSearch::Outcome::kTooFewGroups:
      ssc::log(ssc::kLogWarn, "Not enough buckets to perform bump detection");
      ssc::log(ssc::kLogWarn, "Consider reducing the temperature bucket range (--bump-tbrng)");
      return ssc::kOk;
    case BumpSearch::Outcome::kTooManyGroups:
      ssc::log(ssc::kLogError, "A temperature bucket range of %g makes too many buckets (--bump-tbrng)",
               static_cast<double>(bumpTemperatureRange_));
      return ssc::kInvalid;
    case BumpSearch::Outcome::kBump:
      return reportBump(search.jump);
    case BumpSearch::Outcome::kNone:
      break;
  }
  return ssc::kOk;
}

int ImuThermalCalibrator::DetectBumpsByTime() {
  const BumpSearch search = findBumpByTime(samples[accelSuid_], bumpBucketSize_, bumpThreshold_);
  if (search.outcome == BumpSearch::Outcome::kTooFewGroups) {
    ssc::log(ssc::kLogWarn, "Not enough samples to perform bump detection");
    ssc::log(ssc::kLogWarn, "Consider reducing the bucket size (--bump-bsize)");
    return ssc::kOk;
  }
  return search.outcome == BumpSearch::Outcome::kBump ? reportBump(search.jump) : ssc::kOk;
}

int ImuThermalCalibrator::reportBump(float jump) {
  ssc::log(ssc::kLogDebug, "bump diff = %.6f", static_cast<double>(jump));
  ssc::log(ssc::kLogError, "Detected bump during sample collection");
  return ssc::kInvalid;
}

void ImuThermalCalibrator::InterpolateTemperature(const ssc::SensorUid& sensor,
                                                  const ssc::SensorUid& temperature) {
  std::vector<Sample>& itsSamples = samples[sensor];
  std::vector<float>& itsTemperatures = temperatures_[sensor];
  if (itsTemperatures.size() == itsSamples.size()) return;
  InterpolatedTemperatures found = interpolateTemperatures(itsSamples, samples[temperature]);
  const auto first = itsSamples.begin() + static_cast<std::ptrdiff_t>(found.first);
  const auto end = first + static_cast<std::ptrdiff_t>(found.values.size());
  itsSamples.erase(end, itsSamples.end());
  itsSamples.erase(itsSamples.begin(), first);
  itsTemperatures = std::move(found.values);
}

int ImuThermalCalibrator::CorrelateTemperature(const ssc::SensorUid& sensor,
                                               const ssc::SensorUid& temperature, const char* name,
                                               SampleData* scale, SampleData* bias) {
  const SensorInfo& info = sensorInfo[sensor];
  ssc::say("Correlating %s with %s...\n", info.name.c_str(), sensorInfo[temperature].name.c_str());
  InterpolateTemperature(sensor, temperature);
  const std::vector<float>& itsTemperatures = temperatures_[sensor];
  constexpr std::size_t kNeeded = 2;
  if (itsTemperatures.size() < kNeeded) {
    ssc::log(ssc::kLogError, "Insufficient data to perform linear regression");
    ssc::log(ssc::kLogDebug, "Only %zu of at least %zu %s samples lie within the time of %zu %s samples",
             itsTemperatures.size(), kNeeded, info.name.c_str(), samples[temperature].size(),
             sensorInfo[temperature].name.c_str());
    return ssc::kNoData;
  }
  ThermalFit fit =
      fitThermal(samples[sensor], itsTemperatures, sensor == pressureSuid_ ? 1 : kMaxThermalAxes);
  // What is printed here still has the slopes that the following test takes out.
  PrintScaleAndBias(name, fit.scale, fit.bias);
  for (const std::size_t axis : uncorrelatedAxes(fit)) {
    ssc::log(ssc::kLogWarn, "%c-axis data does not correlate with temperature", 'X' + static_cast<int>(axis));
    ssc::log(ssc::kLogDebug, "stdev[%zu] %.10f > %.10f", axis, static_cast<double>(fit.residualStdev[axis]),
             static_cast<double>(fit.stdev[axis]));
    // The bias stays as computed with the slope.
    fit.scale[axis] = 0;
  }
  if (scale != nullptr) *scale = fit.scale;
  if (bias != nullptr) *bias = fit.bias;
  return ssc::kOk;
}

void ImuThermalCalibrator::PrintScaleAndBias(const char* name, const SampleData& scale,
                                             const SampleData& bias) {
  if (name == nullptr) return;
  ssc::say("%s_SCALE:%s\n", name, formatted(scale).c_str());
  ssc::say("%s_BIAS: %s\n", name, formatted(bias).c_str());
}

int ImuThermalCalibrator::CalibrateSensor(const ssc::SensorUid& sensor) {
  const bool isAccel = sensor == accelSuid_;
  SampleData scale;
  SampleData bias;
  int result = CorrelateTemperature(sensor, imuTemperatureSuid_, nullptr, &scale, &bias);
  if (result != ssc::kOk) return result;
  StoredModel stored;
  result = readStored(isAccel ? "accel" : "gyro", &stored);
  if (result != ssc::kOk) return result;
  // Elsewhere the stored model is already taken off the samples.
  if (!hasRawValues()) mergeStored(isAccel ? "accelerometer" : "gyroscope", stored, &scale, &bias);
  // The blank makes the labels equally wide.
  PrintScaleAndBias(isAccel ? "ACCEL" : " GYRO", scale, bias);
  result = requireFiniteModel(sensor, scale, bias);
  if (result != ssc::kOk) return result;
  return SkipsWrite() ? ssc::kOk : store(scale, bias, &stored);
}

int ImuThermalCalibrator::readStored(const char* sensorWord, StoredModel* stored) {
  stored->scaleGroup = groupName(sensorWord, kScale);
  stored->biasGroup = groupName(sensorWord, kBias);
  ssc::RegistryUtil registry(connection);
  const int result = registry.Read(stored->scaleGroup, &stored->scale);
  return result != ssc::kOk ? result : registry.Read(stored->biasGroup, &stored->bias);
}

void ImuThermalCalibrator::mergeStored(const char* sensorName, const StoredModel& stored, SampleData* scale,
                                       SampleData* bias) const {
  const SampleData previousScale(ssc::RegistryUtil::GetRegistryVector(stored.scale));
  const SampleData previousBias(ssc::RegistryUtil::GetRegistryVector(stored.bias));
  if (!previousScale.empty() || !previousBias.empty()) {
    ssc::log(ssc::kLogWarn, "There is an existing %s thermal calibration%s", sensorName,
             dryRun ? "" : " which will be overwritten");
  }
  if (!previousScale.empty()) ssc::log(ssc::kLogWarn, "PREV_SCALE:%s", formatted(previousScale).c_str());
  if (!previousBias.empty()) ssc::log(ssc::kLogWarn, "PREV_BIAS: %s", formatted(previousBias).c_str());
  mergeWithPrevious(previousScale, scale, bias);
}

int ImuThermalCalibrator::requireFiniteModel(const ssc::SensorUid& sensor, const SampleData& scale,
                                             const SampleData& bias) {
  const std::string& name = sensorInfo[sensor].name;
  // A constant temperature leaves the slope open: with the temperature check switched off such a model is
  // stored as it is. Readings that are no numbers are another matter.
  if (isConstantTemperature(temperatures_[sensor])) {
    const std::vector<Sample>& itsSamples = samples[sensor];
    const auto odd = std::find_if(itsSamples.begin(), itsSamples.end(), [](const Sample& sample) {
      return !std::all_of(sample.values.begin(), sample.values.begin() + kMaxThermalAxes,
                          [](float value) { return std::isfinite(value); });
    });
    if (odd == itsSamples.end()) return ssc::kOk;
    return RequireFinite((name + " reading").c_str(), odd->values.toVector());
  }
  const int result = RequireFinite((name + " scale").c_str(), scale.toVector());
  return result != ssc::kOk ? result : RequireFinite((name + " bias").c_str(), bias.toVector());
}

int ImuThermalCalibrator::store(const SampleData& scale, const SampleData& bias, StoredModel* stored) {
  ssc::RegistryUtil::CreateRegistryVector(scale.toVector(), &stored->scale);
  ssc::RegistryUtil::CreateRegistryVector(bias.toVector(), &stored->bias);
  return WriteRegistry({{stored->scaleGroup, &stored->scale}, {stored->biasGroup, &stored->bias}});
}

int ImuThermalCalibrator::Reset() {
  ssc::say("Resetting IMU thermal calibration...\n");
  for (const char* const sensorWord : {"accel", "gyro"}) {
    for (const char* const itemWord : {kScale, kBias}) {
      const std::string group = groupName(sensorWord, itemWord);
      std::string path;
      if (registryFilePath(group, &path) != ssc::kOk || ::unlink(path.c_str()) == 0) continue;
      // A model that was never stored has no file. One that stays is no failure, but goes on to count.
      if (errno == ENOENT) continue;
      ssc::log(ssc::kLogWarn, "Unable to delete the registry file %s: %s", group.c_str(),
               std::strerror(errno));
    }
  }
  ssc::say("Reboot device for default calibration to take effect.\n");
  return ssc::kOk;
}
