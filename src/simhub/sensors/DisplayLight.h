// The light of the display that gets into a sensor under it. The display is dark for a moment of each
// refresh: an integration that falls into that moment catches least of its light. And at low brightness the
// display is dimmed by pulses, which add to what is caught.
#pragma once

namespace simhub {

/// Share of the display's light that is caught by an integration short against the refresh, `offset` after
/// the best moment (in the unit of `period`):
///
///   floor + (1 − floor) · (2 · d / period)²,    d the distance to the nearest best moment
///
/// so `floor` (0 to 1) at the best moment, a parabola around it, and 1 halfway to the next.
[[nodiscard]] double triggeredShare(double offset, double period, double floor);

/// The share's mean over the refresh: what integrations catch that are not tied to it.
[[nodiscard]] double untriggeredShare(double floor);

/// The pulses at a brightness level, as a share of what they are at the lowest: falls in a line to 0 at
/// `boundary`, from which level on the display is dimmed without pulses. No pulses come from a display that
/// is off.
[[nodiscard]] double pulseShare(double brightness, double boundary);

}  // namespace simhub
