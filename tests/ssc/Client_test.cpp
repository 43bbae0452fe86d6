// Requests as they are encoded, and the episode of SendRequestsAndWait.
#include "ssc/Client.h"

#include <chrono>
#include <cmath>
#include <limits>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "ssc/FakeHub.h"
#include "ssc/HubServer.h"
#include "ssc/TestClient.h"
#include "ssc/transport/UnixTransport.h"

namespace {

using namespace ssctest;
using namespace std::chrono_literals;
using ssc::Client;
using ssc::Clock;

sns_client_request_msg parsed(const std::string& request) {
  sns_client_request_msg message;
  EXPECT_TRUE(message.ParseFromString(request));
  return message;
}

TEST(ClientRequests, BareRequestNamesSensorProcessorAndDeliveryAndHasAnEmptyRequest) {
  const sns_client_request_msg request = Client::MakeRequest({0x1122334455667788, 0x99aabbccddeeff00});
  EXPECT_EQ(request.suid().suid_low(), 0x1122334455667788U);
  EXPECT_EQ(request.suid().suid_high(), 0x99aabbccddeeff00U);
  EXPECT_EQ(request.susp_config().client_proc_type(), 1);
  EXPECT_EQ(request.susp_config().delivery_type(), 0);
  EXPECT_TRUE(request.has_request());
  EXPECT_EQ(request.request().ByteSizeLong(), 0U);
  EXPECT_FALSE(request.has_msg_id());
}

TEST(ClientRequests, ConfigRequestHasTheDocumentedBytes) {
  const std::string request = Client::MakeConfigRequest({1, 2}, 20, 0);
  const char expected[] =
      "\x0a\x12\x09\x01\0\0\0\0\0\0\0\x11\x02\0\0\0\0\0\0\0"  // suid: low, high
      "\x15\x01\x02\0\0"                                      // msg_id 513, fixed32
      "\x1a\x04\x08\x01\x10\0"                                // susp_config
      "\x22\x07\x12\x05\x0d\0\0\xa0\x41";                     // request: payload: rate 20.0
  EXPECT_EQ(request, std::string(expected, sizeof expected - 1));
}

TEST(ClientRequests, ConfigRequestStreamsAtARateAboveZeroOnly) {
  for (const float rate : {0.001F, 5.0F, std::numeric_limits<float>::infinity()}) {
    const auto request = parsed(Client::MakeConfigRequest(kSensor, rate, 0));
    EXPECT_EQ(request.msg_id(), 513U);
    sns_std_sensor_config config;
    ASSERT_TRUE(config.ParseFromString(request.request().payload()));
    EXPECT_EQ(config.sample_rate(), rate);
    EXPECT_FALSE(request.request().has_batching());
  }
  for (const float rate : {0.0F, -0.0F, -1.0F, std::numeric_limits<float>::quiet_NaN()}) {
    const auto request = parsed(Client::MakeConfigRequest(kSensor, rate, 0));
    EXPECT_EQ(request.msg_id(), 514U) << rate;
    EXPECT_FALSE(request.request().has_payload());
    EXPECT_TRUE(request.has_request());
  }
}

TEST(ClientRequests, BatchPeriodIsPassedOn) {
  EXPECT_EQ(parsed(Client::MakeConfigRequest(kSensor, 5, 250000)).request().batching().batch_period(),
            250000U);
  EXPECT_EQ(parsed(Client::MakeConfigRequest(kSensor, 0, 7)).request().batching().batch_period(), 7U);
}

TEST(ClientRequests, DisableRequestIsMessageTenWithoutAPayload) {
  const auto request = parsed(Client::MakeDisableRequest(kSensor));
  EXPECT_EQ(request.msg_id(), 10U);
  EXPECT_TRUE(request.has_request());
  EXPECT_FALSE(request.request().has_payload());
  EXPECT_EQ(ssc::SensorUid(request.suid()), kSensor);
}

TEST(ClientRequests, FactoryTestRequestIsMessage515OfTypeTwo) {
  const auto request = parsed(Client::MakeFactoryTestRequest(kSensor));
  EXPECT_EQ(request.msg_id(), 515U);
  sns_physical_sensor_test_config config;
  ASSERT_TRUE(config.ParseFromString(request.request().payload()));
  EXPECT_EQ(config.test_type(), 2);
}

TEST(ClientSendRequests, StopsAtTheFirstThatFails) {
  const SimulatedRig rig([](const Request& request) {
    return Outgoings{request.suid() == kOtherSensor ? refuse(request) : accept(request)};
  });
  TestClient client(rig.connection.get());
  std::vector<ssc::Response> responses;
  const std::string good = Client::MakeDisableRequest(kSensor);
  const std::string bad = Client::MakeDisableRequest(kOtherSensor);
  EXPECT_EQ(client.SendRequests({good, good, bad, good}, &responses), ssc::kIoError);
  EXPECT_EQ(rig.requests().size(), 3U);
  EXPECT_EQ(responses.size(), 2U);
  EXPECT_EQ(client.SendRequests({}, &responses), ssc::kOk);
  EXPECT_EQ(client.SendRequests({good}, nullptr), ssc::kOk);
}

TEST(ClientSendRequests, WaitsForEachResponseBeforeTheNext) {
  std::vector<Clock::TimePoint> arrivals;
  const SimulatedRig* rigs = nullptr;
  const SimulatedRig rig([&](const Request& request) {
    arrivals.push_back(rigs->now());
    return Outgoings{accept(request, 10ms)};
  });
  rigs = &rig;
  TestClient client(rig.connection.get());
  const std::string request = Client::MakeDisableRequest(kSensor);
  EXPECT_EQ(client.SendRequests({request, request, request}, nullptr), ssc::kOk);
  EXPECT_EQ(arrivals, (std::vector<Clock::TimePoint>{Clock::TimePoint{}, Clock::TimePoint(10ms),
                                                     Clock::TimePoint(20ms)}));
}

/// One episode with a stream of events every millisecond.
class Episode : public testing::Test {
 protected:
  Episode()
      : rig_([this](const Request& request) -> Outgoings {
          if (refuse_) return {refuse(request)};
          return Outgoings{accept(request)} + stream(kSensor, 50, 1ms, 1ms);
        }),
        client_(rig_.connection.get()) {
    client_.wakeAlways = false;
  }
  template <class Duration>
  int run(Duration timeout, std::vector<ssc::Response>* responses = nullptr) {
    return client_.SendRequestsAndWait({Client::MakeConfigRequest(kSensor, 20, 0)}, timeout, responses);
  }

