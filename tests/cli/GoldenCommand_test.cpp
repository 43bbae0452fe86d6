// Runs every case under tests/cli/cases with the real program. A case that is added there is a test.
#include <algorithm>
#include <cctype>
#include <cstdlib>
#include <filesystem>
#include <vector>

#include <gtest/gtest.h>

#include "cli/GoldenRunner.h"

namespace {

namespace fs = std::filesystem;

std::vector<fs::path> caseFiles() {
  std::vector<fs::path> paths;
  for (const auto& entry : fs::recursive_directory_iterator(VANTLE_GOLDEN_CASES)) {
    if (entry.is_regular_file()) paths.push_back(entry.path());
  }
  std::sort(paths.begin(), paths.end());
  return paths;
}

/// "baro/no-pressure.golden" is the test baro__no_pressure: test names take letters, digits and underscores.
std::string caseName(const testing::TestParamInfo<fs::path>& info) {
  std::string name = info.param.lexically_relative(VANTLE_GOLDEN_CASES).replace_extension().string();
  for (std::size_t at = name.find('/'); at != std::string::npos; at = name.find('/'))
    name.replace(at, 1, "__");
  std::replace_if(
      name.begin(), name.end(), [](unsigned char c) { return std::isalnum(c) == 0; }, '_');
  return name;
}

class GoldenCommand : public testing::TestWithParam<fs::path> {};

TEST_P(GoldenCommand, LeavesBehindWhatItsCaseStates) {
  ASSERT_EQ(GetParam().extension(), ".golden") << "only cases belong into this folder";
  const auto text = support::readFile(GetParam());
  ASSERT_TRUE(text.has_value());
  std::string error;
  auto golden = golden::parseCase(*text, &error);
  ASSERT_TRUE(golden.has_value()) << GetParam() << ": " << error;

  const bool update = std::getenv("VANTLE_UPDATE_GOLDEN") != nullptr;
  const std::string difference = golden::checkCase(VANTLE_PROGRAM, update, &*golden);
  if (difference.empty()) return;
  if (update) {
    EXPECT_TRUE(support::writeFile(GetParam(), golden::formatCase(*golden)));
    FAIL() << GetParam() << " was updated; see that each change is meant, then test again:\n" << difference;
  }
  FAIL() << GetParam() << ":\n" << difference;
}

INSTANTIATE_TEST_SUITE_P(Cases, GoldenCommand, testing::ValuesIn(caseFiles()), caseName);

}  // namespace
