// A program that is killed at, or has fail, a chosen one of its system calls that change a file. The calls
// are caught in the kernel's filter, so that those that the C library makes by itself count too.
#pragma once

#include <cstddef>
#include <filesystem>
#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace fault {

enum class FileFault {
  kNone,
  kKill,        ///< the program is killed before the call
  kNoSpace,     ///< from the call on, nothing more fits on the disk: ENOSPC
  kIoError,     ///< the call fails: EIO
  kShortWrite,  ///< the call writes half of what it should; only writes count
};

struct FileFaultOrder {
  FileFault fault = FileFault::kNone;
  std::size_t at = 0;  ///< the call's index
};

/// A call that creates, writes, syncs, renames, cuts or removes a file, or makes a folder. One that finds its
/// work done counts for nothing.
struct FileCall {
  std::string name;
  std::string path;
};

struct FaultedRun {
  bool killed = false;
  int status = 0;  ///< exit status, or the signal that ended it when that was not the fault
  bool crashed = false;
  std::string output;  ///< standard output and error
  std::vector<FileCall> calls;
};

/// Runs the program with calls on files below `root` counted, those on files named in `ignored` not. Nothing
/// when the system does not let programs be traced.
[[nodiscard]] std::optional<FaultedRun> runWithFileFault(
    const std::vector<std::string>& arguments,
    const std::vector<std::pair<std::string, std::string>>& environment, const std::filesystem::path& root,
    const std::vector<std::string>& ignored, const FileFaultOrder& order);

}  // namespace fault
