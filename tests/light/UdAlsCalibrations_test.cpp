// Delay scans, the display's TE2 table, and what the records of a working file lead to.
#include <limits>

#include <gmock/gmock.h>

#include "light/UdAlsSteps.h"

namespace {

using testing::ElementsAre;
using testing::EndsWith;
using testing::HasSubstr;
using testing::StartsWith;

constexpr float kNan = std::numeric_limits<float>::quiet_NaN();

class UdAlsCalibrations : public UdAlsSteps {
 protected:
  /// Three steps of a scan whose clear level is least at `delay`.
  static std::vector<SampleData> parabolaAround(float delay, float step) {
    return {makeUdAlsRecord({{kUdAlsDelay, delay - step}, {kUdAlsMeanClear, 5}}),
            makeUdAlsRecord({{kUdAlsDelay, delay}, {kUdAlsMeanClear, 3}}),
            makeUdAlsRecord({{kUdAlsDelay, delay + step}, {kUdAlsMeanClear, 5}})};
  }
};

// Delay scans.

TEST_F(UdAlsCalibrations, AScanAddsInSinglePrecision) {
  run({"-s", "1", "caldelay", "100", "3", "0.1", "0.8", "0.1"});
  std::vector<float> wanted;
  for (float delay = 0.1F; delay <= 0.8F; delay += 0.1F) wanted.push_back(delay);
  EXPECT_EQ(delaysAsked(), wanted);
  EXPECT_EQ(wanted.size(), 7U);  // the eighth sum lies above 0.8; in double precision it would not
  ASSERT_EQ(records().size(), wanted.size());
  for (std::size_t i = 0; i < wanted.size(); ++i) EXPECT_EQ(records()[i][kUdAlsDelay], wanted[i]);
}

TEST_F(UdAlsCalibrations, AScanDoesNotBeginWithOldRecordsThatCannotBeRemoved) {
  std::filesystem::create_directories(folder.path() / kDataFile / "occupied");
  const Captured captured = run({"caldelay", "100", "3", "0", "5", "1"});
  EXPECT_EQ(captured.result, -1);
  EXPECT_THAT(captured.err, HasSubstr("ERROR: Unable to remove the data file: "));
  EXPECT_THAT(captured.out, EndsWith("Calibration failed.\n"));
  EXPECT_EQ(script->countRequests(light, kStream), 0);
}

TEST_F(UdAlsCalibrations, AScanWhoseStartLiesBeyondItsEndComputesFromNothing) {
  giveRecords({makeUdAlsRecord({})});
  const Captured captured = run({"caldelay", "100", "3", "5", "4", "1"});
  EXPECT_EQ(captured.result, -1);
  EXPECT_EQ(captured.out,
            "Searching for ambient light sensor...\nDelay calibration...\nRemoving data file...\n"
            "Reading data file...\nCalibration failed.\n");
  EXPECT_EQ(content("persist/sensors/als_delay_cal.csv"), "lux,c,r,g,b,ir,gain,int_t,delay\n");
}

TEST_F(UdAlsCalibrations, AScanThatClearsAtEachStepHasOneRecordAtItsEnd) {
  const Captured captured = run({"-r", "-s", "1", "caldelay", "100", "3", "1", "3", "1"});
  EXPECT_EQ(captured.result, -61);
  EXPECT_THAT(captured.err, HasSubstr("Insufficient data to compute delay\n"));
}

TEST_F(UdAlsCalibrations, AScanOfTheTe2SignalWaitsForThePanelAndWritesItsEdges) {
  give(kTe2Node, std::string(39, 'x'));
  readClearOfEachStep({5, 3, 4});
  const Captured captured = run({"-s", "1", "caldelay_te2", "100", "3", "1.5", "20", "40.5", "10.25"});
  EXPECT_EQ(captured.result, 0) << captured.err;
  EXPECT_THAT(captured.out, HasSubstr("ALS Delay = 1.500000\nRising  Edge Delay : 0018\n"
                                      "Falling Edge Delay : 0020\nSet TE2 succeeded.\n\n"));
  EXPECT_THAT(captured.out, HasSubstr("Rising  Edge Delay : 0028\nFalling Edge Delay : 0030\n"));
  EXPECT_THAT(captured.out, HasSubstr("Rising  Edge Delay : 0038\nFalling Edge Delay : 0040\n"));
  EXPECT_THAT(delaysAsked(), ElementsAre(1.5F, 1.5F, 1.5F));
  ASSERT_EQ(records().size(), 3U);
  EXPECT_EQ(records()[1][kUdAlsDelay], 30.25F);
  EXPECT_EQ(records()[1][kUdAlsBrightness], -1.0F);
  EXPECT_THAT(content("persist/sensors/als_te2_delay_cal.csv"), HasSubstr(",30.250000\n"));
  // The vertex lies at 31.958; the node keeps what the shorter table does not reach.
  EXPECT_THAT(captured.out,
              EndsWith("Delay of minimum clear value:      32.000000\nReading registry...\n"
                       "Start setting TE2 table...\nWriting registry...\nCalibration succeeded.\n"));
  EXPECT_THAT(content(kTe2Node), StartsWith("2055 -1151 3240 32 2354 13 2354 13"));
  EXPECT_EQ(stored("delay_te2")->flt(), 32.0F);
  EXPECT_EQ(stored("delay"), nullptr);
}

TEST_F(UdAlsCalibrations, AScanOfTheTe2SignalEndsWhereThePanelCannotBeWritten) {
  const Captured captured = run({"caldelay_te2", "100", "3", "1.5", "20", "40", "10"});
  EXPECT_EQ(captured.result, -1);
  EXPECT_EQ(captured.err, "ERROR: Failed to open panel register file.\n");
  EXPECT_THAT(captured.out, EndsWith("Set TE2 failed.\n\n"));
  EXPECT_THAT(delaysAsked(), ElementsAre());
}

TEST_F(UdAlsCalibrations, TheVertexOfAScanIsStored) {
  readClearOfEachStep({5, 3, 5});
  const Captured captured = run({"-s", "1", "caldelay", "100", "3", "1", "3", "1"});
  EXPECT_EQ(captured.result, 0) << captured.err;
  EXPECT_THAT(captured.out, HasSubstr("Delay of minimum clear value:       2.000000\nReading registry...\n"
                                      "Writing registry...\nCalibration succeeded.\n"));
  EXPECT_EQ(stored("delay")->flt(), 2.0F);
  EXPECT_EQ(stored("delay")->version(), 1);
}

TEST_F(UdAlsCalibrations, AFlatScanHasNoBestDelay) {
  script->sensors[0].reading = [](int) { return std::vector<float>{0, 0, 0, 0, 0, 0, 3, 100}; };
  const Captured captured = run({"-s", "1", "caldelay", "100", "3", "1", "3", "1"});
  EXPECT_EQ(captured.result, -22);
  EXPECT_THAT(captured.err, HasSubstr("The delay of the minimum clear value is not a finite number: nan"));
  EXPECT_EQ(writes(), 0);
}

TEST_F(UdAlsCalibrations, AParabolaThatOpensDownwardsGivesTheDelayOfTheMostLight) {
  readClearOfEachStep({3, 5, 3});
  const Captured captured = run({"-s", "1", "caldelay", "100", "3", "1", "3", "1"});
  EXPECT_EQ(captured.result, 0) << captured.err;
  EXPECT_EQ(captured.err, "");
  EXPECT_EQ(stored("delay")->flt(), 2.0F);
}

TEST_F(UdAlsCalibrations, ADelayIsStoredInModesThatScannedOneOnly) {
  EXPECT_EQ(run({"-s", "1", "sample"}).result, 0);
  giveRecords(parabolaAround(2, 1));
  const Captured captured = capture([&] { return calibrator->DelayCalibrate(); });
  EXPECT_EQ(captured.result, -22);
  EXPECT_EQ(captured.err, "ERROR: Invalid mode\n");
  EXPECT_THAT(captured.out, EndsWith("Delay of minimum clear value:       2.000000\nReading registry...\n"
                                     "Calibration failed.\n"));
  EXPECT_EQ(writes(), 0);
}

// The display's TE2 table.

class UdAlsTe2Calibration : public UdAlsCalibrations {
 protected:
  /// A scan with a node that takes its table; what it found is then replaced by these records.
  void scanAndGive(const std::vector<SampleData>& records) {
    give(kTe2Node, std::string(39, 'x'));
    readClearOfEachStep({5, 3, 5});
    ASSERT_EQ(run({"-s", "1", "caldelay_te2", "100", "3", "1.5", "20", "40", "10"}).result, 0);
    giveRecords(records);
  }
  [[nodiscard]] Captured calibrate() {
    return capture([this] { return calibrator->DelayCalibrate(); });
  }
};

TEST_F(UdAlsTe2Calibration, RoundsTheBestEdgeToAWholeLine) {
  scanAndGive(parabolaAround(1500.4F, 100));
  const Captured captured = calibrate();
  EXPECT_EQ(captured.result, 0) << captured.err;
  EXPECT_THAT(captured.out, HasSubstr("Delay of minimum clear value:    1500.000000\n"));
  EXPECT_EQ(stored("delay_te2")->flt(), 1500.0F);
  EXPECT_THAT(content(kTe2Node), StartsWith("2055 317 3240 1500 2354 13 2354 13"));
}

TEST_F(UdAlsTe2Calibration, IsStoredThoughTheNodeCannotBeOpened) {
  scanAndGive(parabolaAround(1500, 100));
  std::filesystem::remove(folder.path() / kTe2Node);
  const Captured captured = calibrate();
  EXPECT_EQ(captured.result, 0);
  EXPECT_EQ(captured.err, "ERROR: Failed to open TE2 table node.\n");
  EXPECT_THAT(captured.out, EndsWith("Reading registry...\nWriting registry...\nCalibration succeeded.\n"));
  EXPECT_EQ(stored("delay_te2")->flt(), 1500.0F);
}

TEST_F(UdAlsTe2Calibration, IsStoredThoughTheNodeRefusesTheTable) {
  scanAndGive(parabolaAround(1500, 100));
  std::filesystem::remove(folder.path() / kTe2Node);
  std::filesystem::create_symlink("/dev/full", folder.path() / kTe2Node);
  const Captured captured = calibrate();
  EXPECT_EQ(captured.result, 0);
  EXPECT_EQ(captured.err, "ERROR: Failed to close TE2 table node.\n");
  EXPECT_THAT(captured.out, EndsWith("Reading registry...\nStart setting TE2 table...\nWriting registry...\n"
                                     "Calibration succeeded.\n"));
  EXPECT_EQ(stored("delay_te2")->flt(), 1500.0F);
}

TEST_F(UdAlsCalibrations, SettingTheTe2TableWaitsHalfASecond) {
  give(kTe2Node, std::string(39, 'x'));
  const Captured captured = run({"set_te2", "8", "10"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_EQ(captured.out,
            "Searching for ambient light sensor...\nRising  Edge Delay : 0008\n"
            "Falling Edge Delay : 0010\nSet TE2 succeeded.\n\n");
  EXPECT_EQ(content(kTe2Node), "0008 0010 0008 0010 0008 0010 0008 0010");
  EXPECT_EQ(elapsed(), Milliseconds(500));
}

TEST_F(UdAlsCalibrations, ATe2TableThatCannotBeWrittenIsSaidAndNoFailure) {
  const Captured missing = run({"set_te2", "8", "10"});
  EXPECT_EQ(missing.result, 0);
  EXPECT_EQ(missing.err, "ERROR: Failed to open panel register file.\n");
  EXPECT_THAT(missing.out, EndsWith("Set TE2 failed.\n\n"));

  // The driver's refusal shows when what was written reaches it.
  std::filesystem::create_directories((folder.path() / kTe2Node).parent_path());
  std::filesystem::create_symlink("/dev/full", folder.path() / kTe2Node);
  const Captured full = run({"set_te2", "8", "10"});
  EXPECT_EQ(full.result, 0);
  EXPECT_EQ(full.err, "ERROR: Failed to close panel register file. Error: No space left on device\n");
  EXPECT_THAT(full.out, EndsWith("Set TE2 failed.\n\n"));
}

// Computations on a working file that is given.

TEST_F(UdAlsCalibrations, AComputationThatNeedsMoreRecordsSaysWhat) {
  giveRecords({makeUdAlsRecord({{kUdAlsMeanGain, 11}})});
  const std::pair<std::vector<const char*>, const char*> cases[] = {
      {{"-W", "calgain", "100", "3"}, "Insufficient data to compute gain ratio"},
      {{"-W", "calgain", "ir", "100", "3"}, "Insufficient data to compute IR gain ratio"},
      {{"-W", "pwm", "100", "3", "128"}, "Insufficient data to compute PWM boundary"},
      {{"-W", "red", "128"}, "Insufficient data to compute screen pattern coefficients"},
  };
  for (const auto& [words, message] : cases) {
    const Captured captured = run(words);
    EXPECT_EQ(captured.result, -61) << message;
    EXPECT_EQ(captured.err, std::string("ERROR: ") + message + '\n');
    EXPECT_THAT(captured.out, EndsWith("INFO: Got 1 records\nCalibration failed.\n"));
  }
}

TEST_F(UdAlsCalibrations, TheLuxScaleNeedsARecordOfAnyKind) {
  EXPECT_EQ(run({"-s", "1", "sample"}).result, 0);
  giveRecords({});
  const Captured none = capture([&] { return calibrator->CalibrateLux(); });
  EXPECT_EQ(none.result, -61);
  EXPECT_EQ(none.err, "ERROR: Insufficient data to compute lux coefficients\n");
  EXPECT_THAT(none.out, EndsWith("INFO: Got 0 records\nCalibration failed.\n"));

  giveRecords({makeUdAlsRecord({{kUdAlsReferenceLux, 100}, {kUdAlsMeanLux, 50}}),
               makeUdAlsRecord({{kUdAlsReferenceLux, 200}, {kUdAlsMeanLux, 0}})});
  const Captured dark = capture([&] { return calibrator->CalibrateLux(); });
  EXPECT_EQ(dark.result, 0);
  EXPECT_THAT(dark.out, HasSubstr("INFO: Got 2 records\nLUX_SCALE:       1.000000\nWriting registry...\n"));
  EXPECT_EQ(stored("scale")->version(), 4);
}

TEST_F(UdAlsCalibrations, ATornWorkingFileIsComputedFromByNobody) {
  const std::vector<SampleData> steps = parabolaAround(2, 1);
  std::string bytes;
  for (const SampleData& record : steps) appendFloats(record, &bytes);
  give(kDataFile, bytes + "torn");
  EXPECT_EQ(run({"-s", "1", "sample"}).result, 0);
  int (UdAlsCalibrator::*const computations[])() = {
      &UdAlsCalibrator::CalibrateLux,    &UdAlsCalibrator::GainCalibrate,
      &UdAlsCalibrator::IRGainCalibrate, &UdAlsCalibrator::PwmCalibrate,
      &UdAlsCalibrator::DelayCalibrate,  &UdAlsCalibrator::ScreenPatternCalibrate};
  for (const auto computation : computations) {
    const Captured captured = capture([&] { return (calibrator.get()->*computation)(); });
    EXPECT_EQ(captured.result, -61);
    EXPECT_EQ(captured.err, "ERROR: Data file is incomplete\n");
    EXPECT_EQ(captured.out, "Reading data file...\nCalibration failed.\n");
  }
  EXPECT_EQ(writes(), 0);
}

TEST_F(UdAlsCalibrations, AComputationWithoutAGroupFails) {
  script->registry.clear();
  giveRecords({makeUdAlsRecord({}), makeUdAlsRecord({{kUdAlsBrightness, 8}})});
  for (const auto& words : {std::vector<const char*>{"-W", "calgain", "100", "3"},
                            std::vector<const char*>{"-W", "calgain", "ir", "100", "3"},
                            std::vector<const char*>{"-W", "pwm", "100", "3", "128"},
                            std::vector<const char*>{"-W", "red", "128"}}) {
    const Captured captured = run(words);
    EXPECT_EQ(captured.result, -2) << words[1];
    EXPECT_THAT(captured.out, EndsWith("Reading registry...\nCalibration failed.\n")) << words[1];
  }
}

TEST_F(UdAlsCalibrations, ResultsThatAreNoFiniteNumberAreNotStored) {
  giveRecords({makeUdAlsRecord({{kUdAlsMeanGain, 8}, {kUdAlsMeanBlue, 1e-30F}, {kUdAlsMeanInfrared, 1e-30F}}),
               makeUdAlsRecord({{kUdAlsMeanGain, 11},
                                {kUdAlsMeanBlue, 1e30F},
                                {kUdAlsMeanInfrared, 1e30F},
                                {kUdAlsMeanClear, -1},
                                {kUdAlsBrightness, kNan}})});
  for (const auto& words : {std::vector<const char*>{"-W", "calgain", "100", "3"},
                            std::vector<const char*>{"-W", "calgain", "ir", "100", "3"},
                            std::vector<const char*>{"-W", "pwm", "100", "3", "128"},
                            std::vector<const char*>{"-W", "red", "128"}}) {
    const Captured captured = run(words);
    EXPECT_EQ(captured.result, -22) << words[1];
    EXPECT_THAT(captured.err, HasSubstr("is not a finite number")) << words[1];
    EXPECT_THAT(captured.out, EndsWith("Calibration failed.\n")) << words[1];
  }
  EXPECT_EQ(writes(), 0);
}

TEST_F(UdAlsCalibrations, GainItemsAreMadeInTheirOrder) {
  giveRecords({makeUdAlsRecord({{kUdAlsMeanGain, 8}, {kUdAlsMeanClear, 100}}),
               makeUdAlsRecord({{kUdAlsMeanGain, 11}, {kUdAlsMeanClear, 790}})});
  EXPECT_EQ(run({"-W", "calgain", "100", "3"}).result, 0);
  std::vector<std::string> names;
  for (const auto& item : script->registry.at(kGroup).items()) names.push_back(item.name());
  EXPECT_THAT(names,
              ElementsAre("scale", "c_gain_ratio_10", "c_gain_ratio_9", "c_gain_ratio_8", "r_gain_ratio_10",
                          "r_gain_ratio_9", "r_gain_ratio_8", "g_gain_ratio_10", "g_gain_ratio_9",
                          "g_gain_ratio_8", "b_gain_ratio_10", "b_gain_ratio_9", "b_gain_ratio_8"));
  EXPECT_EQ(stored("c_gain_ratio_8")->flt(), 7.9F);
  EXPECT_EQ(stored("b_gain_ratio_9")->flt(), 4.0F);
}

TEST_F(UdAlsCalibrations, AnotherKindOfItemBecomesTheKindOfTheResult) {
  addFloatItem(&script->registry[kGroup], "pwm_boundary", 60, 4);
  giveRecords({makeUdAlsRecord({{kUdAlsBrightness, 80.9F}}), makeUdAlsRecord({{kUdAlsBrightness, 120.9F}})});
  EXPECT_EQ(run({"-W", "pwm", "100", "3", "128"}).result, 0);
  EXPECT_TRUE(stored("pwm_boundary")->has_sint());
  EXPECT_EQ(stored("pwm_boundary")->sint(), 120);
  EXPECT_EQ(stored("pwm_boundary")->version(), 5);
}

}  // namespace
