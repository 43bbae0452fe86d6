#include "imu/ImuMultipointCalibrator.h"

#include <algorithm>
#include <array>
#include <cstdlib>
#include <filesystem>
#include <limits>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "ssc/Log.h"
#include "support/ArgumentWords.h"
#include "support/Capture.h"
#include "support/FileSizeLimit.h"
#include "support/ScriptedHub.h"
#include "support/TemporaryFolder.h"

namespace {

using testing::HasSubstr;
using testing::Not;
using testing::SizeIs;
using testing::StartsWith;

constexpr const char* kAccelGroup = "chipa_0_platform.accel.fac_cal";
constexpr const char* kGyroGroup = "chipa_0_platform.gyro.fac_cal";
constexpr const char* kUsage = "Usage: vantle imu-multipoint [OPTIONS] [first | last]\n";
constexpr int kInvalid = -22;
constexpr int kNoData = -61;
constexpr float kNan = std::numeric_limits<float>::quiet_NaN();

void addMatrixItem(sns_registry_data* data, const std::string& name, float diagonal) {
  auto* item = data->add_items();
  item->set_name(name);
  for (int i = 0; i < 9; ++i) {
    const std::string element = std::to_string(i / 3) + "_" + std::to_string(i % 3);
    addFloatItem(item->mutable_subgrp(), element, i % 4 == 0 ? diagonal : 0, 4);
  }
}

/// A handset whose IMU reads what a test says. The ids put the accelerometer first.
class ImuMultipointTest : public testing::Test {
 protected:
  ImuMultipointTest() {
    ::setenv("VANTLE_ROOT", folder.path().c_str(), 1);
    support::makeDeviceFolders(folder.path());
    ssc::setLogLevel(ssc::kLogInfo);
    script->sensors = {{accel, "accel", "ChipA accelerometer"},
                       {gyro, "gyro", "ChipA gyroscope"},
                       {temperature, "sensor_temperature", "ChipA thermometer"}};
    reading(accel, {0, 0, 9.8F});
    reading(gyro, {0.01F, 0.02F, 0.03F});
    reading(temperature, {25.5F});
    for (const char* group : {kAccelGroup, kGyroGroup}) {
      sns_registry_data data;
      addMatrixItem(&data, "corr_mat", 1);
      addVectorItem(&data, "bias", {0, 0, 0}, 3);
      addFloatItem(&data, "other", 1, 9);
      script->registry[group] = data;
    }
    options.quiet = true;
  }
  ~ImuMultipointTest() override {
    ::unsetenv("VANTLE_ROOT");
    ssc::setLogLevel(ssc::kLogInfo);
  }

  ScriptedSensor& sensor(const ssc::SensorUid& suid) {
    for (ScriptedSensor& candidate : script->sensors) {
      if (candidate.suid == suid) return candidate;
    }
    return script->sensors.front();
  }
  void readings(const ssc::SensorUid& suid, std::function<std::vector<float>(int)> at) {
    sensor(suid).reading = std::move(at);
  }
  void reading(const ssc::SensorUid& suid, const std::vector<float>& values) {
    readings(suid, [values](int) { return values; });
  }
  void silence(const ssc::SensorUid& suid) { sensor(suid).reading = nullptr; }

  void perPhase() { options.deviceType = DeviceType::t5h5; }

  Captured run(std::initializer_list<const char*> words) {
    ArgumentWords argumentWords(words);
    options.command = "imu-multipoint";
    options.argc = argumentWords.argc();
    options.argv = argumentWords.argv();
    script->requests.clear();
    connection = connectTo(script);
    ImuMultipointCalibrator calibrator(connection.get());
    return capture([&] { return calibrator.Run(options); });
  }

  [[nodiscard]] std::string file() const { return support::readFile(path).value_or("(none)"); }
  void writeFile(const std::string& bytes) const { ASSERT_TRUE(support::writeFile(path, bytes)); }
  [[nodiscard]] bool hasFile() const { return std::filesystem::exists(path); }

  [[nodiscard]] int writes() const { return script->countRequests(HubScript::registrySuid(), 513); }
  [[nodiscard]] int notifications() const {
    return script->countRequests(accel, 610) + script->countRequests(gyro, 610);
  }

  /// The records of a whole per-phase procedure of a perfect handset.
  [[nodiscard]] static std::string wholeProcedure() {
    return "a+x 9.8 0 0 0 0 0 25 2 0 0 0\ng+x 9.8 0 0 1 0 0 25 2 2 0 0\na-x -9.8 0 0 0 0 0 25 2 0 0 0\n"
           "a+y 0 9.8 0 0 0 0 25 2 0 0 0\ng+y 0 9.8 0 0 1 0 25 2 0 2 0\na-y 0 -9.8 0 0 0 0 25 2 0 0 0\n"
           "a+z 0 0 9.8 0 0 0 25 2 0 0 0\ng+z 0 0 9.8 0 0 1 25 2 0 0 2\na-z 0 0 -9.8 0 0 0 25 2 0 0 0\n";
  }
  Captured runLastPhase() {
    return run({"imu-multipoint", "--a+x-refx=9.8", "--a+y-refy=9.8", "--a+z-refz=9.8", "--g+x-refx=2",
                "--g+y-refy=2", "--g+z-refz=2", "last"});
  }

  /// Six positions of a perfect handset, the sixth of which is still to be measured.
  void writeFivePositions() const {
    std::string bytes;
    for (const auto& mean :
         std::vector<std::array<float, 7>>{{9.80665F, 0, 0, 0.01F, 0.02F, 0.03F, 25.5F},
                                           {-9.80665F, 0, 0, 0.01F, 0.02F, 0.03F, 25.5F},
                                           {0, 9.80665F, 0, 0.01F, 0.02F, 0.03F, 25.5F},
                                           {0, -9.80665F, 0, 0.01F, 0.02F, 0.03F, 25.5F},
                                           {0, 0, -9.80665F, 0.01F, 0.02F, 0.03F, 25.5F}}) {
      bytes.append(reinterpret_cast<const char*>(mean.data()), sizeof(mean));
    }
    writeFile(bytes);
  }

