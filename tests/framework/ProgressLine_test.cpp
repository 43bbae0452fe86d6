#include "framework/ProgressLine.h"

#include <cstdlib>
#include <functional>
#include <string>

#include <fcntl.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include "ssc/Log.h"
#include "support/Capture.h"

namespace {

using std::chrono::milliseconds;
using std::chrono::seconds;

constexpr ssc::Clock::TimePoint kStart{seconds(100)};
constexpr const char* kErase = "\r\x1b[K";

/// What `action` writes to standard error while that is a terminal.
std::string onTerminal(const std::function<void()>& action) {
  const int terminal = ::posix_openpt(O_RDWR | O_NOCTTY | O_NONBLOCK);
  if (terminal < 0 || ::grantpt(terminal) != 0 || ::unlockpt(terminal) != 0) return "no terminal";
  const int side = ::open(::ptsname(terminal), O_RDWR | O_NOCTTY);
  std::fflush(stderr);
  const int saved = ::dup(STDERR_FILENO);
  ::dup2(side, STDERR_FILENO);
  action();
  std::fflush(stderr);
  ::dup2(saved, STDERR_FILENO);
  std::string text;
  char buffer[4096];
  for (ssize_t count; (count = ::read(terminal, buffer, sizeof buffer)) > 0;) {
    text.append(buffer, static_cast<std::size_t>(count));
  }
  ::close(saved);
  ::close(side);
  ::close(terminal);
  return text;
}

TEST(ProgressLine, SaysElapsedAndRemainingSecondsAndTheTemperature) {
  EXPECT_EQ(ProgressLine::Text(seconds(12), seconds(60), 31.254F), "  12 s elapsed, 48 s remaining, 31.25 C");
}

TEST(ProgressLine, SaysNoTemperatureBeforeOneIsKnown) {
  EXPECT_EQ(ProgressLine::Text(seconds(0), seconds(60), std::nullopt), "  0 s elapsed, 60 s remaining");
}

TEST(ProgressLine, NeverCountsPastTheEnd) {
  EXPECT_EQ(ProgressLine::Text(seconds(61), seconds(60), std::nullopt), "  60 s elapsed, 0 s remaining");
}

TEST(ProgressLine, IsRedrawnInPlaceOnceASecondAndGoneAtTheEnd) {
  EXPECT_EQ(onTerminal([] {
              ProgressLine line;
              line.Start(kStart, seconds(3));
              line.Update(kStart + milliseconds(100), std::nullopt);
              line.Update(kStart + milliseconds(900), 20.0F);  // the same second
              line.Update(kStart + milliseconds(1000), 20.0F);
              line.End();
            }),
            std::string("  0 s elapsed, 3 s remaining") + kErase + "  1 s elapsed, 2 s remaining, 20.00 C" +
                kErase);
}

TEST(ProgressLine, IsNotDrawnBeforeTheStartNorAfterTheEnd) {
  EXPECT_EQ(onTerminal([] {
              ProgressLine line;
              line.Update(kStart, 20.0F);
              line.End();
              line.Update(kStart, 20.0F);
            }),
            "");
}

TEST(ProgressLine, MakesWayForWhatIsSaid) {
  std::string out;
  EXPECT_EQ(onTerminal([&] {
              ProgressLine line;
              line.Start(kStart, seconds(3));
              line.Update(kStart, std::nullopt);
              testing::internal::CaptureStdout();
              ssc::say("result\n");
              out = testing::internal::GetCapturedStdout();
              line.End();
            }),
            std::string("  0 s elapsed, 3 s remaining") + kErase);
  EXPECT_EQ(out, "result\n");
}

TEST(ProgressLine, IsNotWrittenWhereStandardErrorIsNoTerminal) {
  const Captured captured = capture([] {
    ProgressLine line;
    line.Start(kStart, seconds(3));
    line.Update(kStart, 20.0F);
    line.End();
  });
  EXPECT_EQ(captured.out, "");
  EXPECT_EQ(captured.err, "");
}

}  // namespace
