#include "simhub/sensors/Proximity.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "simhub/HubHarness.h"

namespace {

using testing::ElementsAre;

constexpr const char* kGroup = "proxchip_0_platform.prox.fac_cal";

std::vector<sns_proximity_event> proximityEvents(const HubHarness& hub, const simhub::Suid& suid) {
  std::vector<sns_proximity_event> found;
  for (const SeenEvent& event : hub.EventsOf(suid, simhub::kProximityEvent)) {
    sns_proximity_event parsed;
    if (parsed.ParseFromString(event.payload)) found.push_back(parsed);
  }
  return found;
}

/// Half a second of readings of a sensor without noise, its target where the overrides put it.
std::vector<sns_proximity_event> readings(std::vector<std::string> overrides) {
  overrides.insert(overrides.begin(), {"sensor.proximity.noise=0", "sensor.proximity.scale=1"});
  HubHarness hub(overrides);
  const simhub::Suid suid = hub.Find("proximity");
  hub.Configure(suid, 50);
  hub.Run(0.5);
  const auto found = proximityEvents(hub, suid);
  EXPECT_FALSE(found.empty());
  return found;
}

std::uint32_t countsAt(const std::string& distance, const std::string& crosstalk = "0") {
  const auto events = readings({"world.target_distance=" + distance, "world.window_crosstalk=" + crosstalk});
  return events.empty() ? 0 : events.back().raw_adc();
}

TEST(Proximity, LightFallsWithTheSquareOfTheDistance) {
  EXPECT_EQ(countsAt("50"), 140U);
  EXPECT_EQ(countsAt("100"), 35U);
  EXPECT_EQ(countsAt("100000"), 0U);
}

TEST(Proximity, CountsStopAtTheTopOfTheScale) {
  EXPECT_EQ(countsAt("10"), 255U);
  EXPECT_EQ(countsAt("0"), 255U);
}

TEST(Proximity, TheWindowsCrosstalkAdds) { EXPECT_EQ(countsAt("100", "20"), 55U); }

TEST(Proximity, EventsCarryTheReadingBeforeItIsCutToCounts) {
  const auto events = readings({"world.target_distance=60"});
  ASSERT_FALSE(events.empty());
  EXPECT_EQ(events[0].raw_adc(), 97U);
  ASSERT_EQ(events[0].data_size(), 1);
  EXPECT_NEAR(events[0].data(0), 97.2222F, 1e-3F);
}

TEST(Proximity, SaysNearFromTheNearThresholdOnAndFarFromTheFarOneDown) {
  // Comes closer, crosses the gap between the thresholds, and goes away through it again.
  const auto events =
      readings({"world.target_distance=[{at=0.0, value=100.0}, {at=0.1, value=55.0}, {at=0.2, value=50.0}, "
                "{at=0.3, value=55.0}, {at=0.4, value=60.0}]"});
  std::vector<std::pair<int, unsigned>> changes;
  for (const auto& event : events) {
    const std::pair<int, unsigned> now{event.proximity_event_type(), event.raw_adc()};
    if (changes.empty() || changes.back() != now) changes.push_back(now);
  }
  const int far = SNS_PROXIMITY_EVENT_TYPE_FAR;
  const int near = SNS_PROXIMITY_EVENT_TYPE_NEAR;
  EXPECT_THAT(changes, ElementsAre(std::pair(far, 35U), std::pair(far, 116U), std::pair(near, 140U),
                                   std::pair(near, 116U), std::pair(far, 97U)));
}

TEST(Proximity, AppliesStoredThresholdsWhenAFactoryTestTellsItTo) {
  HubHarness hub({"sensor.proximity.noise=0", "sensor.proximity.scale=1", "world.target_distance=50"});
  const simhub::Suid suid = hub.Find("proximity");
  sns_registry_data data;
  addFloat(&data, "near_threshold", 141);
  EXPECT_EQ(hub.WriteRegistry(kGroup, data), 0);
  sns_physical_sensor_test_config config;
  config.set_test_type(SNS_PHYSICAL_SENSOR_TEST_TYPE_FACTORY);
  EXPECT_TRUE(hub.Ask(suid, simhub::kTestRequest, config.SerializeAsString()).has_value());
  hub.Configure(suid, 50);
  hub.Run(0.1);
  const auto events = proximityEvents(hub, suid);
  ASSERT_FALSE(events.empty());
  EXPECT_EQ(events.back().raw_adc(), 140U);
  EXPECT_EQ(events.back().proximity_event_type(), SNS_PROXIMITY_EVENT_TYPE_FAR);
}

TEST(Proximity, EventWithoutValuesDoesNotParse) {
  HubHarness hub({"fault.short.kind=short_event", "fault.short.sensor=proximity", "fault.short.values=0"});
  const simhub::Suid suid = hub.Find("proximity");
  hub.Configure(suid, 50);
  hub.Run(0.1);
  EXPECT_FALSE(hub.EventsOf(suid, simhub::kProximityEvent).empty());
  EXPECT_TRUE(proximityEvents(hub, suid).empty());
}

TEST(Proximity, NotANumberIsNoCounts) {
  const auto events = readings({"fault.odd.kind=\"nan\"", "fault.odd.sensor=proximity"});
  ASSERT_FALSE(events.empty());
  EXPECT_EQ(events[0].raw_adc(), 0U);
}

}  // namespace
