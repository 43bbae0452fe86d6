#include "fault/HandsetFiles.h"

#include <algorithm>
#include <iterator>
#include <sstream>
#include <system_error>
#include <vector>

#include "fault/WatchedRun.h"
#include "imu/ImuMultipointFile.h"
#include "light/ColorRecord.h"
#include "light/UdAlsFiles.h"
#include "proto/sns_registry.pb.h"
#include "simhub/RegistryFiles.h"
#include "simhub/RegistryJson.h"
#include "simhub/RegistryStore.h"
#include "ssc/RegistryUtil.h"
#include "support/TemporaryFolder.h"

namespace fault {
namespace {

std::string registryFolder(const std::filesystem::path& root) {
  return root.string() + ssc::RegistryUtil::RegistryPath();
}

/// What is wrong with the file between the steps of a multi-point calibration.
std::string faultOfMultipointFile(const std::filesystem::path& path, const std::string& content) {
  std::vector<ImuPosition> positions;
  if (readPositions(path, &positions) == FileResult::kOk) return "";
  std::vector<ImuCalibrationInfo> records;
  if (readCalibrationInfos(path, &records) != FileResult::kOk) return "cannot be read";
  if (content.back() != '\n') return "ends in the middle of a record";
  for (const ImuCalibrationInfo& record : records) {
    if (record.phase.empty() || !record.IsFinite()) return "holds a record that is none";
  }
  return "";
}

std::string faultOfColorRecords(const std::filesystem::path&, const std::string& content) {
  constexpr std::size_t kRecord = color_record::kCount * sizeof(float);
  return content.size() % kRecord == 0 ? "" : "ends in the middle of a record";
}

std::string faultOfLightRecords(const std::filesystem::path& path, const std::string&) {
  std::vector<SampleData> records;
  return readUdAlsRecords(path, &records) == FileResult::kOk ? "" : "cannot be read to its end";
}

std::string faultOfLines(const std::filesystem::path&, const std::string& content) {
  return content.back() == '\n' ? "" : "ends in the middle of a line";
}

/// Eight numbers: whatever of an older table a shorter one has left stands behind them.
std::string faultOfDisplayTable(const std::filesystem::path&, const std::string& content) {
  constexpr int kNumbers = 8;
  std::istringstream text(content);
  for (int i = 0; i < kNumbers; ++i) {
    unsigned number = 0;
    if (!(text >> number)) return "is no table of the display";
  }
  return "";
}

/// A file that outlives a step, below the handset's root.
struct WorkingFile {
  const char* path;
  enum class Kind {
    kRecords,
    kGrowingLog,
    kLog
  } kind;  ///< only records are read again; some logs start anew
  std::string (*faultOf)(const std::filesystem::path& path, const std::string& content);
};
using enum WorkingFile::Kind;
constexpr WorkingFile kWorkingFiles[] = {
    {"data/app-ephemeral/vantle_imu", kRecords, faultOfMultipointFile},
    {"data/app-ephemeral/vantle_color", kRecords, faultOfColorRecords},
    {"data/app-ephemeral/vantle_als", kRecords, faultOfLightRecords},
    {"mnt/vendor/persist/sensors/color.csv", kGrowingLog, faultOfLines},
    {"persist/sensors/als.csv", kLog, faultOfLines},
    {"persist/sensors/als_gain_cal.csv", kGrowingLog, faultOfLines},
    {"persist/sensors/als_pwm_cal.csv", kGrowingLog, faultOfLines},
    {"persist/sensors/als_pattern_cal.csv", kGrowingLog, faultOfLines},
    {"persist/sensors/als_delay_cal.csv", kLog, faultOfLines},
    {"persist/sensors/als_te2_delay_cal.csv", kLog, faultOfLines},
    {"sys/devices/platform/soc/soc:qcom,dsi-display-primary/te2_table", kLog, faultOfDisplayTable},
};

}  // namespace

void copyFolder(const std::filesystem::path& from, const std::filesystem::path& to) {
  std::filesystem::copy(
      from, to, std::filesystem::copy_options::recursive | std::filesystem::copy_options::overwrite_existing);
}

Files registryFiles(const std::filesystem::path& root) {
  Files files;
  std::error_code ignored;
  for (const auto& entry : std::filesystem::directory_iterator(registryFolder(root), ignored)) {
    files[entry.path().filename()] = support::readFile(entry.path()).value_or("");
  }
  return files;
}

Files registryFilesAfterStart(const std::filesystem::path& root, std::string* complaints) {
  simhub::RegistryFiles files(registryFolder(root));
  simhub::RegistryStore store(files, {}, [&](const std::string& text) { *complaints += text + "\n"; });
  store.Load();
  return registryFiles(root);
}

std::optional<std::string> itemNames(const std::string& file) {
  sns_registry_data items;
  std::string error;
  if (!simhub::parseRegistryGroup(file, &items, &error)) return std::nullopt;
  std::string names;
  for (const sns_registry_data_item& item : items.items()) names += item.name() + " ";
  return names;
}

bool holdSameRecords(const std::filesystem::path& one, const std::filesystem::path& other) {
  return std::all_of(std::begin(kWorkingFiles), std::end(kWorkingFiles), [&](const WorkingFile& file) {
    return file.kind != kRecords ||
           support::readFile(one / file.path) == support::readFile(other / file.path);
  });
}

bool holdSameState(const std::filesystem::path& one, const std::filesystem::path& other) {
  for (const WorkingFile& file : kWorkingFiles) {
    if (support::readFile(one / file.path) != support::readFile(other / file.path)) return false;
  }
  return registryFiles(one) == registryFiles(other);
}

std::string faultOfWorkingFiles(const CommandMode& mode, const std::filesystem::path& before,
                                const std::filesystem::path& after) {
  for (const WorkingFile& file : kWorkingFiles) {
    const auto old = support::readFile(before / file.path);
    const auto now = support::readFile(after / file.path);
    if (file.kind != kLog && !mode.dropsRecords && old && (!now || now->compare(0, old->size(), *old) != 0)) {
      return std::string(file.path) + ": records of earlier steps are gone";
    }
    if (!now || now->empty()) continue;
    const std::string fault = file.faultOf(after / file.path, *now);
    if (!fault.empty()) return std::string(file.path) + " " + fault;
  }
  return "";
}

std::string prepareHandset(const CommandMode& mode, const std::filesystem::path& root) {
  support::makeDeviceFolders(root);
  for (const CommandMode::Step& step : mode.before) {
    const Captured run = runWatched(root, mode.device, step.words, step.world, mode.lookedUp).captured;
    if (run.result != 0) return "a step before fails: " + run.out + run.err;
  }
  return "";
}

}  // namespace fault
