// One step of a calibration of the light sensor under the display: samples, their means, and the files that
// they go to.
#include <cstring>

#include "framework/Statistics.h"
#include "light/UdAlsCalibrator.h"
#include "light/UdAlsFiles.h"
#include "ssc/DevicePath.h"
#include "ssc/Log.h"
#include "ssc/WorkingFile.h"

namespace {

/// Fewer than are asked for: a sensor that drops every other sample is waited for.
constexpr std::int32_t kLeastSamplesPerSecond = 2;
/// Beyond what the samples themselves take: the sensor needs a while to become accurate.
constexpr std::chrono::seconds kExtraTime{3};

/// What the display's colour is called in the log when nobody said it.
constexpr const char* kNoColor = "k";

int requireValues(const SampleData& values) {
  if (values.size() >= kUdAlsSampleValues) return ssc::kOk;
  ssc::log(ssc::kLogError, "Insufficient data (only %zu item%s)", values.size(),
           values.size() == 1 ? "" : "s");
  return ssc::kNoData;
}

/// The result of a write, after a level-0 message where it failed.
int requireWritten(FileResult result) {
  if (result == FileResult::kOk) return ssc::kOk;
  if (result == FileResult::kCannotOpen) {
    ssc::log(ssc::kLogError, "Failed to open als calibration data file");
    return ssc::kNotPermitted;
  }
  ssc::log(ssc::kLogError, "Failed to write data to file");
  return ssc::kShortFile;
}

}  // namespace

std::chrono::seconds UdAlsCalibrator::stepPeriod() const {
  return std::chrono::seconds(sampleCount / kLeastSamplesPerSecond) + kExtraTime;
}

int UdAlsCalibrator::collect(std::chrono::seconds period, bool print) {
  const int result = CollectSamples(period, print);
  if (result == ssc::kTimedOut) {
    ssc::log(ssc::kLogError, "Timed out waiting for light sensor samples");
    return result;
  }
  if (result != ssc::kOk) return RequireCollected(result);
  // A late answer to a request ends the wait as well as the last sample does.
  if (HasEnoughSamples()) return ssc::kOk;
  const int none = RequireSamples(suid);
  if (none != ssc::kOk) return none;
  ssc::log(ssc::kLogError, "Only %zu of %d light sensor samples were received", samples[suid].size(),
           sampleCount);
  return ssc::kNoData;
}

void UdAlsCalibrator::printMeans(const SampleData& means) const {
  const auto value = [&means](std::size_t i) { return static_cast<double>(means[i]); };
  ssc::say("LUX_MEAN:  %14.6f\n", value(0));
  ssc::say("C_MEAN:    %14.6f\n", value(1));
  ssc::say("R_MEAN:    %14.6f\n", value(2));
  ssc::say("G_MEAN:    %14.6f\n", value(3));
  ssc::say("B_MEAN:    %14.6f\n", value(4));
  ssc::say("IR_MEAN:   %14.6f\n", value(5));
  ssc::say("GAIN:      %14.6f\n\n", value(6));
}

int UdAlsCalibrator::CollectData(const char* csvPath) {
  return collectStep(csvPath, &UdAlsCalibrator::SaveDataToCsv);
}

int UdAlsCalibrator::CollectDelayCalData(const char* csvPath) {
  return collectStep(csvPath, &UdAlsCalibrator::SaveDelayDataToCsv);
}

int UdAlsCalibrator::collectStep(const char* csvPath,
                                 int (UdAlsCalibrator::*log)(const char*, const SampleData&)) {
  int result = collect(stepPeriod(), !IsVerifying());
  if (result == ssc::kOk) {
    const SampleData means = sampleDataMean(samples[suid]);
    if (!IsVerifying()) printMeans(means);
    // A log that cannot be written keeps no step from being taken: its means are what counts.
    for (const Sample& sample : samples[suid]) (void)(this->*log)(csvPath, sample.values);
    result = appendRecord(means);
  }
  if (IsVerifying()) return result;
  if (result != ssc::kOk) return Conclude("Calibration", result);
  if (!words_.writeAfterCollect) ssc::say("Please proceed to the next step.\n");
  return result;
}

