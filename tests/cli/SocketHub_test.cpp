// vantle against vantle-hub: two processes, a Unix-domain socket, real time. What has to happen in the middle
// of a run is triggered by what the run prints, never by waiting for a while.
#include <algorithm>
#include <chrono>
#include <cmath>
#include <csignal>
#include <cstdio>
#include <filesystem>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include <gtest/gtest.h>

#include "support/Process.h"
#include "support/TemporaryFolder.h"

namespace {

namespace fs = std::filesystem;

/// Nothing takes this long unless it hangs, not even with a sanitizer on a busy machine.
constexpr std::chrono::seconds kPatience{60};
constexpr const char* kRegistry = "mnt/vendor/persist/sensors/registry/registry/";

// Without noise every number of a run follows from the scenario, whatever moments it reads.
const std::vector<std::string> kStill{"sensor.pressure.noise=0", "sensor.pressure_temperature.noise=0",
                                      "sensor.pressure_temperature.bias=0.5"};

using Environment = std::vector<std::pair<std::string, std::string>>;

class SocketHub : public testing::Test {
 protected:
  SocketHub() { support::makeDeviceFolders(root()); }

  [[nodiscard]] fs::path root() const { return folder_.path() / "root"; }
  [[nodiscard]] fs::path socket() const { return folder_.path() / "hub"; }

  /// A hub that listens.
  [[nodiscard]] std::unique_ptr<support::Process> startHub(
      const std::string& scenario, double speed = 1,
      const std::vector<std::string>& settings = kStill) const {
    support::Command command{VANTLE_HUB_PROGRAM, "vantle-hub", {}, environment(), "", ""};
    command.arguments = {"--socket", socket().string(), "--scenario",
                         scenario,   "--speed",         std::to_string(speed)};
    for (const std::string& setting : settings)
      command.arguments.insert(command.arguments.end(), {"--set", setting});
    auto hub = std::make_unique<support::Process>();
    EXPECT_TRUE(hub->start(command));
    EXPECT_TRUE(hub->waitForText("listening on", kPatience));
    return hub;
  }

  /// Ends it as a crash would: without a word, its socket file left behind.
  static void kill(support::Process& hub) {
    EXPECT_TRUE(hub.signal(SIGKILL));
    EXPECT_EQ(hub.wait(kPatience).end, support::Outcome::End::kSignalled);
  }

  [[nodiscard]] support::Command vantle(const std::vector<std::string>& words) const {
    support::Command command{VANTLE_PROGRAM, "vantle", words, environment(), "", ""};
    command.environment.emplace_back("VANTLE_HUB", "unix:" + socket().string());
    return command;
  }

  /// What a "prox" that has to succeed prints.
  [[nodiscard]] std::string runProx(const std::string& device, const std::vector<std::string>& words) const {
    std::vector<std::string> all{"-d", device, "-q", "prox"};
    all.insert(all.end(), words.begin(), words.end());
    const support::Outcome outcome = support::run(vantle(all), kPatience);
    EXPECT_TRUE(outcome.exitedWith(0)) << outcome.describe() << outcome.errors;
    return outcome.output;
  }

  [[nodiscard]] std::string registryFile(const std::string& group) const {
    return support::readFile(root() / kRegistry / group).value_or("(no file)");
  }

  [[nodiscard]] Environment environment() const {
    Environment variables = support::sanitizerEnvironment();
    variables.emplace_back("VANTLE_ROOT", root().string());
    return variables;
  }

 private:
  support::TemporaryFolder folder_;
};

/// What the same command prints and stores with the embedded hub.
struct Embedded {
  explicit Embedded(const std::string& scenario, const std::vector<std::string>& words,
                    const std::vector<std::string>& groups) {
    const support::TemporaryFolder folder;
    std::string hub = "sim:" + scenario + "?";
    for (const std::string& setting : kStill) hub += setting + "&";
    support::Command command{VANTLE_PROGRAM, "vantle", words, support::sanitizerEnvironment(), "", ""};
    command.environment.emplace_back("VANTLE_HUB", hub);
    command.environment.emplace_back("VANTLE_ROOT", folder.path().string());
    outcome = support::run(command, kPatience);
    for (const std::string& group : groups) {
      files.push_back(support::readFile(folder.path() / kRegistry / group).value_or("(no file)"));
    }
  }

