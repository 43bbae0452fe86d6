// What drives the emitter of a proximity sensor: how many pulses it sends for one reading, and with which
// current. The raw reading grows in proportion to both, so that one measured average tells the setting at
// which it becomes a wanted value. All in 32-bit float, in the order of the formulas.
#pragma once

#include <cstdint>
#include <optional>

// The pulse number is stored as the number of pulses less one.
inline constexpr float kMaxStoredPulseNumber = 63.0F;
inline constexpr std::int64_t kMinPulseCurrent = 2;  // steps of the driver
inline constexpr std::int64_t kMaxPulseCurrent = 25;

/// The pulses that would make the average reading `target`: target · pulses · count / rawSum, `pulses` being
/// those of now. Not finite for a sum of 0, or when the product exceeds a float.
[[nodiscard]] float pulsesForTarget(float target, float pulses, std::int32_t count, float rawSum);

/// How a finite number of pulses is stored: rounded (halves away from zero) and less one; 0 below 2 pulses,
/// at most 63.
[[nodiscard]] float storedPulseNumber(float pulses);

/// The current that would make the average reading `target`: target / wholeAverage · current, the average
/// cut to whole counts. Not finite for an average of 0, or when the quotient exceeds a float.
[[nodiscard]] float currentForTarget(float target, std::int64_t wholeAverage, std::int64_t current);

/// A finite current rounded to whole steps (halves up), and at least 2, at most 25: a current below zero
/// becomes 2, too.
[[nodiscard]] std::int64_t limitedPulseCurrent(float current);

/// The value without its fraction, as an integer item stores it; nothing when it is not finite or beyond 64
/// bits.
[[nodiscard]] std::optional<std::int64_t> wholeNumber(float value);
