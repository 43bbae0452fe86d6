// Steps, their files, lux and verification, where a whole run cannot bring it about or would hide it.
#include "light/UdAlsSteps.h"

#include <limits>

#include <gmock/gmock.h>

#include "support/FileSizeLimit.h"

namespace {

using testing::EndsWith;
using testing::HasSubstr;
using testing::Not;

constexpr int kShortFile = -2147483646;
constexpr float kNan = std::numeric_limits<float>::quiet_NaN();

// Arguments.

TEST_F(UdAlsSteps, EachRunStartsFromTheDefaults) {
  EXPECT_EQ(run({"-s", "3", "-r", "100", "4000", "d65", "128"}).result, 0);
  const auto runAgain = [&](std::vector<std::string> words) {
    std::vector<char*> argv;
    for (std::string& word : words) argv.push_back(word.data());
    argv.push_back(nullptr);
    Calibrator::Arguments arguments = globals;
    arguments.command = "als";
    arguments.argc = static_cast<std::int32_t>(words.size());
    arguments.argv = argv.data();
    return capture([&] { return calibrator->Run(arguments); });
  };
  const Captured again = runAgain({"als", "200"});
  EXPECT_EQ(again.result, 0) << again.err;
  EXPECT_THAT(again.out, Not(HasSubstr("Searching")));
  const std::vector<SampleData> read = records();
  ASSERT_EQ(read.size(), 2U);  // -r is forgotten
  EXPECT_EQ(read[1], SampleData({200, -1, -1, 0, 50, 10, 20, 30, 40, 5, 8, 1000}));
  EXPECT_THAT(content("persist/sensors/als.csv"), HasSubstr(",k,0.000000\n"));
  EXPECT_EQ(runAgain({"als"}).err.substr(0, 37), "ERROR: No reference lux was specified");
}

TEST_F(UdAlsSteps, AreForDevicesWithTheSensorAndTheClassicFamily) {
  for (const int type : {1, 2, 6, 7, -1, 1000}) {
    globals.deviceType = static_cast<DeviceType>(type);
    const Captured captured = run({"100"});
    EXPECT_EQ(captured.result, -38) << type;
    EXPECT_EQ(captured.err, "ERROR: 'als' command is not supported for the specified device type\n");
  }
  for (const int type : {0, 3, 4, 5}) {
    globals.deviceType = static_cast<DeviceType>(type);
    EXPECT_EQ(run({"100"}).result, 0) << type;
  }
}

// Files of a step.

TEST_F(UdAlsSteps, OnlyALuxStepCanHaveALabelInItsLog) {
  EXPECT_EQ(run({"-s", "1", "100", "4000", "d65", "128"}).result, 0);
  EXPECT_THAT(content("persist/sensors/als.csv"), EndsWith(",d65,128.000000\n"));
  EXPECT_EQ(run({"-s", "1", "white", "50"}).result, 0);
  EXPECT_THAT(content("persist/sensors/als_pattern_cal.csv"), EndsWith(",k,50.000000\n"));
  EXPECT_EQ(run({"-s", "1", "pwm", "100", "3", "128"}).result, 0);
  EXPECT_THAT(content("persist/sensors/als_pwm_cal.csv"), EndsWith(",k,128.000000\n"));
  EXPECT_EQ(run({"-s", "1", "calgain", "100", "3"}).result, 0);
  EXPECT_THAT(content("persist/sensors/als_gain_cal.csv"), EndsWith(",k,0.000000\n"));
}

TEST_F(UdAlsSteps, AStepWithoutLogFolderStillMakesItsRecord) {
  std::filesystem::remove_all(folder.path() / "persist");
  const Captured captured = run({"-s", "2", "100"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_EQ(
      captured.err,
      "ERROR: Failed to open als calibration data file\nERROR: Failed to open als calibration data file\n");
  EXPECT_THAT(captured.out, HasSubstr("WARN: Unable to start the log /persist/sensors/als.csv\n"));
  EXPECT_EQ(records().size(), 1U);
}

TEST_F(UdAlsSteps, ADelayStepWithoutLogFolderSaysNothingOfIt) {
  std::filesystem::remove_all(folder.path() / "persist");
  const Captured captured = run({"-s", "1", "caldelay", "100", "3", "1", "2", "1"});
  EXPECT_EQ(captured.err, "ERROR: Insufficient data to compute quadratic delay fit\n");
  EXPECT_EQ(records().size(), 2U);
}

TEST_F(UdAlsSteps, AStepWithoutDataFolderFails) {
  std::filesystem::remove_all(folder.path() / "data");
  const Captured captured = run({"100"});
  EXPECT_EQ(captured.result, -1);
  EXPECT_EQ(captured.err, "ERROR: Failed to open als calibration data file\n");
  EXPECT_THAT(captured.out, EndsWith("Saving data to file...\nCalibration failed.\n"));
  // The samples were logged before, and stay so.
  EXPECT_THAT(
      content("persist/sensors/als.csv"),
      EndsWith(",10.000000,20.000000,30.000000,40.000000,5.000000,8.000000,1000.000000,k,0.000000\n"));
}

TEST_F(UdAlsSteps, AFullDiskIsSaidAndLeavesNoHalfRecord) {
  // Larger than all that this test program itself writes meanwhile.
  giveRecords(std::vector<SampleData>(100, makeUdAlsRecord({})));
  const support::FileSizeLimit disk(100 * 48 + 47);
  const Captured captured = run({"-s", "1", "100"});
  EXPECT_EQ(captured.result, kShortFile);
  EXPECT_THAT(captured.err, HasSubstr("ERROR: Failed to write data to file\n"));
  EXPECT_EQ(records().size(), 100U);
}

TEST_F(UdAlsSteps, AMeanThatIsNoNumberIsNotKept) {
  script->sensors[0].reading = [](int) { return std::vector<float>{50, kNan, 20, 30, 40, 5, 8, 1000}; };
  const Captured captured = run({"100"});
  EXPECT_EQ(captured.result, -22);
  EXPECT_THAT(captured.err, HasSubstr("A mean of the light sensor's samples is not a finite number"));
  EXPECT_EQ(content(kDataFile), "(none)");
  EXPECT_THAT(content("persist/sensors/als.csv"), HasSubstr("nan"));  // to be looked into
}

TEST_F(UdAlsSteps, ShortDataIsNotSaved) {
  ASSERT_EQ(run({"-s", "1", "100"}).result, 0);
  const Captured one = capture([&] { return calibrator->SaveData({1}); });
  EXPECT_EQ(one.result, -61);
  EXPECT_EQ(one.err, "ERROR: Insufficient data (only 1 item)\n");
  EXPECT_EQ(one.out, "");
  const Captured seven = capture([&] {
    return calibrator->SaveDataToCsv("/persist/sensors/als.csv", {1, 2, 3, 4, 5, 6, 7});
  });
  EXPECT_EQ(seven.result, -61);
  EXPECT_EQ(seven.err, "ERROR: Insufficient data (only 7 items)\n");
  const Captured none =
      capture([&] { return calibrator->SaveDelayDataToCsv("/persist/sensors/als.csv", SampleData()); });
  EXPECT_EQ(none.err, "ERROR: Insufficient data (only 0 items)\n");
}

TEST_F(UdAlsSteps, LoadingTellsWhatIsWrongWithTheFile) {
  ASSERT_EQ(run({"-s", "1", "100"}).result, 0);
  std::vector<SampleData> read;
  const auto load = [&] { return capture([&] { return calibrator->LoadData(&read); }); };
  EXPECT_EQ(load().out, "Reading data file...\nINFO: Got 1 records\n");

  give(kDataFile, std::string(100, '\0'));
  EXPECT_EQ(load().result, -61);
  EXPECT_EQ(read.size(), 2U);
  EXPECT_EQ(load().err, "ERROR: Data file is incomplete\n");

  std::filesystem::remove(folder.path() / kDataFile);
  EXPECT_EQ(load().result, -1);
  EXPECT_EQ(load().err, "ERROR: Failed to open calibration data file\n");
  EXPECT_EQ(read.size(), 2U) << "what was read before stays";

  std::filesystem::create_directory(folder.path() / kDataFile);
  EXPECT_EQ(load().result, kShortFile);
  EXPECT_EQ(load().err, "ERROR: Failed to read data from file\n");

  std::filesystem::remove(folder.path() / kDataFile);
  give(kDataFile, std::string(kMaxUdAlsDataFileBytes + 1, '\0'));
  EXPECT_EQ(load().result, -22);
  EXPECT_EQ(load().err, "ERROR: Data file is larger than 16777216 bytes\n");

  const Captured null = capture([&] { return calibrator->LoadData(nullptr); });
  EXPECT_EQ(null.result, -22);
  EXPECT_EQ(null.err, "ERROR: Cannot load data into null vector\n");
}

// Lux.

TEST_F(UdAlsSteps, TheLastStepOfALuxCalibrationMeasuresWithTheNeutralScale) {
  addFloatItem(&script->registry[kGroup], "other", 7, 1);
  script->registry[kGroup].mutable_items(0)->set_flt(2.5F);
  // The sensor applies what the registry holds.
  script->sensors[0].reading = [this](int) {
    return reading(50 * script->registry.at(kGroup).items(0).flt());
  };
  giveRecords({makeUdAlsRecord({}), makeUdAlsRecord({})});
  const Captured captured = run({"-w", "100"});
  EXPECT_EQ(captured.result, 0) << captured.err;
  EXPECT_THAT(captured.out, HasSubstr("LUX_MEAN:      125.000000\n"));
  EXPECT_THAT(captured.out, HasSubstr("LUX_MEAN:       50.000000\n"));
  EXPECT_THAT(captured.out, EndsWith("INFO: Got 1 records\nLUX_SCALE:       2.000000\nWriting registry...\n"
                                     "Calibration succeeded.\n"));
  EXPECT_EQ(stored("scale")->flt(), 2.0F);
  EXPECT_EQ(stored("scale")->version(), 5);  // neutral, then calibrated
  EXPECT_EQ(script->countRequests(light, 610), 2);
}

TEST_F(UdAlsSteps, AScaleOfOneOfEitherKindIsNeutralAndAnAbsentOneIsNot) {
  const auto writesWith = [this](const std::function<void(sns_registry_data_item*)>& scale) {
    sns_registry_data group;
    if (scale) {
      group.add_items()->set_name("scale");
      scale(group.mutable_items(0));
    }
    script->registry[kGroup] = group;
    script->requests.clear();
    EXPECT_EQ(run({"-s", "1", "-W", "100"}).result, 0);
    return writes();
  };
  EXPECT_EQ(writesWith([](auto* item) { item->set_flt(1); }), 1);
  EXPECT_EQ(writesWith([](auto* item) { item->set_sint(1); }), 1);
  EXPECT_TRUE(stored("scale")->has_flt());
  EXPECT_EQ(writesWith([](auto* item) { item->set_flt(1.0001F); }), 2);
  EXPECT_EQ(writesWith([](auto* item) { item->set_sint(2); }), 2);
  EXPECT_EQ(writesWith([](auto* item) { item->set_str("1"); }), 2);
  EXPECT_EQ(writesWith(nullptr), 2);
}

TEST_F(UdAlsSteps, ADryRunSaysThatTheStoredScaleIsStillApplied) {
  script->registry[kGroup].mutable_items(0)->set_flt(2.5F);
  globals.dryRun = true;
  const Captured captured = run({"-s", "1", "-W", "100"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_THAT(captured.out, HasSubstr("WARN: The samples still carry the stored scale due to dry run\n"));
  EXPECT_THAT(captured.out, EndsWith("LUX_SCALE:       2.000000\n"
                                     "Skipping registry write due to dry run.\nCalibration succeeded.\n"));
  EXPECT_EQ(writes(), 0);
  EXPECT_EQ(script->countRequests(light, 610), 0);
  EXPECT_EQ(records().size(), 1U);  // collected all the same
}

TEST_F(UdAlsSteps, WithoutAnAnswerToTheNeutralScaleNothingIsMeasuredWithIt) {
  script->registry[kGroup].mutable_items(0)->set_flt(2.5F);
  script->sensors[0].confirms = false;
  giveRecords({makeUdAlsRecord({})});
  const Captured captured = run({"-W", "100"});
  EXPECT_EQ(captured.result, -110);
  EXPECT_EQ(captured.err, "ERROR: Unable to make the sensor measure without its scale. Error = -110\n");
  EXPECT_THAT(captured.out, Not(HasSubstr("Collecting samples")));
  EXPECT_EQ(records().size(), 1U);
}

TEST_F(UdAlsSteps, AScaleThatCannotBeStoredFailsTheCalibration) {
  script->registryWritesFail = true;
  const Captured captured = run({"-W", "100"});
  EXPECT_EQ(captured.result, -5);
  EXPECT_THAT(captured.out, EndsWith("Writing registry...\nWARN: Failed to write registry. Error = -5\n"
                                     "Calibration failed.\n"));
}

TEST_F(UdAlsSteps, ASensorThatDoesNotConfirmIsWarnedAbout) {
  script->sensors[0].confirms = false;
  const Captured captured = run({"-W", "100"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_THAT(captured.out, EndsWith("WARN: Unable to notify sensor of completed calibration\n"
                                     "WARN: A reboot may be required for the calibration to take effect\n"
                                     "Calibration succeeded.\n"));
}

// Verification.

TEST_F(UdAlsSteps, VerificationOfOtherStepsCollectsInSilence) {
  globals.quiet = false;
  const Captured captured = run({"-s", "1", "-v", "5", "white", "20"});
  EXPECT_EQ(captured.result, 0) << captured.err;
  EXPECT_EQ(captured.out,
            "Searching for ambient light sensor...\nDisplay pattern noise calibration...\n"
            "Collecting samples...\nSaving data to file...\n");
  EXPECT_EQ(records().size(), 1U);

  script->sensors[0].reading = nullptr;
  const Captured silent = run({"-s", "1", "-v", "5", "white", "20"});
  EXPECT_EQ(silent.result, -110);
  EXPECT_THAT(silent.out, EndsWith("Collecting samples...\n"));
}

TEST_F(UdAlsSteps, VerificationGoesBeforeWriting) {
  for (const char* option : {"-w", "-W"}) {
    const Captured captured = run({"-s", "1", option, "-v", "5", "50"});
    EXPECT_EQ(captured.result, 0) << captured.err;
    EXPECT_THAT(captured.out, EndsWith("Verification succeeded.\n"));
    EXPECT_EQ(writes(), 0);
  }
}

TEST_F(UdAlsSteps, VerificationAppliesTheCorrectionFactorToTheLuxAlone) {
  addFloatItem(&script->registry[kGroup], "corr_factor", 2, 1);
  globals.quiet = false;
  const Captured captured = run({"-s", "2", "-v", "1", "100"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_THAT(captured.out, HasSubstr("     100.000000      10.000000      20.000000"));
  EXPECT_THAT(captured.out, EndsWith("MEAN:      100.000000\nSTDEV:       0.000000\nDIFF:        0.000000%\n"
                                     "Verification succeeded.\n"));
}

TEST_F(UdAlsSteps, ACorrectionFactorOfAnotherKindIsZero) {
  script->registry[kGroup].add_items()->set_name("corr_factor");
  script->registry[kGroup].mutable_items(1)->set_sint(2);
  const Captured captured = run({"-v", "1", "100"});
  EXPECT_EQ(captured.result, -22);
  EXPECT_THAT(captured.out, HasSubstr("MEAN:        0.000000\n"));
}

TEST_F(UdAlsSteps, VerificationOfCorrectedSamplesAsksNoRegistry) {
  script->registry.clear();
  const Captured captured = run({"-c", "-s", "1", "-v", "1", "50"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_THAT(captured.out, Not(HasSubstr("Reading registry")));
  EXPECT_THAT(captured.out, Not(HasSubstr("STDEV")));
  EXPECT_EQ(script->countRequests(HubScript::registrySuid(), 512), 0);
}

TEST_F(UdAlsSteps, AFailedVerificationLogsItsSamplesAllTheSame) {
  give("persist/sensors/als.csv", "before\n");
  const Captured captured = run({"-s", "2", "-v", "1", "100"});
  EXPECT_EQ(captured.result, -22);
  EXPECT_THAT(captured.out, EndsWith("DIFF:      -50.000000%\nDifference exceeds |1.000%| tolerance.\n"
                                     "Verification failed.\n"));
  const std::string line =
      "100.000000,-1.000000,10.000000,20.000000,30.000000,40.000000,5.000000,8.000000,1000.000000,k,0."
      "000000\n";
  EXPECT_EQ(content("persist/sensors/als.csv"), "before\n" + line + line);
  EXPECT_EQ(content(kDataFile), "(none)");
}

TEST_F(UdAlsSteps, AVerificationThatIsNoNumberFails) {
  script->sensors[0].reading = [](int) { return reading(kNan); };
  const Captured captured = run({"-s", "2", "-v", "1", "100"});
  EXPECT_EQ(captured.result, -22);
  EXPECT_THAT(captured.out, EndsWith("Verification failed.\n"));
}

TEST_F(UdAlsSteps, AVerificationWaitsForSoManySamplesAsASoundSensorBrings) {
  script->sensors[0].reading = nullptr;
  const Captured captured = run({"-s", "14", "-v", "1", "100"});
  EXPECT_EQ(captured.result, -110);
  EXPECT_EQ(elapsed(), Milliseconds(5000));
  EXPECT_THAT(captured.out, EndsWith("Collecting samples...\nVerification failed.\n"));
}

TEST_F(UdAlsSteps, AStepWaitsLonger) {
  script->sensors[0].reading = nullptr;
  const Captured captured = run({"-s", "11", "100"});
  EXPECT_EQ(captured.result, -110);
  EXPECT_EQ(elapsed(), Milliseconds(8000));
  EXPECT_THAT(captured.out, EndsWith("Collecting samples...\nCalibration failed.\n"));
}

}  // namespace
