// The hub's outgoing side: encodes responses and events, keeps those that are still under way, and hands them
// out.
#pragma once

#include <cstdint>
#include <set>
#include <string>
#include <vector>

#include "proto/sns_client.pb.h"
#include "simhub/EventQueue.h"
#include "simhub/Hub.h"
#include "simhub/Suid.h"

namespace simhub {

class Outbox {
 public:
  /// Room for the events of one report, so that it fits its frame with what stands around them.
  static constexpr std::size_t kMaxEventBytes = 60'000;

  Outbox(HubOutput& output, EventQueue& queue, HubStatistics& statistics, std::uint64_t startTicks)
      : output_(output), queue_(queue), statistics_(statistics), startTicks_(startTicks) {}

  void AddClient(ClientId client) { clients_.insert(client); }
  void RemoveClient(ClientId client) { clients_.erase(client); }
  [[nodiscard]] bool HasClient(ClientId client) const { return clients_.count(client) != 0; }

  [[nodiscard]] std::uint64_t Ticks(Time time) const { return startTicks_ + toTicks(time); }

  /// The QMI response to a request, to go out at `time`.
  void Respond(ClientId client, std::uint16_t transactionId, std::uint16_t result, std::uint16_t error,
               Time time);

  /// One event, to go out and stamped at `time`. False when the payload is too large for a report.
  [[nodiscard]] bool Answer(ClientId client, const Suid& suid, std::uint32_t messageId,
                            const std::string& payload, Time time);

  /// A report goes out now.
  void Send(ClientId client, const sns_client_event_msg& report);

  /// The queue's mail of that slot is due.
  void Deliver(std::uint32_t slot);
  /// Everything under way is lost.
  void Clear();

 private:
  struct Letter {
    ClientId client = 0;
    std::vector<std::uint8_t> datagram;
  };

  void encode(ClientId client, const sns_client_event_msg& report, std::vector<std::uint8_t>* datagram);
  /// A free slot, in the queue for `time`.
  Letter& post(ClientId client, Time time);

  HubOutput& output_;
  EventQueue& queue_;
  HubStatistics& statistics_;
  const std::uint64_t startTicks_;
  std::set<ClientId> clients_;
  std::vector<Letter> letters_;
  std::vector<std::uint32_t> freeSlots_;
  std::vector<std::uint8_t> payload_;  // reused from report to report
  std::vector<std::uint8_t> datagram_;
};

}  // namespace simhub
