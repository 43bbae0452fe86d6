#include "simhub/SocketServer.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <utility>

#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <unistd.h>

namespace simhub {
namespace {

constexpr std::size_t kMaxDatagram = 7 + 0xffff;
constexpr int kBacklog = 64;
constexpr int kMaxDatagramsPerRound = 64;  // of one client, so that none keeps the others waiting
constexpr std::chrono::milliseconds kAcceptPause{100};

bool makeAddress(const std::string& path, sockaddr_un* address, std::string* error) {
  *address = {};
  address->sun_family = AF_UNIX;
  if (path.empty() || path.size() >= sizeof address->sun_path || path.find('\0') != std::string::npos) {
    *error = path.empty() ? "the socket path is empty"
                          : path + ": the socket path is longer than " +
                                std::to_string(sizeof address->sun_path - 1) + " bytes";
    return false;
  }
  std::memcpy(address->sun_path, path.data(), path.size());
  return true;
}

const sockaddr* generic(const sockaddr_un& address) { return reinterpret_cast<const sockaddr*>(&address); }

/// Whether the client has ended the connection; packets of before may still be there.
bool hungUp(const Descriptor& socket) {
  pollfd polled{socket.get(), POLLRDHUP, 0};
  return ::poll(&polled, 1, 0) > 0;
}

int openSocket() { return ::socket(AF_UNIX, SOCK_SEQPACKET | SOCK_CLOEXEC | SOCK_NONBLOCK, 0); }

}  // namespace

SocketServer::SocketServer(const SocketServerOptions& options, Diagnostics diagnostics)
    : HubServer(options.speed, std::move(diagnostics)), path_(options.path), buffer_(kMaxDatagram + 1) {}

std::unique_ptr<SocketServer> SocketServer::Create(const SocketServerOptions& options, Scenario scenario,
                                                   Diagnostics diagnostics, std::string* error) {
  std::unique_ptr<SocketServer> server(new SocketServer(options, std::move(diagnostics)));
  if (!server->listen(error)) return nullptr;
  if (!server->startHub(std::move(scenario), options.files, error)) return nullptr;
  return server;
}

SocketServer::~SocketServer() { stopListening(); }

// ---- The socket ----

bool SocketServer::listen(std::string* error) {
  sockaddr_un address{};
  if (!makeAddress(path_, &address, error)) return false;
  struct stat status {};
  if (::lstat(path_.c_str(), &status) == 0) {
    if (!S_ISSOCK(status.st_mode)) {
      *error = path_ + ": is there already, and is no socket";
      return false;
    }
    const Descriptor probe(openSocket());
    // Only a refused connection shows that nobody listens; a full queue, say, is somebody's.
    if (::connect(probe.get(), generic(address), sizeof address) == 0 || errno != ECONNREFUSED) {
      *error = path_ + ": another hub listens there";
      return false;
    }
    (void)::unlink(path_.c_str());
  }
  Descriptor listener(openSocket());
  if (!listener.IsOpen() || ::bind(listener.get(), generic(address), sizeof address) != 0) {
    *error = path_ + ": " + std::strerror(errno);
    return false;
  }
  if (::stat(path_.c_str(), &status) == 0) {
    device_ = status.st_dev;
    inode_ = status.st_ino;
  }
  if (::listen(listener.get(), kBacklog) != 0) {
    *error = path_ + ": " + std::strerror(errno);
    return false;
  }
  listener_ = std::move(listener);
  return true;
}

void SocketServer::stopListening() {
  if (!listener_.IsOpen()) return;
  // Not the file of another hub that has taken the path over.
  struct stat status {};
  const bool isOurs =
      ::lstat(path_.c_str(), &status) == 0 && status.st_dev == device_ && status.st_ino == inode_;
  if (isOurs) (void)::unlink(path_.c_str());
  listener_ = Descriptor();
}

void SocketServer::acceptClients() {
  for (;;) {
    Descriptor socket(::accept4(listener_.get(), nullptr, nullptr, SOCK_CLOEXEC | SOCK_NONBLOCK));
    if (!socket.IsOpen()) {
      if (errno == EINTR || errno == ECONNABORTED) continue;
      if (errno == EMFILE || errno == ENFILE || errno == ENOBUFS || errno == ENOMEM) {
        tell(std::string("a client has to wait: ") + std::strerror(errno));
        acceptAgain_ = Clock::now() + kAcceptPause;
      }
      return;
    }
    if (clients_.size() >= kMaxClients) {
      tell("more than " + std::to_string(kMaxClients) + " clients: one is turned away");
      continue;
    }
    clients_[hub().AddClient()].socket = std::move(socket);
  }
}

void SocketServer::receive(ClientId client, Connection& connection) {
  for (int i = 0; i < kMaxDatagramsPerRound && !connection.isLost; ++i) {
    const ssize_t size = ::recv(connection.socket.get(), buffer_.data(), buffer_.size(), MSG_TRUNC);
    if (size < 0 && errno == EINTR) continue;
    if (size < 0 && (errno == EAGAIN || errno == EWOULDBLOCK)) return;
    // A packet of no bytes, which is a malformed datagram, looks like the end but for the client being there.
    if (size < 0 || (size == 0 && hungUp(connection.socket))) {
      connection.isLost = true;
      return;
    }
    // One that is too large comes cut, and is no well-formed message then.
    const std::size_t taken = std::min(static_cast<std::size_t>(size), buffer_.size());
    (void)hub().HandleDatagram(client, {buffer_.data(), taken});
  }
}

SendQueue::Sent SocketServer::send(const Descriptor& socket, qmi::Bytes datagram) {
  const ssize_t sent = ::send(socket.get(), datagram.data(), datagram.size(), MSG_NOSIGNAL);
  if (sent >= 0) return SendQueue::Sent::kNow;
  const bool isFull = errno == EAGAIN || errno == EWOULDBLOCK || errno == EINTR || errno == ENOBUFS;
  return isFull ? SendQueue::Sent::kLater : SendQueue::Sent::kGone;
}

void SocketServer::Deliver(ClientId client, qmi::Bytes datagram) {
  const auto entry = clients_.find(client);
  if (entry == clients_.end() || entry->second.isLost) return;
  Connection& connection = entry->second;
  const auto outcome = connection.queue.Add(
      datagram, [&connection](qmi::Bytes bytes) { return send(connection.socket, bytes); });
  if (outcome == SendQueue::Outcome::kOverflow) {
    tell("client " + std::to_string(client) + " does not read: it is disconnected");
  }
  connection.isLost = outcome != SendQueue::Outcome::kKept;
}

void SocketServer::flush(Connection& connection) {
  if (!connection.queue.Flush([&connection](qmi::Bytes bytes) { return send(connection.socket, bytes); })) {
    connection.isLost = true;
  }
}

void SocketServer::dropLost() {
  for (auto entry = clients_.begin(); entry != clients_.end();) {
    if (entry->second.isLost) {
      hub().RemoveClient(entry->first);
      entry = clients_.erase(entry);
    } else {
      ++entry;
    }
  }
}

// ---- The hub ----

void SocketServer::HubDown() {
  // As when a hub's process ends: nobody is connected, and nobody can be.
  stopListening();
  for (auto& [client, connection] : clients_) connection.isLost = true;
}

void SocketServer::HubUp() {
  std::string error;
  if (!listen(&error)) tell("the hub is back but cannot be reached: " + error);
}

// ---- A round ----

std::chrono::nanoseconds SocketServer::patience() const {
  const bool mustWait = listener_.IsOpen() && !mayAccept();
  return mustWait ? std::chrono::nanoseconds(kAcceptPause) : std::chrono::nanoseconds::max();
}

void SocketServer::addPolled(std::vector<pollfd>* polled) {
  polled->push_back({mayAccept() ? listener_.get() : -1, POLLIN, 0});
  polledClients_.clear();
  for (const auto& [client, connection] : clients_) {
    polledClients_.push_back(client);
    const int wanted = POLLIN | (connection.queue.IsEmpty() ? 0 : POLLOUT);
    polled->push_back({connection.socket.get(), static_cast<short>(wanted), 0});
  }
}

void SocketServer::takeIncoming(std::span<const pollfd> polled) {
  if ((polled[0].revents & POLLIN) != 0 && listener_.IsOpen()) acceptClients();
  for (std::size_t i = 0; i < polledClients_.size(); ++i) {
    const auto entry = clients_.find(polledClients_[i]);
    if (entry == clients_.end()) continue;  // gone with the hub
    const short ready = polled[i + 1].revents;
    if ((ready & POLLOUT) != 0) flush(entry->second);
    if ((ready & (POLLIN | POLLHUP | POLLERR)) != 0) receive(entry->first, entry->second);
  }
}

}  // namespace simhub
