#pragma once

#include <cstdint>

namespace ssc {

/// Frequency of the counter behind the hub's time stamps, Hz.
inline constexpr double kTicksPerSecond = 19'200'000.0;

/// A hub time stamp in seconds, in double precision.
constexpr double ticksToSeconds(std::uint64_t ticks) { return static_cast<double>(ticks) / kTicksPerSecond; }

}  // namespace ssc
