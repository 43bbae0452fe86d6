// How the inertial sensors drift, and how a stored thermal model takes the drift off.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "simhub/HubHarness.h"

namespace {

using testing::FloatNear;
using testing::IsEmpty;
using testing::Pointwise;

constexpr float kGravity = 9.80665F;
constexpr const char* kThermalScale = "dynamic.fac_cal.accel.thermal.scale";

/// A handset at a steady 40 °C whose accelerometer errs in nothing.
std::vector<std::string> steady(std::vector<std::string> more = {}) {
  for (const char* const setting : {"bias=0", "scale=1", "noise=0", "temperature_slope=0"}) {
    more.push_back("sensor.accel." + std::string(setting));
  }
  more.push_back("world.temperature=40");
  return more;
}

void expectReading(HubHarness& hub, const char* dataType, const std::vector<float>& expected) {
  const simhub::Suid suid = hub.Find(dataType);
  hub.Configure(suid, 20);
  hub.Run(0.5);
  const auto readings = hub.Readings(suid);
  ASSERT_FALSE(readings.empty());
  EXPECT_THAT(std::vector<float>(readings.back().data().begin(), readings.back().data().end()),
              Pointwise(FloatNear(1e-5F), expected));
}

sns_registry_data vectorOf(const std::vector<float>& values) {
  sns_registry_data group;
  for (std::size_t i = 0; i < values.size(); ++i) {
    sns_registry_data_item* const item = group.add_items();
    item->set_name(std::string(1, static_cast<char>('x' + i)));
    item->set_flt(values[i]);
  }
  return group;
}

TEST(ImuSensorsThermal, DriftFromTheReferenceTemperature) {
  HubHarness hub({"sensor.gyro.bias=0.25", "sensor.gyro.scale=1", "sensor.gyro.noise=0",
                  "sensor.gyro.temperature_slope=[0.01, -0.02, 0]", "sensor.gyro.reference_temperature=25",
                  "world.temperature=35"});
  expectReading(hub, "gyro", {0.35F, 0.05F, 0.25F});
}

TEST(ImuSensorsThermal, TheScaleTakesTheDriftOffOnceTheSensorIsTold) {
  HubHarness hub(steady());
  ASSERT_TRUE(hub.WriteRegistry(kThermalScale, vectorOf({0.01F, -0.02F, 0.03F})));
  expectReading(hub, "accel", {0, 0, kGravity});
  ASSERT_TRUE(hub.Ask(hub.Find("accel"), simhub::kCalibrationChangedRequest));
  expectReading(hub, "accel", {-0.4F, 0.8F, kGravity - 1.2F});
}

TEST(ImuSensorsThermal, TheScaleTakesTheDriftOffAfterAFactoryTest) {
  HubHarness hub(steady());
  ASSERT_TRUE(hub.WriteRegistry(kThermalScale, vectorOf({0.01F, 0, 0})));
  sns_physical_sensor_test_config config;
  config.set_test_type(SNS_PHYSICAL_SENSOR_TEST_TYPE_FACTORY);
  ASSERT_TRUE(hub.Ask(hub.Find("accel"), simhub::kTestRequest, config.SerializeAsString()));
  expectReading(hub, "accel", {-0.4F, 0, kGravity});
}

TEST(ImuSensorsThermal, TheScaleTakesTheDriftOffAfterARestart) {
  HubHarness hub(steady());
  ASSERT_TRUE(hub.WriteRegistry(kThermalScale, vectorOf({0, 0.01F, 0})));
  hub.Restart();
  expectReading(hub, "accel", {0, -0.4F, kGravity});
}

TEST(ImuSensorsThermal, UncalibratedValuesKeepTheirDrift) {
  HubHarness hub(steady({"sensor.accel.with_raw=1"}));
  ASSERT_TRUE(hub.WriteRegistry(kThermalScale, vectorOf({0.01F, 0, 0})));
  hub.Restart();
  expectReading(hub, "accel", {-0.4F, 0, kGravity, 0, 0, kGravity});
}

TEST(ImuSensorsThermal, AModelOfTooFewAxesIsNone) {
  HubHarness hub(steady());
  ASSERT_TRUE(hub.WriteRegistry(kThermalScale, vectorOf({0.01F, 0.01F})));
  hub.Restart();
  expectReading(hub, "accel", {0, 0, kGravity});
}

TEST(ImuSensorsThermal, EveryBuiltInHandsetStartsWithEmptyModels) {
  for (const std::string& name : simhub::builtInScenarios()) {
    HubHarness hub({}, name);
    for (const char* const group :
         {"accel.thermal.scale", "accel.thermal.bias", "gyro.thermal.scale", "gyro.thermal.bias"}) {
      const auto items = hub.ReadRegistry(std::string("dynamic.fac_cal.") + group);
      ASSERT_TRUE(items) << name << " " << group;
      EXPECT_THAT(items->items(), IsEmpty()) << name << " " << group;
    }
  }
}

}  // namespace
