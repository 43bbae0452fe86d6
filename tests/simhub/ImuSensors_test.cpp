#include "simhub/sensors/ImuSensors.h"

#include <cmath>
#include <numbers>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "simhub/HubHarness.h"
#include "simhub/Pose.h"

namespace {

using testing::ElementsAre;
using testing::FloatNear;
using testing::HasSubstr;
using testing::SizeIs;

constexpr double kGravity = 9.80665;

// A handset with perfect sensors in a pose, so that what is left is the geometry.
std::vector<std::string> perfect(std::vector<std::string> more) {
  more.insert(more.end(), {"sensor.accel.bias=0", "sensor.accel.scale=1", "sensor.accel.noise=0",
                           "sensor.gyro.bias=0", "sensor.gyro.scale=1", "sensor.gyro.noise=0"});
  return more;
}

sns_std_sensor_event lastReading(HubHarness& hub, const std::string& dataType, double seconds) {
  const simhub::Suid suid = hub.Find(dataType);
  hub.Configure(suid, 100);
  hub.Run(seconds);
  const auto readings = hub.Readings(suid);
  return readings.empty() ? sns_std_sensor_event() : readings.back();
}

struct Pose {
  const char* angles;
  std::array<float, 3> gravity;
};

class SixPoses : public testing::TestWithParam<Pose> {};

TEST_P(SixPoses, LoadGravityOnTheAxisThatPointsUp) {
  HubHarness hub(perfect({std::string("world.pose=") + GetParam().angles}));
  const auto reading = lastReading(hub, "accel", 1);
  EXPECT_THAT(reading.data(),
              ElementsAre(FloatNear(GetParam().gravity[0], 1e-5F), FloatNear(GetParam().gravity[1], 1e-5F),
                          FloatNear(GetParam().gravity[2], 1e-5F)));
}

constexpr float kG = static_cast<float>(kGravity);
INSTANTIATE_TEST_SUITE_P(ImuSensors, SixPoses,
                         testing::Values(Pose{"[0,-90,0]", {kG, 0, 0}}, Pose{"[0,90,0]", {-kG, 0, 0}},
                                         Pose{"[90,0,0]", {0, kG, 0}}, Pose{"[-90,0,0]", {0, -kG, 0}},
                                         Pose{"[0,0,0]", {0, 0, kG}}, Pose{"[180,0,45]", {0, 0, -kG}}));

TEST(ImuSensors, ATiltSharesGravityBetweenAxes) {
  HubHarness hub(perfect({"world.pose=[30,0,0]", "world.gravity=10"}));
  const auto reading = lastReading(hub, "accel", 1);
  EXPECT_THAT(reading.data(),
              ElementsAre(FloatNear(0, 1e-5F), FloatNear(5, 1e-5F),
                          FloatNear(static_cast<float>(10 * std::cos(std::numbers::pi / 6)), 1e-5F)));
}

TEST(ImuSensors, ATurnOfTheHandsetTurnsTheRoomTheOtherWay) {
  const simhub::Vector3 north = simhub::toHandsetFrame({0, 0, 90}, {0, 1, 0});
  EXPECT_NEAR(north[0], 1, 1e-12);  // its right side, x, now points north
  EXPECT_NEAR(north[1], 0, 1e-12);
}

TEST(ImuSensors, ARotationComesUpToItsRateAndTurnsItsAngle) {
  HubHarness hub(perfect({"world.rotation.axis=y", "world.rotation.rate=-90", "world.rotation.angle=180",
                          "world.rotation.ramp=0.5", "world.rotation.at=0.2"}));
  const simhub::Suid gyro = hub.Find("gyro");
  hub.Configure(gyro, 400);
  hub.Run(4);
  double angle = 0;
  double fastest = 0;
  for (const auto& reading : hub.Readings(gyro)) {
    angle += static_cast<double>(reading.data(1)) / 400;
    fastest = std::min(fastest, static_cast<double>(reading.data(1)));
    EXPECT_EQ(reading.data(0), 0);
  }
  EXPECT_NEAR(angle, -std::numbers::pi, 1e-3);
  EXPECT_NEAR(fastest, -std::numbers::pi / 2, 1e-6);
}

TEST(ImuSensors, ReadingsWithBothHaveTheUncalibratedValuesBehindTheCalibratedOnes) {
  HubHarness hub({"sensor.accel.noise=0", "sensor.accel.bias=[0.5,0,0]", "sensor.accel.scale=1"}, "t5h5");
  const std::string group = "imuchip5_0_platform.accel.fac_cal";
  auto registry = hub.ReadRegistry(group);
  ASSERT_TRUE(registry);
  for (auto& item : *registry->mutable_items()) {
    if (item.name() == "bias") item.mutable_subgrp()->mutable_items(0)->set_flt(0.5F);
  }
  ASSERT_EQ(hub.WriteRegistry(group, *registry), SNS_REGISTRY_WRITE_STATUS_SUCCESS);
  const simhub::Suid accel = hub.Find("accel");
  EXPECT_THAT(lastReading(hub, "accel", 1).data(), ElementsAre(0.5F, 0, kG, 0.5F, 0, kG));
  // It reads the registry again only when it is told to.
  ASSERT_TRUE(hub.Ask(accel, simhub::kCalibrationChangedRequest));
  EXPECT_THAT(lastReading(hub, "accel", 1).data(), ElementsAre(0, 0, kG, 0.5F, 0, kG));
}

TEST(ImuSensors, TheFamilyDecidesWhetherTheBiasGoesBeforeOrAfterTheMatrix) {
  for (const bool biasFirst : {false, true}) {
    HubHarness hub({"sensor.accel.noise=0", "sensor.accel.bias=[1,1,1]", "sensor.accel.scale=1",
                    std::string("sensor.accel.bias_first=") + (biasFirst ? "1" : "0"),
                    R"(registry."imuchip_0_platform.accel.fac_cal".bias.z=1.0)",
                    R"(registry."imuchip_0_platform.accel.fac_cal".corr_mat.2_2=2.0)"});
    const float z = lastReading(hub, "accel", 1).data(2);
    EXPECT_NEAR(z, biasFirst ? 2 * kGravity : 2 * (kGravity + 1) - 1, 1e-5);
  }
}

TEST(ImuSensors, OutliersComeAsOftenAsAskedAndNoMore) {
  HubHarness hub(
      perfect({"sensor.accel.outliers=3", "sensor.accel.outlier_every=10", "sensor.accel.outlier_size=7"}));
  const simhub::Suid accel = hub.Find("accel");
  hub.Configure(accel, 100);
  hub.Run(1);
  const auto readings = hub.Readings(accel);
  ASSERT_THAT(readings, SizeIs(testing::Gt(60U)));
  for (std::size_t i = 0; i < readings.size(); ++i) {
    EXPECT_EQ(readings[i].data(0), i == 9 || i == 19 || i == 29 ? 7 : 0) << i;
  }
}

std::string problemsOf(const std::vector<std::string>& overrides) {
  simhub::Scenario scenario;
  std::string error;
  return simhub::loadScenario("o1v1", overrides, &scenario, &error) ? "" : error;
}

TEST(Rotation, HasToBePossible) {
  EXPECT_THAT(problemsOf({"world.rotation.rate=90"}), HasSubstr("has to be \"x\", \"y\" or \"z\""));
  EXPECT_THAT(problemsOf({"world.rotation.axis=w"}), HasSubstr("\"w\" is not x, y or z"));
  EXPECT_THAT(problemsOf({"world.rotation.axis=x", "world.rotation.angle=10", "world.rotation.ramp=2"}),
              HasSubstr("is not reached at this rate"));
  EXPECT_THAT(problemsOf({"world.rotation.axis=x", "world.rotation.rate=0"}),
              HasSubstr("is not reached at this rate"));
  EXPECT_THAT(problemsOf({"world.rotation.axis=x", "world.rotation_rate=[1,0,0]"}),
              HasSubstr("give one of them"));
  EXPECT_THAT(problemsOf({"world.rotation.axis=x", "world.rotation.speed=1"}), HasSubstr("speed"));
  EXPECT_EQ(problemsOf({"world.rotation.axis=x"}), "");
}

}  // namespace
