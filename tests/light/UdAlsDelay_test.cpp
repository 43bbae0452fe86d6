#include "light/UdAlsDelay.h"

#include <cmath>

#include <gtest/gtest.h>

#include "light/UdAlsRecords.h"

namespace {

SampleData step(float delay, float clear) {
  return makeUdAlsRecord({{kUdAlsDelay, delay}, {kUdAlsMeanClear, clear}});
}

TEST(FitDelay, IsTheParabolaThroughThreeSteps) {
  SampleData fit;
  ASSERT_TRUE(fitDelay({step(1, 5), step(2, 3), step(3, 5)}, &fit));
  ASSERT_EQ(fit.size(), 3U);
  EXPECT_NEAR(fit[0], 11.0F, 1e-4F);
  EXPECT_NEAR(fit[1], -8.0F, 1e-4F);
  EXPECT_NEAR(fit[2], 2.0F, 1e-4F);
  EXPECT_EQ(roundedToThreeDecimals(vertexOf(fit)), 2.0F);
}

TEST(FitDelay, NeedsThreeSteps) {
  SampleData fit{7};
  EXPECT_FALSE(fitDelay({step(1, 5), step(2, 3)}, &fit));
  EXPECT_EQ(fit, SampleData({7}));
}

TEST(VertexOf, IsWhereTheParabolaTurns) {
  EXPECT_EQ(vertexOf({9, -4, 1}), 2.0F);
  EXPECT_EQ(vertexOf({0, 3, 2}), -0.75F);
}

TEST(VertexOf, OfAParabolaThatOpensDownwardsIsTakenAlike) { EXPECT_EQ(vertexOf({0, 4, -1}), 2.0F); }

TEST(VertexOf, IsComputedInDoublePrecision) {
  // In single precision the halved coefficient would be lost.
  EXPECT_EQ(vertexOf({0, -1.4e-45F, 1.4e-45F}), 0.5F);
}

TEST(VertexOf, OfALineIsNoFiniteNumber) {
  EXPECT_TRUE(std::isinf(vertexOf({0, 1, 0})));
  EXPECT_TRUE(std::isnan(vertexOf({0, 0, 0})));
  EXPECT_FALSE(std::signbit(vertexOf({0, 0, 0})));
}

TEST(RoundedToThreeDecimals, GoesToTheNearest) {
  EXPECT_EQ(roundedToThreeDecimals(1.23449F), 1.234F);
  EXPECT_EQ(roundedToThreeDecimals(1.23451F), 1.235F);
  EXPECT_EQ(roundedToThreeDecimals(-0.0006F), -0.001F);
}

TEST(Te2Table, CalibratedFollowsTheDelayAtTwoPlaces) {
  EXPECT_EQ(calibratedTe2Table(1500), "2055 317 3240 1500 2354 13 2354 13");
  EXPECT_EQ(calibratedTe2Table(1000), "2055 -183 3240 1000 2354 13 2354 13");
  EXPECT_EQ(calibratedTe2Table(std::round(1500.4F)), "2055 317 3240 1500 2354 13 2354 13");
}

TEST(Te2Table, CalibratedHoldsAnyFiniteDelay) {
  EXPECT_EQ(calibratedTe2Table(-1e30F), "2055 -2147483648 3240 -2147483648 2354 13 2354 13");
}

TEST(Te2Table, OfOnePairRepeatsItFourTimes) {
  EXPECT_EQ(te2Table(8, 10), "0008 0010 0008 0010 0008 0010 0008 0010");
  EXPECT_EQ(te2Table(4095, 0), "4095 0000 4095 0000 4095 0000 4095 0000");
}

}  // namespace
