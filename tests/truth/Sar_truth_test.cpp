// Whether "sar" finds what a simulated SAR sensor sees of its own handset, over many handsets.
#include <random>

#include <gtest/gtest.h>

#include "truth/TruthHandset.h"

namespace {

constexpr unsigned kHandsets = 20;
constexpr double kNoise = 3;       // counts
constexpr double kDeviations = 5;  // that a single reading may be off
constexpr double kBound = kDeviations * kNoise + 0.5;
constexpr double kMargin = 30;

class SarTruth : public testing::TestWithParam<unsigned> {};

TEST_P(SarTruth, OffsetsAreThoseOfTheSelectedSensorWithTheirMargin) {
  std::mt19937 generator(GetParam());
  std::uniform_real_distribution<double> anyOffset(0, 16000);
  const double top = anyOffset(generator);
  const double bottom = anyOffset(generator);
  const std::string sensor = GetParam() % 2 == 0 ? "sensor.sar" : "sensor.sar_1";
  TruthHandset handset(
      "e4d4", {sensor + ".bias=[" + std::to_string(top) + "," + std::to_string(bottom) + "]",
               sensor + ".noise=" + std::to_string(kNoise), "hub.seed=" + std::to_string(GetParam())});
  const Captured run = handset.Run({"sar", "-i", GetParam() % 2 == 0 ? "0" : "1"});
  ASSERT_EQ(run.result, 0) << run.err;
  ASSERT_EQ(numbersAfter("TOP_OFFSET:", run.out).size(), 1U);
  ASSERT_EQ(numbersAfter("BOT_OFFSET:", run.out).size(), 1U);
  EXPECT_NEAR(numbersAfter("TOP_OFFSET:", run.out)[0], top + kMargin, kBound);
  EXPECT_NEAR(numbersAfter("BOT_OFFSET:", run.out)[0], bottom + kMargin, kBound);
}

INSTANTIATE_TEST_SUITE_P(Handsets, SarTruth, testing::Range(1U, kHandsets + 1));

}  // namespace
