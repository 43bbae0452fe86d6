// Steps that are killed: what earlier ones stored has to stay readable, to the byte.
#include <filesystem>

#include <gtest/gtest.h>

#include "framework/DataFile.h"
#include "light/ColorFiles.h"
#include "light/ColorRecord.h"
#include "support/RunAndKill.h"
#include "support/TemporaryFolder.h"

namespace {

constexpr std::size_t kKills = 40;

TEST(ColorCrash, AKilledStepLeavesOnlyWholeRecordsAndLines) {
  const support::TemporaryFolder folder;
  const std::string dataFile = folder.path() / "vantle_color";
  const std::string logFile = folder.path() / "color.csv";
  const SampleData means{1.0F / 3, 2, 3, 4, 5, 6, 7, 8};
  const std::string line = colorLogLine(500, 2800, means);
  std::string record;
  appendFloats(colorRecord(500, 2800, means), &record);
  std::size_t count = 0;
  for (std::size_t kill = 0; kill < kKills; ++kill) {
    std::filesystem::remove(dataFile);
    std::filesystem::remove(logFile);
    support::runAndKill(static_cast<int>(kill % 4), [&] {
      (void)appendLinesToFile(logFile, line, FileStart::kKeep);
      (void)appendToFile(dataFile, record, FileStart::kKeep);
    });
    std::string content;
    if (readWholeFile(dataFile, kMaxColorDataBytes, &content) != FileResult::kOk) continue;
    std::vector<SampleData> records;
    ASSERT_EQ(splitFloatRecords(content, color_record::kCount, &records), FileResult::kOk);
    ASSERT_GE(records.size(), kill % 4);
    count = records.size();
    for (const SampleData& each : records) ASSERT_EQ(each, colorRecord(500, 2800, means));
    const std::string log = support::readFile(logFile).value_or("");
    ASSERT_EQ(log.size() % line.size(), 0U);
    // A line is written before its record.
    ASSERT_GE(log.size() / line.size(), count);
  }
  EXPECT_GT(count, 0U);
}

}  // namespace