int UdAlsCalibrator::appendRecord(const SampleData& means) {
  // A record that is not a number would spoil whatever the following steps lead to.
  const int result = RequireFinite("A mean of the light sensor's samples", means.toVector());
  return result == ssc::kOk ? SaveData(means) : result;
}

float UdAlsCalibrator::delayOfStep() const {
  return words_.mode == UdAlsMode::kTe2DelayCalibration ? te2Delay_ : words_.alsDelay;
}

// Files.

int UdAlsCalibrator::SaveDataToCsv(const char* path, const SampleData& sample) {
  const int result = requireValues(sample);
  if (result != ssc::kOk) return result;
  // What the log says of the display is what the record says. The colour of a screen pattern is no label: its
  // log has the same "k".
  if (words_.displayColor.empty()) words_.displayColor = kNoColor;
  if (words_.brightness < 0) words_.brightness = 0;
  const std::string line = udAlsLogLine(words_, sample);
  // With -r each sample starts the log anew, so that only the last one stays: the means are in the working
  // file.
  return requireWritten(
      words_.clearData ? appendToLogFile(ssc::devicePath(path), kUdAlsLogHeader + line, FileStart::kTruncate)
                       : appendToLogFile(ssc::devicePath(path), line, FileStart::kKeep));
}

int UdAlsCalibrator::SaveDelayDataToCsv(const char* path, const SampleData& sample) {
  const int result = requireValues(sample);
  if (result != ssc::kOk) return result;
  const FileResult written =
      appendToLogFile(ssc::devicePath(path), udAlsDelayLogLine(sample, delayOfStep()), FileStart::kKeep);
  return written == FileResult::kCannotOpen ? ssc::kOk : requireWritten(written);
}

int UdAlsCalibrator::SaveData(const SampleData& means) {
  const int result = requireValues(means);
  if (result != ssc::kOk) return result;
  ssc::say("Saving data to file...\n");
  return requireWritten(appendToFile(ssc::devicePath(kUdAlsDataFile),
                                     udAlsRecord(words_, delayOfStep(), means),
                                     words_.clearData ? FileStart::kTruncate : FileStart::kKeep));
}

int UdAlsCalibrator::LoadData(std::vector<SampleData>* records) {
  if (records == nullptr) {
    ssc::log(ssc::kLogError, "Cannot load data into null vector");
    return ssc::kInvalid;
  }
  ssc::say("Reading data file...\n");
  switch (readUdAlsRecords(ssc::devicePath(kUdAlsDataFile), records)) {
    case FileResult::kOk:
      ssc::log(ssc::kLogInfo, "Got %zu records", records->size());
      return ssc::kOk;
    case FileResult::kCannotOpen:
      ssc::log(ssc::kLogError, "Failed to open calibration data file");
      return ssc::kNotPermitted;
    case FileResult::kIncomplete:
      ssc::log(ssc::kLogError, "Data file is incomplete");
      return ssc::kNoData;
    case FileResult::kTooLarge:
      ssc::log(ssc::kLogError, "Data file is larger than %zu bytes", kMaxUdAlsDataFileBytes);
      return ssc::kInvalid;
    case FileResult::kFailed:
      break;
  }
  ssc::log(ssc::kLogError, "Failed to read data from file");
  return ssc::kShortFile;
}

int UdAlsCalibrator::removeDataFile() {
  const int result = ssc::removeWorkingFile(ssc::devicePath(kUdAlsDataFile));
  if (result == ssc::kOk) return result;
  // The old records would be solved together with the new ones.
  ssc::log(ssc::kLogError, "Unable to remove the data file: %s", std::strerror(-result));
  return ssc::kNotPermitted;
}

void UdAlsCalibrator::startLog(const char* path, const char* header) {
  const FileResult result = appendToLogFile(ssc::devicePath(path), header, FileStart::kTruncate);
  if (result == FileResult::kOk) return;
  ssc::log(ssc::kLogWarn, "Unable to start the log %s", path);
}
