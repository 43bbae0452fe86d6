// The files of one folder, written so that a crash loses nothing that was reported as written. Every
// operation is one step that a test can make fail or stop at.
#pragma once

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "simhub/Descriptor.h"

namespace simhub {

class RegistryFiles {
 public:
  /// How long another hub may keep the folder: less than a client waits for its answer.
  static constexpr std::chrono::milliseconds kLockPatience{2000};

  /// `folder` with or without a closing slash.
  explicit RegistryFiles(std::string folder, std::chrono::milliseconds lockPatience = kLockPatience);
  virtual ~RegistryFiles() = default;

  /// Creates the folder and those above it. 0 or an errno value, as every function here.
  [[nodiscard]] int CreateFolder();
  /// Keeps the folder to this hub for as long as `held` is open: two hubs that wrote the same group at once
  /// would mix their files. Waits for another hub's turn to end, for as long as the constructor says;
  /// EWOULDBLOCK when it does not. A file system that knows no locks counts as ours.
  [[nodiscard]] int Lock(Descriptor* held) const;
  /// The names of everything in the folder, sorted. A folder that is not there holds nothing.
  [[nodiscard]] int List(std::vector<std::string>* names) const;
  /// A regular file's content. EFBIG when it is larger than `limit`, EINVAL when it is no regular file.
  [[nodiscard]] int Read(const std::string& name, std::size_t limit, std::string* content) const;

  /// Makes a file of that content and syncs it. Anything short of that (also where the disk turns out to be
  /// full only at the sync or the close) is an error, and the file may hold part of it.
  [[nodiscard]] virtual int Write(const std::string& name, const std::string& content);
  [[nodiscard]] virtual int Rename(const std::string& from, const std::string& to);
  /// ENOENT counts as success.
  [[nodiscard]] virtual int Remove(const std::string& name);
  /// Makes the renames and removals so far durable.
  [[nodiscard]] virtual int SyncFolder();

  /// From now on only so many bytes fit in; nothing: no such limit.
  void LimitFreeBytes(std::optional<std::uint64_t> bytes) { freeBytes_ = bytes; }
  [[nodiscard]] bool IsLimited() const { return freeBytes_.has_value(); }

  [[nodiscard]] std::string Path(const std::string& name) const { return folder_ + "/" + name; }

 private:
  std::string folder_;  ///< without a closing slash
  std::chrono::milliseconds lockPatience_;
  std::optional<std::uint64_t> freeBytes_;
};

}  // namespace simhub
