#include "ssc/transport/QrtrSocket.h"

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <thread>
#include <utility>

#include <sys/ioctl.h>
#include <sys/socket.h>

#include "ssc/transport/CallLimit.h"
#include "ssc/transport/Descriptor.h"

namespace ssc {
namespace {

/// A full queue loses packets for good, the one that says that the hub went away among them.
constexpr int kReceiveBuffer = 4 * 1024 * 1024;

constexpr std::chrono::milliseconds kFullQueuePause{2};

/// Between one failure to receive and the next.
constexpr std::chrono::milliseconds kFailurePause{100};

class KernelSocket final : public QrtrSocket {
 public:
  KernelSocket(Descriptor socket, std::uint32_t node) : socket_(std::move(socket)), node_(node) {}

  /// False: there is no descriptor left, with the reason in errno.
  [[nodiscard]] bool works() const { return interrupt_.works(); }

  [[nodiscard]] std::uint32_t LocalNode() const override { return node_; }

  [[nodiscard]] int Send(const QrtrAddress& to, qmi::Bytes packet) override {
    const sockaddr_qrtr address = qmi::toSocketAddress(to);
    return sendWithin(kSendLimit, socket_.get(), &address, sizeof address, packet);
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
      *from = qmi::fromSocketAddress(address);
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

int sendWithin(std::chrono::milliseconds limit, int fd, const void* address, std::uint32_t addressSize,
               qmi::Bytes packet) {
  const CallLimit guard(limit);
  if (!guard.works()) return -EAGAIN;
  for (;;) {
    // The router family refuses every flag but MSG_DONTWAIT, and waits for other processors in spite of it.
    const auto* to = static_cast<const sockaddr*>(address);
    if (::sendto(fd, packet.data(), packet.size(), 0, to, addressSize) >= 0) return 0;
    const int error = errno;
    if (error != EINTR && error != ENOSPC) return -error;
    if (guard.passed()) return -ETIMEDOUT;
    // On this machine a receiver whose queue is full refuses instead of making the sender wait.
    if (error == ENOSPC) std::this_thread::sleep_for(kFullQueuePause);
  }
}

std::unique_ptr<QrtrSocket> QrtrSocket::Open() {
  Descriptor socket(::socket(AF_QIPCRTR, SOCK_DGRAM | SOCK_CLOEXEC, 0));
  if (!socket.valid()) return nullptr;
  // Beyond the limit for everybody, where the program may do that.
  if (::setsockopt(socket.get(), SOL_SOCKET, SO_RCVBUFFORCE, &kReceiveBuffer, sizeof kReceiveBuffer) != 0) {
    ::setsockopt(socket.get(), SOL_SOCKET, SO_RCVBUF, &kReceiveBuffer, sizeof kReceiveBuffer);
  }
  sockaddr_qrtr address{};
  socklen_t length = sizeof address;
  if (::getsockname(socket.get(), reinterpret_cast<sockaddr*>(&address), &length) != 0) return nullptr;
  auto made = std::make_unique<KernelSocket>(std::move(socket), address.sq_node);
  if (!made->works()) return nullptr;
  return made;
}

}  // namespace ssc
