// The transport over a real socket. Waits have deadlines far beyond what they take.
#include "ssc/transport/UnixTransport.h"

#include <cerrno>
#include <chrono>
#include <memory>
#include <string>
#include <thread>
#include <vector>

#include <gtest/gtest.h>

#include "ssc/Connection.h"
#include "ssc/HubServer.h"
#include "ssc/Results.h"
#include "ssc/TestClient.h"
#include "support/DescriptorLimit.h"

namespace {

using namespace ssctest;
using namespace std::chrono_literals;
using ssc::Clock;
using ssc::Incoming;
using ssc::Transport;
using Outcome = ssc::Transport::Outcome;

class UnixTransportTest : public testing::Test {
 protected:
  void SetUp() override {
    ASSERT_TRUE(server_.listening());
    ASSERT_EQ(ssc::UnixTransport::Connect(server_.path(), &transport_), ssc::kOk);
    ASSERT_TRUE(server_.WaitForConnections(1));
  }

  Clock::TimePoint patience() { return clock_.now() + kPatience; }
  Outcome receive() { return transport_->Receive(patience(), &incoming_); }
  /// Receives and expects a datagram of these bytes.
  void expectDatagram(const Datagram& bytes) {
    ASSERT_EQ(receive(), Outcome::kIncoming);
    ASSERT_EQ(incoming_.kind, Incoming::Kind::kDatagram);
    EXPECT_EQ(incoming_.datagram, bytes);
  }
  void expectChange(Incoming::Kind kind) {
    ASSERT_EQ(receive(), Outcome::kIncoming);
    EXPECT_EQ(incoming_.kind, kind);
    EXPECT_TRUE(incoming_.datagram.empty());
  }

