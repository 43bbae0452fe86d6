#include "imu/ImuMultipointStage.h"

namespace {

using testing::HasSubstr;
using testing::SizeIs;
using testing::StartsWith;

TEST_F(ImuMultipointTest, HelpIsUsageAndOptions) {
  const Captured captured = run({"imu-multipoint", "--help"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_THAT(captured.out, StartsWith(std::string(kUsage) + "Options:\n\n  --clear, -c "));
  EXPECT_THAT(captured.out, testing::EndsWith("this command performs an intermediate step of\n"
                                              "a multi-point calibration.\n"));
  EXPECT_THAT(script->requests, SizeIs(0));
}

TEST_F(ImuMultipointTest, BadWordsAreErrorsWithTheUsageLine) {
  const std::vector<std::pair<std::vector<const char*>, std::string>> cases{
      {{"--phase", "a+xx"}, "Invalid POS argument: a+xx"},
      {{"-p", "b+x"}, "Invalid POS argument: b+x"},
      {{"--time", "0"}, "SECONDS must be a positive integer"},
      {{"-t", "2s"}, "SECONDS must be a positive integer"},
      {{"-g", "much"}, "GRAVITY must be a number"},
      {{"-g", "nan"}, "GRAVITY must be a number"},
      {{"--accel-bias", "x"}, "Limits must be positive numbers"},
      {{"--accel-scale", "1,0"}, "Limits must be positive numbers"},
      {{"--accel-stdev", "x"}, "Limits must be positive numbers"},
      {{"--gyro-bias", "x"}, "Limits must be positive numbers"},
      {{"--gyro-stdev", "x"}, "Limits must be positive numbers"},
      {{"--a+x-refx", "x"}, "Limits must be positive numbers"},
      {{"--g+z-refz", "x"}, "Limits must be positive numbers"},
      {{"--gyro-const-rate-window", "x"}, "Limits must be positive numbers"},
      {{"--a-x-refx", "1"}, "Invalid 'imu-multipoint' command option '?'"},
      {{"-z"}, "Invalid 'imu-multipoint' command option '?'"},
      {{"--phase"}, "Invalid 'imu-multipoint' command option '?'"},
      {{"middle"}, "Invalid argument 'middle'"},
      {{"First"}, "Invalid argument 'First'"},
  };
  for (const auto& [words, message] : cases) {
    const Captured captured =
        words.size() == 1 ? run({"imu-multipoint", words[0]}) : run({"imu-multipoint", words[0], words[1]});
    EXPECT_EQ(captured.result, kInvalid) << message;
    EXPECT_EQ(captured.err, "ERROR: " + message + "\n" + kUsage);
    EXPECT_THAT(script->requests, SizeIs(0));
  }
}

TEST_F(ImuMultipointTest, ANegativeLimitIsAcceptedAndNeverCompared) {
  readings(accel, [](int index) { return std::vector<float>{0, 0, index % 2 == 0 ? 9.0F : 10.0F}; });
  const Captured captured = run({"imu-multipoint", "--accel-bias", "-1", "--accel-stdev", "-1"});
  EXPECT_EQ(captured.result, 0);
}

TEST_F(ImuMultipointTest, WordsAfterTheStepAreIgnoredWithAWarning) {
  perPhase();
  const Captured captured = run({"imu-multipoint", "first", "last"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_THAT(captured.out, StartsWith("WARN: Ignoring extra argument 'last'\n"));
  EXPECT_THAT(captured.out, HasSubstr("Beginning IMU multi-point calibration.\n"));
}

TEST_F(ImuMultipointTest, ClearRemovesTheRecordsAtAnyStep) {
  perPhase();
  writeFile("old\n");
  EXPECT_EQ(run({"imu-multipoint", "--clear"}).result, 0);
  EXPECT_FALSE(hasFile());
  // Even when a later word is wrong: it happens while the words are read.
  writeFile("old\n");
  EXPECT_EQ(run({"imu-multipoint", "-c", "-t", "0"}).result, kInvalid);
  EXPECT_FALSE(hasFile());
}

}  // namespace
