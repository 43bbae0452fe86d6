#include <limits>
#include <string>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "mag/MagCalibrationFixture.h"
#include "ssc/Log.h"

namespace {

using testing::EndsWith;
using testing::HasSubstr;
using testing::Not;

constexpr int kInvalid = -22;
constexpr int kNotFound = -2;
constexpr int kIoError = -5;
constexpr int kNoData = -61;
constexpr const char* kSucceeded = "Magnetometer calibration succeeded.\n";
constexpr const char* kFailed = "Magnetometer calibration failed.\n";
constexpr float kNan = std::numeric_limits<float>::quiet_NaN();

TEST_F(MagCalibration, OfTheRawStreamStoresTheExcessOverTheReference) {
  // Given a bias that the raw stream does not have applied
  setItem("bias", {1, 2, 3});
  const Captured captured = run();
  EXPECT_EQ(captured.result, 0);
  EXPECT_EQ(captured.err, "");
  EXPECT_EQ(captured.out, R"(Searching for magnetometer...
Magnetometer calibration (dry run = 0) begins with raw samples.
Collecting samples...
WARN: The magnetometer has an existing calibration which may be overwritten
WARN: PREV_BIAS:       1.000000       2.000000       3.000000
MEAN:       40.000000      15.000000     -60.000000
STDEV:       0.502519       0.502519       0.502519
BIAS:       20.000000      15.000000     -20.000000
TEMP:        27.500000
Writing registry...
Magnetometer calibration succeeded.
)");
  EXPECT_EQ(numbersOf(group(), "bias"), (std::vector<float>{20, 15, -20}));
  EXPECT_EQ(versionOf(group(), "bias"), 5);
  EXPECT_EQ(versionOf(group(), "bias.x"), 5);
  EXPECT_EQ(ssc::RegistryUtil::FindDataItem("mean_temp", group())->flt(), 27.5F);
  EXPECT_EQ(versionOf(group(), "mean_temp"), 8);
  EXPECT_EQ(numbersOf(group(), "corr_mat"), (std::vector<float>{1, 0, 0, 0, 1, 0, 0, 0, 1}));
  EXPECT_EQ(script->countRequests(kMagRawSuid, ssc::kCalibrationChangedRequest), 1);
  EXPECT_EQ(script->countRequests(kMagSuid, ssc::kCalibrationChangedRequest), 0);
}

TEST_F(MagCalibration, OfTheCalibratedStreamAddsThePreviousBias) {
  withoutRawStream();
  setItem("bias", {1, 2, 3});
  const Captured captured = run();
  EXPECT_EQ(captured.result, 0);
  EXPECT_THAT(captured.out, HasSubstr("begins with calibrated samples.\n"));
  EXPECT_THAT(captured.out, HasSubstr("BIAS:       11.000000       7.000000      -7.000000\n"));
  EXPECT_EQ(numbersOf(group(), "bias"), (std::vector<float>{11, 7, -7}));
  EXPECT_EQ(script->countRequests(kMagSuid, ssc::kCalibrationChangedRequest), 1);
}

TEST_F(MagCalibration, LooksThroughTheStoredSoftIronMatrix) {
  setItem("corr_mat", {2, 0, 0, 0, 1, 0, 0, 0, 0.5});
  EXPECT_THAT(run().out, HasSubstr("BIAS:       30.000000      15.000000      20.000000\n"));
}

TEST_F(MagCalibration, RawStreamOfAnotherChipDoesNotCount) {
  raw().name = "OtherChip_0";
  const Captured captured = run();
  EXPECT_EQ(captured.result, 0);
  EXPECT_THAT(captured.out, HasSubstr("begins with calibrated samples.\n"));
}

TEST_F(MagCalibration, StreamsFiftyTimesASecondAndTheTemperatureFiveTimes) {
  const Captured captured = runWords({"mag", "20", "0", "40"}, {.quiet = false});
  EXPECT_THAT(captured.out, HasSubstr("\nMagnetometer Raw Samples:\n"));
  EXPECT_THAT(captured.out, HasSubstr("\nMagnetometer Temperature Samples:\n"));
  EXPECT_THAT(captured.out, HasSubstr("(count 100 @ ~50.000 Hz)\n"));
  EXPECT_THAT(captured.out, HasSubstr("(count 10 @ ~5.000 Hz)\n"));
}

TEST_F(MagCalibration, WithoutTheRawStreamNamesItsSamplesOtherwise) {
  withoutRawStream();
  EXPECT_THAT(runWords({"mag", "20", "0", "40"}, {.quiet = false}).out,
              HasSubstr("\nMagnetometer Samples:\n"));
}

class MagWithoutTemperature : public MagCalibration, public testing::WithParamInterface<DeviceType> {};

TEST_P(MagWithoutTemperature, StreamsPrintsAndStoresNone) {
  const CommandSettings settings{.deviceType = GetParam()};
  const Captured captured = run(settings);
  EXPECT_EQ(captured.result, 0);
  EXPECT_THAT(captured.out, Not(HasSubstr("TEMP")));
  EXPECT_TRUE(script->requestIdsTo(kMagTemperatureSuid).empty());
  EXPECT_EQ(versionOf(group(), "mean_temp"), 7);
}

TEST_P(MagWithoutTemperature, ResetLeavesTheStoredTemperatureAlone) {
  EXPECT_EQ(run({.deviceType = GetParam(), .reset = true}).result, 0);
  EXPECT_EQ(versionOf(group(), "mean_temp"), 7);
  EXPECT_EQ(versionOf(group(), "bias"), 5);
}

INSTANTIATE_TEST_SUITE_P(Devices, MagWithoutTemperature,
                         testing::Values(DeviceType::e4d4, DeviceType::whiskel));

TEST_F(MagCalibration, DropsSamplesBelowHighAccuracy) {
  ssc::setLogLevel(ssc::kLogDebug);
  raw().status = SNS_STD_SENSOR_SAMPLE_STATUS_ACCURACY_MEDIUM;
  const Captured captured = run();
  ssc::setLogLevel(ssc::kLogInfo);
  EXPECT_EQ(captured.result, kNoData);
  EXPECT_THAT(captured.out, HasSubstr("DEBUG: Dropping Raw Mag sample. Status = 2\n"));
  EXPECT_THAT(captured.out, EndsWith(kFailed));
  EXPECT_EQ(captured.err, "ERROR: No Magnetometer Raw samples were received\n");
  expectNothingStored();
}

TEST_F(MagCalibration, DropsCalibratedSamplesUnderTheirOwnName) {
  ssc::setLogLevel(ssc::kLogDebug);
  withoutRawStream();
  calibrated().status = SNS_STD_SENSOR_SAMPLE_STATUS_UNRELIABLE;
  const Captured captured = run();
  ssc::setLogLevel(ssc::kLogInfo);
  EXPECT_THAT(captured.out, HasSubstr("DEBUG: Dropping Mag sample. Status = 0\n"));
  EXPECT_EQ(captured.err, "ERROR: No Magnetometer samples were received\n");
}

TEST_F(MagCalibration, KeepsTemperaturesOfAnyAccuracy) {
  temperature().status = SNS_STD_SENSOR_SAMPLE_STATUS_ACCURACY_LOW;
  EXPECT_EQ(run().result, 0);
}

TEST_F(MagCalibration, LogsTheMatrixAndItsInverseForDebugging) {
  ssc::setLogLevel(ssc::kLogDebug);
  setItem("corr_mat", {2, 0, 0, 0, 4, 0, 0, 0, 0.5});
  const Captured captured = run();
  ssc::setLogLevel(ssc::kLogInfo);
  EXPECT_THAT(
      captured.out,
      HasSubstr("DEBUG: CORR_MAT:       2.000000       0.000000       0.000000       0.000000       4.000000"
                "       0.000000       0.000000       0.000000       0.500000\n"
                "DEBUG: INV_MAT:\n[ 0.5, 0, 0 ]\n[ 0, 0.25, 0 ]\n[ 0, 0, 2 ]\n"));
}

// The message has no newline, so that the next line follows on it.
TEST_F(MagCalibration, GoesOnWithoutTheFieldWhenTheMatrixHasNoInverse) {
  setItem("corr_mat", {0, 0, 0, 0, 0, 0, 0, 0, 0});
  const Captured captured = run();
  EXPECT_EQ(captured.result, 0);
  EXPECT_THAT(captured.out,
              HasSubstr("begins with raw samples.\nMatrix does not have a InverseCollecting samples...\n"));
  EXPECT_THAT(captured.out, HasSubstr("BIAS:       40.000000      15.000000     -60.000000\n"));
}

// Five readings of 2, −2, 2, −2 and 0 have a deviation of √(16 / 4).
TEST_F(MagCalibration, DeviationOfExactlyTheLimitIsTooNoisy) {
  sendRawReadings({{0, 2, 0}, {0, -2, 0}, {0, 2, 0}, {0, -2, 0}, {0, 0, 0}});
  const Captured captured = run();
  EXPECT_EQ(captured.result, kInvalid);
  EXPECT_EQ(captured.err, "ERROR: Sample noise is too high: 2.000000 >= 2.000000\n");
  EXPECT_THAT(captured.out, HasSubstr("STDEV:"));
  EXPECT_THAT(captured.out, Not(HasSubstr("BIAS:")));
  EXPECT_THAT(captured.out, EndsWith(kFailed));
  expectNothingStored();
}

TEST_F(MagCalibration, DeviationJustBelowTheLimitPasses) {
  sendRawReadings({{0, 1.99F, 0}, {0, -1.99F, 0}, {0, 1.99F, 0}, {0, -1.99F, 0}, {0, 0, 0}});
  EXPECT_EQ(run().result, 0);
}

TEST_F(MagCalibration, LimitIsCheckedAxisByAxis) {
  const Captured captured = runWords({"mag", "-l", "15", "--", "40", "-0.5", "-40"});
  EXPECT_EQ(captured.result, kInvalid);
  EXPECT_EQ(captured.err, "ERROR: Y-axis bias is too large: |15.500000| > 15.000000\n");
  EXPECT_THAT(captured.out, HasSubstr("TEMP:"));
  EXPECT_THAT(captured.out, EndsWith(kFailed));
  expectNothingStored();
}

TEST_F(MagCalibration, LimitMessageShowsTheSign) {
  EXPECT_EQ(runWords({"mag", "-l", "19", "--", "40", "15", "-40"}).err,
            "ERROR: Z-axis bias is too large: |-20.000000| > 19.000000\n");
}

TEST_F(MagCalibration, BiasOfExactlyTheLimitPasses) {
  EXPECT_EQ(runWords({"mag", "-l", "20", "--", "20", "0", "-40"}).result, 0);
}

TEST_F(MagCalibration, DryRunReportsButNeitherStoresNorNotifies) {
  setItem("bias", {1, 2, 3});
  const Captured captured = run({.dryRun = true});
  EXPECT_EQ(captured.result, 0);
  EXPECT_THAT(captured.out, HasSubstr("calibration (dry run = 1) begins"));
  EXPECT_THAT(captured.out,
              HasSubstr("WARN: The magnetometer has an existing calibration\nWARN: PREV_BIAS:"));
  EXPECT_THAT(captured.out, EndsWith(std::string("Skipping registry write due to dry run.\n") + kSucceeded));
  expectNothingStored();
}

TEST_F(MagCalibration, MissingItemsAreNamedAndNothingIsCollected) {
  for (const char* item : {"corr_mat", "bias"}) {  // once both are gone, the bias is what is missed
    removeItem(item);
    const Captured captured = run();
    EXPECT_EQ(captured.result, kInvalid);
    EXPECT_EQ(captured.err, std::string("ERROR: Invalid registry; missing \"") + item + "\"\n");
    EXPECT_THAT(captured.out, EndsWith(kFailed));
    EXPECT_THAT(captured.out, Not(HasSubstr("Collecting")));
  }
  expectNothingStored();
}

TEST_F(MagCalibration, ItemsOfTheWrongKindAreNamed) {
  removeItem("corr_mat");
  addFloatItem(&group(), "corr_mat", 1, 1);
  EXPECT_EQ(run().err, "ERROR: Invalid registry; \"corr_mat\" does not hold a 3x3 matrix\n");
  removeItem("bias");
  addFloatItem(&group(), "bias", 1, 1);
  const Captured captured = run();
  EXPECT_EQ(captured.result, kInvalid);
  EXPECT_EQ(captured.err, "ERROR: Invalid registry; \"bias\" does not hold a vector of 3\n");
  expectNothingStored();
}

TEST_F(MagCalibration, MatrixOfSevenEntriesIsRefused) {
  auto* const items = group().mutable_items(1)->mutable_subgrp()->mutable_items();
  items->RemoveLast();
  items->RemoveLast();
  const Captured captured = run();
  EXPECT_EQ(captured.result, kInvalid);
  EXPECT_EQ(captured.err, "ERROR: Invalid registry; \"corr_mat\" does not hold a 3x3 matrix\n");
}

TEST_F(MagCalibration, UnknownGroupEndsWithItsResult) {
  script->registry.clear();
  const Captured captured = run();
  EXPECT_EQ(captured.result, kNotFound);
  EXPECT_THAT(captured.out, EndsWith(kFailed));
}

TEST_F(MagCalibration, EventsWithTwoAxesAreDroppedAndSaidOnce) {
  raw().reading = [](int index) {
    return index < 10   ? std::vector<float>{1, 2}
           : index < 12 ? std::vector<float>{}
                        : std::vector<float>{40, 15, -60};
  };
  const Captured captured = run();
  EXPECT_EQ(captured.result, 0);
  EXPECT_THAT(captured.out, HasSubstr("WARN: Dropping Magnetometer Raw events with fewer than 3 values"));
  EXPECT_THAT(captured.out, HasSubstr("MEAN:       40.000000      15.000000     -60.000000\n"));
}

TEST_F(MagCalibration, FurtherValuesOfAnEventAreNoPartOfTheBias) {
  raw().reading = wobble({40, 15, -60, 7});
  const Captured captured = run();
  EXPECT_EQ(captured.result, 0);
  EXPECT_THAT(captured.out, HasSubstr("BIAS:       20.000000      15.000000     -20.000000\n"));
  EXPECT_EQ(numbersOf(group(), "bias"), (std::vector<float>{20, 15, -20}));
}

TEST_F(MagCalibration, ReadingThatIsNoNumberIsNeverStored) {
  raw().reading = [](int index) { return std::vector<float>{40, index == 50 ? kNan : 15, -60}; };
  const Captured captured = run();
  EXPECT_EQ(captured.result, kInvalid);
  EXPECT_THAT(captured.err, HasSubstr("ERROR: The magnetometer's bias is not a finite number: "));
  expectNothingStored();
}

TEST_F(MagCalibration, ReferenceThatIsNotFiniteIsNeverStored) {
  EXPECT_EQ(runWords({"mag", "inf", "0", "40"}).result, kInvalid);
  expectNothingStored();
}

TEST_F(MagCalibration, TemperatureThatIsNoNumberIsNeverStored) {
  temperature().reading = [](int) { return std::vector<float>{kNan}; };
  const Captured captured = run();
  EXPECT_EQ(captured.result, kInvalid);
  EXPECT_THAT(captured.err, HasSubstr("ERROR: The magnetometer's temperature is not a finite number: "));
  expectNothingStored();
}

TEST_F(MagCalibration, SilentTemperatureSensorIsNamed) {
  temperature().reading = nullptr;
  const Captured captured = run();
  EXPECT_EQ(captured.result, kNoData);
  EXPECT_EQ(captured.err, "ERROR: No Magnetometer Temperature samples were received\n");
  expectNothingStored();
}

// The deviation of one sample is not a number, which is below every limit.
TEST_F(MagCalibration, SingleSampleIsEnough) {
  sendRawReadings({{40, 15, -60}});
  const Captured captured = run();
  EXPECT_EQ(captured.result, 0);
  EXPECT_THAT(captured.out, HasSubstr("STDEV:"));
  EXPECT_EQ(numbersOf(group(), "bias"), (std::vector<float>{20, 15, -20}));
}

TEST_F(MagCalibration, MalformedEventEndsTheCalibration) {
  script->onRequest = [](ScriptedHub& hub, const sns_client_request_msg& request) {
    if (request.msg_id() != ssc::kStreamConfigRequest || ssc::SensorUid(request.suid()) != kMagRawSuid)
      return false;
    hub.SendEvent(std::chrono::milliseconds(20), kMagRawSuid, ssc::kSensorEvent, "\xff\xff");
    return true;
  };
  const Captured captured = run();
  EXPECT_EQ(captured.result, -2147483647);
  EXPECT_THAT(captured.out, EndsWith(kFailed));
  expectNothingStored();
}

TEST_F(MagCalibration, FailedWriteIsTheResult) {
  script->registryWritesFail = true;
  const Captured captured = run();
  EXPECT_EQ(captured.result, kIoError);
  EXPECT_THAT(captured.out, EndsWith(std::string("WARN: Failed to write registry. Error = -5\n") + kFailed));
  EXPECT_EQ(script->countRequests(kMagRawSuid, ssc::kCalibrationChangedRequest), 0);
}

TEST_F(MagCalibration, FailedNotificationIsOnlyAWarning) {
  raw().confirms = false;
  const Captured captured = run();
  EXPECT_EQ(captured.result, 0);
  EXPECT_THAT(captured.out,
              EndsWith(std::string("WARN: Unable to notify sensor of completed calibration\n"
                                   "WARN: A reboot may be required for the calibration to take effect\n") +
                       kSucceeded));
  EXPECT_EQ(numbersOf(group(), "bias"), (std::vector<float>{20, 15, -20}));
}

TEST_F(MagCalibration, NeedsAMagnetometerAndItsTemperatureSensor) {
  script->sensors.pop_back();
  const Captured captured = run();
  EXPECT_EQ(captured.result, kNotFound);
  EXPECT_EQ(captured.out, "Searching for magnetometer...\n");
  EXPECT_THAT(captured.err,
              HasSubstr("Unable to look up the magnetometer and its temperature sensor. Error = -2"));
  script->sensors.clear();
  EXPECT_THAT(run({.deviceType = DeviceType::whiskel}).err,
              HasSubstr("Unable to look up the magnetometer. Error = -2"));
}

}  // namespace