  HubServer server_{acceptAll};
  std::unique_ptr<Transport> transport_;
  ssc::RealClock clock_;
  Incoming incoming_;
};

TEST_F(UnixTransportTest, CarriesDatagramsBothWaysByteForByte) {
  const Datagram up{0, 1, 2, 255};
  ASSERT_EQ(transport_->Send(up), ssc::kOk);
  ASSERT_TRUE(server_.WaitForPackets(1));
  EXPECT_EQ(server_.packets()[0], up);
  const Datagram down{4, 0, 0, 7};
  ASSERT_TRUE(server_.Send(down));
  expectDatagram(down);
}

TEST_F(UnixTransportTest, CarriesTheLargestDatagramsBothWays) {
  Datagram largest;
  ASSERT_TRUE(qmi::encodeReport(1, Datagram(qmi::kMaxReportPayload, 0x5a), &largest));
  ASSERT_EQ(largest.size(), 65542U);
  ASSERT_EQ(transport_->Send(largest), ssc::kOk);
  ASSERT_TRUE(server_.WaitForPackets(1));
  EXPECT_EQ(server_.packets()[0], largest);
  ASSERT_TRUE(server_.Send(largest));
  expectDatagram(largest);
}

TEST_F(UnixTransportTest, PacketLargerThanAnyDatagramDoesNotPassForAGoodOne) {
  // Cut to the largest frame's size it would be a whole message.
  Datagram tooLarge;
  ASSERT_TRUE(qmi::encodeReport(1, Datagram(qmi::kMaxReportPayload, 0x5a), &tooLarge));
  tooLarge.resize(tooLarge.size() + 1000);
  ASSERT_TRUE(server_.Send(tooLarge));
  ASSERT_EQ(receive(), Outcome::kIncoming);
  EXPECT_FALSE(qmi::datagramKind(incoming_.datagram).has_value());
  ASSERT_TRUE(server_.Send({1, 2, 3}));
  expectDatagram({1, 2, 3});
}

TEST_F(UnixTransportTest, KeepsTheOrderOfManyDatagramsOfDifferentSizes) {
  constexpr std::size_t kCount = 100;
  std::thread sender([this] {
    for (std::size_t i = 1; i <= kCount; ++i) {
      ASSERT_TRUE(server_.Send(Datagram(i * 37 % 3000 + 1, static_cast<std::uint8_t>(i))));
    }
  });
  for (std::size_t i = 1; i <= kCount; ++i) {
    expectDatagram(Datagram(i * 37 % 3000 + 1, static_cast<std::uint8_t>(i)));
  }
  sender.join();
}

TEST_F(UnixTransportTest, PacketOfNoBytesIsADatagramAndNotTheEnd) {
  ASSERT_TRUE(server_.Send({}));
  ASSERT_TRUE(server_.Send({1, 2, 3}));
  expectDatagram({});
  expectDatagram({1, 2, 3});
  ASSERT_TRUE(server_.Send({}));
  expectDatagram({});
  for (int i = 0; i < 40; ++i) ASSERT_TRUE(server_.Send({}));
  for (int i = 0; i < 40; ++i) expectDatagram({});
  EXPECT_EQ(transport_->Receive(clock_.now(), &incoming_), Outcome::kDeadline);
}

TEST_F(UnixTransportTest, ConnectingNeedsADescriptorForTheEndOfAWaitToo) {
  // Without it a connection could be opened, but never closed.
  std::unique_ptr<Transport> transport;
  for (const rlim_t left : {0U, 1U}) {
    const support::DescriptorLimit limit(left);
    EXPECT_EQ(ssc::UnixTransport::Connect(server_.path(), &transport), ssc::kNoHub) << left;
    EXPECT_EQ(errno, EMFILE) << left;
    EXPECT_EQ(transport, nullptr) << left;
  }
}

TEST_F(UnixTransportTest, DeadlinePassesWithoutAnythingComingIn) {
  const auto deadline = clock_.now() + 2ms;
  EXPECT_EQ(transport_->Receive(deadline, &incoming_), Outcome::kDeadline);
  EXPECT_GE(clock_.now(), deadline);
  EXPECT_EQ(transport_->Receive(Clock::TimePoint{}, &incoming_), Outcome::kDeadline);
}

TEST_F(UnixTransportTest, WhatIsThereIsTakenEvenWhenTheDeadlineHasPassed) {
  ASSERT_TRUE(server_.Send({1}));
  EXPECT_EQ(transport_->Receive(Clock::TimePoint{}, &incoming_), Outcome::kIncoming);
  EXPECT_EQ(incoming_.datagram, Datagram{1});
}

TEST_F(UnixTransportTest, InterruptEndsTheNextOrTheRunningReceiveOnce) {
  transport_->Interrupt();
  EXPECT_EQ(receive(), Outcome::kInterrupted);
  EXPECT_EQ(transport_->Receive(clock_.now(), &incoming_), Outcome::kDeadline);
  std::thread interrupter([this] { transport_->Interrupt(); });
  EXPECT_EQ(transport_->Receive(Clock::TimePoint::max(), &incoming_), Outcome::kInterrupted);
  interrupter.join();
}

TEST_F(UnixTransportTest, EndOfTheConnectionComesAfterWhatWasSentBeforeIt) {
  for (std::uint8_t i = 1; i <= 20; ++i) ASSERT_TRUE(server_.Send({i}));
  server_.GoAway();
  for (std::uint8_t i = 1; i <= 20; ++i) expectDatagram({i});
  expectChange(Incoming::Kind::kDown);
  EXPECT_EQ(transport_->Send(Datagram{1}), ssc::kNotConnected);
}

TEST_F(UnixTransportTest, SendingToAHubThatHasGoneIsNotConnected) {
  server_.GoAway();
  expectChange(Incoming::Kind::kDown);
  EXPECT_EQ(transport_->Send(Datagram{1}), ssc::kNotConnected);
  // The same before the end was read off the socket.
  server_.Listen();
  expectChange(Incoming::Kind::kUp);
  ASSERT_TRUE(server_.WaitForConnections(2));
  server_.GoAway();
  EXPECT_EQ(transport_->Send(Datagram{1}), ssc::kNotConnected);
  expectChange(Incoming::Kind::kDown);
}

TEST_F(UnixTransportTest, HubThatReturnsIsFoundWithinItsInterval) {
  server_.GoAway();
  expectChange(Incoming::Kind::kDown);
  const auto start = clock_.now();
  server_.Listen();
  expectChange(Incoming::Kind::kUp);
  // One interval after the end was noticed; the upper bound leaves room for a busy machine.
  EXPECT_LT(clock_.now() - start, 5s);
  ASSERT_TRUE(server_.WaitForConnections(2));
  ASSERT_TRUE(server_.Send({9}));
  expectDatagram({9});
  ASSERT_EQ(transport_->Send(Datagram{8}), ssc::kOk);
  ASSERT_TRUE(server_.WaitForPackets(1));
}

TEST_F(UnixTransportTest, WhileTheHubIsAwayReceiveKeepsItsDeadlineAndCanBeInterrupted) {
  server_.GoAway();
  expectChange(Incoming::Kind::kDown);
  const auto deadline = clock_.now() + 3ms;
  EXPECT_EQ(transport_->Receive(deadline, &incoming_), Outcome::kDeadline);
  EXPECT_GE(clock_.now(), deadline);
  transport_->Interrupt();
  EXPECT_EQ(receive(), Outcome::kInterrupted);
}

TEST_F(UnixTransportTest, NothingOfTheOldConnectionComesAfterTheNewOne) {
  for (int round = 1; round <= 3; ++round) {
    for (std::uint8_t i = 0; i < 5; ++i) ASSERT_TRUE(server_.Send({i, static_cast<std::uint8_t>(round)}));
    server_.HangUp();
    for (std::uint8_t i = 0; i < 5; ++i) expectDatagram({i, static_cast<std::uint8_t>(round)});
    expectChange(Incoming::Kind::kDown);
    expectChange(Incoming::Kind::kUp);
    ASSERT_TRUE(server_.WaitForConnections(round + 1));
  }
}

/// A listener of which nothing is read unless the test does so.
class IdleListener {
 public:
  IdleListener() {
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    std::memcpy(address.sun_path, path().c_str(), path().size());
    EXPECT_EQ(::bind(listener_.get(), reinterpret_cast<const sockaddr*>(&address), sizeof address), 0);
    EXPECT_EQ(::listen(listener_.get(), 1), 0);
  }
  [[nodiscard]] std::string path() const { return folder_.socketPath(); }
  [[nodiscard]] ssc::Descriptor accept() const {
    return ssc::Descriptor(::accept4(listener_.get(), nullptr, nullptr, SOCK_CLOEXEC));
  }

