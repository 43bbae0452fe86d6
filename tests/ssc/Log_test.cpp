#include "ssc/Log.h"

#include <algorithm>
#include <cerrno>
#include <cstdint>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <string>
#include <thread>
#include <vector>

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include "ssc/DevicePath.h"
#include "ssc/Ticks.h"

namespace {

namespace fs = std::filesystem;

/// Catches both streams, has a folder of its own and leaves the log as it was.
class LogTest : public testing::Test {
 protected:
  LogTest() {
    std::string pattern = (fs::temp_directory_path() / "vantle-log-XXXXXX").string();
    folder_ = ::mkdtemp(pattern.data());
  }
  ~LogTest() override {
    ssc::closeLogFile();
    ssc::setLogLevel(ssc::kLogInfo);
    fs::remove_all(folder_);
  }

  void capture() {
    testing::internal::CaptureStdout();
    testing::internal::CaptureStderr();
  }
  void shown(std::string* out, std::string* error) {
    *out = testing::internal::GetCapturedStdout();
    *error = testing::internal::GetCapturedStderr();
  }
  [[nodiscard]] std::string path() const { return (folder_ / "vantle.log").string(); }
  [[nodiscard]] std::string logged() const {
    std::ifstream file(path());
    return {std::istreambuf_iterator<char>(file), {}};
  }
  /// The file's lines with the time stamps, whose form is checked, taken off.
  [[nodiscard]] std::vector<std::string> loggedLines() const {
    const std::string form = "dddd-dd-dd dd:dd:dd.dddZ ";
    std::vector<std::string> lines;
    std::ifstream file(path());
    for (std::string line; std::getline(file, line);) {
      std::string stamp = line.substr(0, form.size());
      std::replace_if(
          stamp.begin(), stamp.end(), [](char c) { return c >= '0' && c <= '9'; }, 'd');
      EXPECT_EQ(stamp, form) << line;
      lines.push_back(line.substr(stamp.size()));
    }
    return lines;
  }

