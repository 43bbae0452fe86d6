#include "light/UdAlsLux.h"

#include <cmath>

#include <gtest/gtest.h>

#include "light/UdAlsRecords.h"

namespace {

SampleData step(float reference, float mean) {
  return makeUdAlsRecord({{kUdAlsReferenceLux, reference}, {kUdAlsMeanLux, mean}});
}

TEST(UdAlsLuxScale, IsTheMeanOfTheRatios) {
  EXPECT_EQ(udAlsLuxScale({step(100, 50)}), 2.0F);
  EXPECT_EQ(udAlsLuxScale({step(100, 50), step(300, 100), step(10, 10)}), 2.0F);
}

TEST(UdAlsLuxScale, DarkStepsCountInTheDivisorOnly) {
  EXPECT_EQ(udAlsLuxScale({step(100, 50), step(200, 0)}), 1.0F);
  EXPECT_EQ(udAlsLuxScale({step(100, 50), step(200, -3)}), 1.0F);
  EXPECT_EQ(udAlsLuxScale({step(100, 0)}), 0.0F);
}

TEST(UdAlsLuxScale, AddsIn32BitFloatInTheOrderOfTheSteps) {
  const float third = 1.0F / 3.0F;
  EXPECT_EQ(udAlsLuxScale({step(16777216, 1), step(1, 1), step(1, 3)}), (16777216.0F + 1.0F + third) / 3.0F);
}

TEST(UdAlsLuxScale, OfNothingIsNotANumber) { EXPECT_TRUE(std::isnan(udAlsLuxScale({}))); }

}  // namespace