 private:
  const SocketFolder folder_;
  const ssc::Descriptor listener_{::socket(AF_UNIX, SOCK_SEQPACKET | SOCK_CLOEXEC, 0)};
};

TEST(UnixTransportIdleHub, ThatTakesNoRequestsMakesTheSenderTimeOut) {
  const IdleListener hub;
  std::unique_ptr<Transport> transport;
  ASSERT_EQ(ssc::UnixTransport::Connect(hub.path(), &transport), ssc::kOk);
  const Datagram large(60000, 1);
  int result = ssc::kOk;
  for (int i = 0; i < 1000 && result == ssc::kOk; ++i) result = transport->Send(large);
  EXPECT_EQ(result, ssc::kTimedOut);
}

TEST(UnixTransportIdleHub, ThatGoesAwayWithRequestsUnreadHasStillSaidWhatItSaid) {
  const IdleListener hub;
  std::unique_ptr<Transport> transport;
  ASSERT_EQ(ssc::UnixTransport::Connect(hub.path(), &transport), ssc::kOk);
  ASSERT_EQ(transport->Send(Datagram{1}), ssc::kOk);
  {
    const ssc::Descriptor peer = hub.accept();
    for (const std::uint8_t i : Datagram{10, 11, 12}) ASSERT_EQ(::send(peer.get(), &i, 1, 0), 1);
  }
  Incoming incoming;
  const auto deadline = ssc::RealClock().now() + kPatience;
  for (const std::uint8_t i : Datagram{10, 11, 12}) {
    ASSERT_EQ(transport->Receive(deadline, &incoming), Outcome::kIncoming);
    EXPECT_EQ(incoming.kind, Incoming::Kind::kDatagram);
    EXPECT_EQ(incoming.datagram, Datagram{i});
  }
  ASSERT_EQ(transport->Receive(deadline, &incoming), Outcome::kIncoming);
  EXPECT_EQ(incoming.kind, Incoming::Kind::kDown);
}

TEST(UnixTransportConnect, FailsWithoutTouchingTheResult) {
  std::unique_ptr<Transport> transport;
  const SocketFolder folder;
  EXPECT_EQ(ssc::UnixTransport::Connect("", &transport), ssc::kInvalid);
  EXPECT_EQ(ssc::UnixTransport::Connect(std::string(108, 'x'), &transport), ssc::kInvalid);
  EXPECT_EQ(ssc::UnixTransport::Connect(std::string("/tmp/a\0b", 8), &transport), ssc::kInvalid);
  EXPECT_EQ(ssc::UnixTransport::Connect(folder.socketPath(), &transport), ssc::kNoHub);
  EXPECT_EQ(transport, nullptr);
}

/// A connection with its own event thread over the socket.
class UnixConnection : public testing::Test {
 protected:
  void connectTo(const Script& script) {
    server_ = std::make_unique<HubServer>(script);
    ssc::HubLink link;
    link.clock = std::make_unique<ssc::RealClock>();
    ASSERT_EQ(ssc::UnixTransport::Connect(server_->path(), &link.transport), ssc::kOk);
    connection_ = ssc::Connection::Over(std::move(link));
    ASSERT_TRUE(server_->WaitForConnections(1));
  }

