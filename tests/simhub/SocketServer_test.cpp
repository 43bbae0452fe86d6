#include "simhub/SocketServer.h"

#include <cerrno>
#include <chrono>
#include <cstring>
#include <thread>

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/eventfd.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <unistd.h>

#include "simhub/HubHarness.h"
#include "simhub/Protocol.h"
#include "simhub/Suid.h"
#include "simhub/TemporaryFolder.h"
#include "support/DescriptorLimit.h"

namespace {

using simhub::SocketServer;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::SizeIs;
using SteadyClock = std::chrono::steady_clock;

constexpr std::chrono::seconds kPatience{120};

/// A client's end of the socket; never blocks.
class Client {
 public:
  explicit Client(const std::string& path)
      : fd_(::socket(AF_UNIX, SOCK_SEQPACKET | SOCK_CLOEXEC | SOCK_NONBLOCK, 0)) {
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    std::memcpy(address.sun_path, path.data(), path.size());
    connected_ = ::connect(fd_, reinterpret_cast<const sockaddr*>(&address), sizeof address) == 0;
  }
  Client(const Client&) = delete;
  Client& operator=(const Client&) = delete;
  ~Client() { Close(); }

  void Close() {
    if (fd_ >= 0) ::close(fd_);
    fd_ = -1;
  }
  [[nodiscard]] bool IsConnected() const { return connected_; }

  void SendRaw(const std::vector<std::uint8_t>& datagram) const {
    ASSERT_EQ(::send(fd_, datagram.data(), datagram.size(), MSG_NOSIGNAL),
              static_cast<ssize_t>(datagram.size()));
  }
  void Send(const simhub::Suid& suid, std::uint32_t messageId, const std::string& payload = {}) {
    SendRaw(requestDatagram(++transaction_, suid, messageId, payload));
  }

  enum class Got { kDatagram, kNothing, kEnd };
  Got Receive(std::vector<std::uint8_t>* datagram) const {
    datagram->resize(70'000);
    const ssize_t size = ::recv(fd_, datagram->data(), datagram->size(), 0);
    if (size > 0) {
      datagram->resize(static_cast<std::size_t>(size));
      return Got::kDatagram;
    }
    return size == 0 || errno == ECONNRESET ? Got::kEnd : Got::kNothing;
  }

 private:
  int fd_;
  bool connected_ = false;
  std::uint16_t transaction_ = 0;
};

class SocketServerTest : public testing::Test {
 protected:
  std::unique_ptr<SocketServer> start(const std::vector<std::string>& overrides = {}, double speed = 1,
                                      const std::string& scenarioName = "o1v1") {
    simhub::Scenario scenario;
    EXPECT_TRUE(simhub::loadScenario(scenarioName, overrides, &scenario, &error)) << error;
    simhub::SocketServerOptions options;
    options.path = path;
    options.files.registryFolder = folder.Path("registry");
    options.speed = speed;
    return SocketServer::Create(
        options, std::move(scenario), [this](const std::string& text) { diagnostics.push_back(text); },
        &error);
  }

  /// Runs the server round by round until `done`, for at most kPatience.
  template <class Done>
  [[nodiscard]] static bool runUntil(SocketServer& server, Done done) {
    const auto deadline = SteadyClock::now() + kPatience;
    while (!done()) {
      if (SteadyClock::now() > deadline) return false;
      bool stopped = false;
      EXPECT_EQ(server.Round(std::chrono::milliseconds(1), -1, &stopped), 0);
      EXPECT_FALSE(stopped);
    }
    return true;
  }

  /// Receives `count` datagrams.
  static std::vector<std::vector<std::uint8_t>> receive(SocketServer& server, const Client& client,
                                                        std::size_t count) {
    std::vector<std::vector<std::uint8_t>> datagrams;
    std::vector<std::uint8_t> datagram;
    EXPECT_TRUE(runUntil(server, [&] {
      while (datagrams.size() < count && client.Receive(&datagram) == Client::Got::kDatagram) {
        datagrams.push_back(datagram);
      }
      return datagrams.size() == count;
    }));
    return datagrams;
  }

  [[nodiscard]] static bool ends(SocketServer& server, const Client& client) {
    std::vector<std::uint8_t> datagram;
    return runUntil(server, [&] { return client.Receive(&datagram) == Client::Got::kEnd; });
  }

