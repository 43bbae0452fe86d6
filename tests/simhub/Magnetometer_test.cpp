#include <array>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "simhub/HubHarness.h"

namespace {

constexpr const char* kGroup = "magchip_0_platform.mag.fac_cal";
constexpr double kTolerance = 1e-4;  // µT; readings travel as 32-bit floats

class Magnetometer : public testing::Test {
 protected:
  /// o1v1 with a soft and hard iron that are easy to follow, without noise.
  explicit Magnetometer(std::vector<std::string> overrides = {}) : hub(withDefaults(std::move(overrides))) {}

  static std::vector<std::string> withDefaults(std::vector<std::string> overrides) {
    const std::vector<std::string> defaults{"world.magnetic_field=[10, 20, -40]", "sensor.mag.noise=0",
                                            "sensor.mag.quantisation=0", "sensor.mag.bias=[1, 2, 3]",
                                            "sensor.mag.soft_iron=[2, 0, 0, 0, 1, 0, 0, 0.5, 1]"};
    overrides.insert(overrides.begin(), defaults.begin(), defaults.end());  // the last of a key counts
    return overrides;
  }

  /// The newest reading after half a second of streaming.
  std::vector<float> read(const std::string& dataType) {
    const simhub::Suid suid = hub.Find(dataType);
    hub.Configure(suid, 50);
    hub.Run(0.5);
    const auto readings = hub.Readings(suid);
    if (readings.empty()) return {};
    return {readings.back().data().begin(), readings.back().data().end()};
  }

  static void expectReading(const std::vector<float>& reading, const std::array<double, 3>& expected) {
    ASSERT_EQ(reading.size(), expected.size());
    for (std::size_t axis = 0; axis < expected.size(); ++axis)
      EXPECT_NEAR(reading[axis], expected[axis], kTolerance);
  }

  /// Stores the bias and a diagonal matrix.
  void store(const std::vector<float>& bias, const std::vector<float>& diagonal) {
    sns_registry_data data;
    constexpr std::array<const char*, 3> kAxes{"x", "y", "z"};
    sns_registry_data_item* const biasItem = addGroup(&data, "bias");
    for (std::size_t i = 0; i < bias.size(); ++i) addFloat(biasItem->mutable_subgrp(), kAxes[i], bias[i]);
    sns_registry_data_item* const matrix = addGroup(&data, "corr_mat");
    for (std::size_t i = 0; i < 9; ++i) {
      addFloat(matrix->mutable_subgrp(), std::to_string(i / 3) + "_" + std::to_string(i % 3),
               i % 4 == 0 ? diagonal[i / 4] : 0.0F);
    }
    ASSERT_EQ(hub.WriteRegistry(kGroup, data), 0);
  }

  HubHarness hub;
};

TEST_F(Magnetometer, RawStreamReadsTheFieldThroughSoftAndHardIron) {
  expectReading(read("mag_raw"), {2 * 10 + 1, 20 + 2, 0.5 * 20 - 40 + 3});
}

TEST_F(Magnetometer, CalibratedStreamStartsOutLikeTheRawOne) { expectReading(read("mag"), {21, 22, -27}); }

TEST_F(Magnetometer, CalibrationSubtractsTheBiasBeforeTheMatrix) {
  store({1, 2, 3}, {0.5, 1, 2});
  ASSERT_TRUE(hub.Ask(hub.Find("mag"), simhub::kCalibrationChangedRequest));
  expectReading(read("mag"), {10, 20, -60});
  expectReading(read("mag_raw"), {21, 22, -27});
}

TEST_F(Magnetometer, NewCalibrationCountsOnlyOnceItIsToldOf) {
  store({1, 2, 3}, {0.5, 1, 2});
  expectReading(read("mag"), {21, 22, -27});
}

TEST_F(Magnetometer, RawStreamIsToldForTheWholeChip) {
  store({1, 2, 3}, {0.5, 1, 2});
  ASSERT_TRUE(hub.Ask(hub.Find("mag_raw"), simhub::kCalibrationChangedRequest));
  expectReading(read("mag"), {10, 20, -60});
}

TEST_F(Magnetometer, StoredCalibrationCountsAfterARestart) {
  store({1, 2, 3}, {0.5, 1, 2});
  hub.Restart();
  expectReading(read("mag"), {10, 20, -60});
}

TEST_F(Magnetometer, TakesSomeTimeToBeAccurate) {
  const simhub::Suid suid = hub.Find("mag_raw");
  hub.Configure(suid, 50);
  hub.Run(0.5);
  const auto readings = hub.Readings(suid);
  ASSERT_GT(readings.size(), 20U);
  EXPECT_LT(readings.front().status(), SNS_STD_SENSOR_SAMPLE_STATUS_ACCURACY_HIGH);
  EXPECT_EQ(readings.back().status(), SNS_STD_SENSOR_SAMPLE_STATUS_ACCURACY_HIGH);
}

class TurnedMagnetometer : public Magnetometer {
 protected:
  TurnedMagnetometer() : Magnetometer({"world.pose=[0, 0, 90]", "sensor.mag.soft_iron=1"}) {}
};

TEST_F(TurnedMagnetometer, ReadsTheFieldAlongTheHandsetsAxes) {
  // The handset's top points west: its x axis points north, its y axis west.
  expectReading(read("mag_raw"), {20 + 1, -10 + 2, -40 + 3});
}

}  // namespace
