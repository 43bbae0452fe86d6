#include "imu/lmfit/Lmmin.h"

#include <array>
#include <cmath>
#include <limits>
#include <vector>

#include <gtest/gtest.h>

namespace {

// The control record of the accelerometer's fit.
constexpr double kTolerance = 30 * std::numeric_limits<double>::epsilon();
constexpr lm_control_struct kControl{kTolerance, kTolerance, kTolerance, kTolerance, 100, 100,
                                     1,          nullptr,    0,          -1,         -1};

bool hasConverged(const lm_status_struct& status) {
  // With tolerances this near to the machine's, "cannot get any better" is an end as good as convergence.
  return status.outcome != kLmExhausted && status.outcome <= kLmGtolTooSmall;
}

void rosenbrock(const double* par, const int /*m_dat*/, const void* /*data*/, double* fvec, int* /*stop*/) {
  fvec[0] = 10 * (par[1] - par[0] * par[0]);
  fvec[1] = 1 - par[0];
}

TEST(Lmmin, FindsTheBottomOfTheCurvedValley) {
  std::array<double, 2> par{-1.2, 1};
  lm_status_struct status;
  lmmin(2, par.data(), 2, nullptr, nullptr, rosenbrock, &kControl, &status);
  EXPECT_TRUE(hasConverged(status)) << status.outcome;
  EXPECT_NEAR(par[0], 1, 1e-12);
  EXPECT_NEAR(par[1], 1, 1e-12);
  EXPECT_NEAR(status.fnorm, 0, 1e-12);
  EXPECT_GT(status.nfev, 10);
}

struct Points {
  std::vector<std::array<double, 3>> at;
};

void sphere(const double* par, const int m_dat, const void* data, double* fvec, int* /*stop*/) {
  const auto& points = static_cast<const Points*>(data)->at;
  for (int i = 0; i < m_dat; ++i) {
    const auto& p = points[static_cast<std::size_t>(i)];
    fvec[i] = par[3] - std::hypot(p[0] - par[0], p[1] - par[1], p[2] - par[2]);
  }
}

TEST(Lmmin, FitsCentreAndRadiusOfASphere) {
  Points points;
  for (int i = 0; i < 40; ++i) {
    const double azimuth = 0.7 * i;
    const double height = -0.95 + 1.9 * i / 39;
    const double ring = std::sqrt(1 - height * height);
    points.at.push_back(
        {1.5 + 9.8 * ring * std::cos(azimuth), -0.5 + 9.8 * ring * std::sin(azimuth), 0.25 + 9.8 * height});
  }
  std::array<double, 4> par{0, 0, 0, 1};
  lm_status_struct status;
  lmmin(4, par.data(), 40, nullptr, &points, sphere, &kControl, &status);
  EXPECT_TRUE(hasConverged(status)) << status.outcome;
  EXPECT_NEAR(par[0], 1.5, 1e-10);
  EXPECT_NEAR(par[1], -0.5, 1e-10);
  EXPECT_NEAR(par[2], 0.25, 1e-10);
  EXPECT_NEAR(par[3], 9.8, 1e-10);
}

void sumOfTwo(const double* par, const int m_dat, const void* /*data*/, double* fvec, int* /*stop*/) {
  for (int i = 0; i < m_dat; ++i) fvec[i] = (par[0] + par[1]) * (i + 1) - 6.0 * (i + 1);
}

TEST(Lmmin, SolvesARankDeficientProblemToOneOfItsSolutions) {
  std::array<double, 2> par{0, 0};
  lm_status_struct status;
  lmmin(2, par.data(), 5, nullptr, nullptr, sumOfTwo, &kControl, &status);
  EXPECT_TRUE(hasConverged(status)) << status.outcome;
  EXPECT_NEAR(par[0] + par[1], 6, 1e-10);
  EXPECT_TRUE(std::isfinite(par[0]) && std::isfinite(par[1]));
}

void line(const double* par, const int m_dat, const void* /*data*/, double* fvec, int* /*stop*/) {
  for (int i = 0; i < m_dat; ++i) fvec[i] = par[0] + par[1] * i;
}

TEST(Lmmin, AgreesWithTheClosedFormOfAStraightLine) {
  // Slope and offset by the textbook: mean y = 4.25, Sxx = 5, Sxy = 11.5.
  const std::array<double, 4> measured{1, 2.5, 6, 7.5};
  std::array<double, 2> par{0, 0};
  lm_status_struct status;
  lmmin(2, par.data(), 4, measured.data(), nullptr, line, &kControl, &status);
  EXPECT_TRUE(hasConverged(status)) << status.outcome;
  // The residual is not zero here, so that forward differences limit what can be reached.
  EXPECT_NEAR(par[1], 11.5 / 5, 1e-7);
  EXPECT_NEAR(par[0], 4.25 - 1.5 * 11.5 / 5, 1e-7);
}

TEST(Lmmin, UnscaledParametersGiveTheSameAnswer) {
  lm_control_struct control = kControl;
  control.scale_diag = 0;
  std::array<double, 2> par{-1.2, 1};
  lm_status_struct status;
  lmmin(2, par.data(), 2, nullptr, nullptr, rosenbrock, &control, &status);
  EXPECT_NEAR(par[0], 1, 1e-10);
  EXPECT_NEAR(par[1], 1, 1e-10);
}

TEST(Lmmin, StartingAtTheAnswerEndsWithAZeroResidual) {
  std::array<double, 2> par{1, 1};
  lm_status_struct status;
  lmmin(2, par.data(), 2, nullptr, nullptr, rosenbrock, &kControl, &status);
  EXPECT_LE(status.outcome, kLmTrapped);
  EXPECT_EQ(status.fnorm, 0);
  EXPECT_EQ(par[0], 1);
}

TEST(Lmmin, PatienceLimitsTheEvaluations) {
  lm_control_struct control = kControl;
  control.patience = 2;
  std::array<double, 2> par{-1.2, 1};
  lm_status_struct status;
  lmmin(2, par.data(), 2, nullptr, nullptr, rosenbrock, &control, &status);
  EXPECT_EQ(status.outcome, kLmExhausted);
  EXPECT_LE(status.nfev, 2 * 3 + 4);  // the Jacobian begun last is finished
}

TEST(Lmmin, FewerResidualsThanParametersLeaveTheParametersAlone) {
  std::array<double, 2> par{3, 4};
  lm_status_struct status;
  lmmin(2, par.data(), 1, nullptr, nullptr, rosenbrock, &kControl, &status);
  EXPECT_EQ(status.outcome, kLmBadInput);
  EXPECT_EQ(par[0], 3);
  EXPECT_EQ(par[1], 4);
}

// lmfit's own handling of them differs between its releases.
#ifndef VANTLE_LMFIT
void notANumber(const double* par, const int m_dat, const void* /*data*/, double* fvec, int* /*stop*/) {
  for (int i = 0; i < m_dat; ++i) fvec[i] = par[0] * std::numeric_limits<double>::quiet_NaN();
}

TEST(Lmmin, ResidualsThatAreNotFiniteEndTheFitAtOnce) {
  std::array<double, 1> par{2};
  lm_status_struct status;
  lmmin(1, par.data(), 3, nullptr, nullptr, notANumber, &kControl, &status);
  EXPECT_EQ(status.outcome, kLmNotFinite);
  EXPECT_EQ(status.nfev, 1);
  EXPECT_EQ(par[0], 2);
}
#endif

void stopAtOnce(const double* par, const int m_dat, const void* /*data*/, double* fvec, int* stop) {
  for (int i = 0; i < m_dat; ++i) fvec[i] = par[0];
  *stop = 1;
}

TEST(Lmmin, TheEvaluationCanEndTheFit) {
  std::array<double, 1> par{2};
  lm_status_struct status;
  lmmin(1, par.data(), 3, nullptr, nullptr, stopAtOnce, &kControl, &status);
  EXPECT_EQ(status.outcome, kLmUserBreak);
  EXPECT_NE(status.userbreak, 0);
  EXPECT_EQ(par[0], 2);
}

}  // namespace
