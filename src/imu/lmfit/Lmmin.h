// Levenberg–Marquardt least squares with lmfit's interface: the parameters that minimise Σ fvec[i]².
//
// Names and layout are lmfit's own, because lmfit itself serves when it is installed. Otherwise they stand
// for an adapter to Eigen's port of MINPACK's lmdif, from which lmfit descends: the same control values mean
// the same there.
#pragma once

#ifdef VANTLE_LMFIT

#include <lmmin.h>

#else

#include <cstdio>

struct lm_control_struct {
  double ftol;       ///< relative reduction of the sum of squares that ends the fit
  double xtol;       ///< relative change of the parameters that ends the fit
  double gtol;       ///< cosine between residuals and any column of the Jacobian that ends the fit
  double epsilon;    ///< relative error of the evaluation; the Jacobian's step is its square root
  double stepbound;  ///< first bound on a step, as a factor of the scaled parameters' length
  int patience;      ///< at most patience · (n_par + 1) evaluations
  int scale_diag;    ///< not 0: parameters are scaled by their columns of the Jacobian
  std::FILE* msgfile;
  int verbosity;  ///< the adapter never prints: this and the following two are taken and ignored
  int n_maxpri;
  int m_maxpri;
};

struct lm_status_struct {
  double fnorm;   ///< √Σ fvec[i]² at the end
  int nfev;       ///< evaluations made
  int outcome;    ///< one of LmOutcome
  int userbreak;  ///< set when `evaluate` asked for the end
};

/// Fills fvec[0 … m_dat−1] for the parameters `par`; a *userbreak other than 0 ends the fit.
using LmEvaluate = void(const double* par, const int m_dat, const void* data, double* fvec, int* userbreak);

/// Fits `par` (n_par start values, replaced by the result) to m_dat residuals. `y` (may be null) is
/// subtracted from what `evaluate` fills in. Needs 1 ≤ n_par ≤ m_dat, else nothing is evaluated and the
/// parameters stay. Residuals that are not finite end the fit; the parameters are then the best so far.
void lmmin(int n_par, double* par, int m_dat, const double* y, const void* data, LmEvaluate* evaluate,
           const lm_control_struct* control, lm_status_struct* status);

#endif

/// How a fit ended: the values of lm_status_struct::outcome.
enum LmOutcome : int {
  kLmZeroResidual = 0,
  kLmConvergedF = 1,     ///< by ftol
  kLmConvergedX = 2,     ///< by xtol
  kLmConvergedBoth = 3,  ///< by both
  kLmTrapped = 4,        ///< by gtol: the residuals are orthogonal to the Jacobian
  kLmExhausted = 5,      ///< evaluations used up
  kLmFtolTooSmall = 6,
  kLmXtolTooSmall = 7,
  kLmGtolTooSmall = 8,
  kLmNoMemory = 9,
  kLmBadInput = 10,
  kLmUserBreak = 11,
  kLmNotFinite = 12,
};
