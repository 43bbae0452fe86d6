// The thermal model of a sensor: each axis's reading as a straight line of the temperature,
//
//   reading = scale · T + bias,   T in °C, by least squares,
//
// scale in sensor units per °C, bias the reading extrapolated to 0 °C (there is no other reference
// temperature). All sums run in 32-bit float in the samples' order: their rounding is part of the result, and
// the one thing that the correlation test reacts to.
#pragma once

#include <cstddef>
#include <vector>

#include "framework/Sample.h"

inline constexpr std::size_t kMaxThermalAxes = 3;

/// One element for each axis.
struct ThermalFit {
  SampleData scale;          ///< not a number at constant temperature, which leaves the slope open
  SampleData bias;           ///< as scale
  SampleData stdev;          ///< of the readings
  SampleData residualStdev;  ///< of what the line leaves of them
};

/// Fits the first `axes` values (1 to kMaxThermalAxes) of the samples. `temperatures` has one element for
/// each sample; there are at least two, and each has at least `axes` values.
[[nodiscard]] ThermalFit fitThermal(const std::vector<Sample>& samples,
                                    const std::vector<float>& temperatures, std::size_t axes);

/// The axes that the fit leaves more scattered than it found them. In exact arithmetic a least-squares line
/// never does; only rounding makes one. There is deliberately no other test of how good the line is.
[[nodiscard]] std::vector<std::size_t> uncorrelatedAxes(const ThermalFit& fit);

/// Whether all temperatures are the same, so that they say nothing about a slope.
[[nodiscard]] bool isConstantTemperature(const std::vector<float>& temperatures);

/// Adds a fit of samples that were corrected by a previous model to that model. Either vector of the previous
/// model may be empty: there was none.
void mergeWithPrevious(const SampleData& previousScale, SampleData* scale, SampleData* bias);
