// Runs every committed input of one fuzz target once. A finding ends the process, which fails the test
// program.
#include <algorithm>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <vector>

#include <gtest/gtest.h>

#include "fuzz/FuzzCheck.h"

namespace {

std::vector<std::filesystem::path> inputs() {
  std::vector<std::filesystem::path> paths;
  for (const auto& entry : std::filesystem::directory_iterator(VANTLE_FUZZ_CORPUS)) {
    if (entry.is_regular_file()) paths.push_back(entry.path());
  }
  std::sort(paths.begin(), paths.end());
  return paths;
}

TEST(FuzzCorpus, EveryCommittedInputIsTaken) {
  const auto paths = inputs();
  ASSERT_FALSE(paths.empty()) << "no inputs in " << VANTLE_FUZZ_CORPUS;
  for (const auto& path : paths) {
    SCOPED_TRACE(path.filename().string());
    std::ifstream file(path, std::ios::binary);
    ASSERT_TRUE(file.is_open());
    // A heap block of exactly the input's size: the address sanitizer sees a read of one byte too many.
    const std::string content{std::istreambuf_iterator<char>(file), {}};
    const std::vector<std::uint8_t> bytes(content.begin(), content.end());
    EXPECT_EQ(LLVMFuzzerTestOneInput(bytes.data(), bytes.size()), 0);
  }
}

}  // namespace
