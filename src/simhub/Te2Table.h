// The display's TE2 table, a text node of its driver. It holds four pairs of delays in display lines, each of
// a rising and a falling edge of the signal that triggers the light sensor under the display, one pair for
// each refresh mode.
#pragma once

#include <optional>
#include <string>

namespace simhub {

inline constexpr int kMaxTe2Delay = 4095;  // display lines

/// The falling edge of the second pair, which is the one for the mode that the light sensor is calibrated in.
/// Nothing when the text has no such number of 0 to kMaxTe2Delay: then the display keeps the edge that it has
/// of its own. What follows makes no difference: whoever writes a shorter line over a longer one leaves the
/// longer one's end.
[[nodiscard]] std::optional<int> parseTe2FallingEdge(const std::string& table);

/// That of a file; nothing when there is none.
[[nodiscard]] std::optional<int> readTe2FallingEdge(const std::string& path);

}  // namespace simhub
