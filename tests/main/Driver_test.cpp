#include "main/Driver.h"

#include <csignal>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iterator>

#include <gtest/gtest.h>
#include <unistd.h>

#include "main/Usage.h"
#include "ssc/Log.h"
#include "support/ArgumentWords.h"
#include "support/Capture.h"
#include "support/ScriptedHub.h"

namespace {

constexpr const char* kShortUsage = "Usage: vantle [OPTIONS] COMMAND [ARGS...]\n";
constexpr int kInvalid = -22;

std::string fullUsage() {
  return capture([] { printUsage(stdout); }).out;
}

class DriverTest : public testing::Test {
 protected:
  void SetUp() override {
    root = std::filesystem::temp_directory_path() / ("vantle-driver-" + std::to_string(getpid()));
    std::filesystem::create_directories(root / "data/app-ephemeral");
    setenv("VANTLE_ROOT", root.c_str(), 1);
    setenv("VANTLE_HUB", "sim", 1);
    sns_registry_data data;
    addVectorItem(&data, "bias", {0}, 1);
    script->registry["chipa_0_platform.pressure.fac_cal"] = data;
    script->sensors = {{{1, 1}, "pressure", "chipa"}, {{2, 2}, "sensor_temperature", "chipa"}};
    for (ScriptedSensor& sensor : script->sensors) {
      sensor.reading = [](int) { return std::vector<float>{1000}; };
    }
  }
  void TearDown() override {
    unsetenv("VANTLE_ROOT");
    unsetenv("VANTLE_HUB");
    ssc::setLogLevel(ssc::kLogInfo);
    std::filesystem::remove_all(root);
  }

  int runHere(ArgumentWords& words) {
    return runVantle(words.argc(), words.argv(),
                     [this](const std::string&, std::unique_ptr<ssc::EmbeddedHub>* hub, std::string*) {
                       ++connections;
                       if (createResult == 0) *hub = std::make_unique<ScriptedHub>(script);
                       return createResult;
                     });
  }

  Captured run(std::initializer_list<const char*> words) {
    ArgumentWords argumentWords(words);
    return capture([&] { return runHere(argumentWords); });
  }

  [[nodiscard]] std::string logText() const {
    std::ifstream file(root / "data/app-ephemeral/vantle.log");
    return {std::istreambuf_iterator<char>(file), {}};
  }

