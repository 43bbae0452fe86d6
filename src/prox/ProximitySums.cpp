#include "prox/ProximitySums.h"

#include <array>
#include <cstdio>

#include "framework/SampleData.h"
#include "ssc/Ticks.h"

void ProximitySums::Add(const sns_proximity_event& reading) {
  raw += static_cast<float>(reading.raw_adc());
  if (reading.data_size() > 0) poffset += reading.data(0);
  if (reading.data_size() > 1) ore += reading.data(1);
  ++count;
}

std::string readingLine(const sns_proximity_event& reading, std::uint64_t timestamp, float rangeHigh) {
  const bool isFar = reading.proximity_event_type() == SNS_PROXIMITY_EVENT_TYPE_FAR;
  // A time of 2^64 ticks has 12 digits before the point, a raw value 10, and a range up to 39.
  std::array<char, 128> start;
  (void)std::snprintf(start.data(), start.size(), "%.6f %14.6f %14.6f", ssc::ticksToSeconds(timestamp),
                      static_cast<double>(reading.raw_adc()), static_cast<double>(isFar ? rangeHigh : 0.0F));
  return start.data() + SampleData(reading.data().begin(), reading.data().end()).format(14, 6) + "\n";
}
