// What a request comes to, and who gets an event: over a hub in simulated time.
#include "ssc/Connection.h"

#include <chrono>
#include <set>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "ssc/FakeHub.h"
#include "ssc/TestClient.h"

namespace {

using namespace ssctest;
using namespace std::chrono_literals;
using ssc::Client;
using ssc::Clock;

std::string configRequest(const ssc::SensorUid& suid = kSensor) {
  return Client::MakeConfigRequest(suid, 20, 0);
}

TEST(ConnectionRequest, ReachesTheHubAsItIsAndReportsTheResponse) {
  const SimulatedRig rig([](const Request& request) { return Outgoings{accept(request, 5ms)}; });
  TestClient client(rig.connection.get());
  ssc::Response response;
  EXPECT_EQ(client.SendRequest(configRequest(), &response), ssc::kOk);
  EXPECT_EQ(response.result, 0);
  EXPECT_EQ(response.error, 0);
  EXPECT_EQ(response.clientId, 77U);
  EXPECT_EQ(response.response, 88U);
  EXPECT_EQ(rig.now(), Clock::TimePoint(5ms));
  ASSERT_EQ(rig.requests().size(), 1U);
  EXPECT_EQ(rig.requests()[0].message.SerializeAsString(), configRequest());
  EXPECT_EQ(rig.requests()[0].reportType, 1);
  EXPECT_NE(rig.requests()[0].transactionId, 0);
}

TEST(ConnectionRequest, RefusedByTheHubIsAnIoErrorWithTheHubsReason) {
  const SimulatedRig rig([](const Request& request) { return Outgoings{refuse(request, 48)}; });
  TestClient client(rig.connection.get());
  ssc::Response response;
  EXPECT_EQ(client.SendRequest(configRequest(), &response), ssc::kIoError);
  EXPECT_EQ(response.result, 1);
  EXPECT_EQ(response.error, 48);
}

TEST(ConnectionRequest, WithoutAResponseTimesOutAfterExactlyThreeSeconds) {
  const SimulatedRig rig([](const Request&) { return Outgoings{}; });
  TestClient client(rig.connection.get());
  EXPECT_EQ(client.SendRequest(configRequest()), ssc::kTimedOut);
  EXPECT_EQ(rig.now(), Clock::TimePoint(3s));
}

TEST(ConnectionRequest, WithoutAResponseTimesOutInTimeThoughOtherThingsComeIn) {
  const SimulatedRig rig([](const Request&) { return stream(kSensor, 5000, 0ns, 1ms); });
  TestClient client(rig.connection.get());
  client.Register();
  EXPECT_EQ(client.SendRequest(configRequest()), ssc::kTimedOut);
  client.Unregister();
  EXPECT_EQ(rig.now(), Clock::TimePoint(3s));
}

TEST(ConnectionRequest, ResponseAtTheDeadlineItselfStillCounts) {
  const SimulatedRig rig([](const Request& request) { return Outgoings{accept(request, 3s)}; });
  TestClient client(rig.connection.get());
  EXPECT_EQ(client.SendRequest(configRequest()), ssc::kOk);
  EXPECT_EQ(rig.now(), Clock::TimePoint(3s));
}

TEST(ConnectionRequest, LateResponseIsNotTakenForTheNextRequests) {
  // The first request's answer comes while the second, which is refused later, is under way.
  int count = 0;
  const SimulatedRig rig([&count](const Request& request) -> Outgoings {
    if (count++ == 0) return {accept(request, 3100ms)};
    return {raw(responseDatagram(request.transactionId, 1, 5), 1s)};
  });
  TestClient client(rig.connection.get());
  EXPECT_EQ(client.SendRequest(configRequest()), ssc::kTimedOut);
  ssc::Response response;
  EXPECT_EQ(client.SendRequest(configRequest(), &response), ssc::kIoError);
  EXPECT_EQ(response.error, 5);
  EXPECT_EQ(rig.now(), Clock::TimePoint(4s));
  EXPECT_EQ(rig.connection->malformedCount(), 0U);
}

TEST(ConnectionRequest, ResponseThatNobodyAskedForIsIgnored) {
  const SimulatedRig rig([](const Request& request) -> Outgoings {
    return {raw(responseDatagram(static_cast<std::uint16_t>(request.transactionId + 1), 1)),
            raw(responseDatagram(0, 1)), accept(request), raw(responseDatagram(request.transactionId, 1))};
  });
  TestClient client(rig.connection.get());
  for (int i = 0; i < 3; ++i) EXPECT_EQ(client.SendRequest(configRequest()), ssc::kOk);
}

TEST(ConnectionRequest, EndsAtOnceWhenTheHubGoesAway) {
  const SimulatedRig rig([](const Request&) { return Outgoings{goAway(10ms)}; });
  TestClient client(rig.connection.get());
  EXPECT_EQ(client.SendRequest(configRequest()), ssc::kNotConnected);
  EXPECT_EQ(rig.now(), Clock::TimePoint(10ms));
}

TEST(ConnectionRequest, IsRefusedWhileTheHubIsAwayAndGoesThroughWhenItIsBack) {
  bool away = true;
  const SimulatedRig rig([&away](const Request& request) -> Outgoings {
    if (!away) return {accept(request)};
    away = false;
    return {goAway(), comeBack(1s)};
  });
  TestClient client(rig.connection.get());
  EXPECT_EQ(client.SendRequest(configRequest()), ssc::kNotConnected);
  EXPECT_EQ(client.SendRequest(configRequest()), ssc::kNotConnected);
  EXPECT_EQ(rig.now(), Clock::TimePoint{});
  rig.connection->clock().sleepFor(1s);
  EXPECT_EQ(client.SendRequest(configRequest()), ssc::kOk);
}

TEST(ConnectionRequest, OfAHubThatIsBackAlreadyIsNotAnsweredByTheOldOne) {
  // The request was made of a hub that is gone: its return does not bring it back.
  const SimulatedRig rig([](const Request& request) -> Outgoings {
    return {goAway(), comeBack(), accept(request, 10ms)};
  });
  TestClient client(rig.connection.get());
  EXPECT_EQ(client.SendRequest(configRequest()), ssc::kNotConnected);
  EXPECT_EQ(rig.now(), Clock::TimePoint{});
}

TEST(ConnectionRequest, ThatDoesNotParseOrFitIsInvalidAndNotSent) {
  const SimulatedRig rig(acceptAll);
  TestClient client(rig.connection.get());
  EXPECT_EQ(client.SendRequest(""), ssc::kInvalid);
  EXPECT_EQ(client.SendRequest("\xff\xff\xff"), ssc::kInvalid);
  sns_client_request_msg request = Client::MakeRequest(kSensor);
  EXPECT_EQ(client.SendRequest(request.SerializePartialAsString()), ssc::kInvalid);  // no message id
  request.set_msg_id(1);
  request.mutable_request()->set_payload(std::string(65536, 'x'));
  EXPECT_EQ(client.SendRequest(request.SerializeAsString()), ssc::kInvalid);
  EXPECT_TRUE(rig.requests().empty());

  request.mutable_request()->set_payload(std::string(65000, 'x'));
  EXPECT_EQ(client.SendRequest(request.SerializeAsString()), ssc::kOk);
}

TEST(ConnectionRequest, TransactionIdsIncreaseAndWrapPastZero) {
  const SimulatedRig rig(acceptAll);
  TestClient client(rig.connection.get());
  const std::string request = Client::MakeDisableRequest(kSensor);
  constexpr int kCount = 65540;
  for (int i = 0; i < kCount; ++i) ASSERT_EQ(client.SendRequest(request), ssc::kOk);
  const std::vector<Request> requests = rig.requests();
  ASSERT_EQ(requests.size(), static_cast<std::size_t>(kCount));
  for (std::size_t i = 0; i < requests.size(); ++i) {
    ASSERT_EQ(requests[i].transactionId, i % 65535 + 1) << i;
  }
}

TEST(ConnectionRequest, MalformedDatagramsAreDroppedAndCountedAndTheConnectionGoesOn) {
  sns_client_event_msg incomplete;  // no SUID
  const Outgoings damaged{raw({}),
                          raw({4}),
                          raw({9, 0, 0, 0, 0, 0, 0}),
                          raw({2, 1, 0, 0x20, 0, 0, 0}),  // a response without a result
                          raw({4, 0, 0, 0x21, 0, 0, 0}),  // a report without a payload
                          raw(reportDatagram("\xff\xff no protobuf")),
                          raw(reportDatagram(incomplete.SerializePartialAsString()))};
  const SimulatedRig rig(
      [&](const Request& request) { return damaged + Outgoings{accept(request)} + damaged; });
  TestClient client(rig.connection.get());
  client.Register();
  testing::internal::CaptureStdout();
  EXPECT_EQ(client.SendRequest(configRequest()), ssc::kOk);
  EXPECT_EQ(rig.connection->malformedCount(), damaged.size());
  EXPECT_EQ(client.SendRequest(configRequest()), ssc::kOk);
  rig.connection->clock().sleepFor(1s);
  client.Unregister();
  const std::string shown = testing::internal::GetCapturedStdout();
  EXPECT_EQ(rig.connection->malformedCount(), 4 * damaged.size());
  EXPECT_TRUE(client.messages().empty());
  std::size_t lines = 0;
  for (std::size_t at = shown.find("WARN: Dropped a malformed"); at != std::string::npos;
       at = shown.find("WARN: Dropped a malformed", at + 1)) {
    ++lines;
  }
  EXPECT_EQ(lines, 4 * damaged.size());
}

TEST(ConnectionRequest, MalformedReportIsLoggedOnceAndByTheLibraryAlone) {
  sns_client_event_msg incomplete;
  const SimulatedRig rig([&](const Request& request) -> Outgoings {
    return {raw(reportDatagram(incomplete.SerializePartialAsString())), accept(request)};
  });
  TestClient client(rig.connection.get());
  testing::internal::CaptureStdout();
  testing::internal::CaptureStderr();
  EXPECT_EQ(client.SendRequest(configRequest()), ssc::kOk);
  EXPECT_EQ(testing::internal::GetCapturedStdout(),
            "WARN: Dropped a malformed report from the hub (1 so far)\n");
  EXPECT_EQ(testing::internal::GetCapturedStderr(), "");
}

}  // namespace
