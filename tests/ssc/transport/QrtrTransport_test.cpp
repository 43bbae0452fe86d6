#include "ssc/transport/QrtrTransport.h"

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "ssc/Results.h"
#include "ssc/transport/FakeQrtrSocket.h"

namespace {

using namespace ssctest;
using ssc::Clock;
using ssc::Incoming;
using ssc::Transport;
using Outcome = ssc::Transport::Outcome;

constexpr Address kHub{9, 0x4007};
constexpr Address kSecondHub{9, 0x4008};
constexpr Address kStranger{9, 0x4111};

constexpr std::chrono::seconds kSilence = ssc::QrtrTransport::kSilence;

/// Time that the test sets.
class SetClock final : public Clock {
 public:
  [[nodiscard]] TimePoint now() const override { return time; }
  void wait(ssc::Condition&, std::unique_lock<std::mutex>&, Duration) override {}
  void notifyAll(ssc::Condition&) override {}
  void sleepFor(Duration duration) override { time += duration; }

  TimePoint time{std::chrono::hours(1)};
};

class QrtrTransportTest : public testing::Test {
 protected:
  int connect() {
    traffic_->packetTaken = [this] { clock_->time += traffic_->timePerPacket; };
    return ssc::QrtrTransport::ConnectOver(std::make_unique<FakeQrtrSocket>(traffic_), clock_, &transport_,
                                           &reason_);
  }
  void connectToHub() {
    traffic_->control(newServer(kHub));
    traffic_->control(endOfList());
    ASSERT_EQ(connect(), ssc::kOk);
    traffic_->sent.clear();
  }
  /// Everything that comes in until nothing does: "<bytes>" a datagram, "down", "up", "interrupted".
  std::string received() {
    std::string all;
    Incoming incoming;
    for (int i = 0; i < 100; ++i) {
      switch (transport_->Receive(Clock::TimePoint{}, &incoming)) {
        case Outcome::kDeadline:
          return all;
        case Outcome::kInterrupted:
          all += "interrupted ";
          break;
        case Outcome::kIncoming:
          if (incoming.kind == Incoming::Kind::kDatagram) {
            all += "<" + std::string(incoming.datagram.begin(), incoming.datagram.end()) + "> ";
          } else {
            EXPECT_TRUE(incoming.datagram.empty());
            all += incoming.kind == Incoming::Kind::kDown ? "down " : "up ";
          }
          break;
      }
    }
    return all + "without end";
  }
  /// The destination of one more datagram, {0, 0} when it is not sent.
  Address destination() {
    const std::size_t before = traffic_->sent.size();
    const int result = transport_->Send(Datagram{1});
    const bool sent = traffic_->sent.size() > before;
    EXPECT_EQ(result, sent ? ssc::kOk : ssc::kNotConnected);
    return sent ? traffic_->sent.back().address : Address{};
  }

  /// Lets so much time pass without a word from anybody.
  void silence(Clock::Duration duration) {
    clock_->time += duration;
    EXPECT_EQ(received(), "");
  }
  /// How often the name service was asked for its list.
  [[nodiscard]] std::size_t lookups() const {
    return static_cast<std::size_t>(
        std::count_if(traffic_->sent.begin(), traffic_->sent.end(), [](const auto& packet) {
          return packet.address == kNameService && packet.bytes[0] == QRTR_TYPE_NEW_LOOKUP;
        }));
  }