  const ssc::SensorUid accel{1, 1};
  const ssc::SensorUid gyro{2, 2};
  const ssc::SensorUid temperature{3, 3};
  support::TemporaryFolder folder;
  const std::filesystem::path path = folder.path() / "data/app-ephemeral/vantle_imu";
  Calibrator::Arguments options;
  std::shared_ptr<HubScript> script = std::make_shared<HubScript>();
  std::unique_ptr<ssc::Connection> connection;
};

// Words.

TEST_F(ImuMultipointTest, HelpIsUsageAndOptions) {
  const Captured captured = run({"imu-multipoint", "--help"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_THAT(captured.out, StartsWith(std::string(kUsage) + "Options:\n\n  --clear, -c "));
  EXPECT_THAT(captured.out, testing::EndsWith("this command performs an intermediate step of\n"
                                              "a multi-point calibration.\n"));
  EXPECT_THAT(script->requests, SizeIs(0));
}

TEST_F(ImuMultipointTest, BadWordsAreErrorsWithTheUsageLine) {
  const std::vector<std::pair<std::vector<const char*>, std::string>> cases{
      {{"--phase", "a+xx"}, "Invalid POS argument: a+xx"},
      {{"-p", "b+x"}, "Invalid POS argument: b+x"},
      {{"--time", "0"}, "SECONDS must be a positive integer"},
      {{"-t", "2s"}, "SECONDS must be a positive integer"},
      {{"-g", "much"}, "GRAVITY must be a number"},
      {{"-g", "nan"}, "GRAVITY must be a number"},
      {{"--accel-bias", "x"}, "Limits must be positive numbers"},
      {{"--accel-scale", "1,0"}, "Limits must be positive numbers"},
      {{"--accel-stdev", "x"}, "Limits must be positive numbers"},
      {{"--gyro-bias", "x"}, "Limits must be positive numbers"},
      {{"--gyro-stdev", "x"}, "Limits must be positive numbers"},
      {{"--a+x-refx", "x"}, "Limits must be positive numbers"},
      {{"--g+z-refz", "x"}, "Limits must be positive numbers"},
      {{"--gyro-const-rate-window", "x"}, "Limits must be positive numbers"},
      {{"--a-x-refx", "1"}, "Invalid 'imu-multipoint' command option '?'"},
      {{"-z"}, "Invalid 'imu-multipoint' command option '?'"},
      {{"--phase"}, "Invalid 'imu-multipoint' command option '?'"},
      {{"middle"}, "Invalid argument 'middle'"},
      {{"First"}, "Invalid argument 'First'"},
  };
  for (const auto& [words, message] : cases) {
    const Captured captured =
        words.size() == 1 ? run({"imu-multipoint", words[0]}) : run({"imu-multipoint", words[0], words[1]});
    EXPECT_EQ(captured.result, kInvalid) << message;
    EXPECT_EQ(captured.err, "ERROR: " + message + "\n" + kUsage);
    EXPECT_THAT(script->requests, SizeIs(0));
  }
}

TEST_F(ImuMultipointTest, ANegativeLimitIsAcceptedAndNeverCompared) {
  readings(accel, [](int index) { return std::vector<float>{0, 0, index % 2 == 0 ? 9.0F : 10.0F}; });
  const Captured captured = run({"imu-multipoint", "--accel-bias", "-1", "--accel-stdev", "-1"});
  EXPECT_EQ(captured.result, 0);
}

TEST_F(ImuMultipointTest, WordsAfterTheStepAreIgnoredWithAWarning) {
  perPhase();
  const Captured captured = run({"imu-multipoint", "first", "last"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_THAT(captured.out, StartsWith("WARN: Ignoring extra argument 'last'\n"));
  EXPECT_THAT(captured.out, HasSubstr("Beginning IMU multi-point calibration.\n"));
}

TEST_F(ImuMultipointTest, ClearRemovesTheRecordsAtAnyStep) {
  perPhase();
  writeFile("old\n");
  EXPECT_EQ(run({"imu-multipoint", "--clear"}).result, 0);
  EXPECT_FALSE(hasFile());
  // Even when a later word is wrong: it happens while the words are read.
  writeFile("old\n");
  EXPECT_EQ(run({"imu-multipoint", "-c", "-t", "0"}).result, kInvalid);
  EXPECT_FALSE(hasFile());
}

// Looking up and streaming.

TEST_F(ImuMultipointTest, RatesDependOnTheProcedure) {
  const auto rates = [this] {
    std::map<ssc::SensorUid, float> found;
    for (const auto& request : script->requests) {
      if (request.msg_id() != 513 || ssc::SensorUid(request.suid()) == HubScript::registrySuid()) continue;
      sns_std_sensor_config config;
      EXPECT_TRUE(config.ParseFromString(request.request().payload()));
      found[ssc::SensorUid(request.suid())] = config.sample_rate();
    }
    return found;
  };
  (void)run({"imu-multipoint"});
  EXPECT_EQ(rates(), (std::map<ssc::SensorUid, float>{{accel, 20}, {gyro, 20}, {temperature, 1}}));
  for (const DeviceType type :
       {DeviceType::p2m2, DeviceType::t5h5, DeviceType::rufael, DeviceType::whiskel}) {
    options.deviceType = type;
    (void)run({"imu-multipoint", "-p", "a+z"});
    EXPECT_EQ(rates(), (std::map<ssc::SensorUid, float>{{accel, 400}, {gyro, 400}, {temperature, 1}}));
  }
}

TEST_F(ImuMultipointTest, APackageWithoutAGyroscopeEndsTheCommand) {
  script->sensors[1].name = "ChipB gyroscope";
  const Captured captured = run({"imu-multipoint"});
  EXPECT_EQ(captured.result, -2);
  EXPECT_EQ(captured.out, "Searching for IMU...\n");
  EXPECT_EQ(captured.err,
            "ERROR: Unable to find gyro for ChipA\n"
            "ERROR: Unable to look up the IMU and its temperature sensor. Error = -2\n");
}

TEST_F(ImuMultipointTest, AHubWithoutAnAccelerometerEndsTheCommand) {
  script->sensors.erase(script->sensors.begin());
  const Captured captured = run({"imu-multipoint"});
  EXPECT_EQ(captured.result, -2);
  EXPECT_EQ(captured.err, "ERROR: Unable to look up the IMU and its temperature sensor. Error = -2\n");
}

TEST_F(ImuMultipointTest, ReadingsBelowHighAccuracyAreDropped) {
  sensor(gyro).status = SNS_STD_SENSOR_SAMPLE_STATUS_ACCURACY_MEDIUM;
  ssc::setLogLevel(ssc::kLogDebug);
  const Captured captured = run({"imu-multipoint"});
  EXPECT_EQ(captured.result, kNoData);
  EXPECT_THAT(captured.out, HasSubstr("DEBUG: sample status (2) below accuracy level (3), dropping\n"));
  EXPECT_EQ(captured.err, "ERROR: Not enough  GYRO samples were collected\n");
}

TEST_F(ImuMultipointTest, ReadingsAreTracedBeforeAndAfterTheirRawValuesAreTaken) {
  perPhase();
  reading(accel, {1, 2, 3, 0, 0, 9.5F, 77});
  ssc::setLogLevel(ssc::kLogVerbose);
  const Captured captured = run({"imu-multipoint", "-p", "a+z"});
  EXPECT_THAT(captured.out, HasSubstr("VERBOSE: accel sample (status: 3): [ 1, 2, 3, 0, 0, 9.5, 77 ]\n"
                                      "VERBOSE: accel raw data sample : [ 0, 0, 9.5 ]\n"));
  EXPECT_THAT(captured.out, HasSubstr("VERBOSE: gyro sample (status: 3): [ 0.01, 0.02, 0.03 ]\n"));
  EXPECT_THAT(captured.out, HasSubstr("VERBOSE: temp sample (status: 3): [ 25.5 ]\n"));
  EXPECT_THAT(captured.out, Not(HasSubstr("gyro raw data")));
  EXPECT_THAT(captured.out, HasSubstr("ACCEL_MEAN:        0.000000       0.000000       9.500000\n"));
}

TEST_F(ImuMultipointTest, SixValuesAreNotTakenApartInThePositionalProcedure) {
  reading(accel, {1, 2, 3, 0, 0, 9.5F});
  const Captured captured = run({"imu-multipoint", "first"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_THAT(
      captured.out,
      HasSubstr("ACCEL_MEAN:        1.000000       2.000000       3.000000       0.000000       0.000000 "
                "      9.500000\n"));
  EXPECT_THAT(file(), SizeIs(28));
}

// A step of the per-phase procedure.

TEST_F(ImuMultipointTest, APhaseBecomesOneLine) {
  perPhase();
  reading(accel, {0, 0, 9.75F});
  reading(gyro, {0.5F, -0.25F, 0});
  const Captured captured = run({"imu-multipoint", "-p", "a+z", "-t", "1"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_EQ(captured.err, "");
  EXPECT_EQ(captured.out,
            "Searching for IMU...\n"
            "Continuing IMU multi-point calibration.\n"
            "Collecting samples...\n"
            "INFO: verifying device position for phase: a+z\n"
            "INFO: Cleaning data...\n"
            "Verifying data...\n"
            "ACCEL_MEAN:        0.000000       0.000000       9.750000\n"
            "ACCEL_STDEV:       0.000000       0.000000       0.000000\n"
            " GYRO_MEAN:        0.500000      -0.250000       0.000000\n"
            " GYRO_STDEV:       0.000000       0.000000       0.000000\n"
            " TEMP_MEAN:       25.500000\n"
            "INFO: Generating calibration info (phase: a+z)\n"
            "INFO: Appending calibration info to file: /data/app-ephemeral/vantle_imu\n"
            "Completed data collection for current position.\n");
  EXPECT_THAT(file(), StartsWith("a+z 0 0 9.75 0.5 -0.25 0 25.5 1.1975"));
  EXPECT_THAT(file(), testing::EndsWith("\n"));
}

TEST_F(ImuMultipointTest, FirstWithoutAPhaseOnlyClears) {
  perPhase();
  writeFile("old\n");
  const Captured captured = run({"imu-multipoint", "first"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_EQ(captured.out,
            "Searching for IMU...\nBeginning IMU multi-point calibration.\n"
            "INFO: Clearing existing intermediate IMU calibration data.\n"
            "Completed data collection for current position.\n");
  EXPECT_FALSE(hasFile());
}

TEST_F(ImuMultipointTest, AStepWithoutAPhaseCollectsNothing) {
  perPhase();
  const Captured captured = run({"imu-multipoint"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_THAT(captured.out, Not(HasSubstr("Collecting")));
}

TEST_F(ImuMultipointTest, APhaseTakenTwiceLeavesTwoLines) {
  perPhase();
  (void)run({"imu-multipoint", "-p", "a+z", "-t", "1"});
  (void)run({"imu-multipoint", "-p", "a+z", "-t", "1"});
  const std::string lines = file();
  EXPECT_EQ(std::count(lines.begin(), lines.end(), '\n'), 2);
}

TEST_F(ImuMultipointTest, ANegativeRotationIsStoredUnderItsOwnName) {
  perPhase();
  EXPECT_EQ(run({"imu-multipoint", "-p", "g-x", "-t", "1"}).result, 0);
  EXPECT_THAT(file(), StartsWith("g-x "));
}

TEST_F(ImuMultipointTest, TheWrongPoseLeavesTheFileAlone) {
  perPhase();
  writeFile("a+x 1\n");
  reading(accel, {0, 0, 9.75F});
  const Captured captured = run({"imu-multipoint", "-p", "a-z"});
  EXPECT_EQ(captured.result, kInvalid);
  EXPECT_EQ(captured.err,
            "ERROR: Accel data out of range (phase = a-z, accel_mean[z] = 9.750000)\n"
            "ERROR: Stationary accel data validation failed\n");
  EXPECT_THAT(captured.out, testing::EndsWith("IMU multi-point calibration failed.\n"));
  EXPECT_EQ(file(), "a+x 1\n");
}

TEST_F(ImuMultipointTest, APoseOfTwoValuesFailsWithoutNamingAnAxis) {
  perPhase();
  reading(accel, {0, 9.8F});
  const Captured captured = run({"imu-multipoint", "-p", "a+y"});
  EXPECT_EQ(captured.result, kInvalid);
  EXPECT_EQ(captured.err, "ERROR: Stationary accel data validation failed\n");
}

TEST_F(ImuMultipointTest, ARotationSkipsPoseAndOutliers) {
  perPhase();
  readings(accel, [](int index) { return std::vector<float>{index % 100 == 50 ? 99.0F : 20.0F, 20, 20}; });
  const Captured captured = run({"imu-multipoint", "-p", "g+x", "-t", "1"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_THAT(captured.out, Not(HasSubstr("outlier")));
}

std::function<std::vector<float>(int)> withOutliers(int outliers) {
  return [outliers](int index) {
    const bool isOutlier = index % 40 == 39 && index / 40 < outliers;
    return std::vector<float>{isOutlier ? 5.0F : 0.0F, 0, 9.5F};
  };
}

TEST_F(ImuMultipointTest, TenOutliersAreRemovedWithAWarning) {
  perPhase();
  readings(accel, withOutliers(10));
  const Captured captured = run({"imu-multipoint", "-p", "a+z"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_THAT(captured.out, HasSubstr("WARN: removing outlier sample: [ 5, 0, 9.5 ]\n"));
  EXPECT_THAT(captured.out, HasSubstr("WARN: 10 outlier samples are removed\nVerifying data...\n"
                                      "ACCEL_MEAN:        0.000000       0.000000       9.500000\n"));
}

TEST_F(ImuMultipointTest, ElevenOutliersAreTooMany) {
  perPhase();
  readings(accel, withOutliers(11));
  const Captured captured = run({"imu-multipoint", "-p", "a+z"});
  EXPECT_EQ(captured.result, kInvalid);
  EXPECT_EQ(captured.err, "ERROR: Too many outliers (11)\n");
  EXPECT_FALSE(hasFile());
}

TEST_F(ImuMultipointTest, OutliersOfTheGyroscopeCountByThemselves) {
  perPhase();
  readings(accel, withOutliers(10));
  readings(gyro, withOutliers(11));
  const Captured captured = run({"imu-multipoint", "-p", "a+z"});
  EXPECT_EQ(captured.result, kInvalid);
  EXPECT_THAT(captured.out, HasSubstr("WARN: 10 outlier samples are removed\n"));
  EXPECT_EQ(captured.err, "ERROR: Too many outliers (11)\n");
}

TEST_F(ImuMultipointTest, AReadingOfAnotherDimensionIsAnOutlier) {
  perPhase();
  readings(gyro, [](int index) {
    return index == 7 ? std::vector<float>{1, 2} : std::vector<float>{0, 0, 0};
  });
  const Captured captured = run({"imu-multipoint", "-p", "a+z"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_EQ(captured.err, "ERROR: Sample data dimension (2) != stdev dimension (3)\n");
  EXPECT_THAT(captured.out, HasSubstr("WARN: 1 outlier samples are removed\n"));
}

TEST_F(ImuMultipointTest, AGyroscopeOfTwoValuesIsNoMeasurement) {
  perPhase();
  reading(gyro, {1, 2});
  Captured captured = run({"imu-multipoint", "-p", "a+z"});
  EXPECT_EQ(captured.result, kInvalid);
  EXPECT_EQ(captured.err, "ERROR: gyro_mean has invalid dimension (2) when converting to CalibrationInfo\n");
  captured = run({"imu-multipoint", "-p", "g+z", "--use-gyro-rate"});
  EXPECT_EQ(captured.result, kInvalid);
  EXPECT_EQ(captured.err,
            "ERROR: observed gyro sample with dimension less than 3, calibration terminated\n"
            "ERROR: unable to obtain rotation data from gyro calibration\n");
  EXPECT_FALSE(hasFile());
}

TEST_F(ImuMultipointTest, MeansOfTheWrongDimensionAreNoRecord) {
  perPhase();
  reading(accel, {0, 0, 9.8F, 1});
  EXPECT_EQ(run({"imu-multipoint", "-p", "a+z"}).err,
            "ERROR: accel_mean has invalid dimension (4) when converting to CalibrationInfo\n");
  reading(accel, {0, 0, 9.8F});
  reading(temperature, {25, 1});
  EXPECT_EQ(run({"imu-multipoint", "-p", "a+z"}).err,
            "ERROR: temp_mean has invalid dimension (2) when converting to CalibrationInfo\n");
}

TEST_F(ImuMultipointTest, ReadingsThatAreNotNumbersAreNoRecord) {
  perPhase();
  reading(gyro, {0, kNan, 0});
  const Captured captured = run({"imu-multipoint", "-p", "g+x"});
  EXPECT_EQ(captured.result, kInvalid);
  EXPECT_EQ(captured.err, "ERROR: Calibration info of phase g+x has values that are not finite\n");
  reading(accel, {0, 0, kNan});
  EXPECT_THAT(run({"imu-multipoint", "-p", "a+z"}).err,
              StartsWith("ERROR: Accel data out of range (phase = a+z, accel_mean[z] = "));
  EXPECT_FALSE(hasFile());
}

TEST_F(ImuMultipointTest, AnUnwritableFolderIsReported) {
  perPhase();
  std::filesystem::remove_all(path.parent_path());
  const Captured captured = run({"imu-multipoint", "-p", "a+z", "-t", "1"});
  EXPECT_EQ(captured.result, -1);
  EXPECT_EQ(captured.err, "ERROR: Failed to open file to write calibration info to\n");
}

// Rates instead of angles.

std::function<std::vector<float>(int)> steadyTurn(float fluctuation) {
  return [fluctuation](int index) {
    const float rate = index < 200 || index >= 700 ? 0.0F : 2.0F + (index % 2 == 0 ? fluctuation : 0.0F);
    return std::vector<float>{0, 0, rate};
  };
}

TEST_F(ImuMultipointTest, RatesComeFromTheSteadyMiddle) {
  perPhase();
  readings(gyro, steadyTurn(0));
  const Captured captured = run({"imu-multipoint", "-p", "g+z", "--use-gyro-rate"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_THAT(captured.out,
              HasSubstr("INFO: Filling calibration info with gyro rate instead of integrated angle.\n"
                        "INFO: const_rate_window: 0.00 (start: 0.81, end: 1.44) gyro avg on rotating axis: "
                        "2.000000\n"));
  EXPECT_THAT(file(), testing::EndsWith(" 0 0 0 2\n"));
}

TEST_F(ImuMultipointTest, AWindowOfItsOwnSizeIsTakenAboutTheMiddle) {
  perPhase();
  readings(gyro, steadyTurn(0));
  const Captured captured =
      run({"imu-multipoint", "-p", "g+z", "--use-gyro-rate", "--gyro-const-rate-window", "0.5"});
  EXPECT_THAT(captured.out, HasSubstr("const_rate_window: 0.50 (start: 0.88, end: 1.38) gyro avg"));
}

TEST_F(ImuMultipointTest, ATableThatFluctuatesIsReported) {
  perPhase();
  readings(gyro, steadyTurn(1));
  const Captured captured = run({"imu-multipoint", "-p", "g+z", "--use-gyro-rate"});
  EXPECT_EQ(captured.result, kInvalid);
  EXPECT_EQ(captured.err,
            "ERROR: Heavy fluctuation detected on gyro data during steady rotating phase, please check if "
            "rotation station is functioning properly\n"
            "ERROR: unable to obtain rotation data from gyro calibration\n");
  EXPECT_FALSE(hasFile());
}

TEST_F(ImuMultipointTest, AWindowWithoutASampleIsNoRotation) {
  perPhase();
  readings(gyro, steadyTurn(0));
  const Captured captured =
      run({"imu-multipoint", "-p", "g+z", "--use-gyro-rate", "--gyro-const-rate-window", "-1"});
  EXPECT_EQ(captured.result, kInvalid);
  EXPECT_EQ(captured.err, "ERROR: unable to obtain rotation data from gyro calibration\n");
}

// Samples and deviations, in both procedures.

TEST_F(ImuMultipointTest, SilentSensorsAreNamedAndNothingIsStored) {
  for (const bool isPerPhase : {false, true}) {
    options.deviceType = isPerPhase ? DeviceType::t5h5 : DeviceType::e4d4;
    const std::vector<std::pair<ssc::SensorUid, std::string>> labels{
        {accel, "ACCEL"}, {gyro, " GYRO"}, {temperature, " TEMP"}};
    for (const auto& [suid, label] : labels) {
      const auto spoken = sensor(suid).reading;
      silence(suid);
      const Captured captured = run({"imu-multipoint", "-p", "a+z"});
      EXPECT_EQ(captured.result, kNoData) << label;
      EXPECT_EQ(captured.err, "ERROR: Not enough " + label + " samples were collected\n");
      EXPECT_THAT(captured.out, testing::EndsWith("IMU multi-point calibration failed.\n"));
      EXPECT_FALSE(hasFile());
      sensor(suid).reading = spoken;
    }
  }
}

TEST_F(ImuMultipointTest, ATemperatureThatIsNotReliableInTimeIsMissing) {
  sensor(temperature).status = SNS_STD_SENSOR_SAMPLE_STATUS_UNRELIABLE;
  const Captured captured = run({"imu-multipoint", "first"});
  EXPECT_EQ(captured.result, kNoData);
  EXPECT_EQ(captured.err, "ERROR: Not enough  TEMP samples were collected\n");
  EXPECT_FALSE(hasFile());
}

TEST_F(ImuMultipointTest, ADeviationAtItsLimitPassesAndAboveItFails) {
  // Two values in turn: the deviation of 44 samples is half their distance times sqrt(44/43).
  readings(accel, [](int index) { return std::vector<float>{0, index % 2 == 0 ? 0.05F : -0.05F, 9.8F}; });
  Captured captured = run({"imu-multipoint", "--accel-stdev", "0.0506"});
  EXPECT_EQ(captured.result, 0);
  captured = run({"imu-multipoint", "--accel-stdev", "0.05"});
  EXPECT_EQ(captured.result, kInvalid);
  EXPECT_THAT(captured.err, HasSubstr("ERROR: ACCEL y-axis standard deviation is too large (0.0505"));
  EXPECT_THAT(captured.err, HasSubstr(" > 0.050000)\n"));
  readings(gyro, [](int index) { return std::vector<float>{0, 0, index % 2 == 0 ? 1.0F : 0.0F}; });
  captured = run({"imu-multipoint", "--gyro-stdev", "0.1"});
  EXPECT_EQ(captured.result, kInvalid);
  EXPECT_THAT(captured.err, HasSubstr("ERROR:  GYRO z-axis standard deviation is too large (0.5"));
}

TEST_F(ImuMultipointTest, SensorsAreVerifiedInTheOrderOfTheirIds) {
  sensor(temperature).suid = {0, 0x1};
  const Captured captured = run({"imu-multipoint"});
  EXPECT_LT(captured.out.find("TEMP_MEAN"), captured.out.find("ACCEL_MEAN"));
  EXPECT_LT(captured.out.find("ACCEL_STDEV"), captured.out.find(" GYRO_MEAN"));
}

// The last step of the per-phase procedure.

TEST_F(ImuMultipointTest, LastSolvesAndStoresAndNotifies) {
  perPhase();
  writeFile(wholeProcedure());
  const Captured captured = runLastPhase();
  EXPECT_EQ(captured.result, 0);
  EXPECT_EQ(captured.err, "");
  EXPECT_THAT(
      captured.out,
      HasSubstr("ACCEL_SCALE:        1.000000       0.000000       0.000000       0.000000       1.000000 "
                "      0.000000       0.000000       0.000000       1.000000\n"
                "ACCEL_BIAS:         0.000000       0.000000       0.000000\n"));
  EXPECT_THAT(captured.out, HasSubstr("\nGYRO_SCALE:        1.000000 "));
  EXPECT_THAT(captured.out, HasSubstr("\nGYRO_BIAS:         0.000000 "));
  EXPECT_THAT(captured.out, testing::EndsWith("IMU multi-point calibration succeeded.\n"));
  EXPECT_THAT(captured.out, Not(HasSubstr("Writing")));
  EXPECT_EQ(writes(), 2);
  EXPECT_EQ(notifications(), 2);
  EXPECT_TRUE(hasFile());
  const sns_registry_data& group = script->registry.at(kAccelGroup);
  EXPECT_EQ(group.items(0).version(), 1);
  EXPECT_EQ(group.items(0).subgrp().items(0).name(), "0_0");
  EXPECT_EQ(group.items(0).subgrp().items(0).version(), 5);
  EXPECT_EQ(group.items(1).version(), 4);
  EXPECT_EQ(group.items(1).subgrp().items(2).version(), 4);
  EXPECT_EQ(group.items(2).version(), 9);
  EXPECT_EQ(group.items(3).name(), "mean_temp");
  EXPECT_EQ(group.items(3).flt(), 25);
  EXPECT_EQ(group.items(3).version(), 1);
}

TEST_F(ImuMultipointTest, LastInADryRunPrintsAndNotifiesButWritesNothing) {
  perPhase();
  options.dryRun = true;
  writeFile(wholeProcedure());
  const Captured captured = runLastPhase();
  EXPECT_EQ(captured.result, 0);
  EXPECT_THAT(captured.out, HasSubstr("GYRO_SCALE:"));
  EXPECT_EQ(writes(), 0);
  EXPECT_EQ(notifications(), 2);
}

TEST_F(ImuMultipointTest, TheRecordOfAStepIsWrittenInADryRunToo) {
  perPhase();
  options.dryRun = true;
  (void)run({"imu-multipoint", "-p", "a+z", "-t", "1"});
  EXPECT_THAT(file(), StartsWith("a+z "));
}

TEST_F(ImuMultipointTest, AFailedNotificationIsOnlyAWarning) {
  perPhase();
  sensor(gyro).confirms = false;
  writeFile(wholeProcedure());
  const Captured captured = runLastPhase();
  EXPECT_EQ(captured.result, 0);
  EXPECT_THAT(captured.out, HasSubstr("WARN: Unable to notify sensor of completed calibration\n"
                                      "WARN: A reboot may be required for the calibration to take effect\n"));
}

TEST_F(ImuMultipointTest, EightRecordsAreTooFew) {
  perPhase();
  std::string eight = wholeProcedure();
  eight.erase(eight.rfind("a-z"));
  writeFile(eight);
  Captured captured = runLastPhase();
  EXPECT_EQ(captured.result, kInvalid);
  EXPECT_EQ(captured.err, "ERROR: Calibration input is invalid.\n");
  EXPECT_THAT(captured.out, testing::EndsWith("IMU multi-point calibration failed.\n"));
  std::filesystem::remove(path);
  captured = runLastPhase();
  EXPECT_EQ(captured.result, kInvalid);
  EXPECT_EQ(
      captured.err,
      "ERROR: Failed to open file to write calibration info to\nERROR: Calibration input is invalid.\n");
}

TEST_F(ImuMultipointTest, AMissingPoseIsNoAccelerometerInput) {
  perPhase();
  std::string records = wholeProcedure();
  records.replace(records.find("a-z"), 3, "a+z");
  writeFile(records);
  const Captured captured = runLastPhase();
  EXPECT_EQ(captured.result, kInvalid);
  EXPECT_EQ(captured.err, "ERROR: Cannot extract accel calibration input.\n");
  EXPECT_EQ(writes(), 0);
}

TEST_F(ImuMultipointTest, AGyroscopeThatFailsLeavesTheNewAccelerometerCalibration) {
  perPhase();
  std::string records = wholeProcedure();
  writeFile(records.substr(records.find('\n') + 1) + "a+x 9.8 0 0 0 0 0 25 2 0 0 0\n");
  Captured captured = runLastPhase();
  EXPECT_EQ(captured.result, kInvalid);
  EXPECT_EQ(
      captured.err,
      "ERROR: No stationary capture before phase: g+x\nERROR: Cannot extract gyro calibration input.\n");
  EXPECT_EQ(writes(), 1);
  EXPECT_EQ(notifications(), 0);
}

TEST_F(ImuMultipointTest, MixedAnglesAndRatesAreNoOutput) {
  perPhase();
  std::string records = wholeProcedure();
  records.replace(records.find("25 2 2 0 0"), 4, "25 0");
  writeFile(records);
  const Captured captured = runLastPhase();
  EXPECT_EQ(captured.result, kInvalid);
  EXPECT_EQ(captured.err,
            "ERROR: Mixed input of rotation angle and angular rate from previous phases\n"
            "ERROR: Failed to compute gyro calibration output.\n");
}

TEST_F(ImuMultipointTest, MissingItemsAreReportedUnderTheSensorsNames) {
  perPhase();
  writeFile(wholeProcedure());
  const auto without = [](const sns_registry_data& data, const std::string& name) {
    sns_registry_data rest;
    for (const auto& item : data.items()) {
      if (item.name() != name) *rest.add_items() = item;
    }
    return rest;
  };
  const auto accelBefore = script->registry.at(kAccelGroup);
  const auto gyroBefore = script->registry.at(kGyroGroup);
  for (const std::string name : {"corr_mat", "bias"}) {
    script->registry[kAccelGroup] = without(accelBefore, name);
    EXPECT_EQ(runLastPhase().err, "ERROR: Invalid registry; missing accel \"" + name +
                                      "\"\nERROR: Failed to write accel calibration output to regsitry\n");
    script->registry[kAccelGroup] = accelBefore;
    script->registry[kGyroGroup] = without(gyroBefore, name);
    const Captured captured = runLastPhase();
    EXPECT_EQ(captured.result, kInvalid);
    EXPECT_EQ(captured.err, "ERROR: Invalid registry; missing gryo \"" + name +
                                "\"\nERROR: Failed to write gyro calibration output to regsitry\n");
    script->registry[kGyroGroup] = gyroBefore;
  }
}

TEST_F(ImuMultipointTest, AWriteThatFailsIsReported) {
  perPhase();
  writeFile(wholeProcedure());
  script->registryWritesFail = true;
  const Captured captured = runLastPhase();
  EXPECT_EQ(captured.result, -5);
  EXPECT_EQ(captured.err,
            "ERROR: Failed to write data to accel registry\n"
            "ERROR: Failed to write accel calibration output to regsitry\n");
}

TEST_F(ImuMultipointTest, NumbersThatAreNotFiniteAreNotWritten) {
  perPhase();
  writeFile(wholeProcedure());
  const Captured captured =
      run({"imu-multipoint", "--a+x-refx=nan", "--a+y-refy=9.8", "--a+z-refz=9.8", "last"});
  EXPECT_EQ(captured.result, kInvalid);
  EXPECT_THAT(captured.err, StartsWith("ERROR: The accelerometer's scale is not a finite number: "));
  EXPECT_EQ(writes(), 0);
}

TEST_F(ImuMultipointTest, AReferenceOfZerosGivesZeros) {
  perPhase();
  writeFile(wholeProcedure());
  const Captured captured = run({"imu-multipoint", "last"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_THAT(captured.out, HasSubstr("Matrix does not have a Inverse"));
  EXPECT_THAT(captured.out, HasSubstr("ACCEL_SCALE:        0.000000       0.000000 "));
}

TEST_F(ImuMultipointTest, LastMayMeasureAPhaseOfItsOwn) {
  perPhase();
  std::string records = wholeProcedure();
  writeFile(records.substr(0, records.rfind("a-z")));
  reading(accel, {0, 0, -9.8F});
  const Captured captured = run({"imu-multipoint", "-p", "a-z", "--a+x-refx=9.8", "--a+y-refy=9.8",
                                 "--a+z-refz=9.8", "--g+x-refx=2", "--g+y-refy=2", "--g+z-refz=2", "last"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_THAT(captured.out, Not(HasSubstr("Completed data collection")));
}

// The positional procedure.

TEST_F(ImuMultipointTest, APositionIsKeptAndFirstStartsAfresh) {
  writeFile("old");
  Captured captured = run({"imu-multipoint", "first"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_THAT(captured.out,
              HasSubstr("Saving data to file...\nCompleted data collection for current position.\n"));
  EXPECT_THAT(file(), SizeIs(28));
  (void)run({"imu-multipoint"});
  EXPECT_THAT(file(), SizeIs(56));
}

TEST_F(ImuMultipointTest, FivePositionsAreTooFew) {
  writeFivePositions();
  std::filesystem::resize_file(path, 4 * 28);
  const Captured captured = run({"imu-multipoint", "last"});
  EXPECT_EQ(captured.result, kNoData);
  EXPECT_EQ(captured.err, "ERROR: Only 5 of 6 positions have been measured\n");
  EXPECT_THAT(captured.out,
              HasSubstr("WARN: Calibration is not complete\nIMU multi-point calibration failed.\n"));
}

TEST_F(ImuMultipointTest, SixPositionsAreFittedStoredAndNotified) {
  reading(accel, {0, 0, 9.80665F});
  writeFivePositions();
  const Captured captured = run({"imu-multipoint", "last"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_EQ(captured.err, "");
  EXPECT_THAT(captured.out, HasSubstr("Retrieving previous data...\n"
                                      "Computing accelerometer parameters...\n"
                                      "ACCEL_SCALE:       1.000000       1.000000       1.000000\n"));
  EXPECT_THAT(captured.out, HasSubstr("Writing accelerometer calibration to registry...\n"
                                      "Computing gyroscope biases...\n"
                                      " GYRO_BIAS:        0.010000       0.020000       0.030000\n"
                                      "Writing gyroscope calibration to registry...\n"
                                      "IMU multi-point calibration succeeded.\n"));
  EXPECT_EQ(writes(), 2);
  EXPECT_EQ(notifications(), 2);
  EXPECT_FLOAT_EQ(script->registry.at(kGyroGroup).items(1).subgrp().items(2).flt(), 0.03F);
  EXPECT_EQ(script->registry.at(kAccelGroup).items(3).flt(), 25.5F);
}

TEST_F(ImuMultipointTest, AnExistingCalibrationIsReportedAndComposed) {
  addVectorItem(&(script->registry[kGyroGroup] = {}), "bias", {0.5F, 0, 0}, 1);
  sns_registry_data data;
  addMatrixItem(&data, "corr_mat", 2);
  addVectorItem(&data, "bias", {1, 0, 0}, 1);
  script->registry[kAccelGroup] = data;
  reading(accel, {0, 0, 9.80665F});
  writeFivePositions();
  const Captured captured = run({"imu-multipoint", "last"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_THAT(captured.out,
              HasSubstr("WARN: The accelerometer has an existing calibration which may be overwritten\n"
                        "WARN: PREV_ACCEL_SCALE:       2.000000       2.000000       2.000000\n"
                        "WARN: PREV_ACCEL_BiAS:        1.000000       0.000000       0.000000\n"
                        "ACCEL_SCALE:       2.000000       2.000000       2.000000\n"
                        "ACCEL_BIAS:        1.000000 "));
  EXPECT_THAT(captured.out,
              HasSubstr("WARN: The gyroscope has an existing calibration which may be overwritten\n"
                        "WARN: PREV_GYRO_BIAS:       0.500000       0.000000       0.000000\n"
                        " GYRO_BIAS:        0.510000       0.020000       0.030000\n"));
}

TEST_F(ImuMultipointTest, ThePositionalDryRunSaysThatItSkips) {
  options.dryRun = true;
  addVectorItem(&(script->registry[kGyroGroup] = {}), "bias", {0.5F, 0, 0}, 1);
  reading(accel, {0, 0, 9.80665F});
  writeFivePositions();
  const Captured captured = run({"imu-multipoint", "last"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_THAT(captured.out, HasSubstr("WARN: The gyroscope has an existing calibration\n"));
  EXPECT_THAT(captured.out,
              HasSubstr("Skipping registry write due to dry run.\nComputing gyroscope biases...\n"));
  EXPECT_THAT(captured.out, HasSubstr("Skipping registry write due to dry run.\nIMU multi-point"));
  EXPECT_EQ(writes(), 0);
  EXPECT_EQ(notifications(), 0);
  EXPECT_THAT(file(), SizeIs(6 * 28));
}

TEST_F(ImuMultipointTest, ScaleAndBiasAreHeldAgainstTheirLimits) {
  sns_registry_data data;
  addMatrixItem(&data, "corr_mat", 1.03F);
  addVectorItem(&data, "bias", {0, -0.5F, 0}, 1);
  const auto neutral = script->registry;
  reading(accel, {0, 0, 9.80665F});

  writeFivePositions();
  EXPECT_EQ(run({"imu-multipoint", "--accel-scale", "1.02", "last"}).result, 0);

  script->registry[kAccelGroup] = data;
  writeFivePositions();
  Captured captured = run({"imu-multipoint", "--accel-scale", "1.02", "last"});
  EXPECT_EQ(captured.result, kInvalid);
  EXPECT_EQ(captured.err, "ERROR: Accelerometer x-axis scale is out of tolerance: |1.030000| > 1.020000\n");

  writeFivePositions();
  captured = run({"imu-multipoint", "--accel-bias", "0.4", "last"});
  EXPECT_EQ(captured.result, kInvalid);
  EXPECT_EQ(captured.err, "ERROR: Accelerometer y-axis bias is out of tolerance: |-0.500000| > 0.400000\n");
  EXPECT_EQ(writes(), 0);

  script->registry = neutral;
  writeFivePositions();
  captured = run({"imu-multipoint", "--gyro-bias", "0.025", "last"});
  EXPECT_EQ(captured.result, kInvalid);
  EXPECT_EQ(captured.err, "ERROR: Gyroscope z-axis bias is out of tolerance: |0.030000| > 0.025000\n");
  EXPECT_EQ(writes(), 1);
}

TEST_F(ImuMultipointTest, AFileCutAnywhereIsIncomplete) {
  for (const std::size_t length : {1U, 13U, 27U, 5U * 28U + 4U}) {
    writeFivePositions();
    std::filesystem::resize_file(path, length);
    const Captured captured = run({"imu-multipoint", "last"});
    EXPECT_EQ(captured.result, kNoData) << length;
    EXPECT_EQ(captured.err, "ERROR: Previous data is malformed or incomplete\n");
  }
}

TEST_F(ImuMultipointTest, PositionsThatAreNotFiniteAreMalformed) {
  const std::array<float, 7> odd{kNan, 0, 0, 0, 0, 0, 25};
  writeFile(std::string(reinterpret_cast<const char*>(odd.data()), sizeof(odd)));
  EXPECT_EQ(run({"imu-multipoint", "last"}).err, "ERROR: Previous data is malformed or incomplete\n");
}

TEST_F(ImuMultipointTest, APositionThatIsNotFiniteIsNotStored) {
  reading(gyro, {0, 0, kNan});
  const Captured captured = run({"imu-multipoint", "first"});
  EXPECT_EQ(captured.result, kInvalid);
  EXPECT_THAT(captured.err, StartsWith("ERROR: The gyroscope's mean is not a finite number: "));
  EXPECT_FALSE(hasFile());
}

TEST_F(ImuMultipointTest, AFullDiskIsReported) {
  const std::string records = std::string(65535, '#') + '\n';
  writeFile(records);
  const support::FileSizeLimit full(records.size());
  Captured captured = run({"imu-multipoint"});
  EXPECT_EQ(captured.result, -2147483646);
  EXPECT_EQ(captured.err, "ERROR: Failed to write data to file\n");
  perPhase();
  captured = run({"imu-multipoint", "-p", "a+z", "-t", "1"});
  EXPECT_EQ(captured.result, -1);
  EXPECT_EQ(captured.err, "ERROR: Failed to write calibration info to file\n");
  EXPECT_EQ(std::filesystem::file_size(path), records.size());
}

TEST_F(ImuMultipointTest, AStoredMatrixOfAnotherKindIsReported) {
  reading(accel, {0, 0, 9.80665F});
  writeFivePositions();
  sns_registry_data data;
  addFloatItem(&data, "corr_mat", 1, 1);
  addVectorItem(&data, "bias", {0, 0, 0}, 1);
  script->registry[kAccelGroup] = data;
  const Captured captured = run({"imu-multipoint", "last"});
  EXPECT_EQ(captured.result, kInvalid);
  EXPECT_EQ(captured.err, "ERROR: Invalid registry; \"corr_mat\" does not hold a 3x3 matrix\n");
}

TEST_F(ImuMultipointTest, AShortReadingIsDroppedInThePositionalProcedure) {
  reading(gyro, {1, 2});
  const Captured captured = run({"imu-multipoint"});
  EXPECT_EQ(captured.result, kNoData);
  EXPECT_THAT(captured.out, HasSubstr("WARN: Dropping Gyroscope events with fewer than 3 values"));
  EXPECT_EQ(captured.err, "ERROR: Not enough  GYRO samples were collected\n");
}

// Reset.

TEST_F(ImuMultipointTest, ResetStoresTheNeutralCalibrationEvenInADryRun) {
  options.reset = true;
  options.dryRun = true;
  sns_registry_data data;
  addMatrixItem(&data, "corr_mat", 2);
  addVectorItem(&data, "bias", {1, 2, 3}, 1);
  script->registry[kAccelGroup] = data;
  script->registry[kGyroGroup] = data;
  const Captured captured = run({"imu-multipoint", "--nonsense"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_EQ(captured.err, "");
  EXPECT_EQ(captured.out,
            "Searching for IMU...\nResetting IMU multi-point calibration...\n"
            "Reboot device for default calibration to take effect.\n");
  const sns_registry_data& accelData = script->registry.at(kAccelGroup);
  EXPECT_EQ(accelData.items(0).subgrp().items(0).flt(), 1);
  EXPECT_EQ(accelData.items(0).subgrp().items(1).flt(), 0);
  EXPECT_EQ(accelData.items(1).subgrp().items(2).flt(), 0);
  EXPECT_EQ(accelData.items(2).name(), "mean_temp");
  const sns_registry_data& gyroData = script->registry.at(kGyroGroup);
  EXPECT_EQ(gyroData.items(0).subgrp().items(0).flt(), 2);  // the gyroscope's matrix stays
  EXPECT_EQ(gyroData.items(1).subgrp().items(0).flt(), 0);
  EXPECT_EQ(notifications(), 0);
}

TEST_F(ImuMultipointTest, ResetNeedsTheItemsItResets) {
  options.reset = true;
  const sns_registry_data whole = script->registry.at(kAccelGroup);
  script->registry[kAccelGroup].mutable_items()->DeleteSubrange(0, 1);
  EXPECT_EQ(run({"imu-multipoint"}).err, "ERROR: Invalid registry; missing accel \"corr_mat\"\n");
  EXPECT_EQ(writes(), 0);
  script->registry[kAccelGroup] = whole;
  script->registry[kAccelGroup].mutable_items()->DeleteSubrange(1, 1);
  EXPECT_EQ(run({"imu-multipoint"}).err, "ERROR: Invalid registry; missing accel \"bias\"\n");
  script->registry[kAccelGroup] = whole;
  script->registry[kGyroGroup].mutable_items()->DeleteSubrange(1, 1);
  const Captured captured = run({"imu-multipoint"});
  EXPECT_EQ(captured.result, kInvalid);
  EXPECT_EQ(captured.err, "ERROR: Invalid registry; missing gyro \"bias\"\n");
  EXPECT_EQ(writes(), 1);
}

}  // namespace
