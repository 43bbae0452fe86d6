// The true ratios of the sensor's upper gain settings. Each setting is nominally twice the one before; what
// the amplifier really does is measured under one light at settings 8 to 11. In 32-bit float.
#pragma once

#include <array>
#include <cstddef>
#include <vector>

#include "framework/SampleData.h"

inline constexpr int kFirstCalibratedGain = 8;
/// Settings 8, 9, 10 and 11; the last is what the others are compared with.
inline constexpr std::size_t kCalibratedGains = 4;

using GainMeans = std::array<float, kCalibratedGains>;
using GainRatios = std::array<float, kCalibratedGains - 1>;

/// The channel that stands at `index` of the records (see UdAlsFiles.h) at each setting: of the last record
/// whose mean gain rounds to it (a half rounds up), 0 where there is none.
[[nodiscard]] GainMeans meansByGain(const std::vector<SampleData>& records, std::size_t index);

/// X11 / X8, X11 / X9, X11 / X10; the nominal 8, 4, 2 where the divisor is not above 0.
[[nodiscard]] GainRatios gainRatios(const GainMeans& means);
