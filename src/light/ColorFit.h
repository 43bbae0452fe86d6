// What the records of a color calibration say about the sensor. All in 32-bit float; the order of the
// operations is part of the results.
//
// Functions take records of color_record::kCount values. Results may be infinite or not a number, for light
// that no sound sensor reports (no clear light at all, as much red as clear).
#pragma once

#include <optional>
#include <utility>
#include <vector>

#include "framework/Sample.h"

/// How much of the infrared leaks through the red and the blue filter: ((R + B) / 2) / IR, of the record
/// under the infrared lamp.
[[nodiscard]] float irCrosstalk(const SampleData& irOnly);

/// The lamp's infrared in proportion to the clear light of another record, at that one's gain:
/// IR · 2^d / C, d being the whole steps by which its gain is above the lamp's. Nothing unless C is above 0.
[[nodiscard]] std::optional<float> irRatio(const SampleData& irOnly, const SampleData& visible);

/// The mean of reference lux / raw lux.
[[nodiscard]] float meanLuxScale(const std::vector<SampleData>& records);
/// The mean of reference lux / ((C − R) · raw lux / C), for a light sensor that weighs the clear light by
/// what is not red in it.
[[nodiscard]] float meanBmScale(const std::vector<SampleData>& records);

/// A ratio of channels, and the color temperature that a source with it has.
using ColorPoints = std::vector<std::pair<float, float>>;

/// B / R of the records whose R is above 0.
[[nodiscard]] ColorPoints blueRedPoints(const std::vector<SampleData>& records);
/// (C − R) / (C − B) of the records whose C is at least R and above B.
[[nodiscard]] ColorPoints minusBlueRedPoints(const std::vector<SampleData>& records);
/// B / C of the records whose C is above 0.
[[nodiscard]] ColorPoints blueClearPoints(const std::vector<SampleData>& records);

/// Makes the first value of each reading the color temperature q0 + q1 · B / R. False at the first whose R is
/// 0 or less: those before it are converted, the others are not. An R that is not a number gives a color
/// temperature that is none either.
[[nodiscard]] bool convertToCct(float q0, float q1, std::vector<Sample>* readings);
