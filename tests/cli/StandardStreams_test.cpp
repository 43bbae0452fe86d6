// What a program is started with for standard input, output and error is up to whoever starts it: also
// nothing.
#include <algorithm>
#include <sstream>
#include <string>

#include <gtest/gtest.h>

#include "support/Process.h"
#include "support/TemporaryFolder.h"

namespace {

constexpr std::chrono::seconds kPatience{60};

class ClosedStreams : public testing::TestWithParam<const char*> {};

// Otherwise the log file, the hub's socket or a file of the calibration would get the number of the closed
// stream, and what is printed would be written there.
TEST_P(ClosedStreams, PutNoOutputIntoFiles) {
  const support::TemporaryFolder root;
  const std::string redirected = std::string("exec \"$0\" \"$@\" ") + GetParam();
  support::Command command{"/bin/sh",
                           "",
                           {"-c", redirected, VANTLE_PROGRAM, "-q", "-v", "4", "baro", "1013.25"},
                           support::sanitizerEnvironment(),
                           "",
                           ""};
  command.environment.emplace_back("VANTLE_HUB", "sim");
  command.environment.emplace_back("VANTLE_ROOT", root.path().string());
  const support::Outcome outcome = support::run(command, kPatience);
  EXPECT_TRUE(outcome.exitedWith(0)) << outcome.describe();

  const std::string log = support::readFile(root.path() / "data/app-ephemeral/vantle.log").value_or("");
  std::istringstream lines(log);
  std::string line;
  ASSERT_TRUE(std::getline(lines, line));
  EXPECT_EQ(line.substr(0, 2), "$ ");
  while (std::getline(lines, line)) EXPECT_EQ(line.substr(0, 2), "20") << line;  // a time stamp's year
  EXPECT_NE(log.find("SAY     Barometer calibration succeeded.\n"), std::string::npos);
}

INSTANTIATE_TEST_SUITE_P(Each, ClosedStreams,
                         testing::Values("<&-", ">&-", "2>&-", "<&- >&-", ">&- 2>&-", "<&- >&- 2>&-"));

}  // namespace