  TemporaryFolder folder;
  std::string path = folder.Path("hub.sock");
  std::string error;
  std::vector<std::string> diagnostics;
};

const simhub::Suid kPressure = simhub::suidForName("pressure");

TEST_F(SocketServerTest, AnswersARequest) {
  const auto server = start();
  ASSERT_NE(server, nullptr) << error;
  Client client(path);
  client.Send(kPressure, simhub::kAttributesRequest);
  const auto datagrams = receive(*server, client, 2);
  const auto response = qmi::decodeResponse(datagrams[0]);
  ASSERT_TRUE(response);
  EXPECT_EQ(response->result, 0);
  EXPECT_TRUE(qmi::decodeReport(datagrams[1]));
}

TEST_F(SocketServerTest, StreamsInMultiplesOfRealTime) {
  const auto server = start({}, 100);
  Client client(path);
  const auto began = SteadyClock::now();
  client.Send(kPressure, simhub::kStreamConfigRequest, ratePayload(20));
  (void)receive(*server, client, 1 + 40);
  const auto took = SteadyClock::now() - began;
  EXPECT_GT(took, std::chrono::milliseconds(19));  // 2 s at a hundred times the speed
}

TEST_F(SocketServerTest, ServesManyClientsEachItsOwn) {
  const auto server = start({}, 100);
  Client one(path);
  Client two(path);
  one.Send(kPressure, simhub::kStreamConfigRequest, ratePayload(20));
  (void)receive(*server, one, 5);
  two.Send(kPressure, simhub::kAttributesRequest);
  const auto datagrams = receive(*server, two, 2);
  EXPECT_TRUE(qmi::decodeResponse(datagrams[0]));
  EXPECT_EQ(server->ClientCount(), 2U);
  one.Close();
  EXPECT_TRUE(runUntil(*server, [&] { return server->ClientCount() == 1; }));
}

TEST_F(SocketServerTest, MalformedDatagramsDoNotEndTheConnection) {
  const auto server = start();
  Client client(path);
  client.SendRaw({1, 2, 3});
  client.SendRaw(std::vector<std::uint8_t>(100'000, 0));  // larger than any datagram
  client.Send(kPressure, simhub::kAttributesRequest);
  (void)receive(*server, client, 2);
  EXPECT_THAT(diagnostics, SizeIs(2));
}

TEST_F(SocketServerTest, PacketOfNoBytesIsAMalformedDatagramAndNotTheEnd) {
  const auto server = start();
  Client client(path);
  client.SendRaw({});
  client.SendRaw({});
  client.Send(kPressure, simhub::kAttributesRequest);
  (void)receive(*server, client, 2);
  EXPECT_THAT(diagnostics, SizeIs(2));
  client.SendRaw({});
  client.Close();
  EXPECT_TRUE(runUntil(*server, [&] { return server->ClientCount() == 0; }));
}

TEST_F(SocketServerTest, ClientsBeyondTheMostThatThereCanBeAreTurnedAway) {
  const auto server = start();
  std::vector<std::unique_ptr<Client>> clients;
  for (std::size_t count = 1; count <= SocketServer::kMaxClients; ++count) {
    clients.push_back(std::make_unique<Client>(path));
    ASSERT_TRUE(runUntil(*server, [&] { return server->ClientCount() == count; }));
  }
  EXPECT_THAT(diagnostics, SizeIs(0));
  const Client tooMany(path);
  EXPECT_TRUE(ends(*server, tooMany));
  EXPECT_THAT(diagnostics, ElementsAre("more than 256 clients: one is turned away"));
  EXPECT_EQ(server->ClientCount(), SocketServer::kMaxClients);
  clients.back()->Close();
  ASSERT_TRUE(runUntil(*server, [&] { return server->ClientCount() < SocketServer::kMaxClients; }));
  Client next(path);
  next.Send(kPressure, simhub::kAttributesRequest);
  EXPECT_THAT(receive(*server, next, 2), SizeIs(2));
}

TEST_F(SocketServerTest, ClientThatComesWhileNoDescriptorIsLeftIsTakenLater) {
  const auto server = start();
  Client first(path);
  ASSERT_TRUE(runUntil(*server, [&] { return server->ClientCount() == 1; }));
  Client second(path);
  {
    const support::DescriptorLimit none(0);
    ASSERT_TRUE(runUntil(*server, [&] { return !diagnostics.empty(); }));
    EXPECT_THAT(diagnostics, ElementsAre("a client has to wait: Too many open files"));
    first.Send(kPressure, simhub::kAttributesRequest);
    EXPECT_THAT(receive(*server, first, 2), SizeIs(2)) << "who is there is served meanwhile";
    EXPECT_EQ(server->ClientCount(), 1U);
  }
  second.Send(kPressure, simhub::kAttributesRequest);
  EXPECT_THAT(receive(*server, second, 2), SizeIs(2));
}

TEST_F(SocketServerTest, ClientThatDoesNotReadIsDisconnectedAndHoldsNobodyUp) {
  const auto server = start({"sensor.pressure.rates=[100000]"}, 1000);
  Client lazy(path);
  Client busy(path);
  lazy.Send(kPressure, simhub::kStreamConfigRequest, ratePayload(100'000));
  ASSERT_TRUE(runUntil(*server, [&] { return server->ClientCount() == 2; }));
  ASSERT_TRUE(runUntil(*server, [&] { return server->ClientCount() == 1; }));
  EXPECT_THAT(diagnostics, ElementsAre(HasSubstr("does not read")));
  busy.Send(kPressure, simhub::kAttributesRequest);
  EXPECT_TRUE(qmi::decodeResponse(receive(*server, busy, 1)[0]));
}

TEST_F(SocketServerTest, SlowReaderGetsEverythingInOrder) {
  // More than the socket holds, less than the server keeps: 6,000 readings in 0.6 s of the hub's time.
  constexpr int kReadings = 6'000;
  const auto server = start({"sensor.pressure.rates=[10000]", "fault.f.kind=silent",
                             "fault.f.sensor=pressure", "fault.f.after=" + std::to_string(kReadings)},
                            100);
  Client client(path);
  client.Send(kPressure, simhub::kStreamConfigRequest, ratePayload(10'000));
  const auto deadline = SteadyClock::now() + std::chrono::milliseconds(30);
  ASSERT_TRUE(runUntil(*server, [&] { return SteadyClock::now() > deadline; }));
  const auto datagrams = receive(*server, client, 1 + kReadings);
  std::uint64_t last = 0;
  for (std::size_t i = 1; i < datagrams.size(); ++i) {
    const auto report = qmi::decodeReport(datagrams[i]);
    sns_client_event_msg message;
    ASSERT_TRUE(report &&
                message.ParseFromArray(report->payload.data(), static_cast<int>(report->payload.size())));
    if (last != 0) {
      ASSERT_EQ(message.events(0).timestamp(), last + 1920);
    }
    last = message.events(0).timestamp();
  }
}

TEST_F(SocketServerTest, HubThatGoesAwayEndsConnectionsAndComesBack) {
  const auto server = start({"fault.f.kind=hub_away", "fault.f.after=5", "fault.f.down_for=20"}, 100);
  Client client(path);
  client.Send(kPressure, simhub::kStreamConfigRequest, ratePayload(20));
  EXPECT_TRUE(ends(*server, client));
  EXPECT_FALSE(folder.Exists("hub.sock"));
  EXPECT_FALSE(Client(path).IsConnected());
  EXPECT_TRUE(runUntil(*server, [&] { return folder.Exists("hub.sock"); }));
  Client again(path);
  again.Send(kPressure, simhub::kAttributesRequest);
  EXPECT_THAT(receive(*server, again, 2), SizeIs(2));
}

TEST_F(SocketServerTest, StaleSocketIsReplaced) {
  { ASSERT_NE(start(), nullptr); }
  const int fd = ::socket(AF_UNIX, SOCK_SEQPACKET | SOCK_CLOEXEC, 0);
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  std::memcpy(address.sun_path, path.data(), path.size());
  ASSERT_EQ(::bind(fd, reinterpret_cast<const sockaddr*>(&address), sizeof address), 0);
  ::close(fd);
  ASSERT_TRUE(folder.Exists("hub.sock"));
  const auto server = start();
  ASSERT_NE(server, nullptr) << error;
  EXPECT_TRUE(Client(path).IsConnected());
}

TEST_F(SocketServerTest, LiveSocketIsNeverTaken) {
  const auto first = start();
  ASSERT_NE(first, nullptr);
  EXPECT_EQ(start(), nullptr);
  EXPECT_THAT(error, HasSubstr("another hub listens there"));
  EXPECT_TRUE(Client(path).IsConnected());
}

TEST_F(SocketServerTest, FileThatIsNoSocketIsLeftAlone) {
  folder.WriteFile("hub.sock", "precious");
  EXPECT_EQ(start(), nullptr);
  EXPECT_THAT(error, HasSubstr("is no socket"));
  EXPECT_EQ(folder.ReadFile("hub.sock"), "precious");
}

TEST_F(SocketServerTest, PathsThatDoNotFitAreRefused) {
  path = folder.Path(std::string(200, 'a'));
  EXPECT_EQ(start(), nullptr);
  EXPECT_THAT(error, HasSubstr("longer than 107 bytes"));
  path = folder.Path("missing/hub.sock");
  EXPECT_EQ(start(), nullptr);
  EXPECT_THAT(error, HasSubstr("No such file"));
  path = "";
  EXPECT_EQ(start(), nullptr);
  EXPECT_THAT(error, HasSubstr("empty"));
}

TEST_F(SocketServerTest, EndingRemovesTheSocket) {
  auto server = start();
  ASSERT_TRUE(folder.Exists("hub.sock"));
  server.reset();
  EXPECT_FALSE(folder.Exists("hub.sock"));
}

TEST_F(SocketServerTest, RunEndsWhenAskedTo) {
  const auto server = start();
  const int stop = ::eventfd(0, EFD_CLOEXEC);
  int result = -1;
  std::thread runner([&] { result = server->Run(stop); });
  const std::uint64_t one = 1;
  ASSERT_EQ(::write(stop, &one, sizeof one), static_cast<ssize_t>(sizeof one));
  runner.join();
  EXPECT_EQ(result, 0);
  ::close(stop);
}

}  // namespace
