#include "ssc/transport/UnixTransport.h"

#include <algorithm>
#include <cerrno>
#include <cstring>

#include <poll.h>
#include <sys/un.h>

#include "ssc/Results.h"

namespace ssc {
namespace {

/// False when the path does not fit.
bool fillAddress(const std::string& path, sockaddr_un* address) {
  *address = {};
  address->sun_family = AF_UNIX;
  if (path.empty() || path.size() >= sizeof address->sun_path || path.find('\0') != std::string::npos)
    return false;
  std::memcpy(address->sun_path, path.data(), path.size());
  return true;
}

}  // namespace

int UnixTransport::Connect(const std::string& path, std::unique_ptr<Transport>* transport) {
  sockaddr_un address{};
  if (!fillAddress(path, &address)) return kInvalid;
  Descriptor socket = connectTo(path);
  if (!socket.valid()) return kNoHub;
  std::unique_ptr<UnixTransport> made(new UnixTransport(path, std::move(socket)));
  if (!made->interrupt_.works()) return kNoHub;
  *transport = std::move(made);
  return kOk;
}

UnixTransport::UnixTransport(std::string path, Descriptor socket)
    : path_(std::move(path)),
      socket_(std::move(socket)),
      buffers_(new Buffers) {}  // uninitialised on purpose: 1 MiB

Descriptor UnixTransport::connectTo(const std::string& path) {
  sockaddr_un address{};
  if (!fillAddress(path, &address)) return {};
  Descriptor socket(::socket(AF_UNIX, SOCK_SEQPACKET | SOCK_CLOEXEC, 0));
  if (!socket.valid()) return {};
  // Connecting to a local listener blocks only when its backlog is full; a bound keeps even that short.
  const timeval bound{1, 0};
  ::setsockopt(socket.get(), SOL_SOCKET, SO_SNDTIMEO, &bound, sizeof bound);
  int result = 0;
  do {
    result = ::connect(socket.get(), reinterpret_cast<const sockaddr*>(&address), sizeof address);
  } while (result != 0 && errno == EINTR);
  if (result != 0) return {};
  return socket;
}

int UnixTransport::Send(qmi::Bytes datagram) {
  const std::lock_guard<std::mutex> guard(mutex_);
  if (!socket_.valid()) return kNotConnected;
  for (;;) {
    if (::send(socket_.get(), datagram.data(), datagram.size(), MSG_NOSIGNAL) >= 0) return kOk;
    switch (errno) {
      case EINTR:
        continue;
      case EPIPE:
      case ECONNRESET:
      case ENOTCONN:
        return kNotConnected;  // the receiving side sees the end too
      case EAGAIN:
        return kTimedOut;  // the hub does not take requests off its socket
      default:
        return -errno;
    }
  }
}

bool UnixTransport::hungUp() const {
  pollfd polled{socket_.get(), POLLRDHUP, 0};
  return ::poll(&polled, 1, 0) > 0;
}

bool UnixTransport::takeDatagram(Incoming* incoming) {
  if (batchNext_ == batchSize_) {
    if (drained_) return false;
    std::array<mmsghdr, kBatch> messages{};
    std::array<iovec, kBatch> vectors{};
    for (std::size_t i = 0; i < kBatch; ++i) {
      vectors[i] = {(*buffers_)[i].data(), (*buffers_)[i].size()};
      messages[i].msg_hdr.msg_iov = &vectors[i];
      messages[i].msg_hdr.msg_iovlen = 1;
    }
    batchNext_ = batchSize_ = 0;
    const int count = ::recvmmsg(socket_.get(), messages.data(), kBatch, MSG_DONTWAIT, nullptr);
    if (count < 0) {
      // A hub that went away with requests unread resets the connection; what it sent before is still there.
      lost_ = errno != EAGAIN && errno != EINTR && errno != ECONNRESET;
      drained_ = errno == EAGAIN;
      return false;
    }
    batchSize_ = static_cast<std::size_t>(count);
    drained_ = batchSize_ < kBatch;  // what has come since, the next wait tells at once
    // From the end of the connection on every message has no bytes, so that the batch is full of them. A
    // packet of no bytes, which is a malformed datagram, looks the same but for the hub being there.
    lost_ = batchSize_ == kBatch && messages.back().msg_len == 0 && hungUp();
    while (lost_ && batchSize_ > 0 && messages[batchSize_ - 1].msg_len == 0) --batchSize_;
    for (std::size_t i = 0; i < batchSize_; ++i) lengths_[i] = messages[i].msg_len;
    if (batchSize_ == 0) return false;
  }
  const std::uint8_t* bytes = (*buffers_)[batchNext_].data();
  incoming->kind = Incoming::Kind::kDatagram;
  incoming->datagram.assign(bytes, bytes + lengths_[batchNext_]);
  ++batchNext_;
  return true;
}

void UnixTransport::goDown() {
  const std::lock_guard<std::mutex> guard(mutex_);
  socket_.reset();
  lost_ = false;
  nextAttempt_ = clock_.now() + kReconnectInterval;
}

Transport::Outcome UnixTransport::Receive(Clock::TimePoint deadline, Incoming* incoming) {
  for (;;) {
    // Only this thread replaces the socket, so it may look at it without the lock.
    if (socket_.valid()) {
      if (takeDatagram(incoming)) return Outcome::kIncoming;
      if (lost_) {
        goDown();
        incoming->kind = Incoming::Kind::kDown;
        incoming->datagram.clear();
        return Outcome::kIncoming;
      }
    } else if (clock_.now() >= nextAttempt_) {
      Descriptor socket = connectTo(path_);
      if (socket.valid()) {
        const std::lock_guard<std::mutex> guard(mutex_);
        socket_ = std::move(socket);
        drained_ = false;
        incoming->kind = Incoming::Kind::kUp;
        incoming->datagram.clear();
        return Outcome::kIncoming;
      }
      nextAttempt_ = clock_.now() + kReconnectInterval;
    }
    const bool connected = socket_.valid();
    const auto until = connected ? deadline : std::min(deadline, nextAttempt_);
    switch (interrupt_.WaitReadable(connected ? socket_.get() : -1, until)) {
      case Interrupter::Woken::kInterrupted:
        return Outcome::kInterrupted;
      case Interrupter::Woken::kDeadline:
        if (clock_.now() >= deadline) return Outcome::kDeadline;
        break;
      case Interrupter::Woken::kReady:
        drained_ = false;
        break;
    }
  }
}

}  // namespace ssc
