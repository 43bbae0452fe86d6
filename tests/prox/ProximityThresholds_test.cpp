#include "prox/ProximityThresholds.h"

#include <cmath>

#include <gtest/gtest.h>

namespace {

std::vector<Sample> countsOf(std::initializer_list<float> counts) {
  std::vector<Sample> samples;
  for (const float count : counts) {
    const float values[] = {count, 5.0F, 0.5F};
    samples.emplace_back(0.0, values, values + 3);
  }
  return samples;
}

std::optional<float> farMovedBy(float nearThreshold, float far) {
  return displacedThreshold(ProximityMode::kNear, nearThreshold, far);
}

std::optional<float> nearMovedBy(float farThreshold, float near) {
  return displacedThreshold(ProximityMode::kFar, farThreshold, near);
}

TEST(ProximityThresholds, ThresholdIsTheMeanOfTheRawCounts) {
  EXPECT_EQ(proximityThreshold(countsOf({140, 142, 144})), 142.0F);
}

TEST(ProximityThresholds, HalvesAreRoundedUp) {
  EXPECT_EQ(proximityThreshold(countsOf({42, 43})), 43.0F);
  EXPECT_EQ(proximityThreshold(countsOf({43, 44})), 44.0F);
}

TEST(ProximityThresholds, NoSamplesGiveNoThreshold) { EXPECT_TRUE(std::isnan(proximityThreshold({}))); }

TEST(ProximityThresholds, EnoughSeparationMovesNothing) {
  EXPECT_EQ(farMovedBy(110, 100), std::nullopt);
  EXPECT_EQ(nearMovedBy(100, 110), std::nullopt);
}

TEST(ProximityThresholds, OneCountTooCloseMovesTheOtherToTheSeparation) {
  EXPECT_EQ(farMovedBy(109, 100), 99.0F);
  EXPECT_EQ(nearMovedBy(101, 110), 111.0F);
}

TEST(ProximityThresholds, ThresholdsTheWrongWayRoundAreSetRight) {
  EXPECT_EQ(farMovedBy(80, 100), 70.0F);
  EXPECT_EQ(nearMovedBy(180, 140), 190.0F);
}

TEST(ProximityThresholds, LowNearThresholdLeavesTheFarOneAtTen) {
  EXPECT_EQ(farMovedBy(21, 15), 11.0F);
  EXPECT_EQ(farMovedBy(20, 15), 10.0F);
  EXPECT_EQ(farMovedBy(15, 8), 10.0F);
}

TEST(ProximityThresholds, NearThresholdOfTenOrLessPutsTheFarOneUponIt) {
  EXPECT_EQ(farMovedBy(10, 8), 10.0F);
  EXPECT_EQ(farMovedBy(4, 100), 4.0F);
  EXPECT_EQ(farMovedBy(0, 100), 0.0F);
}

TEST(ProximityThresholds, HighFarThresholdLeavesTheNearOneAt245) {
  EXPECT_EQ(nearMovedBy(234, 240), 244.0F);
  EXPECT_EQ(nearMovedBy(235, 240), 245.0F);
  EXPECT_EQ(nearMovedBy(240, 245), 245.0F);
  EXPECT_EQ(nearMovedBy(244, 250), 245.0F);
}

TEST(ProximityThresholds, FarThresholdOf245OrMorePutsTheNearOneUponIt) {
  EXPECT_EQ(nearMovedBy(245, 250), 245.0F);
  EXPECT_EQ(nearMovedBy(255, 140), 255.0F);
}

}  // namespace
