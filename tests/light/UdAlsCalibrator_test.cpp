// Steps, their files, and what they lead to, where a whole run cannot bring it about or would hide it.
#include <cmath>
#include <limits>

#include <gmock/gmock.h>

#include "light/UdAlsCommand.h"
#include "light/UdAlsRecords.h"
#include "proto/sns_oem_als.pb.h"
#include "support/FileSizeLimit.h"

namespace {

using testing::ElementsAre;
using testing::EndsWith;
using testing::HasSubstr;
using testing::Not;
using testing::StartsWith;

constexpr int kShortFile = -2147483646;
constexpr float kNan = std::numeric_limits<float>::quiet_NaN();

class UdAlsSteps : public UdAlsCommand {
 protected:
  UdAlsSteps() {
    sns_registry_data group;
    addFloatItem(&group, "scale", 1, 3);
    script->registry[kGroup] = group;
  }

  void giveRecords(const std::vector<SampleData>& records) {
    std::string bytes;
    for (const SampleData& record : records) appendFloats(record, &bytes);
    give(kDataFile, bytes);
  }
  [[nodiscard]] std::vector<SampleData> records() const {
    std::vector<SampleData> read;
    EXPECT_EQ(readUdAlsRecords(folder.path() / kDataFile, &read), FileResult::kOk);
    return read;
  }
  [[nodiscard]] const sns_registry_data_item* stored(const std::string& name) const {
    for (const sns_registry_data_item& item : script->registry.at(kGroup).items()) {
      if (item.name() == name) return &item;
    }
    return nullptr;
  }
  [[nodiscard]] int writes() const { return script->countRequests(HubScript::registrySuid(), 513); }

  /// The clear level of each step of a scan.
  void readClearOfEachStep(const std::vector<float>& clear) {
    auto step = std::make_shared<std::size_t>(0);
    answers[7804] = [this, step](ScriptedHub& hub) {
      ++*step;
      hub.SendMessage(Milliseconds(10), messageOf({{7805, std::string("\x08\x01", 2)}}));
    };
    script->sensors[0].reading = [clear, step](int) {
      return std::vector<float>{50, clear.at(*step - 1), 0, 0, 0, 0, 3, 100};
    };
  }

