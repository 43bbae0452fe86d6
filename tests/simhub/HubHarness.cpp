#include "simhub/HubHarness.h"

#include <cstdio>
#include <utility>

HubHarness::HubHarness(const std::vector<std::string>& overrides, const std::string& scenarioName,
                       simhub::SensorMaker makeSensor)
    : makeSensor_(std::move(makeSensor)) {
  std::string error;
  EXPECT_TRUE(simhub::loadScenario(scenarioName, overrides, &scenario, &error)) << error;
  Restart();
}

void HubHarness::Restart() {
  std::string error;
  hub.reset();
  hub = simhub::Hub::Create(scenario, {folder.Path("registry"), folder.Path("te2_table")}, *this, &error,
                            makeSensor_);
  EXPECT_NE(hub, nullptr) << error;
  client = hub->AddClient();
}

void HubHarness::Deliver(simhub::ClientId to, qmi::Bytes datagram) {
  datagrams.emplace_back(datagram.begin(), datagram.end());
  if (const auto response = qmi::decodeResponse(datagram)) {
    responses.push_back({to, hub->Now(), *response});
    return;
  }
  const auto report = qmi::decodeReport(datagram);
  ASSERT_TRUE(report.has_value());
  EXPECT_EQ(report->clientId, to);
  sns_client_event_msg message;
  ASSERT_TRUE(message.ParseFromArray(report->payload.data(), static_cast<int>(report->payload.size())));
  ++reports_;
  for (const auto& event : message.events()) {
    events.push_back({to, hub->Now(), simhub::suidOf(message.suid()), event.msg_id(), event.timestamp(),
                      event.payload(), reports_});
  }
}

std::vector<std::uint8_t> requestDatagram(std::uint16_t transaction, const simhub::Suid& suid,
                                          std::uint32_t messageId, const std::string& payload,
                                          std::uint32_t batchMicroseconds) {
  sns_client_request_msg message;
  suid.CopyTo(message.mutable_suid());
  message.set_msg_id(messageId);
  message.mutable_susp_config()->set_client_proc_type(SNS_STD_CLIENT_PROCESSOR_APSS);
  message.mutable_susp_config()->set_delivery_type(SNS_CLIENT_DELIVERY_WAKEUP);
  sns_std_request* const request = message.mutable_request();
  if (!payload.empty()) request->set_payload(payload);
  if (batchMicroseconds != 0) request->mutable_batching()->set_batch_period(batchMicroseconds);
  const std::string bytes = message.SerializeAsString();
  std::vector<std::uint8_t> datagram;
  EXPECT_TRUE(qmi::encodeRequest(
      transaction, {reinterpret_cast<const std::uint8_t*>(bytes.data()), bytes.size()}, &datagram));
  return datagram;
}

bool HubHarness::SendAs(simhub::ClientId from, const simhub::Suid& suid, std::uint32_t messageId,
                        const std::string& payload, std::uint32_t batchMicroseconds) {
  return hub->HandleDatagram(from,
                             requestDatagram(++transaction, suid, messageId, payload, batchMicroseconds));
}

bool HubHarness::Send(const simhub::Suid& suid, std::uint32_t messageId, const std::string& payload,
                      std::uint32_t batchMicroseconds) {
  return SendAs(client, suid, messageId, payload, batchMicroseconds);
}

std::optional<SeenEvent> HubHarness::Ask(const simhub::Suid& suid, std::uint32_t messageId,
                                         const std::string& payload) {
  const std::size_t before = events.size();
  EXPECT_TRUE(Send(suid, messageId, payload));
  const simhub::Time deadline = hub->Now() + simhub::fromSeconds(10);
  while (hub->NextEventTime() && *hub->NextEventTime() <= deadline) {
    hub->Step();
    for (std::size_t i = before; i < events.size(); ++i) {
      if (events[i].suid == suid && events[i].messageId != simhub::kSensorEvent) return events[i];
    }
  }
  return std::nullopt;
}

void HubHarness::Configure(const simhub::Suid& suid, float rate, std::uint32_t batchMicroseconds) {
  EXPECT_TRUE(Send(suid, simhub::kStreamConfigRequest, ratePayload(rate), batchMicroseconds));
}

