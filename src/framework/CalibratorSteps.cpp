// The steps that all commands share: arguments, printing, checking, storing, closing.
#include <algorithm>
#include <array>
#include <cmath>
#include <cstdarg>
#include <cstdio>

#include "framework/Calibrator.h"
#include "framework/Notifier.h"
#include "framework/Statistics.h"
#include "ssc/Log.h"
#include "ssc/RegistryUtil.h"

namespace {

// Samples are printed in pieces of about this many bytes: few writes, and little memory for an hour of
// samples.
constexpr std::size_t kPrintedPiece = 16 * 1024;
// "%.6lf" of the largest double is 309 digits and the fraction.
constexpr std::size_t kLongestTime = 320;

void printSampleLines(const std::vector<Sample>& samples) {
  std::string lines;
  for (const Sample& sample : samples) {
    std::array<char, kLongestTime> time;
    std::snprintf(time.data(), time.size(), "%.6lf", sample.time);
    lines += time.data();
    lines += sample.values.format(14, 6);
    lines += '\n';
    if (lines.size() < kPrintedPiece) continue;
    ssc::say("%s", lines.c_str());
    lines.clear();
  }
  if (!lines.empty()) ssc::say("%s", lines.c_str());
}

}  // namespace

void Calibrator::CopyGlobalOptions(const Arguments& arguments) {
  dryRun = arguments.dryRun;
  quiet = arguments.quiet;
  deviceType = arguments.deviceType;
}

bool Calibrator::DeviceHasMagTemp() const {
  return deviceType != DeviceType::e4d4 && deviceType != DeviceType::whiskel;
}

void Calibrator::PrintUsage(bool error) const {
  std::fputs(usage_, error ? stderr : stdout);
  if (!error) std::fputs(options_, stdout);
}

int Calibrator::UsageError(const char* format, ...) const {
  std::va_list arguments;
  va_start(arguments, format);
  std::va_list copy;
  va_copy(copy, arguments);
  const int length = std::vsnprintf(nullptr, 0, format, copy);
  va_end(copy);
  std::string text(static_cast<std::size_t>(std::max(length, 0)) + 1, '\0');
  std::vsnprintf(text.data(), text.size(), format, arguments);
  va_end(arguments);
  ssc::log(ssc::kLogError, "%s", text.c_str());
  PrintUsage(true);
  return ssc::kInvalid;
}

int Calibrator::InvalidOption(const Arguments& arguments, int option) const {
  return UsageError("Invalid '%s' command option '%c'", arguments.command.c_str(), option);
}

int Calibrator::UnsupportedDevice(const Arguments& arguments) {
  ssc::log(ssc::kLogError, "'%s' command is not supported for the specified device type",
           arguments.command.c_str());
  return ssc::kNotSupported;
}

void Calibrator::IgnoreExtraArguments(const std::vector<const char*>& words, std::size_t first) {
  for (std::size_t i = first; i < words.size(); ++i) {
    ssc::log(ssc::kLogWarn, "Ignoring extra argument '%s'", words[i]);
  }
}

void Calibrator::PrintSamples() {
  if (quiet) return;
  ssc::say("\n");
  for (const auto& [suid, itsSamples] : samples) {
    // A sensor that nobody registered gets an entry without a name here, as it always has.
    ssc::say("%s Samples:\n", sensorInfo[suid].name.c_str());
    printSampleLines(itsSamples);
    if (itsSamples.size() < 2) continue;
    const double duration = itsSamples.back().time - itsSamples.front().time;
    ssc::say("(count %zu @ ~%.3lf Hz)\n\n", itsSamples.size(),
             static_cast<double>(itsSamples.size() - 1) / duration);
  }
}

int Calibrator::RequireCollected(int result) {
  if (IsCollected(result)) return ssc::kOk;
  // An event that does not parse was reported when it came.
  if (result != ssc::kMalformed) ssc::log(ssc::kLogError, "Unable to collect samples. Error = %d", result);
  return result;
}

int Calibrator::RequireSamples(const ssc::SensorUid& suid) {
  const auto found = samples.find(suid);
  return RequireSamples(suid, found == samples.end() ? 0 : found->second.size());
}

int Calibrator::RequireSamples(const ssc::SensorUid& suid, std::size_t count) const {
  if (count > 0) return ssc::kOk;
  const auto info = sensorInfo.find(suid);
  ssc::log(ssc::kLogError, "No %s samples were received",
           info == sensorInfo.end() ? "sensor" : info->second.name.c_str());
  return ssc::kNoData;
}

int Calibrator::RequireFinite(const char* what, const std::vector<float>& values) {
  const auto odd =
      std::find_if(values.begin(), values.end(), [](float value) { return !std::isfinite(value); });
  if (odd == values.end()) return ssc::kOk;
  ssc::log(ssc::kLogError, "%s is not a finite number: %f", what, static_cast<double>(withPlainNan(*odd)));
  return ssc::kInvalid;
}

bool Calibrator::SkipsWrite() const {
  if (dryRun) ssc::say("Skipping registry write due to dry run.\n");
  return dryRun;
}

int Calibrator::StoreGroup(ssc::RegistryUtil& registry, const std::string& group,
                           const sns_registry_data& data, WriteFailure failure) {
  const int result = registry.Write(group, data);
  if (result != ssc::kOk) {
    ssc::log(failure == WriteFailure::kLogged ? ssc::kLogWarn : ssc::kLogDebug,
             "Failed to write registry. Error = %d", result);
  }
  return result;
}

int Calibrator::WriteRegistry(const std::string& group, const sns_registry_data& data, WriteFailure failure) {
  return WriteRegistry({{group, &data}}, failure);
}

int Calibrator::WriteRegistry(const std::vector<std::pair<std::string, const sns_registry_data*>>& groups,
                              WriteFailure failure) {
  ssc::say("Writing registry...\n");
  return WriteRegistryGroups(groups, failure);
}

int Calibrator::WriteRegistryGroups(
    const std::vector<std::pair<std::string, const sns_registry_data*>>& groups, WriteFailure failure) {
  ssc::RegistryUtil registry(connection);
  for (const auto& [group, data] : groups) {
    const int result = StoreGroup(registry, group, *data, failure);
    if (result != ssc::kOk) return result;
  }
  return ssc::kOk;
}

void Calibrator::NotifyOrWarn(const std::set<ssc::SensorUid>& suids, const char* warning,
                              const char* advice) {
  if (Notifier(connection).NotifyCalibrationCompleted(suids) == ssc::kOk) return;
  ssc::log(ssc::kLogWarn, "%s", warning);
  ssc::log(ssc::kLogWarn, "%s", advice);
}

int Calibrator::Conclude(const char* what, int result) {
  ssc::say("%s %s.\n", what, Outcome(result));
  return result;
}
