// The simulated hub on the router of the handset's processors, where a handset's hub is: found through the
// name service, every address that sends to it a client.
#pragma once

#include <map>
#include <memory>
#include <string>
#include <vector>

#include "simhub/HubServer.h"
#include "simhub/QrtrPort.h"
#include "simhub/SendQueue.h"

namespace simhub {

class QrtrServer final : public HubServer {
 public:
  static constexpr std::size_t kMaxClients = 256;
  /// How often a client whose queue was full is tried again: nothing tells when there is room.
  static constexpr std::chrono::milliseconds kRetryInterval{2};

  /// Starts the hub and registers its service. Null with the reason in `error`.
  [[nodiscard]] static std::unique_ptr<QrtrServer> Create(const HubServerOptions& options,
                                                          std::unique_ptr<QrtrPort> port, Scenario scenario,
                                                          Diagnostics diagnostics, std::string* error);

  [[nodiscard]] std::size_t ClientCount() const { return clients_.size(); }

 private:
  struct Client {
    qmi::QrtrAddress address;
    SendQueue queue;
    bool isLost = false;  ///< to be taken from the hub after its step
  };

  QrtrServer(const HubServerOptions& options, std::unique_ptr<QrtrPort> port, Diagnostics diagnostics);
  void takeControl(qmi::Bytes packet);
  void takeDatagram(const qmi::QrtrAddress& from, qmi::Bytes datagram);
  [[nodiscard]] SendQueue::Sent send(const Client& client, qmi::Bytes datagram);
  void flush();
  void reopenPort();

  void addPolled(std::vector<pollfd>* polled) override;
  [[nodiscard]] std::chrono::nanoseconds patience() const override;
  void takeIncoming(std::span<const pollfd> polled) override;
  void dropLost() override;

  void Deliver(ClientId client, qmi::Bytes datagram) override;
  void HubDown() override;
  void HubUp() override;

  const std::unique_ptr<QrtrPort> port_;
  std::map<qmi::QrtrAddress, ClientId> ids_;
  std::map<ClientId, Client> clients_;
  std::vector<std::uint8_t> packet_;
};

}  // namespace simhub