std::vector<simhub::Suid> HubHarness::LookUp(const std::string& dataType) {
  sns_suid_req request;
  request.set_data_type(dataType);
  const auto event = Ask(simhub::kLookupSuid, simhub::kSuidRequest, request.SerializeAsString());
  sns_suid_event answer;
  EXPECT_TRUE(event && event->messageId == simhub::kSuidEvent && answer.ParseFromString(event->payload));
  EXPECT_EQ(answer.data_type(), dataType);
  std::vector<simhub::Suid> suids;
  for (const sns_std_suid& suid : answer.suid()) suids.push_back(simhub::suidOf(suid));
  return suids;
}

simhub::Suid HubHarness::Find(const std::string& dataType) {
  const std::vector<simhub::Suid> suids = LookUp(dataType);
  EXPECT_FALSE(suids.empty()) << dataType;
  return suids.empty() ? simhub::Suid{} : suids.front();
}

std::optional<sns_registry_data> HubHarness::ReadRegistry(const std::string& group) {
  sns_registry_read_req request;
  request.set_name(group);
  const auto event = Ask(Find("registry"), simhub::kRegistryReadRequest, request.SerializeAsString());
  if (!event || event->messageId != simhub::kRegistryReadEvent) return std::nullopt;
  sns_registry_read_event answer;
  EXPECT_TRUE(answer.ParseFromString(event->payload));
  EXPECT_EQ(answer.name(), group);
  return answer.data();
}

std::optional<int> HubHarness::WriteRegistry(const std::string& group, const sns_registry_data& items) {
  sns_registry_write_req request;
  request.set_name(group);
  *request.mutable_data() = items;
  const auto event = Ask(Find("registry"), simhub::kRegistryWriteRequest, request.SerializeAsString());
  if (!event || event->messageId != simhub::kRegistryWriteEvent) return std::nullopt;
  sns_registry_write_event answer;
  EXPECT_TRUE(answer.ParseFromString(event->payload));
  return static_cast<int>(answer.status());
}

std::vector<SeenEvent> HubHarness::EventsOf(const simhub::Suid& suid, std::uint32_t messageId) const {
  std::vector<SeenEvent> found;
  for (const SeenEvent& event : events) {
    if (event.suid == suid && event.messageId == messageId) found.push_back(event);
  }
  return found;
}

std::vector<sns_std_sensor_event> HubHarness::Readings(const simhub::Suid& suid) const {
  std::vector<sns_std_sensor_event> readings;
  for (const SeenEvent& event : EventsOf(suid, simhub::kSensorEvent)) {
    sns_std_sensor_event reading;
    if (reading.ParseFromString(event.payload)) readings.push_back(reading);
  }
  return readings;
}

double HubHarness::MeanReading(const simhub::Suid& suid) const {
  double sum = 0;
  const auto readings = Readings(suid);
  for (const auto& reading : readings) sum += static_cast<double>(reading.data(0));
  return sum / static_cast<double>(readings.size());
}

sns_registry_data_item* addFloat(sns_registry_data* data, const std::string& name, float value) {
  sns_registry_data_item* const item = data->add_items();
  item->set_name(name);
  item->set_flt(value);
  return item;
}

sns_registry_data_item* addGroup(sns_registry_data* data, const std::string& name) {
  sns_registry_data_item* const item = data->add_items();
  item->set_name(name);
  item->mutable_subgrp();
  return item;
}

std::string ratePayload(float rate) {
  sns_std_sensor_config config;
  config.set_sample_rate(rate);
  return config.SerializeAsString();
}

std::string show(const sns_registry_data& data) {
  std::string text;
  for (const sns_registry_data_item& item : data.items()) {
    if (!text.empty()) text += ", ";
    text += item.name();
    if (item.has_version()) text += "#" + std::to_string(item.version());
    char number[48];
    std::snprintf(number, sizeof number, "=%.9g", static_cast<double>(item.flt()));
    switch (item.data_case()) {
      case sns_registry_data_item::kSubgrp:
        text += "={" + show(item.subgrp()) + "}";
        break;
      case sns_registry_data_item::kStr:
        text += "='" + item.str() + "'";
        break;
      case sns_registry_data_item::kFlt:
        text += number;
        break;
      case sns_registry_data_item::kSint:
        text += "=" + std::to_string(item.sint()) + "i";
        break;
      case sns_registry_data_item::DATA_NOT_SET:
        break;
    }
  }
  return text;
}
