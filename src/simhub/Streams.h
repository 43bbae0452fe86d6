// Who gets which sensor's readings, and when. A sensor runs at the highest rate that anyone asks of it; each
// client gets those of its readings that are due at the client's own rate, several in a message where it
// asked for batching.
#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include "proto/sns_client.pb.h"
#include "simhub/EventQueue.h"
#include "simhub/FaultPlan.h"
#include "simhub/Outbox.h"
#include "simhub/Sensor.h"

namespace simhub {

struct StreamRequest {
  double rate = 0;      ///< Hz; 0: whenever the reading changes
  Time batchPeriod{0};  ///< readings of this time go into one message; 0: the scenario's way
};

class Streams {
 public:
  /// All references outlive the streams, and the sensors keep their index.
  Streams(const std::vector<std::unique_ptr<Sensor>>& sensors, const HubConfig& config, EventQueue& queue,
          Outbox& outbox, FaultPlan& faults, HubStatistics& statistics);

  /// Starts the client's stream of the sensor, or replaces it.
  void Start(ClientId client, std::uint32_t sensor, const StreamRequest& request, Time now);
  void Stop(ClientId client, std::uint32_t sensor, Time now);
  void StopClient(ClientId client, Time now);
  /// Ends all streams at once.
  void Clear();

  /// The queue's reading is due: takes it and sends it to whom it concerns. True when the hub goes away upon
  /// it, to be back at `back`.
  [[nodiscard]] bool TakeReading(const HubEvent& event, Time* back);

 private:
  using EventMessage = sns_client_event_msg::sns_client_event;

  struct Stream {
    ClientId client = 0;
    bool onChange = false;
    double rate = 0;  ///< Hz
    Time period{0};
    Time due{0};  ///< the reading that is taken at or after this is the next to send
    Time batchPeriod{0};
    std::uint32_t batchCount = 1;
    Time batchSince{0};  ///< when the first reading of the message was taken
    std::size_t batchBytes = 0;
    sns_client_event_msg message;  ///< readings that wait for their message to fill
    EventMessage held;             ///< a reading to be sent after the next one
    bool isHolding = false;
    std::string lastPayload;  ///< on-change: what the client knows
    bool ended = false;       ///< single output: done
  };

  struct Running {
    std::vector<std::unique_ptr<Stream>> streams;
    double rate = 0;         ///< Hz; 0: off
    Time base{0};            ///< reading i is taken at base + i / rate
    std::uint64_t next = 0;  ///< i of the next reading
    Time last{0};            ///< when the last one was taken
    Time switchedOn{0};
    std::uint32_t generation = 0;
  };

  /// The sensor's rate follows its streams.
  void adjust(std::uint32_t sensor, Time now);
  void planNext(std::uint32_t sensor);
  [[nodiscard]] static Time readingTime(const Running& running, std::uint64_t index);
  void encodeReading(std::uint32_t sensor, Time taken, const ReadingFaults& faults);
  void offer(const Sensor& sensor, Stream& stream, Time taken, const ReadingFaults& faults);
  void append(Stream& stream, Time taken, const EventMessage& event);

  const std::vector<std::unique_ptr<Sensor>>& sensors_;
  const HubConfig& config_;
  EventQueue& queue_;
  Outbox& outbox_;
  FaultPlan& faults_;
  HubStatistics& statistics_;
  std::vector<Running> running_;
  std::vector<float> values_;  // of the reading at hand, reused
  EventMessage event_;         // the reading's event, reused
};

}  // namespace simhub
