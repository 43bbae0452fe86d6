// Steps that are killed: what earlier ones stored has to stay readable, to the byte.
#include <csignal>

#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include "imu/ImuMultipointFile.h"
#include "support/TemporaryFolder.h"

namespace {

constexpr int kKills = 40;

/// Runs `body` in a process of its own, over and over, and kills that at some moment after its first
/// `progress` rounds.
template <class Body>
void runAndKill(int progress, Body body) {
  int pipe[2];
  ASSERT_EQ(::pipe(pipe), 0);
  const pid_t child = ::fork();
  ASSERT_GE(child, 0);
  if (child == 0) {
    for (;;) {
      body();
      if (::write(pipe[1], "", 1) != 1) ::_exit(1);
    }
  }
  ::close(pipe[1]);
  char round;
  for (int i = 0; i < progress; ++i) {
    if (::read(pipe[0], &round, 1) != 1) break;
  }
  ASSERT_EQ(::kill(child, SIGKILL), 0);
  int status = 0;
  ASSERT_EQ(::waitpid(child, &status, 0), child);
  ::close(pipe[0]);
  EXPECT_TRUE(WIFSIGNALED(status));
}

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
    runAndKill(kill % 4, [&] { (void)appendCalibrationInfo(info, path); });
    const std::string content = support::readFile(path).value_or("");
    ASSERT_EQ(content.size() % line.size(), 0U) << content;
    ASSERT_GE(content.size() / line.size(), lines + static_cast<std::size_t>(kill % 4));
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
    runAndKill(kill % 4, [&] { (void)appendPosition(position, path, FileStart::kKeep); });
    std::vector<ImuPosition> positions;
    if (!support::readFile(path)) continue;
    ASSERT_EQ(readPositions(path, &positions), FileResult::kOk);
    ASSERT_GE(positions.size(), count + static_cast<std::size_t>(kill % 4));
    count = positions.size();
    for (const ImuPosition& each : positions) ASSERT_EQ(each.gyro, position.gyro);
  }
  EXPECT_GT(count, 0U);
}

}  // namespace
