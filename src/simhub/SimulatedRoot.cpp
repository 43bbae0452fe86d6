#include "simhub/SimulatedRoot.h"

#include <cerrno>
#include <cstdlib>
#include <cstring>

#include <fcntl.h>
#include <unistd.h>

#include "simhub/Hub.h"
#include "simhub/RegistryFiles.h"

namespace simhub {
namespace {

constexpr const char* kFolderName = "/vantle-sim";

/// A variable that is set and not empty.
const char* variable(const char* name) {
  const char* const value =
      std::getenv(name);  // NOLINT: the environment is only changed before threads exist
  return value != nullptr && *value != '\0' ? value : nullptr;
}

bool createFolder(const std::string& path, std::string* error) {
  const int failure = RegistryFiles(path).CreateFolder();
  if (failure != 0) *error = path + ": " + std::strerror(failure);
  return failure == 0;
}

}  // namespace

std::string simulatedRoot(std::string* error) {
  if (const char* const root = variable("VANTLE_ROOT")) return root;
  const char* const state = variable("XDG_STATE_HOME");
  // A relative one has to be ignored: it would mean another folder from each working directory.
  if (state != nullptr && *state == '/') return std::string(state) + kFolderName;
  if (const char* const home = variable("HOME")) return std::string(home) + "/.local/state" + kFolderName;
  *error = "neither VANTLE_ROOT nor XDG_STATE_HOME nor HOME is set";
  return {};
}

bool prepareSimulatedRoot(const std::string& root, std::string* error) {
  const HubFiles files = hubFiles(root);
  const std::string te2Folder = files.te2Table.substr(0, files.te2Table.rfind('/'));
  for (const std::string& folder :
       {root, root + "/data/app-ephemeral", root + "/persist/sensors", te2Folder, files.registryFolder}) {
    if (!createFolder(folder, error)) return false;
  }
  // The display driver's node: always there on a handset, written but never created by the program.
  const int fd = ::open(files.te2Table.c_str(), O_WRONLY | O_CREAT | O_CLOEXEC | O_NONBLOCK, 0644);
  if (fd < 0) *error = files.te2Table + ": " + std::strerror(errno);
  if (fd >= 0) (void)::close(fd);
  return fd >= 0;
}

}  // namespace simhub
