#pragma once

#include <compare>
#include <cstdint>

#include "proto/sns_std.pb.h"

namespace ssc {

/// The hub's identifier of a sensor: 128 bits, ordered (high word first) so that it can be a key.
struct SensorUid {
  std::uint64_t high = 0;
  std::uint64_t low = 0;

  SensorUid() = default;
  SensorUid(std::uint64_t lowWord, std::uint64_t highWord) : high(highWord), low(lowWord) {}
  explicit SensorUid(const sns_std_suid& suid) : high(suid.suid_high()), low(suid.suid_low()) {}

  void CopyTo(sns_std_suid* suid) const {
    suid->set_suid_low(low);
    suid->set_suid_high(high);
  }

  /// No sensor has the SUID zero.
  [[nodiscard]] bool IsZero() const { return high == 0 && low == 0; }

  // NOLINTNEXTLINE(modernize-use-nullptr): the check takes the zero of the generated comparison for a pointer
  friend auto operator<=>(const SensorUid&, const SensorUid&) = default;
};

/// The one SUID that is known without asking: the sensor that looks up all others.
inline const SensorUid kSuidLookupSensor{0xabababababababab, 0xabababababababab};

}  // namespace ssc
