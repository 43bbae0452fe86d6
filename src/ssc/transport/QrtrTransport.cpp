#include "ssc/transport/QrtrTransport.h"

#include <cerrno>
#include <cstring>

#include <endian.h>
#include <linux/qrtr.h>

#include "ssc/Results.h"

namespace ssc {
namespace {

std::vector<std::uint8_t> lookupPacket() {
  qrtr_ctrl_pkt packet{};
  packet.cmd = htole32(QRTR_TYPE_NEW_LOOKUP);
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

bool QrtrTransport::discover(Clock::TimePoint deadline) {
  // The look-up stays armed: the name service goes on telling of servers that go and come.
  if (socket_->Send({socket_->LocalNode(), QRTR_PORT_CTRL}, lookupPacket()) != 0) return false;
  QrtrAddress from;
  std::vector<std::uint8_t> packet;
  while (!listEnded_) {
    if (socket_->Receive(deadline, &from, &packet) != QrtrSocket::Outcome::kPacket) break;
    if (from.port == QRTR_PORT_CTRL) handleControl(packet);
  }
  changes_.clear();
  return server_.has_value();
}

std::optional<QrtrAddress> QrtrTransport::server() const {
  const std::lock_guard<std::mutex> guard(mutex_);
  return server_;
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
        if (server_ == to) serverGone();
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
        const std::lock_guard<std::mutex> guard(mutex_);
        if (!server_) return Outcome::kInterrupted;
        serverGone();
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
      if (service == qmi::kHubServiceId && server_ == address) serverGone();
      break;
    case QRTR_TYPE_BYE:
      if (server_ && server_->node == le32toh(packet.client.node)) serverGone();
      break;
    default:
      break;
  }
}

void QrtrTransport::serverAppeared(const QrtrAddress& address) {
  if (server_ && !(*server_ == address)) return;  // a second hub: the first that was found stays
  // The same server again: it has restarted, and the notice that it went was lost.
  if (server_) serverGone();
  server_ = address;
  changes_.push_back(Incoming::Kind::kUp);
}

void QrtrTransport::serverGone() {
  server_.reset();
  changes_.push_back(Incoming::Kind::kDown);
}

}  // namespace ssc
