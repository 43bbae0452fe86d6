#include "imu/ImuMultipointFit.h"

#include <cmath>
#include <limits>
#include <numeric>

#include "imu/lmfit/Lmmin.h"

namespace {

constexpr std::size_t kAxes = 3;
constexpr int kParameters = 6;
constexpr double kTolerance = 30 * std::numeric_limits<double>::epsilon();  // 6.661338147750939e-15
static_assert(kTolerance == 6.661338147750939e-15);

lm_control_struct fitControl() {
  lm_control_struct control{};
  control.ftol = kTolerance;
  control.xtol = kTolerance;
  control.gtol = kTolerance;
  control.epsilon = kTolerance;
  control.stepbound = 100;
  control.patience = 100;
  control.scale_diag = 1;
  control.msgfile = nullptr;
  control.verbosity = 0;
  control.n_maxpri = -1;
  control.m_maxpri = -1;
  return control;
}

}  // namespace

void AccelError(const double* par, int m_dat, const void* data, double* fvec, int* /*userbreak*/) {
  const auto& fit = *static_cast<const AccelFitData*>(data);
  const double gravity = static_cast<double>(fit.gravity);
  for (int i = 0; i < m_dat; ++i) {
    const SampleData& mean = fit.means[static_cast<std::size_t>(i)];
    double sum = 0;
    for (std::size_t axis = 0; axis < kAxes; ++axis) {
      const double corrected = par[axis] * (static_cast<double>(mean[axis]) - par[kAxes + axis]);
      sum += corrected * corrected;
    }
    fvec[i] = gravity - std::sqrt(sum);
  }
}

AxisCorrection fitAccel(const std::vector<SampleData>& means, float gravity) {
  std::array<double, kParameters> par{1, 1, 1, 0, 0, 0};
  const AccelFitData data{means, gravity};
  const lm_control_struct control = fitControl();
  // Not looked at: with these tolerances a good fit ends as often with "no further progress" as converged.
  lm_status_struct status{};
  lmmin(kParameters, par.data(), static_cast<int>(means.size()), nullptr, &data, AccelError, &control,
        &status);
  AxisCorrection fitted;
  for (std::size_t axis = 0; axis < kAxes; ++axis) {
    fitted.scale[axis] = static_cast<float>(par[axis]);
    fitted.bias[axis] = static_cast<float>(par[kAxes + axis]);
  }
  return fitted;
}

AxisCorrection composeCorrections(const AxisCorrection& current, const AxisCorrection& fitted) {
  AxisCorrection composed;
  for (std::size_t axis = 0; axis < kAxes; ++axis) {
    composed.bias[axis] = current.bias[axis] + fitted.bias[axis] / current.scale[axis];
    composed.scale[axis] = current.scale[axis] * fitted.scale[axis];
  }
  return composed;
}

SampleData meanOf(const std::vector<SampleData>& values) {
  SampleData mean = std::accumulate(values.begin(), values.end(), SampleData());
  mean /= static_cast<float>(values.size());
  return mean;
}
