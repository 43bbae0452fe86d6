#include "support/ScriptedHub.h"

#include <algorithm>
#include <array>
#include <utility>

#include "proto/sns_suid.pb.h"
#include "ssc/AttrUtil.h"
#include "ssc/MessageIds.h"
#include "ssc/Results.h"

namespace {

constexpr std::uint64_t kClientId = 1;
constexpr double kTicksPerNanosecond = 0.0192;

qmi::Bytes asBytes(const std::string& text) {
  return {reinterpret_cast<const std::uint8_t*>(text.data()), text.size()};
}

std::uint64_t ticks(ssc::Clock::TimePoint time) {
  return static_cast<std::uint64_t>(
      static_cast<double>(time.time_since_epoch().count()) * kTicksPerNanosecond + 0.5);
}

sns_std_attr_value::sns_std_attr_value_data* addAttribute(sns_std_attr_event* event, ssc::AttributeId id) {
  sns_std_attr* attribute = event->add_attributes();
  attribute->set_attr_id(id);
  return attribute->mutable_value()->add_values();
}

}  // namespace

std::vector<std::uint32_t> HubScript::requestIdsTo(const ssc::SensorUid& suid) const {
  std::vector<std::uint32_t> ids;
  for (const sns_client_request_msg& request : requests) {
    if (ssc::SensorUid(request.suid()) == suid) ids.push_back(request.msg_id());
  }
  return ids;
}

int HubScript::countRequests(const ssc::SensorUid& suid, std::uint32_t messageId) const {
  const std::vector<std::uint32_t> ids = requestIdsTo(suid);
  return static_cast<int>(std::count(ids.begin(), ids.end(), messageId));
}

void ScriptedHub::schedule(Duration delay, ssc::Incoming incoming) {
  outgoing_.emplace(now_ + delay, std::move(incoming));
}

void ScriptedHub::SendMessage(Duration delay, const sns_client_event_msg& message) {
  ssc::Incoming incoming;
  // A script may send what is incomplete on purpose.
  const std::string payload = message.SerializePartialAsString();
  if (qmi::encodeReport(kClientId, asBytes(payload), &incoming.datagram))
    schedule(delay, std::move(incoming));
}

void ScriptedHub::SendEvent(Duration delay, const ssc::SensorUid& suid, std::uint32_t messageId,
                            const std::string& payload) {
  sns_client_event_msg message;
  suid.CopyTo(message.mutable_suid());
  auto* event = message.add_events();
  event->set_msg_id(messageId);
  event->set_timestamp(ticks(now_ + delay));
  event->set_payload(payload);
  SendMessage(delay, message);
}

void ScriptedHub::SendReading(Duration delay, const ssc::SensorUid& suid, const std::vector<float>& values) {
  SendEvent(delay, suid, ssc::kSensorEvent, encodeReading(values));
}

void ScriptedHub::GoAwayAndReturn(Duration delay, Duration absence) {
  ssc::Incoming down;
  down.kind = ssc::Incoming::Kind::kDown;
  schedule(delay, std::move(down));
  ssc::Incoming up;
  up.kind = ssc::Incoming::Kind::kUp;
  schedule(delay + absence, std::move(up));
}

int ScriptedHub::Submit(qmi::Bytes datagram) {
  if (!up_) return ssc::kNotConnected;
  const auto frame = qmi::decodeRequest(datagram);
  sns_client_request_msg request;
  if (!frame || !request.ParseFromArray(frame->payload.data(), static_cast<int>(frame->payload.size()))) {
    return ssc::kInvalid;
  }
  script_->requests.push_back(request);
  const bool refused = script_->refuses && script_->refuses(request);
  respond(frame->transactionId, refused);
  if (refused || (script_->onRequest && script_->onRequest(*this, request))) return ssc::kOk;
  answer(request);
  return ssc::kOk;
}

void ScriptedHub::respond(std::uint16_t transaction, bool refused) {
  ssc::Incoming incoming;
  qmi::Response response;
  response.transactionId = transaction;
  response.result = refused ? 1 : 0;
  qmi::encodeResponse(response, &incoming.datagram);
  schedule(Duration::zero(), std::move(incoming));
}

void ScriptedHub::answer(const sns_client_request_msg& request) {
  const ssc::SensorUid suid(request.suid());
  if (suid == ssc::kSuidLookupSensor) {
    answerLookup(request);
  } else if (suid == HubScript::registrySuid()) {
    answerRegistry(request);
  } else {
    for (const ScriptedSensor& sensor : script_->sensors) {
      if (sensor.suid == suid) answerSensor(sensor, request);
    }
  }
}

void ScriptedHub::answerLookup(const sns_client_request_msg& request) {
  sns_suid_req query;
  query.ParseFromString(request.request().payload());
  sns_suid_event found;
  found.set_data_type(query.data_type());
  if (query.data_type() == ssc::kRegistryDataType) HubScript::registrySuid().CopyTo(found.add_suid());
  for (const ScriptedSensor& sensor : script_->sensors) {
    if (sensor.dataType == query.data_type()) sensor.suid.CopyTo(found.add_suid());
  }
  SendEvent(Duration::zero(), ssc::kSuidLookupSensor, ssc::kSuidEvent, found.SerializeAsString());
}

