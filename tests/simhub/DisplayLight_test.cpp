#include "simhub/sensors/DisplayLight.h"

#include <gtest/gtest.h>

namespace {

TEST(DisplayLight, LeastIsCaughtAtTheBestMomentOfEveryRefresh) {
  EXPECT_DOUBLE_EQ(simhub::triggeredShare(0, 16, 0.25), 0.25);
  EXPECT_DOUBLE_EQ(simhub::triggeredShare(16, 16, 0.25), 0.25);
  EXPECT_DOUBLE_EQ(simhub::triggeredShare(-32, 16, 0.25), 0.25);
}

TEST(DisplayLight, RisesInAParabolaToAllOfItHalfwayToTheNextRefresh) {
  EXPECT_DOUBLE_EQ(simhub::triggeredShare(8, 16, 0.25), 1);
  EXPECT_DOUBLE_EQ(simhub::triggeredShare(-8, 16, 0.25), 1);
  EXPECT_DOUBLE_EQ(simhub::triggeredShare(4, 16, 0.2), 0.4);
  EXPECT_DOUBLE_EQ(simhub::triggeredShare(-4, 16, 0.2), 0.4);
  EXPECT_DOUBLE_EQ(simhub::triggeredShare(12, 16, 0.2), 0.4) << "4 before the next";
}

TEST(DisplayLight, UntriggeredIntegrationsCatchTheMeanOverTheRefresh) {
  constexpr int kSteps = 2000;
  double sum = 0;
  for (int i = 0; i < kSteps; ++i) sum += simhub::triggeredShare((i + 0.5) * 16 / kSteps, 16, 0.3);
  EXPECT_NEAR(simhub::untriggeredShare(0.3), sum / kSteps, 1e-6);
}

TEST(DisplayLight, PulsesFadeTowardsTheBoundaryAndEndThere) {
  EXPECT_DOUBLE_EQ(simhub::pulseShare(15, 60), 0.75);
  EXPECT_DOUBLE_EQ(simhub::pulseShare(45, 60), 0.25);
  EXPECT_DOUBLE_EQ(simhub::pulseShare(60, 60), 0);
  EXPECT_DOUBLE_EQ(simhub::pulseShare(200, 60), 0);
}

TEST(DisplayLight, DarkDisplayAndNoBoundaryMakeNoPulses) {
  EXPECT_DOUBLE_EQ(simhub::pulseShare(0, 60), 0);
  EXPECT_DOUBLE_EQ(simhub::pulseShare(0, 0), 0);
  EXPECT_DOUBLE_EQ(simhub::pulseShare(10, 0), 0);
}

}  // namespace
