// The delay at which the sensor under the display sees the least of the display's own light.
#pragma once

#include <string>
#include <vector>

#include "framework/SampleData.h"

/// The parabola C = q0 + q1·d + q2·d² of the mean clear level against the delay, over the records (see
/// UdAlsFiles.h). False, with `coefficients` left alone, for fewer than three.
[[nodiscard]] bool fitDelay(const std::vector<SampleData>& records, SampleData* coefficients);

/// Where the parabola turns: −½ · q1 / q2, in double precision, rounded to float at the end. That of one that
/// opens downwards is the delay of the most light, and is taken all the same. Infinite or not a number for a
/// parabola that is a line.
[[nodiscard]] float vertexOf(const SampleData& coefficients);

/// To whole microseconds, for a delay in ms.
[[nodiscard]] float roundedToThreeDecimals(float delay);

/// The TE2 table that puts the display's edges where the sensor's best delay is: eight numbers, of which two
/// follow the delay. The others belong to the panel.
[[nodiscard]] std::string calibratedTe2Table(float delay);
/// The TE2 table with one pair of edges, four times over.
[[nodiscard]] std::string te2Table(unsigned risingEdge, unsigned fallingEdge);
