#include "ssc/transport/QrtrSocket.h"

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <utility>

#include <linux/qrtr.h>
#include <sys/ioctl.h>
#include <sys/socket.h>

#include "ssc/transport/Descriptor.h"

namespace ssc {
namespace {

/// A full queue loses packets for good, the one that says that the hub went away among them.
constexpr int kReceiveBuffer = 4 * 1024 * 1024;

/// Between one failure to receive and the next.
constexpr std::chrono::milliseconds kFailurePause{100};

sockaddr_qrtr socketAddress(const QrtrAddress& address) {
  sockaddr_qrtr result{};
  result.sq_family = AF_QIPCRTR;
  result.sq_node = address.node;
  result.sq_port = address.port;
  return result;
}

class KernelSocket final : public QrtrSocket {
 public:
  KernelSocket(Descriptor socket, std::uint32_t node) : socket_(std::move(socket)), node_(node) {}

  [[nodiscard]] std::uint32_t LocalNode() const override { return node_; }

  [[nodiscard]] int Send(const QrtrAddress& to, qmi::Bytes packet) override {
    const sockaddr_qrtr address = socketAddress(to);
    for (;;) {
      // The family refuses every flag but MSG_DONTWAIT.
      if (::sendto(socket_.get(), packet.data(), packet.size(), MSG_DONTWAIT,
                   reinterpret_cast<const sockaddr*>(&address), sizeof address) >= 0) {
        return 0;
      }
      if (errno != EINTR) return -errno;
    }
  }

  [[nodiscard]] Outcome Receive(Clock::TimePoint deadline, QrtrAddress* from,
                                std::vector<std::uint8_t>* packet) override {
    for (;;) {
      switch (interrupt_.WaitReadable(socket_.get(), deadline)) {
        case Interrupter::Woken::kDeadline:
          return Outcome::kDeadline;
        case Interrupter::Woken::kInterrupted:
          return Outcome::kInterrupted;
        case Interrupter::Woken::kReady:
          break;
      }
      int size = 0;
      if (::ioctl(socket_.get(), FIONREAD, &size) != 0 || size < 0) size = 0;
      packet->resize(static_cast<std::size_t>(size));
      sockaddr_qrtr address{};
      iovec vector{packet->data(), packet->size()};
      msghdr message{};
      message.msg_name = &address;
      message.msg_namelen = sizeof address;
      message.msg_iov = &vector;
      message.msg_iovlen = 1;
      const ssize_t length = ::recvmsg(socket_.get(), &message, MSG_DONTWAIT);
      if (length < 0 && (errno == EAGAIN || errno == EINTR)) continue;
      if (length < 0) return failed(deadline);
      failedBefore_ = false;
      if ((message.msg_flags & MSG_TRUNC) != 0) continue;
      packet->resize(static_cast<std::size_t>(length));
      *from = {address.sq_node, address.sq_port};
      return Outcome::kPacket;
    }
  }

  void Interrupt() override { interrupt_.Signal(); }

 private:
  /// A socket that goes on failing must neither keep a processor busy nor the caller beyond its deadline.
  [[nodiscard]] Outcome failed(Clock::TimePoint deadline) {
    if (!std::exchange(failedBefore_, true)) return Outcome::kFailed;
    const auto pause = saturatingAdd(RealClock().now(), Clock::Duration(kFailurePause));
    switch (interrupt_.WaitReadable(-1, std::min(deadline, pause))) {
      case Interrupter::Woken::kInterrupted:
        return Outcome::kInterrupted;
      default:
        return RealClock().now() >= deadline ? Outcome::kDeadline : Outcome::kFailed;
    }
  }

  Descriptor socket_;
  bool failedBefore_ = false;
  std::uint32_t node_;
  Interrupter interrupt_;
};

}  // namespace

std::unique_ptr<QrtrSocket> QrtrSocket::Open() {
  Descriptor socket(::socket(AF_QIPCRTR, SOCK_DGRAM | SOCK_CLOEXEC, 0));
  if (!socket.valid()) return nullptr;
  ::setsockopt(socket.get(), SOL_SOCKET, SO_RCVBUF, &kReceiveBuffer, sizeof kReceiveBuffer);
  sockaddr_qrtr address{};
  socklen_t length = sizeof address;
  if (::getsockname(socket.get(), reinterpret_cast<sockaddr*>(&address), &length) != 0) return nullptr;
  return std::make_unique<KernelSocket>(std::move(socket), address.sq_node);
}

}  // namespace ssc
