#include "imu/ImuMultipointFit.h"

#include <array>
#include <cmath>
#include <limits>
#include <random>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace {

using testing::ElementsAre;

constexpr float kGravity = 9.80665F;

/// The readings of the six poses (and more tilts) of a sensor with reading = truth / scale + bias.
std::vector<SampleData> readings(const AxisCorrection& truth) {
  constexpr double kG = static_cast<double>(kGravity);
  const double r = kG / std::sqrt(3.0);
  std::vector<SampleData> means;
  for (const auto& force : std::vector<std::array<double, 3>>{{kG, 0, 0},
                                                              {-kG, 0, 0},
                                                              {0, kG, 0},
                                                              {0, -kG, 0},
                                                              {0, 0, kG},
                                                              {0, 0, -kG},
                                                              {r, r, r},
                                                              {-r, r, -r}}) {
    SampleData mean;
    for (std::size_t axis = 0; axis < 3; ++axis) {
      mean.push_back(static_cast<float>(force[axis] / static_cast<double>(truth.scale[axis]) +
                                        static_cast<double>(truth.bias[axis])));
    }
    means.push_back(mean);
  }
  return means;
}

TEST(AccelFit, PerfectPositionsNeedNoCorrection) {
  const AxisCorrection fitted = fitAccel(readings({}), kGravity);
  for (std::size_t axis = 0; axis < 3; ++axis) {
    EXPECT_NEAR(fitted.scale[axis], 1, 1e-6);
    EXPECT_NEAR(fitted.bias[axis], 0, 1e-6);
  }
}

TEST(AccelFit, FindsScaleAndBiasOfEachAxis) {
  const AxisCorrection truth{{1.02F, 0.98F, 1.005F}, {0.3F, -0.2F, 0.1F}};
  const AxisCorrection fitted = fitAccel(readings(truth), kGravity);
  for (std::size_t axis = 0; axis < 3; ++axis) {
    EXPECT_NEAR(fitted.scale[axis], truth.scale[axis], 2e-6);
    EXPECT_NEAR(fitted.bias[axis], truth.bias[axis], 1e-5);
  }
}

TEST(AccelFit, AgreesWithTheClosedFormOfSixExactPoses) {
  // With only the six poses, each axis by itself: bias half the sum, scale 2 g over the difference.
  const AxisCorrection truth{{1.01F, 0.99F, 1.03F}, {0.15F, -0.25F, 0.35F}};
  std::vector<SampleData> six = readings(truth);
  six.resize(6);
  // The other axes' biases shorten nothing to first order only: the fit has them to be exact.
  const AxisCorrection fitted = fitAccel(six, kGravity);
  for (std::size_t axis = 0; axis < 3; ++axis) {
    const float up = six[2 * axis][axis];
    const float down = six[2 * axis + 1][axis];
    EXPECT_NEAR(fitted.bias[axis], (up + down) / 2, 1e-5);
    EXPECT_NEAR(fitted.scale[axis], 2 * kGravity / (up - down), 2e-6);
  }
}

TEST(AccelFit, LocalGravityScalesTheScale) {
  const AxisCorrection fitted = fitAccel(readings({}), 2 * kGravity);
  EXPECT_NEAR(fitted.scale[0], 2, 2e-6);
}

TEST(AccelFit, ResidualIsGravityLessTheCorrectedLength) {
  const std::vector<SampleData> means{{3, 4, 12}, {1, 0, 0}};
  const AccelFitData data{means, 10};
  const std::array<double, 6> par{1, 2, 0.5, 3, 1, 2};
  std::array<double, 2> fvec{};
  AccelError(par.data(), 2, &data, fvec.data(), nullptr);
  EXPECT_DOUBLE_EQ(fvec[0], 10 - std::sqrt(0.0 + 36 + 25));
  EXPECT_DOUBLE_EQ(fvec[1], 10 - std::sqrt(4.0 + 4 + 1));
}

TEST(AccelFit, NoPositionLeavesTheResidualsAlone) {
  const std::vector<SampleData> none;
  const AccelFitData data{none, 10};
  const std::array<double, 6> par{1, 1, 1, 0, 0, 0};
  double untouched = 42;
  AccelError(par.data(), 0, &data, &untouched, nullptr);
  EXPECT_EQ(untouched, 42);
}

TEST(AccelFit, PositionsThatAreAllAlikeEnd) {
  const std::vector<SampleData> same(6, SampleData{0, 0, 9.5F});
  const AxisCorrection fitted = fitAccel(same, kGravity);
  EXPECT_NEAR(fitted.scale[2] * (9.5F - fitted.bias[2]), kGravity, 1e-4);
}

TEST(Composition, ActsOnReadingsThatTheStoredCorrectionHadNotSeen) {
  const AxisCorrection current{{2, 1, 0.5F}, {1, 2, 3}};
  const AxisCorrection fitted{{1.5F, 1, 2}, {4, 5, 6}};
  const AxisCorrection composed = composeCorrections(current, fitted);
  EXPECT_THAT(composed.scale, ElementsAre(3, 1, 1));
  EXPECT_THAT(composed.bias, ElementsAre(1 + 4 / 2.0F, 2 + 5, 3 + 6 / 0.5F));
  for (std::size_t axis = 0; axis < 3; ++axis) {
    const float reading = 7;
    const float once = current.scale[axis] * (reading - current.bias[axis]);
    const float twice = fitted.scale[axis] * (once - fitted.bias[axis]);
    EXPECT_FLOAT_EQ(composed.scale[axis] * (reading - composed.bias[axis]), twice);
  }
}

TEST(Composition, AStoredScaleOfZeroIsNotFinite) {
  AxisCorrection current;
  current.scale[1] = 0;
  EXPECT_TRUE(std::isinf(composeCorrections(current, {{1, 1, 1}, {1, 1, 1}}).bias[1]));
}

TEST(MeanOf, IsElementWise) {
  EXPECT_THAT(meanOf({{1, 2, 3}, {3, 2, 4}}).toVector(), ElementsAre(2, 2, 3.5F));
  EXPECT_TRUE(meanOf({}).empty());
}

}  // namespace
