#include "simhub/QrtrServer.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <utility>

namespace simhub {
namespace {

constexpr int kMaxPacketsPerRound = 256;  // so that the hub's time moves on however much comes in

}  // namespace

QrtrServer::QrtrServer(const HubServerOptions& options, std::unique_ptr<QrtrPort> port,
                       Diagnostics diagnostics)
    : HubServer(options.speed, std::move(diagnostics)), port_(std::move(port)) {}

std::unique_ptr<QrtrServer> QrtrServer::Create(const HubServerOptions& options,
                                               std::unique_ptr<QrtrPort> port, Scenario scenario,
                                               Diagnostics diagnostics, std::string* error) {
  std::unique_ptr<QrtrServer> server(new QrtrServer(options, std::move(port), std::move(diagnostics)));
  // The hub first: whoever hears of the service may use it at once.
  if (!server->startHub(std::move(scenario), options.files, error)) return nullptr;
  if (const int result = server->port_->Open(); result != 0) {
    *error = std::string("QRTR cannot be used on this machine: ") + std::strerror(-result);
    return nullptr;
  }
  return server;
}

// ---- Clients ----

void QrtrServer::takeControl(qmi::Bytes packet) {
  const auto control = qmi::decodeQrtrControl(packet);
  if (!control) return;
  const qmi::QrtrAddress gone = control->client();
  for (auto& [id, client] : clients_) {
    // Every socket's end is told, also of those that never sent anything here.
    if (control->command == QRTR_TYPE_DEL_CLIENT && client.address == gone) client.isLost = true;
    if (control->command == QRTR_TYPE_BYE && client.address.node == gone.node) client.isLost = true;
  }
}

void QrtrServer::takeDatagram(const qmi::QrtrAddress& from, qmi::Bytes datagram) {
  auto id = ids_.find(from);
  if (id == ids_.end()) {
    if (clients_.size() >= kMaxClients) {
      tell("more than " + std::to_string(kMaxClients) + " clients: one is not listened to");
      return;
    }
    id = ids_.emplace(from, hub().AddClient()).first;
    clients_[id->second].address = from;
  }
  (void)hub().HandleDatagram(id->second, datagram);
}

void QrtrServer::dropLost() {
  for (auto entry = clients_.begin(); entry != clients_.end();) {
    if (entry->second.isLost) {
      hub().RemoveClient(entry->first);
      ids_.erase(entry->second.address);
      entry = clients_.erase(entry);
    } else {
      ++entry;
    }
  }
}

// ---- The hub's output ----

SendQueue::Sent QrtrServer::send(const Client& client, qmi::Bytes datagram) {
  switch (-port_->Send(client.address, datagram)) {
    case 0:
      return SendQueue::Sent::kNow;
    case ENOSPC:
    case ENOBUFS:
    case ENOMEM:
    case EAGAIN:
      return SendQueue::Sent::kLater;
    case EMSGSIZE:
      tell("a report of " + std::to_string(datagram.size()) + " bytes is too large for QRTR");
      return SendQueue::Sent::kNow;
    default:
      return SendQueue::Sent::kGone;
  }
}

void QrtrServer::Deliver(ClientId id, qmi::Bytes datagram) {
  const auto entry = clients_.find(id);
  if (entry == clients_.end() || entry->second.isLost) return;
  Client& client = entry->second;
  const auto outcome =
      client.queue.Add(datagram, [this, &client](qmi::Bytes bytes) { return send(client, bytes); });
  if (outcome == SendQueue::Outcome::kOverflow) {
    tell("client " + std::to_string(id) + " does not read: its streams end");
  }
  client.isLost = outcome != SendQueue::Outcome::kKept;
}

void QrtrServer::flush() {
  for (auto& entry : clients_) {
    auto& client = entry.second;  // clang 14 captures no structured binding
    if (!client.queue.Flush([this, &client](qmi::Bytes bytes) { return send(client, bytes); })) {
      client.isLost = true;
    }
  }
}

void QrtrServer::HubDown() {
  // As when a hub's processor stops: its port is gone, and nobody is known when it is back.
  port_->Close();
  for (auto& [id, client] : clients_) client.isLost = true;
}

void QrtrServer::HubUp() {
  if (const int result = port_->Open(); result != 0) {
    tell(std::string("the hub is back but cannot be reached: ") + std::strerror(-result));
  }
}

// ---- A round ----

void QrtrServer::addPolled(std::vector<pollfd>* polled) {
  polled->push_back({port_->descriptor(), POLLIN, 0});
}

std::chrono::nanoseconds QrtrServer::patience() const {
  const bool someWait = std::any_of(clients_.begin(), clients_.end(),
                                    [](const auto& entry) { return !entry.second.queue.IsEmpty(); });
  return someWait ? std::chrono::nanoseconds(kRetryInterval) : std::chrono::nanoseconds::max();
}

void QrtrServer::takeIncoming(std::span<const pollfd> polled) {
  flush();
  if (polled[0].revents == 0 || port_->descriptor() < 0) return;
  qmi::QrtrAddress from;
  for (int i = 0; i < kMaxPacketsPerRound; ++i) {
    const int result = port_->Receive(&from, &packet_);
    if (result == -EAGAIN) return;
    if (result != 0) {
      reopenPort();
      return;
    }
    if (from.port == QRTR_PORT_CTRL) {
      takeControl(packet_);
      dropLost();  // the port may be another client's with the next packet
    } else if (from.node == port_->LocalNode()) {
      // Sending to other processors can block for ever, and the simulated hub is for programs of this one.
      takeDatagram(from, packet_);
    }
  }
}

void QrtrServer::reopenPort() {
  // The name service has restarted and knows nobody any more.
  HubDown();
  dropLost();
  HubUp();
}

}  // namespace simhub
