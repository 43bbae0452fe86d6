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
