// Requests of a sensor's own kind, on a sensor made for it.
#include <gtest/gtest.h>

#include "simhub/HubHarness.h"

namespace {

constexpr std::uint32_t kEchoRequest = 7000;
constexpr std::uint32_t kEchoEvent = 7001;

/// Counts its requests: that is its reading, until the hub restarts.
class Echo final : public simhub::Sensor {
 public:
  using Sensor::Sensor;
  void Read(simhub::Time, std::vector<float>* values) override { values->push_back(requests_); }
  bool HandleRequest(const simhub::SensorRequest& request,
                     std::vector<simhub::SensorAnswer>* answers) override {
    if (request.messageId != kEchoRequest) return false;
    ++requests_;
    answers->push_back({kEchoEvent, request.refuse ? "refused" : request.payload, simhub::fromSeconds(0.5)});
    return true;
  }
  void Restart() override { requests_ = 0; }

 private:
  float requests_ = 0;
};

HubHarness echoHub(const std::vector<std::string>& overrides = {}) {
  return HubHarness(overrides, "o1v1", [](const auto& config, const auto& surroundings) {
    return std::make_unique<Echo>(config, surroundings);
  });
}

float lastReading(HubHarness& hub, const simhub::Suid& suid) {
  hub.Configure(suid, 10);
  hub.Run(0.11);
  return hub.Readings(suid).back().data(0);
}

TEST(OwnRequests, AreAnsweredAndTakeEffect) {
  HubHarness hub = echoHub();
  const simhub::Suid suid = hub.Find("pressure");
  const simhub::Time sent = hub.hub->Now();
  const auto answer = hub.Ask(suid, kEchoRequest, "hello");
  ASSERT_TRUE(answer && answer->messageId == kEchoEvent);
  EXPECT_EQ(answer->payload, "hello");
  EXPECT_GT(answer->at, sent + simhub::fromSeconds(0.5)) << "the sensor's own delay";
  EXPECT_EQ(lastReading(hub, suid), 1);
}

TEST(OwnRequests, UnknownOnesAreAnErrorEvent) {
  HubHarness hub = echoHub();
  const auto answer = hub.Ask(hub.Find("pressure"), kEchoRequest + 5);
  EXPECT_TRUE(answer && answer->messageId == simhub::kErrorEvent);
}

TEST(OwnRequests, FailOnDemand) {
  HubHarness hub = echoHub({"fault.f.kind=oem_failure", "fault.f.message=7000", "fault.f.after=1"});
  const simhub::Suid suid = hub.Find("pressure");
  EXPECT_EQ(hub.Ask(suid, kEchoRequest, "first")->payload, "first");
  EXPECT_EQ(hub.Ask(suid, kEchoRequest, "second")->payload, "refused");
}

TEST(OwnRequests, StaySilentOnDemandButTakeEffect) {
  HubHarness hub = echoHub({"fault.f.kind=oem_silence", "fault.f.sensor=pressure"});
  const simhub::Suid suid = hub.Find("pressure");
  EXPECT_EQ(hub.Ask(suid, kEchoRequest, "hello"), std::nullopt);
  EXPECT_EQ(lastReading(hub, suid), 1);
}

TEST(OwnRequests, AreAnsweredOnDemandByWhatCannotBeDecodedButTakeEffect) {
  HubHarness hub = echoHub({"fault.f.kind=oem_malformed", "fault.f.message=7000"});
  const simhub::Suid suid = hub.Find("pressure");
  const auto answer = hub.Ask(suid, kEchoRequest, "hello");
  ASSERT_TRUE(answer && answer->messageId == kEchoEvent);
  EXPECT_FALSE(sns_std_sensor_event().ParseFromString(answer->payload));
  EXPECT_EQ(lastReading(hub, suid), 1);
}

TEST(OwnRequests, WhatTheyChangedIsForgottenWhenTheHubComesBack) {
  HubHarness hub = echoHub({"fault.f.kind=hub_away", "fault.f.from=20", "fault.f.down_for=1"});
  const simhub::Suid suid = hub.Find("pressure");
  (void)hub.Ask(suid, kEchoRequest);
  hub.Run(25);
  EXPECT_EQ(lastReading(hub, suid), 0);
}

}  // namespace
