// Every order of words and both sides of every limit.
#include "light/UdAlsArguments.h"

#include <cmath>
#include <limits>

#include <gtest/gtest.h>

namespace {

using Words = std::vector<const char*>;

struct Parsed {
  std::string error;
  UdAlsArguments arguments;
  std::size_t firstIgnored = 0;
};

Parsed parse(const Words& words) {
  Parsed parsed;
  parsed.error = parseUdAlsWords(words, &parsed.arguments, &parsed.firstIgnored);
  return parsed;
}

std::string joined(const Words& words) {
  std::string text;
  for (const char* word : words) text += std::string(text.empty() ? "" : " ") + "'" + word + "'";
  return text;
}

// What the words select.

struct ModeCase {
  Words words;
  std::uint32_t mode;
};

TEST(UdAlsWords, SelectTheMode) {
  const ModeCase cases[] = {
      {{"trigger"}, 0},
      {{"trigger", "disable"}, 1},
      {{"trigger", "enable"}, 2},
      {{"trigger", "enable", "5"}, 2},
      {{"autogain"}, 3},
      {{"autogain", "disable"}, 4},
      {{"autogain", "enable"}, 5},
      {{"caldelay", "100", "3", "0", "5", "1"}, 6},
      {{"caldelay_te2", "100", "3", "0", "2", "5", "1"}, 7},
      {{"100"}, 8},
      {{"100", "4000"}, 8},
      {{"calgain", "100", "3"}, 9},
      {{"calgain", "ir"}, 10},
      {{"calgain", "ir", "100", "3"}, 10},
      {{"pwm", "100", "3", "128"}, 11},
      {{"sample"}, 12},
      {{"white", "128"}, 13},
      {{"red", "128"}, 13},
      {{"green", "128"}, 13},
      {{"blue", "128"}, 13},
      {{"delay", "5"}, 14},
      {{"gain"}, 15},
      {{"gain", "3"}, 15},
      {{"gain", "itime"}, 16},
      {{"gain", "3", "itime"}, 16},
      {{"gain", "3", "itime", "100"}, 16},
      {{"itime"}, 17},
      {{"itime", "100"}, 17},
      {{"itime", "gain"}, 18},
      {{"itime", "100", "gain", "3"}, 18},
      {{"gain", "3", "itime", "100", "gain", "4"}, 18},
      {{"itime", "100", "gain", "3", "itime", "200"}, 16},
      {{"set_te2", "10", "20"}, 19},
  };
  for (const ModeCase& row : cases) {
    const Parsed parsed = parse(row.words);
    EXPECT_EQ(parsed.error, "") << joined(row.words);
    EXPECT_EQ(static_cast<std::uint32_t>(parsed.arguments.mode), row.mode) << joined(row.words);
    EXPECT_EQ(parsed.firstIgnored, row.words.size()) << joined(row.words);
  }
}

TEST(UdAlsWords, SubCommandsAreFirstWordsOnly) {
  EXPECT_EQ(parse({"100", "sample"}).error, "Reference cct must be a non-negative number");
  const Parsed labelled = parse({"100", "4000", "white"});
  EXPECT_EQ(labelled.error, "");
  EXPECT_EQ(labelled.arguments.mode, UdAlsMode::kLux);
  EXPECT_EQ(labelled.arguments.displayColor, "white");
  EXPECT_EQ(labelled.arguments.patternColor, "");
  EXPECT_EQ(parse({"Sample"}).error, "Reference lux must be a non-negative number");
  EXPECT_EQ(parse({"ir"}).error, "Reference lux must be a non-negative number");
}

TEST(UdAlsWords, NothingGivenLeavesEveryNumberUnset) {
  const UdAlsArguments arguments = parse({"sample"}).arguments;
  EXPECT_EQ(arguments.brightness, -1.0F);
  EXPECT_EQ(arguments.alsDelay, -1.0F);
  EXPECT_EQ(arguments.delayEnd, -1.0F);
  EXPECT_EQ(arguments.delayStart, -1.0F);
  EXPECT_EQ(arguments.delayStep, -1.0F);
  EXPECT_EQ(arguments.gain, -1);
  EXPECT_EQ(arguments.integrationTime, -1.0F);
  EXPECT_EQ(arguments.referenceCct, -1.0F);
  EXPECT_EQ(arguments.referenceLux, -1.0F);
  EXPECT_EQ(arguments.te2DelayEnd, -1.0F);
  EXPECT_EQ(arguments.te2DelayStart, -1.0F);
  EXPECT_EQ(arguments.te2DelayStep, -1.0F);
  EXPECT_EQ(arguments.risingEdgeDelay, -1);
  EXPECT_EQ(arguments.fallingEdgeDelay, -1);
  EXPECT_EQ(arguments.patternColor, "");
  EXPECT_EQ(arguments.displayColor, "");
  EXPECT_FALSE(arguments.clearData || arguments.clearOnly || arguments.writeAfterCollect ||
               arguments.writeOnly);
}

// Where the words go.

TEST(UdAlsWords, OfALuxStep) {
  const UdAlsArguments arguments = parse({"100", "4000", "d65", "128"}).arguments;
  EXPECT_EQ(arguments.referenceLux, 100.0F);
  EXPECT_EQ(arguments.referenceCct, 4000.0F);
  EXPECT_EQ(arguments.displayColor, "d65");
  EXPECT_EQ(arguments.brightness, 128.0F);
}

TEST(UdAlsWords, AnEmptyColourIsAskedForAgain) {
  const UdAlsArguments arguments = parse({"100", "4000", "", "d65", "128"}).arguments;
  EXPECT_EQ(arguments.displayColor, "d65");
  EXPECT_EQ(arguments.brightness, 128.0F);
}

TEST(UdAlsWords, OfADelayScan) {
  const UdAlsArguments arguments = parse({"caldelay", "100.5", "3", "0", "5.5", "0.25"}).arguments;
  EXPECT_EQ(arguments.integrationTime, 100.5F);
  EXPECT_EQ(arguments.gain, 3);
  EXPECT_EQ(arguments.delayStart, 0.0F);
  EXPECT_EQ(arguments.delayEnd, 5.5F);
  EXPECT_EQ(arguments.delayStep, 0.25F);
}

TEST(UdAlsWords, OfATe2DelayScan) {
  const UdAlsArguments arguments = parse({"caldelay_te2", "100.5", "3", "1.5", "2", "4095", "8"}).arguments;
  EXPECT_EQ(arguments.integrationTime, 100.5F);
  EXPECT_EQ(arguments.gain, 3);
  EXPECT_EQ(arguments.alsDelay, 1.5F);
  EXPECT_EQ(arguments.te2DelayStart, 2.0F);
  EXPECT_EQ(arguments.te2DelayEnd, 4095.0F);
  EXPECT_EQ(arguments.te2DelayStep, 8.0F);
  EXPECT_EQ(arguments.delayStart, -1.0F);
}

TEST(UdAlsWords, OfTheGainCalibrations) {
  for (const Words& words : {Words{"calgain", "100.5", "0x0b"}, Words{"calgain", "ir", "100.5", "11"}}) {
    const UdAlsArguments arguments = parse(words).arguments;
    EXPECT_EQ(arguments.integrationTime, 100.5F) << joined(words);
    EXPECT_EQ(arguments.gain, 11) << joined(words);
  }
}

TEST(UdAlsWords, OfThePwmCalibration) {
  const UdAlsArguments arguments = parse({"pwm", "100.5", "3", "128"}).arguments;
  EXPECT_EQ(arguments.integrationTime, 100.5F);
  EXPECT_EQ(arguments.gain, 3);
  EXPECT_EQ(arguments.brightness, 128.0F);
}

TEST(UdAlsWords, OfTheScreenPattern) {
  for (const char* color : {"white", "red", "green", "blue"}) {
    const UdAlsArguments arguments = parse({color, "77.5"}).arguments;
    EXPECT_EQ(arguments.patternColor, color);
    EXPECT_EQ(arguments.brightness, 77.5F);
    EXPECT_EQ(arguments.displayColor, "");
  }
}

TEST(UdAlsWords, OfTheSettings) {
  EXPECT_EQ(parse({"trigger", "enable", "5.5"}).arguments.alsDelay, 5.5F);
  EXPECT_EQ(parse({"delay", "5.5"}).arguments.alsDelay, 5.5F);
  EXPECT_EQ(parse({"gain", "7"}).arguments.gain, 7);
  EXPECT_EQ(parse({"itime", "0"}).arguments.integrationTime, 0.0F);
  for (const Words& words : {Words{"gain", "7", "itime", "100"}, Words{"itime", "100", "gain", "7"}}) {
    EXPECT_EQ(parse(words).arguments.gain, 7) << joined(words);
    EXPECT_EQ(parse(words).arguments.integrationTime, 100.0F) << joined(words);
  }
  EXPECT_EQ(parse({"set_te2", "10", "0x14"}).arguments.risingEdgeDelay, 10);
  EXPECT_EQ(parse({"set_te2", "10", "0x14"}).arguments.fallingEdgeDelay, 20);
}

TEST(UdAlsWords, ALaterNumberReplacesTheSettingBefore) {
  EXPECT_EQ(parse({"gain", "3", "4"}).arguments.gain, 4);
  EXPECT_EQ(parse({"itime", "100", "200"}).arguments.integrationTime, 200.0F);
  EXPECT_EQ(parse({"itime", "100", "gain", "3", "4"}).arguments.gain, 4);
  EXPECT_EQ(parse({"gain", "3", "itime", "100", "200"}).arguments.integrationTime, 200.0F);
  EXPECT_EQ(parse({"delay", "1", "2"}).arguments.alsDelay, 2.0F);
  EXPECT_EQ(parse({"trigger", "enable", "1", "2"}).arguments.alsDelay, 2.0F);
  EXPECT_EQ(parse({"white", "1", "2"}).arguments.brightness, 2.0F);
  EXPECT_EQ(parse({"pwm", "100", "3", "1", "2"}).arguments.brightness, 2.0F);
}

TEST(UdAlsWords, CalibrationsIgnoreWhatFollowsTheirNumbers) {
  const Words cases[] = {
      {"caldelay", "100", "3", "0", "5", "1", "x", "nan"},
      {"caldelay_te2", "100", "3", "0", "2", "5", "1", "x", "nan"},
      {"calgain", "100", "3", "x", "nan"},
      {"calgain", "ir", "100", "3", "x", "nan"},
      {"set_te2", "10", "20", "x", "nan"},
  };
  for (const Words& words : cases) {
    const Parsed parsed = parse(words);
    EXPECT_EQ(parsed.error, "") << joined(words);
    EXPECT_EQ(parsed.firstIgnored, words.size()) << joined(words);  // no warning
  }
}

TEST(UdAlsWords, SomeModesWarnOfWhatFollows) {
  const std::pair<Words, std::size_t> cases[] = {
      {{"sample", "x", "y"}, 1},
      {{"trigger", "disable", "x"}, 2},
      {{"autogain", "disable", "x"}, 2},
      {{"autogain", "enable", "x", "y"}, 2},
  };
  for (const auto& [words, firstIgnored] : cases) {
    EXPECT_EQ(parse(words).error, "") << joined(words);
    EXPECT_EQ(parse(words).firstIgnored, firstIgnored) << joined(words);
  }
}

// What is refused.

constexpr const char* kScanIncomplete = "No gain or integration time or start end step of delay specified";

TEST(UdAlsWords, WhatIsMissingIsSaid) {
  const std::pair<Words, const char*> cases[] = {
      {{}, "No reference lux was specified"},
      {{"caldelay"}, kScanIncomplete},
      {{"caldelay", "100"}, kScanIncomplete},
      {{"caldelay", "100", "3"}, kScanIncomplete},
      {{"caldelay", "100", "3", "0"}, kScanIncomplete},
      {{"caldelay", "100", "3", "0", "5"}, kScanIncomplete},
      {{"caldelay", "100", "-1", "0", "5", "1"}, kScanIncomplete},
      // A gain that counts as missing stays missing, whatever follows.
      {{"caldelay", "100", "-1", "3", "4", "5", "1"}, kScanIncomplete},
      {{"caldelay_te2"}, kScanIncomplete},
      {{"caldelay_te2", "100"}, kScanIncomplete},
      {{"caldelay_te2", "100", "3"}, kScanIncomplete},
      {{"caldelay_te2", "100", "3", "0"}, kScanIncomplete},
      {{"caldelay_te2", "100", "3", "0", "2"}, kScanIncomplete},
      {{"caldelay_te2", "100", "3", "0", "2", "5"}, kScanIncomplete},
      {{"caldelay_te2", "100", "-1", "0", "2", "5", "1"}, kScanIncomplete},
      {{"calgain"}, "No gain or integration time specified"},
      {{"calgain", "100"}, "No gain or integration time specified"},
      {{"calgain", "100", "-1"}, "No gain or integration time specified"},
      {{"pwm"}, "No gain or integration time or brightness level specified"},
      {{"pwm", "100"}, "No gain or integration time or brightness level specified"},
      {{"pwm", "100", "3"}, "No gain or integration time or brightness level specified"},
      {{"pwm", "100", "-1", "128"}, "No gain or integration time or brightness level specified"},
      {{"white"}, "No brightness level specified"},
      {{"red"}, "No brightness level specified"},
      {{"green"}, "No brightness level specified"},
      {{"blue"}, "No brightness level specified"},
      {{"delay"}, "No ALS delay specified"},
      {{"set_te2"}, "No rising or falling edge delay specified"},
      {{"set_te2", "10"}, "No rising or falling edge delay specified"},
  };
  for (const auto& [words, error] : cases) EXPECT_EQ(parse(words).error, error) << joined(words);
}

TEST(UdAlsWords, SettingsAndTheInfraredGainMayLackTheirNumbers) {
  for (const Words& words : {Words{"gain"}, Words{"itime"}, Words{"gain", "itime"}, Words{"itime", "gain"},
                             Words{"gain", "-1"}, Words{"trigger", "enable"}, Words{"calgain", "ir"},
                             Words{"calgain", "ir", "100"}, Words{"calgain", "ir", "100", "-1"}}) {
    EXPECT_EQ(parse(words).error, "") << joined(words);
  }
}

TEST(UdAlsWords, WordsWithoutAMeaningAreNamed) {
  EXPECT_EQ(parse({"trigger", "on"}).error, "Invalid argument 'on'");
  EXPECT_EQ(parse({"trigger", ""}).error, "Invalid argument ''");
  EXPECT_EQ(parse({"autogain", "5"}).error, "Invalid argument '5'");
  EXPECT_EQ(parse({"100", "4000", "d65", "128", "more"}).error, "Invalid argument 'more'");
  EXPECT_EQ(parse({"100", "4000", "d65", "0", "more"}).error, "Invalid argument 'more'");
}

struct NumberCase {
  const char* name;
  Words before;  ///< the words that lead to the number
  Words after;   ///< those that make the command complete
  const char* message;
  std::vector<const char*> accepted;
  std::vector<const char*> refused;
};

const std::vector<const char*> kNoNumbers{"x",   "1x",   "1 ",       "nan",  "-nan",
                                          "inf", "-inf", "infinity", "1e40", "-1e40"};

class UdAlsNumber : public testing::TestWithParam<NumberCase> {
 protected:
  [[nodiscard]] static Words wordsWith(const char* number) {
    Words words = GetParam().before;
    words.push_back(number);
    words.insert(words.end(), GetParam().after.begin(), GetParam().after.end());
    return words;
  }
};

TEST_P(UdAlsNumber, IsAcceptedWithinItsLimitsOnly) {
  for (const char* number : GetParam().accepted) {
    EXPECT_EQ(parse(wordsWith(number)).error, "") << joined(wordsWith(number));
  }
  std::vector<const char*> refused = GetParam().refused;
  refused.insert(refused.end(), kNoNumbers.begin(), kNoNumbers.end());
  for (const char* number : refused) {
    EXPECT_EQ(parse(wordsWith(number)).error, GetParam().message) << joined(wordsWith(number));
  }
}

constexpr const char* kLuxMessage = "Reference lux must be a non-negative number";
constexpr const char* kCctMessage = "Reference cct must be a non-negative number";
constexpr const char* kBrightnessMessage = "Brightness must be in the range [0, 255]";
constexpr const char* kDelayMessage = "Delay must be in the range [0, 16.7] (ms)";
constexpr const char* kItimeMessage = "Integration time must be in the range [0, 182000] (us)";
constexpr const char* kCalibrationItimeMessage = "Integration time must be in the range [2.78, 182000] (us)";
constexpr const char* kGainMessage = "GAIN must be in the range [-1, 11]";
constexpr const char* kCalibrationGainMessage = "Gain must be in the range [-1, 11]";
constexpr const char* kStepMessage = "Delay step must be greater than 0";

const std::vector<const char*> kBrightnesses{"0", "255", "", "1e2"};
const std::vector<const char*> kNoBrightnesses{"-0.001", "255.001", "-1"};
const std::vector<const char*> kDelays{"0", "16.7", "16.69", ""};
const std::vector<const char*> kNoDelays{"-0.001", "16.71", "16.7001"};
const std::vector<const char*> kCalibrationItimes{"2.78", "182000"};
const std::vector<const char*> kNoCalibrationItimes{"2.77", "2.7799", "0", "", "-1", "182001", "182000.01"};
const std::vector<const char*> kGains{"0", "11", "0xb", ""};
const std::vector<const char*> kNoGains{"-2", "12", "1.5", "99999999999"};

INSTANTIATE_TEST_SUITE_P(
    OfEachSubCommand, UdAlsNumber,
    testing::Values(
        NumberCase{"lux", {}, {}, kLuxMessage, {"0", "1e5", "", "-0"}, {"-0.001", "-1"}},
        NumberCase{"cct", {"100"}, {}, kCctMessage, {"0", "6500", ""}, {"-0.001", "-1"}},
        NumberCase{
            "luxBrightness", {"100", "4000", "k"}, {}, kBrightnessMessage, kBrightnesses, kNoBrightnesses},
        NumberCase{
            "pwmBrightness", {"pwm", "100", "3"}, {}, kBrightnessMessage, kBrightnesses, kNoBrightnesses},
        NumberCase{"patternBrightness", {"blue"}, {}, kBrightnessMessage, kBrightnesses, kNoBrightnesses},
        NumberCase{"laterBrightness", {"blue", "3"}, {}, kBrightnessMessage, kBrightnesses, kNoBrightnesses},
        NumberCase{"triggerDelay", {"trigger", "enable"}, {}, kDelayMessage, kDelays, kNoDelays},
        NumberCase{"delay", {"delay"}, {}, kDelayMessage, kDelays, kNoDelays},
        NumberCase{
            "te2ScanDelay", {"caldelay_te2", "100", "3"}, {"2", "5", "1"}, kDelayMessage, kDelays, kNoDelays},
        NumberCase{"scanItime",
                   {"caldelay"},
                   {"3", "0", "5", "1"},
                   kCalibrationItimeMessage,
                   kCalibrationItimes,
                   kNoCalibrationItimes},
        NumberCase{"te2ScanItime",
                   {"caldelay_te2"},
                   {"3", "0", "2", "5", "1"},
                   kCalibrationItimeMessage,
                   kCalibrationItimes,
                   kNoCalibrationItimes},
        NumberCase{"gainItime",
                   {"calgain"},
                   {"3"},
                   kCalibrationItimeMessage,
                   kCalibrationItimes,
                   kNoCalibrationItimes},
        NumberCase{"irGainItime",
                   {"calgain", "ir"},
                   {"3"},
                   kCalibrationItimeMessage,
                   kCalibrationItimes,
                   kNoCalibrationItimes},
        NumberCase{"pwmItime",
                   {"pwm"},
                   {"3", "128"},
                   kCalibrationItimeMessage,
                   kCalibrationItimes,
                   kNoCalibrationItimes},
        NumberCase{"itime",
                   {"itime"},
                   {},
                   kItimeMessage,
                   {"0", "2.77", "182000", ""},
                   {"-0.001", "-1", "182000.01", "182001"}},
        NumberCase{
            "itimeBehindGain", {"gain", "3", "itime"}, {}, kItimeMessage, {"0", "182000"}, {"-1", "182001"}},
        NumberCase{"gain", {"gain"}, {}, kGainMessage, {"-1", "0", "11", "0xb", ""}, kNoGains},
        NumberCase{"gainBehindItime", {"itime", "100", "gain"}, {}, kGainMessage, {"-1", "11"}, kNoGains},
        NumberCase{
            "scanGain", {"caldelay", "100"}, {"0", "5", "1"}, kCalibrationGainMessage, kGains, kNoGains},
        NumberCase{"te2ScanGain",
                   {"caldelay_te2", "100"},
                   {"0", "2", "5", "1"},
                   kCalibrationGainMessage,
                   kGains,
                   kNoGains},
        NumberCase{"calgainGain", {"calgain", "100"}, {}, kCalibrationGainMessage, kGains, kNoGains},
        NumberCase{"irCalgainGain",
                   {"calgain", "ir", "100"},
                   {},
                   kCalibrationGainMessage,
                   {"-1", "0", "11"},
                   kNoGains},
        NumberCase{"pwmGain", {"pwm", "100"}, {"128"}, kCalibrationGainMessage, kGains, kNoGains}),
    [](const auto& row) { return std::string(row.param.name); });

INSTANTIATE_TEST_SUITE_P(OfTheScans, UdAlsNumber,
                         testing::Values(NumberCase{"start",
                                                    {"caldelay", "100", "3"},
                                                    {"5", "1"},
                                                    "Delay start time must be greater than 0",
                                                    {"0", "5", "6", ""},
                                                    {"-0.001", "-1"}},
                                         NumberCase{"end",
                                                    {"caldelay", "100", "3", "0"},
                                                    {"1"},
                                                    "Delay end time must be greater than 0",
                                                    {"0.001", "100"},
                                                    {"0", "-0", "", "-1"}},
                                         NumberCase{"step",
                                                    {"caldelay", "100", "3", "0", "5"},
                                                    {},
                                                    kStepMessage,
                                                    {"0.001", "100"},
                                                    {"0", "-0", "", "-1"}},
                                         NumberCase{"te2Start",
                                                    {"caldelay_te2", "100", "3", "0"},
                                                    {"4095", "1"},
                                                    "Delay start time must be in the range [2, 4095] (h)",
                                                    {"2", "4095"},
                                                    {"1.999", "4095.001", "0", "", "-1"}},
                                         NumberCase{"te2End",
                                                    {"caldelay_te2", "100", "3", "0", "2"},
                                                    {"1"},
                                                    "Delay end time must be in the range [2, 4095] (h)",
                                                    {"2", "4095"},
                                                    {"1.999", "4095.001", "0", "", "-1"}},
                                         NumberCase{"te2Step",
                                                    {"caldelay_te2", "100", "3", "0", "2", "5"},
                                                    {},
                                                    kStepMessage,
                                                    {"0.001", "100"},
                                                    {"0", "-0", "", "-1"}},
                                         NumberCase{"risingEdge",
                                                    {"set_te2"},
                                                    {"20"},
                                                    "Rising edge delay must be in the range [0, 4095] (h)",
                                                    {"0", "4095", "0xfff", ""},
                                                    {"-1", "4096", "1.5"}},
                                         NumberCase{"fallingEdge",
                                                    {"set_te2", "10"},
                                                    {},
                                                    "Falling edge delay must be in the range [0, 4095] (h)",
                                                    {"0", "4095", "0xfff", ""},
                                                    {"-1", "4096", "1.5"}}),
                         [](const auto& row) { return std::string(row.param.name); });

// Scans that would not end.

TEST(UdAlsWords, AStepThatSinglePrecisionLosesIsRefused) {
  constexpr const char* kTooSmall = "Delay step is too small to get from start to end";
  EXPECT_EQ(parse({"caldelay", "100", "3", "0", "16", "1e-7"}).error, kTooSmall);
  EXPECT_EQ(parse({"caldelay", "100", "3", "0", "1e30", "1"}).error, kTooSmall);
  EXPECT_EQ(parse({"caldelay_te2", "100", "3", "0", "2", "4095", "1e-4"}).error, kTooSmall);
  EXPECT_EQ(parse({"caldelay", "100", "3", "0", "16", "0.001"}).error, "");
  // Nothing to scan: the command says so in its own way.
  EXPECT_EQ(parse({"caldelay", "100", "3", "17", "16", "1e-30"}).error, "");
}

TEST(ScanAdvances, ExactlyWhenEveryStepIsFelt) {
  // Above 8 neighbouring floats are 2^-20 apart.
  const float half = std::ldexp(1.0F, -21);
  EXPECT_FALSE(scanAdvances(0, 9, half));
  EXPECT_TRUE(scanAdvances(0, 9, std::nextafter(half, 1.0F)));
  // A scan that ends below 8 has finer steps, and one that starts and ends at one place has any.
  EXPECT_TRUE(scanAdvances(0, std::nextafter(8.0F, 0.0F), half));
  EXPECT_FALSE(scanAdvances(9, 9, half));
  EXPECT_TRUE(scanAdvances(10, 9, half));
  EXPECT_TRUE(scanAdvances(0, 1e-45F, 1e-45F));
  EXPECT_FALSE(scanAdvances(0, std::numeric_limits<float>::max(), 1e30F));
}

TEST(ScanAdvances, OfWhatItAcceptsNoSumStays) {
  for (const float end : {1.0F, 8.0F, 9.0F, 16.7F, 4095.0F, 1e6F}) {
    const float least = std::nextafter(std::ldexp(0.5F, std::ilogb(end) - 23), end);
    ASSERT_TRUE(scanAdvances(0, end, least));
    for (float value : {end, std::nextafter(end, 0.0F), end / 2, end / 3}) {
      EXPECT_GT(value + least, value) << end;
    }
  }
}

}  // namespace