  fs::path folder_;
};

TEST_F(LogTest, LevelZeroGoesToStandardErrorAndTheOthersToStandardOutput) {
  ssc::setLogLevel(4);
  capture();
  for (int level = 0; level <= 4; ++level) ssc::log(level, "at %d", level);
  std::string out;
  std::string error;
  shown(&out, &error);
  EXPECT_EQ(error, "ERROR: at 0\n");
  EXPECT_EQ(out, "WARN: at 1\nINFO: at 2\nDEBUG: at 3\nVERBOSE: at 4\n");
}

TEST_F(LogTest, ShowsLevelsUpToTheOneThatIsSet) {
  for (int limit = -1; limit <= 4; ++limit) {
    ssc::setLogLevel(limit);
    EXPECT_EQ(ssc::logLevel(), limit);
    capture();
    for (int level = 1; level <= 4; ++level) ssc::log(level, "x");
    std::string out;
    std::string error;
    shown(&out, &error);
    EXPECT_EQ(std::count(out.begin(), out.end(), '\n'), std::max(limit, 0)) << limit;
  }
}

TEST_F(LogTest, ErrorsAreAlwaysShown) {
  ssc::setLogLevel(-5);
  capture();
  ssc::log(ssc::kLogError, "x");
  std::string out;
  std::string error;
  shown(&out, &error);
  EXPECT_EQ(error, "ERROR: x\n");
}

TEST_F(LogTest, NewlineIsAddedOnlyWhereThereIsNone) {
  capture();
  ssc::log(1, "with\n");
  ssc::log(1, "without");
  ssc::log(1, "%s", "");
  std::string out;
  std::string error;
  shown(&out, &error);
  EXPECT_EQ(out, "WARN: with\nWARN: without\nWARN: \n");
}

TEST_F(LogTest, TraceIsShownAtLevelFourOnly) {
  capture();
  ssc::setLogLevel(3);
  ssc::logFunc("virtual void X::OnEvent()", "-->");
  ssc::setLogLevel(4);
  ssc::logFunc("virtual void X::OnEvent() %s", "<--");
  std::string out;
  std::string error;
  shown(&out, &error);
  EXPECT_EQ(out, "VERBOSE: virtual void X::OnEvent() %s <--\n");
}

TEST_F(LogTest, SayShowsTextAsItIs) {
  ssc::setLogLevel(0);
  const std::string longText(5000, 'y');
  capture();
  ssc::say("BIAS:  %14.6f\n", 1.5);
  ssc::say("%s", longText.c_str());
  ssc::say("\n\n");
  std::string out;
  std::string error;
  shown(&out, &error);
  EXPECT_EQ(out, "BIAS:        1.500000\n" + longText + "\n\n");
  EXPECT_EQ(error, "");
}

TEST_F(LogTest, FileHasEverythingThatWasShownWithTimeAndLevel) {
  ASSERT_EQ(ssc::openLogFile(path()), 0);
  capture();
  ssc::say("said\n");
  for (int level = 0; level <= 4; ++level) ssc::log(level, "level %d", level);
  ssc::say("two\nlines\n");
  ssc::say("\n");
  ssc::logFunc("f", "-->");
  std::string out;
  std::string error;
  shown(&out, &error);
  ssc::closeLogFile();
  EXPECT_EQ(loggedLines(),
            (std::vector<std::string>{"SAY     said", "ERROR   level 0", "WARN    level 1", "INFO    level 2",
                                      "SAY     two", "SAY     lines", "SAY     "}));
}

TEST_F(LogTest, LineSaidInPiecesIsOneLineOfTheFile) {
  ASSERT_EQ(ssc::openLogFile(path()), 0);
  capture();
  ssc::say("one ");
  ssc::say("two ");
  ssc::say("three\nfo");
  ssc::say("ur\n");
  std::string out;
  std::string error;
  shown(&out, &error);
  ssc::closeLogFile();
  EXPECT_EQ(out, "one two three\nfour\n");
  EXPECT_EQ(loggedLines(), (std::vector<std::string>{"SAY     one two three", "SAY     four"}));
}

TEST_F(LogTest, DiagnosticAmidALineOfOutputIsALineOfItsOwnInTheFile) {
  ASSERT_EQ(ssc::openLogFile(path()), 0);
  capture();
  ssc::say("Collecting");
  ssc::log(0, "no sensor");
  ssc::say(" samples\n");
  std::string out;
  std::string error;
  shown(&out, &error);
  ssc::closeLogFile();
  EXPECT_EQ(loggedLines(),
            (std::vector<std::string>{"SAY     Collecting", "ERROR   no sensor", "SAY      samples"}));
}

TEST_F(LogTest, UnfinishedLineIsInTheFileWhenItIsClosed) {
  ASSERT_EQ(ssc::openLogFile(path()), 0);
  capture();
  ssc::say("unfinished");
  std::string out;
  std::string error;
  shown(&out, &error);
  ssc::closeLogFile();
  EXPECT_EQ(loggedLines(), std::vector<std::string>{"SAY     unfinished"});
}

TEST_F(LogTest, LongAndPercentTextIsInTheFileWhole) {
  ASSERT_EQ(ssc::openLogFile(path()), 0);
  const std::string text = std::string(20000, 'z') + "%s%n";
  capture();
  ssc::say("%s\n", text.c_str());
  std::string out;
  std::string error;
  shown(&out, &error);
  ssc::closeLogFile();
  EXPECT_EQ(loggedLines(), std::vector<std::string>{"SAY     " + text});
}

TEST_F(LogTest, FileTextGoesToTheFileOnlyAndAsItIs) {
  ASSERT_EQ(ssc::openLogFile(path()), 0);
  capture();
  ssc::fsay("vantle %s\n", "baro");
  std::string out;
  std::string error;
  shown(&out, &error);
  ssc::closeLogFile();
  EXPECT_EQ(out + error, "");
  EXPECT_EQ(logged(), "vantle baro\n");
}

TEST_F(LogTest, LinesAreInTheFileAsSoonAsTheyAreShown) {
  ASSERT_EQ(ssc::openLogFile(path()), 0);
  capture();
  ssc::say("here\n");
  std::string out;
  std::string error;
  shown(&out, &error);
  EXPECT_EQ(loggedLines().size(), 1U);  // the file is still open
}

TEST_F(LogTest, FileIsAppendedTo) {
  capture();
  for (int run = 0; run < 2; ++run) {
    ASSERT_EQ(ssc::openLogFile(path()), 0);
    ssc::say("run\n");
    ssc::closeLogFile();
  }
  ssc::say("after it was closed\n");
  std::string out;
  std::string error;
  shown(&out, &error);
  EXPECT_EQ(loggedLines().size(), 2U);
}

TEST_F(LogTest, FileThatEndsWithinALineIsGoneOnWithOnANewOne) {
  const auto content = [&] {
    std::ifstream file(path());
    return std::string{std::istreambuf_iterator<char>(file), {}};
  };
  std::ofstream(path()) << "cut sho";
  for (int run = 0; run < 2; ++run) {
    ASSERT_EQ(ssc::openLogFile(path()), 0);
    ssc::fsay("$ vantle \n");
    ssc::closeLogFile();
  }
  EXPECT_EQ(content(), "cut sho\n$ vantle \n$ vantle \n");
}

TEST_F(LogTest, FileThatCannotBeOpenedIsOneWarningAndTheRunGoesOn) {
  capture();
  const std::string missing = (folder_ / "no/such/folder.log").string();
  EXPECT_EQ(ssc::openLogFile(missing), -ENOENT);
  ssc::say("said\n");
  ssc::fsay("kept\n");
  ssc::log(1, "logged");
  ssc::closeLogFile();
  std::string out;
  std::string error;
  shown(&out, &error);
  EXPECT_EQ(out, "said\nWARN: logged\n");
  EXPECT_EQ(error, "WARN: Unable to open the log file " + missing + ": No such file or directory\n");
}

TEST_F(LogTest, FolderOrLinkOrPipeInItsPlaceIsNotWrittenTo) {
  capture();
  EXPECT_EQ(ssc::openLogFile(folder_.string()), -EISDIR);
  fs::create_symlink(folder_ / "elsewhere", path());
  EXPECT_EQ(ssc::openLogFile(path()), -ELOOP);
  EXPECT_FALSE(fs::exists(folder_ / "elsewhere"));
  fs::remove(path());
  ASSERT_EQ(::mkfifo(path().c_str(), 0600), 0);
  EXPECT_EQ(ssc::openLogFile(path()), -ENXIO);  // without waiting for somebody who reads it
  std::string out;
  std::string error;
  shown(&out, &error);
  EXPECT_EQ(std::count(error.begin(), error.end(), '\n'), 3);
}

TEST_F(LogTest, LinesOfSeveralThreadsAreNeverMixed) {
  ASSERT_EQ(ssc::openLogFile(path()), 0);
  constexpr int kThreads = 4;
  constexpr int kLines = 200;
  capture();
  std::vector<std::thread> threads;
  for (int i = 0; i < kThreads; ++i) {
    threads.emplace_back([i] {
      const std::string text(40, static_cast<char>('a' + i));
      for (int line = 0; line < kLines; ++line) {
        ssc::say("%s\n", text.c_str());
        ssc::log(1, "%s", text.c_str());
        ssc::setLogLevel(2);
      }
    });
  }
  for (std::thread& thread : threads) thread.join();
  std::string out;
  std::string error;
  shown(&out, &error);
  ssc::closeLogFile();
  const auto lines = loggedLines();
  EXPECT_EQ(lines.size(), static_cast<std::size_t>(2 * kThreads * kLines));
  for (const std::string& line : lines) {
    ASSERT_EQ(line.size(), 48U);
    EXPECT_TRUE(line.compare(0, 8, "SAY     ") == 0 || line.compare(0, 8, "WARN    ") == 0) << line;
    EXPECT_EQ(line.substr(8), std::string(40, line[8]));
  }
  EXPECT_EQ(std::count(out.begin(), out.end(), '\n'), 2 * kThreads * kLines);
}

TEST_F(LogTest, FileLiesUnderTheRoot) {
  ASSERT_EQ(::setenv("VANTLE_ROOT", folder_.c_str(), 1), 0);
  EXPECT_EQ(ssc::openLogFile("/vantle.log"), 0);
  ssc::fsay("x\n");
  ssc::closeLogFile();
  ::unsetenv("VANTLE_ROOT");
  EXPECT_EQ(logged(), "x\n");
}

TEST(DevicePath, HasTheRootInFrontIfThereIsOne) {
  ::unsetenv("VANTLE_ROOT");
  EXPECT_EQ(ssc::devicePath("/persist/sensors/"), "/persist/sensors/");
  ::setenv("VANTLE_ROOT", "", 1);
  EXPECT_EQ(ssc::devicePath("/persist/sensors/"), "/persist/sensors/");
  ::setenv("VANTLE_ROOT", "/tmp/root", 1);
  EXPECT_EQ(ssc::devicePath("/persist/sensors/"), "/tmp/root/persist/sensors/");
  EXPECT_EQ(ssc::devicePath(""), "/tmp/root");
  ::unsetenv("VANTLE_ROOT");
}

TEST(SafeFileName, HoldsNothingThatLeadsElsewhere) {
  for (const char* name : {"a", "chipa_0_platform.pressure.fac_cal", "a.", "a..b", " ", "-", "~"}) {
    EXPECT_TRUE(ssc::isSafeFileName(name)) << name;
  }
  for (const char* name : {"", ".", "..", ".hidden", "/", "a/b", "a/", "/a", "../a"}) {
    EXPECT_FALSE(ssc::isSafeFileName(name)) << name;
  }
  EXPECT_FALSE(ssc::isSafeFileName(std::string("a\0b", 3)));
  EXPECT_FALSE(ssc::isSafeFileName(std::string(1, '\0')));
}

TEST(Ticks, AreOfA19200000HertzCounter) {
  EXPECT_EQ(ssc::ticksToSeconds(0), 0.0);
  EXPECT_EQ(ssc::ticksToSeconds(1), 1.0 / 19'200'000.0);
  EXPECT_EQ(ssc::ticksToSeconds(19'200'000), 1.0);
  EXPECT_EQ(ssc::ticksToSeconds(UINT64_MAX), 18446744073709551616.0 / 19'200'000.0);
}

}  // namespace
