// Who gets which events, when and in which order.
#include <chrono>
#include <memory>
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

TEST(Delivery, KeepsTheOrderInWhichThingsCameIn) {
  const SimulatedRig rig(
      [](const Request& request) { return stream(kSensor, 500, 0ns, 0ns) + Outgoings{accept(request)}; });
  TestClient client(rig.connection.get());
  client.Register();
  EXPECT_EQ(client.SendRequest(configRequest()), ssc::kOk);
  EXPECT_TRUE(client.WaitForValues(500, 1s));
  client.Unregister();
  EXPECT_EQ(client.values(), countUp(500));
}

TEST(Delivery, KeepsTheEventsOfOneMessageTogether) {
  const SimulatedRig rig([](const Request& request) -> Outgoings {
    return {raw(eventDatagram(kSensor, {{1025, sample(0), 11}, {128, "x", 12}, {1025, sample(1), 13}})),
            accept(request)};
  });
  TestClient client(rig.connection.get());
  client.Register();
  EXPECT_EQ(client.SendRequest(configRequest()), ssc::kOk);
  EXPECT_TRUE(client.WaitForValues(3, 1s));
  client.Unregister();
  ASSERT_EQ(client.messages().size(), 1U);
  const auto message = client.messages()[0];
  EXPECT_EQ(ssc::SensorUid(message.suid()), kSensor);
  ASSERT_EQ(message.events_size(), 3);
  EXPECT_EQ(message.events(0).timestamp(), 11U);
  EXPECT_EQ(message.events(1).msg_id(), 128U);
  EXPECT_EQ(message.events(1).payload(), "x");
  EXPECT_EQ(message.events(2).timestamp(), 13U);
}

TEST(Delivery, OfAMessageThatIsReusedLeavesNothingOfTheOneBefore) {
  const SimulatedRig rig([](const Request& request) -> Outgoings {
    return {raw(eventDatagram(kSensor, {{1025, sample(0), 1}, {1025, sample(1), 2}})),
            raw(eventDatagram(kSensor, {}), 1ms), raw(eventDatagram(kSensor, {{9, "", 0}}), 2ms),
            accept(request)};
  });
  TestClient client(rig.connection.get());
  client.Register();
  EXPECT_EQ(client.SendRequest(configRequest()), ssc::kOk);
  EXPECT_TRUE(client.WaitForValues(3, 1s));
  client.Unregister();
  ASSERT_EQ(client.messages().size(), 3U);
  EXPECT_EQ(client.messages()[1].events_size(), 0);
  ASSERT_EQ(client.messages()[2].events_size(), 1);
  EXPECT_EQ(client.messages()[2].events(0).payload(), "");
}

TEST(Delivery, UnregisteredClientGetsNothing) {
  const SimulatedRig rig(
      [](const Request& request) { return Outgoings{accept(request)} + stream(kSensor, 5, 0ns, 1ms); });
  TestClient client(rig.connection.get());
  EXPECT_EQ(client.SendRequest(configRequest()), ssc::kOk);
  rig.connection->clock().sleepFor(1s);
  client.Register();
  client.Unregister();
  EXPECT_TRUE(client.messages().empty());
}

TEST(Delivery, EventsOfOneRegistrationNeverReachALaterOne) {
  // They are taken off the wire, but nobody waits, so they are still queued when the registration ends.
  const SimulatedRig rig(
      [](const Request& request) { return stream(kSensor, 5, 0ns, 0ns) + Outgoings{accept(request)}; });
  TestClient client(rig.connection.get());
  client.Register();
  EXPECT_EQ(client.SendRequest(configRequest()), ssc::kOk);
  client.Unregister();
  client.Register();
  rig.connection->clock().sleepFor(1s);
  client.Unregister();
  EXPECT_TRUE(client.messages().empty());
}

TEST(Delivery, EventsThatCameInBeforeTheRegistrationNeverReachIt) {
  const SimulatedRig rig([](const Request& request) {
    return stream(kSensor, 5, 0ns, 0ns) + Outgoings{accept(request)} + stream(kSensor, 2, 1ms, 1ms);
  });
  TestClient client(rig.connection.get());
  EXPECT_EQ(client.SendRequest(configRequest()), ssc::kOk);
  client.Register();
  EXPECT_TRUE(client.WaitForValues(2, 1s));
  client.Unregister();
  EXPECT_EQ(client.values(), countUp(2));
  EXPECT_EQ(rig.now(), Clock::TimePoint(2ms));
}

