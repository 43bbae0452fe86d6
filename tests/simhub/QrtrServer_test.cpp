#include "simhub/QrtrServer.h"

#include <cerrno>
#include <chrono>
#include <deque>
#include <functional>

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/eventfd.h>

#include "simhub/Descriptor.h"
#include "simhub/HubHarness.h"
#include "simhub/Protocol.h"
#include "simhub/Suid.h"
#include "simhub/TemporaryFolder.h"

namespace {

using qmi::QrtrAddress;
using simhub::QrtrServer;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::SizeIs;
using SteadyClock = std::chrono::steady_clock;
using Packet = std::vector<std::uint8_t>;

constexpr std::chrono::seconds kPatience{120};
constexpr QrtrAddress kOne{1, 0x4001};
constexpr QrtrAddress kTwo{1, 0x4002};
constexpr QrtrAddress kElsewhere{9, 0x4001};
constexpr QrtrAddress kNameService{1, QRTR_PORT_CTRL};
const simhub::Suid kPressure = simhub::suidForName("pressure");

/// What the test and the port, which the server owns, share.
struct Traffic {
  std::deque<std::pair<QrtrAddress, Packet>> incoming;
  std::map<QrtrAddress, std::vector<Packet>> sent;
  std::function<int(const QrtrAddress&)> sendResult = [](const QrtrAddress&) { return 0; };
  int openResult = 0;
  int receiveFailures = 0;
  int opened = 0;
  bool isOpen = false;
};

/// A port that always seems to have something.
class FakePort final : public simhub::QrtrPort {
 public:
  explicit FakePort(std::shared_ptr<Traffic> traffic)
      : traffic_(std::move(traffic)), readable_(::eventfd(1, EFD_CLOEXEC)) {}

  int Open() override {
    traffic_->isOpen = traffic_->openResult == 0;
    if (traffic_->isOpen) ++traffic_->opened;
    return traffic_->openResult;
  }
  void Close() override { traffic_->isOpen = false; }
  int descriptor() const override { return traffic_->isOpen ? readable_.get() : -1; }
  std::uint32_t LocalNode() const override { return 1; }
  int Send(const QrtrAddress& to, qmi::Bytes packet) override {
    const int result = traffic_->sendResult(to);
    if (result == 0) traffic_->sent[to].emplace_back(packet.begin(), packet.end());
    return result;
  }
  int Receive(QrtrAddress* from, Packet* packet) override {
    if (traffic_->receiveFailures > 0) {
      --traffic_->receiveFailures;
      return -ENETRESET;
    }
    if (traffic_->incoming.empty()) return -EAGAIN;
    std::tie(*from, *packet) = std::move(traffic_->incoming.front());
    traffic_->incoming.pop_front();
    return 0;
  }

 private:
  std::shared_ptr<Traffic> traffic_;
  simhub::Descriptor readable_;
};

class QrtrServerTest : public testing::Test {
 protected:
  void start(const std::vector<std::string>& overrides = {}, double speed = 1) {
    simhub::Scenario scenario;
    ASSERT_TRUE(simhub::loadScenario("o1v1", overrides, &scenario, &error)) << error;
    simhub::HubServerOptions options;
    options.files.registryFolder = folder.Path("registry");
    options.speed = speed;
    server = QrtrServer::Create(
        options, std::make_unique<FakePort>(traffic), std::move(scenario),
        [this](const std::string& text) { diagnostics.push_back(text); }, &error);
  }

  void send(const QrtrAddress& from, std::uint32_t messageId, const std::string& payload = {}) {
    traffic->incoming.emplace_back(from, requestDatagram(++transaction, kPressure, messageId, payload));
  }
  void control(std::uint32_t command, const QrtrAddress& client) {
    traffic->incoming.emplace_back(kNameService,
                                   qmi::encodeQrtrControl({command, client.node, client.port, {}}));
  }

  /// Runs the server round by round until `done`, for at most kPatience.
  template <class Done>
  [[nodiscard]] bool runUntil(Done done) {
    const auto deadline = SteadyClock::now() + kPatience;
    while (!done()) {
      if (SteadyClock::now() > deadline) return false;
      round();
    }
    return true;
  }
  void round() {
    bool stopped = false;
    EXPECT_EQ(server->Round(std::chrono::milliseconds(1), -1, &stopped), 0);
  }
  [[nodiscard]] std::size_t reports(const QrtrAddress& to) const {
    std::size_t count = 0;
    const auto found = traffic->sent.find(to);
    if (found == traffic->sent.end()) return 0;
    for (const Packet& packet : found->second) count += qmi::decodeReport(packet) ? 1 : 0;
    return count;
  }

