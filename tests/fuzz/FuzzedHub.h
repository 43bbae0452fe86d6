// A hub whose every answer and reading is at the mercy of a fuzz input. By default it is a well-behaved hub;
// each thing that it sends takes one byte of the input, which may make it keep silent, repeat itself, lie,
// send rubbish, come late or go away. It runs in simulated time, so that a whole command is one quick call.
#pragma once

#include <cstdint>
#include <functional>
#include <map>
#include <string>
#include <utility>
#include <vector>

#include "fuzz/FuzzInput.h"
#include "proto/sns_client.pb.h"
#include "proto/sns_registry.pb.h"
#include "ssc/MessageIds.h"
#include "ssc/SensorUid.h"
#include "ssc/transport/EmbeddedHub.h"

namespace fuzz {

/// What the hub has, and what it saw. Outlives the hub.
struct HubWorld {
  struct Sensor {
    std::string dataType;
    std::string name;
    std::vector<float> reading;
    std::uint32_t readingId = ssc::kSensorEvent;
    /// The payload of a reading; without it that of a standard sensor.
    std::function<std::string(const std::vector<float>&)> encode = nullptr;
    /// How requests of the sensor's own are answered, by their message id: event id and payload.
    std::map<std::uint32_t, std::pair<std::uint32_t, std::string>> answers = {};
  };
  std::vector<Sensor> sensors;
  std::map<std::string, sns_registry_data> registry;

  int writes = 0;           ///< registry writes that it was asked for
  bool wroteFinite = true;  ///< whether every float in them was finite
};

class FuzzedHub final : public ssc::EmbeddedHub {
 public:
  FuzzedHub(HubWorld* world, FuzzInput* input) : world_(*world), input_(*input) {}

  [[nodiscard]] int Submit(qmi::Bytes datagram) override;
  [[nodiscard]] bool RunUntil(ssc::Clock::TimePoint limit, ssc::Incoming* incoming) override;
  [[nodiscard]] ssc::Clock::TimePoint Now() const override { return now_; }

 private:
  using Duration = ssc::Clock::Duration;
  struct Stream {
    Duration period;
    ssc::Clock::TimePoint next;
  };

  void respond(std::uint16_t transaction);
  void answer(const sns_client_request_msg& request);
  void answerLookup(const sns_client_request_msg& request);
  void answerRegistry(const sns_client_request_msg& request);
  void answerSensor(std::size_t index, const sns_client_request_msg& request);
  void read(std::size_t index);

  [[nodiscard]] std::string readingOf(const ssc::SensorUid& suid, const std::vector<float>& values) const;
  /// Sends an event, or whatever the input makes of it.
  void sendEvent(const ssc::SensorUid& suid, std::uint32_t messageId, std::string payload);
  void sendReport(Duration delay, const std::string& payload);
  void schedule(Duration delay, ssc::Incoming incoming);
  void goAway(Duration absence);

  HubWorld& world_;
  FuzzInput& input_;
  ssc::Clock::TimePoint now_{};
  bool up_ = true;
  std::multimap<ssc::Clock::TimePoint, ssc::Incoming> outgoing_;
  std::map<std::size_t, Stream> streams_;
};

}  // namespace fuzz
