#include <array>
#include <filesystem>

#include "imu/ImuMultipointStage.h"
#include "support/FileSizeLimit.h"

namespace {

using testing::HasSubstr;
using testing::SizeIs;
using testing::StartsWith;

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

}  // namespace
