#include "simhub/SocketServer.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <utility>

#include <poll.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <unistd.h>

namespace simhub {
namespace {

constexpr std::size_t kMaxDatagram = 7 + 0xffff;
constexpr int kBacklog = 64;
constexpr int kMaxDatagramsPerRound = 64;   // of one client, so that none keeps the others waiting
constexpr int kMaxStepsPerRound = 100'000;  // of a hub that cannot keep up, so that requests still come in
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

int openSocket() { return ::socket(AF_UNIX, SOCK_SEQPACKET | SOCK_CLOEXEC | SOCK_NONBLOCK, 0); }

}  // namespace

SocketServer::Descriptor::~Descriptor() {
  if (fd_ >= 0) (void)::close(fd_);
}

SocketServer::SocketServer(const SocketServerOptions& options, Diagnostics diagnostics)
    : options_(options),
      diagnostics_(std::move(diagnostics)),
      start_(Clock::now()),
      buffer_(kMaxDatagram + 1) {}

std::unique_ptr<SocketServer> SocketServer::Create(const SocketServerOptions& options, Scenario scenario,
                                                   Diagnostics diagnostics, std::string* error) {
  std::unique_ptr<SocketServer> server(new SocketServer(options, std::move(diagnostics)));
  if (!server->listen(error)) return nullptr;
  server->hub_ = Hub::Create(std::move(scenario), options.files, *server, error);
  if (server->hub_ == nullptr) return nullptr;
  server->start_ = Clock::now();
  return server;
}

SocketServer::~SocketServer() { stopListening(); }

// ---- The socket ----

bool SocketServer::listen(std::string* error) {
  sockaddr_un address{};
  if (!makeAddress(options_.path, &address, error)) return false;
  struct stat status {};
  if (::lstat(options_.path.c_str(), &status) == 0) {
    if (!S_ISSOCK(status.st_mode)) {
      *error = options_.path + ": is there already, and is no socket";
      return false;
    }
    const Descriptor probe(openSocket());
    // Only a refused connection shows that nobody listens; a full queue, say, is somebody's.
    if (::connect(probe.get(), generic(address), sizeof address) == 0 || errno != ECONNREFUSED) {
      *error = options_.path + ": another hub listens there";
      return false;
    }
    (void)::unlink(options_.path.c_str());
  }
  Descriptor listener(openSocket());
  if (!listener.IsOpen() || ::bind(listener.get(), generic(address), sizeof address) != 0) {
    *error = options_.path + ": " + std::strerror(errno);
    return false;
  }
  if (::stat(options_.path.c_str(), &status) == 0) {
    device_ = status.st_dev;
    inode_ = status.st_ino;
  }
  if (::listen(listener.get(), kBacklog) != 0) {
    *error = options_.path + ": " + std::strerror(errno);
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
      ::lstat(options_.path.c_str(), &status) == 0 && status.st_dev == device_ && status.st_ino == inode_;
  if (isOurs) (void)::unlink(options_.path.c_str());
  listener_ = Descriptor();
}

void SocketServer::acceptClients() {
  for (;;) {
    Descriptor socket(::accept4(listener_.get(), nullptr, nullptr, SOCK_CLOEXEC | SOCK_NONBLOCK));
    if (!socket.IsOpen()) {
      if (errno == EINTR || errno == ECONNABORTED) continue;
      if (errno == EMFILE || errno == ENFILE || errno == ENOBUFS || errno == ENOMEM) {
        diagnostics_(std::string("a client has to wait: ") + std::strerror(errno));
        acceptAgain_ = Clock::now() + kAcceptPause;
      }
      return;
    }
    if (clients_.size() >= kMaxClients) {
      diagnostics_("more than " + std::to_string(kMaxClients) + " clients: one is turned away");
      continue;
    }
    clients_[hub_->AddClient()].socket = std::move(socket);
  }
}

void SocketServer::receive(ClientId client, Connection& connection) {
  for (int i = 0; i < kMaxDatagramsPerRound && !connection.isLost; ++i) {
    const ssize_t size = ::recv(connection.socket.get(), buffer_.data(), buffer_.size(), MSG_TRUNC);
    if (size < 0 && errno == EINTR) continue;
    if (size < 0 && (errno == EAGAIN || errno == EWOULDBLOCK)) return;
    if (size <= 0) {
      connection.isLost = true;
      return;
    }
    // One that is too large comes cut, and is no well-formed message then.
    const std::size_t taken = std::min(static_cast<std::size_t>(size), buffer_.size());
    (void)hub_->HandleDatagram(client, {buffer_.data(), taken});
  }
}

void SocketServer::Deliver(ClientId client, qmi::Bytes datagram) {
  const auto entry = clients_.find(client);
  if (entry == clients_.end() || entry->second.isLost) return;
  Connection& connection = entry->second;
  if (connection.queue.empty()) {
    const ssize_t sent = ::send(connection.socket.get(), datagram.data(), datagram.size(), MSG_NOSIGNAL);
    if (sent == static_cast<ssize_t>(datagram.size())) return;
    if (errno != EAGAIN && errno != EWOULDBLOCK && errno != EINTR && errno != ENOBUFS) {
      connection.isLost = true;
      return;
    }
  }
  if (connection.queuedBytes + datagram.size() > kMaxQueuedBytes) {
    diagnostics_("client " + std::to_string(client) + " does not read: it is disconnected");
    connection.isLost = true;
    return;
  }
  connection.queue.emplace_back(datagram.begin(), datagram.end());
  connection.queuedBytes += datagram.size();
}

void SocketServer::flush(Connection& connection) {
  while (!connection.queue.empty() && !connection.isLost) {
    const std::vector<std::uint8_t>& datagram = connection.queue.front();
    const ssize_t sent = ::send(connection.socket.get(), datagram.data(), datagram.size(), MSG_NOSIGNAL);
    if (sent < 0) {
      connection.isLost = errno != EAGAIN && errno != EWOULDBLOCK && errno != EINTR && errno != ENOBUFS;
      return;
    }
    connection.queuedBytes -= datagram.size();
    connection.queue.pop_front();
  }
}

void SocketServer::dropLost() {
  for (auto entry = clients_.begin(); entry != clients_.end();) {
    if (entry->second.isLost) {
      hub_->RemoveClient(entry->first);
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
  if (!listen(&error)) diagnostics_("the hub is back but cannot be reached: " + error);
}

Time SocketServer::hubTime() const {
  const double seconds = std::chrono::duration<double>(Clock::now() - start_).count();
  return fromSeconds(seconds * options_.speed);
}

void SocketServer::advance() {
  const Time target = hubTime();
  for (int i = 0; i < kMaxStepsPerRound; ++i) {
    const std::optional<Time> next = hub_->NextEventTime();
    if (!next || *next > target) {
      hub_->AdvanceTo(target);
      return;
    }
    hub_->Step();
    if (!hub_->IsUp()) dropLost();  // before the hub can be back and take them for its own
  }
}

std::chrono::nanoseconds SocketServer::untilNextEvent() const {
  const std::optional<Time> next = hub_->NextEventTime();
  if (!next) return std::chrono::nanoseconds::max();
  const double seconds = toSeconds(*next - hubTime()) / options_.speed;
  return seconds > 0 ? fromSeconds(seconds) : std::chrono::nanoseconds::zero();
}

int SocketServer::Round(std::chrono::nanoseconds maxWait, int stop, bool* stopped) {
  const Clock::time_point now = Clock::now();
  const bool mayAccept = listener_.IsOpen() && now >= acceptAgain_;
  if (listener_.IsOpen() && !mayAccept) maxWait = std::min<std::chrono::nanoseconds>(maxWait, kAcceptPause);
  std::vector<pollfd> polled{{stop, POLLIN, 0}, {mayAccept ? listener_.get() : -1, POLLIN, 0}};
  std::vector<ClientId> ids;
  for (const auto& [client, connection] : clients_) {
    ids.push_back(client);
    const int wanted = POLLIN | (connection.queue.empty() ? 0 : POLLOUT);
    polled.push_back({connection.socket.get(), static_cast<short>(wanted), 0});
  }
  const auto wait = std::min(maxWait, untilNextEvent());
  constexpr std::chrono::nanoseconds kSecond{1'000'000'000};
  const timespec timeout{static_cast<time_t>(wait / kSecond), static_cast<long>((wait % kSecond).count())};
  const bool isBounded = wait != std::chrono::nanoseconds::max();
  if (::ppoll(polled.data(), polled.size(), isBounded ? &timeout : nullptr, nullptr) < 0) {
    return errno == EINTR ? 0 : errno;
  }
  advance();
  *stopped = (polled[0].revents & POLLIN) != 0;
  if ((polled[1].revents & POLLIN) != 0 && listener_.IsOpen()) acceptClients();
  for (std::size_t i = 0; i < ids.size(); ++i) {
    const auto entry = clients_.find(ids[i]);
    if (entry == clients_.end()) continue;  // gone with the hub
    const short ready = polled[i + 2].revents;
    if ((ready & POLLOUT) != 0) flush(entry->second);
    if ((ready & (POLLIN | POLLHUP | POLLERR)) != 0) receive(entry->first, entry->second);
  }
  dropLost();
  return 0;
}

int SocketServer::Run(int stop) {
  bool stopped = false;
  while (!stopped) {
    if (const int error = Round(std::chrono::nanoseconds::max(), stop, &stopped); error != 0) return error;
  }
  return 0;
}

}  // namespace simhub
