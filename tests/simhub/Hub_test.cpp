#include "simhub/Hub.h"

#include <cmath>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "simhub/HubHarness.h"

namespace {

using simhub::kSensorEvent;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::SizeIs;

constexpr const char* kGroup = "barochip_0_platform.pressure.fac_cal";

TEST(Hub, ListsTheSensorsOfADataType) {
  HubHarness hub;
  EXPECT_THAT(hub.LookUp("pressure"), ElementsAre(simhub::suidForName("pressure")));
  EXPECT_THAT(hub.LookUp("pressure_raw"), ElementsAre(simhub::suidForName("pressure_raw")));
  EXPECT_THAT(hub.LookUp("registry"), SizeIs(1));
  EXPECT_THAT(hub.LookUp("flux_capacitor"), IsEmpty());
}

TEST(Hub, RespondsBeforeItAnswers) {
  HubHarness hub({"hub.response_latency_ms=0.2", "hub.answer_latency_ms=0.3"});
  (void)hub.LookUp("pressure");
  ASSERT_THAT(hub.responses, SizeIs(1));
  EXPECT_EQ(hub.responses[0].at, simhub::Time{200'000});
  EXPECT_EQ(hub.responses[0].response.transactionId, 1);
  EXPECT_EQ(hub.responses[0].response.result, 0);
  EXPECT_EQ(hub.responses[0].response.clientId, hub.client);
  ASSERT_THAT(hub.events, SizeIs(1));
  EXPECT_EQ(hub.events[0].at, simhub::Time{500'000});
}

TEST(Hub, StreamsAtTheAskedRate) {
  HubHarness hub({"hub.start_ticks=0", "sensor.pressure.latency_ms=2"});
  const simhub::Suid suid = hub.Find("pressure");
  const simhub::Time start = hub.hub->Now();
  hub.Configure(suid, 20);
  hub.Run(1.0);
  const auto events = hub.EventsOf(suid, kSensorEvent);
  ASSERT_THAT(events, SizeIs(19));  // the 20th is taken at the end and still under way
  for (std::size_t i = 0; i < events.size(); ++i) {
    const simhub::Time taken = start + (i + 1) * simhub::Time{50'000'000};
    EXPECT_EQ(events[i].ticks, simhub::toTicks(taken));
    EXPECT_EQ(events[i].at, taken + simhub::Time{2'000'000});
  }
}

TEST(Hub, ReadsTheWorldThroughTheErrorModel) {
  HubHarness hub({"world.pressure=1000", "sensor.pressure.bias=3", "sensor.pressure.noise=0.02"});
  const simhub::Suid suid = hub.Find("pressure_raw");
  hub.Configure(suid, 20);
  hub.Run(100);
  EXPECT_THAT(hub.Readings(suid), SizeIs(1999));
  EXPECT_NEAR(hub.MeanReading(suid), 1003, 5 * 0.02 / std::sqrt(1999));
}

}  // namespace
