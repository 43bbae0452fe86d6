// What a stand-in hub understands and says, as values: the requests that reach it and the datagrams that it
// answers with. The same script serves a hub in simulated time (FakeHub.h) and one behind a real socket
// (HubServer.h).
#pragma once

#include <chrono>
#include <cstdint>
#include <functional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "proto/sns_client.pb.h"
#include "proto/sns_std.pb.h"
#include "qmi/Qmi.h"
#include "ssc/MessageIds.h"
#include "ssc/SensorUid.h"
#include "ssc/transport/Transport.h"

namespace ssctest {

using Datagram = std::vector<std::uint8_t>;

/// A request as it reached the hub.
struct Request {
  std::uint16_t transactionId = 0;
  std::uint8_t reportType = 0;
  sns_client_request_msg message;

  [[nodiscard]] ssc::SensorUid suid() const { return ssc::SensorUid(message.suid()); }
  [[nodiscard]] const std::string& payload() const { return message.request().payload(); }
};

/// One thing that the hub does, `after` the request (a real hub: at once, in the order given).
struct Outgoing {
  ssc::Incoming::Kind kind = ssc::Incoming::Kind::kDatagram;
  Datagram bytes;
  ssc::Clock::Duration after{0};
};

using Outgoings = std::vector<Outgoing>;
/// What the hub does about a request.
using Script = std::function<Outgoings(const Request&)>;

inline qmi::Bytes asBytes(std::string_view text) {
  return {reinterpret_cast<const std::uint8_t*>(text.data()), text.size()};
}

/// One event of an event message.
struct Event {
  std::uint32_t messageId = 0;
  std::string payload;
  std::uint64_t ticks = 0;
};

inline Datagram reportDatagram(std::string_view payload) {
  Datagram datagram;
  if (!qmi::encodeReport(1, asBytes(payload), &datagram)) datagram.clear();
  return datagram;
}

inline Datagram eventDatagram(const ssc::SensorUid& suid, const std::vector<Event>& events) {
  sns_client_event_msg message;
  suid.CopyTo(message.mutable_suid());
  for (const Event& event : events) {
    auto* added = message.add_events();
    added->set_msg_id(event.messageId);
    added->set_timestamp(event.ticks);
    added->set_payload(event.payload);
  }
  return reportDatagram(message.SerializeAsString());
}

inline Datagram responseDatagram(std::uint16_t transactionId, std::uint16_t result = 0,
                                 std::uint16_t error = 0) {
  Datagram datagram;
  qmi::encodeResponse({transactionId, result, error, 77, 88}, &datagram);
  return datagram;
}

inline Outgoing raw(Datagram bytes, ssc::Clock::Duration after = {}) {
  return {ssc::Incoming::Kind::kDatagram, std::move(bytes), after};
}
inline Outgoing accept(const Request& request, ssc::Clock::Duration after = {}) {
  return raw(responseDatagram(request.transactionId), after);
}
inline Outgoing refuse(const Request& request, std::uint16_t error = 3) {
  return raw(responseDatagram(request.transactionId, 1, error));
}
inline Outgoing event(const ssc::SensorUid& suid, std::uint32_t messageId, std::string payload,
                      ssc::Clock::Duration after = {}) {
  return raw(eventDatagram(suid, {{messageId, std::move(payload), 0}}), after);
}
inline Outgoing goAway(ssc::Clock::Duration after = {}) { return {ssc::Incoming::Kind::kDown, {}, after}; }
inline Outgoing comeBack(ssc::Clock::Duration after = {}) { return {ssc::Incoming::Kind::kUp, {}, after}; }

/// The script of a hub that takes everything and says nothing.
inline Outgoings acceptAll(const Request& request) { return {accept(request)}; }

inline std::string sample(float value) {
  sns_std_sensor_event sensorEvent;
  sensorEvent.add_data(value);
  sensorEvent.set_status(SNS_STD_SENSOR_SAMPLE_STATUS_ACCURACY_HIGH);
  return sensorEvent.SerializeAsString();
}

/// The value that sample() was made of.
inline float sampleValue(const sns_client_event_msg::sns_client_event& sensorEvent) {
  sns_std_sensor_event parsed;
  if (!parsed.ParseFromString(sensorEvent.payload()) || parsed.data_size() == 0) return -1.0F;
  return parsed.data(0);
}

/// `count` sensor events, one a message, the first after `start` and one every `period`.
inline Outgoings stream(const ssc::SensorUid& suid, int count, ssc::Clock::Duration start,
                        ssc::Clock::Duration period) {
  Outgoings all;
  for (int i = 0; i < count; ++i) {
    all.push_back(event(suid, ssc::kSensorEvent, sample(static_cast<float>(i)), start + i * period));
  }
  return all;
}

inline Outgoings operator+(Outgoings left, const Outgoings& right) {
  left.insert(left.end(), right.begin(), right.end());
  return left;
}

}  // namespace ssctest
