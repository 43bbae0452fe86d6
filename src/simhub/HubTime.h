// Time as the hub knows it: nanoseconds since its start, and the 19.2 MHz ticks that it stamps on events.
#pragma once

#include <chrono>
#include <cstdint>

namespace simhub {

/// Nanoseconds since the hub's start.
using Time = std::chrono::nanoseconds;

/// Far enough away never to come, near enough never to overflow when something is added.
inline constexpr Time kNever{std::int64_t{1} << 62};

constexpr double toSeconds(Time time) { return static_cast<double>(time.count()) * 1e-9; }

/// `seconds` ≥ 0 in nanoseconds, at most kNever.
constexpr Time fromSeconds(double seconds) {
  const double nanoseconds = seconds * 1e9;
  return nanoseconds < static_cast<double>(kNever.count())
             ? Time{static_cast<std::int64_t>(nanoseconds + 0.5)}
             : kNever;
}

/// The 19.2 MHz counter at `time`, rounded down: 12 ticks every 625 ns.
constexpr std::uint64_t toTicks(Time time) {
  const auto nanoseconds = static_cast<std::uint64_t>(time.count());
  return nanoseconds / 625 * 12 + nanoseconds % 625 * 12 / 625;
}

}  // namespace simhub
