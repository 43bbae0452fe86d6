#include "framework/Fits.h"

#include <cstdio>

#include "framework/Matrix3by3.h"

namespace {

/// Sums over the points of powers of x, and of y times powers of x.
struct ParabolaSums {
  double n = 0, x = 0, x2 = 0, x3 = 0, x4 = 0;
  double y = 0, xy = 0, x2y = 0;
};

ParabolaSums sumPoints(const std::vector<std::pair<float, float>>& points) {
  ParabolaSums sums;
  for (const auto& [pointX, pointY] : points) {
    const double x = pointX;
    const double y = pointY;
    sums.n += 1;
    sums.x += x;
    sums.x2 += x * x;
    sums.x3 += x * x * x;
    sums.x4 += x * x * x * x;
    sums.y += y;
    sums.xy += x * y;
    sums.x2y += x * x * y;
  }
  return sums;
}

/// A symmetric 3×3 matrix: the upper triangle.
struct Symmetric {
  double m00 = 0, m01 = 0, m02 = 0, m11 = 0, m12 = 0, m22 = 0;
};

/// The inverse of [[n, Σx, Σx²], [Σx, Σx², Σx³], [Σx², Σx³, Σx⁴]]; all zeros, after a message, when it has
/// none.
Symmetric invertNormalMatrix(const ParabolaSums& s) {
  const double det = s.x2 * (s.x * s.x3 - s.x2 * s.x2) + s.x * (s.x2 * s.x3 - s.x * s.x4) +
                     s.n * (s.x2 * s.x4 - s.x3 * s.x3);
  if (det == 0) {
    std::printf("%s", kNoInverseMessage);
    return {};
  }
  return {(s.x2 * s.x4 - s.x3 * s.x3) / det, (s.x2 * s.x3 - s.x * s.x4) / det,
          (s.x * s.x3 - s.x2 * s.x2) / det,  (s.n * s.x4 - s.x2 * s.x2) / det,
          (s.x * s.x2 - s.n * s.x3) / det,   (s.n * s.x2 - s.x * s.x) / det};
}

}  // namespace

bool linearFit(const std::vector<std::pair<float, float>>& points, SampleData* coefficients) {
  if (points.empty()) return false;
  const auto n = static_cast<float>(points.size());
  float sumX = 0;
  float sumY = 0;
  for (const auto& [x, y] : points) {
    sumX += x;
    sumY += y;
  }
  const float meanX = sumX / n;
  const float meanY = sumY / n;
  float sxx = 0;
  float sxy = 0;
  for (const auto& [x, y] : points) {
    sxx += (x - meanX) * (x - meanX);
    sxy += (x - meanX) * (y - meanY);
  }
  if (sxx == 0) return false;
  if (coefficients == nullptr) return true;
  const float slope = sxy / sxx;
  *coefficients = {meanY - meanX * slope, slope};
  return true;
}

bool quadraticFit(const std::vector<std::pair<float, float>>& points, SampleData* coefficients) {
  if (points.size() < 3) return false;
  const ParabolaSums s = sumPoints(points);
  const Symmetric inverse = invertNormalMatrix(s);
  if (coefficients == nullptr) return true;
  *coefficients = {static_cast<float>(inverse.m00 * s.y + inverse.m01 * s.xy + inverse.m02 * s.x2y),
                   static_cast<float>(inverse.m01 * s.y + inverse.m11 * s.xy + inverse.m12 * s.x2y),
                   static_cast<float>(inverse.m02 * s.y + inverse.m12 * s.xy + inverse.m22 * s.x2y)};
  return true;
}
