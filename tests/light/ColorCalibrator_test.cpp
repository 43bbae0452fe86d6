// What needs a hub that behaves oddly at a chosen moment, or a working file that no step writes. Whole runs
// of the command are golden cases.
#include "light/ColorCalibrator.h"

#include <cmath>
#include <cstdlib>
#include <filesystem>
#include <functional>
#include <limits>
#include <string_view>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "framework/DataFile.h"
#include "light/ColorFiles.h"
#include "light/ColorRecord.h"
#include "support/ArgumentWords.h"
#include "support/Capture.h"
#include "support/FileSizeLimit.h"
#include "support/ScriptedHub.h"
#include "support/TemporaryFolder.h"

namespace {

using std::chrono::milliseconds;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;
using testing::SizeIs;

constexpr const char* kAlsGroup = "chipa_platform.als.fac_cal";
constexpr const char* kColorGroup = "chipa_platform.color.fac_cal";
constexpr float kNan = std::numeric_limits<float>::quiet_NaN();
constexpr int kMalformed = -2147483647;
constexpr int kShortFile = -2147483646;

/// Every other reading has a green, the others an infrared.
std::vector<float> reading(int index, float first, float gain = 4) {
  return index % 2 == 0 ? std::vector<float>{first, 1000, 200, 300, 100, -1, gain}
                        : std::vector<float>{first, 1000, 200, 0, 100, 50, gain};
}

class ColorTest : public testing::Test {
 protected:
  ColorTest() {
    (void)::setenv("VANTLE_ROOT", folder.path().c_str(), 1);
    support::makeDeviceFolders(folder.path());
    script->sensors = {{color, "color_raw", "ChipA color"}, {light, "ambient_light_raw", "ChipA light"}};
    script->sensors[0].reading = [](int index) { return reading(index, 4000); };
    script->sensors[1].reading = [](int index) { return reading(index, 500); };
    script->registry[kAlsGroup];
    addFloatItem(&script->registry[kColorGroup], "irc_ratio", 7, 2);
  }
  ~ColorTest() override { (void)::unsetenv("VANTLE_ROOT"); }

  Captured run(std::initializer_list<const char*> words) {
    calibrator.reset();  // before the connection that it uses
    connection = connectTo(script);
    calibrator = std::make_unique<ColorCalibrator>(connection.get());
    ArgumentWords argumentWords(words);
    Calibrator::Arguments arguments;
    arguments.deviceType = DeviceType::p2m2;
    arguments.command = "color";
    arguments.argc = argumentWords.argc();
    arguments.argv = argumentWords.argv();
    arguments.quiet = true;
    return capture([&] { return calibrator->Run(arguments); });
  }

  void writeRecords(const std::vector<SampleData>& records) const {
    std::string bytes;
    for (const SampleData& record : records) appendFloats(record, &bytes);
    ASSERT_TRUE(support::writeFile(dataFile, bytes));
  }
  [[nodiscard]] std::string data() const { return support::readFile(dataFile).value_or("(none)"); }

  [[nodiscard]] const sns_registry_data_item* item(const char* group, const std::string& name) const {
    for (const auto& each : script->registry[group].items()) {
      if (each.name() == name) return &each;
    }
    return nullptr;
  }