  support::Outcome outcome;
  std::vector<std::string> files;
};

TEST_F(SocketHub, CalibratesAsTheEmbeddedHubDoes) {
  const std::vector<std::string> groups{"barochip_0_platform.pressure.fac_cal",
                                        "barochip_0_platform.pressure.fac_cal.bias"};
  const std::vector<std::string> words{"-q", "baro", "-t", "1", "1013.25"};
  const Embedded embedded("o1v1", words, groups);
  const auto hub = startHub("o1v1");
  const support::Outcome outcome = support::run(vantle(words), kPatience);
  EXPECT_TRUE(outcome.exitedWith(0)) << outcome.describe() << outcome.errors;
  EXPECT_EQ(outcome.output,
            "Searching for barometer...\n"
            "Barometer calibration begins with Raw samples.\n"
            "Collecting samples...\n"
            "MEAN:     1016.000000\n"
            "STDEV:       0.000000\n"
            "BIAS:        2.750000\n"
            "TEMP:       28.000000\n"
            "Writing registry...\n"
            "Barometer calibration succeeded.\n");
  EXPECT_EQ(outcome.output, embedded.outcome.output);
  EXPECT_EQ(outcome.errors, "");
  EXPECT_GE(outcome.wall, std::chrono::seconds(1));
  for (std::size_t i = 0; i < groups.size(); ++i) EXPECT_EQ(registryFile(groups[i]), embedded.files[i]);
}

/// Text with the digits of its times, counts and rates replaced: what of a sample listing does not depend on
/// the moment. "100.055000    1016.000000" becomes "T    1016.000000", and lines that are then the same
/// become one.
std::string withoutMoments(const std::string& output) {
  std::string form;
  std::string previous;
  for (std::size_t at = 0; at < output.size();) {
    const std::size_t end = std::min(output.find('\n', at), output.size());
    std::string line = output.substr(at, end - at);
    at = end + 1;
    double time = 0;
    int length = 0;
    std::size_t count = 0;
    double rate = 0;
    // Six digits behind the point of a time, three behind that of a rate.
    if (std::sscanf(line.c_str(), "%lf%n", &time, &length) == 1 && length > 7 &&
        line[static_cast<std::size_t>(length) - 7] == '.') {
      line = "T" + line.substr(static_cast<std::size_t>(length));
    } else if (std::sscanf(line.c_str(), "(count %zu @ ~%lf%n", &count, &rate, &length) == 2 &&
               line[static_cast<std::size_t>(length) - 4] == '.') {
      line =
          "(count N @ ~" + std::to_string(std::lround(rate)) + line.substr(static_cast<std::size_t>(length));
    }
    if (line != previous || line.empty()) form += line + "\n";
    previous = line;
  }
  return form;
}

TEST_F(SocketHub, PrintsSamplesInTheSameForm) {
  const auto hub = startHub("o1v1");
  const support::Outcome outcome = support::run(vantle({"-n", "baro", "-t", "1", "1013.25"}), kPatience);
  ASSERT_TRUE(outcome.exitedWith(0)) << outcome.describe() << outcome.errors;
  EXPECT_EQ(withoutMoments(outcome.output),
            "Searching for barometer...\n"
            "Barometer calibration begins with Raw samples.\n"
            "Collecting samples...\n"
            "\n"
            "Barometer Raw Samples:\n"
            "T    1016.000000\n"
            "(count N @ ~20 Hz)\n"
            "\n"
            "Barometer Temperature Samples:\n"
            "T      28.000000\n"
            "(count N @ ~5 Hz)\n"
            "\n"
            "MEAN:     1016.000000\n"
            "STDEV:       0.000000\n"
            "BIAS:        2.750000\n"
            "TEMP:       28.000000\n"
            "Skipping registry write due to dry run.\n"
            "Barometer calibration succeeded.\n")
      << outcome.output;
}

TEST_F(SocketHub, ASecondRunOnTheSameHubShowsTheErrorGone) {
  // Its barometer has only the calibrated stream. Ten times as fast: the numbers do not depend on the
  // moments.
  const auto hub = startHub("e4d4", 10);
  const std::vector<std::string> words{"-d", "e4d4", "-q", "baro", "-t", "1", "1013.25"};
  const support::Outcome first = support::run(vantle(words), kPatience);
  ASSERT_TRUE(first.exitedWith(0)) << first.describe() << first.errors;
  EXPECT_NE(first.output.find("MEAN:     1017.500000\nSTDEV:       0.000000\nBIAS:        4.250000\n"),
            std::string::npos)
      << first.output;
  const support::Outcome second = support::run(vantle(words), kPatience);
  ASSERT_TRUE(second.exitedWith(0)) << second.describe() << second.errors;
  EXPECT_EQ(second.output,
            "Searching for barometer...\n"
            "Barometer calibration begins with Calibrated samples.\n"
            "Collecting samples...\n"
            "WARN: The barometer has an existing calibration which will be overwritten\n"
            "WARN: PREV_BIAS:       4.250000\n"
            "MEAN:     1013.250000\n"
            "STDEV:       0.000000\n"
            "BIAS:        4.250000\n"
            "TEMP:       28.000000\n"
            "Writing registry...\n"
            "Barometer calibration succeeded.\n");
  EXPECT_EQ(registryFile("barochip4_0_platform.pressure.fac_cal.bias"),
            "{\n  \"items\": [\n    {\"name\": \"x\", \"version\": 2, \"float\": 4.25}\n  ]\n}\n");
}

TEST_F(SocketHub, AProximityOffsetLastsAsLongAsTheHub) {
  // Without noise, and with a light that rounds the same at every moment.
  const auto hub = startHub("p2m2", 10, {"sensor.proximity.noise=0"});
  const auto run = [&](const std::vector<std::string>& words) { return runProx("p2m2", words); };
  const std::string start = "Searching for proximity sensor...\n";
  EXPECT_EQ(run({}), start + "Collecting samples...\n\nADC_AVG:      54.000000\n");
  EXPECT_EQ(run({"poffset"}), start +
                                  "Disabling POFFSET calibration...\nPOFFSET disabled.\n"
                                  "Collecting samples...\n\nADC_AVG:       0.000000\n");
  EXPECT_EQ(run({}), start + "Collecting samples...\n\nADC_AVG:       0.000000\n");
}

TEST_F(SocketHub, AnExtendedOffsetAndThePulsesAreStoredAndTakenOver) {
  const auto hub = startHub("whiskel", 10,
                            {"sensor.proximity_raw.noise=0", "sensor.proximity_raw.scale=1",
                             "world.target_distance=100000", "world.window_crosstalk=300"});
  const auto run = [&](const std::vector<std::string>& words) { return runProx("whiskel", words); };
  // 26 of 32 pulses, and an offset of 64: 236 counts are left, of which 26/32 are seen.
  const std::string start = "Searching for proximity sensor...\n";
  EXPECT_EQ(run({"ppulse", "236"}), start +
                                        "Enabling pulse number calibration...\n"
                                        "Proximity pulse number calibration begins.\n"
                                        "Collecting samples...\n\nADC_AVG:     192.000000\n"
                                        "PPULSE:        31.000000\nWriting registry...\n"
                                        "Proximity pulse number calibration succeeded.\n");
  EXPECT_EQ(run({"ore", "enable", "16", "4"}), start + "Enabling ORE...\nORE enabled.\n");
  EXPECT_EQ(run({"poffset", "-w"}), start +
                                        "Disabling POFFSET calibration...\nPOFFSET disabled.\n"
                                        "Collecting samples...\n\nADC_AVG:       0.000000\n"
                                        "ADC_ORE:       4.000000\nADC_POFFSET:      44.000000\n\n"
                                        "NEW ORE:             4.000000\nNEW POFFSET:        44.000000\n\n"
                                        "Writing registry...\nProximity poffset calibration succeeded.\n");
  EXPECT_EQ(registryFile("proxchipw_0_platform.prox.fac_cal"),
            "{\n  \"items\": [\n"
            "    {\"name\": \"ore\", \"version\": 1, \"int\": 4},\n"
            "    {\"name\": \"poffset\", \"version\": 1, \"int\": 44},\n"
            "    {\"name\": \"ppulse\", \"version\": 1, \"float\": 31.0},\n"
            "    {\"name\": \"version\", \"int\": 1}\n"
            "  ]\n}\n");
}

TEST_F(SocketHub, AColorCalibrationIsTakenOverAndVerified) {
  // Without noise; each light has a hub of its own, as if somebody had moved the handset to the next lamp.
  const auto under = [&](const std::string& light, const std::string& kelvin,
                         const std::vector<std::string>& words) {
    const auto hub = startHub("p2m2", 10,
                              {light, "world.color_temperature=" + kelvin, "sensor.color_raw.noise=0",
                               "sensor.ambient_light_raw.noise=0", "sensor.ambient_light_raw.scale=0.5"});
    std::vector<std::string> all{"-d", "p2m2", "-q", "color", "-s", "2"};
    all.insert(all.end(), words.begin(), words.end());
    const support::Outcome outcome = support::run(vantle(all), kPatience);
    EXPECT_TRUE(outcome.exitedWith(0)) << outcome.describe() << outcome.errors;
    EXPECT_TRUE(hub->signal(SIGTERM));
    EXPECT_TRUE(hub->wait(kPatience).exitedWith(0));
    return outcome.output;
  };
  (void)under("world.infrared=5", "5000", {"-c"});
  (void)under("world.illuminance=500", "2800", {"500", "2800"});
  const std::string last = under("world.illuminance=1000", "6500", {"-w", "1000", "6500"});
  EXPECT_NE(last.find("LUX_SCALE:       2.000000\n"), std::string::npos) << last;
  EXPECT_NE(last.find("Writing registry...\nCalibration succeeded.\n"), std::string::npos) << last;
  const std::string check = under("world.illuminance=700", "4000", {"-v", "1", "700", "4000"});
  EXPECT_NE(check.find("LUX_MEAN:     700.000000\n"), std::string::npos) << check;
  EXPECT_NE(check.find("Verification succeeded.\n"), std::string::npos) << check;
}

TEST_F(SocketHub, ASarCalibrationIsStoredForItsSensor) {
  const auto hub = startHub("e4d4", 10, {"sensor.sar_1.noise=0", "sensor.sar_1.bias=[16353,100]"});
  const support::Outcome outcome = support::run(vantle({"-d", "e4d4", "sar", "-i", "1"}), kPatience);
  ASSERT_TRUE(outcome.exitedWith(0)) << outcome.describe() << outcome.errors;
  EXPECT_EQ(outcome.output,
            "Searching for SAR sensor...\nSAR calibration begins.\n"
            "TOP_OFFSET: 16383\nBOT_OFFSET:   130\n"
            "Writing registry...\nSAR calibration succeeded.\n");
  EXPECT_EQ(registryFile("sarchip_1_platform.fac_cal"),
            "{\n  \"items\": [\n"
            "    {\"name\": \"max_offset_bottom\", \"version\": 1, \"float\": 130.0},\n"
            "    {\"name\": \"max_offset_top\", \"version\": 1, \"float\": 16383.0}\n"
            "  ]\n}\n");
}

TEST_F(SocketHub, TwoRunsAtOnceDoNotDisturbEachOther) {
  const auto hub = startHub("o1v1", 10);
  support::Process calibration;
  ASSERT_TRUE(calibration.start(vantle({"-q", "baro", "-t", "1", "1013.25"})));
  const support::Outcome beside = support::run(vantle({"-n", "-q", "baro", "-t", "1", "1013.25"}), kPatience);
  const support::Outcome& outcome = calibration.wait(kPatience);
  EXPECT_TRUE(outcome.exitedWith(0)) << outcome.describe() << outcome.errors;
  EXPECT_TRUE(beside.exitedWith(0)) << beside.describe() << beside.errors;
  EXPECT_NE(outcome.output.find("BIAS:        2.750000\n"), std::string::npos);
  EXPECT_NE(beside.output.find("BIAS:        2.750000\n"), std::string::npos);
}

/// Enough of the trace to know where a run stands: the first reading came in.
constexpr const char* kFirstReading = "virtual void Calibrator::OnEvent(const sns_client_event_msg &) <--\n";

/// Four pressures come before the first temperature: six handlers have seen both.
std::string bothSensorsWereRead() {
  std::string trace;
  for (int i = 0; i < 6; ++i) {
    trace +=
        "VERBOSE: virtual void Calibrator::OnEvent(const sns_client_event_msg &) -->\n"
        "VERBOSE: virtual void Calibrator::OnEvent(const sns_client_event_msg &) <--\n";
  }
  return trace;
}

/// The run has asked for its streams for the n-th time again, and the first reading came in after that. Not
/// before: a hub killed while it is asked is a retry that failed.
std::string firstReadingAfterRetry(int retry) {
  return "DEBUG: Retry " + std::to_string(retry) +
         "\nVERBOSE: virtual void Calibrator::OnReconnect() <--\nVERBOSE: virtual void Calibrator::OnEvent";
}

TEST_F(SocketHub, AHubKilledAndRestartedInTheCollectionIsMadeGood) {
  auto hub = startHub("o1v1", 10);
  support::Process run;
  ASSERT_TRUE(run.start(vantle({"-v", "4", "-q", "baro", "-t", "4", "1013.25"})));
  ASSERT_TRUE(run.waitForText(kFirstReading, kPatience));
  kill(*hub);
  hub = startHub("o1v1", 10);
  ASSERT_TRUE(run.waitForText(firstReadingAfterRetry(1), kPatience));
  const support::Outcome& outcome = run.wait(kPatience);
  EXPECT_TRUE(outcome.exitedWith(0)) << outcome.describe() << outcome.errors;
  EXPECT_EQ(outcome.errors, "");
  EXPECT_NE(outcome.output.find("MEAN:     1016.000000\nSTDEV:       0.000000\nBIAS:        2.750000\n"),
            std::string::npos);
  EXPECT_EQ(outcome.output.find("Retry 2"), std::string::npos);
  EXPECT_EQ(registryFile("barochip_0_platform.pressure.fac_cal.bias"),
            "{\n  \"items\": [\n    {\"name\": \"x\", \"version\": 1, \"float\": 2.75}\n  ]\n}\n");
}

TEST_F(SocketHub, TheFourthReturnEndsTheCollection) {
  auto hub = startHub("o1v1", 10);
  support::Process run;
  ASSERT_TRUE(run.start(vantle({"-v", "4", "-q", "baro", "-t", "600", "1013.25"})));
  ASSERT_TRUE(run.waitForText(kFirstReading, kPatience));
  for (int retry = 1; retry <= 3; ++retry) {
    kill(*hub);
    hub = startHub("o1v1", 10);
    ASSERT_TRUE(run.waitForText(firstReadingAfterRetry(retry), kPatience));
  }
  kill(*hub);
  hub = startHub("o1v1", 10);
  const support::Outcome& outcome = run.wait(kPatience);
  EXPECT_TRUE(outcome.exitedWith(-11)) << outcome.describe();
  EXPECT_NE(outcome.output.find("DEBUG: Exhausted all retries\nDEBUG: Retry failed\n"), std::string::npos);
  EXPECT_TRUE(outcome.output.ends_with("Barometer calibration failed.\n"));
  EXPECT_EQ(outcome.errors, "ERROR: Unable to collect samples. Error = -11\n");
  EXPECT_EQ(registryFile("barochip_0_platform.pressure.fac_cal"), "(no file)");
}

TEST_F(SocketHub, AHubKilledForGoodEndsTheRunAtItsOwnTime) {
  auto hub = startHub("o1v1", 20);
  support::Process run;
  ASSERT_TRUE(run.start(vantle({"-v", "4", "-q", "baro", "-t", "2", "1013.25"})));
  ASSERT_TRUE(run.waitForText(bothSensorsWereRead(), kPatience));
  kill(*hub);
  const support::Outcome& outcome = run.wait(kPatience);
  EXPECT_TRUE(outcome.exitedWith(-107)) << outcome.describe();
  EXPECT_GE(outcome.wall, std::chrono::seconds(2));
  EXPECT_TRUE(
      outcome.output.ends_with("MEAN:     1016.000000\n"
                               "STDEV:       0.000000\n"
                               "BIAS:        2.750000\n"
                               "TEMP:       28.000000\n"
                               "Writing registry...\n"
                               "WARN: Failed to write registry. Error = -107\n"
                               "Barometer calibration failed.\n"))
      << outcome.output;
  EXPECT_EQ(outcome.errors, "ERROR: Unable to find the hub's registry. Error = -107\n");
  EXPECT_EQ(registryFile("barochip_0_platform.pressure.fac_cal"), "(no file)");
}

TEST_F(SocketHub, AHubStoppedInPeaceIsGoneAllTheSame) {
  auto hub = startHub("o1v1", 20);
  support::Process run;
  ASSERT_TRUE(run.start(vantle({"-v", "4", "-n", "-q", "baro", "-t", "1", "1013.25"})));
  ASSERT_TRUE(run.waitForText(bothSensorsWereRead(), kPatience));
  EXPECT_TRUE(hub->signal(SIGTERM));
  EXPECT_TRUE(hub->wait(kPatience).exitedWith(0));
  EXPECT_FALSE(fs::exists(socket()));
  const support::Outcome& outcome = run.wait(kPatience);
  EXPECT_TRUE(outcome.exitedWith(0)) << outcome.describe() << outcome.errors;
  EXPECT_TRUE(
      outcome.output.ends_with("Skipping registry write due to dry run.\n"
                               "Barometer calibration succeeded.\n"))
      << outcome.output;
}

TEST_F(SocketHub, AHubThatStopsAnsweringEndsTheRunToo) {
  auto hub = startHub("o1v1");
  ASSERT_TRUE(hub->signal(SIGSTOP));
  // The connection is taken by the kernel; the first request is never answered.
  const support::Outcome outcome = support::run(vantle({"-q", "baro", "-t", "1", "1013.25"}), kPatience);
  EXPECT_TRUE(outcome.exitedWith(-110)) << outcome.describe();
  EXPECT_EQ(outcome.output, "Searching for barometer...\n");
  EXPECT_EQ(outcome.errors,
            "ERROR: Unable to look up the barometer and its temperature sensor. Error = -110\n");
  EXPECT_TRUE(hub->signal(SIGCONT));
}

TEST_F(SocketHub, WhatAHubWithoutStandardStreamsSaysGoesToNoClient) {
  support::Command start{"/bin/sh", "", {}, environment(), "", ""};
  start.arguments = {"-c",
                     R"(exec "$0" "$@" <&- >&- 2>&-)",
                     VANTLE_HUB_PROGRAM,
                     "--socket",
                     socket().string(),
                     "--speed",
                     "20",
                     "--set",
                     "fault.f.kind=full_disk"};
  support::Process hub;
  ASSERT_TRUE(hub.start(start));
  const auto deadline = std::chrono::steady_clock::now() + kPatience;
  // Nothing tells when it listens.
  support::Outcome outcome;
  do {
    outcome = support::run(vantle({"-q", "baro", "1013.25"}), kPatience);
  } while (outcome.exitedWith(-19) && std::chrono::steady_clock::now() < deadline);
  // The hub says that it cannot write, but not through the socket that would have its standard error's
  // number.
  EXPECT_TRUE(outcome.exitedWith(-5)) << outcome.describe() << outcome.errors;
  EXPECT_EQ(outcome.output.find("malformed"), std::string::npos) << outcome.output;
}

}  // namespace
