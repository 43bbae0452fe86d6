#include "prox/EmitterSetting.h"

#include <cmath>
#include <limits>

#include <gtest/gtest.h>

namespace {

constexpr float kInfinity = std::numeric_limits<float>::infinity();

TEST(PulseNumber, IsWhatMakesTheAverageTheTarget) {
  // A target of 500 with an average of 250 and 16 pulses (stored as 15).
  const float pulses = pulsesForTarget(500, 15 + 1, 10, 2500);
  EXPECT_EQ(pulses, 32.0F);
  EXPECT_EQ(storedPulseNumber(pulses), 31.0F);
}

TEST(PulseNumber, IsStoredLessOneBetween0And63) {
  struct Row {
    float pulses;
    float stored;
  };
  for (const Row& row : {Row{-1e30F, 0}, Row{-3, 0}, Row{0, 0}, Row{1, 0}, Row{1.4F, 0}, Row{1.5F, 1},
                         Row{2, 1}, Row{2.5F, 2}, Row{31.49F, 30}, Row{31.5F, 31}, Row{63, 62},
                         Row{63.49F, 62}, Row{63.5F, 63}, Row{64, 63}, Row{100, 63}, Row{1e30F, 63}}) {
    EXPECT_EQ(storedPulseNumber(row.pulses), row.stored) << row.pulses;
  }
}

TEST(PulseNumber, IsComputedInFloatFromLeftToRight) {
  // 16777217 is no float: the count is rounded, and so is each product before the division.
  EXPECT_EQ(pulsesForTarget(0.1F, 3, 7, 2.1F), 0.1F * 3.0F * 7.0F / 2.1F);
  EXPECT_EQ(pulsesForTarget(1, 1, 16777217, 1), 16777216.0F);
  EXPECT_EQ(pulsesForTarget(1e30F, 64, 10, 1), 6.4e32F);
}

TEST(PulseNumber, IsNotFiniteWithoutLightOrBeyondAFloat) {
  EXPECT_EQ(pulsesForTarget(500, 16, 10, 0), kInfinity);
  EXPECT_TRUE(std::isnan(pulsesForTarget(500, 0, 10, 0)));
  EXPECT_EQ(pulsesForTarget(1e38F, 64, 10, 1), kInfinity);
}

TEST(PulseCurrent, IsWhatMakesTheWholeAverageTheTarget) {
  // Of an average of 250.9 the fraction has been cut off.
  EXPECT_EQ(currentForTarget(500, 250, 10), 20.0F);
  EXPECT_EQ(limitedPulseCurrent(currentForTarget(500, 250, 10)), 20);
  EXPECT_EQ(currentForTarget(500, 0, 10), kInfinity);
  EXPECT_TRUE(std::isnan(currentForTarget(500, 0, 0)));
  EXPECT_EQ(currentForTarget(1e38F, 1, 10), kInfinity);
}

TEST(PulseCurrent, IsRoundedAndKeptBetween2And25) {
  struct Row {
    float current;
    std::int64_t limited;
  };
  for (const Row& row : {Row{-1e30F, 2}, Row{-20, 2}, Row{-0.5F, 2}, Row{0, 2}, Row{1, 2}, Row{2, 2},
                         Row{2.49F, 2}, Row{2.5F, 3}, Row{24.49F, 24}, Row{24.5F, 25}, Row{25, 25},
                         Row{25.5F, 25}, Row{40, 25}, Row{1e30F, 25}}) {
    EXPECT_EQ(limitedPulseCurrent(row.current), row.limited) << row.current;
  }
}

TEST(WholeNumber, LosesItsFraction) {
  EXPECT_EQ(wholeNumber(60.9F), 60);
  EXPECT_EQ(wholeNumber(-60.9F), -60);
  EXPECT_EQ(wholeNumber(-0.5F), 0);
  EXPECT_EQ(wholeNumber(-9223372036854775808.0F), std::numeric_limits<std::int64_t>::min());
}

TEST(WholeNumber, IsNoneBeyondSixtyFourBits) {
  EXPECT_EQ(wholeNumber(9223372036854775808.0F), std::nullopt);
  EXPECT_EQ(wholeNumber(-1e19F), std::nullopt);
  EXPECT_EQ(wholeNumber(kInfinity), std::nullopt);
  EXPECT_EQ(wholeNumber(std::nanf("")), std::nullopt);
}

}  // namespace
