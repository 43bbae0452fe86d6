// Several threads on one connection, over the simulated link and over a real socket.
#include <atomic>
#include <chrono>
#include <memory>
#include <string>
#include <thread>
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

/// Far longer than anything takes in real time; nothing in simulated time.
constexpr std::chrono::seconds kLong{20};

/// A connection to a scripted hub over one of the links.
class Rig {
 public:
  virtual ~Rig() = default;
  [[nodiscard]] ssc::Connection* connection() { return connection_.get(); }

 protected:
  std::unique_ptr<ssc::Connection> connection_;
};

class SimulatedLinkRig : public Rig {
 public:
  explicit SimulatedLinkRig(const Script& script) : rig_(script) { connection_ = std::move(rig_.connection); }

 private:
  SimulatedRig rig_;
};

class SocketRig : public Rig {
 public:
  explicit SocketRig(const Script& script) : server_(script) {
    ssc::HubLink link;
    link.clock = std::make_unique<ssc::RealClock>();
    EXPECT_EQ(ssc::UnixTransport::Connect(server_.path(), &link.transport), ssc::kOk);
    connection_ = ssc::Connection::Over(std::move(link));
  }
  ~SocketRig() override { connection_.reset(); }

 private:
  HubServer server_;
};

enum class Link { kSimulated, kSocket };

class ConnectionThreads : public testing::TestWithParam<Link> {
 protected:
  static std::unique_ptr<Rig> rig(const Script& script) {
    if (GetParam() == Link::kSimulated) return std::make_unique<SimulatedLinkRig>(script);
    return std::make_unique<SocketRig>(script);
  }
};

TEST_P(ConnectionThreads, EventsBeforeTheNextResponseDoNotHoldItUpWhileTheSenderHasItsMutex) {
  // The second request is answered only after a burst of the first sensor's events, whose handler waits for
  // the mutex that the sender holds.
  const auto hub = rig([](const Request& request) -> Outgoings {
    if (request.suid() == kSensor) return {accept(request)};
    return stream(kSensor, 50, 0ns, 0ns) + Outgoings{accept(request)} + stream(kSensor, 1, 1ms, 0ns);
  });
  TestClient client(hub->connection());
  client.wakeAlways = false;
  client.onEvent = [&](const sns_client_event_msg&) {
    if (client.heldValues().size() == 51) client.End(7);
  };
  std::vector<ssc::Response> responses;
  EXPECT_EQ(client.SendRequestsAndWait(
                {Client::MakeConfigRequest(kSensor, 20, 0), Client::MakeConfigRequest(kOtherSensor, 20, 0)},
                kLong, &responses),
            7);
  EXPECT_EQ(responses.size(), 2U);
  std::vector<float> expected = countUp(50);
  expected.push_back(0);
  EXPECT_EQ(client.values(), expected);
}

TEST_P(ConnectionThreads, SendersThatHoldTheirMutexesDoNotHoldEachOtherUp) {
  // Every request brings an event of its own sensor before its response, so that sooner or later the event
  // thread waits for a mutex whose holder waits for a response that a third thread takes off the wire.
  const auto hub = rig([](const Request& request) -> Outgoings {
    return {event(request.suid(), ssc::kSensorEvent, sample(1)), accept(request)};
  });
  constexpr int kThreads = 4;
  constexpr int kRequests = 100;
  std::vector<std::thread> threads;
  for (int i = 0; i < kThreads; ++i) {
    threads.emplace_back([&, i] {
      const ssc::SensorUid sensor(static_cast<std::uint64_t>(i), 99);
      TestClient client(hub->connection());
      client.Register();
      for (int sent = 0; sent < kRequests; sent += 2) {
        const std::unique_lock<std::mutex> lock(client.clientMutex());
        EXPECT_EQ(client.SendRequest(Client::MakeDisableRequest(sensor)), ssc::kOk);
        EXPECT_EQ(client.SendRequest(Client::MakeDisableRequest(sensor)), ssc::kOk);
      }
      EXPECT_TRUE(client.WaitForValues(kRequests, kLong));
      client.Unregister();
      EXPECT_EQ(client.values(), std::vector<float>(kRequests, 1.0F));
    });
  }
  for (std::thread& thread : threads) thread.join();
}

TEST_P(ConnectionThreads, ClientsComeAndGoWhileEventsPourIn) {
  // Each request brings a burst of events around its response; the clients are gone before most are
  // delivered.
  const auto hub = rig([](const Request& request) {
    return stream(kSensor, 20, 0ns, 0ns) + Outgoings{accept(request)} + stream(kSensor, 20, 0ns, 1us);
  });
  std::atomic<int> destroyed{0};
  std::vector<std::thread> threads;
  for (int i = 0; i < 3; ++i) {
    threads.emplace_back([&] {
      for (int round = 0; round < 100; ++round) {
        auto client = std::make_unique<TestClient>(hub->connection());
        // What a handler touches dies with the client: a handler that still runs would be seen.
        auto touched = std::make_unique<int>(0);
        client->onEvent = [value = touched.get()](const sns_client_event_msg&) { ++*value; };
        client->Register();
        EXPECT_EQ(client->SendRequest(Client::MakeConfigRequest(kSensor, 20, 0)), ssc::kOk);
        EXPECT_TRUE(round % 2 == 0 || client->WaitForValues(1, kLong));
        client->Unregister();
        touched.reset();
        client.reset();
        ++destroyed;
      }
    });
  }
  for (std::thread& thread : threads) thread.join();
  EXPECT_EQ(destroyed, 300);
}

TEST_P(ConnectionThreads, UnregisteringWaitsForTheHandlerThatRuns) {
  const auto hub =
      rig([](const Request& request) { return Outgoings{accept(request)} + stream(kSensor, 1, 0ns, 0ns); });
  // A handler that holds no mutex: nothing but the connection keeps it and the client apart.
  class Slow : public Client {
   public:
    explicit Slow(ssc::Connection* hubConnection) : Client(hubConnection) {}
    ~Slow() override { connection->UnregisterClient(this); }
    void OnEvent(const sns_client_event_msg&) override {
      {
        const std::lock_guard<std::mutex> guard(mutex);
        entered = true;
        condition.notify_all();
      }
      // Time for the other thread to come here too soon; on a busy machine each turn is long by itself.
      const auto end = std::chrono::steady_clock::now() + std::chrono::milliseconds(2);
      for (int i = 0; i < 1000 && std::chrono::steady_clock::now() < end; ++i) std::this_thread::yield();
      left = true;
    }
    void run() {
      connection->RegisterClient(this);
      EXPECT_EQ(SendRequest(MakeConfigRequest(kSensor, 20, 0)), ssc::kOk);
      {
        std::unique_lock<std::mutex> lock(mutex);
        while (!entered) connection->clock().wait(condition, lock, kLong);
      }
      connection->UnregisterClient(this);
      EXPECT_TRUE(left);
    }
    bool entered = false;
    bool left = false;  // not guarded: the connection's promise is what orders it
  };
  for (int round = 0; round < 20; ++round) Slow(hub->connection()).run();
}

INSTANTIATE_TEST_SUITE_P(Links, ConnectionThreads, testing::Values(Link::kSimulated, Link::kSocket),
                         [](const auto& instance) {
                           return instance.param == Link::kSimulated ? "Simulated" : "Socket";
                         });

}  // namespace
