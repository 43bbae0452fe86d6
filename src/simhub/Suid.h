#pragma once

#include <compare>
#include <cstdint>
#include <string_view>

#include "proto/sns_std.pb.h"

namespace simhub {

/// A sensor's identifier. Ordered, high word first, as clients order it.
struct Suid {
  std::uint64_t high = 0;
  std::uint64_t low = 0;

  void CopyTo(sns_std_suid* message) const {
    message->set_suid_low(low);
    message->set_suid_high(high);
  }
  friend auto operator<=>(const Suid&, const Suid&) = default;
};

inline Suid suidOf(const sns_std_suid& message) { return {message.suid_high(), message.suid_low()}; }

/// The look-up sensor, the only one whose SUID is known without asking.
inline constexpr Suid kLookupSuid{0xabababababababab, 0xabababababababab};

/// The SUID of the sensor of that name: always the same one, and different for different names.
[[nodiscard]] Suid suidForName(std::string_view name);

/// 64 bits that depend on every byte of `text` (FNV-1a, then mixed).
[[nodiscard]] std::uint64_t hashText(std::string_view text, std::uint64_t seed = 0);

}  // namespace simhub
