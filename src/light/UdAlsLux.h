// The scale of the light sensor under the display, from steps at known illuminances. In 32-bit float.
#pragma once

#include <vector>

#include "framework/SampleData.h"

/// What the sensor's driver multiplies the lux by when nobody has calibrated it.
inline constexpr float kNeutralUdAlsScale = 1.0F;

/// Σ(reference lux / mean lux) over the records with a mean above 0, divided by the number of all records
/// (see UdAlsFiles.h). A dark record thus pulls the scale down instead of failing the calibration. Not a
/// number for no records.
[[nodiscard]] float udAlsLuxScale(const std::vector<SampleData>& records);
