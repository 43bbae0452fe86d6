// The handset's hub: a service that the name service of the router family knows. Which server it is, and that
// it went away or came back, the name service tells through control packets to this socket.
#pragma once

#include <deque>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <vector>

#include "ssc/transport/QrtrSocket.h"
#include "ssc/transport/Transport.h"

namespace ssc {

class QrtrTransport final : public Transport {
 public:
  /// How long the name service's list of servers may take.
  static constexpr std::chrono::seconds kDiscoveryTimeout{1};
  /// After so long without a word from the hub the name service is asked for its list again: a notice that
  /// the hub went or came back is lost for good when this socket's queue was full.
  static constexpr std::chrono::seconds kSilence{1};
  /// An answer to that may take so long; then it was lost as well.
  static constexpr std::chrono::seconds kListPatience{3};

  /// Finds the hub. 0; kNoHub without QRTR or without the service, with a clause in `reason` that says which.
  /// `transport` is set on success only.
  [[nodiscard]] static int Connect(std::unique_ptr<Transport>* transport, std::string* reason);
  /// The same over a given socket; null counts as a machine without QRTR, for the reason in errno.
  [[nodiscard]] static int ConnectOver(std::unique_ptr<QrtrSocket> socket, std::shared_ptr<const Clock> clock,
                                       std::unique_ptr<Transport>* transport, std::string* reason);

  [[nodiscard]] int Send(qmi::Bytes datagram) override;
  [[nodiscard]] Outcome Receive(Clock::TimePoint deadline, Incoming* incoming) override;
  void Interrupt() override { socket_->Interrupt(); }

 private:
  /// A list that the name service is telling.
  struct Listing {
    std::vector<QrtrAddress> before;  ///< known when it was asked for, and not said to have gone since
    std::vector<QrtrAddress> told;
  };

  QrtrTransport(std::unique_ptr<QrtrSocket> socket, std::shared_ptr<const Clock> clock)
      : socket_(std::move(socket)), clock_(std::move(clock)) {}
  /// True: the hub was found. `reason` as in Connect.
  [[nodiscard]] bool discover(std::string* reason);
  /// Takes a packet in. Whether it is a datagram of the hub.
  [[nodiscard]] bool takePacket(const QrtrAddress& from, qmi::Bytes packet);
  void handleControl(qmi::Bytes packet);
  /// Asks the name service for the servers that are there and, from then on, for those that go and come. 0 or
  /// a negated errno.
  [[nodiscard]] int askForServers();
  void serverAppeared(const QrtrAddress& address);
  void listEnded();
  /// If the hub is among those forgotten, the next server takes its place.
  template <class Predicate>
  void forgetServers(Predicate forget);
  [[nodiscard]] std::optional<QrtrAddress> server() const;

  const std::unique_ptr<QrtrSocket> socket_;
  const std::shared_ptr<const Clock> clock_;
  Clock::TimePoint nextList_{};         ///< receiving thread: when the list is asked for again
  bool asked_ = false;                  ///< receiving thread: a look-up was armed
  mutable std::mutex mutex_;            ///< guards the following
  std::vector<QrtrAddress> servers_;    ///< of the service; the first is the hub, none: it is away
  std::deque<Incoming::Kind> changes_;  ///< that Receive has yet to tell
  std::optional<Listing> listing_;      ///< none: all that it told has been taken in
  bool listIsOld_ = false;              ///< a server came that should have replaced the hub
};

}  // namespace ssc