  std::filesystem::path root;
  std::shared_ptr<HubScript> script = std::make_shared<HubScript>();
  int createResult = 0;
  int connections = 0;
};

TEST_F(DriverTest, RunsACommandAndReturnsItsResult) {
  const Captured captured = run({"vantle", "-q", "baro", "1000"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_NE(captured.out.find("Barometer calibration succeeded.\n"), std::string::npos);
  EXPECT_EQ(run({"vantle", "baro", "-t", "0"}).result, kInvalid);
}

TEST_F(DriverTest, HandsTheGlobalOptionsToTheCommand) {
  const Captured captured = run({"vantle", "--dry-run", "--quiet", "--device", "OSTREL", "baro", "1000"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_NE(captured.out.find("Skipping registry write due to dry run.\n"), std::string::npos);
  EXPECT_EQ(captured.out.find("Samples:"), std::string::npos);
  EXPECT_NE(run({"vantle", "-r", "baro"}).out.find("Resetting barometer calibration...\n"),
            std::string::npos);
}

TEST_F(DriverTest, WhatStandsBehindTheCommandBelongsToIt) {
  const Captured captured = run({"vantle", "baro", "-h"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_EQ(captured.out.rfind("Usage: vantle baro ", 0), 0U);
}

TEST_F(DriverTest, AMissingCommandPrintsTheUsagesFirstLine) {
  for (const auto& words :
       {std::initializer_list<const char*>{"vantle"}, {"vantle", "-n", "-q"}, {"vantle", "--"}}) {
    const Captured captured = run(words);
    EXPECT_EQ(captured.result, kInvalid);
    EXPECT_EQ(captured.err, std::string("ERROR: Missing command\n") + kShortUsage);
    EXPECT_EQ(captured.out, "");
  }
  EXPECT_EQ(connections, 0);
}

TEST_F(DriverTest, AnUnknownCommandPrintsTheUsageAfterConnecting) {
  for (const char* command : {"BARO", "bar", "baro ", "SAR", ""}) {
    connections = 0;
    const Captured captured = run({"vantle", command});
    EXPECT_EQ(captured.result, kInvalid);
    EXPECT_EQ(captured.err, "ERROR: Unknown command '" + std::string(command) + "'\n" + fullUsage());
    EXPECT_EQ(connections, 1);
  }
}

TEST_F(DriverTest, AnUnknownOptionPrintsTheUsage) {
  for (const char* word : {"-z", "--nonsense", "-d", "-v", "--device"}) {
    const Captured captured = run({"vantle", word});
    EXPECT_EQ(captured.result, kInvalid) << word;
    EXPECT_EQ(captured.err, "ERROR: Invalid option '?'\n" + fullUsage()) << word;
  }
  EXPECT_EQ(connections, 0);
}

TEST_F(DriverTest, TheOptionYTakesItsValueAndIsRefused) {
  const Captured captured = run({"vantle", "-y", "1", "baro", "1000"});
  EXPECT_EQ(captured.result, kInvalid);
  EXPECT_EQ(captured.err, "ERROR: Invalid option 'y'\n" + fullUsage());
}

TEST_F(DriverTest, AnUnknownDeviceEndsItWithoutUsage) {
  const Captured captured = run({"vantle", "-d", " ostrel", "baro", "1000"});
  EXPECT_EQ(captured.result, kInvalid);
  EXPECT_EQ(captured.err, "ERROR: Invalid device type specified: ' ostrel'\n");
  EXPECT_EQ(connections, 0);
}

TEST_F(DriverTest, OfSeveralDevicesTheLastOneCounts) {
  const std::string thresholds = run({"vantle", "prox", "-h"}).out;
  const std::string underDisplay = run({"vantle", "-d", "rufael", "prox", "-h"}).out;
  EXPECT_NE(thresholds, underDisplay);
  EXPECT_EQ(run({"vantle", "-d", "rufael", "-d", "OSTREL", "prox", "-h"}).out, thresholds);
  EXPECT_EQ(run({"vantle", "-d", "OSTREL", "-d", "rufael", "prox", "-h"}).out, underDisplay);
  EXPECT_EQ(run({"vantle", "-d", "none", "-d", "OSTREL", "prox", "-h"}).result, kInvalid);
}

TEST_F(DriverTest, AVerbosityOutOfRangeIsAWarning) {
  for (const char* level : {"0", "5", "9", "-1"}) {
    const Captured captured = run({"vantle", "-v", level, "-q", "baro", "1000"});
    EXPECT_EQ(captured.result, 0);
    EXPECT_EQ(captured.out.rfind("WARN: Invalid verbosity '" + std::string(level) + "'; using default\n", 0),
              0U);
    EXPECT_EQ(ssc::logLevel(), 2);
  }
}

TEST_F(DriverTest, AVerbosityThatIsNoNumberEndsItBeforeItConnects) {
  for (const auto& [level, result] :
       {std::pair{"x", -2147483647}, {"2x", -2147483647}, {"99999999999999999999", kInvalid}}) {
    const Captured captured = run({"vantle", "-v", level, "baro", "1000"});
    EXPECT_EQ(captured.result, result);
    EXPECT_EQ(captured.out, "WARN: Invalid verbosity '" + std::string(level) + "'; using default\n");
    EXPECT_EQ(captured.err, "");
  }
  EXPECT_EQ(connections, 0);
}

TEST_F(DriverTest, AMissingCommandCountsBeforeAPendingVerbosityError) {
  EXPECT_EQ(run({"vantle", "-v", "x"}).err, std::string("ERROR: Missing command\n") + kShortUsage);
}

TEST_F(DriverTest, ALaterNumberMakesGoodAnEarlierVerbosity) {
  EXPECT_EQ(run({"vantle", "-v", "x", "-v", "3", "-q", "baro", "1000"}).result, 0);
  EXPECT_EQ(run({"vantle", "-v", "x", "-v", "9", "-q", "baro", "1000"}).result, 0);
  EXPECT_EQ(run({"vantle", "-v", "3", "-v", "x", "-q", "baro", "1000"}).result, -2147483647);
}

TEST_F(DriverTest, AVerbosityOutOfRangeLeavesAnEarlierOneAsItIs) {
  run({"vantle", "-v", "3", "-v", "9", "baro", "-h"});
  EXPECT_EQ(ssc::logLevel(), 3);
}

TEST_F(DriverTest, AVerbosityMayBeHexadecimalOrOctal) {
  run({"vantle", "-v", "0x3", "baro", "-h"});
  EXPECT_EQ(ssc::logLevel(), 3);
  run({"vantle", "--verbose", "04", "baro", "-h"});
  EXPECT_EQ(ssc::logLevel(), 4);
  run({"vantle", "baro", "-h"});
  EXPECT_EQ(ssc::logLevel(), 2);
}

TEST_F(DriverTest, AHubThatCannotBeReachedIsTheResult) {
  createResult = -19;
  EXPECT_EQ(run({"vantle", "baro", "1000"}).result, -19);
}

TEST_F(DriverTest, EchoesTheCommandLineIntoTheLog) {
  run({"vantle", "-n", "baro", "two words"});
  EXPECT_EQ(logText().rfind("$ vantle -n baro two words \n", 0), 0U);
}

TEST_F(DriverTest, AppendsToTheLogOfEarlierRuns) {
  run({"vantle", "first"});
  run({"vantle", "second"});
  EXPECT_EQ(logText().rfind("$ vantle first \n", 0), 0U);
  EXPECT_NE(logText().find("\n$ vantle second \n"), std::string::npos);
}

TEST_F(DriverTest, ALogThatCannotBeOpenedIsOneWarning) {
  std::filesystem::remove_all(root);
  const Captured captured = run({"vantle", "-q", "baro", "1000"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_EQ(captured.err.rfind("WARN: Unable to open the log file ", 0), 0U);
  EXPECT_EQ(std::count(captured.err.begin(), captured.err.end(), '\n'), 1);
}

TEST_F(DriverTest, ALostReaderOfStandardOutputDoesNotEndTheRun) {
  std::signal(SIGPIPE, SIG_DFL);
  run({"vantle", "baro", "-h"});
  EXPECT_EQ(std::signal(SIGPIPE, SIG_DFL), SIG_IGN);
}

class DriverDeathTest : public DriverTest {
 protected:
  /// What is matched of a process that ends is its standard error.
  void runWithOutputOnStandardError(ArgumentWords& words) {
    dup2(STDERR_FILENO, STDOUT_FILENO);
    static_cast<void>(runHere(words));
  }
};

TEST_F(DriverDeathTest, HelpEndsTheProcessWithSuccess) {
  testing::GTEST_FLAG(death_test_style) = "threadsafe";
  ArgumentWords words{"vantle", "-v", "x", "-h", "-z"};
  EXPECT_EXIT(runWithOutputOnStandardError(words), testing::ExitedWithCode(0),
              "Usage: vantle .*--version        Display version info and exit.\n\n");
}

TEST_F(DriverDeathTest, VersionEndsTheProcessWithSuccess) {
  testing::GTEST_FLAG(death_test_style) = "threadsafe";
  ArgumentWords words{"vantle", "--version"};
  EXPECT_EXIT(runWithOutputOnStandardError(words), testing::ExitedWithCode(0), "vantle version 20.14\n");
}

}  // namespace