TEST(Delivery, RegisteringTwiceIsRegisteringOnce) {
  const SimulatedRig rig(
      [](const Request& request) { return Outgoings{accept(request)} + stream(kSensor, 3, 0ns, 1ms); });
  TestClient client(rig.connection.get());
  client.Register();
  client.Register();
  EXPECT_EQ(client.SendRequest(configRequest()), ssc::kOk);
  rig.connection->clock().sleepFor(1s);
  EXPECT_EQ(client.values(), countUp(3));
  client.Unregister();
  EXPECT_EQ(client.SendRequest(configRequest()), ssc::kOk);
  rig.connection->clock().sleepFor(1s);
  EXPECT_EQ(client.values(), countUp(3));
  client.Unregister();  // once more changes nothing
}

TEST(Delivery, GoesToTheClientsThatHaveAskedTheSensorOnly) {
  const SimulatedRig rig([](const Request& request) {
    return Outgoings{accept(request)} + stream(request.suid(), 3, 1ms, 1ms);
  });
  TestClient first(rig.connection.get());
  TestClient second(rig.connection.get());
  first.Register();
  second.Register();
  EXPECT_EQ(first.SendRequest(configRequest(kSensor)), ssc::kOk);
  rig.connection->clock().sleepFor(1s);
  EXPECT_EQ(first.values(), countUp(3));
  EXPECT_TRUE(second.values().empty());
  EXPECT_EQ(second.SendRequest(configRequest(kOtherSensor)), ssc::kOk);
  rig.connection->clock().sleepFor(1s);
  EXPECT_EQ(first.values(), countUp(3));
  EXPECT_EQ(second.values(), countUp(3));
  first.Unregister();
  second.Unregister();
}

TEST(Delivery, OfOneEventIsInTheOrderOfTheRegistrations) {
  const SimulatedRig rig(
      [](const Request& request) { return Outgoings{accept(request)} + stream(kSensor, 1, 1ms, 0ns); });
  constexpr std::size_t kClients = 8;
  std::vector<std::unique_ptr<TestClient>> clients;
  std::vector<std::size_t> order;
  for (std::size_t i = 0; i < kClients; ++i) {
    clients.push_back(std::make_unique<TestClient>(rig.connection.get()));
    clients.back()->onEvent = [&order, i](const sns_client_event_msg&) { order.push_back(i); };
    EXPECT_EQ(clients.back()->SendRequest(configRequest()), ssc::kOk);
  }
  rig.connection->clock().sleepFor(1s);
  // The last comes first, so that neither age nor address gives this order by chance.
  for (std::size_t i = kClients; i-- > 0;) clients[i]->Register();
  TestClient trigger(rig.connection.get());
  EXPECT_EQ(trigger.SendRequest(configRequest()), ssc::kOk);
  rig.connection->clock().sleepFor(1s);
  for (auto& client : clients) client->Unregister();
  EXPECT_EQ(order, (std::vector<std::size_t>{7, 6, 5, 4, 3, 2, 1, 0}));
}

TEST(Delivery, ToAClientThatTakesItselfOffInItsHandlerEndsThere) {
  const SimulatedRig rig(
      [](const Request& request) { return Outgoings{accept(request)} + stream(kSensor, 5, 1ms, 1ms); });
  TestClient client(rig.connection.get());
  client.onEvent = [&](const sns_client_event_msg&) { client.Unregister(); };
  client.Register();
  EXPECT_EQ(client.SendRequest(configRequest()), ssc::kOk);
  rig.connection->clock().sleepFor(1s);
  EXPECT_EQ(client.values(), countUp(1));
}

TEST(Delivery, ToAClientThatAnotherHandlerTakesOffEndsThere) {
  // Both get the same event; the first one's handler takes the second off before its turn.
  const SimulatedRig rig(
      [](const Request& request) { return Outgoings{accept(request)} + stream(kSensor, 1, 1ms, 1ms); });
  TestClient first(rig.connection.get());
  auto second = std::make_unique<TestClient>(rig.connection.get());
  EXPECT_EQ(first.SendRequest(configRequest()), ssc::kOk);
  EXPECT_EQ(second->SendRequest(configRequest()), ssc::kOk);
  rig.connection->clock().sleepFor(1s);
  std::size_t seenBySecond = 0;
  second->onEvent = [&](const sns_client_event_msg&) { ++seenBySecond; };
  first.onEvent = [&](const sns_client_event_msg&) { second.reset(); };
  first.Register();
  second->Register();
  EXPECT_EQ(first.SendRequest(configRequest()), ssc::kOk);
  rig.connection->clock().sleepFor(1s);
  first.Unregister();
  EXPECT_EQ(second, nullptr);
  EXPECT_EQ(seenBySecond, 0U);
}

