#include "simhub/QrtrPort.h"

#include <cerrno>

#include <sys/ioctl.h>
#include <sys/socket.h>

#include "simhub/Descriptor.h"

namespace simhub {
namespace {

/// A full queue loses notices of clients that have gone for good.
constexpr int kReceiveBuffer = 4 * 1024 * 1024;

class KernelPort final : public QrtrPort {
 public:
  int Open() override {
    Descriptor socket(::socket(AF_QIPCRTR, SOCK_DGRAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0));
    if (!socket.IsOpen()) return -errno;
    // Beyond the limit for everybody, where the program may do that.
    if (::setsockopt(socket.get(), SOL_SOCKET, SO_RCVBUFFORCE, &kReceiveBuffer, sizeof kReceiveBuffer) != 0) {
      (void)::setsockopt(socket.get(), SOL_SOCKET, SO_RCVBUF, &kReceiveBuffer, sizeof kReceiveBuffer);
    }
    sockaddr_qrtr address{};
    socklen_t length = sizeof address;
    if (::getsockname(socket.get(), reinterpret_cast<sockaddr*>(&address), &length) != 0) return -errno;
    socket_ = std::move(socket);
    node_ = address.sq_node;
    // The name service fills in node and port by itself, and says nothing to it.
    const int result = Send(
        {node_, QRTR_PORT_CTRL},
        qmi::encodeQrtrControl({QRTR_TYPE_NEW_SERVER, qmi::kHubServiceId, qmi::kHubInstance, {node_, 0}}));
    if (result != 0) Close();
    return result;
  }

  void Close() override { socket_ = Descriptor(); }
  int descriptor() const override { return socket_.get(); }
  std::uint32_t LocalNode() const override { return node_; }

  int Send(const qmi::QrtrAddress& to, qmi::Bytes packet) override {
    const sockaddr_qrtr address = qmi::toSocketAddress(to);
    for (;;) {
      if (::sendto(socket_.get(), packet.data(), packet.size(), MSG_DONTWAIT,
                   reinterpret_cast<const sockaddr*>(&address), sizeof address) >= 0) {
        return 0;
      }
      if (errno != EINTR) return -errno;
    }
  }

  int Receive(qmi::QrtrAddress* from, std::vector<std::uint8_t>* packet) override {
    int size = 0;
    if (::ioctl(socket_.get(), FIONREAD, &size) != 0 || size < 0) size = 0;
    packet->resize(static_cast<std::size_t>(size));
    for (;;) {
      sockaddr_qrtr address{};
      socklen_t length = sizeof address;
      const ssize_t taken = ::recvfrom(socket_.get(), packet->data(), packet->size(), MSG_DONTWAIT,
                                       reinterpret_cast<sockaddr*>(&address), &length);
      if (taken < 0 && errno == EINTR) continue;
      if (taken < 0) return -errno;
      packet->resize(static_cast<std::size_t>(taken));
      *from = qmi::fromSocketAddress(address);
      return 0;
    }
  }

 private:
  Descriptor socket_;
  std::uint32_t node_ = 0;
};

}  // namespace

std::unique_ptr<QrtrPort> QrtrPort::OfThisMachine() { return std::make_unique<KernelPort>(); }

}  // namespace simhub
