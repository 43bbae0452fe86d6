// The handset's hub: a service that the name service of the router family knows. Which server it is, and that
// it went away or came back, the name service tells through control packets to this socket.
#pragma once

#include <deque>
#include <memory>
#include <mutex>
#include <optional>
#include <vector>

#include "ssc/transport/QrtrSocket.h"
#include "ssc/transport/Transport.h"

namespace ssc {

class QrtrTransport final : public Transport {
 public:
  /// How long the name service's list of servers may take.
  static constexpr std::chrono::seconds kDiscoveryTimeout{1};

  /// Finds the hub. 0; kNoHub without QRTR or without the service. `transport` is set on success only.
  [[nodiscard]] static int Connect(std::unique_ptr<Transport>* transport);
  /// The same over a given socket; null counts as a machine without QRTR.
  [[nodiscard]] static int ConnectOver(std::unique_ptr<QrtrSocket> socket, const Clock& clock,
                                       std::unique_ptr<Transport>* transport);

  [[nodiscard]] int Send(qmi::Bytes datagram) override;
  [[nodiscard]] Outcome Receive(Clock::TimePoint deadline, Incoming* incoming) override;
  void Interrupt() override { socket_->Interrupt(); }

 private:
  explicit QrtrTransport(std::unique_ptr<QrtrSocket> socket) : socket_(std::move(socket)) {}
  [[nodiscard]] bool discover(Clock::TimePoint deadline);
  void handleControl(qmi::Bytes packet);
  /// Asks the name service for the servers that are there and, from then on, for those that go and come.
  [[nodiscard]] int armLookup();
  [[nodiscard]] int rearmLookup();
  void serverAppeared(const QrtrAddress& address);
  /// If the hub is among those forgotten, the next server takes its place.
  template <class Predicate>
  void forgetServers(Predicate forget);
  [[nodiscard]] std::optional<QrtrAddress> server() const;

  const std::unique_ptr<QrtrSocket> socket_;
  mutable std::mutex mutex_;            ///< guards the following
  std::vector<QrtrAddress> servers_;    ///< of the service; the first is the hub, none: it is away
  std::deque<Incoming::Kind> changes_;  ///< that Receive has yet to tell
  bool listEnded_ = false;
};

}  // namespace ssc
