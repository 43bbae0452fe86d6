#include "simhub/sensors/Color.h"

#include <cmath>

#include <gtest/gtest.h>

#include "simhub/HubHarness.h"

namespace {

enum Value : int { kFirst, kClear, kRed, kGreen, kBlue, kIr, kGain };

/// A chip that does not err, with the overrides.
std::vector<std::string> exact(std::vector<std::string> overrides) {
  for (const char* const sensor : {"color_raw", "ambient_light_raw", "color", "color_light"}) {
    const std::string key = "sensor." + std::string(sensor);
    overrides.insert(overrides.begin(), {key + ".noise=0", key + ".quantisation=0", key + ".scale=1"});
  }
  return overrides;
}

/// Two readings in a row: one with a green, one with an infrared.
std::vector<sns_std_sensor_event> readings(HubHarness* hub, const std::string& dataType) {
  const simhub::Suid suid = hub->Find(dataType);
  hub->events.clear();
  hub->Configure(suid, 10);
  hub->Run(0.25);
  EXPECT_TRUE(hub->Send(suid, simhub::kDisableRequest));
  hub->Run(0.25);
  auto found = hub->Readings(suid);
  EXPECT_EQ(found.size(), 2U);
  if (found.size() == 2 && found[0].data(kIr) >= 0) std::swap(found[0], found[1]);
  return found;
}

std::vector<sns_std_sensor_event> readings(const std::vector<std::string>& overrides,
                                           const std::string& dataType = "color_raw") {
  HubHarness hub(exact(overrides), "p2m2");
  return readings(&hub, dataType);
}

double ratio(const sns_std_sensor_event& event, Value above, Value below) {
  return static_cast<double>(event.data(above)) / static_cast<double>(event.data(below));
}

TEST(Color, MeasuresGreenAndInfraredInTurn) {
  for (const char* const sensor : {"color_raw", "ambient_light_raw"}) {
    const auto found = readings({"world.illuminance=300", "world.infrared=1"}, sensor);
    ASSERT_EQ(found.size(), 2U);
    EXPECT_EQ(found[0].data_size(), 7);
    EXPECT_GT(found[0].data(kGreen), 0);
    EXPECT_EQ(found[0].data(kIr), -1);
    EXPECT_EQ(found[1].data(kGreen), 0);
    EXPECT_GT(found[1].data(kIr), 0);
  }
}

TEST(Color, TemperatureIsLinearInBlueOverRed) {
  for (const double kelvin : {2000, 2800, 5000, 6500, 10000}) {
    const auto found =
        readings({"world.illuminance=300", "world.color_temperature=" + std::to_string(kelvin)});
    EXPECT_NEAR(1000 + 4500 * ratio(found[1], kBlue, kRed), kelvin, 1e-3 * kelvin);
    EXPECT_NEAR(found[1].data(kFirst), kelvin, 1e-3 * kelvin);
    EXPECT_NEAR(static_cast<double>(found[0].data(kClear)),
                static_cast<double>(found[0].data(kRed) + found[0].data(kGreen) + found[0].data(kBlue)),
                0.02);
  }
}

TEST(Color, AnInfraredLampIsSeenThroughTheFiltersOnly) {
  const auto found = readings({"world.illuminance=0", "world.infrared=5"});
  EXPECT_NEAR(ratio(found[1], kRed, kIr), 0.08, 1e-6);
  EXPECT_NEAR(ratio(found[1], kBlue, kIr), 0.08, 1e-6);
  const auto sealed =
      readings({"world.illuminance=0", "world.infrared=5", "sensor.color_raw.infrared_crosstalk=0"});
  EXPECT_EQ(sealed[1].data(kClear), 0);
  EXPECT_EQ(sealed[1].data(kFirst), 0) << "no red, no color temperature";
  const auto lux = readings({"world.illuminance=0", "world.infrared=5"}, "ambient_light_raw");
  EXPECT_EQ(lux[1].data(kFirst), 0);
}

TEST(Color, ASourceHasTheShareOfInfraredThatItIsGiven) {
  const auto half = readings({"world.illuminance=500", "world.ir_share=0.5"});
  // 2 W/m² of each kind, 20 counts for each watt.
  EXPECT_NEAR(static_cast<double>(half[1].data(kIr)), std::ldexp(40.0, static_cast<int>(half[1].data(kGain))),
              0.1);
  const auto all = readings({"world.illuminance=500", "world.ir_share=1"});
  EXPECT_TRUE(std::isfinite(all[1].data(kIr)));
}

TEST(Color, AGainStepDoublesTheCounts) {
  const auto dim = readings({"world.illuminance=100"});
  const auto bright = readings({"world.illuminance=3000"});
  const float steps = dim[1].data(kGain) - bright[1].data(kGain);
  EXPECT_EQ(steps, 5);
  EXPECT_NEAR(static_cast<double>(dim[1].data(kClear)) * 30,
              std::ldexp(static_cast<double>(bright[1].data(kClear)), 5), 1);
  EXPECT_EQ(readings({"world.illuminance=0"})[1].data(kGain), 10);
  const auto sun = readings({"world.illuminance=500000"});
  EXPECT_EQ(sun[1].data(kGain), 0);
  EXPECT_EQ(sun[1].data(kClear), 65535);
}

TEST(Color, TheFiltersErrByThemselves) {
  std::vector<std::string> overrides = exact({"world.illuminance=300"});
  HubHarness hub(overrides, "p2m2");
  overrides.push_back("sensor.color_raw.scale=[0.5,1,2]");
  HubHarness erring(overrides, "p2m2");
  const auto right = readings(&hub, "color_raw");
  const auto wrong = readings(&erring, "color_raw");
  EXPECT_NEAR(ratio(wrong[1], kBlue, kRed), 4 * ratio(right[1], kBlue, kRed), 1e-5);
  EXPECT_EQ(wrong[1].data(kClear), right[1].data(kClear));
  EXPECT_EQ(wrong[0].data(kGreen), right[0].data(kGreen));
}

TEST(Color, CalibratedStreamsApplyTheRegistryWhenTheRawOnesAreNotified) {
  std::vector<std::string> overrides = exact({"world.illuminance=300", "world.color_temperature=5500"});
  overrides.push_back("sensor.color_light.scale=0.5");
  HubHarness hub(overrides, "p2m2");
  EXPECT_NEAR(readings(&hub, "color")[1].data(kFirst), 5500, 1) << "the chip's own line";
  EXPECT_NEAR(readings(&hub, "color_light")[1].data(kFirst), 150, 1e-3);

  sns_registry_data color;
  addFloat(&color, "ratio_coef0", 500);
  addFloat(&color, "ratio_coef1", 3000);
  sns_registry_data als;
  addFloat(&als, "scale", 2);
  EXPECT_EQ(hub.WriteRegistry("lightchip2_platform.color.fac_cal", color), 0);
  EXPECT_EQ(hub.WriteRegistry("lightchip2_platform.als.fac_cal", als), 0);
  EXPECT_NEAR(readings(&hub, "color")[1].data(kFirst), 5500, 1) << "not yet told";
  for (const char* const sensor : {"color_raw", "ambient_light_raw"}) {
    const auto reply = hub.Ask(hub.Find(sensor), simhub::kCalibrationChangedRequest);
    EXPECT_TRUE(reply && reply->messageId == simhub::kCalibrationChangedReply);
  }
  EXPECT_NEAR(readings(&hub, "color")[1].data(kFirst), 3500, 1);
  EXPECT_NEAR(readings(&hub, "color_light")[1].data(kFirst), 300, 1e-3);
  EXPECT_NEAR(readings(&hub, "color_raw")[1].data(kFirst), 5500, 1) << "raw streams stay raw";
}

}  // namespace
