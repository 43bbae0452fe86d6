// What "mag" takes on its command line, and its reset.
#include <string>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "mag/MagCalibrationFixture.h"

namespace {

using testing::EndsWith;
using testing::HasSubstr;
using testing::Not;

constexpr int kInvalid = -22;
constexpr int kIoError = -5;

class MagArguments : public MagCalibration {
 protected:
  /// The words are refused with the message, and the hub hears nothing of it.
  void expectRefused(std::initializer_list<const char*> words, const std::string& message) {
    const Captured captured = runWords(words);
    EXPECT_EQ(captured.result, kInvalid);
    EXPECT_EQ(captured.out, "");
    EXPECT_EQ(captured.err, "ERROR: " + message +
                                "\nUsage: vantle mag [-h] [-l LIMIT] [-t SECONDS] [--] REF_X REF_Y REF_Z\n");
    EXPECT_TRUE(script->requests.empty());
  }
};

TEST_F(MagArguments, HelpIsPrintedAndEndsWell) {
  const Captured captured = runWords({"mag", "-h", "nonsense"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_EQ(captured.out, R"(Usage: vantle mag [-h] [-l LIMIT] [-t SECONDS] [--] REF_X REF_Y REF_Z
Options:
  -h          Print this help and exit.
  -l LIMIT    Verify that calculated biases are not greater than LIMIT.
  -t SECONDS  Collect samples for the given number of seconds.
                Default is 2.
  -u          Calculate the bias with an uncorrected mean, calculated by
                multiplying by the inverse of the correction matrix on the
                left.
Arguments:
  REF_X       X-value of the reference magnetic field in microteslas.
  REF_Y       Y-value of the reference magnetic field in microteslas.
  REF_Z       Z-value of the reference magnetic field in microteslas.

Note: To enter any negative reference values, "--" is required.

)");
  EXPECT_EQ(captured.err, "");
  EXPECT_TRUE(script->requests.empty());
}

TEST_F(MagArguments, NegativeReferenceWithoutTwoDashesIsTakenAsAnOption) {
  expectRefused({"mag", "20", "0", "-40"}, "Invalid 'mag' command option '?'");
  expectRefused({"mag", "-20", "0", "40"}, "Invalid 'mag' command option '?'");
}

TEST_F(MagArguments, TooFewReferencesAreCounted) {
  expectRefused({"mag"}, "3 reference values are required; 0 were provided");
  expectRefused({"mag", "20"}, "3 reference values are required; 1 was provided");
  expectRefused({"mag", "20", "0"}, "3 reference values are required; 2 were provided");
}

TEST_F(MagArguments, ReferenceThatIsNoNumberIsNamed) {
  expectRefused({"mag", "20", "north", "40"}, "Failed to parse 'north' as a reference value");
  expectRefused({"mag", "1e40", "0", "40"}, "Failed to parse '1e40' as a reference value");
}

TEST_F(MagArguments, LimitMustBePositiveAndFinite) {
  for (const char* limit : {"0", "-1", "nan", "inf", "much", "1e99"}) {
    expectRefused({"mag", "-l", limit, "20", "0", "40"}, "LIMIT must be a positive number");
  }
}

TEST_F(MagArguments, SecondsMustBePositive) {
  for (const char* seconds : {"0", "-1", "2.5", "soon", "99999999999999999999"}) {
    expectRefused({"mag", "-t", seconds, "20", "0", "40"}, "SECONDS must be a positive integer");
  }
}

TEST_F(MagArguments, UnknownOptionAndOptionWithoutItsArgumentAreRefused) {
  expectRefused({"mag", "-x", "20", "0", "40"}, "Invalid 'mag' command option '?'");
  expectRefused({"mag", "20", "0", "40", "-l"}, "Invalid 'mag' command option '?'");
}

TEST_F(MagArguments, FurtherWordsAreIgnoredWithAWarning) {
  const Captured captured = runWords({"mag", "20", "0", "40", "50", "sixty"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_THAT(captured.out,
              HasSubstr("WARN: Ignoring extra argument '50'\nWARN: Ignoring extra argument 'sixty'\n"));
}

TEST_F(MagArguments, DeprecatedOptionChangesNothingButWarns) {
  const Captured plain = run();
  const Captured deprecated = runWords({"mag", "-u", "--", "20", "0", "-40"});
  EXPECT_EQ(deprecated.result, 0);
  EXPECT_THAT(deprecated.out, HasSubstr("WARN: 'mag' command option '-u' has been deprecated\n"));
  const std::string bias = "BIAS:       20.000000      15.000000     -20.000000\n";
  EXPECT_THAT(plain.out, HasSubstr(bias));
  EXPECT_THAT(deprecated.out, HasSubstr(bias));
}

class MagReset : public MagCalibration {
 protected:
  Captured reset(CommandSettings settings = {}) {
    settings.reset = true;
    return runWords({"mag", "these", "words", "--are", "not", "read"}, settings);
  }
};

TEST_F(MagReset, StoresZerosAndSendsNoNotification) {
  setItem("bias", {1, 2, 3});
  const Captured captured = reset();
  EXPECT_EQ(captured.result, 0);
  EXPECT_EQ(captured.out,
            "Searching for magnetometer...\nResetting magnetometer calibration...\n"
            "Reboot device for default calibration to take effect.\n");
  EXPECT_EQ(numbersOf(group(), "bias"), (std::vector<float>{0, 0, 0}));
  EXPECT_EQ(versionOf(group(), "bias"), 5);
  EXPECT_EQ(versionOf(group(), "mean_temp"), 8);
  EXPECT_EQ(script->countRequests(kMagRawSuid, ssc::kCalibrationChangedRequest), 0);
}

TEST_F(MagReset, WritesUnderADryRunToo) {
  setItem("bias", {1, 2, 3});
  EXPECT_EQ(reset({.dryRun = true}).result, 0);
  EXPECT_EQ(numbersOf(group(), "bias"), (std::vector<float>{0, 0, 0}));
}

TEST_F(MagReset, RepairsABiasOfTheWrongKind) {
  removeItem("bias");
  addFloatItem(&group(), "bias", 1, 9);
  EXPECT_EQ(reset().result, 0);
  EXPECT_EQ(numbersOf(group(), "bias"), (std::vector<float>{0, 0, 0}));
  EXPECT_EQ(versionOf(group(), "bias"), 10);
}

TEST_F(MagReset, MissingBiasIsNamed) {
  removeItem("bias");
  const Captured captured = reset();
  EXPECT_EQ(captured.result, kInvalid);
  EXPECT_EQ(captured.err, "ERROR: Invalid registry; missing \"bias\"\n");
  EXPECT_TRUE(writesOf(*script).empty());
}

TEST_F(MagReset, FailedWriteIsTheResultAndPromisesNothing) {
  script->registryWritesFail = true;
  const Captured captured = reset();
  EXPECT_EQ(captured.result, kIoError);
  EXPECT_THAT(captured.out, EndsWith("WARN: Failed to write registry. Error = -5\n"));
  EXPECT_THAT(captured.out, Not(HasSubstr("Reboot")));
}

}  // namespace
