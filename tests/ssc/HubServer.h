// A hub on a real SOCK_SEQPACKET socket in a folder of its own, served by one thread. It does what a test's
// script says, in real time and at once. Every wait has a deadline; nothing sleeps.
#pragma once

#include <array>
#include <atomic>
#include <chrono>
#include <condition_variable>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <thread>
#include <utility>
#include <vector>

#include <poll.h>
#include <sys/eventfd.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include "ssc/Wire.h"
#include "ssc/transport/Descriptor.h"

namespace ssctest {

/// Far longer than anything here takes: reaching it is a failure.
inline constexpr std::chrono::seconds kPatience{20};

/// A folder that is removed, with the socket in it, at the end.
class SocketFolder {
 public:
  SocketFolder() {
    std::string pattern = "/tmp/vantle-ssc-XXXXXX";
    if (::mkdtemp(pattern.data()) != nullptr) folder_ = pattern;
  }
  SocketFolder(const SocketFolder&) = delete;
  SocketFolder& operator=(const SocketFolder&) = delete;
  ~SocketFolder() {
    ::unlink(socketPath().c_str());
    ::rmdir(folder_.c_str());
  }
  [[nodiscard]] std::string socketPath() const { return folder_ + "/hub"; }

 private:
  std::string folder_;
};

class HubServer {
 public:
  explicit HubServer(Script script) : script_(std::move(script)) {
    Listen();
    thread_ = std::thread([this] { serve(); });
  }
  HubServer(const HubServer&) = delete;
  HubServer& operator=(const HubServer&) = delete;
  ~HubServer() {
    stopping_ = true;
    wake();
    thread_.join();
  }

  [[nodiscard]] std::string path() const { return folder_.socketPath(); }

  /// Hangs up on the client and, until Listen(), can be reached by none.
  void GoAway() {
    const std::lock_guard<std::mutex> guard(mutex_);
    ::unlink(path().c_str());
    hangUp();
  }
  /// Hangs up and takes the next client that connects.
  void HangUp() {
    const std::lock_guard<std::mutex> guard(mutex_);
    hangUp();
  }
  void Listen() {
    ssc::Descriptor listener(::socket(AF_UNIX, SOCK_SEQPACKET | SOCK_CLOEXEC | SOCK_NONBLOCK, 0));
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    std::memcpy(address.sun_path, path().c_str(), path().size());
    listening_ = ::bind(listener.get(), reinterpret_cast<const sockaddr*>(&address), sizeof address) == 0 &&
                 ::listen(listener.get(), 8) == 0;
    const std::lock_guard<std::mutex> guard(mutex_);
    nextListener_ = std::move(listener);
    wake();
  }
  [[nodiscard]] bool listening() const { return listening_; }

  /// Waits until `count` clients have connected since the start. False when patience ran out.
  [[nodiscard]] bool WaitForConnections(int count) {
    return wait([&] { return connections_ >= count; });
  }
  /// Waits until a client is connected and `count` packets have come in since the start.
  [[nodiscard]] bool WaitForPackets(std::size_t count) {
    return wait([&] { return packets_.size() >= count; });
  }
  [[nodiscard]] std::vector<Datagram> packets() const {
    const std::lock_guard<std::mutex> guard(mutex_);
    return packets_;
  }

  /// Sends to the client as it is; false when it could not be sent whole.
  bool Send(const Datagram& bytes) {
    const std::lock_guard<std::mutex> guard(mutex_);
    return client_.valid() && ::send(client_.get(), bytes.data(), bytes.size(), MSG_NOSIGNAL) ==
                                  static_cast<ssize_t>(bytes.size());
  }

 private:
  template <class Predicate>
  bool wait(Predicate predicate) {
    std::unique_lock<std::mutex> lock(mutex_);
    return changed_.wait_for(lock, kPatience, predicate);
  }

  /// The serving thread, which may be polling the socket, is the one that closes it.
  void hangUp() {
    if (client_.valid()) ::shutdown(client_.get(), SHUT_RDWR);
  }

  void wake() {
    const std::uint64_t one = 1;
    [[maybe_unused]] const auto written = ::write(wake_.get(), &one, sizeof one);
  }

  void serve() {
    while (!stopping_) {
      std::array<pollfd, 3> polled{};
      {
        const std::lock_guard<std::mutex> guard(mutex_);
        polled = {{{wake_.get(), POLLIN, 0},
                   {client_.valid() ? -1 : listener_.get(), POLLIN, 0},
                   {client_.get(), POLLIN, 0}}};
      }
      ::poll(polled.data(), polled.size(), -1);
      std::uint64_t count = 0;
      [[maybe_unused]] const auto got = ::read(wake_.get(), &count, sizeof count);
      const std::lock_guard<std::mutex> guard(mutex_);
      if (nextListener_.valid()) listener_ = std::move(nextListener_);
      acceptClient();
      readPackets();
      changed_.notify_all();
    }
  }

  void acceptClient() {
    if (client_.valid() || !listener_.valid()) return;
    ssc::Descriptor accepted(::accept4(listener_.get(), nullptr, nullptr, SOCK_CLOEXEC));
    if (!accepted.valid()) return;
    client_ = std::move(accepted);
    ++connections_;
  }

  void readPackets() {
    Datagram buffer(1 << 17);
    while (client_.valid()) {
      const ssize_t length = ::recv(client_.get(), buffer.data(), buffer.size(), MSG_DONTWAIT);
      if (length < 0) return;
      if (length == 0) {
        client_.reset();
        return;
      }
      packets_.emplace_back(buffer.begin(), buffer.begin() + length);
      answer(packets_.back());
    }
  }

  void answer(const Datagram& packet) {
    const auto decoded = qmi::decodeRequest(packet);
    if (!decoded) return;
    Request request{decoded->transactionId, decoded->reportType, {}};
    if (!request.message.ParseFromArray(decoded->payload.data(), static_cast<int>(decoded->payload.size())))
      return;
    for (const Outgoing& outgoing : script_(request)) {
      if (outgoing.kind == ssc::Incoming::Kind::kDown) {
        hangUp();
        return;
      }
      ::send(client_.get(), outgoing.bytes.data(), outgoing.bytes.size(), MSG_NOSIGNAL);
    }
  }

  const Script script_;
  const SocketFolder folder_;
  const ssc::Descriptor wake_{::eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK)};
  std::atomic<bool> stopping_{false};
  std::atomic<bool> listening_{false};

  mutable std::mutex mutex_;  ///< guards the following
  std::condition_variable changed_;
  ssc::Descriptor listener_;
  ssc::Descriptor nextListener_;  ///< to replace it
  ssc::Descriptor client_;
  int connections_ = 0;
  std::vector<Datagram> packets_;

  std::thread thread_;
};

}  // namespace ssctest