  const ssc::SensorUid color{1, 1};
  const ssc::SensorUid light{2, 2};
  support::TemporaryFolder folder;
  const std::string dataFile = folder.path() / std::string(kColorDataFile + 1);
  const std::string logFile = folder.path() / std::string(kColorLogFile + 1);
  std::shared_ptr<HubScript> script = std::make_shared<HubScript>();
  std::unique_ptr<ssc::Connection> connection;
  std::unique_ptr<ColorCalibrator> calibrator;
};

/// Reference lux, reference color temperature, lux, and the channels that count.
SampleData record(float lux, float kelvin, float rawLux, float clear, float red, float blue, float ir = 0,
                  float gain = 4) {
  return {lux, kelvin, rawLux, 0, clear, red, blue, ir, gain};
}
const SampleData kLamp = record(0, 0, 0, 900, 300, 500, 5000, 4);
const SampleData kWarm = record(1000, 3000, 500, 1000, 400, 200);
const SampleData kDay = record(1000, 5000, 500, 1000, 300, 300);

// A step.

TEST_F(ColorTest, MeansAreOfWhatEachSensorReportsInTurn) {
  const Captured captured = run({"color", "-c", "-s", "3", "500", "4000"});
  EXPECT_EQ(captured.result, 0) << captured.err;
  EXPECT_THAT(captured.out, HasSubstr("LUX_MEAN:      500.000000\nCCT_MEAN:     4000.000000\n"
                                      "C_MEAN:       1000.000000\nR_MEAN:        200.000000\n"
                                      "G_MEAN:        300.000000\nB_MEAN:        100.000000\n"
                                      "IR_MEAN:        50.000000\nGAIN:            4.000000\n\n"));
  std::vector<SampleData> records;
  EXPECT_EQ(capture([&] { return calibrator->LoadData(&records); }).result, 0);
  EXPECT_THAT(records, ElementsAre(SampleData{500, 4000, 500, 4000, 1000, 200, 100, 50, 4}));
}

TEST_F(ColorTest, BothSensorsHaveToHaveEnough) {
  // The light sensor starts late: the color sensor alone does not end the step.
  script->sensors[1].reading = [](int index) {
    return index < 15 ? std::vector<float>{} : reading(index, 500);
  };
  const Captured captured = run({"color", "-c", "-s", "2", "500", "4000"});
  EXPECT_EQ(captured.result, 0) << captured.err;
  EXPECT_THAT(captured.out, HasSubstr("LUX_MEAN:      500.000000\n"));
}

TEST_F(ColorTest, AChangedGainStartsOnlyThatSensorAfresh) {
  script->sensors[0].reading = [](int index) {
    return index < 4 ? reading(index, 9e9F, 4) : reading(index, 4000, 5);
  };
  script->sensors[1].reading = [](int index) { return reading(index, index < 4 ? 400.0F : 600.0F); };
  const Captured captured = run({"color", "-c", "-s", "3", "500", "4000"});
  EXPECT_EQ(captured.result, 0) << captured.err;
  EXPECT_THAT(captured.out, HasSubstr("CCT_MEAN:     4000.000000\n"));
  EXPECT_THAT(captured.out, HasSubstr("GAIN:            5.000000\n"));
  // Nine readings of the light sensor until then: four of 400 lx, five of 600 lx.
  EXPECT_THAT(captured.out, HasSubstr("LUX_MEAN:      511.111"));
}

TEST_F(ColorTest, AGainThatChangesBehindTheLastSampleNeededChangesNothing) {
  // All in one message: what comes behind the last one needed is not looked at.
  script->sensors[1].reading = nullptr;
  script->onRequest = [this](ScriptedHub& hub, const sns_client_request_msg& request) {
    if (request.msg_id() != 513 || ssc::SensorUid(request.suid()) != light) return false;
    sns_client_event_msg message;
    light.CopyTo(message.mutable_suid());
    for (int i = 0; i < 8; ++i) {
      auto* const event = message.add_events();
      event->set_msg_id(1025);
      event->set_timestamp(0);
      event->set_payload(encodeReading(i < 4 ? reading(i, 500, 4) : reading(i, 900, 5)));
    }
    hub.SendMessage(milliseconds(950), message);
    return false;
  };
  const Captured captured = run({"color", "-c", "-s", "2", "500", "4000"});
  EXPECT_EQ(captured.result, 0) << captured.err;
  EXPECT_THAT(captured.out, HasSubstr("LUX_MEAN:      500.000000\n"));
}

TEST_F(ColorTest, AMeanThatCountsAndIsNotFiniteIsNotSaved) {
  for (const float odd : {kNan, std::numeric_limits<float>::infinity()}) {
    for (const std::size_t value : {color_reading::kClear, color_reading::kRed, color_reading::kBlue}) {
      script->sensors[0].reading = [odd, value](int index) {
        std::vector<float> values = reading(index, 4000);
        values[value] = odd;
        return values;
      };
      const Captured captured = run({"color", "-c", "500", "4000"});
      EXPECT_EQ(captured.result, -22);
      EXPECT_THAT(captured.err, HasSubstr("is not a finite number"));
      EXPECT_THAT(captured.out, HasSubstr("Calibration failed.\n"));
      EXPECT_THAT(captured.out, Not(HasSubstr("Saving")));
      EXPECT_EQ(data(), "(none)");
    }
    script->sensors[0].reading = [](int index) { return reading(index, 4000); };
    script->sensors[1].reading = [odd](int index) { return reading(index, odd); };
    EXPECT_EQ(run({"color", "-c", "500", "4000"}).result, -22);
    EXPECT_EQ(data(), "(none)");
    script->sensors[1].reading = [](int index) { return reading(index, 500); };
  }
}

TEST_F(ColorTest, UnderTheInfraredLampThereMayBeNoColorTemperature) {
  for (const float odd : {kNan, -kNan, std::numeric_limits<float>::infinity()}) {
    script->sensors[0].reading = [odd](int index) { return reading(index, odd); };
    const Captured captured = run({"color", "-c", "-s", "2"});
    EXPECT_EQ(captured.result, 0) << captured.err;
    EXPECT_THAT(captured.out,
                HasSubstr(std::isnan(odd) ? "CCT_MEAN:             nan\n" : "CCT_MEAN:             inf\n"));
    EXPECT_THAT(captured.out, HasSubstr("Please proceed to the next step.\n"));
    EXPECT_EQ(data().size(), 36U);
  }
  // Nothing that is computed depends on it.
  script->sensors[0].reading = [](int index) { return reading(index, kNan); };
  EXPECT_EQ(run({"color", "-s", "2", "1000", "3000"}).result, 0);
  script->sensors[0].reading = [](int index) {
    std::vector<float> values = reading(index, kNan);
    values[color_reading::kBlue] = 300;
    return values;
  };
  const Captured last = run({"color", "-s", "2", "-w", "1000", "5000"});
  EXPECT_EQ(last.result, 0) << last.err;
  EXPECT_THAT(last.out, HasSubstr("BR_FIT:       2000.000000    2000.000000\n"));
  EXPECT_THAT(last.out, HasSubstr("Calibration succeeded.\n"));
}

TEST_F(ColorTest, ReadingsWhoseInfraredIsNotANumberDoNotCount) {
  script->sensors[0].reading = [](int index) {
    std::vector<float> values = reading(index, 4000);
    if (index % 2 != 0) values[color_reading::kIr] = kNan;
    return values;
  };
  const Captured captured = run({"color", "-c", "500", "4000"});
  EXPECT_EQ(captured.result, -110);
  EXPECT_THAT(captured.err, HasSubstr("Only 0 of 10 Color samples were received in time"));
}

// The files.

TEST_F(ColorTest, TooFewMeansAreCounted) {
  ASSERT_EQ(run({"color", "-C"}).result, -1);
  for (const auto& [means, text] : {std::pair<SampleData, const char*>{{}, "(only 0 items)"},
                                    {{1}, "(only 1 item)"},
                                    {{1, 2, 3, 4, 5, 6, 7}, "(only 7 items)"}}) {
    const Captured captured = capture([&, &few = means] { return calibrator->SaveData(few); });
    EXPECT_EQ(captured.result, -61);
    EXPECT_THAT(captured.err, HasSubstr(std::string("Insufficient data ") + text));
    EXPECT_THAT(captured.out, IsEmpty());
  }
  EXPECT_EQ(data(), "(none)");
}

TEST_F(ColorTest, RecordsCannotBeLoadedIntoNothing) {
  ASSERT_EQ(run({"color", "-C"}).result, -1);
  const Captured captured = capture([&] { return calibrator->LoadData(nullptr); });
  EXPECT_EQ(captured.result, -22);
  EXPECT_THAT(captured.err, HasSubstr("Cannot load data into null vector"));
  EXPECT_THAT(captured.out, IsEmpty());
}

TEST_F(ColorTest, AFileThatIsCutAnywhereIsIncompleteButKeepsItsWholeRecords) {
  writeRecords({kLamp, kWarm, kDay});
  const std::string whole = data();
  for (std::size_t length = 0; length <= whole.size(); ++length) {
    ASSERT_TRUE(support::writeFile(dataFile, whole.substr(0, length)));
    if (length % 36 != 0) {
      const Captured captured = run({"color", "-W"});
      EXPECT_EQ(captured.result, -61);
      EXPECT_THAT(captured.err, HasSubstr("Data file is incomplete"));
      EXPECT_THAT(captured.out, HasSubstr("Calibration failed.\n"));
    } else {
      ASSERT_EQ(run({"color", "-h"}).result, 0);
    }
    std::vector<SampleData> records{kDay, kDay, kDay, kDay};
    (void)capture([&] { return calibrator->LoadData(&records); });
    EXPECT_THAT(records, SizeIs(length / 36));
  }
  EXPECT_EQ(item(kAlsGroup, "scale"), nullptr);
}

TEST_F(ColorTest, AFileOfAGigabyteIsRefusedAtOnce) {
  writeRecords({kLamp, kWarm, kDay});
  std::filesystem::resize_file(dataFile, std::uintmax_t{1} << 30);
  const Captured captured = run({"color", "-W"});
  EXPECT_EQ(captured.result, -22);
  EXPECT_THAT(captured.err, HasSubstr("Color calibration data file is larger than 1048576 bytes"));
}

TEST_F(ColorTest, OnAFullDiskTheEarlierRecordsStay) {
  // Long files, since what this test captures is limited too.
  writeRecords(std::vector<SampleData>(300, kWarm));
  const std::string before = data();
  const std::string log(before.size(), '\n');
  ASSERT_TRUE(support::writeFile(logFile, log));
  const support::FileSizeLimit full(before.size() + 20);
  const Captured captured = run({"color", "500", "4000"});
  EXPECT_EQ(captured.result, kShortFile);
  EXPECT_THAT(captured.err, HasSubstr("Failed to write data to file"));
  // Which nobody reads back: its own failure is a warning.
  EXPECT_THAT(captured.out, HasSubstr("WARN: Failed to write to /mnt/vendor/persist/sensors/color.csv\n"));
  EXPECT_THAT(captured.out, HasSubstr("Calibration failed.\n"));
  EXPECT_EQ(data(), before);
  EXPECT_EQ(support::readFile(logFile), log);
}

TEST_F(ColorTest, AWorkingFileThatCannotBeOpenedLeavesTheLinesOfTheLogAndWhatWasReadBefore) {
  std::filesystem::create_directory(dataFile);
  EXPECT_EQ(run({"color", "-c", "500", "4000"}).result, -1);
  EXPECT_EQ(support::readFile(logFile),
            std::string(kColorLogHeader) +
                "500.000000,4000.000000,1000.000000,200.000000,300.000000,100.000000,50.000000,4.000000\n");
  std::filesystem::remove(dataFile);
  std::vector<SampleData> records{kDay};
  EXPECT_EQ(capture([&] { return calibrator->LoadData(&records); }).result, -1);
  EXPECT_THAT(records, ElementsAre(kDay));
}

TEST_F(ColorTest, LinksInThePlaceOfTheFilesAreNotFollowed) {
  const std::string victim = folder.path() / "victim";
  ASSERT_TRUE(support::writeFile(victim, "precious"));
  std::filesystem::create_symlink(victim, dataFile);
  std::filesystem::create_symlink(victim, logFile);
  EXPECT_EQ(run({"color", "-c", "500", "4000"}).result, -1);
  EXPECT_EQ(run({"color", "-W"}).result, -1);
  EXPECT_EQ(run({"color", "-C"}).result, 0);
  EXPECT_FALSE(std::filesystem::is_symlink(dataFile));
  EXPECT_EQ(support::readFile(victim), "precious");
}

// Verification.

TEST_F(ColorTest, OnlyGroupsOfAVersionCanBeVerified) {
  const auto verify = [this](const char* group, const std::function<void(sns_registry_data_item*)>& version) {
    for (const char* const each : {kAlsGroup, kColorGroup}) {
      sns_registry_data data;
      addFloatItem(&data, each == kAlsGroup ? "scale" : "ratio_coef0", 1, 1);
      addFloatItem(&data, "ratio_coef1", 7998, 1);
      auto* const item = data.add_items();
      item->set_name("version");
      item->set_sint(1);
      if (std::string_view(each) == group) version(item);
      script->registry[each] = data;
    }
    return run({"color", "-s", "2", "-v", "0.001", "500", "4000"});
  };
  for (const char* const group : {kAlsGroup, kColorGroup}) {
    const Captured first = verify(group, [](auto* version) { version->set_sint(1); });
    EXPECT_EQ(first.result, 0) << first.err;
    EXPECT_THAT(first.out, HasSubstr("CCT_MEAN:    4000.000000\n"));
    for (const auto& odd : std::vector<std::function<void(sns_registry_data_item*)>>{
             [](auto* version) { version->set_sint(0); }, [](auto* version) { version->set_sint(-4); },
             [](auto* version) { version->set_flt(4); }, [](auto* version) { version->set_name("other"); }}) {
      const Captured captured = verify(group, odd);
      EXPECT_EQ(captured.result, -22);
      EXPECT_EQ(captured.err, "ERROR: Cannot verify with old calibration\n");
      EXPECT_THAT(captured.out, HasSubstr("Saving data to file...\nVerification failed.\n"));
    }
  }
}

// What the records come to.

TEST_F(ColorTest, ParametersAreComputedFromTheRecords) {
  writeRecords({kWarm, kLamp, kDay});
  const Captured captured = run({"color", "-W"});
  EXPECT_EQ(captured.result, 0) << captured.err;
  EXPECT_THAT(
      captured.out,
      HasSubstr("\nCROSSTALK:       0.080000\n\nIR_RATIO:        5.000000\nLUX_SCALE:       2.000000\n"
                "BM_SCALE:        3.095238\n\n"
                "BR_FIT:       1000.000000    4000.000000\n"
                "BMRM_FIT: "));
  EXPECT_EQ(item(kAlsGroup, "version")->sint(), 4);
  EXPECT_EQ(item(kAlsGroup, "scale")->flt(), 2);
  EXPECT_EQ(item(kColorGroup, "xtalk")->flt(), 0.08F);
  EXPECT_NEAR(item(kColorGroup, "ratio_coef0")->flt(), 1000, 0.01);
  EXPECT_NEAR(item(kColorGroup, "ratio_coef1")->flt(), 4000, 0.01);
  EXPECT_NEAR(item(kColorGroup, "bmrm_coef0")->flt(), -3000, 0.01);
  EXPECT_NEAR(item(kColorGroup, "bmrm_coef1")->flt(), 8000, 0.01);
  EXPECT_NEAR(item(kColorGroup, "boc_low_coef0")->flt(), -1000, 0.01);
  EXPECT_NEAR(item(kColorGroup, "boc_low_coef1")->flt(), 20000, 0.01);
  EXPECT_EQ(item(kColorGroup, "boc_low_coef2")->flt(), 0);
  EXPECT_EQ(item(kColorGroup, "irc_ratio")->flt(), 5);
  EXPECT_EQ(item(kColorGroup, "irc_ratio")->version(), 3);
}

TEST_F(ColorTest, WithoutClearLightInTheFirstRecordTheRatioStays) {
  writeRecords({kLamp, record(1000, 3000, 500, 0, 400, 200), kWarm, kDay});
  const Captured captured = run({"color", "-W"});
  EXPECT_EQ(captured.result, 0) << captured.err;
  EXPECT_THAT(captured.out, Not(HasSubstr("IR_RATIO")));
  EXPECT_EQ(item(kColorGroup, "irc_ratio")->flt(), 7);
  EXPECT_EQ(item(kColorGroup, "irc_ratio")->version(), 2);
}

TEST_F(ColorTest, ResultsThatAreNotFiniteAreNotStored) {
  const SampleData noClear = record(1000, 4000, 500, 0, 0, 200);
  const SampleData onlyRed = record(1000, 4000, 500, 400, 400, 200);
  const SampleData dark = record(1000, 4000, 0, 1000, 400, 200);
  SampleData hugeGain = kWarm;
  hugeGain[color_record::kGain] = 3e38F;
  SampleData noGain = kWarm;
  noGain[color_record::kGain] = kNan;
  SampleData noLux = kWarm;
  noLux[color_record::kReferenceLux] = kNan;
  for (const auto& [first, name] : {std::pair<SampleData, const char*>{noClear, "BM_SCALE"},
                                    {onlyRed, "BM_SCALE"},
                                    {dark, "LUX_SCALE"},
                                    {hugeGain, "IR_RATIO"},
                                    {noGain, "IR_RATIO"},
                                    {noLux, "LUX_SCALE"}}) {
    writeRecords({first, kLamp, kWarm, kDay});
    const Captured captured = run({"color", "-W"});
    EXPECT_EQ(captured.result, -22) << name;
    EXPECT_THAT(captured.err, HasSubstr(std::string(name) + " is not a finite number"));
    EXPECT_THAT(captured.out, Not(HasSubstr("-nan")));
    EXPECT_THAT(captured.out, HasSubstr("Calibration failed.\n"));
    EXPECT_EQ(item(kAlsGroup, "scale"), nullptr);
  }
}

TEST_F(ColorTest, EachLineNeedsRecordsOfItsOwn) {
  const SampleData noRed = record(1000, 3000, 500, 1000, 0, 200);
  writeRecords({kLamp, noRed, noRed});
  EXPECT_THAT(run({"color", "-W"}).err, HasSubstr("Insufficient data to compute linear B/R fit"));
  const SampleData allBlue = record(1000, 3000, 500, 1000, 400, 1000);
  const SampleData moreBlue = record(1000, 5000, 500, 1000, 300, 1100);
  writeRecords({kLamp, allBlue, moreBlue});
  const Captured captured = run({"color", "-W"});
  EXPECT_EQ(captured.result, -61);
  EXPECT_THAT(captured.out, HasSubstr("BR_FIT: "));
  EXPECT_THAT(captured.err, HasSubstr("Insufficient data to compute linear Bm/Rm fit"));
  const SampleData sameBlue = record(1000, 5000, 500, 1000, 300, 200);
  writeRecords({kLamp, kWarm, sameBlue});
  EXPECT_THAT(run({"color", "-W"}).err, HasSubstr("Insufficient data to compute linear B/C fit"));
  EXPECT_EQ(item(kAlsGroup, "scale"), nullptr);
}

TEST_F(ColorTest, AnEventThatDoesNotParseFailsTheStep) {
  script->sensors[0].reading = nullptr;
  script->onRequest = [this](ScriptedHub& hub, const sns_client_request_msg& request) {
    if (request.msg_id() != 513 || ssc::SensorUid(request.suid()) != color) return false;
    hub.SendEvent(milliseconds(5), color, 1025, "\xff");
    return false;
  };
  const Captured captured = run({"color", "-c", "500", "4000"});
  EXPECT_EQ(captured.result, kMalformed);
  EXPECT_EQ(data(), "(none)");
}

TEST_F(ColorTest, AWakeUpWithoutSamplesSavesNothing) {
  // Three reconnections are tolerated, the fourth ends the collection.
  script->sensors[0].reading = nullptr;
  script->sensors[1].reading = nullptr;
  bool isFirst = true;
  script->onRequest = [&](ScriptedHub& hub, const sns_client_request_msg& request) {
    if (request.msg_id() == 513 && isFirst) {
      isFirst = false;
      for (int i = 1; i <= 4; ++i) hub.GoAwayAndReturn(milliseconds(300 * i), milliseconds(100));
    }
    return false;
  };
  const Captured captured = run({"color", "-c", "500", "4000"});
  EXPECT_EQ(captured.result, -11);
  EXPECT_THAT(captured.err, HasSubstr("Unable to collect samples. Error = -11"));
  EXPECT_EQ(data(), "(none)");
}

TEST_F(ColorTest, EachRunStartsFromTheDefaults) {
  ASSERT_EQ(run({"color", "-c", "-s", "2", "-w", "500", "4000"}).result, -61);
  ArgumentWords words({"color"});
  Calibrator::Arguments arguments;
  arguments.deviceType = DeviceType::p2m2;
  arguments.command = "color";
  arguments.argc = words.argc();
  arguments.argv = words.argv();
  const Captured second = capture([&] { return calibrator->Run(arguments); });
  EXPECT_EQ(second.result, 0) << second.err;
  EXPECT_THAT(second.out, HasSubstr("(count 20 @"));
  EXPECT_THAT(second.out, HasSubstr("Please proceed to the next step.\n"));
  std::vector<SampleData> records;
  EXPECT_EQ(capture([&] { return calibrator->LoadData(&records); }).result, 0);
  ASSERT_THAT(records, SizeIs(2)) << "and what was collected before stays";
  EXPECT_EQ(records[1][color_record::kReferenceLux], 0);
}

}  // namespace
