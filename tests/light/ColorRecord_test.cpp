#include "light/ColorRecord.h"

#include <cmath>
#include <limits>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace {

using testing::ElementsAre;
using testing::SizeIs;

constexpr float kNan = std::numeric_limits<float>::quiet_NaN();

Sample reading(const std::vector<float>& values) { return {0.0, values.begin(), values.end()}; }

/// Readings with an infrared: the fourth value, the green, must not count.
const Sample kIr1 = reading({4000, 1000, 300, 9e9F, 100, 50, 4});
const Sample kIr2 = reading({4002, 1010, 302, 9e9F, 104, 0, 4});
/// Readings with a green: none of the others counts.
const Sample kGreen1 = reading({9e9F, 9e9F, 9e9F, 600, 9e9F, -1, 4});
const Sample kGreen2 = reading({9e9F, 9e9F, 9e9F, 601, 9e9F, -0.5F, 4});
const std::vector<Sample> kLight{reading({500, 0, 0, 0, 0, 1, 4}), reading({510, 0, 0, 0, 0, -1, 4})};

TEST(ColorReading, HasEitherAGreenOrAnInfrared) {
  EXPECT_TRUE(hasIr(kIr2.values));  // 0 is a measurement
  EXPECT_FALSE(hasGreen(kIr2.values));
  EXPECT_TRUE(hasGreen(kGreen2.values));
  EXPECT_FALSE(hasIr(kGreen2.values));
  const Sample odd = reading({1, 1, 1, 1, 1, kNan, 1});
  EXPECT_FALSE(hasIr(odd.values));
  EXPECT_FALSE(hasGreen(odd.values));
}

TEST(ColorMeans, TakeTheGreenFromTheReadingsThatHaveOne) {
  EXPECT_THAT(colorMeans(kLight, {kIr1, kGreen1, kIr2, kGreen2}),
              ElementsAre(505, 4001, 1005, 301, 600.5F, 102, 25, 4));
}

TEST(ColorMeans, OfTheLightSensorCountAllReadings) {
  EXPECT_EQ(colorMeans(kLight, {kIr1, kGreen1})[color_means::kLux], 505);
}

TEST(ColorMeans, WithoutAReadingAreLeftOut) {
  EXPECT_THAT(colorMeans(kLight, {kIr1}), ElementsAre(505, 4000, 1000, 300, 100, 50, 4));
  EXPECT_THAT(colorMeans(kLight, {kGreen1}), ElementsAre(505));
  EXPECT_THAT(colorMeans({}, {kIr1, kGreen1}), SizeIs(7));
  EXPECT_THAT(colorMeans({}, {}), SizeIs(0));
}

TEST(ColorMeans, FurtherValuesOfAReadingDoNotCount) {
  EXPECT_THAT(
      colorMeans({kLight[0]}, {reading({1, 2, 3, 0, 5, 6, 7, 8, 9}), reading({0, 0, 0, 4, 0, -1, 0, 0, 0})}),
      ElementsAre(500, 1, 2, 3, 4, 5, 6, 7));
}

TEST(ColorMeans, NotANumberIsThePlainOne) {
  const SampleData means = colorMeans({kLight[0]}, {reading({-kNan, 2, 3, 0, 5, 6, 7}), kGreen1});
  EXPECT_TRUE(std::isnan(means[color_means::kCct]));
  EXPECT_FALSE(std::signbit(means[color_means::kCct]));
}

TEST(ColorMeans, ThatCountAreAllButTheColorTemperatureAndTheGreen) {
  EXPECT_THAT(meansThatCount({1, 2, 3, 4, 5, 6, 7, 8}), ElementsAre(1, 3, 4, 6, 7, 8));
}

TEST(ColorRecord, IsTheReferenceAndTheMeansWithoutTheGreen) {
  EXPECT_THAT(colorRecord(500, 2800, {1, 2, 3, 4, 5, 6, 7, 8}), ElementsAre(500, 2800, 1, 2, 3, 4, 6, 7, 8));
}

TEST(ColorLog, HasEightColumnsUnderAHeaderOfTen) {
  EXPECT_STREQ(kColorLogHeader, "lux_ref,cct_ref,c,r,g,b,ir,gain,int_t,irc_ratio\n");
  EXPECT_EQ(colorLogLine(500.5F, 2800, {1, 2, 3, 4, 5.25F, 6, -7, 1e-7F}),
            "500.500000,2800.000000,3.000000,4.000000,5.250000,6.000000,-7.000000,0.000000\n");
}

}  // namespace
