// A thermal calibration over a hub that follows a script.
#pragma once

#include <algorithm>
#include <cmath>
#include <limits>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "imu/ImuThermalCalibrator.h"
#include "ssc/Log.h"
#include "support/ArgumentWords.h"
#include "support/Capture.h"
#include "support/ScriptedHub.h"

inline constexpr int kInvalid = -22;
inline constexpr int kNoData = -61;
inline constexpr const char* kUsage = "Usage: vantle imu-thermal [OPTIONS] SECONDS\n";
inline constexpr const char* kAccelScale = "dynamic.fac_cal.accel.thermal.scale";
inline constexpr const char* kAccelBias = "dynamic.fac_cal.accel.thermal.bias";
inline constexpr const char* kGyroScale = "dynamic.fac_cal.gyro.thermal.scale";
inline constexpr const char* kGyroBias = "dynamic.fac_cal.gyro.thermal.bias";
inline constexpr const char* kFailed = "IMU thermal calibration failed.\n";
inline constexpr const char* kSucceeded = "IMU thermal calibration succeeded.\n";

/// A handset that warms up by one degree a second, and whose readings follow the temperature without noise.
/// Event n of a stream of r Hz is taken at (n + 1) / r seconds.
class ImuThermalTest : public testing::Test {
 protected:
  ImuThermalTest() {
    script->sensors = {{accel, "accel", "ChipA accelerometer"},  {gyro, "gyro", "ChipA gyroscope"},
                       {imuTemp, "sensor_temperature", "ChipA"}, {mag, "mag", "ChipM"},
                       {magTemp, "sensor_temperature", "ChipM"}, {baro, "pressure", "ChipB"},
                       {baroTemp, "sensor_temperature", "ChipB"}};
    for (ScriptedSensor& sensor : script->sensors) {
      if (sensor.dataType == "sensor_temperature") {
        sensor.reading = [](int index) { return std::vector<float>{31.0F + static_cast<float>(index)}; };
      }
    }
    at(accel).reading = [this](int index) {
      return drift(index, {0.001F, -0.002F, 0.0F}, {0.5F, 0.25F, 9.75F});
    };
    at(gyro).reading = [this](int index) {
      return drift(index, {0.0F, 0.0F, 0.0005F}, {0.0F, 0.125F, -0.25F});
    };
    at(mag).reading = [this](int index) { return drift(index, {0.25F, 0.0F, 0.0F}, {10.0F, 20.0F, 30.0F}); };
    at(baro).reading = [](int index) { return std::vector<float>{1000.0F + 0.5F * temperatureAt(index)}; };
    for (const char* const group : {kAccelScale, kAccelBias, kGyroScale, kGyroBias}) script->registry[group];
    options.quiet = true;
  }

  static float temperatureAt(int index) { return 30.0F + static_cast<float>(index + 1) / 20.0F; }

  /// Readings that follow the temperature; with `raw`, calibrated values without drift stand in front.
  [[nodiscard]] std::vector<float> drift(int index, const SampleData& scale, const SampleData& bias) const {
    std::vector<float> values;
    if (raw) values = {7, 8, 9};
    for (std::size_t k = 0; k < 3; ++k) values.push_back(bias[k] + scale[k] * temperatureAt(index));
    return values;
  }

  ScriptedSensor& at(const ssc::SensorUid& suid) {
    for (ScriptedSensor& sensor : script->sensors) {
      if (sensor.suid == suid) return sensor;
    }
    return script->sensors.front();
  }

  /// The temperatures of the inertial unit, one a second; the last one holds.
  void setTemperatures(std::vector<float> temperatures) {
    at(imuTemp).reading = [temperatures = std::move(temperatures)](int index) {
      const auto last = temperatures.size() - 1;
      return std::vector<float>{temperatures[std::min(static_cast<std::size_t>(index), last)]};
    };
  }

  void store(const char* group, const std::vector<float>& values, int version) {
    sns_registry_data data;
    for (std::size_t i = 0; i < values.size(); ++i) {
      addFloatItem(&data, std::string(1, static_cast<char>('x' + i)), values[i], version);
    }
    script->registry[group] = data;
  }

  [[nodiscard]] std::vector<float> stored(const char* group) const {
    std::vector<float> values;
    for (const auto& item : script->registry.at(group).items()) values.push_back(item.flt());
    return values;
  }

  Captured run(std::initializer_list<const char*> words) {
    ArgumentWords argumentWords(words);
    options.command = "imu-thermal";
    options.argc = argumentWords.argc();
    options.argv = argumentWords.argv();
    connection = connectTo(script);
    ImuThermalCalibrator calibrator(connection.get());
    return capture([&] { return calibrator.Run(options); });
  }

  Captured run() { return run({"imu-thermal", "10"}); }

  void expectUsageError(std::initializer_list<const char*> words, const std::string& message) {
    const Captured captured = run(words);
    EXPECT_EQ(captured.result, kInvalid);
    EXPECT_EQ(captured.err, "ERROR: " + message + "\n" + kUsage);
    EXPECT_EQ(captured.out, "");
    EXPECT_TRUE(script->requests.empty());
  }

  [[nodiscard]] int writes() const { return script->countRequests(HubScript::registrySuid(), 513); }

  const ssc::SensorUid accel{1, 1};
  const ssc::SensorUid gyro{2, 2};
  const ssc::SensorUid imuTemp{3, 3};
  const ssc::SensorUid mag{4, 4};
  const ssc::SensorUid magTemp{5, 5};
  const ssc::SensorUid baro{6, 6};
  const ssc::SensorUid baroTemp{7, 7};
  bool raw = false;
  Calibrator::Arguments options;
  std::shared_ptr<HubScript> script = std::make_shared<HubScript>();
  std::unique_ptr<ssc::Connection> connection;
};
