// Steps that are killed: what earlier ones stored has to stay readable, to the byte.
#include <filesystem>

#include <gtest/gtest.h>

#include "imu/ImuMultipointFile.h"
#include "support/RunAndKill.h"
#include "support/TemporaryFolder.h"

namespace {

constexpr int kKills = 40;

class ImuCrashTest : public testing::Test {
 protected:
  support::TemporaryFolder folder;
  const std::string path = folder.path() / "vantle_imu";
};

TEST_F(ImuCrashTest, AKilledPhaseLeavesOnlyWholeLines) {
  ImuCalibrationInfo info;
  info.phase = "a+x";
  info.accel_mean = {1.0 / 3, -2.0 / 3, 1e-17 / 3};
  const std::string line = info.ToString() + "\n";
  std::size_t lines = 0;
  for (int kill = 0; kill < kKills; ++kill) {
    std::filesystem::remove(path);
    support::runAndKill(kill % 4, [&] { (void)appendCalibrationInfo(info, path); });
    const std::string content = support::readFile(path).value_or("");
    ASSERT_EQ(content.size() % line.size(), 0U) << content;
    ASSERT_GE(content.size() / line.size(), static_cast<std::size_t>(kill % 4));
    lines = content.size() / line.size();
    std::vector<ImuCalibrationInfo> records;
    ASSERT_EQ(readCalibrationInfos(path, &records),
              support::readFile(path) ? FileResult::kOk : FileResult::kCannotOpen);
    ASSERT_EQ(records.size(), lines);
    for (const ImuCalibrationInfo& record : records) ASSERT_EQ(record.ToString() + "\n", line);
  }
  EXPECT_GT(lines, 0U);
}

TEST_F(ImuCrashTest, AKilledPositionLeavesOnlyWholeRecords) {
  const ImuPosition position{{1, 2, 3}, {4, 5, 6}, {7}};
  std::size_t count = 0;
  for (int kill = 0; kill < kKills; ++kill) {
    std::filesystem::remove(path);
    support::runAndKill(kill % 4, [&] { (void)appendPosition(position, path, FileStart::kKeep); });
    std::vector<ImuPosition> positions;
    if (!support::readFile(path)) continue;
    ASSERT_EQ(readPositions(path, &positions), FileResult::kOk);
    ASSERT_GE(positions.size(), static_cast<std::size_t>(kill % 4));
    count = positions.size();
    for (const ImuPosition& each : positions) ASSERT_EQ(each.gyro, position.gyro);
  }
  EXPECT_GT(count, 0U);
}

}  // namespace
