#include "truth/StatisticalBound.h"

#include <cmath>

#include <gtest/gtest.h>

namespace truth {
namespace {

TEST(StatisticalBound, TheMeansDeviationFallsWithTheRootOfTheCount) {
  EXPECT_NEAR(meanError(0.02, 0, 1, 1000).deviation, 0.02, 1e-12);
  EXPECT_NEAR(meanError(0.02, 0, 100, 1000).deviation, 0.002, 1e-12);
  // Without noise there is still the quantisation: step / sqrt(12).
  EXPECT_NEAR(meanError(0, 0.012, 1, 1000).deviation, 0.012 / std::sqrt(12.0), 1e-12);
}

TEST(StatisticalBound, FloatRoundingIsHalfAUnitInTheLastPlace) {
  EXPECT_DOUBLE_EQ(floatRounding(1), 0x1p-24);
  EXPECT_DOUBLE_EQ(floatRounding(1000), 0x1p-15);
  EXPECT_DOUBLE_EQ(floatRounding(-40000), 0x1p-9);
}

TEST(StatisticalBound, FarOutIsAsRareAsItSays) {
  // Tables: 4.892 standard deviations leave 1e-6 outside, 6.109 leave 1e-9.
  EXPECT_NEAR(deviationsFor(1), 4.8916, 1e-3);
  EXPECT_NEAR(deviationsFor(1000), 6.1094, 1e-3);
}

TEST(StatisticalBound, VariancesScatterLessWithMoreFreedom) {
  const Range few = varianceRatioRange(8, 1);
  const Range many = varianceRatioRange(800, 1);
  EXPECT_LT(few.low, many.low);
  EXPECT_GT(few.high, many.high);
  EXPECT_LT(many.low, 1);
  EXPECT_GT(many.high, 1);
  // Gaussian for many degrees: 1 ± 4.8916 · sqrt(2 / 800), skewed a little.
  EXPECT_NEAR(many.high, 1 + 4.8916 * std::sqrt(2.0 / 800), 0.03);
  EXPECT_NEAR(many.low, 1 - 4.8916 * std::sqrt(2.0 / 800), 0.03);
}

}  // namespace
}  // namespace truth
