// A folder that lives as long as its object, and files in it.
#pragma once

#include <filesystem>
#include <optional>
#include <string>

namespace support {

class TemporaryFolder {
 public:
  /// Makes a new, empty folder under the system's temporary folder; ends the test program when it cannot.
  TemporaryFolder();
  TemporaryFolder(const TemporaryFolder&) = delete;
  TemporaryFolder& operator=(const TemporaryFolder&) = delete;
  ~TemporaryFolder();

  [[nodiscard]] const std::filesystem::path& path() const { return path_; }

 private:
  std::filesystem::path path_;
};

/// The folders of a handset that vantle relies on, made under `root` (its VANTLE_ROOT).
void makeDeviceFolders(const std::filesystem::path& root);

/// The file's bytes; nothing when it cannot be read.
[[nodiscard]] std::optional<std::string> readFile(const std::filesystem::path& path);

/// Replaces the file's content, making its folders. False when that fails.
[[nodiscard]] bool writeFile(const std::filesystem::path& path, const std::string& content);

}  // namespace support
