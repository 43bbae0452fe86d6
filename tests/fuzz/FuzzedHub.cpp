#include "fuzz/FuzzedHub.h"

#include <algorithm>
#include <cmath>
#include <utility>

#include "fuzz/FuzzCheck.h"
#include "proto/sns_std.pb.h"
#include "proto/sns_suid.pb.h"
#include "ssc/AttrUtil.h"
#include "ssc/MessageIds.h"
#include "ssc/Results.h"
#include "ssc/Ticks.h"

namespace fuzz {
namespace {

using std::chrono::milliseconds;

constexpr std::uint64_t kClientId = 1;
constexpr milliseconds kLatency{1};
/// A byte of the input, times this, is how late something comes or how long the hub stays away: up to 5 s.
constexpr milliseconds kLateness{20};
/// The hub stays away for good.
constexpr std::uint8_t kForGood = 255;
/// The fastest stream: a rate out of a damaged request must not make a run endless.
constexpr double kLargestRateHz = 50;

/// What may become of a thing that the hub sends. Bytes of the input from kOddities on mean that all is well,
/// so that a random input still lets most things pass.
enum class Oddity : std::uint8_t {
  kNone,
  kSilence,
  kErrorEvent,
  kOtherPayload,
  kOtherId,
  kTwice,
  kDatagramOfRubbish,
  kReportOfRubbish,
  kFlippedByte,
  kLate,
  kHubAway,
  kOtherValues,
  kOddities
};

Oddity takeOddity(FuzzInput* input) {
  const std::uint8_t byte = input->byte();
  return byte < static_cast<std::uint8_t>(Oddity::kOddities) ? static_cast<Oddity>(byte) : Oddity::kNone;
}

ssc::SensorUid registrySuid() { return {0x7e9, 0x7e9}; }
ssc::SensorUid suidOf(std::size_t index) { return {index + 1, 1}; }

qmi::Bytes asBytes(const std::string& text) {
  return {reinterpret_cast<const std::uint8_t*>(text.data()), text.size()};
}

ssc::Incoming datagramOf(const std::string& bytes) {
  ssc::Incoming incoming;
  incoming.datagram.assign(bytes.begin(), bytes.end());
  return incoming;
}

std::string errorPayload(std::uint8_t code) {
  sns_std_error_event error;
  error.set_error(static_cast<sns_std_error>(code % (sns_std_error_MAX + 1)));
  return error.SerializeAsString();
}

std::string readingPayload(const std::vector<float>& values) {
  sns_std_sensor_event event;
  for (const float value : values) event.add_data(value);
  event.set_status(SNS_STD_SENSOR_SAMPLE_STATUS_ACCURACY_HIGH);
  return event.SerializeAsString();
}

bool isFinite(const sns_registry_data& data) {
  return std::all_of(data.items().begin(), data.items().end(), [](const sns_registry_data_item& item) {
    return item.has_subgrp() ? isFinite(item.subgrp()) : !item.has_flt() || std::isfinite(item.flt());
  });
}

}  // namespace

int FuzzedHub::Submit(qmi::Bytes datagram) {
  if (!up_) return ssc::kNotConnected;
  const auto frame = qmi::decodeRequest(datagram);
  check(frame.has_value(), "the program sends well-formed requests");
  sns_client_request_msg request;
  check(request.ParseFromArray(frame->payload.data(), static_cast<int>(frame->payload.size())),
        "the program's requests hold a request message");
  respond(frame->transactionId);
  answer(request);
  return ssc::kOk;
}

void FuzzedHub::respond(std::uint16_t transaction) {
  qmi::Response response;
  response.transactionId = transaction;
  milliseconds delay = kLatency;
  switch (takeOddity(&input_)) {
    case Oddity::kSilence:
      return;
    case Oddity::kErrorEvent:
      response.result = 1;
      response.error = input_.byte();
      break;
    case Oddity::kOtherId:
      response.transactionId = input_.byte();
      break;
    case Oddity::kDatagramOfRubbish:
      return schedule(delay, datagramOf(input_.text()));
    case Oddity::kLate:
      delay = kLateness * input_.byte();
      break;
    case Oddity::kHubAway:
      return goAway(kLateness * input_.byte());
    default:
      break;
  }
  ssc::Incoming incoming;
  qmi::encodeResponse(response, &incoming.datagram);
  schedule(delay, std::move(incoming));
}

void FuzzedHub::answer(const sns_client_request_msg& request) {
  const ssc::SensorUid suid(request.suid());
  if (suid == ssc::kSuidLookupSensor) return answerLookup(request);
  if (suid == registrySuid()) return answerRegistry(request);
  for (std::size_t i = 0; i < world_.sensors.size(); ++i) {
    if (suid == suidOf(i)) return answerSensor(i, request);
  }
}

void FuzzedHub::answerLookup(const sns_client_request_msg& request) {
  sns_suid_req query;
  check(query.ParseFromString(request.request().payload()), "a look-up holds its message");
  sns_suid_event found;
  found.set_data_type(query.data_type());
  if (query.data_type() == ssc::kRegistryDataType) registrySuid().CopyTo(found.add_suid());
  for (std::size_t i = 0; i < world_.sensors.size(); ++i) {
    if (world_.sensors[i].dataType == query.data_type()) suidOf(i).CopyTo(found.add_suid());
  }
  sendEvent(ssc::kSuidLookupSensor, ssc::kSuidEvent, found.SerializeAsString());
}

void FuzzedHub::answerRegistry(const sns_client_request_msg& request) {
  if (request.msg_id() == ssc::kRegistryReadRequest) {
    sns_registry_read_req query;
    check(query.ParseFromString(request.request().payload()), "a registry read holds its message");
    const auto group = world_.registry.find(query.name());
    if (group == world_.registry.end()) {
      return sendEvent(registrySuid(), ssc::kErrorEvent, errorPayload(SNS_STD_ERROR_NOT_AVAILABLE));
    }
    sns_registry_read_event event;
    event.set_name(query.name());
    *event.mutable_data() = group->second;
    sendEvent(registrySuid(), ssc::kRegistryReadEvent, event.SerializeAsString());
  } else if (request.msg_id() == ssc::kRegistryWriteRequest) {
    sns_registry_write_req write;
    check(write.ParseFromString(request.request().payload()), "a registry write holds its message");
    ++world_.writes;
    world_.wroteFinite = world_.wroteFinite && isFinite(write.data());
    sns_registry_write_event event;
    event.set_status(SNS_REGISTRY_WRITE_STATUS_SUCCESS);
    sendEvent(registrySuid(), ssc::kRegistryWriteEvent, event.SerializeAsString());
  }
}

void FuzzedHub::answerSensor(std::size_t index, const sns_client_request_msg& request) {
  switch (request.msg_id()) {
    case ssc::kAttributesRequest: {
      sns_std_attr_event event;
      auto* name = event.add_attributes();
      name->set_attr_id(ssc::kAttributeName);
      name->mutable_value()->add_values()->set_str(world_.sensors[index].name);
      auto* streamType = event.add_attributes();
      streamType->set_attr_id(ssc::kAttributeStreamType);
      streamType->mutable_value()->add_values()->set_sint(SNS_STD_SENSOR_STREAM_TYPE_STREAMING);
      auto* hardwareId = event.add_attributes();
      hardwareId->set_attr_id(ssc::kAttributeHardwareId);
      hardwareId->mutable_value()->add_values()->set_sint(static_cast<std::int64_t>(index));
      return sendEvent(suidOf(index), ssc::kAttributesEvent, event.SerializeAsString());
    }
    case ssc::kStreamConfigRequest: {
      sns_std_sensor_config config;
      check(config.ParseFromString(request.request().payload()), "a stream's request holds its message");
      check(config.sample_rate() > 0, "a stream is asked for with a rate");
      const double rateHz = std::min<double>(static_cast<double>(config.sample_rate()), kLargestRateHz);
      const auto period = std::chrono::duration_cast<Duration>(std::chrono::duration<double>(1 / rateHz));
      streams_[index] = Stream{period, now_ + period};
      return;
    }
    case ssc::kDisableRequest:
      streams_.erase(index);
      return;
    case ssc::kCalibrationChangedRequest:
      return sendEvent(suidOf(index), ssc::kCalibrationChangedReply, "");
    default: {
      const auto& answers = world_.sensors[index].answers;
      const auto found = answers.find(request.msg_id());
      if (found != answers.end()) return sendEvent(suidOf(index), found->second.first, found->second.second);
      return sendEvent(suidOf(index), ssc::kErrorEvent, errorPayload(SNS_STD_ERROR_NOT_SUPPORTED));
    }
  }
}

void FuzzedHub::read(std::size_t index) {
  const HubWorld::Sensor& sensor = world_.sensors[index];
  sendEvent(suidOf(index), sensor.readingId, readingOf(suidOf(index), sensor.reading));
}

std::string FuzzedHub::readingOf(const ssc::SensorUid& suid, const std::vector<float>& values) const {
  for (std::size_t i = 0; i < world_.sensors.size(); ++i) {
    if (suid == suidOf(i) && world_.sensors[i].encode) return world_.sensors[i].encode(values);
  }
  return readingPayload(values);
}

void FuzzedHub::sendEvent(const ssc::SensorUid& suid, std::uint32_t messageId, std::string payload) {
  int times = 1;
  Duration delay = kLatency;
  switch (takeOddity(&input_)) {
    case Oddity::kSilence:
      return;
    case Oddity::kErrorEvent:
      messageId = ssc::kErrorEvent;
      payload = errorPayload(input_.byte());
      break;
    case Oddity::kOtherPayload:
      payload = input_.text();
      break;
    case Oddity::kOtherId:
      messageId = static_cast<std::uint32_t>(input_.byte() << 8 | input_.byte());
      break;
    case Oddity::kTwice:
      times = 2;
      break;
    case Oddity::kDatagramOfRubbish:
      return schedule(delay, datagramOf(input_.text()));
    case Oddity::kReportOfRubbish:
      return sendReport(delay, input_.text());
    case Oddity::kFlippedByte:
      if (!payload.empty()) {
        payload[input_.byte() % payload.size()] ^= static_cast<char>(input_.byte());
      }
      break;
    case Oddity::kLate:
      delay = kLateness * input_.byte();
      break;
    case Oddity::kHubAway: {
      const std::uint8_t absence = input_.byte();
      return goAway(absence == kForGood ? Duration::max() : Duration(kLateness * absence));
    }
    case Oddity::kOtherValues: {
      std::vector<float> values(input_.byte() % 8);
      for (float& value : values) value = input_.anyFloat();
      payload = readingOf(suid, values);
      break;
    }
    case Oddity::kNone:
    case Oddity::kOddities:
      break;
  }
  sns_client_event_msg message;
  suid.CopyTo(message.mutable_suid());
  for (int i = 0; i < times; ++i) {
    auto* event = message.add_events();
    event->set_msg_id(messageId);
    const auto seconds = std::chrono::duration<double>(now_.time_since_epoch()).count();
    event->set_timestamp(static_cast<std::uint64_t>(seconds * ssc::kTicksPerSecond));
    event->set_payload(payload);
  }
  sendReport(delay, message.SerializeAsString());
}

void FuzzedHub::sendReport(Duration delay, const std::string& payload) {
  ssc::Incoming incoming;
  if (qmi::encodeReport(kClientId, asBytes(payload), &incoming.datagram))
    schedule(delay, std::move(incoming));
}

void FuzzedHub::schedule(Duration delay, ssc::Incoming incoming) {
  outgoing_.emplace(now_ + delay, std::move(incoming));
}

void FuzzedHub::goAway(Duration absence) {
  ssc::Incoming change;
  change.kind = ssc::Incoming::Kind::kDown;
  schedule(kLatency, change);
  if (absence == Duration::max()) return;
  change.kind = ssc::Incoming::Kind::kUp;
  schedule(kLatency + absence, change);
}

bool FuzzedHub::RunUntil(ssc::Clock::TimePoint limit, ssc::Incoming* incoming) {
  for (;;) {
    const auto stream = std::min_element(streams_.begin(), streams_.end(), [](const auto& a, const auto& b) {
      return a.second.next < b.second.next;
    });
    const bool reads =
        stream != streams_.end() && (outgoing_.empty() || stream->second.next < outgoing_.begin()->first);
    if (reads && stream->second.next <= limit) {
      now_ = std::max(now_, stream->second.next);
      stream->second.next += stream->second.period;
      read(stream->first);
      continue;
    }
    if (reads || outgoing_.empty() || outgoing_.begin()->first > limit) {
      if (limit != ssc::Clock::TimePoint::max()) now_ = std::max(now_, limit);
      return false;
    }
    now_ = std::max(now_, outgoing_.begin()->first);
    *incoming = std::move(outgoing_.begin()->second);
    outgoing_.erase(outgoing_.begin());
    if (incoming->kind != ssc::Incoming::Kind::kDatagram) {
      up_ = incoming->kind == ssc::Incoming::Kind::kUp;
      streams_.clear();
      if (!up_) {
        // What was on its way is lost; only the hub's return still comes.
        std::erase_if(outgoing_,
                      [](const auto& item) { return item.second.kind == ssc::Incoming::Kind::kDatagram; });
      }
    }
    return true;
  }
}

}  // namespace fuzz
