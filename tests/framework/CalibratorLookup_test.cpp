#include <gtest/gtest.h>

#include "framework/PlainCalibrator.h"
#include "support/Capture.h"
#include "support/ScriptedHub.h"

namespace {

constexpr int kNotFound = -2;
constexpr int kNoData = -61;
constexpr auto kStreaming = SNS_STD_SENSOR_STREAM_TYPE_STREAMING;
constexpr int kOnChange = SNS_STD_SENSOR_STREAM_TYPE_ON_CHANGE;

class CalibratorLookup : public testing::Test {
 protected:
  using Suids = std::map<std::string, ssc::SensorUid>;

  Captured lookup(const std::vector<std::string>& dataTypes) {
    connection = connectTo(script);
    PlainCalibrator calibrator(connection.get());
    return capture([&] { return calibrator.LookupSuidsByName(dataTypes, &suids, &package, kStreaming); });
  }

  bool lookupCompanion(const ssc::SensorUid& sensor, const std::string& dataType) {
    connection = connectTo(script);
    PlainCalibrator calibrator(connection.get());
    bool found = false;
    output = capture([&] { found = calibrator.LookupCompanion(sensor, dataType, kStreaming, &companion); });
    return found;
  }

  const ssc::SensorUid p1{11, 1};
  const ssc::SensorUid p2{12, 1};
  const ssc::SensorUid t1{21, 2};
  const ssc::SensorUid t2{22, 2};
  std::shared_ptr<HubScript> script = std::make_shared<HubScript>();
  std::unique_ptr<ssc::Connection> connection;
  Suids suids{{"left over", p2}};
  std::string package;
  ssc::SensorUid companion;
  Captured output;
};

TEST_F(CalibratorLookup, FindsTheSensorsOfOnePackage) {
  script->sensors = {{p1, "pressure", "ChipA_0 a barometer"},
                     {t2, "sensor_temperature", "chipb_0 its temperature"},
                     {t1, "sensor_temperature", "ChipA_0"}};
  // A blank rules over an underscore: the first name's package is "ChipA_0", so a plain "ChipA_0" does not
  // match it.
  EXPECT_EQ(lookup({"pressure", "sensor_temperature"}).result, kNotFound);
  script->sensors[0].name = "ChipA a barometer";
  const Captured captured = lookup({"pressure", "sensor_temperature"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_EQ(suids, (Suids{{"pressure", p1}, {"sensor_temperature", t1}}));
  EXPECT_EQ(package, "chipa");
  EXPECT_EQ(captured.out + captured.err, "");
}

TEST_F(CalibratorLookup, TakesTheFirstOfSeveralOfThePackage) {
  script->sensors = {
      {p1, "pressure", "chipa"}, {t1, "sensor_temperature", "chipa"}, {t2, "sensor_temperature", "chipa"}};
  EXPECT_EQ(lookup({"pressure", "sensor_temperature"}).result, 0);
  EXPECT_EQ(suids["sensor_temperature"], t1);
}

TEST_F(CalibratorLookup, NamesWhatThePackageLacks) {
  script->sensors = {{p1, "pressure", "chipa desc"}, {t2, "sensor_temperature", "chipb desc"}};
  const Captured captured = lookup({"pressure", "sensor_temperature"});
  EXPECT_EQ(captured.result, kNotFound);
  EXPECT_EQ(captured.err, "ERROR: Unable to find sensor_temperature for chipa\n");
}

TEST_F(CalibratorLookup, ComparesPackagesCaseSensitively) {
  script->sensors = {{p1, "pressure", "ChipA"}, {t1, "sensor_temperature", "chipa"}};
  EXPECT_EQ(lookup({"pressure", "sensor_temperature"}).result, kNotFound);
}

TEST_F(CalibratorLookup, SkipsSensorsOfAnotherStreamTypeOrWithoutAttributes) {
  script->sensors = {{p1, "pressure", "chipa"},
                     {t2, "sensor_temperature", "chipa", kOnChange},
                     {p2, "sensor_temperature", "chipa", std::nullopt},
                     {ssc::SensorUid(99, 9), "sensor_temperature", std::nullopt},
                     {t1, "sensor_temperature", "chipa"}};
  EXPECT_EQ(lookup({"pressure", "sensor_temperature"}).result, 0);
  EXPECT_EQ(suids["sensor_temperature"], t1);
}

TEST_F(CalibratorLookup, ADataTypeThatNobodyPublishesIsSilent) {
  const Captured captured = lookup({"pressure"});
  EXPECT_EQ(captured.result, kNotFound);
  EXPECT_EQ(captured.err, "");
  EXPECT_TRUE(suids.empty());
}

TEST_F(CalibratorLookup, AFirstSensorWithoutStreamTypeOrNameIsTheLibrarysResult) {
  script->sensors = {{p1, "pressure", "chipa", std::nullopt}};
  EXPECT_EQ(lookup({"pressure"}).result, kNoData);
  script->sensors = {{p1, "pressure", std::nullopt}};
  EXPECT_EQ(lookup({"pressure"}).result, kNoData);
}

TEST_F(CalibratorLookup, AFirstSensorOfAnotherStreamTypeIsTakenButDecidesNoPackage) {
  script->sensors = {{p1, "pressure", "chipa", kOnChange}, {t1, "sensor_temperature", "chipb"}};
  EXPECT_EQ(lookup({"pressure", "sensor_temperature"}).result, 0);
  EXPECT_EQ(suids, (Suids{{"pressure", p1}, {"sensor_temperature", t1}}));
  EXPECT_EQ(package, "chipb");
  EXPECT_EQ(lookup({"pressure"}).result, 0);
  EXPECT_EQ(package, "");
}

TEST_F(CalibratorLookup, OfADataTypeThatIsAskedForTwiceTheFirstFindIsKept) {
  script->sensors = {{p1, "pressure", "chipa", kOnChange}, {p2, "pressure", "chipb"}};
  EXPECT_EQ(lookup({"pressure", "sensor_temperature"}).result, kNotFound);
  script->sensors.push_back({t1, "sensor_temperature", "chipb"});
  EXPECT_EQ(lookup({"pressure", "sensor_temperature", "pressure"}).result, 0);
  EXPECT_EQ(suids, (Suids{{"pressure", p1}, {"sensor_temperature", t1}}));
}

TEST_F(CalibratorLookup, WantsNoTargets) {
  script->sensors = {{p1, "pressure", "chipa"}};
  connection = connectTo(script);
  PlainCalibrator calibrator(connection.get());
  EXPECT_EQ(calibrator.LookupSuidsByName({"pressure"}, nullptr, nullptr, kStreaming), 0);
}

TEST_F(CalibratorLookup, ACompanionIsTheOneOfTheSamePackage) {
  script->sensors = {{p1, "pressure", "chipa"}, {t2, "pressure_raw", "chipb"}, {t1, "pressure_raw", "chipa"}};
  EXPECT_TRUE(lookupCompanion(p1, "pressure_raw"));
  EXPECT_EQ(companion, t1);
}

TEST_F(CalibratorLookup, AMissingCompanionIsNormalAndSilent) {
  script->sensors = {
      {p1, "pressure", "chipa"}, {t2, "pressure_raw", "chipb"}, {t1, "pressure_raw", "chipa", kOnChange}};
  EXPECT_FALSE(lookupCompanion(p1, "pressure_raw"));
  EXPECT_EQ(companion, ssc::SensorUid());
  EXPECT_EQ(output.out + output.err, "");
  EXPECT_FALSE(lookupCompanion(p1, "nothing"));
  EXPECT_EQ(output.out + output.err, "");
}

TEST(SensorNameToPackageName, CutsAtTheFirstBlankElseAtTheFirstUnderscore) {
  const std::map<std::string, std::string> cases{{"chipa a thing", "chipa"},
                                                 {"chipa_0", "chipa"},
                                                 {"chipa_0 thing", "chipa_0"},
                                                 {"chipa", "chipa"},
                                                 {"", ""},
                                                 {" x", ""},
                                                 {"a_b_c", "a"}};
  for (const auto& [name, packageName] : cases) {
    std::string cut = name;
    Calibrator::SensorNameToPackageName(&cut);
    EXPECT_EQ(cut, packageName) << name;
  }
  Calibrator::SensorNameToPackageName(nullptr);
}

}  // namespace
