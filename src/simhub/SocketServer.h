// The simulated hub behind a Unix-domain SOCK_SEQPACKET socket: one packet is one datagram, every connection
// is a client.
#pragma once

#include <cstdint>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include <sys/types.h>

#include "simhub/Descriptor.h"
#include "simhub/HubServer.h"
#include "simhub/SendQueue.h"

namespace simhub {

struct SocketServerOptions : HubServerOptions {
  std::string path;  ///< of the socket
};

class SocketServer final : public HubServer {
 public:
  static constexpr std::size_t kMaxClients = 256;

  /// Starts the hub and listens. A socket file that nobody listens at is replaced. Null with the reason in
  /// `error`.
  [[nodiscard]] static std::unique_ptr<SocketServer> Create(const SocketServerOptions& options,
                                                            Scenario scenario, Diagnostics diagnostics,
                                                            std::string* error);
  /// Disconnects everybody and removes the socket file.
  ~SocketServer() override;

  [[nodiscard]] std::size_t ClientCount() const { return clients_.size(); }

 private:
  struct Connection {
    Descriptor socket;
    SendQueue queue;
    bool isLost = false;  ///< to be disconnected after the hub's step
  };

  SocketServer(const SocketServerOptions& options, Diagnostics diagnostics);
  [[nodiscard]] bool mayAccept() const { return listener_.IsOpen() && Clock::now() >= acceptAgain_; }
  [[nodiscard]] bool listen(std::string* error);
  void stopListening();
  void acceptClients();
  void receive(ClientId client, Connection& connection);
  [[nodiscard]] static SendQueue::Sent send(const Descriptor& socket, qmi::Bytes datagram);
  void flush(Connection& connection);

  void addPolled(std::vector<pollfd>* polled) override;
  [[nodiscard]] std::chrono::nanoseconds patience() const override;
  void takeIncoming(std::span<const pollfd> polled) override;
  void dropLost() override;

  void Deliver(ClientId client, qmi::Bytes datagram) override;
  void HubDown() override;
  void HubUp() override;

  const std::string path_;
  Descriptor listener_;
  dev_t device_ = 0;  ///< of the socket file that is ours
  ino_t inode_ = 0;
  Clock::time_point acceptAgain_{};  ///< no descriptors were left; try again then
  std::map<ClientId, Connection> clients_;
  std::vector<ClientId> polledClients_;  ///< behind the listener, in the order in which they are polled
  std::vector<std::uint8_t> buffer_;
};

}  // namespace simhub
