// A hub whose behaviour a test writes down: for framework tests that want one odd thing to happen at a known
// moment. It answers look-ups, attributes, registry requests and notifications, and streams, in simulated
// time; a test changes what it says and takes over single requests.
#pragma once

#include <cstdint>
#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "proto/sns_client.pb.h"
#include "proto/sns_registry.pb.h"
#include "proto/sns_std.pb.h"
#include "ssc/Connection.h"
#include "ssc/SensorUid.h"
#include "ssc/transport/EmbeddedHub.h"

struct ScriptedSensor {
  ssc::SensorUid suid;
  std::string dataType;
  std::optional<std::string> name;                                       ///< none: the attribute is absent
  std::optional<int> streamType = SNS_STD_SENSOR_STREAM_TYPE_STREAMING;  ///< none: the attribute is absent
  bool confirms = true;                                                  ///< answers a notification
  /// The values of the n-th event of a stream; without it the sensor is silent.
  std::function<std::vector<float>(int index)> reading = nullptr;
  sns_std_sensor_sample_status status = SNS_STD_SENSOR_SAMPLE_STATUS_ACCURACY_HIGH;
};

class ScriptedHub;

/// What the hub is like, and what it has seen. Shared by the test and the hub; changed only while nothing
/// waits.
struct HubScript {
  static ssc::SensorUid registrySuid() { return {0x5e9, 0x1e9}; }

  std::vector<ScriptedSensor> sensors;  ///< in the order in which look-ups list them
  std::map<std::string, sns_registry_data> registry;
  bool registryWritesFail = false;

  /// Called first with every request; true: the test has dealt with it (the QMI response still says success).
  std::function<bool(ScriptedHub&, const sns_client_request_msg&)> onRequest;
  /// Requests that the hub refuses: its QMI response says failure.
  std::function<bool(const sns_client_request_msg&)> refuses;

  std::vector<sns_client_request_msg> requests;  ///< in the order in which they came

  /// The message ids of the requests to one sensor, in order.
  [[nodiscard]] std::vector<std::uint32_t> requestIdsTo(const ssc::SensorUid& suid) const;
  [[nodiscard]] int countRequests(const ssc::SensorUid& suid, std::uint32_t messageId) const;
};

class ScriptedHub final : public ssc::EmbeddedHub {
 public:
  using Duration = ssc::Clock::Duration;
  using TimePoint = ssc::Clock::TimePoint;

  explicit ScriptedHub(std::shared_ptr<HubScript> script) : script_(std::move(script)) {}

  // What a script may do in onRequest, all at `delay` from now.
  void SendEvent(Duration delay, const ssc::SensorUid& suid, std::uint32_t messageId,
                 const std::string& payload);
  void SendMessage(Duration delay, const sns_client_event_msg& message);
  void SendReading(Duration delay, const ssc::SensorUid& suid, const std::vector<float>& values);
  /// The hub goes away, forgetting its streams, and comes back after `absence`.
  void GoAwayAndReturn(Duration delay, Duration absence);

  [[nodiscard]] int Submit(qmi::Bytes datagram) override;
  [[nodiscard]] bool RunUntil(TimePoint limit, ssc::Incoming* incoming) override;
  [[nodiscard]] TimePoint Now() const override { return now_; }

 private:
  struct Stream {
    const ScriptedSensor* sensor;
    Duration period;
    TimePoint next;
    int index = 0;
  };

  void schedule(Duration delay, ssc::Incoming incoming);
  void respond(std::uint16_t transaction, bool refused);
  void answer(const sns_client_request_msg& request);
  void answerLookup(const sns_client_request_msg& request);
  void answerRegistry(const sns_client_request_msg& request);
  void answerSensor(const ScriptedSensor& sensor, const sns_client_request_msg& request);
  void startStream(const ScriptedSensor& sensor, const sns_client_request_msg& request);
  void queueStreamEvent(Stream* stream);

  std::shared_ptr<HubScript> script_;
  TimePoint now_{};
  bool up_ = true;
  std::multimap<TimePoint, ssc::Incoming> outgoing_;  ///< equal times keep their order
  std::map<ssc::SensorUid, Stream> streams_;
};

/// An encoded event of a streaming sensor.
[[nodiscard]] std::string encodeReading(
    const std::vector<float>& values,
    sns_std_sensor_sample_status status = SNS_STD_SENSOR_SAMPLE_STATUS_ACCURACY_HIGH);

/// A connection to a new hub that follows the script.
[[nodiscard]] std::unique_ptr<ssc::Connection> connectTo(const std::shared_ptr<HubScript>& script);

/// An item of a registry group for tests: a float, or a vector ("x", "y", "z").
void addFloatItem(sns_registry_data* data, const std::string& name, float value, std::optional<int> version);
void addVectorItem(sns_registry_data* data, const std::string& name, const std::vector<float>& values,
                   std::optional<int> version);
