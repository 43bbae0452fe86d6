#include "mag/MagBias.h"

namespace {

constexpr std::size_t kAxes = 3;

/// A sensor may send more than its axes.
SampleData axesOf(SampleData reading) {
  reading.resize(kAxes);
  return reading;
}

}  // namespace

SampleData biasOfRawMean(const SampleData& mean, const Matrix3by3<float>& inverseCorrection,
                         const SampleData& reference) {
  return axesOf(mean) - SampleData(inverseCorrection * reference.toVector());
}

SampleData biasOfCalibratedMean(const SampleData& mean, const Matrix3by3<float>& inverseCorrection,
                                const SampleData& reference, const SampleData& previousBias) {
  const SampleData excess = axesOf(mean) - reference;
  return SampleData(inverseCorrection * excess.toVector()) + previousBias;
}
