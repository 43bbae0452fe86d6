#include "imu/ImuMultipointStage.h"

namespace {

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

TEST_F(ImuMultipointTest, ResetRaisesTheVersionsOfWhatItStoresAndKeepsTheRest) {
  options.reset = true;
  ASSERT_EQ(run({"imu-multipoint"}).result, 0);
  const sns_registry_data& accelData = script->registry.at(kAccelGroup);
  EXPECT_EQ(accelData.items(0).version(), 1);  // it had none
  EXPECT_EQ(accelData.items(0).subgrp().items(8).version(), 5);
  EXPECT_EQ(accelData.items(1).version(), 4);
  EXPECT_EQ(accelData.items(2).version(), 9);
  EXPECT_EQ(accelData.items(3).version(), 1);
  const sns_registry_data& gyroData = script->registry.at(kGyroGroup);
  EXPECT_EQ(gyroData.items(0).subgrp().items(8).version(), 4);
  EXPECT_EQ(gyroData.items(1).version(), 4);
  EXPECT_EQ(gyroData.items(3).name(), "mean_temp");
  EXPECT_EQ(gyroData.items(3).flt(), 0);
}

TEST_F(ImuMultipointTest, AResetThatCannotBeStoredPromisesNothing) {
  options.reset = true;
  script->registryWritesFail = true;
  const Captured captured = run({"imu-multipoint"});
  EXPECT_EQ(captured.result, -5);
  EXPECT_EQ(captured.out,
            "Searching for IMU...\nResetting IMU multi-point calibration...\n"
            "WARN: Failed to write registry. Error = -5\n");
  EXPECT_EQ(writes(), 1);
}

TEST_F(ImuMultipointTest, AResetWithoutItsGroupsIsTheLibrarysResult) {
  options.reset = true;
  const sns_registry_data accelData = script->registry.at(kAccelGroup);
  script->registry.erase(kAccelGroup);
  Captured captured = run({"imu-multipoint"});
  EXPECT_EQ(captured.result, -2);
  EXPECT_EQ(captured.out, "Searching for IMU...\n");
  script->registry[kAccelGroup] = accelData;
  script->registry.erase(kGyroGroup);
  captured = run({"imu-multipoint"});
  EXPECT_EQ(captured.result, -2);
  EXPECT_EQ(writes(), 1);
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
