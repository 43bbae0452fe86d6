// The readings of a proximity sensor that takes an offset off, as they are printed and averaged. An event's
// raw value is in counts; behind it come the offset and its range extension, in steps of the sensor's own.
#pragma once

#include <cstdint>
#include <string>

#include "framework/Statistics.h"
#include "proto/sns_proximity.pb.h"

/// The sums of a collection's readings, in 32-bit float: each is added as it comes. A mean of no readings is
/// not a number.
struct ProximitySums {
  /// Values that an event has behind its raw one: the offset, then the extension.
  static constexpr int kValues = 2;

  float raw = 0;
  float poffset = 0;
  float ore = 0;
  std::int32_t count = 0;

  /// A value that the event lacks counts as 0.
  void Add(const sns_proximity_event& reading);

  [[nodiscard]] float MeanRaw() const { return meanOf(raw); }
  [[nodiscard]] float MeanPoffset() const { return meanOf(poffset); }
  [[nodiscard]] float MeanOre() const { return meanOf(ore); }

 private:
  [[nodiscard]] float meanOf(float sum) const { return withPlainNan(sum / static_cast<float>(count)); }
};

/// One line: the time in seconds, the raw value, the distance (0 for a near target, `rangeHigh` for a far
/// one), and what else the event has.
[[nodiscard]] std::string readingLine(const sns_proximity_event& reading, std::uint64_t timestamp,
                                      float rangeHigh);
