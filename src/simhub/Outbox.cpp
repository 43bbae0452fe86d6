#include "simhub/Outbox.h"

namespace simhub {

Outbox::Letter& Outbox::post(ClientId client, Time time) {
  if (freeSlots_.empty()) {
    freeSlots_.push_back(static_cast<std::uint32_t>(letters_.size()));
    letters_.emplace_back();
  }
  const std::uint32_t slot = freeSlots_.back();
  freeSlots_.pop_back();
  queue_.Push(time, HubEvent::Kind::kMail, slot);
  letters_[slot].client = client;
  return letters_[slot];
}

void Outbox::Respond(ClientId client, std::uint16_t transactionId, std::uint16_t result, std::uint16_t error,
                     Time time) {
  qmi::Response response;
  response.transactionId = transactionId;
  response.result = result;
  response.error = error;
  response.clientId = client;
  qmi::encodeResponse(response, &post(client, time).datagram);
}

bool Outbox::Answer(ClientId client, const Suid& suid, std::uint32_t messageId, const std::string& payload,
                    Time time) {
  if (payload.size() > kMaxEventBytes) return false;
  sns_client_event_msg report;
  suid.CopyTo(report.mutable_suid());
  sns_client_event_msg::sns_client_event* const event = report.add_events();
  event->set_msg_id(messageId);
  event->set_timestamp(Ticks(time));
  event->set_payload(payload);
  encode(client, report, &post(client, time).datagram);
  return true;
}

void Outbox::encode(ClientId client, const sns_client_event_msg& report,
                    std::vector<std::uint8_t>* datagram) {
  payload_.resize(report.ByteSizeLong());
  (void)report.SerializeWithCachedSizesToArray(payload_.data());
  // Never too large: who makes reports stays below kMaxEventBytes.
  (void)qmi::encodeReport(client, payload_, datagram);
}

void Outbox::Send(ClientId client, const sns_client_event_msg& report) {
  encode(client, report, &datagram_);
  ++statistics_.datagrams;
  output_.Deliver(client, datagram_);
}

void Outbox::Deliver(std::uint32_t slot) {
  Letter& letter = letters_[slot];
  freeSlots_.push_back(slot);
  if (!HasClient(letter.client)) return;
  ++statistics_.datagrams;
  output_.Deliver(letter.client, letter.datagram);
}

void Outbox::Clear() {
  freeSlots_.clear();
  for (std::uint32_t slot = 0; slot < letters_.size(); ++slot) freeSlots_.push_back(slot);
}

}  // namespace simhub