TEST(Delivery, TellsRegisteredClientsThatTheHubWentAndCameBack) {
  const SimulatedRig rig(acceptAll, {goAway(10ms), comeBack(20ms), goAway(30ms), comeBack(40ms)});
  TestClient registered(rig.connection.get());
  TestClient unregistered(rig.connection.get());
  registered.Register();
  EXPECT_TRUE(registered.WaitForChanges("drdr", 1s));
  registered.Unregister();
  EXPECT_EQ(rig.now(), Clock::TimePoint(40ms));
  EXPECT_EQ(unregistered.changes(), "");
}

TEST(Delivery, TellsOfAChangeThatIsNoneNothing) {
  const SimulatedRig rig(acceptAll,
                         {comeBack(1ms), goAway(10ms), goAway(11ms), comeBack(20ms), comeBack(21ms)});
  TestClient client(rig.connection.get());
  client.Register();
  rig.connection->clock().sleepFor(1s);
  client.Unregister();
  EXPECT_EQ(client.changes(), "dr");
}

TEST(Delivery, KeepsEventsAndChangesInTheirOrder) {
  const SimulatedRig rig([](const Request& request) {
    return Outgoings{accept(request)} + stream(kSensor, 2, 1ms, 0ns) + Outgoings{goAway(1ms), comeBack(2ms)};
  });
  TestClient client(rig.connection.get());
  std::size_t valuesAtReconnect = 0;
  client.onReconnect = [&] { valuesAtReconnect = client.heldValues().size(); };
  client.Register();
  EXPECT_EQ(client.SendRequest(configRequest()), ssc::kOk);
  EXPECT_TRUE(client.WaitForChanges("dr", 1s));
  client.Unregister();
  EXPECT_EQ(valuesAtReconnect, 2U);
}

TEST(Delivery, HandlerMaySendRequestsItself) {
  const SimulatedRig rig(
      [](const Request& request) { return Outgoings{accept(request, 1ms)} + stream(kSensor, 2, 0ns, 10ms); },
      {goAway(10ms), comeBack(20ms)});
  TestClient client(rig.connection.get());
  int sent = -1;
  client.onReconnect = [&] { sent = client.SendRequest(configRequest()); };
  client.Register();
  // The first event comes in before the response that the handler waits for, and is delivered after it.
  EXPECT_TRUE(client.WaitForValues(2, 1s));
  client.Unregister();
  EXPECT_EQ(sent, ssc::kOk);
  EXPECT_EQ(client.changes(), "dr");
  EXPECT_EQ(client.values(), countUp(2));
  EXPECT_EQ(rig.now(), Clock::TimePoint(30ms));
}

TEST(Delivery, HandlersRequestThatIsNeverAnsweredTimesOutToo) {
  const SimulatedRig rig([](const Request&) { return Outgoings{}; }, {goAway(10ms), comeBack(20ms)});
  TestClient client(rig.connection.get());
  int sent = 0;
  client.onReconnect = [&] { sent = client.SendRequest(configRequest()); };
  client.Register();
  EXPECT_TRUE(client.WaitForChanges("dr", 1h));
  client.Unregister();
  EXPECT_EQ(sent, ssc::kTimedOut);
  EXPECT_EQ(rig.now(), Clock::TimePoint(3020ms));
}

TEST(Delivery, HandlersRequestEndsWhenTheHubGoesAwayAgain) {
  const SimulatedRig rig(
      [](const Request&) {
        return Outgoings{goAway(1ms), comeBack(5ms)};
      },
      {goAway(10ms), comeBack(20ms)});
  TestClient client(rig.connection.get());
  std::vector<int> results;
  client.onReconnect = [&] {
    if (results.size() < 3) results.push_back(client.SendRequest(configRequest()));
  };
  client.Register();
  EXPECT_TRUE(client.WaitForChanges("drdrdrdr", 1s));
  client.Unregister();
  EXPECT_EQ(results, (std::vector<int>{ssc::kNotConnected, ssc::kNotConnected, ssc::kNotConnected}));
}

}  // namespace
