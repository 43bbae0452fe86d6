#include "imu/lmfit/Lmmin.h"

#include <algorithm>
#include <cmath>
#include <limits>
#include <unsupported/Eigen/NonLinearOptimization>

namespace {

using Eigen::LevenbergMarquardtSpace::Status;

/// What Eigen is told to end the fit.
constexpr int kStop = -1;

/// The caller's evaluation in the form that Eigen calls.
struct Residuals {
  [[nodiscard]] int values() const { return residualCount; }

  int operator()(const Eigen::VectorXd& parameters, Eigen::VectorXd& residuals) const {
    ++status->nfev;
    evaluate(parameters.data(), residualCount, data, residuals.data(), &status->userbreak);
    if (y != nullptr) residuals -= Eigen::Map<const Eigen::VectorXd>(y, residualCount);
    if (status->userbreak != 0) {
      status->outcome = kLmUserBreak;
      return kStop;
    }
    if (!residuals.allFinite()) {
      status->outcome = kLmNotFinite;
      return kStop;
    }
    return 0;
  }

  /// Forward differences, with MINPACK's step: relative to the parameter, or absolute for a parameter of 0.
  /// How many evaluations it took.
  int df(const Eigen::VectorXd& parameters, Eigen::MatrixXd& jacobian) const {
    const double relativeStep = std::sqrt(std::max(epsilon, std::numeric_limits<double>::epsilon()));
    Eigen::VectorXd moved = parameters;
    Eigen::VectorXd here(residualCount);
    Eigen::VectorXd there(residualCount);
    if ((*this)(parameters, here) == kStop) return kStop;
    for (Eigen::Index j = 0; j < parameters.size(); ++j) {
      const double step = parameters[j] == 0 ? relativeStep : relativeStep * std::abs(parameters[j]);
      moved[j] += step;
      if ((*this)(moved, there) == kStop) return kStop;
      jacobian.col(j) = (there - here) / step;
      moved[j] = parameters[j];
    }
    return static_cast<int>(parameters.size()) + 1;
  }

  int residualCount;
  const double* y;
  const void* data;
  LmEvaluate* evaluate;
  double epsilon;
  lm_status_struct* status;
};

int outcomeOf(Status status) {
  using namespace Eigen::LevenbergMarquardtSpace;
  switch (status) {
    case RelativeReductionTooSmall:
      return kLmConvergedF;
    case RelativeErrorTooSmall:
      return kLmConvergedX;
    case RelativeErrorAndReductionTooSmall:
      return kLmConvergedBoth;
    case CosinusTooSmall:
      return kLmTrapped;
    case TooManyFunctionEvaluation:
      return kLmExhausted;
    case FtolTooSmall:
      return kLmFtolTooSmall;
    case XtolTooSmall:
      return kLmXtolTooSmall;
    case GtolTooSmall:
      return kLmGtolTooSmall;
    default:
      return kLmBadInput;
  }
}

}  // namespace

void lmmin(int n_par, double* par, int m_dat, const double* y, const void* data, LmEvaluate* evaluate,
           const lm_control_struct* control, lm_status_struct* status) {
  *status = {0, 0, kLmBadInput, 0};
  if (n_par < 1 || m_dat < n_par || !(control->stepbound > 0) || control->patience < 1) return;
  Residuals residuals{m_dat, y, data, evaluate, control->epsilon, status};
  Eigen::LevenbergMarquardt<Residuals> fit(residuals);
  fit.parameters.ftol = control->ftol;
  fit.parameters.xtol = control->xtol;
  fit.parameters.gtol = control->gtol;
  fit.parameters.factor = control->stepbound;
  fit.parameters.maxfev = static_cast<Eigen::Index>(control->patience) * (n_par + 1);
  if (control->scale_diag == 0) {
    fit.useExternalScaling = true;
    fit.diag.setOnes(n_par);
  }

  Eigen::VectorXd parameters = Eigen::Map<const Eigen::VectorXd>(par, n_par);
  // Not minimize(): it goes on after a first evaluation that failed.
  Status end = fit.minimizeInit(parameters);
  if (end == Status::ImproperInputParameters) return;
  if (end == Status::NotStarted) {
    do {
      end = fit.minimizeOneStep(parameters);
    } while (end == Status::Running);
    Eigen::Map<Eigen::VectorXd>(par, n_par) = parameters;
    status->fnorm = fit.fnorm;
  }
  // A fit that the evaluation ended has its outcome from there.
  if (end == Status::UserAsked) return;
  status->outcome = fit.fnorm == 0 ? kLmZeroResidual : outcomeOf(end);
}
