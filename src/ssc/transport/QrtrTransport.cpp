#include "ssc/transport/QrtrTransport.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <utility>

#include "ssc/Results.h"

namespace ssc {
namespace {

std::vector<std::uint8_t> lookupPacket(std::uint32_t command) {
  return qmi::encodeQrtrControl({command, qmi::kHubServiceId, 0, {}});
}

bool contains(const std::vector<QrtrAddress>& addresses, const QrtrAddress& address) {
  return std::find(addresses.begin(), addresses.end(), address) != addresses.end();
}

std::string noService(const std::string& what) {
  return "QRTR's name service " + what + " service " + std::to_string(qmi::kHubServiceId);
}

}  // namespace

int QrtrTransport::Connect(std::unique_ptr<Transport>* transport, std::string* reason) {
  return ConnectOver(QrtrSocket::Open(), std::make_shared<RealClock>(), transport, reason);
}

int QrtrTransport::ConnectOver(std::unique_ptr<QrtrSocket> socket, std::shared_ptr<const Clock> clock,
                               std::unique_ptr<Transport>* transport, std::string* reason) {
  if (socket == nullptr) {
    *reason = "QRTR, which leads to service " + std::to_string(qmi::kHubServiceId) +
              ", cannot be used on this machine (" + std::strerror(errno) + ")";
    return kNoHub;
  }
  std::unique_ptr<QrtrTransport> made(new QrtrTransport(std::move(socket), std::move(clock)));
  if (!made->discover(reason)) return kNoHub;
  *transport = std::move(made);
  return kOk;
}

int QrtrTransport::askForServers() {
  {
    const std::lock_guard<std::mutex> guard(mutex_);
    listing_ = Listing{servers_, {}};
    listIsOld_ = false;
  }
  nextList_ = clock_->now() + kListPatience;
  const QrtrAddress nameService{socket_->LocalNode(), QRTR_PORT_CTRL};
  // A look-up that is still armed beside the new one would announce every server twice.
  if (std::exchange(asked_, true)) {
    const int result = socket_->Send(nameService, lookupPacket(QRTR_TYPE_DEL_LOOKUP));
    if (result != 0) return result;
  }
  return socket_->Send(nameService, lookupPacket(QRTR_TYPE_NEW_LOOKUP));
}

bool QrtrTransport::discover(std::string* reason) {
  const auto deadline = clock_->now() + kDiscoveryTimeout;
  if (const int result = askForServers(); result != 0) {
    *reason = noService("cannot be asked for") + " (" + std::strerror(-result) + ")";
    return false;
  }
  QrtrAddress from;
  std::vector<std::uint8_t> packet;
  // A stranger can send as much as it likes: the time is up for all that.
  while (listing_ && socket_->Receive(deadline, &from, &packet) == QrtrSocket::Outcome::kPacket) {
    (void)takePacket(from, packet);
    if (clock_->now() > deadline) break;
  }
  changes_.clear();
  if (!servers_.empty()) return true;
  *reason = listing_ ? noService("did not say within " + std::to_string(kDiscoveryTimeout.count()) +
                                 " s whether there is a")
                     : noService("knows no");
  return false;
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
    bool listIsOld = false;
    {
      const std::lock_guard<std::mutex> guard(mutex_);
      if (!changes_.empty()) {
        incoming->kind = changes_.front();
        incoming->datagram.clear();
        changes_.pop_front();
        return Outcome::kIncoming;
      }
      listIsOld = listIsOld_;
    }
    // A request that fails is made again after the next silence.
    if (listIsOld) [[maybe_unused]]
      const int ignored = askForServers();
    switch (socket_->Receive(std::min(deadline, nextList_), &from, &incoming->datagram)) {
      case QrtrSocket::Outcome::kDeadline: {
        const auto now = clock_->now();
        if (now >= nextList_) [[maybe_unused]]
          const int ignored = askForServers();
        if (now >= deadline) return Outcome::kDeadline;
        break;
      }
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
        [[maybe_unused]] const int ignored = askForServers();
        break;
      }
      case QrtrSocket::Outcome::kPacket:
        if (!takePacket(from, incoming->datagram)) break;
        nextList_ = std::max(nextList_, clock_->now() + kSilence);
        incoming->kind = Incoming::Kind::kDatagram;
        return Outcome::kIncoming;
    }
  }
}

bool QrtrTransport::takePacket(const QrtrAddress& from, qmi::Bytes packet) {
  const std::lock_guard<std::mutex> guard(mutex_);
  // Nobody but the name service has the control port, here or on another node. Anybody may send to this
  // socket.
  if (from.port != QRTR_PORT_CTRL) return !servers_.empty() && servers_.front() == from;
  handleControl(packet);
  return false;
}

void QrtrTransport::handleControl(qmi::Bytes packet) {
  const auto control = qmi::decodeQrtrControl(packet);
  if (!control) return;
  const bool isHub = control->service == qmi::kHubServiceId;
  switch (control->command) {
    case QRTR_TYPE_NEW_SERVER:
      if (control->EndsList()) {
        listEnded();
      } else if (isHub) {
        serverAppeared(control->server);
      }
      break;
    case QRTR_TYPE_DEL_SERVER:
      if (isHub) forgetServers([&](const QrtrAddress& known) { return known == control->server; });
      break;
    case QRTR_TYPE_BYE:
      forgetServers([&](const QrtrAddress& known) { return known.node == control->client().node; });
      break;
    default:
      break;
  }
}

void QrtrTransport::serverAppeared(const QrtrAddress& address) {
  const bool isKnown = contains(servers_, address);
  // A list names what is known too. What was known before and is named twice was announced besides.
  const bool isNews =
      !listing_ || !isKnown || (contains(listing_->before, address) && contains(listing_->told, address));
  if (isNews) {
    // The same server again: it has restarted, and the notice that it went was lost.
    if (isKnown) forgetServers([&](const QrtrAddress& known) { return known == address; });
    servers_.push_back(address);
    // Perhaps the hub has returned elsewhere, and the notice that it went was lost.
    if (servers_.size() > 1 && !listing_) listIsOld_ = true;
    if (servers_.size() == 1) changes_.push_back(Incoming::Kind::kUp);
  }
  if (listing_) listing_->told.push_back(address);
}

void QrtrTransport::listEnded() {
  if (!listing_) return;
  const std::vector<QrtrAddress> told = std::move(listing_->told);
  listing_.reset();
  forgetServers([&](const QrtrAddress& known) { return !contains(told, known); });
  nextList_ = clock_->now() + kSilence;
}

template <class Predicate>
void QrtrTransport::forgetServers(Predicate forget) {
  if (listing_) std::erase_if(listing_->before, forget);
  if (listing_) std::erase_if(listing_->told, forget);
  if (servers_.empty()) return;
  const bool current = forget(servers_.front());
  std::erase_if(servers_, forget);
  if (!current) return;
  changes_.push_back(Incoming::Kind::kDown);
  if (!servers_.empty()) changes_.push_back(Incoming::Kind::kUp);
}

}  // namespace ssc
