#include <cstdlib>
#include <filesystem>

#include "imu/ImuThermalTest.h"
#include "ssc/RegistryUtil.h"
#include "support/TemporaryFolder.h"

namespace {

using testing::ElementsAre;
using testing::EndsWith;
using testing::FloatNear;
using testing::HasSubstr;
using testing::Not;
using testing::StartsWith;

TEST_F(ImuThermalTest, MeasuresPrintsAndStores) {
  const Captured captured = run();
  EXPECT_EQ(captured.result, 0);
  EXPECT_EQ(captured.err, "");
  EXPECT_EQ(captured.out,
            "Looking up sensors...\n"
            "IMU thermal calibration begins.\n"
            "Collecting samples...\n"
            "Validating temperatures...\n"
            "Checking for bumps...\n"
            "Correlating Accelerometer with IMU Temperature...\n"
            "ACCEL_SCALE:       0.001000      -0.002000       0.000000\n"
            "ACCEL_BIAS:        0.500000       0.250000       9.750000\n"
            "Writing registry...\n"
            "Correlating Gyroscope with IMU Temperature...\n"
            " GYRO_SCALE:       0.000000       0.000000       0.000500\n"
            " GYRO_BIAS:        0.000000       0.125000      -0.250000\n"
            "Writing registry...\n"
            "Correlating Magnetometer with Magnetometer Temperature...\n"
            "  MAG_SCALE:       0.250000       0.000000       0.000000\n"
            "  MAG_BIAS:       10.000000      20.000000      30.000000\n"
            "Correlating Barometer with Barometer Temperature...\n"
            " BARO_SCALE:       0.500000\n"
            " BARO_BIAS:      999.999939\n"
            "IMU thermal calibration succeeded.\n");
  EXPECT_THAT(stored(kAccelScale), ElementsAre(FloatNear(0.001F, 1e-6F), FloatNear(-0.002F, 1e-6F), 0.0F));
  EXPECT_THAT(stored(kGyroBias), ElementsAre(0.0F, 0.125F, FloatNear(-0.25F, 1e-6F)));
}

TEST_F(ImuThermalTest, StoresPlainVectorsWithRaisedVersions) {
  store(kAccelScale, {0, 0, 0}, 4);
  run();
  const sns_registry_data& scale = script->registry.at(kAccelScale);
  ASSERT_EQ(scale.items_size(), 3);
  EXPECT_EQ(scale.items(0).name(), "x");
  EXPECT_EQ(scale.items(2).name(), "z");
  EXPECT_EQ(scale.items(2).version(), 5);
  EXPECT_EQ(script->registry.at(kAccelBias).items(0).version(), 1);
}

TEST_F(ImuThermalTest, SendsNoNotification) {
  run();
  for (const auto& sensor : script->sensors) EXPECT_EQ(script->countRequests(sensor.suid, 610), 0);
}

TEST_F(ImuThermalTest, AsksForTwentyHertzAndOneForTemperatures) {
  run();
  std::map<ssc::SensorUid, float> rates;
  for (const auto& request : script->requests) {
    if (request.msg_id() != 513 || ssc::SensorUid(request.suid()) == HubScript::registrySuid()) continue;
    sns_std_sensor_config config;
    ASSERT_TRUE(config.ParseFromString(request.request().payload()));
    rates[ssc::SensorUid(request.suid())] = config.sample_rate();
  }
  EXPECT_EQ(rates, (std::map<ssc::SensorUid, float>{{accel, 20.0F},
                                                    {gyro, 20.0F},
                                                    {imuTemp, 1.0F},
                                                    {mag, 20.0F},
                                                    {magTemp, 1.0F},
                                                    {baro, 20.0F},
                                                    {baroTemp, 1.0F}}));
}

TEST_F(ImuThermalTest, PrintsTheSamplesUnlessQuiet) {
  options.quiet = false;
  const Captured captured = run();
  EXPECT_THAT(captured.out,
              HasSubstr("\nAccelerometer Samples:\n0.050000       0.530050       0.189900       "
                        "9.750000\n"));
  EXPECT_THAT(captured.out, HasSubstr("IMU Temperature Samples:\n1.000000      31.000000\n"));
  EXPECT_THAT(captured.out, HasSubstr("(count 200 @ ~20.000 Hz)\n\n"));
  EXPECT_EQ(captured.err, "");
}

TEST_F(ImuThermalTest, HandsetsWithoutMagnetometerTemperatureDoNotNeedAMagnetometer) {
  script->sensors.erase(script->sensors.begin() + 3, script->sensors.begin() + 5);
  for (const DeviceType type : {DeviceType::e4d4, DeviceType::whiskel}) {
    raw = type == DeviceType::whiskel;
    options.deviceType = type;
    const Captured captured = run();
    EXPECT_EQ(captured.result, 0);
    EXPECT_THAT(captured.out, Not(HasSubstr("MAG")));
    EXPECT_THAT(captured.out, EndsWith(" BARO_BIAS:      999.999939\nIMU thermal calibration succeeded.\n"));
  }
  raw = false;
  options.deviceType = DeviceType::o1v1;
  const Captured captured = run();
  EXPECT_EQ(captured.result, -2);
  EXPECT_EQ(captured.err, "ERROR: Unable to look up the mag sensor and its temperature sensor. Error = -2\n");
}

TEST_F(ImuThermalTest, ASensorThatIsMissingEndsItBeforeItBegins) {
  script->sensors.erase(script->sensors.begin() + 1);
  const Captured captured = run();
  EXPECT_EQ(captured.result, -2);
  EXPECT_EQ(captured.out, "Looking up sensors...\n");
}

TEST_F(ImuThermalTest, TheTemperatureSensorHasToBeOfTheSamePackage) {
  at(imuTemp).name = "ChipX";
  const Captured captured = run();
  EXPECT_EQ(captured.result, -2);
  EXPECT_THAT(captured.err, StartsWith("ERROR: Unable to find sensor_temperature for ChipA\n"));
}

TEST_F(ImuThermalTest, MagnetometerAndBarometerMayFail) {
  at(mag).reading = nullptr;
  at(baroTemp).reading = nullptr;
  const Captured captured = run();
  EXPECT_EQ(captured.result, 0);
  EXPECT_EQ(captured.err,
            "ERROR: Insufficient data to perform linear regression\n"
            "ERROR: Insufficient data to perform linear regression\n");
  EXPECT_THAT(captured.out, EndsWith(kSucceeded));
}

TEST_F(ImuThermalTest, HelpIsPrintedAndNothingElseHappens) {
  for (const char* const word : {"-h", "--help"}) {
    const Captured captured = run({"imu-thermal", word, "--bump-thold", "x"});
    EXPECT_EQ(captured.result, 0);
    EXPECT_EQ(captured.err, "");
    EXPECT_THAT(captured.out,
                StartsWith(std::string(kUsage) + "Options:\n\n  --bump-bsize BSIZE  (Deprecated)"));
    EXPECT_THAT(captured.out, EndsWith("  SECONDS             Duration of the calibration in seconds.\n\n"));
  }
  EXPECT_TRUE(script->requests.empty());
}

TEST_F(ImuThermalTest, RefusesWrongWords) {
  expectUsageError({"imu-thermal"}, "Missing required SECONDS argument");
  for (const char* const seconds : {"0", "-3", "ten", "5s", "99999999999999999999"}) {
    expectUsageError({"imu-thermal", "--", seconds}, "SECONDS must be a positive integer");
  }
  expectUsageError({"imu-thermal", "-x", "5"}, "Invalid 'imu-thermal' command option '?'");
  expectUsageError({"imu-thermal", "--bump", "5"}, "Invalid 'imu-thermal' command option '?'");
  expectUsageError({"imu-thermal", "5", "--bump-thold"}, "Invalid 'imu-thermal' command option '?'");
  for (const char* const value : {"0", "-1", "x", "1.5", ""}) {
    expectUsageError({"imu-thermal", "--bump-bsize", value, "5"}, "BSIZE must be a positive integer");
  }
  for (const char* const value : {"0", "-1", "x", "nan", "inf", "1e40"}) {
    expectUsageError({"imu-thermal", "--bump-thold", value, "5"}, "THOLD must be a positive number");
    expectUsageError({"imu-thermal", "--bump-tbrng", value, "5"}, "TBRNG must be a positive number");
  }
}

TEST_F(ImuThermalTest, RunsForAsLongAsAskedAndIgnoresFurtherWords) {
  const Captured captured = run({"imu-thermal", "5", "extra", "-i"});
  EXPECT_THAT(captured.out, StartsWith("WARN: Ignoring extra argument 'extra'\nLooking up sensors...\n"));
  EXPECT_EQ(captured.result, 0);
  EXPECT_EQ(connection->clock().now().time_since_epoch(), std::chrono::seconds(5));
}

TEST_F(ImuThermalTest, ADurationWhoseSamplesCannotBeKeptIsRefused) {
  const Captured captured = run({"imu-thermal", "2147483647"});
  EXPECT_EQ(captured.result, kInvalid);
  EXPECT_EQ(captured.err,
            "ERROR: The samples of 2147483647 seconds take 14259291 MB, more memory than there is\n"
            "ERROR: Unable to collect samples. Error = -22\n");
  EXPECT_EQ(captured.out, std::string("Looking up sensors...\nIMU thermal calibration begins.\n") + kFailed);
}

TEST_F(ImuThermalTest, MergesWithTheStoredModel) {
  store(kAccelScale, {0.5F, 0.25F, 0}, 1);
  store(kAccelBias, {1, 2, 3}, 1);
  const Captured captured = run();
  EXPECT_EQ(captured.result, 0);
  EXPECT_THAT(
      captured.out,
      HasSubstr("Correlating Accelerometer with IMU Temperature...\n"
                "WARN: There is an existing accelerometer thermal calibration which will be overwritten\n"
                "WARN: PREV_SCALE:       0.500000       0.250000       0.000000\n"
                "WARN: PREV_BIAS:        1.000000       2.000000       3.000000\n"
                "ACCEL_SCALE:       0.501000       0.248000       0.000000\n"
                "ACCEL_BIAS:        0.250000       0.187500       9.750000\n"
                "Writing registry...\nCorrelating Gyroscope with IMU Temperature...\n GYRO_SCALE:"));
}

TEST_F(ImuThermalTest, AStoredBiasAloneIsShownAndHasNoEffect) {
  store(kGyroBias, {1, 2, 3}, 1);
  const Captured captured = run();
  EXPECT_THAT(captured.out,
              HasSubstr("WARN: There is an existing gyroscope thermal calibration which will be overwritten\n"
                        "WARN: PREV_BIAS:        1.000000       2.000000       3.000000\n"
                        " GYRO_SCALE:       0.000000       0.000000       0.000500\n"
                        " GYRO_BIAS:        0.000000       0.125000      -0.250000\n"));
}

TEST_F(ImuThermalTest, ADryRunShowsTheStoredModelAndWritesNothing) {
  store(kAccelScale, {0.5F, 0.25F, 0}, 1);
  options.dryRun = true;
  const Captured captured = run();
  EXPECT_EQ(captured.result, 0);
  EXPECT_THAT(captured.out,
              HasSubstr("WARN: There is an existing accelerometer thermal calibration\nWARN: PREV_SCALE:"));
  EXPECT_THAT(captured.out, HasSubstr("ACCEL_BIAS:        0.250000       0.187500       9.750000\n"
                                      "Skipping registry write due to dry run.\nCorrelating Gyroscope"));
  EXPECT_THAT(captured.out, EndsWith(kSucceeded));
  EXPECT_EQ(writes(), 0);
}

TEST_F(ImuThermalTest, AGroupThatCannotBeReadFails) {
  script->registry.erase(kAccelBias);
  const Captured captured = run();
  EXPECT_EQ(captured.result, -2);
  EXPECT_THAT(captured.err, HasSubstr(kAccelBias));
  EXPECT_THAT(captured.out,
              EndsWith(std::string("Correlating Accelerometer with IMU Temperature...\n") + kFailed));
  EXPECT_EQ(writes(), 0);
}

TEST_F(ImuThermalTest, AFailedWriteEndsIt) {
  script->registryWritesFail = true;
  const Captured captured = run();
  EXPECT_EQ(captured.result, -5);
  EXPECT_THAT(
      captured.out,
      EndsWith(std::string("Writing registry...\nWARN: Failed to write registry. Error = -5\n") + kFailed));
  EXPECT_EQ(writes(), 1);  // the bias is not tried after the scale
}

TEST_F(ImuThermalTest, AStoredModelThatIsNoNumberIsNotWrittenAgain) {
  store(kAccelScale, {std::numeric_limits<float>::quiet_NaN(), 0, 0}, 1);
  const Captured captured = run();
  EXPECT_EQ(captured.result, kInvalid);
  EXPECT_EQ(captured.err, "ERROR: Accelerometer scale is not a finite number: nan\n");
  EXPECT_EQ(writes(), 0);
}

class ImuThermalResetTest : public ImuThermalTest {
 protected:
  ImuThermalResetTest() { options.reset = true; }
};

TEST_F(ImuThermalResetTest, AsksTheHubNothingAndLooksAtNoOtherWord) {
  options.dryRun = true;
  const Captured captured = run({"imu-thermal", "--bump-thold", "nonsense"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_EQ(captured.err, "");
  EXPECT_EQ(captured.out,
            "Resetting IMU thermal calibration...\n"
            "Reboot device for default calibration to take effect.\n");
  EXPECT_TRUE(script->requests.empty());
}

TEST_F(ImuThermalResetTest, AModelThatCannotBeDeletedIsAWarning) {
  const support::TemporaryFolder root;
  ::setenv("VANTLE_ROOT", root.path().c_str(), 1);
  // Nothing that is a file could be there.
  std::filesystem::create_directories(root.path().string() + ssc::RegistryUtil::RegistryPath() +
                                      "dynamic.fac_cal.gyro.thermal.bias");
  const Captured captured = run({"imu-thermal"});
  ::unsetenv("VANTLE_ROOT");
  EXPECT_EQ(captured.result, 0);
  EXPECT_EQ(captured.out,
            "Resetting IMU thermal calibration...\n"
            "WARN: Unable to delete the registry file dynamic.fac_cal.gyro.thermal.bias: Is a directory\n"
            "Reboot device for default calibration to take effect.\n");
}

}  // namespace