void ScriptedHub::answerRegistry(const sns_client_request_msg& request) {
  const ssc::SensorUid suid = HubScript::registrySuid();
  if (request.msg_id() == ssc::kRegistryReadRequest) {
    sns_registry_read_req query;
    query.ParseFromString(request.request().payload());
    const auto group = script_->registry.find(query.name());
    if (group == script_->registry.end()) {
      sns_std_error_event error;
      error.set_error(SNS_STD_ERROR_INVALID_VALUE);
      SendEvent(Duration::zero(), suid, ssc::kErrorEvent, error.SerializeAsString());
      return;
    }
    sns_registry_read_event event;
    event.set_name(query.name());
    *event.mutable_data() = group->second;
    SendEvent(Duration::zero(), suid, ssc::kRegistryReadEvent, event.SerializeAsString());
  } else if (request.msg_id() == ssc::kRegistryWriteRequest) {
    sns_registry_write_req write;
    write.ParseFromString(request.request().payload());
    sns_registry_write_event event;
    event.set_status(script_->registryWritesFail ? SNS_REGISTRY_WRITE_STATUS_FAILED
                                                 : SNS_REGISTRY_WRITE_STATUS_SUCCESS);
    // Whole groups are written here, so replacing is merging.
    if (!script_->registryWritesFail) script_->registry[write.name()] = write.data();
    SendEvent(Duration::zero(), suid, ssc::kRegistryWriteEvent, event.SerializeAsString());
  }
}

void ScriptedHub::answerSensor(const ScriptedSensor& sensor, const sns_client_request_msg& request) {
  switch (request.msg_id()) {
    case ssc::kAttributesRequest: {
      sns_std_attr_event event;
      if (sensor.name) addAttribute(&event, ssc::kAttributeName)->set_str(*sensor.name);
      if (sensor.streamType) addAttribute(&event, ssc::kAttributeStreamType)->set_sint(*sensor.streamType);
      SendEvent(Duration::zero(), sensor.suid, ssc::kAttributesEvent, event.SerializeAsString());
      break;
    }
    case ssc::kStreamConfigRequest:
      startStream(sensor, request);
      break;
    case ssc::kDisableRequest:
      streams_.erase(sensor.suid);
      break;
    case ssc::kCalibrationChangedRequest:
      if (sensor.confirms) SendEvent(Duration::zero(), sensor.suid, ssc::kCalibrationChangedReply, "");
      break;
    default:
      break;
  }
}

void ScriptedHub::startStream(const ScriptedSensor& sensor, const sns_client_request_msg& request) {
  sns_std_sensor_config config;
  config.ParseFromString(request.request().payload());
  if (!sensor.reading || !(config.sample_rate() > 0)) return;
  const auto period = std::chrono::duration_cast<Duration>(
      std::chrono::duration<double>(1.0 / static_cast<double>(config.sample_rate())));
  streams_[sensor.suid] = Stream{&sensor, period, now_ + period};
}

void ScriptedHub::queueStreamEvent(Stream* stream) {
  SendEvent(stream->next - now_, stream->sensor->suid, ssc::kSensorEvent,
            encodeReading(stream->sensor->reading(stream->index++), stream->sensor->status));
  stream->next += stream->period;
}

bool ScriptedHub::RunUntil(TimePoint limit, ssc::Incoming* incoming) {
  Stream* first = nullptr;
  for (auto& entry : streams_) {
    if (first == nullptr || entry.second.next < first->next) first = &entry.second;
  }
  if (first != nullptr && first->next <= limit &&
      (outgoing_.empty() || first->next < outgoing_.begin()->first)) {
    queueStreamEvent(first);
  }
  if (outgoing_.empty() || outgoing_.begin()->first > limit) {
    if (limit != TimePoint::max()) now_ = limit;
    return false;
  }
  const auto next = outgoing_.begin();
  now_ = std::max(now_, next->first);
  *incoming = std::move(next->second);
  outgoing_.erase(next);
  if (incoming->kind == ssc::Incoming::Kind::kDown) {
    up_ = false;
    streams_.clear();
  } else if (incoming->kind == ssc::Incoming::Kind::kUp) {
    up_ = true;
  }
  return true;
}

std::string encodeReading(const std::vector<float>& values, sns_std_sensor_sample_status status) {
  sns_std_sensor_event event;
  for (const float value : values) event.add_data(value);
  event.set_status(status);
  return event.SerializeAsString();
}

std::unique_ptr<ssc::Connection> connectTo(const std::shared_ptr<HubScript>& script) {
  return ssc::Connection::Over(ssc::makeEmbeddedLink(std::make_unique<ScriptedHub>(script)));
}

void addFloatItem(sns_registry_data* data, const std::string& name, float value, std::optional<int> version) {
  sns_registry_data_item* item = data->add_items();
  item->set_name(name);
  if (version) item->set_version(*version);
  item->set_flt(value);
}

void addVectorItem(sns_registry_data* data, const std::string& name, const std::vector<float>& values,
                   std::optional<int> version) {
  static constexpr std::array<const char*, 3> kNames{"x", "y", "z"};
  sns_registry_data_item* item = data->add_items();
  item->set_name(name);
  if (version) item->set_version(*version);
  for (std::size_t i = 0; i < std::min(values.size(), kNames.size()); ++i) {
    addFloatItem(item->mutable_subgrp(), kNames[i], values[i], version);
  }
}
