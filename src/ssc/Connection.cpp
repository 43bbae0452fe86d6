#include "ssc/Connection.h"

#include <algorithm>
#include <utility>

#include <google/protobuf/stubs/logging.h>

#include "ssc/Client.h"
#include "ssc/Log.h"
#include "ssc/Results.h"

namespace ssc {
namespace {

/// Used deliveries that are kept: more than ever wait in an ordinary run.
constexpr std::size_t kMaxSpare = 64;

qmi::Bytes asBytes(const std::string& text) {
  return {reinterpret_cast<const std::uint8_t*>(text.data()), text.size()};
}

/// Keeps protobuf from writing to standard error: whoever parses says himself what did not parse.
void silenceProtobuf() {
  [[maybe_unused]] static const auto previous = google::protobuf::SetLogHandler(nullptr);
}

}  // namespace

int Connection::Create(Connection** out, const EmbeddedHubFactory& embeddedHub) {
  HubLink link;
  const int result = openHubLink(embeddedHub, &link);
  if (result != kOk) return result;
  *out = Over(std::move(link)).release();
  return kOk;
}

std::unique_ptr<Connection> Connection::Over(HubLink link) {
  return std::unique_ptr<Connection>(new Connection(std::move(link)));
}

Connection::Connection(HubLink link)
    : clock_(std::move(link.clock)),
      transport_(std::move(link.transport)),
      changed_(*clock_, Condition::Resume::kAtOnce) {
  silenceProtobuf();
  eventThread_ = std::thread([this] { runEventThread(); });
}

Connection::~Connection() {
  {
    const Lock lock(mutex_);
    stopping_ = true;
    announceChange();
  }
  transport_->Interrupt();
  clock_->stopWaiting();
  eventThread_.join();
}

void Connection::RegisterClient(Client* client) {
  const Lock lock(mutex_);
  ClientState& state = clients_[client];
  if (state.registration == 0) state.registration = ++lastRegistration_;
}

void Connection::UnregisterClient(Client* client) {
  Lock lock(mutex_);
  const auto state = clients_.find(client);
  if (state != clients_.end()) state->second.registration = 0;
  if (std::this_thread::get_id() == eventThread_.get_id()) return;
  while (handling_ == client) waitForChange(lock, Clock::Duration::max());
}

void Connection::RemoveClient(Client* client) {
  UnregisterClient(client);
  const Lock lock(mutex_);
  clients_.erase(client);
}

int Connection::SendRequest(Client* client, const std::string& request, Response* response) {
  sns_client_request_msg message;
  if (!message.ParseFromString(request)) return kInvalid;
  Lock lock(mutex_);
  if (!up_) return kNotConnected;
  const std::uint16_t transaction = nextTransaction();
  std::vector<std::uint8_t> datagram;
  if (!qmi::encodeRequest(transaction, asBytes(request), &datagram)) return kInvalid;
  clients_[client].sensors.insert(SensorUid(message.suid()));
  PendingRequest pending;
  pending_[transaction] = &pending;

  lock.unlock();
  int result = transport_->Send(datagram);
  lock.lock();
  if (result == kOk) result = awaitResponse(lock, pending);
  pending_.erase(transaction);
  clock_->hubAsked();
  if (response != nullptr) *response = pending.response;
  return result;
}

std::uint64_t Connection::malformedCount() const {
  const Lock lock(mutex_);
  return malformed_;
}

std::uint16_t Connection::nextTransaction() {
  do {
    ++lastTransaction_;
  } while (lastTransaction_ == 0 || pending_.count(lastTransaction_) != 0);
  return lastTransaction_;
}

int Connection::awaitResponse(Lock& lock, const PendingRequest& pending) {
  const auto deadline = saturatingAdd(clock_->now(), Clock::Duration(kResponseTimeout));
  Incoming incoming;
  while (!pending.done) {
    const auto left = deadline - clock_->now();
    if (left <= Clock::Duration::zero()) return kTimedOut;
    if (reading_) {
      waitForChange(lock, left);
    } else {
      readOne(lock, deadline, &incoming);
    }
  }
  return pending.result;
}

void Connection::waitForChange(Lock& lock, Clock::Duration timeout) {
  ++waiting_;
  clock_->wait(changed_, lock, timeout);
  --waiting_;
}

void Connection::announceChange() {
  if (waiting_ > 0) changed_.notify_all();
}

void Connection::runEventThread() {
  Incoming incoming;
  for (;;) {
    clock_->awaitIdle();
    Lock lock(mutex_);
    if (stopping_) return;
    if (!queue_.empty()) {
      deliverNext(lock);
    } else if (reading_) {
      waitForChange(lock, Clock::Duration::max());
    } else if (readOne(lock, clock_->horizon(), &incoming) == Transport::Outcome::kDeadline) {
      lock.unlock();
      clock_->horizonReached();
    }
  }
}

Transport::Outcome Connection::readOne(Lock& lock, Clock::TimePoint deadline, Incoming* incoming) {
  reading_ = true;
  lock.unlock();
  const Transport::Outcome outcome = transport_->Receive(deadline, incoming);
  lock.lock();
  reading_ = false;
  if (outcome == Transport::Outcome::kIncoming) sortIncoming(*incoming);
  announceChange();
  return outcome;
}

void Connection::sortIncoming(const Incoming& incoming) {
  if (incoming.kind != Incoming::Kind::kDatagram) {
    connectionChanged(incoming.kind);
  } else if (const auto report = qmi::decodeReport(incoming.datagram)) {
    sortReport(*report);
  } else if (const auto response = qmi::decodeResponse(incoming.datagram)) {
    sortResponse(*response);
  } else {
    dropMalformed("datagram");
  }
}

void Connection::sortResponse(const qmi::Response& response) {
  const auto pending = pending_.find(response.transactionId);
  if (pending == pending_.end()) return;  // it came too late: its request has timed out
  PendingRequest& request = *pending->second;
  if (request.done) return;
  request.response = {response.result, response.error, response.clientId, response.response};
  request.result = response.result == 0 ? kOk : kIoError;
  request.done = true;
}

void Connection::sortReport(const qmi::Report& report) {
  auto delivery = takeSpare();
  if (!delivery->event.ParseFromArray(report.payload.data(), static_cast<int>(report.payload.size()))) {
    dropMalformed("report");
  } else {
    const SensorUid sensor(delivery->event.suid());
    for (const auto& [client, state] : clients_) {
      if (state.registration != 0 && state.sensors.count(sensor) != 0) {
        delivery->recipients.push_back({client, state.registration});
      }
    }
    sortByRegistration(&delivery->recipients);
  }
  if (delivery->recipients.empty()) {
    spare_.push_back(std::move(delivery));
  } else {
    queue_.push_back(std::move(delivery));
  }
}

void Connection::sortByRegistration(std::vector<Recipient>* recipients) {
  std::sort(recipients->begin(), recipients->end(), [](const Recipient& left, const Recipient& right) {
    return left.registration < right.registration;
  });
}

void Connection::dropMalformed(const char* what) {
  ++malformed_;
  log(kLogWarn, "Dropped a malformed %s from the hub (%llu so far)", what,
      static_cast<unsigned long long>(malformed_));
}

void Connection::connectionChanged(Incoming::Kind kind) {
  const bool up = kind == Incoming::Kind::kUp;
  if (up == up_) return;
  up_ = up;
  if (!up) {
    for (auto& [transaction, request] : pending_) {
      if (request->done) continue;  // answered, though its sender has not got to see it yet
      request->result = kNotConnected;
      request->done = true;
    }
  }
  auto delivery = takeSpare();
  delivery->kind = kind;
  for (const auto& [client, state] : clients_) {
    if (state.registration != 0) delivery->recipients.push_back({client, state.registration});
  }
  sortByRegistration(&delivery->recipients);
  queue_.push_back(std::move(delivery));
}

std::unique_ptr<Connection::Delivery> Connection::takeSpare() {
  if (spare_.empty()) return std::make_unique<Delivery>();
  auto delivery = std::move(spare_.back());
  spare_.pop_back();
  delivery->kind = Incoming::Kind::kDatagram;
  delivery->recipients.clear();
  return delivery;
}

bool Connection::stillRegistered(const Recipient& recipient) const {
  const auto state = clients_.find(recipient.client);
  return state != clients_.end() && state->second.registration == recipient.registration;
}

void Connection::deliverNext(Lock& lock) {
  auto delivery = std::move(queue_.front());
  queue_.pop_front();
  for (const Recipient& recipient : delivery->recipients) {
    if (!stillRegistered(recipient)) continue;
    handling_ = recipient.client;
    lock.unlock();
    switch (delivery->kind) {
      case Incoming::Kind::kDatagram:
        recipient.client->OnEvent(delivery->event);
        break;
      case Incoming::Kind::kDown:
        recipient.client->OnDisconnect();
        break;
      case Incoming::Kind::kUp:
        recipient.client->OnReconnect();
        break;
    }
    lock.lock();
    handling_ = nullptr;
    announceChange();
  }
  if (spare_.size() < kMaxSpare) spare_.push_back(std::move(delivery));
}

}  // namespace ssc
