// The harness itself: what it counts, and that it strikes where it should.
#include "fault/FileFaults.h"

#include <gtest/gtest.h>

#include "support/TemporaryFolder.h"

namespace fault {
namespace {

class FileFaults : public testing::Test {
 protected:
  /// A shell that makes a file of seven bytes.
  FaultedRun write(FileFault fault, std::size_t at) {
    const std::vector<std::string> command{"/bin/sh", "-c", "echo abcdef > " + file.string()};
    auto run = runWithFileFault(command, {}, folder.path(), {"ignored"}, {fault, at});
    traced = run.has_value();
    return run.value_or(FaultedRun());
  }
  [[nodiscard]] std::string content() const { return support::readFile(file).value_or("none"); }

  support::TemporaryFolder folder;
  std::filesystem::path file = folder.path() / "file";
  bool traced = false;
};

#define SKIP_WITHOUT_TRACING() \
  if (!traced) GTEST_SKIP() << "programs cannot be traced here"

TEST_F(FileFaults, CountsTheCallsThatChangeAFile) {
  const FaultedRun run = write(FileFault::kNone, 0);
  SKIP_WITHOUT_TRACING();
  EXPECT_EQ(run.status, 0);
  ASSERT_EQ(run.calls.size(), 2U);
  EXPECT_EQ(run.calls[0].path, "file");
  EXPECT_EQ(run.calls[1].name, "write");
  EXPECT_EQ(content(), "abcdef\n");
}

TEST_F(FileFaults, CountsNeitherIgnoredFilesNorThoseElsewhere) {
  file = folder.path() / "ignored";
  EXPECT_TRUE(write(FileFault::kNone, 0).calls.empty());
  file = "/dev/null";
  EXPECT_TRUE(write(FileFault::kNone, 0).calls.empty());
}

TEST_F(FileFaults, KillsBeforeTheCall) {
  const FaultedRun run = write(FileFault::kKill, 1);
  SKIP_WITHOUT_TRACING();
  EXPECT_TRUE(run.killed);
  EXPECT_FALSE(run.crashed);
  EXPECT_EQ(content(), "");
}

TEST_F(FileFaults, LetsTheCallFail) {
  const FaultedRun run = write(FileFault::kIoError, 1);
  SKIP_WITHOUT_TRACING();
  EXPECT_NE(run.status, 0);
  EXPECT_EQ(content(), "");
  (void)write(FileFault::kNoSpace, 0);  // the file is there already, and emptied
  EXPECT_EQ(content(), "");
}

TEST_F(FileFaults, CutsAWriteInHalf) {
  const FaultedRun run = write(FileFault::kShortWrite, 0);
  SKIP_WITHOUT_TRACING();
  ASSERT_GE(run.calls.size(), 1U);
  EXPECT_EQ(run.calls[0].name, "write");
  EXPECT_EQ(content().substr(0, 3), "abc");
}

}  // namespace
}  // namespace fault
