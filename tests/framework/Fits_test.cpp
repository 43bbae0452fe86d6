#include "framework/Fits.h"

#include <cmath>
#include <random>

#include <gtest/gtest.h>

#include "support/Capture.h"

namespace {

using Points = std::vector<std::pair<float, float>>;

TEST(LinearFit, FindsAnExactLine) {
  SampleData line;
  EXPECT_TRUE(linearFit({{0, 1}, {1, 3}, {2, 5}}, &line));
  EXPECT_EQ(line, SampleData({1, 2}));
}

TEST(LinearFit, ReplacesWhateverTheCoefficientsHeld) {
  SampleData line{9, 9, 9, 9, 9};
  EXPECT_TRUE(linearFit({{0, 1}, {1, 3}}, &line));
  EXPECT_EQ(line, SampleData({1, 2}));
}

TEST(LinearFit, OfEqualXWritesNothing) {
  SampleData line{7};
  EXPECT_FALSE(linearFit({{1, 1}, {1, 2}}, &line));
  EXPECT_EQ(line, SampleData({7}));
}

TEST(LinearFit, OfNoPointsWritesNothing) {
  SampleData line{7};
  EXPECT_FALSE(linearFit({}, &line));
  EXPECT_EQ(line, SampleData({7}));
}

TEST(LinearFit, WithoutATargetSaysWhetherThereIsALine) {
  EXPECT_TRUE(linearFit({{0, 1}, {1, 3}}, nullptr));
  EXPECT_FALSE(linearFit({{1, 1}, {1, 2}}, nullptr));
}

TEST(LinearFit, OfWhatIsNoNumberIsALineThatIsNone) {
  SampleData line;
  EXPECT_TRUE(linearFit({{0, 1}, {std::nanf(""), 2}}, &line));
  ASSERT_EQ(line.size(), 2U);
  EXPECT_TRUE(std::isnan(line[0]));
  EXPECT_TRUE(std::isnan(line[1]));
}

TEST(LinearFit, OfXTooCloseForAFloatIsNone) {
  SampleData line{7};
  EXPECT_FALSE(linearFit({{0, 1}, {1e-30F, 2}}, &line));  // Σ(x − x̄)² underflows to 0
  EXPECT_EQ(line, SampleData({7}));
}

TEST(LinearFit, IsTheLeastSquaresLineOfNoisyPoints) {
  SampleData line;
  EXPECT_TRUE(linearFit({{0, 0}, {1, 2}, {2, 1}}, &line));
  EXPECT_EQ(line, SampleData({0.5F, 0.5F}));
}

TEST(LinearFit, RunsIn32BitFloatInThePointsOrder) {
  // Σx rounds to 2^24, so the mean of x is 2^24 / 4 and the line is what follows from that.
  const Points points{{16777216, 0}, {1, 1}, {1, 1}, {0, 2}};
  const float meanX = 16777216.0F / 4.0F;
  const float meanY = 1.0F;
  float sxx = 0;
  float sxy = 0;
  for (const auto& [x, y] : points) {
    const float dx = x - meanX;
    const float dy = y - meanY;
    const float dxx = dx * dx;
    const float dxy = dx * dy;
    sxx = sxx + dxx;
    sxy = sxy + dxy;
  }
  SampleData line;
  ASSERT_TRUE(linearFit(points, &line));
  EXPECT_EQ(line[1], sxy / sxx);
  const float product = meanX * line[1];
  EXPECT_EQ(line[0], meanY - product);
}

TEST(LinearFit, RecoversRandomLines) {
  std::mt19937 random(5);
  std::uniform_int_distribution<int> coefficient(-64, 64);
  for (int round = 0; round < 100; ++round) {
    const auto q0 = static_cast<float>(coefficient(random));
    const auto q1 = static_cast<float>(coefficient(random)) / 4.0F;
    Points points;
    for (int i = 0; i < 8; ++i) points.emplace_back(static_cast<float>(i), q0 + q1 * static_cast<float>(i));
    SampleData line;
    ASSERT_TRUE(linearFit(points, &line));
    EXPECT_EQ(line, SampleData({q0, q1}));  // all sums are exact
  }
}

TEST(QuadraticFit, OfTwoPointsWritesNothing) {
  SampleData parabola{7};
  EXPECT_FALSE(quadraticFit({{0, 0}, {1, 1}}, &parabola));
  EXPECT_EQ(parabola, SampleData({7}));
}

TEST(QuadraticFit, FindsAnExactParabola) {
  SampleData parabola{9, 9, 9, 9, 9};
  EXPECT_TRUE(quadraticFit({{0, 0}, {1, 1}, {2, 4}}, &parabola));
  ASSERT_EQ(parabola.size(), 3U);
  EXPECT_NEAR(parabola[0], 0, 1e-6);
  EXPECT_NEAR(parabola[1], 0, 1e-6);
  EXPECT_NEAR(parabola[2], 1, 1e-6);
}

TEST(QuadraticFit, OfEqualXGivesZerosAndSuccessAndSaysSo) {
  SampleData parabola;
  const Captured captured = capture([&] { EXPECT_TRUE(quadraticFit({{2, 1}, {2, 2}, {2, 3}}, &parabola)); });
  EXPECT_EQ(parabola, SampleData({0, 0, 0}));
  EXPECT_EQ(captured.out, "Matrix does not have a Inverse");
}

TEST(QuadraticFit, WithoutATargetStillSaysThatThereWereEnoughPoints) {
  EXPECT_TRUE(quadraticFit({{0, 0}, {1, 1}, {2, 4}}, nullptr));
  EXPECT_FALSE(quadraticFit({{0, 0}}, nullptr));
}

TEST(QuadraticFit, WithoutATargetStillSaysThatTheMatrixIsSingular) {
  const Captured captured = capture([] { EXPECT_TRUE(quadraticFit({{2, 1}, {2, 2}, {2, 3}}, nullptr)); });
  EXPECT_EQ(captured.out, "Matrix does not have a Inverse");
}

TEST(QuadraticFit, SumsInDouble) {
  // In float the offset of 32 swamps the curvature: Σx⁴ needs 23 bits and the determinant's terms 37.
  Points points;
  for (int i = -2; i <= 2; ++i) {
    const auto x = static_cast<float>(i);
    points.emplace_back(32.0F + x, x * x);
  }
  SampleData parabola;
  ASSERT_TRUE(quadraticFit(points, &parabola));
  EXPECT_EQ(parabola[2], 1.0F);
  EXPECT_NEAR(parabola[1], -64.0, 1e-4);
  EXPECT_NEAR(parabola[0], 1024.0, 1e-3);
}

TEST(QuadraticFit, RecoversRandomParabolas) {
  std::mt19937 random(6);
  std::uniform_int_distribution<int> coefficient(-64, 64);
  for (int round = 0; round < 100; ++round) {
    const auto q0 = static_cast<float>(coefficient(random));
    const auto q1 = static_cast<float>(coefficient(random)) / 4.0F;
    const auto q2 = static_cast<float>(coefficient(random)) / 8.0F;
    Points points;
    for (int i = -4; i < 5; ++i) {
      const auto x = static_cast<float>(i);
      points.emplace_back(x, q0 + q1 * x + q2 * x * x);
    }
    SampleData parabola;
    ASSERT_TRUE(quadraticFit(points, &parabola));
    EXPECT_NEAR(parabola[0], q0, 1e-4);
    EXPECT_NEAR(parabola[1], q1, 1e-4);
    EXPECT_NEAR(parabola[2], q2, 1e-4);
  }
}

}  // namespace
