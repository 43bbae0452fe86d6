#include <atomic>
#include <chrono>
#include <string>
#include <thread>
#include <vector>

#include <gtest/gtest.h>

#include "ssc/FakeHub.h"
#include "ssc/TestClient.h"

namespace {

using namespace ssctest;
using namespace std::chrono_literals;
using ssc::Clock;

TEST(SimulatedClock, StandsStillWhileNobodyWaits) {
  const SimulatedRig rig(acceptAll, stream(kSensor, 100, 1ms, 1ms));
  TestClient client(rig.connection.get());
  EXPECT_EQ(client.SendRequest(ssc::Client::MakeConfigRequest(kSensor, 20, 0)), ssc::kOk);
  EXPECT_EQ(rig.now(), Clock::TimePoint{});
}

TEST(SimulatedClock, AnHourPassesInTheTimeOfItsEvents) {
  const SimulatedRig rig(acceptAll);
  rig.connection->clock().sleepFor(1h);
  EXPECT_EQ(rig.now(), Clock::TimePoint(1h));
}

TEST(SimulatedClock, SleepOfNoOrNegativeTimeMovesNothing) {
  const SimulatedRig rig(acceptAll);
  rig.connection->clock().sleepFor(0ns);
  rig.connection->clock().sleepFor(-1h);
  EXPECT_EQ(rig.now(), Clock::TimePoint{});
}

TEST(SimulatedClock, WaitThatNothingEndsEndsExactlyAtItsDeadline) {
  const SimulatedRig rig(acceptAll);
  ssc::Condition condition(rig.connection->clock());
  std::mutex mutex;
  std::unique_lock<std::mutex> lock(mutex);
  rig.connection->clock().wait(condition, lock, 1234567ns);
  EXPECT_TRUE(lock.owns_lock());
  EXPECT_EQ(rig.now(), Clock::TimePoint(1234567ns));
}

TEST(SimulatedClock, WaitOfNoOrNegativeTimeEndsAtTheSameTime) {
  const SimulatedRig rig(acceptAll);
  ssc::Condition condition(rig.connection->clock());
  std::mutex mutex;
  std::unique_lock<std::mutex> lock(mutex);
  rig.connection->clock().wait(condition, lock, 0ns);
  rig.connection->clock().wait(condition, lock, Clock::Duration::min());
  EXPECT_TRUE(lock.owns_lock());
  EXPECT_EQ(rig.now(), Clock::TimePoint{});
}

TEST(SimulatedClock, NotificationEndsTheWaitAtTheTimeOfTheEventThatCausedIt) {
  const SimulatedRig rig(acceptAll, stream(kSensor, 10, 100ms, 100ms));
  TestClient client(rig.connection.get());
  ASSERT_EQ(client.SendRequest(ssc::Client::MakeConfigRequest(kSensor, 10, 0)), ssc::kOk);
  client.Register();
  EXPECT_TRUE(client.WaitForValues(3, 1h));
  client.Unregister();
  EXPECT_EQ(rig.now(), Clock::TimePoint(300ms));
  EXPECT_EQ(client.values(), countUp(3));
}

TEST(SimulatedClock, EventAtTheDeadlineItselfIsDeliveredBeforeTheWaitEnds) {
  const SimulatedRig rig(acceptAll, stream(kSensor, 3, 100ms, 100ms));
  TestClient client(rig.connection.get());
  client.wakeAlways = false;
  const auto request = ssc::Client::MakeConfigRequest(kSensor, 10, 0);
  EXPECT_EQ(client.SendRequestsAndWait({request}, 200ms, nullptr), ssc::kTimedOut);
  EXPECT_EQ(client.values(), countUp(2));
  EXPECT_EQ(rig.now(), Clock::TimePoint(200ms));
}

TEST(SimulatedClock, SleepersOfSeveralThreadsAllGetTheirTimeAndNoneMovesItFurther) {
  const SimulatedRig rig(acceptAll);
  Clock& clock = rig.connection->clock();
  std::vector<std::thread> sleepers;
  for (int i = 5; i > 0; --i) {
    sleepers.emplace_back([&clock, i] {
      const auto start = clock.now();
      clock.sleepFor(i * 10ms);
      EXPECT_GE(clock.now() - start, i * 10ms);
    });
  }
  for (std::thread& sleeper : sleepers) sleeper.join();
  EXPECT_GE(rig.now(), Clock::TimePoint(50ms));
  EXPECT_LE(rig.now(), Clock::TimePoint(150ms));
}

TEST(SimulatedClock, WaitWithoutEndIsEndedByAnotherThread) {
  const SimulatedRig rig(acceptAll);
  Clock& clock = rig.connection->clock();
  ssc::Condition condition(clock);
  std::mutex mutex;
  bool told = false;
  std::thread notifier;
  {
    std::unique_lock<std::mutex> lock(mutex);
    notifier = std::thread([&] {
      const std::lock_guard<std::mutex> guard(mutex);
      told = true;
      condition.notify_all();
    });
    while (!told) clock.wait(condition, lock, Clock::Duration::max());
  }
  notifier.join();
  EXPECT_EQ(rig.now(), Clock::TimePoint{});
}

TEST(SimulatedClock, AfterAWaitWithoutEndAWaitWithADeadlineRunsOutAgain) {
  // One thread goes from a wait without end to a wait with a deadline, over and over: whoever looks at the
  // waiters only now and then must still notice that a deadline has appeared.
  const SimulatedRig rig(acceptAll);
  Clock& clock = rig.connection->clock();
  ssc::Condition condition(clock);
  std::mutex mutex;
  constexpr int kRounds = 300;
  std::atomic<int> wanted{0};
  int notified = 0;
  std::thread notifier([&] {
    for (int round = 1; round <= kRounds; ++round) {
      for (int seen = wanted; seen < round; seen = wanted) wanted.wait(seen);
      const std::lock_guard<std::mutex> guard(mutex);
      notified = round;
      condition.notify_all();
    }
  });
  for (int round = 1; round <= kRounds; ++round) {
    std::unique_lock<std::mutex> lock(mutex);
    wanted = round;
    wanted.notify_all();
    while (notified < round) clock.wait(condition, lock, Clock::Duration::max());
    lock.unlock();
    clock.sleepFor(1ms);
  }
  notifier.join();
  EXPECT_EQ(rig.now(), Clock::TimePoint(kRounds * 1ms));
}

TEST(SimulatedClock, WaitWithoutEndGetsTheEventsThatAnotherThreadsRequestBrings) {
  // The hub has nothing to do until a second thread asks it for something.
  const SimulatedRig rig([](const Request& request) -> Outgoings {
    Outgoings answer{accept(request)};
    if (request.message.msg_id() == ssc::kTestRequest) answer.push_back(event(kSensor, 1025, sample(0), 5ms));
    return answer;
  });
  TestClient waiting(rig.connection.get());
  ASSERT_EQ(waiting.SendRequest(ssc::Client::MakeConfigRequest(kSensor, 10, 0)), ssc::kOk);
  waiting.Register();
  TestClient asking(rig.connection.get());
  std::thread asker(
      [&] { EXPECT_EQ(asking.SendRequest(ssc::Client::MakeFactoryTestRequest(kOtherSensor)), ssc::kOk); });
  EXPECT_TRUE(waiting.WaitForValues(1, Clock::Duration::max()));
  asker.join();
  waiting.Unregister();
  EXPECT_EQ(rig.now(), Clock::TimePoint(5ms));
}

TEST(SimulatedClock, WaitWithoutEndGetsTheEventsThatAnotherThreadTookOffTheWire) {
  // The event comes before the response, so the asking thread is the one that reads it.
  const SimulatedRig rig([](const Request& request) -> Outgoings {
    if (request.message.msg_id() != ssc::kTestRequest) return {accept(request)};
    return {event(kSensor, 1025, sample(0)), accept(request)};
  });
  for (int round = 1; round <= 50; ++round) {
    TestClient waiting(rig.connection.get());
    ASSERT_EQ(waiting.SendRequest(ssc::Client::MakeConfigRequest(kSensor, 10, 0)), ssc::kOk);
    waiting.Register();
    TestClient asking(rig.connection.get());
    std::thread asker(
        [&] { EXPECT_EQ(asking.SendRequest(ssc::Client::MakeFactoryTestRequest(kOtherSensor)), ssc::kOk); });
    EXPECT_TRUE(waiting.WaitForValues(1, Clock::Duration::max()));
    asker.join();
    waiting.Unregister();
  }
}

TEST(SimulatedClock, TwoRunsOfOneScriptAreTheSame) {
  const auto run = [] {
    std::string trace;
    const SimulatedRig rig([&](const Request& request) {
      return Outgoings{accept(request, 700us)} + stream(kSensor, 40, 1ms, 7ms) +
             stream(kOtherSensor, 30, 1ms, 11ms);
    });
    TestClient client(rig.connection.get());
    client.wakeAlways = false;
    client.onEvent = [&](const sns_client_event_msg& message) {
      trace += std::to_string(message.suid().suid_low()) + "@" +
               std::to_string(rig.now().time_since_epoch().count()) + " ";
    };
    const std::vector<std::string> requests{ssc::Client::MakeConfigRequest(kSensor, 10, 0),
                                            ssc::Client::MakeConfigRequest(kOtherSensor, 10, 0)};
    EXPECT_EQ(client.SendRequestsAndWait(requests, 200ms, nullptr), ssc::kTimedOut);
    EXPECT_EQ(client.SendRequest(ssc::Client::MakeDisableRequest(kSensor)), ssc::kOk);
    return trace + std::to_string(rig.now().time_since_epoch().count());
  };
  const std::string first = run();
  EXPECT_GT(first.size(), 500U);
  for (int i = 0; i < 20; ++i) EXPECT_EQ(run(), first);
}

}  // namespace
