// The stage for the tests of imu-multipoint: a handset whose inertial sensors read what a test says.
#pragma once

#include <array>
#include <cstdlib>
#include <filesystem>
#include <functional>
#include <limits>
#include <memory>
#include <string>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "imu/ImuMultipointCalibrator.h"
#include "ssc/Log.h"
#include "support/ArgumentWords.h"
#include "support/Capture.h"
#include "support/ScriptedHub.h"
#include "support/TemporaryFolder.h"

inline constexpr const char* kAccelGroup = "chipa_0_platform.accel.fac_cal";
inline constexpr const char* kGyroGroup = "chipa_0_platform.gyro.fac_cal";
inline constexpr const char* kUsage = "Usage: vantle imu-multipoint [OPTIONS] [first | last]\n";
inline constexpr int kInvalid = -22;
inline constexpr int kNoData = -61;
inline constexpr float kNan = std::numeric_limits<float>::quiet_NaN();

inline void addMatrixItem(sns_registry_data* data, const std::string& name, float diagonal) {
  auto* item = data->add_items();
  item->set_name(name);
  for (int i = 0; i < 9; ++i) {
    const std::string element = std::to_string(i / 3) + "_" + std::to_string(i % 3);
    addFloatItem(item->mutable_subgrp(), element, i % 4 == 0 ? diagonal : 0, 4);
  }
}

/// A handset whose IMU reads what a test says. The ids put the accelerometer first.
class ImuMultipointTest : public testing::Test {
 protected:
  ImuMultipointTest() {
    ::setenv("VANTLE_ROOT", folder.path().c_str(), 1);
    support::makeDeviceFolders(folder.path());
    ssc::setLogLevel(ssc::kLogInfo);
    script->sensors = {{accel, "accel", "ChipA accelerometer"},
                       {gyro, "gyro", "ChipA gyroscope"},
                       {temperature, "sensor_temperature", "ChipA thermometer"}};
    reading(accel, {0, 0, 9.8F});
    reading(gyro, {0.01F, 0.02F, 0.03F});
    reading(temperature, {25.5F});
    for (const char* group : {kAccelGroup, kGyroGroup}) {
      sns_registry_data data;
      addMatrixItem(&data, "corr_mat", 1);
      addVectorItem(&data, "bias", {0, 0, 0}, 3);
      addFloatItem(&data, "other", 1, 9);
      script->registry[group] = data;
    }
    options.quiet = true;
  }
  ~ImuMultipointTest() override {
    ::unsetenv("VANTLE_ROOT");
    ssc::setLogLevel(ssc::kLogInfo);
  }

  ScriptedSensor& sensor(const ssc::SensorUid& suid) {
    for (ScriptedSensor& candidate : script->sensors) {
      if (candidate.suid == suid) return candidate;
    }
    return script->sensors.front();
  }
  void readings(const ssc::SensorUid& suid, std::function<std::vector<float>(int)> at) {
    sensor(suid).reading = std::move(at);
  }
  void reading(const ssc::SensorUid& suid, const std::vector<float>& values) {
    readings(suid, [values](int) { return values; });
  }
  void silence(const ssc::SensorUid& suid) { sensor(suid).reading = nullptr; }

  void perPhase() { options.deviceType = DeviceType::t5h5; }

  Captured run(std::initializer_list<const char*> words) {
    ArgumentWords argumentWords(words);
    options.command = "imu-multipoint";
    options.argc = argumentWords.argc();
    options.argv = argumentWords.argv();
    script->requests.clear();
    connection = connectTo(script);
    ImuMultipointCalibrator calibrator(connection.get());
    return capture([&] { return calibrator.Run(options); });
  }

  [[nodiscard]] std::string file() const { return support::readFile(path).value_or("(none)"); }
  void writeFile(const std::string& bytes) const { ASSERT_TRUE(support::writeFile(path, bytes)); }
  [[nodiscard]] bool hasFile() const { return std::filesystem::exists(path); }

  [[nodiscard]] int writes() const { return script->countRequests(HubScript::registrySuid(), 513); }
  [[nodiscard]] int notifications() const {
    return script->countRequests(accel, 610) + script->countRequests(gyro, 610);
  }

  /// The records of a whole per-phase procedure of a perfect handset.
  [[nodiscard]] static std::string wholeProcedure() {
    return "a+x 9.8 0 0 0 0 0 25 2 0 0 0\ng+x 9.8 0 0 1 0 0 25 2 2 0 0\na-x -9.8 0 0 0 0 0 25 2 0 0 0\n"
           "a+y 0 9.8 0 0 0 0 25 2 0 0 0\ng+y 0 9.8 0 0 1 0 25 2 0 2 0\na-y 0 -9.8 0 0 0 0 25 2 0 0 0\n"
           "a+z 0 0 9.8 0 0 0 25 2 0 0 0\ng+z 0 0 9.8 0 0 1 25 2 0 0 2\na-z 0 0 -9.8 0 0 0 25 2 0 0 0\n";
  }
  Captured runLastPhase() {
    return run({"imu-multipoint", "--a+x-refx=9.8", "--a+y-refy=9.8", "--a+z-refz=9.8", "--g+x-refx=2",
                "--g+y-refy=2", "--g+z-refz=2", "last"});
  }

  /// Six positions of a perfect handset, the sixth of which is still to be measured.
  void writeFivePositions() const {
    std::string bytes;
    for (const auto& mean :
         std::vector<std::array<float, 7>>{{9.80665F, 0, 0, 0.01F, 0.02F, 0.03F, 25.5F},
                                           {-9.80665F, 0, 0, 0.01F, 0.02F, 0.03F, 25.5F},
                                           {0, 9.80665F, 0, 0.01F, 0.02F, 0.03F, 25.5F},
                                           {0, -9.80665F, 0, 0.01F, 0.02F, 0.03F, 25.5F},
                                           {0, 0, -9.80665F, 0.01F, 0.02F, 0.03F, 25.5F}}) {
      bytes.append(reinterpret_cast<const char*>(mean.data()), sizeof(mean));
    }
    writeFile(bytes);
  }

  const ssc::SensorUid accel{1, 1};
  const ssc::SensorUid gyro{2, 2};
  const ssc::SensorUid temperature{3, 3};
  support::TemporaryFolder folder;
  const std::filesystem::path path = folder.path() / "data/app-ephemeral/vantle_imu";
  Calibrator::Arguments options;
  std::shared_ptr<HubScript> script = std::make_shared<HubScript>();
  std::unique_ptr<ssc::Connection> connection;
};
