#include <filesystem>

#include "imu/ImuMultipointStage.h"

namespace {

using testing::HasSubstr;
using testing::Not;
using testing::StartsWith;

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

}  // namespace
