#include "support/TemporaryFolder.h"

#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <iterator>
#include <system_error>

namespace support {

TemporaryFolder::TemporaryFolder() {
  std::error_code error;
  std::string pattern = (std::filesystem::temp_directory_path(error) / "vantle-test-XXXXXX").string();
  if (::mkdtemp(pattern.data()) == nullptr) {
    std::perror("a temporary folder");
    std::abort();
  }
  path_ = pattern;
}

TemporaryFolder::~TemporaryFolder() {
  std::error_code ignored;
  std::filesystem::remove_all(path_, ignored);
}

void makeDeviceFolders(const std::filesystem::path& root) {
  std::error_code ignored;
  for (const char* folder :
       {"data/app-ephemeral", "persist/sensors", "mnt/vendor/persist/sensors/registry/registry",
        "sys/devices/platform/soc/soc:qcom,dsi-display-primary"}) {
    std::filesystem::create_directories(root / folder, ignored);
  }
  // The display driver's node, which is there whether or not anything was written to it.
  (void)writeFile(root / "sys/devices/platform/soc/soc:qcom,dsi-display-primary/te2_table", "");
}

std::optional<std::string> readFile(const std::filesystem::path& path) {
  std::error_code error;
  if (!std::filesystem::is_regular_file(path, error)) return std::nullopt;
  std::ifstream file(path, std::ios::binary);
  if (!file) return std::nullopt;
  return std::string{std::istreambuf_iterator<char>(file), {}};
}

bool writeFile(const std::filesystem::path& path, const std::string& content) {
  std::error_code ignored;
  std::filesystem::create_directories(path.parent_path(), ignored);
  std::ofstream file(path, std::ios::binary | std::ios::trunc);
  file.write(content.data(), static_cast<std::streamsize>(content.size()));
  file.close();
  return file.good();
}

}  // namespace support
