// The simulated hub behind a Unix-domain SOCK_SEQPACKET socket, in real time or a multiple of it: one packet
// is one datagram, every connection is a client. One thread does everything, in rounds.
#pragma once

#include <chrono>
#include <cstdint>
#include <deque>
#include <map>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include <sys/types.h>

#include "simhub/Diagnostics.h"
#include "simhub/Hub.h"

namespace simhub {

struct SocketServerOptions {
  std::string path;  ///< of the socket
  HubFiles files;
  double speed = 1;  ///< hub seconds per real second, > 0
};

class SocketServer final : public HubOutput {
 public:
  /// How much may wait for a client that does not read; more, and it is disconnected.
  static constexpr std::size_t kMaxQueuedBytes = std::size_t{4} << 20;
  static constexpr std::size_t kMaxClients = 256;

  /// Starts the hub and listens. A socket file that nobody listens at is replaced. Null with the reason in
  /// `error`.
  [[nodiscard]] static std::unique_ptr<SocketServer> Create(const SocketServerOptions& options,
                                                            Scenario scenario, Diagnostics diagnostics,
                                                            std::string* error);
  /// Disconnects everybody and removes the socket file.
  ~SocketServer() override;

  /// Runs until `stop` can be read. 0 or the errno value that ended it.
  [[nodiscard]] int Run(int stop);
  /// One round: takes what came in, moves the hub's time on, and waits for more, at most so long. 0 or an
  /// errno value. `stop` as in Run, or negative; `*stopped` is set when it can be read.
  [[nodiscard]] int Round(std::chrono::nanoseconds maxWait, int stop, bool* stopped);

  [[nodiscard]] std::size_t ClientCount() const { return clients_.size(); }

 private:
  using Clock = std::chrono::steady_clock;

  /// An open descriptor.
  class Descriptor {
   public:
    explicit Descriptor(int fd = -1) : fd_(fd) {}
    Descriptor(Descriptor&& other) noexcept : fd_(std::exchange(other.fd_, -1)) {}
    Descriptor& operator=(Descriptor&& other) noexcept {
      std::swap(fd_, other.fd_);
      return *this;
    }
    ~Descriptor();
    [[nodiscard]] int get() const { return fd_; }
    [[nodiscard]] bool IsOpen() const { return fd_ >= 0; }

   private:
    int fd_;
  };

  struct Connection {
    Descriptor socket;
    std::deque<std::vector<std::uint8_t>> queue;
    std::size_t queuedBytes = 0;
    bool isLost = false;  ///< to be disconnected after the hub's step
  };

  SocketServer(const SocketServerOptions& options, Diagnostics diagnostics);
  [[nodiscard]] bool listen(std::string* error);
  void stopListening();
  void acceptClients();
  void receive(ClientId client, Connection& connection);
  void flush(Connection& connection);
  void advance();
  void dropLost();
  [[nodiscard]] Time hubTime() const;
  [[nodiscard]] std::chrono::nanoseconds untilNextEvent() const;

  void Deliver(ClientId client, qmi::Bytes datagram) override;
  void HubDown() override;
  void HubUp() override;
  void Diagnostic(const std::string& text) override { diagnostics_(text); }

  const SocketServerOptions options_;
  const Diagnostics diagnostics_;
  std::unique_ptr<Hub> hub_;
  Clock::time_point start_;
  Descriptor listener_;
  dev_t device_ = 0;  ///< of the socket file that is ours
  ino_t inode_ = 0;
  Clock::time_point acceptAgain_{};  ///< no descriptors were left; try again then
  std::map<ClientId, Connection> clients_;
  std::vector<std::uint8_t> buffer_;
};

}  // namespace simhub
