#include "ssc/transport/QrtrTransport.h"

#include <cerrno>
#include <cstring>

#include <endian.h>
#include <linux/qrtr.h>

#include "ssc/Results.h"

namespace ssc {
namespace {

std::vector<std::uint8_t> lookupPacket(std::uint32_t command) {
  qrtr_ctrl_pkt packet{};
  packet.cmd = htole32(command);
  packet.server.service = htole32(qmi::kHubServiceId);
  packet.server.instance = 0;  // any
  const auto* bytes = reinterpret_cast<const std::uint8_t*>(&packet);
  return {bytes, bytes + sizeof packet};
}

}  // namespace

int QrtrTransport::Connect(std::unique_ptr<Transport>* transport) {
  return ConnectOver(QrtrSocket::Open(), RealClock(), transport);
}

int QrtrTransport::ConnectOver(std::unique_ptr<QrtrSocket> socket, const Clock& clock,
                               std::unique_ptr<Transport>* transport) {
  if (socket == nullptr) return kNoHub;
  std::unique_ptr<QrtrTransport> made(new QrtrTransport(std::move(socket)));
  if (!made->discover(clock.now() + kDiscoveryTimeout)) return kNoHub;
  *transport = std::move(made);
  return kOk;
}

int QrtrTransport::armLookup() {
  return socket_->Send({socket_->LocalNode(), QRTR_PORT_CTRL}, lookupPacket(QRTR_TYPE_NEW_LOOKUP));
}

int QrtrTransport::rearmLookup() {
  // One that is still armed would announce every server twice.
  const int result =
      socket_->Send({socket_->LocalNode(), QRTR_PORT_CTRL}, lookupPacket(QRTR_TYPE_DEL_LOOKUP));
  return result != 0 ? result : armLookup();
}

bool QrtrTransport::discover(Clock::TimePoint deadline) {
  if (armLookup() != 0) return false;
  QrtrAddress from;
  std::vector<std::uint8_t> packet;
  while (!listEnded_) {
    if (socket_->Receive(deadline, &from, &packet) != QrtrSocket::Outcome::kPacket) break;
    if (from.port == QRTR_PORT_CTRL) handleControl(packet);
  }
  changes_.clear();
  return !servers_.empty();
}

std::optional<QrtrAddress> QrtrTransport::server() const {
  const std::lock_guard<std::mutex> guard(mutex_);
  if (servers_.empty()) return std::nullopt;
  return servers_.front();
}

int QrtrTransport::Send(qmi::Bytes datagram) {
  const auto to = server();
  if (!to) return kNotConnected;
  const int result = socket_->Send(*to, datagram);
  switch (-result) {
    case 0:
      return kOk;
    case ENODEV:
    case ECONNRESET:
    case EPIPE:
      // The port is dead although nothing said so: a notice that was lost.
      {
        const std::lock_guard<std::mutex> guard(mutex_);
        forgetServers([&](const QrtrAddress& address) { return address == *to; });
      }
      socket_->Interrupt();
      return kNotConnected;
    default:
      return result;
  }
}

Transport::Outcome QrtrTransport::Receive(Clock::TimePoint deadline, Incoming* incoming) {
  QrtrAddress from;
  for (;;) {
    {
      const std::lock_guard<std::mutex> guard(mutex_);
      if (!changes_.empty()) {
        incoming->kind = changes_.front();
        incoming->datagram.clear();
        changes_.pop_front();
        return Outcome::kIncoming;
      }
    }
    switch (socket_->Receive(deadline, &from, &incoming->datagram)) {
      case QrtrSocket::Outcome::kDeadline:
        return Outcome::kDeadline;
      case QrtrSocket::Outcome::kInterrupted: {
        const std::lock_guard<std::mutex> guard(mutex_);
        if (changes_.empty()) return Outcome::kInterrupted;
        break;
      }
      case QrtrSocket::Outcome::kFailed: {
        // The name service has restarted and forgotten who listens; what it knew may be true no longer.
        {
          const std::lock_guard<std::mutex> guard(mutex_);
          forgetServers([](const QrtrAddress&) { return true; });
        }
        [[maybe_unused]] const int ignored = rearmLookup();  // or else at the next failure
        break;
      }
      case QrtrSocket::Outcome::kPacket:
        if (from.port == QRTR_PORT_CTRL) {
          const std::lock_guard<std::mutex> guard(mutex_);
          handleControl(incoming->datagram);
        } else if (server() == from) {  // anybody may send to this socket
          incoming->kind = Incoming::Kind::kDatagram;
          return Outcome::kIncoming;
        }
        break;
    }
  }
}

void QrtrTransport::handleControl(qmi::Bytes bytes) {
  qrtr_ctrl_pkt packet{};
  if (bytes.size() < sizeof packet) return;
  std::memcpy(&packet, bytes.data(), sizeof packet);
  const QrtrAddress address{le32toh(packet.server.node), le32toh(packet.server.port)};
  const std::uint32_t service = le32toh(packet.server.service);
  switch (le32toh(packet.cmd)) {
    case QRTR_TYPE_NEW_SERVER:
      if (service == 0 && packet.server.instance == 0 && address == QrtrAddress{}) {
        listEnded_ = true;
      } else if (service == qmi::kHubServiceId) {
        serverAppeared(address);
      }
      break;
    case QRTR_TYPE_DEL_SERVER:
      if (service != qmi::kHubServiceId) break;
      forgetServers([&](const QrtrAddress& known) { return known == address; });
      break;
    case QRTR_TYPE_BYE:
      forgetServers([&](const QrtrAddress& known) { return known.node == le32toh(packet.client.node); });
      break;
    default:
      break;
  }
}

void QrtrTransport::serverAppeared(const QrtrAddress& address) {
  // The same server again: it has restarted, and the notice that it went was lost.
  forgetServers([&](const QrtrAddress& known) { return known == address; });
  servers_.push_back(address);
  if (servers_.size() == 1) changes_.push_back(Incoming::Kind::kUp);
}

template <class Predicate>
void QrtrTransport::forgetServers(Predicate forget) {
  if (servers_.empty()) return;
  const bool current = forget(servers_.front());
  std::erase_if(servers_, forget);
  if (!current) return;
  changes_.push_back(Incoming::Kind::kDown);
  if (!servers_.empty()) changes_.push_back(Incoming::Kind::kUp);
}

}  // namespace ssc
