// Client and server over the real socket family. Where the machine has none everything is skipped;
// scripts/check-qrtr runs this in a virtual machine that has one.
#include <algorithm>
#include <cerrno>
#include <chrono>
#include <memory>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "simhub/QrtrPort.h"
#include "ssc/Results.h"
#include "ssc/transport/QrtrTransport.h"

namespace {

using qmi::QrtrAddress;
using ssc::Incoming;
using ssc::QrtrSocket;
using ssc::Transport;
using Packet = std::vector<std::uint8_t>;
using SteadyClock = std::chrono::steady_clock;

constexpr std::chrono::seconds kPatience{10};
constexpr std::size_t kLargest = 65'535;

ssc::Clock::TimePoint soon() { return ssc::RealClock().now() + kPatience; }

class Qrtr : public testing::Test {
 protected:
  void SetUp() override {
    if (QrtrSocket::Open() == nullptr) GTEST_SKIP() << "this machine has no QRTR";
    hub = simhub::QrtrPort::OfThisMachine();
    ASSERT_EQ(hub->Open(), 0);
  }
  [[nodiscard]] int connect() { return ssc::QrtrTransport::Connect(&transport, &reason); }

  /// The next packet that comes to the hub from a client; notices are left out.
  [[nodiscard]] Packet atHub() {
    Packet packet;
    const auto deadline = SteadyClock::now() + kPatience;
    while (SteadyClock::now() < deadline) {
      if (hub->Receive(&client, &packet) == 0 && client.port != QRTR_PORT_CTRL) return packet;
    }
    return {};
  }
  /// What comes to the client next: "<size>" of a datagram, "down", "up", "nothing".
  [[nodiscard]] std::string atClient(ssc::Clock::TimePoint deadline = soon()) {
    Incoming incoming;
    if (transport->Receive(deadline, &incoming) != Transport::Outcome::kIncoming) return "nothing";
    switch (incoming.kind) {
      case Incoming::Kind::kDown:
        return "down";
      case Incoming::Kind::kUp:
        return "up";
      default:
        return "<" + std::to_string(incoming.datagram.size()) + ">";
    }
  }
  /// Makes the hub know the client's address.
  void greet() {
    ASSERT_EQ(connect(), ssc::kOk) << reason;
    ASSERT_EQ(transport->Send(Packet{7}), ssc::kOk);
    ASSERT_EQ(atHub(), Packet{7});
  }
  /// Sends to the client until its queue takes no more; how many packets it has.
  [[nodiscard]] int fillClient() {
    const Packet packet(60'000, 1);
    for (int count = 0; count < 10'000; ++count) {
      const int result = hub->Send(client, packet);
      if (result == -ENOSPC) return count;
      EXPECT_EQ(result, 0);
    }
    return 0;
  }
  void drainClient(int count) {
    for (int i = 0; i < count; ++i) ASSERT_EQ(atClient(), "<60000>");
  }

  std::unique_ptr<simhub::QrtrPort> hub;
  std::unique_ptr<Transport> transport;
  std::string reason;
  QrtrAddress client;
};

TEST_F(Qrtr, ClientFindsTheHubAndBothSpeak) {
  greet();
  ASSERT_EQ(hub->Send(client, Packet{1, 2, 3}), 0);
  EXPECT_EQ(atClient(), "<3>");
}

TEST_F(Qrtr, LargestDatagramsTravelBothWays) {
  greet();
  Packet large(kLargest, 9);
  EXPECT_EQ(transport->Send(large), ssc::kOk);
  EXPECT_EQ(atHub(), large);
  EXPECT_EQ(hub->Send(client, large), 0);
  EXPECT_EQ(atClient(), "<65535>");
  large.push_back(9);
  EXPECT_EQ(transport->Send(large), -EMSGSIZE);
  EXPECT_EQ(hub->Send(client, large), -EMSGSIZE);
}

TEST_F(Qrtr, WithoutTheServiceThereIsNoHubAndNoWait) {
  hub->Close();
  EXPECT_EQ(connect(), ssc::kNoHub);
  // Another reason than that of a name service that was waited for.
  EXPECT_EQ(reason, "QRTR's name service knows no service 400");
}

TEST_F(Qrtr, HubThatReturnsAtTheSamePortIsDownAndUp) {
  greet();
  hub->Close();
  EXPECT_EQ(atClient(), "down");
  EXPECT_EQ(transport->Send(Packet{7}), ssc::kNotConnected);
  ASSERT_EQ(hub->Open(), 0);
  EXPECT_EQ(atClient(), "up");
  EXPECT_EQ(transport->Send(Packet{8}), ssc::kOk);
  EXPECT_EQ(atHub(), Packet{8});
}

TEST_F(Qrtr, HubThatReturnsElsewhereIsFound) {
  greet();
  hub->Close();
  const auto squatter = QrtrSocket::Open();  // takes the port that the hub had
  ASSERT_EQ(squatter->Send(client, Packet{1}), 0);
  ASSERT_EQ(hub->Open(), 0);
  EXPECT_EQ(atClient(), "down");
  EXPECT_EQ(atClient(), "up");
  EXPECT_EQ(transport->Send(Packet{8}), ssc::kOk);
  EXPECT_EQ(atHub(), Packet{8});
}

TEST_F(Qrtr, StrangersAreNotHeard) {
  greet();
  const auto stranger = QrtrSocket::Open();
  ASSERT_EQ(stranger->Send(client, Packet{1}), 0);
  const auto forged =
      qmi::encodeQrtrControl({QRTR_TYPE_DEL_SERVER, qmi::kHubServiceId, qmi::kHubInstance, client});
  ASSERT_EQ(stranger->Send(client, forged), 0);
  ASSERT_EQ(hub->Send(client, Packet{1, 2}), 0);
  EXPECT_EQ(atClient(), "<2>");
}

TEST_F(Qrtr, HubHearsThatAClientHasGone) {
  greet();
  transport.reset();
  QrtrAddress from;
  Packet packet;
  const auto deadline = SteadyClock::now() + kPatience;
  while (hub->Receive(&from, &packet) != 0 || from.port != QRTR_PORT_CTRL) {
    ASSERT_LT(SteadyClock::now(), deadline);
  }
  const auto control = qmi::decodeQrtrControl(packet);
  ASSERT_TRUE(control);
  EXPECT_EQ(control->command, static_cast<std::uint32_t>(QRTR_TYPE_DEL_CLIENT));
  EXPECT_EQ(control->client(), client);
}

TEST_F(Qrtr, RequestsToAHubThatReadsNothingEndAtTheirLimit) {
  greet();
  const Packet packet(60'000, 1);
  int result = 0;
  auto begin = SteadyClock::now();
  for (int i = 0; i < 10'000 && result == 0; ++i) {
    begin = SteadyClock::now();
    result = transport->Send(packet);
  }
  EXPECT_EQ(result, -ETIMEDOUT);
  EXPECT_GE(SteadyClock::now() - begin, QrtrSocket::kSendLimit);
  EXPECT_EQ(atHub(), packet);
  EXPECT_EQ(transport->Send(packet), ssc::kOk);  // there is room again
}

TEST_F(Qrtr, ClientThatReadsNothingRefusesInsteadOfHoldingTheHubUp) {
  greet();
  const int count = fillClient();
  // Megabytes: the family's default takes a few packets of this size.
  EXPECT_GT(count, 50);
  drainClient(count);
  EXPECT_EQ(hub->Send(client, Packet{1}), 0);
  EXPECT_EQ(atClient(), "<1>");
}

TEST_F(Qrtr, DepartureWhoseNoticeWasLostIsFoundOutInTheSilence) {
  greet();
  const int count = fillClient();
  hub->Close();
  drainClient(count);
  const auto begin = SteadyClock::now();
  EXPECT_EQ(atClient(), "down");
  EXPECT_GT(SteadyClock::now() - begin, std::chrono::milliseconds(500));  // no notice came
  EXPECT_EQ(transport->Send(Packet{7}), ssc::kNotConnected);
  ASSERT_EQ(hub->Open(), 0);
  EXPECT_EQ(atClient(), "up");
}

TEST_F(Qrtr, DepartureWhoseNoticeWasLostIsFoundOutBySending) {
  greet();
  const int count = fillClient();
  hub->Close();
  EXPECT_EQ(transport->Send(Packet{7}), ssc::kNotConnected);
  // What it sent before came from a hub that is there no more.
  EXPECT_EQ(atClient(), "down");
  EXPECT_GT(count, 0);
}

TEST_F(Qrtr, ReturnOfWhichNothingWasHeardIsFoundOutInTheSilence) {
  greet();
  const int count = fillClient();
  hub->Close();
  const auto squatter = QrtrSocket::Open();
  (void)squatter->Send({1, 0x3fff}, Packet{1});  // binds it to the hub's old port
  ASSERT_EQ(hub->Open(), 0);
  drainClient(count);
  EXPECT_EQ(atClient(), "down");
  EXPECT_EQ(atClient(), "up");
  EXPECT_EQ(transport->Send(Packet{8}), ssc::kOk);
  EXPECT_EQ(atHub(), Packet{8});
}

}  // namespace
