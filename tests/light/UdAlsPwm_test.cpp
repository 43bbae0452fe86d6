#include "light/UdAlsPwm.h"

#include <cmath>
#include <limits>

#include <gtest/gtest.h>

#include "light/TruncateToInt.h"
#include "light/UdAlsRecords.h"

namespace {

constexpr float kNan = std::numeric_limits<float>::quiet_NaN();
constexpr float kInfinity = std::numeric_limits<float>::infinity();

SampleData step(float brightness, float clear) {
  return makeUdAlsRecord({{kUdAlsBrightness, brightness}, {kUdAlsMeanClear, clear}});
}

TEST(PwmBoundary, IsTheBrightnessOfTheLeastClearLevel) {
  EXPECT_EQ(pwmBoundary({step(40, 5), step(80, 3), step(120, 4)}), 80.0F);
  EXPECT_EQ(pwmBoundary({step(40, -5), step(80, 3)}), 40.0F);
}

TEST(PwmBoundary, OfEqualLevelsTheLaterCounts) {
  EXPECT_EQ(pwmBoundary({step(40.7F, 10), step(80.2F, 5), step(120.9F, 5)}), 120.9F);
}

TEST(PwmBoundary, IsNotANumberWhenNoLevelCanBeCompared) {
  EXPECT_TRUE(std::isnan(pwmBoundary({})));
  EXPECT_TRUE(std::isnan(pwmBoundary({step(40, kNan), step(80, kInfinity)})));
  EXPECT_EQ(pwmBoundary({step(40, kNan), step(80, std::numeric_limits<float>::max())}), 80.0F);
}

TEST(TruncateToInt, CutsTheFraction) {
  EXPECT_EQ(truncateToInt(120.9F), 120);
  EXPECT_EQ(truncateToInt(-120.9F), -120);
  EXPECT_EQ(truncateToInt(0.0F), 0);
}

TEST(TruncateToInt, StopsAtTheEndsOfTheRange) {
  EXPECT_EQ(truncateToInt(2147483648.0F), 2147483647);
  EXPECT_EQ(truncateToInt(-2147483648.0F), std::numeric_limits<std::int32_t>::min());
  EXPECT_EQ(truncateToInt(kInfinity), 2147483647);
  EXPECT_EQ(truncateToInt(-1e30F), std::numeric_limits<std::int32_t>::min());
  EXPECT_EQ(truncateToInt(2147483520.0F), 2147483520);
  EXPECT_EQ(truncateToInt(kNan), 0);
}

}  // namespace
