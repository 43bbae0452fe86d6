// The solution of the positional procedure: a scale and a bias for each axis, found from positions of which
// nothing is known but that the handset lay still.
//
// corrected = scale · (reading − bias), axis by axis. The fit itself runs in double; what it starts from and
// what it gives are 32-bit floats.
#pragma once

#include <array>
#include <cstddef>
#include <vector>

#include "framework/SampleData.h"

struct AxisCorrection {
  std::array<float, 3> scale{1, 1, 1};
  std::array<float, 3> bias{};

  friend bool operator==(const AxisCorrection&, const AxisCorrection&) = default;
};

inline constexpr std::size_t kMinPositions = 6;  ///< as many as there are unknowns

/// What AccelError is given as its data.
struct AccelFitData {
  const std::vector<SampleData>& means;  ///< of three values each
  float gravity;
};

/// The residuals of the fit: par holds scale x, y, z and bias x, y, z, and
///   fvec[i] = gravity − √(Σ (scale · (mean_i − bias))²)
/// in double. Fewer than one position leave fvec alone.
void AccelError(const double* par, int m_dat, const void* data, double* fvec, int* userbreak);

/// Least squares: the correction that gives every position's mean the length `gravity`, starting from none.
/// Needs at least kMinPositions means of three values. Positions that do not span all axes give one of the
/// many corrections that fit, or numbers that are not finite.
[[nodiscard]] AxisCorrection fitAccel(const std::vector<SampleData>& means, float gravity);

/// The correction for uncalibrated readings, when `fitted` was found from readings that `current` had
/// corrected: bias + fitted bias / scale, scale · fitted scale, in float. A current scale of 0 gives
/// infinity.
[[nodiscard]] AxisCorrection composeCorrections(const AxisCorrection& current, const AxisCorrection& fitted);

/// The mean of each element, in float. Empty for none.
[[nodiscard]] SampleData meanOf(const std::vector<SampleData>& values);
