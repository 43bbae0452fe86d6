#include "simhub/sensors/AmbientLight.h"

#include <cmath>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "simhub/HubHarness.h"

namespace {

constexpr const char* kGroup = "lightchip_0_platform.als.fac_cal";

/// A sensor that errs by `scale` alone, under 300 lx.
std::vector<std::string> quiet(const std::string& scale, std::vector<std::string> more = {}) {
  more.insert(more.begin(), {"world.illuminance=300", "sensor.ambient_light.noise=0",
                             "sensor.ambient_light.quantisation=0", "sensor.ambient_light.scale=" + scale});
  return more;
}

std::string factoryTest() {
  sns_physical_sensor_test_config config;
  config.set_test_type(SNS_PHYSICAL_SENSOR_TEST_TYPE_FACTORY);
  return config.SerializeAsString();
}

/// One reading after it has settled.
double reading(HubHarness* hub) {
  const simhub::Suid suid = hub->Find("ambient_light");
  hub->events.clear();
  hub->Configure(suid, 10);
  hub->Run(1);
  EXPECT_TRUE(hub->Send(suid, simhub::kDisableRequest));
  hub->Run(1);
  const auto readings = hub->Readings(suid);
  EXPECT_FALSE(readings.empty());
  return readings.empty() ? 0 : static_cast<double>(readings.back().data(0));
}

void store(HubHarness* hub, float scale) {
  sns_registry_data data;
  addFloat(&data, "scale", scale);
  EXPECT_EQ(hub->WriteRegistry(kGroup, data), 0);
}

TEST(AmbientLight, ReadsTheIlluminanceTimesItsError) {
  HubHarness hub(quiet("0.8"));
  EXPECT_NEAR(reading(&hub), 240, 1e-4);
}

TEST(AmbientLight, AppliesAStoredScaleOnlyWhenToldToReadItAgain) {
  HubHarness hub(quiet("0.8"));
  store(&hub, 1250);
  EXPECT_NEAR(reading(&hub), 240, 1e-4);
  EXPECT_TRUE(hub.Ask(hub.Find("ambient_light"), simhub::kTestRequest, factoryTest()).has_value());
  EXPECT_NEAR(reading(&hub), 300, 1e-4);
}

TEST(AmbientLight, AppliesAStoredScaleAfterTheNotification) {
  HubHarness hub(quiet("0.8"));
  store(&hub, 500);
  EXPECT_TRUE(hub.Ask(hub.Find("ambient_light"), simhub::kCalibrationChangedRequest).has_value());
  EXPECT_NEAR(reading(&hub), 120, 1e-4);
}

TEST(AmbientLight, AppliesAStoredScaleAfterARestart) {
  HubHarness hub(quiet("0.8"));
  store(&hub, 1250);
  hub.Restart();
  EXPECT_NEAR(reading(&hub), 300, 1e-4);
}

TEST(AmbientLight, RawStreamIgnoresTheRegistry) {
  HubHarness hub(quiet("0.8", {"sensor.ambient_light.calibrated=false"}));
  store(&hub, 1250);
  hub.Restart();
  EXPECT_NEAR(reading(&hub), 240, 1e-4);
}

TEST(AmbientLight, LeavesTheCorrectionFactorToItsReadersUnlessItCorrects) {
  HubHarness plain(quiet("1"));
  EXPECT_NEAR(reading(&plain), 300, 1e-4);
  HubHarness correcting(quiet("1", {"sensor.ambient_light.corrects=1"}));
  EXPECT_NEAR(reading(&correcting), 300 * 1.05, 1e-4);
}

TEST(AmbientLight, SeesInfraredAndColdLightBrighter) {
  HubHarness infrared(quiet("1", {"world.ir_share=0.5", "sensor.ambient_light.infrared_leak=0.2"}));
  EXPECT_NEAR(reading(&infrared), 330, 1e-4);
  HubHarness cold(
      quiet("1", {"world.color_temperature=7000", "sensor.ambient_light.color_temperature_slope=0.05"}));
  EXPECT_NEAR(reading(&cold), 330, 1e-4);
}

TEST(AmbientLight, DarknessIsNeverNegative) {
  HubHarness hub({"world.illuminance=0", "sensor.ambient_light.bias=-5"});
  EXPECT_EQ(reading(&hub), 0);
}

TEST(AmbientLight, IsOfLowAccuracyUntilItHasSettled) {
  HubHarness hub({"sensor.ambient_light.settling_ms=250"});
  const simhub::Suid suid = hub.Find("ambient_light");
  hub.Configure(suid, 10);
  hub.Run(0.55);
  std::vector<int> statuses;
  for (const auto& event : hub.Readings(suid)) statuses.push_back(event.status());
  EXPECT_THAT(statuses, testing::ElementsAre(1, 1, 3, 3, 3));
}

}  // namespace
