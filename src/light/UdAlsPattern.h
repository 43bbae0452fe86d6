// How much of the display's own light reaches a channel of the sensor, by the display's brightness.
#pragma once

#include <cstddef>
#include <vector>

#include "framework/SampleData.h"

/// The straight line, in 32-bit float, of the channel mean at `index` of the records (see UdAlsFiles.h)
/// against the display's brightness: level = q0 + q1 · brightness. False, with `coefficients` left alone,
/// when all brightnesses are equal or there is no record.
[[nodiscard]] bool fitPattern(const std::vector<SampleData>& records, std::size_t index,
                              SampleData* coefficients);
