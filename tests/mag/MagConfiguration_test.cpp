// The commands that store what they are given: soft iron, orientation and current sensitivity.
#include <string>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "mag/MagConfigurationFixture.h"
#include "mag/MagCurrentSensitivity.h"
#include "mag/MagOrientation.h"
#include "mag/MagSoftIron.h"

namespace {

using testing::EndsWith;
using testing::HasSubstr;

constexpr int kNotFound = -2;
constexpr int kIoError = -5;
constexpr const char* kPlatformGroup = "magchip_0_platform";

using namespace std::string_literals;  // zero bytes in strings

class MagSoftIronCommand : public MagConfigurationTest {
 protected:
  Captured run(const CommandSettings& settings = {}) {
    return runCommand<MagSoftIron>(
        script, {"mag-softiron", "1.1", "-0.1", "0.2", "0.01", "0.9", "-0.3", "0", "0.05", "1"}, settings);
  }
  void refuse(std::initializer_list<const char*> words, const std::string& message) {
    expectRefused<MagSoftIron>(words, message, "Usage: vantle mag-softiron [-h] ROWMATRIX\n");
  }
  const std::vector<float> matrix{1.1F, -0.1F, 0.2F, 0.01F, 0.9F, -0.3F, 0, 0.05F, 1};
};

TEST_F(MagSoftIronCommand, PrintsItsHelpForTheFirstWordOnly) {
  const Captured captured = runCommand<MagSoftIron>(script, {"mag-softiron", "-h", "1"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_EQ(captured.out,
            "Usage: vantle mag-softiron [-h] ROWMATRIX\nOptions:\n  -h         Print this help and "
            "exit.\nArguments:\n"
            "  ROWMATRIX  Nine, floating-point values specifying a 3x3 matrix in row order\n\n");
  refuse({"mag-softiron", "1", "-h"}, "Failed to parse '-h' as a mag value");
}

TEST_F(MagSoftIronCommand, NeedsNineNumbers) {
  refuse({"mag-softiron"}, "9 values of ROWMATRIX are required");
  refuse({"mag-softiron", "1", "0", "0", "0", "1", "0", "0", "0"}, "9 values of ROWMATRIX are required");
  refuse({"mag-softiron", "1", "zero"}, "Failed to parse 'zero' as a mag value");
  refuse({"mag-softiron", "1", "nan"}, "Failed to parse 'nan' as a mag value");
  refuse({"mag-softiron", "--", "1"}, "Failed to parse '--' as a mag value");
}

TEST_F(MagSoftIronCommand, IgnoresATenthNumberWithAWarning) {
  const Captured captured =
      runCommand<MagSoftIron>(script, {"mag-softiron", "1", "0", "0", "0", "1", "0", "0", "0", "1", "10"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_THAT(captured.out, testing::StartsWith("WARN: Ignoring extra argument '10'\n"));
}

TEST_F(MagSoftIronCommand, WritesTheMatrixIntoBothGroups) {
  const Captured captured = run();
  EXPECT_EQ(captured.result, 0);
  EXPECT_EQ(captured.err, "");
  EXPECT_EQ(captured.out,
            "Searching for magnetometer...\nReading current soft-iron matrix...\nWriting registry...\n"
            "Magnetometer soft-iron configuration succeeded.\n");
  const auto writes = writesOf(*script);
  ASSERT_EQ(writes.size(), 2U);
  EXPECT_EQ(writes[0].name(), kMagGroup);
  ASSERT_EQ(writes[0].data().items_size(), 1);
  EXPECT_EQ(numbersOf(writes[0].data(), "corr_mat"), matrix);
  EXPECT_EQ(writes[1].name(), kMagMatrixGroup);
  EXPECT_EQ(ssc::RegistryUtil::GetRegistryMatrix(writes[1].data(), false), matrix);
  EXPECT_EQ(writes[1].data().items_size(), 9);
}

TEST_F(MagSoftIronCommand, AdvancesTheVersionsOfTheMatrixAndItsNumbers) {
  script->registry[kMagGroup].mutable_items(0)->set_version(6);
  EXPECT_EQ(run().result, 0);
  const auto writes = writesOf(*script);
  ASSERT_EQ(writes.size(), 2U);
  EXPECT_EQ(versionOf(writes[0].data(), "corr_mat"), 7);
  EXPECT_EQ(versionOf(writes[0].data(), "corr_mat.0_0"), 2);
  EXPECT_EQ(versionOf(writes[1].data(), "2_2"), 2);
}

TEST_F(MagSoftIronCommand, DoesNotMissTheGroupAroundItsOwn) {
  script->registry.erase(kMagGroup);
  const Captured captured = run();
  EXPECT_EQ(captured.result, 0);
  EXPECT_EQ(captured.err, "");
  EXPECT_EQ(versionOf(script->registry[kMagGroup], "corr_mat"), 1);
}

TEST_F(MagSoftIronCommand, FillsAMatrixThatLiesInTheGroupAsAnItem) {
  sns_registry_data& data = script->registry[kMagMatrixGroup];
  data.clear_items();
  addMatrixItem(&data, "corr_mat", {1, 0, 0, 0, 1, 0, 0, 0, 1});
  data.mutable_items(0)->set_version(3);
  EXPECT_EQ(run().result, 0);
  const auto writes = writesOf(*script);
  ASSERT_EQ(writes.size(), 2U);
  EXPECT_EQ(writes[0].name(), kMagMatrixGroup);
  EXPECT_EQ(numbersOf(writes[0].data(), "corr_mat"), matrix);
  EXPECT_EQ(versionOf(writes[0].data(), "corr_mat"), 4);
  EXPECT_EQ(writes[1].name(), kMagMatrixGroup);
  EXPECT_EQ(ssc::RegistryUtil::GetRegistryMatrix(writes[1].data(), false), matrix);
}

TEST_F(MagSoftIronCommand, KnowsNoDryRun) {
  EXPECT_EQ(run({.dryRun = true}).result, 0);
  EXPECT_EQ(writesOf(*script).size(), 2U);
}

TEST_F(MagSoftIronCommand, NeedsItsGroup) {
  script->registry.erase(kMagMatrixGroup);
  const Captured captured = run();
  EXPECT_EQ(captured.result, kNotFound);
  EXPECT_THAT(captured.out, EndsWith("Reading current soft-iron matrix...\n"
                                     "Magnetometer soft-iron configuration failed.\n"));
  EXPECT_TRUE(writesOf(*script).empty());
}

TEST_F(MagSoftIronCommand, FailedWriteIsTheResult) {
  script->registryWritesFail = true;
  const Captured captured = run();
  EXPECT_EQ(captured.result, kIoError);
  EXPECT_THAT(captured.out, EndsWith("WARN: Failed to write registry. Error = -5\n"
                                     "Magnetometer soft-iron configuration failed.\n"));
  EXPECT_EQ(writesOf(*script).size(), 1U);
}

TEST_F(MagSoftIronCommand, NeedsAMagnetometer) {
  script->sensors.clear();
  const Captured captured = run();
  EXPECT_EQ(captured.result, kNotFound);
  EXPECT_EQ(captured.out, "Searching for magnetometer...\n");
  EXPECT_EQ(captured.err, "ERROR: Unable to look up the magnetometer. Error = -2\n");
}

class MagOrientCommand : public MagConfigurationTest {
 protected:
  Captured run(const char* x, const char* y, const char* z) {
    return runCommand<MagOrientation>(script, {"mag-orient", x, y, z});
  }
  void refuse(std::initializer_list<const char*> words, const std::string& message) {
    expectRefused<MagOrientation>(words, message, "Usage: vantle mag-orient [-h] X_AXIS Y_AXIS Z_AXIS\n");
  }
  static std::string textOf(const sns_registry_data& data, const std::string& name) {
    const sns_registry_data_item* const item = ssc::RegistryUtil::FindDataItem(name, data);
    return item == nullptr ? "absent" : item->str();
  }
};

TEST_F(MagOrientCommand, PrintsItsHelp) {
  EXPECT_EQ(
      runCommand<MagOrientation>(script, {"mag-orient", "-h"}).out,
      "Usage: vantle mag-orient [-h] X_AXIS Y_AXIS Z_AXIS\nOptions:\n  -h       Print this help and exit.\n"
      "Arguments:\n  X_AXIS   Sensor axis to map to the Android +x axis.\n"
      "  Y_AXIS   Sensor axis to map to the Android +y axis.\n"
      "  Z_AXIS   Sensor axis to map to the Android +z axis.\n\n"
      "Note: Each axis argument must contain a sign ('+' or '-') and a name\n      ('x', 'y', or 'z').\n\n");
}

TEST_F(MagOrientCommand, StoresEachTextWithItsZeroByte) {
  const Captured captured = run("+x", "-y", "+z");
  EXPECT_EQ(captured.result, 0);
  EXPECT_EQ(captured.out,
            "Searching for magnetometer...\nReading current orientation...\nWriting registry...\n"
            "Magnetometer orientation configuration succeeded.\n");
  const sns_registry_data& stored = script->registry[kOrientGroup];
  EXPECT_EQ(textOf(stored, "x"), "+x\0"s);
  EXPECT_EQ(textOf(stored, "y"), "-y\0"s);
  EXPECT_EQ(textOf(stored, "z"), "+z\0"s);
  EXPECT_EQ(versionOf(stored, "y"), 3);
}

TEST_F(MagOrientCommand, AcceptsAnAxisTwice) { EXPECT_EQ(run("+x", "+x", "+z").result, 0); }

TEST_F(MagOrientCommand, NamesTheFirstWordThatIsNoMapping) {
  refuse({"mag-orient", "x", "+y", "+z"}, "Invalid x-axis mapping 'x'");
  refuse({"mag-orient", "+x", "+yy", "+z"}, "Invalid y-axis mapping '+yy'");
  refuse({"mag-orient", "+x", "+y", "*z"}, "Invalid z-axis mapping '*z'");
  refuse({"mag-orient", "+X", "+y", "+z"}, "Invalid x-axis mapping '+X'");
  refuse({"mag-orient", "", "+y", "+z"}, "Invalid x-axis mapping ''");
}

TEST_F(MagOrientCommand, NeedsThreeMappings) {
  refuse({"mag-orient"}, "Three axis mappings are required");
  refuse({"mag-orient", "+x", "-y"}, "Three axis mappings are required");
}

TEST_F(MagOrientCommand, IgnoresAFourthWordWithAWarning) {
  const Captured captured = runCommand<MagOrientation>(script, {"mag-orient", "+x", "+y", "+z", "up"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_THAT(captured.out, HasSubstr("WARN: Ignoring extra argument 'up'\n"));
}

TEST_F(MagOrientCommand, MakesTheMappingInTheGroupAroundWhenItsOwnHoldsNone) {
  script->registry[kOrientGroup].clear_items();
  addFloatItem(&script->registry[kOrientGroup], "leftover", 1, 1);
  EXPECT_EQ(run("+x", "-y", "+z").result, 0);
  const auto writes = writesOf(*script);
  ASSERT_EQ(writes.size(), 2U);
  EXPECT_EQ(writes[0].name(), kPlatformGroup);
  EXPECT_EQ(textOf(writes[0].data(), "orient.y"), "-y\0"s);
  EXPECT_EQ(versionOf(writes[0].data(), "orient"), 1);
  EXPECT_EQ(writes[1].name(), kOrientGroup);
  EXPECT_EQ(textOf(writes[1].data(), "z"), "+z\0"s);
  EXPECT_EQ(writes[1].data().items_size(), 3);
}

TEST_F(MagOrientCommand, ReplacesItemsOfAnotherKind) {
  script->registry[kOrientGroup].clear_items();
  addFloatItem(&script->registry[kOrientGroup], "x", 1, 8);
  EXPECT_EQ(run("+x", "-y", "+z").result, 0);
  EXPECT_EQ(textOf(script->registry[kOrientGroup], "x"), "+x\0"s);
  EXPECT_EQ(versionOf(script->registry[kOrientGroup], "x"), 9);
}

class MagSensitivityCommand : public MagConfigurationTest {
 protected:
  Captured run(std::initializer_list<const char*> words) {
    return runCommand<MagCurrentSensitivity>(script, words);
  }
  void refuse(std::initializer_list<const char*> words, const std::string& message) {
    expectRefused<MagCurrentSensitivity>(
        words, message, "Usage: vantle mag-sensitivity [-h] [-cs normal|fast] [X_SS Y_SS Z_SS] \n");
  }
};

TEST_F(MagSensitivityCommand, PrintsItsHelp) {
  EXPECT_EQ(run({"mag-sensitivity", "-h"}).out,
            R"(Usage: vantle mag-sensitivity [-h] [-cs normal|fast] [X_SS Y_SS Z_SS] )"
            R"(
Options:
  -h              Print this help and exit.
  -c normal|fast  Clear the current sensitivity for the selected charging
                  speed. This is equivalent to a partial `--reset`.
  -s normal|fast  Set the current sensitivity for the selected charging
                  speed. Defaults to 'normal'.
Arguments:
  X_SS   Current sensitivity of X axis.
  Y_SS   Current sensitivity of Y axis.
  Z_SS   Current sensitivity of Z axis.

)");
}

TEST_F(MagSensitivityCommand, StoresForNormalChargingByDefault) {
  const Captured captured = run({"mag-sensitivity", "0.5", "-1", "-2.5"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_EQ(captured.out,
            "Searching for magnetometer...\nReading current sensitivity ...\nWriting registry...\n"
            "Magnetometer current sensitivity configuration succeeded\n");
  EXPECT_EQ(ssc::RegistryUtil::GetRegistryVector(script->registry[kNormalGroup]),
            (std::vector<float>{0.5F, -1, -2.5F}));
  EXPECT_EQ(ssc::RegistryUtil::GetRegistryVector(script->registry[kFastGroup]),
            (std::vector<float>{0, 0, 0}));
  EXPECT_EQ(versionOf(script->registry[kNormalGroup], "z"), 2);
}

TEST_F(MagSensitivityCommand, TakesTheSpeedByItsFirstLetters) {
  EXPECT_EQ(run({"mag-sensitivity", "-s", "fastest", "1", "2", "3"}).result, 0);
  EXPECT_EQ(ssc::RegistryUtil::GetRegistryVector(script->registry[kFastGroup]),
            (std::vector<float>{1, 2, 3}));
  EXPECT_EQ(run({"mag-sensitivity", "-snormally", "4", "5", "6"}).result, 0);
  EXPECT_EQ(ssc::RegistryUtil::GetRegistryVector(script->registry[kNormalGroup]),
            (std::vector<float>{4, 5, 6}));
}

TEST_F(MagSensitivityCommand, RefusesAnotherSpeed) {
  refuse({"mag-sensitivity", "-s", "slow", "1", "2", "3"}, "Invalid charging speed 'slow'");
  refuse({"mag-sensitivity", "-c", "fas"}, "Invalid charging speed 'fas'");
  refuse({"mag-sensitivity", "-s", "Normal", "1", "2", "3"}, "Invalid charging speed 'Normal'");
}

TEST_F(MagSensitivityCommand, NeedsThreeNumbers) {
  refuse({"mag-sensitivity", "-s", "fast"}, "Three sensitivities data are required");
  refuse({"mag-sensitivity", "1", "-2"}, "Three sensitivities data are required");
  refuse({"mag-sensitivity", "1", "two", "3"}, "Failed to parse 'two' as a mag value");
  refuse({"mag-sensitivity", "1", "inf", "3"}, "Failed to parse 'inf' as a mag value");
}

TEST_F(MagSensitivityCommand, OptionsEndAtTheFirstNumber) {
  refuse({"mag-sensitivity", "-1", "2", "3"}, "Invalid 'mag-sensitivity' command option '?'");
  refuse({"mag-sensitivity", "1", "-s", "3"}, "Failed to parse '-s' as a mag value");
  EXPECT_EQ(run({"mag-sensitivity", "--", "-1", "2", "3"}).result, 0);
}

TEST_F(MagSensitivityCommand, WarnsOfAFourthNumber) {
  EXPECT_THAT(run({"mag-sensitivity", "1", "2", "3", "4"}).out,
              HasSubstr("WARN: Ignoring extra argument '4'\n"));
}

TEST_F(MagSensitivityCommand, NeedsTheGroupOfTheSpeed) {
  script->registry.erase(kFastGroup);
  const Captured captured = run({"mag-sensitivity", "-s", "fast", "1", "2", "3"});
  EXPECT_EQ(captured.result, kNotFound);
  EXPECT_THAT(captured.out, EndsWith("Magnetometer current sensitivity configuration failed\n"));
}

}  // namespace
