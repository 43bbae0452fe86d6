// The hard-iron offset (bias) of a magnetometer from its mean reading in a known field. All in µT and 32-bit
// float, x, y, z.
//
// A magnetometer without calibration reads  raw = A · field + b:  A the soft iron of the handset, b its hard
// iron. The driver gives out  calibrated = C · (raw − bias)  with the stored soft-iron correction C
// ("corr_mat") and bias. With a perfect C, A is the inverse of C; both functions below return the bias for
// which the calibrated reading becomes the reference, whatever C is.
//
// A C without an inverse counts as the zero matrix here, as Matrix3by3::Inverse() has it: the field then has
// no part in the bias.
#pragma once

#include "framework/Matrix3by3.h"
#include "framework/SampleData.h"

/// From the raw stream: bias = mean − C⁻¹ · reference. `mean` has at least three values, of which three are
/// used.
[[nodiscard]] SampleData biasOfRawMean(const SampleData& mean, const Matrix3by3<float>& inverseCorrection,
                                       const SampleData& reference);

/// From the calibrated stream, which has `previousBias` subtracted already: bias = C⁻¹ · (mean − reference) +
/// previous.
[[nodiscard]] SampleData biasOfCalibratedMean(const SampleData& mean,
                                              const Matrix3by3<float>& inverseCorrection,
                                              const SampleData& reference, const SampleData& previousBias);