  bool refuse_ = false;
  SimulatedRig rig_;
  TestClient client_;
};

TEST_F(Episode, RunsOutAfterExactlyItsTimeInWhateverUnitItIsGiven) {
  EXPECT_EQ(run(2s), ssc::kTimedOut);
  EXPECT_EQ(rig_.now(), Clock::TimePoint(2s));
  EXPECT_EQ(run(1500ms), ssc::kTimedOut);
  EXPECT_EQ(rig_.now(), Clock::TimePoint(3500ms));
  EXPECT_EQ(run(1us), ssc::kTimedOut);
  EXPECT_EQ(run(std::chrono::duration<double>(0.25)), ssc::kTimedOut);
  EXPECT_EQ(run(std::chrono::duration<float, std::milli>(0.5F)), ssc::kTimedOut);
  EXPECT_EQ(run(1min), ssc::kTimedOut);
  EXPECT_EQ(rig_.now(), Clock::TimePoint(63'750'501us));
}

TEST_F(Episode, DeliversWhatCameWithinItsTimeAndNothingAfterIt) {
  EXPECT_EQ(run(5ms), ssc::kTimedOut);
  EXPECT_EQ(client_.values(), countUp(5));
  rig_.connection->clock().sleepFor(1s);
  EXPECT_EQ(client_.values(), countUp(5));
}

TEST_F(Episode, OfNoOrNegativeTimeSendsTheRequestsAndTimesOutAtOnce) {
  EXPECT_EQ(run(0s), ssc::kTimedOut);
  EXPECT_EQ(run(-5s), ssc::kTimedOut);
  EXPECT_EQ(run(std::chrono::milliseconds::min()), ssc::kTimedOut);
  EXPECT_EQ(run(std::chrono::duration<double>(std::nan(""))), ssc::kTimedOut);
  EXPECT_EQ(rig_.requests().size(), 4U);
  EXPECT_EQ(rig_.now(), Clock::TimePoint{});
  EXPECT_TRUE(client_.values().empty());
}

TEST_F(Episode, EndedByAHandlerGivesTheStatus) {
  client_.onEvent = [&](const sns_client_event_msg&) {
    if (client_.heldValues().size() == 3) client_.End(-42);
  };
  EXPECT_EQ(run(1h), -42);
  EXPECT_EQ(rig_.now(), Clock::TimePoint(3ms));
  EXPECT_EQ(client_.values(), countUp(3));
}

TEST_F(Episode, EndedByANotificationThatLeavesTheStatusAloneGivesIt) {
  // One wait and no predicate: whoever notifies ends the episode.
  {
    const std::lock_guard<std::mutex> guard(client_.clientMutex());
    client_.SetStatus(-77);
  }
  client_.onEvent = [&](const sns_client_event_msg&) { client_.clientCondition().notify_all(); };
  EXPECT_EQ(run(1h), -77);
  EXPECT_EQ(rig_.now(), Clock::TimePoint(1ms));
}

TEST_F(Episode, NotifiedExactlyAtItsEndHasTimedOut) {
  client_.onEvent = [&](const sns_client_event_msg&) {
    if (client_.heldValues().size() == 3) client_.End(0);
  };
  EXPECT_EQ(run(3ms), ssc::kTimedOut);
}

TEST_F(Episode, LongerThanAnyClockReachesIsEndedByAHandlerAsAnyOther) {
  client_.onEvent = [&](const sns_client_event_msg&) { client_.End(5); };
  rig_.connection->clock().sleepFor(1h);
  EXPECT_EQ(run(std::chrono::hours::max()), 5);
  EXPECT_EQ(run(std::chrono::nanoseconds::max()), 5);
  EXPECT_EQ(run(std::chrono::duration<double>(std::numeric_limits<double>::infinity())), 5);
  EXPECT_EQ(rig_.now(), Clock::TimePoint(1h + 2ms));
}

TEST_F(Episode, WhoseSendFailsEndsWithThatResultWithoutWaiting) {
  refuse_ = true;
  EXPECT_EQ(run(1h), ssc::kIoError);
  EXPECT_EQ(rig_.now(), Clock::TimePoint{});
}

TEST_F(Episode, WithoutRequestsJustWaits) {
  EXPECT_EQ(client_.SendRequestsAndWait({}, 4ms, nullptr), ssc::kTimedOut);
  EXPECT_EQ(rig_.now(), Clock::TimePoint(4ms));
}

TEST_F(Episode, ClearsTheResponsesAndFillsThemInTheOrderOfTheRequests) {
  std::vector<ssc::Response> responses(7);
  EXPECT_EQ(run(1ms, &responses), ssc::kTimedOut);
  ASSERT_EQ(responses.size(), 1U);
  EXPECT_EQ(responses[0].clientId, 77U);
  refuse_ = true;
  EXPECT_EQ(run(1ms, &responses), ssc::kIoError);
  EXPECT_TRUE(responses.empty());
}

TEST_F(Episode, OfTimeThatIsUpStillClearsTheResponses) {
  std::vector<ssc::Response> responses(7);
  EXPECT_EQ(client_.SendRequestsAndWait({}, 0s, &responses), ssc::kTimedOut);
  EXPECT_TRUE(responses.empty());
}

TEST(EpisodeOverAReturn, IsEndedByItsOwnHandler) {
  const SimulatedRig rig(acceptAll, {goAway(10ms), comeBack(20ms), goAway(30ms)});
  TestClient client(rig.connection.get());
  client.wakeAlways = false;
  client.onReconnect = [&] { client.End(-11); };
  EXPECT_EQ(client.SendRequestsAndWait({Client::MakeConfigRequest(kSensor, 20, 0)}, 1s, nullptr), -11);
  EXPECT_EQ(client.changes(), "dr");
  EXPECT_EQ(rig.now(), Clock::TimePoint(20ms));
}

TEST(EpisodeInRealTime, DeadlineBeyondTheSystemClockIsEndedByAHandler) {
  HubServer server(
      [](const Request& request) { return Outgoings{accept(request)} + stream(kSensor, 1, 0ns, 0ns); });
  ssc::HubLink link;
  link.clock = std::make_unique<ssc::RealClock>();
  ASSERT_EQ(ssc::UnixTransport::Connect(server.path(), &link.transport), ssc::kOk);
  const auto connection = ssc::Connection::Over(std::move(link));
  TestClient client(connection.get());
  client.wakeAlways = false;
  client.onEvent = [&](const sns_client_event_msg&) { client.End(9); };
  const std::vector<std::string> requests{Client::MakeConfigRequest(kSensor, 20, 0)};
  EXPECT_EQ(client.SendRequestsAndWait(requests, std::chrono::hours::max(), nullptr), 9);
  EXPECT_EQ(client.SendRequestsAndWait(requests, 9'223'372'036s, nullptr), 9);
}

TEST(EpisodeInRealTime, RunsOut) {
  HubServer server(acceptAll);
  ssc::HubLink link;
  link.clock = std::make_unique<ssc::RealClock>();
  ASSERT_EQ(ssc::UnixTransport::Connect(server.path(), &link.transport), ssc::kOk);
  const auto connection = ssc::Connection::Over(std::move(link));
  TestClient client(connection.get());
  const auto start = connection->clock().now();
  EXPECT_EQ(client.SendRequestsAndWait({Client::MakeConfigRequest(kSensor, 20, 0)}, 5ms, nullptr),
            ssc::kTimedOut);
  EXPECT_GE(connection->clock().now() - start, 5ms);
}

}  // namespace