  std::shared_ptr<QrtrTraffic> traffic_ = std::make_shared<QrtrTraffic>();
  std::shared_ptr<SetClock> clock_ = std::make_shared<SetClock>();
  std::unique_ptr<Transport> transport_;
  std::string reason_;
};

TEST_F(QrtrTransportTest, AsksTheLocalNameServiceForTheHubsService) {
  traffic_->control(newServer(kHub));
  traffic_->control(endOfList());
  ASSERT_EQ(connect(), ssc::kOk);
  ASSERT_EQ(traffic_->sent.size(), 1U);
  EXPECT_EQ(traffic_->sent[0].address, (Address{1, 0xfffffffe}));
  EXPECT_EQ(traffic_->sent[0].bytes,
            (Datagram{10, 0, 0, 0, 0x90, 1, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0}));
}

TEST_F(QrtrTransportTest, SendsToTheServerThatWasFoundAndTakesWhatItSends) {
  connectToHub();
  EXPECT_EQ(transport_->Send(Datagram{1, 2, 3}), ssc::kOk);
  ASSERT_EQ(traffic_->sent.size(), 1U);
  EXPECT_EQ(traffic_->sent[0].address, kHub);
  EXPECT_EQ(traffic_->sent[0].bytes, (Datagram{1, 2, 3}));
  traffic_->from(kHub, {'a'});
  traffic_->from(kHub, {'b'});
  EXPECT_EQ(received(), "<a> <b> ");
}

TEST_F(QrtrTransportTest, MachineWithoutQrtrHasNoHub) {
  errno = EAFNOSUPPORT;
  EXPECT_EQ(ssc::QrtrTransport::ConnectOver(nullptr, clock_, &transport_, &reason_), ssc::kNoHub);
  EXPECT_EQ(transport_, nullptr);
  EXPECT_EQ(reason_,
            "QRTR, which leads to service 400, cannot be used on this machine "
            "(Address family not supported by protocol)");
}

TEST_F(QrtrTransportTest, NameServiceThatCannotBeAskedMeansNoHub) {
  traffic_->lookupResult = -ENODEV;
  traffic_->control(newServer(kHub));
  EXPECT_EQ(connect(), ssc::kNoHub);
  EXPECT_EQ(reason_, "QRTR's name service cannot be asked for service 400 (No such device)");
}

TEST_F(QrtrTransportTest, ListWithoutTheServiceMeansNoHub) {
  traffic_->control(ControlPacket{QRTR_TYPE_NEW_SERVER, 401, 1, kHub}.bytes());
  traffic_->control(endOfList());
  traffic_->control(newServer(kHub));  // too late: the list has ended
  EXPECT_EQ(connect(), ssc::kNoHub);
  EXPECT_EQ(transport_, nullptr);
  EXPECT_EQ(reason_, "QRTR's name service knows no service 400");
}

TEST_F(QrtrTransportTest, NoAnswerMeansNoHub) {
  EXPECT_EQ(connect(), ssc::kNoHub);
  EXPECT_EQ(reason_, "QRTR's name service did not say within 1 s whether there is a service 400");
  traffic_->failures = 1;
  EXPECT_EQ(connect(), ssc::kNoHub);
}

TEST_F(QrtrTransportTest, StrangersDoNotHoldTheSearchUp) {
  for (int i = 0; i < 100; ++i) traffic_->from(kStranger, {'x'});
  traffic_->control(newServer(kHub));
  traffic_->control(endOfList());
  traffic_->timePerPacket = std::chrono::milliseconds(100);
  EXPECT_EQ(connect(), ssc::kNoHub);
  EXPECT_GT(traffic_->incoming.size(), 80U);
}

TEST_F(QrtrTransportTest, ServerFoundCountsThoughTheEndOfTheListWasLost) {
  traffic_->control(newServer(kHub));
  ASSERT_EQ(connect(), ssc::kOk);
  EXPECT_EQ(destination(), kHub);
}

TEST_F(QrtrTransportTest, InstanceMayCarryAVersion) {
  traffic_->control(newServer(kHub, 0x00000203));
  traffic_->control(endOfList());
  ASSERT_EQ(connect(), ssc::kOk);
  traffic_->control(delServer(kHub, 0x00000201));
  EXPECT_EQ(received(), "down ");
}

TEST_F(QrtrTransportTest, AnnouncementsByAnybodyButTheNameServiceDoNotCount) {
  traffic_->from(kStranger, newServer(kStranger));
  traffic_->control(newServer(kHub));
  traffic_->from(kStranger, endOfList());
  traffic_->control(endOfList());
  ASSERT_EQ(connect(), ssc::kOk);
  EXPECT_EQ(destination(), kHub);
  traffic_->from(kStranger, delServer(kHub));
  EXPECT_EQ(received(), "");
}

TEST_F(QrtrTransportTest, CutAndUnknownControlPacketsAreIgnored) {
  for (std::size_t size = 0; size < 20; ++size) {
    Datagram cut = newServer(kStranger);
    cut.resize(size);
    traffic_->control(cut);
  }
  traffic_->control(newServer(kHub));
  traffic_->control(endOfList());
  ASSERT_EQ(connect(), ssc::kOk);
  for (std::size_t size = 0; size < 20; ++size) {
    for (Datagram cut : {delServer(kHub), bye(kHub.node), newServer(kHub)}) {
      cut.resize(size);
      traffic_->control(cut);
    }
  }
  for (const std::uint32_t command : {0U, 1U, 2U, 6U, 7U, 8U, 9U, 10U, 11U, 12U, 0xffffffffU}) {
    traffic_->control(ControlPacket{command, 400, 1, kHub}.bytes());
  }
  EXPECT_EQ(received(), "");
  EXPECT_EQ(destination(), kHub);
}

TEST_F(QrtrTransportTest, ControlPacketMayBeLongerThanItIsToday) {
  connectToHub();
  Datagram longer = delServer(kHub);
  longer.resize(28);
  traffic_->control(longer);
  EXPECT_EQ(received(), "down ");
}

TEST_F(QrtrTransportTest, DatagramsOfOthersAreDropped) {
  connectToHub();
  traffic_->from(kStranger, {'x'});
  traffic_->from({8, kHub.port}, {'y'});
  traffic_->from(kHub, {'a'});
  EXPECT_EQ(received(), "<a> ");
}

TEST_F(QrtrTransportTest, DepartureAndReturnOfTheServerAreTold) {
  connectToHub();
  traffic_->control(delServer(kHub));
  EXPECT_EQ(received(), "down ");
  EXPECT_EQ(destination(), Address{});
  traffic_->from(kHub, {'x'});  // of a hub that is gone
  traffic_->control(newServer(kHub));
  traffic_->from(kHub, {'a'});
  EXPECT_EQ(received(), "up <a> ");
  EXPECT_EQ(destination(), kHub);
}

TEST_F(QrtrTransportTest, ServerMayReturnAtAnotherPort) {
  connectToHub();
  traffic_->control(delServer(kHub));
  traffic_->control(newServer(kSecondHub));
  traffic_->from(kHub, {'x'});
  traffic_->from(kSecondHub, {'a'});
  EXPECT_EQ(received(), "down up <a> ");
  EXPECT_EQ(destination(), kSecondHub);
}

TEST_F(QrtrTransportTest, DepartureOfOthersIsNothing) {
  connectToHub();
  traffic_->control(delServer(kSecondHub));
  traffic_->control(ControlPacket{QRTR_TYPE_DEL_SERVER, 401, 1, kHub}.bytes());
  traffic_->control(bye(kHub.node + 1));
  EXPECT_EQ(received(), "");
  EXPECT_EQ(destination(), kHub);
}

TEST_F(QrtrTransportTest, NodeThatSaysByeTakesItsServerAlong) {
  connectToHub();
  traffic_->control(bye(kHub.node));
  traffic_->control(delServer(kHub));  // told again
  EXPECT_EQ(received(), "down ");
  traffic_->control(newServer(kHub));
  EXPECT_EQ(received(), "up ");
}

TEST_F(QrtrTransportTest, SamePortAnnouncedAgainIsARestartWhoseDepartureWasLost) {
  connectToHub();
  traffic_->control(newServer(kHub));
  EXPECT_EQ(received(), "down up ");
  EXPECT_EQ(destination(), kHub);
}

TEST_F(QrtrTransportTest, SecondServerChangesNothingWhileTheFirstIsThere) {
  connectToHub();
  traffic_->control(newServer(kSecondHub));
  traffic_->from(kSecondHub, {'x'});
  EXPECT_EQ(received(), "");
  EXPECT_EQ(destination(), kHub);
}

TEST_F(QrtrTransportTest, ServerThatWasAnnouncedBeforeTheFirstOnesDepartureTakesItsPlace) {
  // As after a restart whose two notices came in the other order.
  connectToHub();
  traffic_->control(newServer(kSecondHub));
  traffic_->control(delServer(kHub));
  EXPECT_EQ(received(), "down up ");
  EXPECT_EQ(destination(), kSecondHub);
}

TEST_F(QrtrTransportTest, ServerOfTheListThatIsNotUsedIsRememberedToo) {
  traffic_->control(newServer(kHub));
  traffic_->control(newServer(kSecondHub));
  traffic_->control(endOfList());
  ASSERT_EQ(connect(), ssc::kOk);
  EXPECT_EQ(received(), "");
  EXPECT_EQ(destination(), kHub);
  traffic_->control(bye(kHub.node));  // both are on it
  EXPECT_EQ(received(), "down ");
  EXPECT_EQ(destination(), Address{});
}

TEST_F(QrtrTransportTest, SpareServerThatHasGoneIsNotTaken) {
  connectToHub();
  traffic_->control(newServer(kSecondHub));
  traffic_->control(delServer(kSecondHub));
  traffic_->control(delServer(kHub));
  EXPECT_EQ(received(), "down ");
}

TEST_F(QrtrTransportTest, DeadPortIsNoticedWhenItIsSentTo) {
  for (const int error : {ENODEV, ECONNRESET, EPIPE}) {
    traffic_->incoming.clear();
    connectToHub();
    traffic_->sendResult = -error;
    EXPECT_EQ(transport_->Send(Datagram{1}), ssc::kNotConnected);
    EXPECT_EQ(transport_->Send(Datagram{1}), ssc::kNotConnected);
    EXPECT_EQ(traffic_->interrupts, 1);  // whoever receives is told at once
    EXPECT_EQ(received(), "down interrupted ");
    traffic_->sendResult = 0;
    traffic_->control(newServer(kHub));
    EXPECT_EQ(received(), "up ");
    EXPECT_EQ(destination(), kHub);
  }
}

TEST_F(QrtrTransportTest, SendThatFailsForAnotherReasonKeepsTheConnection) {
  connectToHub();
  for (const int error : {ENOSPC, EMSGSIZE, ENOMEM, EAGAIN}) {
    traffic_->sendResult = -error;
    EXPECT_EQ(transport_->Send(Datagram{1}), -error);
  }
  EXPECT_EQ(received(), "");
  traffic_->sendResult = 0;
  EXPECT_EQ(destination(), kHub);
}

TEST_F(QrtrTransportTest, AfterASilenceTheServersAreListedAgain) {
  connectToHub();
  silence(kSilence - std::chrono::milliseconds(1));
  EXPECT_EQ(lookups(), 0U);
  silence(std::chrono::milliseconds(1));
  EXPECT_EQ(lookups(), 1U);
  traffic_->control(newServer(kHub));
  traffic_->control(endOfList());
  EXPECT_EQ(received(), "");  // still the same hub
  EXPECT_EQ(destination(), kHub);
  silence(kSilence);
  EXPECT_EQ(lookups(), 2U);
}

TEST_F(QrtrTransportTest, WhileTheHubSpeaksNobodyIsAsked) {
  connectToHub();
  for (int i = 0; i < 10; ++i) {
    clock_->time += kSilence / 2;
    traffic_->from(kHub, {'a'});
    EXPECT_EQ(received(), "<a> ");
  }
  EXPECT_EQ(lookups(), 0U);
}

TEST_F(QrtrTransportTest, HubThatIsNotListedAnyMoreHasGone) {
  // The notice was lost, and nothing is sent that would fail.
  connectToHub();
  silence(kSilence);
  traffic_->control(endOfList());
  EXPECT_EQ(received(), "down ");
  EXPECT_EQ(destination(), Address{});
  silence(kSilence);
  EXPECT_EQ(lookups(), 2U);
  traffic_->control(newServer(kSecondHub));  // nor did the notice come that it is back
  traffic_->control(endOfList());
  EXPECT_EQ(received(), "up ");
  EXPECT_EQ(destination(), kSecondHub);
}

TEST_F(QrtrTransportTest, HubThatReturnedElsewhereAfterALostNoticeIsFound) {
  connectToHub();
  traffic_->control(newServer(kSecondHub));
  EXPECT_EQ(received(), "");
  EXPECT_EQ(lookups(), 1U);  // is the first still there?
  traffic_->control(newServer(kSecondHub));
  traffic_->control(endOfList());
  EXPECT_EQ(received(), "down up ");
  EXPECT_EQ(destination(), kSecondHub);
}

TEST_F(QrtrTransportTest, AnnouncementAmongTheListIsARestart) {
  connectToHub();
  silence(kSilence);
  traffic_->control(newServer(kHub));
  traffic_->control(newServer(kHub));
  EXPECT_EQ(received(), "down up ");
  traffic_->control(endOfList());
  EXPECT_EQ(received(), "");
  EXPECT_EQ(destination(), kHub);
}

TEST_F(QrtrTransportTest, DepartureAmongTheListCounts) {
  connectToHub();
  silence(kSilence);
  traffic_->control(newServer(kHub));
  traffic_->control(delServer(kHub));
  traffic_->control(endOfList());
  EXPECT_EQ(received(), "down ");
  traffic_->control(newServer(kHub));
  EXPECT_EQ(received(), "up ");
}

TEST_F(QrtrTransportTest, ServerThatCameBeforeTheListIsNoRestart) {
  connectToHub();
  traffic_->control(delServer(kHub));
  EXPECT_EQ(received(), "down ");
  silence(kSilence);
  traffic_->control(newServer(kHub));  // announced just before the list was made
  traffic_->control(newServer(kHub));
  traffic_->control(endOfList());
  EXPECT_EQ(received(), "up ");
}

TEST_F(QrtrTransportTest, ListThatNobodyTellsIsAskedForLaterAgain) {
  connectToHub();
  silence(kSilence);
  silence(kSilence);
  EXPECT_EQ(lookups(), 1U);
  silence(ssc::QrtrTransport::kListPatience);
  EXPECT_EQ(lookups(), 2U);
  EXPECT_EQ(destination(), kHub);
}

TEST_F(QrtrTransportTest, InterruptEndsAReceive) {
  connectToHub();
  transport_->Interrupt();
  EXPECT_EQ(received(), "interrupted ");
}

TEST_F(QrtrTransportTest, SocketThatFailsMeansAwayUntilTheNameServiceNamesAServerAgain) {
  // As when the name service itself restarts: every armed look-up is forgotten.
  connectToHub();
  traffic_->failures = 1;
  EXPECT_EQ(received(), "down ");
  EXPECT_EQ(destination(), Address{});
  ASSERT_EQ(traffic_->sent.size(), 2U);
  EXPECT_EQ(traffic_->sent[0].address, kNameService);
  EXPECT_EQ(traffic_->sent[0].bytes, ControlPacket({QRTR_TYPE_DEL_LOOKUP, 400, 0, {}}).bytes());
  EXPECT_EQ(traffic_->sent[1].address, kNameService);
  EXPECT_EQ(traffic_->sent[1].bytes, ControlPacket({QRTR_TYPE_NEW_LOOKUP, 400, 0, {}}).bytes());
  traffic_->control(newServer(kHub));
  traffic_->control(endOfList());
  EXPECT_EQ(received(), "up ");
}

TEST_F(QrtrTransportTest, SocketThatFailsAgainAndAgainIsDownOnce) {
  connectToHub();
  traffic_->failures = 5;
  EXPECT_EQ(received(), "down ");
}

TEST_F(QrtrTransportTest, DatagramWithTheControlPortOfANodeIsNoDatagramOfTheHub) {
  connectToHub();
  traffic_->from({kHub.node, QRTR_PORT_CTRL}, {'x'});
  EXPECT_EQ(received(), "");
}

}  // namespace
