#include <algorithm>
#include <filesystem>

#include "imu/ImuMultipointStage.h"

namespace {

using testing::HasSubstr;
using testing::Not;
using testing::SizeIs;
using testing::StartsWith;

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

TEST_F(ImuMultipointTest, RecordsThatCannotBeRemovedAreAWarningWithTheCause) {
  perPhase();
  std::filesystem::create_directories(path);  // nothing that is a file could be there
  const Captured captured = run({"imu-multipoint", "first"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_THAT(captured.out,
              HasSubstr("WARN: Unable to remove file: /data/app-ephemeral/vantle_imu: Is a "
                        "directory\nWARN: What it holds of an earlier calibration will be taken "
                        "for this one's\n"));
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

TEST_F(ImuMultipointTest, ASilentAccelerometerIsInNoPose) {
  perPhase();
  silence(accel);
  const Captured captured = run({"imu-multipoint", "-p", "a+y"});
  EXPECT_EQ(captured.result, kInvalid);
  EXPECT_EQ(captured.err, "ERROR: Stationary accel data validation failed\n");
  EXPECT_THAT(captured.out, testing::EndsWith("INFO: verifying device position for phase: a+y\n"
                                              "IMU multi-point calibration failed.\n"));
  EXPECT_FALSE(hasFile());
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
  const std::string outOfRange = "ERROR: Accel data out of range (phase = a+z, accel_mean[z] = nan)\n";
  EXPECT_THAT(run({"imu-multipoint", "-p", "a+z"}).err, StartsWith(outOfRange));
  // Their difference has another sign on another processor.
  constexpr float kInfinity = std::numeric_limits<float>::infinity();
  readings(accel, [](int index) {
    return std::vector<float>{0, 0, index % 2 == 0 ? kInfinity : -kInfinity};
  });
  EXPECT_THAT(run({"imu-multipoint", "-p", "a+z"}).err, StartsWith(outOfRange));
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
      const Captured captured = run({"imu-multipoint", "-p", "g+z"});
      EXPECT_EQ(captured.result, kNoData) << label;
      EXPECT_EQ(captured.err, "ERROR: Not enough " + label + " samples were collected\n");
      EXPECT_THAT(captured.out, testing::EndsWith("IMU multi-point calibration failed.\n"));
      EXPECT_FALSE(hasFile());
      sensor(suid).reading = spoken;
    }
  }
}

std::function<std::vector<float>(int)> onlyTheFirst(int count, const std::vector<float>& values) {
  return [count, values](int index) { return index < count ? values : std::vector<float>{}; };
}

TEST_F(ImuMultipointTest, ARotationNeedsTwoReadingsOfEachInertialSensorAndOneTemperature) {
  perPhase();
  readings(temperature, onlyTheFirst(1, {25.5F}));
  readings(accel, onlyTheFirst(1, {0, 0, 9.8F}));
  Captured captured = run({"imu-multipoint", "-p", "g+x"});
  EXPECT_EQ(captured.result, kNoData);
  EXPECT_EQ(captured.err, "ERROR: Not enough ACCEL samples were collected\n");
  readings(accel, onlyTheFirst(2, {0, 0, 9.8F}));
  readings(gyro, onlyTheFirst(1, {1, 0, 0}));
  captured = run({"imu-multipoint", "-p", "g+x"});
  EXPECT_EQ(captured.result, kNoData);
  EXPECT_EQ(captured.err, "ERROR: Not enough  GYRO samples were collected\n");
  EXPECT_FALSE(hasFile());
  readings(gyro, onlyTheFirst(2, {1, 0, 0}));
  EXPECT_EQ(run({"imu-multipoint", "-p", "g+x"}).result, 0);
  EXPECT_TRUE(hasFile());
}

TEST_F(ImuMultipointTest, WhereNothingCameAtAllTheRotationIsMissed) {
  perPhase();
  for (const ssc::SensorUid& suid : {accel, gyro, temperature}) silence(suid);
  const Captured captured = run({"imu-multipoint", "-p", "g+x"});
  EXPECT_EQ(captured.result, kInvalid);
  EXPECT_EQ(captured.err, "ERROR: unable to obtain rotation data from gyro calibration\n");
  EXPECT_THAT(captured.out, testing::EndsWith("Verifying data...\n"
                                              "INFO: Generating calibration info (phase: g+x)\n"
                                              "IMU multi-point calibration failed.\n"));
  EXPECT_EQ(run({"imu-multipoint", "-p", "g+x", "--use-gyro-rate"}).err, captured.err);
  EXPECT_FALSE(hasFile());
}

TEST_F(ImuMultipointTest, APositionInWhichNothingCameIsNotStored) {
  writeFile("old");
  for (const ssc::SensorUid& suid : {accel, gyro, temperature}) silence(suid);
  const Captured captured = run({"imu-multipoint", "first"});
  EXPECT_EQ(captured.result, kNoData);
  EXPECT_EQ(captured.err, "ERROR: Not enough ACCEL samples were collected\n");
  EXPECT_THAT(captured.out, testing::EndsWith("Verifying data...\nIMU multi-point calibration failed.\n"));
  EXPECT_EQ(file(), "old");
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

}  // namespace
