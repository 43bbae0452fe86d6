#include "fault/HandsetFiles.h"

#include <system_error>
#include <vector>

#include "fault/WatchedRun.h"
#include "imu/ImuMultipointFile.h"
#include "proto/sns_registry.pb.h"
#include "simhub/RegistryFiles.h"
#include "simhub/RegistryJson.h"
#include "simhub/RegistryStore.h"
#include "ssc/RegistryUtil.h"
#include "support/TemporaryFolder.h"

namespace fault {
namespace {

constexpr const char* kMultipointFile = "data/app-ephemeral/vantle_imu";

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

std::string faultOfWorkingFiles(const std::filesystem::path& before, const std::filesystem::path& after) {
  const auto old = support::readFile(before / kMultipointFile);
  const auto now = support::readFile(after / kMultipointFile);
  if (old && (!now || now->compare(0, old->size(), *old) != 0)) return "records of earlier steps are gone";
  if (!now || now->empty()) return "";
  const std::string fault = faultOfMultipointFile(after / kMultipointFile, *now);
  return fault.empty() ? "" : "the file of earlier steps " + fault;
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
