#pragma once

#include <algorithm>
#include <cstdint>
#include <vector>

#include "simhub/HubTime.h"

namespace simhub {

/// What the hub does by itself at a time.
struct HubEvent {
  enum class Kind : std::uint32_t { kReading, kMail, kDown, kUp };
  Time time;
  std::uint64_t sequence;  ///< of two at the same time, the one planned first comes first
  Kind kind;
  std::uint32_t index;       ///< kReading: the sensor; kMail: the slot; kDown: the fault
  std::uint32_t generation;  ///< kReading: stale when the sensor's has moved on
};

/// A binary heap of events.
class EventQueue {
 public:
  void Push(Time time, HubEvent::Kind kind, std::uint32_t index = 0, std::uint32_t generation = 0) {
    heap_.push_back({time, sequence_++, kind, index, generation});
    std::push_heap(heap_.begin(), heap_.end(), later);
  }
  [[nodiscard]] bool Empty() const { return heap_.empty(); }
  [[nodiscard]] const HubEvent& Next() const { return heap_.front(); }
  HubEvent Pop() {
    std::pop_heap(heap_.begin(), heap_.end(), later);
    const HubEvent event = heap_.back();
    heap_.pop_back();
    return event;
  }
  void Clear() { heap_.clear(); }

 private:
  static bool later(const HubEvent& a, const HubEvent& b) {
    return a.time != b.time ? a.time > b.time : a.sequence > b.sequence;
  }
  std::vector<HubEvent> heap_;
  std::uint64_t sequence_ = 0;
};

}  // namespace simhub