  /// The delays that the requests asked for.
  [[nodiscard]] std::vector<float> delaysAsked() const {
    std::vector<float> delays;
    for (const sns_client_request_msg& request : script->requests) {
      if (request.msg_id() != 7804) continue;
      sns_oem_delay_calib_req asked;
      EXPECT_TRUE(asked.ParseFromString(request.request().payload()));
      delays.push_back(asked.delay_ms());
    }
    return delays;
  }
};

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
  const Captured captured = run({"-s", "11", "-v", "1", "100"});
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

// Delay scans.

TEST_F(UdAlsSteps, AScanAddsInSinglePrecision) {
  run({"-s", "1", "caldelay", "100", "3", "0.1", "0.8", "0.1"});
  std::vector<float> wanted;
  for (float delay = 0.1F; delay <= 0.8F; delay += 0.1F) wanted.push_back(delay);
  EXPECT_EQ(delaysAsked(), wanted);
  EXPECT_EQ(wanted.size(), 7U);  // the eighth sum lies above 0.8; in double precision it would not
  ASSERT_EQ(records().size(), wanted.size());
  for (std::size_t i = 0; i < wanted.size(); ++i) EXPECT_EQ(records()[i][kUdAlsDelay], wanted[i]);
}

TEST_F(UdAlsSteps, AScanWhoseStartLiesBeyondItsEndComputesFromNothing) {
  giveRecords({makeUdAlsRecord({})});
  const Captured captured = run({"caldelay", "100", "3", "5", "4", "1"});
  EXPECT_EQ(captured.result, -1);
  EXPECT_EQ(captured.out,
            "Searching for ambient light sensor...\nDelay calibration...\nRemoving data file...\n"
            "Reading data file...\nCalibration failed.\n");
  EXPECT_EQ(content("persist/sensors/als_delay_cal.csv"), "lux,c,r,g,b,ir,gain,int_t,delay\n");
}

TEST_F(UdAlsSteps, AScanThatClearsAtEachStepHasOneRecordAtItsEnd) {
  const Captured captured = run({"-r", "-s", "1", "caldelay", "100", "3", "1", "3", "1"});
  EXPECT_EQ(captured.result, -61);
  EXPECT_THAT(captured.err, HasSubstr("Insufficient data to compute delay\n"));
}

TEST_F(UdAlsSteps, AScanOfTheTe2SignalWaitsForThePanelAndWritesItsEdges) {
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

TEST_F(UdAlsSteps, AScanOfTheTe2SignalEndsWhereThePanelCannotBeWritten) {
  const Captured captured = run({"caldelay_te2", "100", "3", "1.5", "20", "40", "10"});
  EXPECT_EQ(captured.result, -1);
  EXPECT_EQ(captured.err, "ERROR: Failed to open panel register file.\n");
  EXPECT_THAT(captured.out, EndsWith("Set TE2 failed.\n\n"));
  EXPECT_THAT(delaysAsked(), ElementsAre());
}

TEST_F(UdAlsSteps, TheVertexOfAScanIsStored) {
  readClearOfEachStep({5, 3, 5});
  const Captured captured = run({"-s", "1", "caldelay", "100", "3", "1", "3", "1"});
  EXPECT_EQ(captured.result, 0) << captured.err;
  EXPECT_THAT(captured.out, HasSubstr("Delay of minimum clear value:       2.000000\nReading registry...\n"
                                      "Writing registry...\nCalibration succeeded.\n"));
  EXPECT_EQ(stored("delay")->flt(), 2.0F);
  EXPECT_EQ(stored("delay")->version(), 1);
}

TEST_F(UdAlsSteps, AFlatScanHasNoBestDelay) {
  script->sensors[0].reading = [](int) { return std::vector<float>{0, 0, 0, 0, 0, 0, 3, 100}; };
  const Captured captured = run({"-s", "1", "caldelay", "100", "3", "1", "3", "1"});
  EXPECT_EQ(captured.result, -22);
  EXPECT_THAT(captured.err, HasSubstr("The delay of the minimum clear value is not a finite number: nan"));
  EXPECT_EQ(writes(), 0);
}

// The display's TE2 table.

TEST_F(UdAlsSteps, SettingTheTe2TableWaitsHalfASecond) {
  give(kTe2Node, std::string(39, 'x'));
  const Captured captured = run({"set_te2", "8", "10"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_EQ(captured.out,
            "Searching for ambient light sensor...\nRising  Edge Delay : 0008\n"
            "Falling Edge Delay : 0010\nSet TE2 succeeded.\n\n");
  EXPECT_EQ(content(kTe2Node), "0008 0010 0008 0010 0008 0010 0008 0010");
  EXPECT_EQ(elapsed(), Milliseconds(500));
}

TEST_F(UdAlsSteps, ATe2TableThatCannotBeWrittenIsSaidAndNoFailure) {
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

TEST_F(UdAlsSteps, AComputationThatNeedsMoreRecordsSaysWhat) {
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

TEST_F(UdAlsSteps, AComputationWithoutAGroupFails) {
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

TEST_F(UdAlsSteps, ResultsThatAreNoFiniteNumberAreNotStored) {
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

TEST_F(UdAlsSteps, GainItemsAreMadeInTheirOrder) {
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

TEST_F(UdAlsSteps, AnotherKindOfItemBecomesTheKindOfTheResult) {
  addFloatItem(&script->registry[kGroup], "pwm_boundary", 60, 4);
  giveRecords({makeUdAlsRecord({{kUdAlsBrightness, 80.9F}}), makeUdAlsRecord({{kUdAlsBrightness, 120.9F}})});
  EXPECT_EQ(run({"-W", "pwm", "100", "3", "128"}).result, 0);
  EXPECT_TRUE(stored("pwm_boundary")->has_sint());
  EXPECT_EQ(stored("pwm_boundary")->sint(), 120);
  EXPECT_EQ(stored("pwm_boundary")->version(), 5);
}

}  // namespace