  TemporaryFolder folder;
  std::shared_ptr<Traffic> traffic = std::make_shared<Traffic>();
  std::unique_ptr<QrtrServer> server;
  std::string error;
  std::vector<std::string> diagnostics;
  std::uint16_t transaction = 0;
};

TEST_F(QrtrServerTest, AnswersWhoeverSendsARequest) {
  start();
  ASSERT_NE(server, nullptr) << error;
  EXPECT_EQ(traffic->opened, 1);
  send(kOne, simhub::kAttributesRequest);
  ASSERT_TRUE(runUntil([&] { return traffic->sent[kOne].size() == 2; }));
  EXPECT_TRUE(qmi::decodeResponse(traffic->sent[kOne][0]));
  EXPECT_TRUE(qmi::decodeReport(traffic->sent[kOne][1]));
  EXPECT_EQ(server->ClientCount(), 1U);
}

TEST_F(QrtrServerTest, MachineWithoutQrtrIsSaid) {
  traffic->openResult = -EAFNOSUPPORT;
  start();
  EXPECT_EQ(server, nullptr);
  EXPECT_EQ(error, "QRTR cannot be used on this machine: Address family not supported by protocol");
}

TEST_F(QrtrServerTest, EachAddressIsAClientWithStreamsOfItsOwn) {
  start({}, 100);
  send(kOne, simhub::kStreamConfigRequest, ratePayload(20));
  ASSERT_TRUE(runUntil([&] { return reports(kOne) >= 5; }));
  send(kTwo, simhub::kAttributesRequest);
  ASSERT_TRUE(runUntil([&] { return reports(kTwo) >= 1; }));
  EXPECT_EQ(reports(kTwo), 1U);
  EXPECT_EQ(server->ClientCount(), 2U);
}

TEST_F(QrtrServerTest, ClientThatHasGoneGetsNothingMoreNorDoesItsPortsNextOwner) {
  start({}, 100);
  send(kOne, simhub::kStreamConfigRequest, ratePayload(20));
  send(kTwo, simhub::kStreamConfigRequest, ratePayload(20));
  ASSERT_TRUE(runUntil([&] { return reports(kOne) >= 2; }));
  control(QRTR_TYPE_DEL_CLIENT, kOne);
  send(kOne, simhub::kAttributesRequest);  // somebody else, at the same port
  ASSERT_TRUE(runUntil([&] { return traffic->incoming.empty(); }));
  traffic->sent.clear();
  ASSERT_TRUE(runUntil([&] { return reports(kTwo) >= 10; }));
  EXPECT_LE(reports(kOne), 1U);  // the attributes
  EXPECT_EQ(server->ClientCount(), 2U);
}

TEST_F(QrtrServerTest, EndsOfSocketsThatNeverSpokeAndStrangePacketsAreNothing) {
  start();
  send(kOne, simhub::kAttributesRequest);
  control(QRTR_TYPE_DEL_CLIENT, kTwo);
  control(QRTR_TYPE_BYE, kElsewhere);
  control(QRTR_TYPE_HELLO, kOne);
  traffic->incoming.emplace_back(kNameService, Packet{1, 2, 3});
  ASSERT_TRUE(runUntil([&] { return traffic->incoming.empty(); }));
  EXPECT_EQ(server->ClientCount(), 1U);
  control(QRTR_TYPE_BYE, kOne);
  ASSERT_TRUE(runUntil([&] { return server->ClientCount() == 0; }));
}

TEST_F(QrtrServerTest, OtherProcessorsAreNotServed) {
  start();
  send(kElsewhere, simhub::kAttributesRequest);
  ASSERT_TRUE(runUntil([&] { return traffic->incoming.empty(); }));
  EXPECT_EQ(server->ClientCount(), 0U);
}

TEST_F(QrtrServerTest, MalformedDatagramsAreTold) {
  start();
  traffic->incoming.emplace_back(kOne, Packet{1, 2, 3});
  ASSERT_TRUE(runUntil([&] { return traffic->incoming.empty(); }));
  EXPECT_THAT(diagnostics, SizeIs(1));
}

TEST_F(QrtrServerTest, WhatDoesNotFitIntoAQueueFollowsInOrder) {
  start({}, 100);
  bool isFull = false;
  traffic->sendResult = [&](const QrtrAddress&) { return isFull ? -ENOSPC : 0; };
  send(kOne, simhub::kStreamConfigRequest, ratePayload(20));
  ASSERT_TRUE(runUntil([&] { return reports(kOne) >= 3; }));
  isFull = true;
  const std::size_t before = reports(kOne);
  const auto until = SteadyClock::now() + std::chrono::milliseconds(10);  // a second of the hub's time
  ASSERT_TRUE(runUntil([&] { return SteadyClock::now() > until; }));
  EXPECT_EQ(reports(kOne), before);
  isFull = false;
  ASSERT_TRUE(runUntil([&] { return reports(kOne) >= before + 20; }));
  std::uint64_t last = 0;
  for (const Packet& packet : traffic->sent[kOne]) {
    const auto report = qmi::decodeReport(packet);
    if (!report) continue;
    sns_client_event_msg message;
    ASSERT_TRUE(message.ParseFromArray(report->payload.data(), static_cast<int>(report->payload.size())));
    if (last != 0) {
      ASSERT_EQ(message.events(0).timestamp(), last + 960'000);
    }
    last = message.events(0).timestamp();
  }
}

TEST_F(QrtrServerTest, ClientThatNeverReadsIsGivenUp) {
  start({"sensor.pressure.rates=[100000]"}, 1000);
  traffic->sendResult = [](const QrtrAddress& to) { return to == kOne ? -ENOSPC : 0; };
  send(kOne, simhub::kStreamConfigRequest, ratePayload(100'000));
  send(kTwo, simhub::kAttributesRequest);
  ASSERT_TRUE(runUntil([&] { return server->ClientCount() == 2; }));
  ASSERT_TRUE(runUntil([&] { return server->ClientCount() == 1; }));
  EXPECT_THAT(diagnostics, ElementsAre(HasSubstr("does not read")));
  EXPECT_EQ(reports(kTwo), 1U);
}

TEST_F(QrtrServerTest, DeadPortIsNoticedWhenItIsSentTo) {
  start({}, 100);
  traffic->sendResult = [](const QrtrAddress&) { return -ENODEV; };
  send(kOne, simhub::kStreamConfigRequest, ratePayload(20));
  ASSERT_TRUE(runUntil([&] { return traffic->incoming.empty(); }));
  ASSERT_TRUE(runUntil([&] { return server->ClientCount() == 0; }));
  EXPECT_TRUE(traffic->isOpen);
}

TEST_F(QrtrServerTest, ReportThatIsTooLargeIsLeftOut) {
  start({}, 100);
  traffic->sendResult = [](const QrtrAddress&) { return -EMSGSIZE; };
  send(kOne, simhub::kAttributesRequest);
  ASSERT_TRUE(runUntil([&] { return diagnostics.size() == 2; }));
  EXPECT_THAT(diagnostics[0], HasSubstr("too large for QRTR"));
  EXPECT_EQ(server->ClientCount(), 1U);
}

TEST_F(QrtrServerTest, HubThatGoesAwayGivesItsPortUpAndTakesOneWhenItIsBack) {
  start({"fault.f.kind=hub_away", "fault.f.after=5", "fault.f.down_for=20"}, 100);
  send(kOne, simhub::kStreamConfigRequest, ratePayload(20));
  ASSERT_TRUE(runUntil([&] { return !traffic->isOpen; }));
  EXPECT_EQ(server->ClientCount(), 0U);
  ASSERT_TRUE(runUntil([&] { return traffic->isOpen; }));
  EXPECT_EQ(traffic->opened, 2);
  const std::size_t before = reports(kOne);
  send(kOne, simhub::kAttributesRequest);
  ASSERT_TRUE(runUntil([&] { return reports(kOne) == before + 1; }));
}

TEST_F(QrtrServerTest, RegistersAnewWhenTheNameServiceHasRestarted) {
  start();
  send(kOne, simhub::kAttributesRequest);
  ASSERT_TRUE(runUntil([&] { return server->ClientCount() == 1; }));
  traffic->receiveFailures = 1;
  ASSERT_TRUE(runUntil([&] { return traffic->opened == 2; }));
  EXPECT_EQ(server->ClientCount(), 0U);
  traffic->openResult = -ENODEV;
  traffic->receiveFailures = 1;
  ASSERT_TRUE(runUntil([&] { return !diagnostics.empty(); }));
  EXPECT_THAT(diagnostics, ElementsAre("the hub is back but cannot be reached: No such device"));
}

}  // namespace
