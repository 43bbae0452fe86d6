// The checks of the matrix themselves: each of them finds what it is there to find, and nothing in a run that
// is as it must be.
#include "fault/FaultChecks.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "ssc/Results.h"
#include "support/TemporaryFolder.h"

namespace fault {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

CommandMode calibration() {
  CommandMode mode;
  mode.family = "baro";
  mode.name = "calibrate";
  mode.lookedUp = mode.streamed = "pressure";
  mode.ending = Ending::kTime;
  mode.begins = "Calibration begins";
  mode.closes = "Calibration";
  mode.storesInRegistry = true;
  return mode;
}

const Captured kSucceeded{"Calibration begins.\nCalibration succeeded.\n", "", 0};

Captured failed(const std::string& warnings, const std::string& close = "Calibration failed.\n") {
  return {"Calibration begins.\n" + warnings + close, "", ssc::kInvalid};
}

Problems problemsOf(const Captured& run, const Expected& expected, const Captured& good = kSucceeded) {
  return checkOutput(calibration(), good, run, expected);
}

// Output.

TEST(CheckOutput, FindsNothingInRunsThatAreAsTheyMustBe) {
  EXPECT_THAT(problemsOf(kSucceeded, {}), IsEmpty());
  EXPECT_THAT(problemsOf(failed("WARN: too dark\n"), {ssc::kInvalid, "too dark"}), IsEmpty());
  const Captured notBegun{"", "ERROR: Unable to look up the sensor\n", ssc::kInvalid};
  EXPECT_THAT(problemsOf(notBegun, {ssc::kInvalid, "Unable"}), IsEmpty());
}

TEST(CheckOutput, FindsAnotherResult) {
  EXPECT_THAT(problemsOf(failed("WARN: x\n"), {ssc::kNoData, ""}), ElementsAre(HasSubstr("should be -61")));
}

TEST(CheckOutput, FindsAnotherMessage) {
  EXPECT_THAT(problemsOf(failed("WARN: x\n"), {ssc::kInvalid, "too dark"}),
              ElementsAre(HasSubstr("does not say \"too dark\"")));
}

TEST(CheckOutput, FindsASuccessThatIsNone) {
  EXPECT_THAT(
      problemsOf(failed("WARN: x\n", "Calibration failed.\nCalibration succeeded.\n"), {ssc::kInvalid}),
      ElementsAre(HasSubstr("fails, and says that it succeeded")));
}

TEST(CheckOutput, FindsASuccessThatIsNotSaid) {
  EXPECT_THAT(problemsOf({"Calibration begins.\n", "", 0}, {}), ElementsAre(HasSubstr("does not say so")));
}

TEST(CheckOutput, FindsAFailureThatIsNone) {
  EXPECT_THAT(problemsOf({kSucceeded.out + "Calibration failed.\n", "", 0}, {}),
              ElementsAre(HasSubstr("succeeds, and says that it failed")));
}

TEST(CheckOutput, FindsAFailureWithoutACause) {
  EXPECT_THAT(problemsOf(failed(""), {ssc::kInvalid}), ElementsAre(HasSubstr("without saying why")));
  EXPECT_THAT(problemsOf(failed(""), {ssc::kInvalid, "", Reason::kUnsaid}), IsEmpty());
}

TEST(CheckOutput, TakesNoWarningForACauseThatAGoodHubBringsAsWell) {
  const std::string usual = "WARN: There is an existing calibration\n";
  const Captured good{usual + kSucceeded.out, "", 0};
  EXPECT_THAT(problemsOf(failed(usual), {ssc::kInvalid}, good), ElementsAre(HasSubstr("without saying why")));
  EXPECT_THAT(problemsOf(failed(usual + "WARN: too dark\n"), {ssc::kInvalid}, good), IsEmpty());
}

TEST(CheckOutput, FindsABeginningWithoutAnEnd) {
  EXPECT_THAT(problemsOf(failed("WARN: x\n", ""), {ssc::kInvalid}), ElementsAre(HasSubstr("does not close")));
}

// Time.

TEST(CheckTime, AllowsTheTimeOnAGoodHubAndTheWaitsForResponses) {
  Traffic good;
  good.end = 5;
  good.waited = 1;
  Traffic run;
  run.waited = 6;
  run.end = 5 - 1 + 6 + 10;
  EXPECT_THAT(checkTime(good, run), IsEmpty());
  run.end += 0.01;
  EXPECT_THAT(checkTime(good, run), ElementsAre(HasSubstr("instead of at most 20")));
}

// Registry.

class CheckRegistry : public testing::Test {
 protected:
  CheckRegistry() {
    const support::TemporaryFolder root;
    CommandMode mode;
    mode.device = "o1v1";
    mode.lookedUp = "pressure";
    mode.before = {{{"baro", "1013.25"}, {}}};
    EXPECT_EQ(prepareHandset(mode, root.path()), "");
    states.done = registryFiles(root.path());
    EXPECT_EQ(prepareHandset(mode, root.path()), "");
    again = registryFiles(root.path());
  }
  [[nodiscard]] Problems problemsOf(const Files& before, const Files& after, Stored stored) const {
    return checkRegistry(states, before, after, stored);
  }
  RegistryStates states;  ///< nothing stored; calibrated
  Files again;            ///< calibrated twice
};

TEST_F(CheckRegistry, FindsNothingWhereAllIsAsItMustBe) {
  EXPECT_THAT(problemsOf({}, {}, Stored::kNothing), IsEmpty());
  EXPECT_THAT(problemsOf({}, {}, Stored::kPerhaps), IsEmpty());
  EXPECT_THAT(problemsOf({}, states.done, Stored::kPerhaps), IsEmpty());
  EXPECT_THAT(problemsOf({}, states.done, Stored::kAll), IsEmpty());
  EXPECT_THAT(problemsOf(states.done, again, Stored::kAll), IsEmpty());
}

TEST_F(CheckRegistry, FindsWhatMustNotBeStored) {
  EXPECT_FALSE(problemsOf({}, states.done, Stored::kNothing).empty());
  EXPECT_FALSE(problemsOf(states.done, again, Stored::kNothing).empty());
}

TEST_F(CheckRegistry, FindsWhatIsGone) {
  EXPECT_FALSE(problemsOf(states.done, {}, Stored::kNothing).empty());
  EXPECT_FALSE(problemsOf(states.done, {}, Stored::kPerhaps).empty());
}

TEST_F(CheckRegistry, FindsWhatIsNotStored) {
  EXPECT_FALSE(problemsOf({}, {}, Stored::kAll).empty());
  EXPECT_FALSE(problemsOf(states.done, states.done, Stored::kAll).empty());
  Files some = states.done;
  some.erase(some.begin());
  EXPECT_FALSE(problemsOf({}, some, Stored::kAll).empty());
}

TEST_F(CheckRegistry, FindsWhatIsNotWhole) {
  for (auto& [name, content] : states.done) {
    Files torn = states.done;
    torn[name] = content.substr(0, content.size() / 2);
    EXPECT_THAT(problemsOf({}, torn, Stored::kPerhaps), ElementsAre(HasSubstr("is not whole"))) << name;
    torn[name] = "{}";
    EXPECT_THAT(problemsOf({}, torn, Stored::kAll), ElementsAre(HasSubstr("is not whole"))) << name;
  }
}

TEST_F(CheckRegistry, FindsWhatIsNotDeleted) {
  const RegistryStates deleting{states.done, {}};
  EXPECT_THAT(checkRegistry(deleting, states.done, {}, Stored::kAll), IsEmpty());
  EXPECT_FALSE(checkRegistry(deleting, states.done, states.done, Stored::kAll).empty());
}

// Files between steps.

constexpr const char* kImuFile = "data/app-ephemeral/vantle_imu";
constexpr const char* kColorFile = "data/app-ephemeral/vantle_color";
constexpr const char* kLightFile = "data/app-ephemeral/vantle_als";
constexpr const char* kLightLog = "persist/sensors/als_pattern_cal.csv";
constexpr const char* kTable = "sys/devices/platform/soc/soc:qcom,dsi-display-primary/te2_table";

class CheckRecords : public testing::Test {
 protected:
  [[nodiscard]] Problems problemsOf(const RecordsRun& run = {}) const {
    return checkRecords(mode, run, before.path(), after.path());
  }
  void writeBefore(const char* path, const std::string& content) {
    ASSERT_TRUE(support::writeFile(before.path() / path, content));
  }
  void writeAfter(const char* path, const std::string& content) {
    ASSERT_TRUE(support::writeFile(after.path() / path, content));
  }
  CommandMode mode;
  support::TemporaryFolder before;
  support::TemporaryFolder after;
};

TEST_F(CheckRecords, FindsLostRecords) {
  mode.keepsRecords = true;
  const std::string record(36, 'r');
  writeBefore(kColorFile, record);
  EXPECT_THAT(problemsOf({.failed = true}), ElementsAre(HasSubstr("records of earlier steps are gone")));
  writeAfter(kColorFile, std::string(72, 'x'));
  EXPECT_THAT(problemsOf(), ElementsAre(HasSubstr("records of earlier steps are gone")));
  writeAfter(kColorFile, record + record);
  EXPECT_THAT(problemsOf(), IsEmpty());
}

TEST_F(CheckRecords, FindsHalfWrittenRecords) {
  mode.keepsRecords = true;
  struct Row {
    const char* path;
    std::string half;
  };
  const Row rows[] = {
      {kColorFile, std::string(36 + 9, 'r')},
      {kLightFile, std::string(48 + 7, 'r')},
      {kImuFile, "a+x 1 2 3"},
      {kLightLog, "500.0,1.0\n500"},
      {kTable, "1258 1260 1258"},
  };
  for (const Row& row : rows) {
    writeAfter(row.path, row.half);
    EXPECT_THAT(problemsOf({.failed = true}), ElementsAre(HasSubstr(row.path)));
    writeAfter(row.path, "");
  }
}

TEST_F(CheckRecords, FindsARecordThatIsNotKept) {
  mode.keepsRecords = true;
  EXPECT_THAT(problemsOf({.failed = true}), IsEmpty());
  EXPECT_THAT(problemsOf(), ElementsAre(HasSubstr("without having kept its record")));
}

TEST_F(CheckRecords, FindsATouchOfTheRecordsOfOthers) {
  writeAfter(kColorFile, std::string(36, 'r'));
  EXPECT_THAT(problemsOf(), ElementsAre(HasSubstr("touches records of others")));
}

TEST_F(CheckRecords, FindsAChangeBeforeACommandCanHaveBegun) {
  mode.dropsRecords = true;
  writeBefore(kColorFile, std::string(36, 'r'));
  EXPECT_THAT(problemsOf({.failed = true}), IsEmpty());
  EXPECT_THAT(problemsOf({.failed = true, .mayHaveBegun = false}),
              ElementsAre(HasSubstr("before it can have begun")));
}

// Rows.

TEST(CheckRow, FindsARowThatSaysOtherThanItsCommandDoes) {
  CommandMode right = calibration();
  right.device = "o1v1";
  right.words = {"baro", "1013.25"};
  right.streamed = "pressure_raw";
  right.begins = "Barometer calibration begins";
  right.closes = "Barometer calibration";
  right.notice = Notice::kWarning;
  const support::TemporaryFolder root;
  ASSERT_EQ(prepareHandset(right, root.path()), "");
  const auto problemsOf = [&](const CommandMode& mode) {
    return checkRow(mode, runWatched(root.path(), mode.device, mode.words, {}, mode.streamed));
  };
  EXPECT_THAT(problemsOf(right), IsEmpty());

  CommandMode wrong = right;
  wrong.begins = "Something else begins";
  EXPECT_THAT(problemsOf(wrong), ElementsAre(HasSubstr("begin")));
  wrong = right;
  wrong.closes = "Something else";
  EXPECT_THAT(problemsOf(wrong), ElementsAre(HasSubstr("succeed")));
  wrong = right;
  wrong.streamed = "gyro";
  wrong.notice = Notice::kNone;
  EXPECT_THAT(problemsOf(wrong), ElementsAre(HasSubstr("another one")));
  wrong = right;
  wrong.ending = Ending::kNoSamples;
  EXPECT_THAT(problemsOf(wrong), ElementsAre(HasSubstr("measures")));
  wrong = right;
  wrong.notice = Notice::kNone;
  EXPECT_THAT(problemsOf(wrong), ElementsAre(HasSubstr("tells")));
  wrong = right;
  wrong.lookedUp = "";
  EXPECT_THAT(problemsOf(wrong), testing::Contains(HasSubstr("asks the hub")));
}

}  // namespace
}  // namespace fault
