// The brightness at which the display changes from dimming by current to dimming by pulses.
#pragma once

#include <vector>

#include "framework/SampleData.h"

/// The brightness of the record (see UdAlsFiles.h) with the smallest mean clear level; of equal ones the
/// later. Not a number when no level can be compared.
[[nodiscard]] float pwmBoundary(const std::vector<SampleData>& records);
