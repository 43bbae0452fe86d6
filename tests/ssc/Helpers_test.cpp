// Several clients of one connection at a time: none sees or loses what is another's.
#include <atomic>
#include <chrono>
#include <string>
#include <thread>
#include <vector>

#include <gtest/gtest.h>

#include "ssc/AttrUtil.h"
#include "ssc/FakeHub.h"
#include "ssc/HubServer.h"
#include "ssc/RegistryHub.h"
#include "ssc/RegistryUtil.h"
#include "ssc/SuidUtil.h"
#include "ssc/transport/UnixTransport.h"

namespace {

using namespace ssctest;
using namespace std::chrono_literals;
using ssc::Client;
using ssc::Clock;

TEST(Helpers, LeaveAStreamingClientsEventsAlone) {
  RegistryHub hub;
  hub.delay = 7ms;
  hub.groups["g"] = groupOf("a", 5);
  const SimulatedRig rig([&](const Request& request) {
    if (request.message.msg_id() == ssc::kStreamConfigRequest && request.suid() == kSensor)
      return Outgoings{accept(request)} + stream(kSensor, 100, 1ms, 1ms);
    return hub(request);
  });
  TestClient streaming(rig.connection.get());
  streaming.Register();
  ASSERT_EQ(streaming.SendRequest(Client::MakeConfigRequest(kSensor, 20, 0)), ssc::kOk);

  std::vector<ssc::SensorUid> suids;
  EXPECT_EQ(ssc::SuidUtil(rig.connection.get()).Lookup("registry", &suids), ssc::kOk);
  sns_registry_data data;
  EXPECT_EQ(ssc::RegistryUtil(rig.connection.get()).Read("g", &data), ssc::kOk);
  EXPECT_EQ(ssc::RegistryUtil(rig.connection.get()).Write("g", data), ssc::kOk);
  sns_std_attr_event attributes;
  EXPECT_EQ(ssc::AttrUtil(rig.connection.get()).LoadAttributes(kOtherSensor, &attributes), ssc::kOk);
  // Look-up, read and write with a look-up each, attributes: six exchanges of 7 ms.
  EXPECT_EQ(rig.now(), Clock::TimePoint(42ms));

  EXPECT_TRUE(streaming.WaitForValues(100, 1s));
  streaming.Unregister();
  EXPECT_EQ(streaming.values(), countUp(100));
  for (const auto& message : streaming.messages()) EXPECT_EQ(ssc::SensorUid(message.suid()), kSensor);
}

/// What each of several threads does with helpers of its own, over and over: every answer must be its own.
void useHelpers(ssc::Connection* connection, int thread, int rounds) {
  const std::string name = "t" + std::to_string(thread);
  for (int round = 0; round < rounds; ++round) {
    std::vector<ssc::SensorUid> suids;
    ASSERT_EQ(ssc::SuidUtil(connection).Lookup(name, &suids), ssc::kOk);
    ASSERT_EQ(suids.size(), 1U);
    EXPECT_EQ(suids[0].low, static_cast<std::uint64_t>(thread));
    sns_std_attr_event attributes;
    ASSERT_EQ(ssc::AttrUtil(connection).LoadAttributes(suids[0], &attributes), ssc::kOk);
    std::int64_t index = -1;
    EXPECT_EQ(ssc::AttrUtil::GetSensorIndex(attributes, &index), ssc::kOk);
    EXPECT_EQ(index, thread);

    ssc::RegistryUtil registry(connection);
    if (thread % 2 == 0) {
      EXPECT_EQ(registry.Write(name, groupOf(name, round)), ssc::kOk);
      sns_registry_data data;
      EXPECT_EQ(registry.Read(name, &data), ssc::kOk);
      EXPECT_EQ(data.SerializeAsString(), groupOf(name, round).SerializeAsString());
    } else {
      // Failures carry no name: they must not be taken for another thread's, nor its successes for these.
      EXPECT_EQ(registry.Write("unwritable", groupOf(name, round)), ssc::kIoError);
      sns_registry_data data;
      EXPECT_EQ(registry.Read("missing", &data), ssc::kNotFound);
    }
  }
}

RegistryHub hubForThreads(int threads) {
  RegistryHub hub;
  hub.unwritable = "unwritable";
  for (int i = 0; i < threads; ++i) {
    hub.sensors["t" + std::to_string(i)] = {{static_cast<std::uint64_t>(i), 500}};
  }
  return hub;
}

constexpr int kThreads = 4;

void useHelpersInThreads(ssc::Connection* connection, int rounds) {
  testing::internal::CaptureStderr();  // every missing group is said so
  std::vector<std::thread> threads;
  for (int i = 0; i < kThreads; ++i) {
    threads.emplace_back([=] { useHelpers(connection, i, rounds); });
  }
  for (std::thread& thread : threads) thread.join();
  EXPECT_NE(testing::internal::GetCapturedStderr().find("\"missing\""), std::string::npos);
}

TEST(Helpers, OfSeveralThreadsGetTheirOwnAnswersInSimulatedTime) {
  RegistryHub hub = hubForThreads(kThreads);
  hub.delay = 1ms;
  const SimulatedRig rig([&](const Request& request) { return hub(request); });
  useHelpersInThreads(rig.connection.get(), 20);
}

TEST(Helpers, OfSeveralThreadsGetTheirOwnAnswersOverASocket) {
  RegistryHub hub = hubForThreads(kThreads);
  HubServer server([&](const Request& request) { return hub(request); });
  ssc::HubLink link;
  link.clock = std::make_unique<ssc::RealClock>();
  ASSERT_EQ(ssc::UnixTransport::Connect(server.path(), &link.transport), ssc::kOk);
  const auto connection = ssc::Connection::Over(std::move(link));
  useHelpersInThreads(connection.get(), 20);
}

TEST(Helpers, AnswerIsKeptWhenTheHubGoesAwayRightAfterIt) {
  // Over a real socket the answer and the end may both have been handled before the asking thread goes on.
  for (int round = 0; round < 50; ++round) {
    RegistryHub hub;
    hub.sensors["pressure"] = {kSensor};
    HubServer server([&](const Request& request) { return hub(request) + Outgoings{goAway()}; });
    ssc::HubLink link;
    link.clock = std::make_unique<ssc::RealClock>();
    ASSERT_EQ(ssc::UnixTransport::Connect(server.path(), &link.transport), ssc::kOk);
    const auto connection = ssc::Connection::Over(std::move(link));
    std::vector<ssc::SensorUid> suids;
    ASSERT_EQ(ssc::SuidUtil(connection.get()).Lookup("pressure", &suids), ssc::kOk) << round;
    EXPECT_EQ(suids, std::vector<ssc::SensorUid>{kSensor});
  }
}

}  // namespace
