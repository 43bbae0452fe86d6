// A hub in another process on this machine: a Unix-domain SOCK_SEQPACKET socket, one packet one QMI message.
#pragma once

#include <array>
#include <atomic>
#include <memory>
#include <mutex>
#include <string>

#include <sys/socket.h>

#include "ssc/transport/Descriptor.h"
#include "ssc/transport/Transport.h"

namespace ssc {

class UnixTransport final : public Transport {
 public:
  /// Connects to the hub that listens at `path`. 0; kNoHub when it cannot be reached, with the reason in
  /// errno; kInvalid when the path does not fit a socket address. `transport` is set on success only.
  [[nodiscard]] static int Connect(const std::string& path, std::unique_ptr<Transport>* transport);

  /// How often a hub that went away is looked for.
  static constexpr std::chrono::milliseconds kReconnectInterval{100};
  static constexpr std::size_t kMaxDatagram = 7 + 0xffff;

  [[nodiscard]] int Send(qmi::Bytes datagram) override;
  [[nodiscard]] Outcome Receive(Clock::TimePoint deadline, Incoming* incoming) override;
  void Interrupt() override { interrupt_.Signal(); }

 private:
  /// How many datagrams one system call may bring.
  static constexpr std::size_t kBatch = 16;

  UnixTransport(std::string path, Descriptor socket);
  [[nodiscard]] static Descriptor connectTo(const std::string& path);
  /// Moves the next datagram of the batch into `incoming`; reads a new batch when the last is used up. False:
  /// none now.
  [[nodiscard]] bool takeDatagram(Incoming* incoming);
  /// Whether the hub has ended the connection; packets of before may still be there.
  [[nodiscard]] bool hungUp() const;
  void goDown();

  const std::string path_;
  Interrupter interrupt_;
  std::mutex mutex_;   ///< guards replacing socket_; sends hold it
  Descriptor socket_;  ///< closed while the hub is away; replaced by the receiving thread only
  bool lost_ = false;  ///< receiving thread: the socket ended
  RealClock clock_;
  Clock::TimePoint nextAttempt_{};

  /// One byte more than a datagram may have: a longer packet, which is cut to this, is seen to be too long.
  using Buffers = std::array<std::array<std::uint8_t, kMaxDatagram + 1>, kBatch>;
  std::unique_ptr<Buffers> buffers_;
  std::array<std::size_t, kBatch> lengths_{};
  std::size_t batchSize_ = 0;
  std::size_t batchNext_ = 0;
  bool drained_ = false;  ///< the last system call left nothing behind: wait before the next
};

}  // namespace ssc