  std::unique_ptr<HubServer> server_;
  std::unique_ptr<ssc::Connection> connection_;
};

TEST_F(UnixConnection, RequestUnderWayEndsWhenTheHubGoesAway) {
  connectTo([](const Request&) { return Outgoings{goAway()}; });
  TestClient client(connection_.get());
  const auto start = connection_->clock().now();
  EXPECT_EQ(client.SendRequest(ssc::Client::MakeDisableRequest(kSensor)), ssc::kNotConnected);
  EXPECT_LT(connection_->clock().now() - start, 2900ms);  // and not because its time was up
}

TEST_F(UnixConnection, ClientsAreToldThatTheHubWentAndMaySendAgainWhenItIsBack) {
  connectTo(acceptAll);
  TestClient client(connection_.get());
  std::vector<int> sent;
  client.onReconnect = [&] {
    sent.push_back(client.SendRequest(ssc::Client::MakeConfigRequest(kSensor, 20, 0)));
  };
  client.Register();
  server_->GoAway();
  ASSERT_TRUE(client.WaitForChanges("d", kPatience));
  EXPECT_EQ(client.SendRequest(ssc::Client::MakeDisableRequest(kSensor)), ssc::kNotConnected);
  server_->Listen();
  ASSERT_TRUE(client.WaitForChanges("dr", kPatience));
  server_->HangUp();
  ASSERT_TRUE(client.WaitForChanges("drdr", kPatience));
  client.Unregister();
  EXPECT_EQ(sent, (std::vector<int>{ssc::kOk, ssc::kOk}));
  EXPECT_EQ(server_->packets().size(), 2U);
}

TEST_F(UnixConnection, DamagedDatagramsAreDroppedAndTheConnectionGoesOn) {
  connectTo([](const Request& request) -> Outgoings {
    return {raw({}), raw({1}), raw(Datagram(70000, 4)), accept(request)};
  });
  TestClient client(connection_.get());
  testing::internal::CaptureStdout();
  EXPECT_EQ(client.SendRequest(ssc::Client::MakeDisableRequest(kSensor)), ssc::kOk);
  EXPECT_NE(testing::internal::GetCapturedStdout().find("WARN: Dropped a malformed"), std::string::npos);
  EXPECT_EQ(connection_->malformedCount(), 3U);
}

TEST_F(UnixConnection, EndsWhileTheHubIsAway) {
  connectTo(acceptAll);
  TestClient client(connection_.get());
  client.Register();
  server_->GoAway();
  ASSERT_TRUE(client.WaitForChanges("d", kPatience));
  client.Unregister();
  SUCCEED();  // what is tested is that the connection's end, after this, is not held up
}

}  // namespace
