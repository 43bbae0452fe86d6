// A magnetometer with raw stream and temperature on a scripted hub, and "mag" run on it.
#pragma once

#include <initializer_list>
#include <memory>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "mag/MagCalibrator.h"
#include "mag/MagScript.h"

class MagCalibration : public testing::Test {
 protected:
  MagCalibration() {
    script->sensors = {magnetometer(), rawMagnetometer(), magThermometer()};
    sns_registry_data& data = script->registry[kMagGroup];
    addVectorItem(&data, "bias", {0, 0, 0}, 4);
    addMatrixItem(&data, "corr_mat", {1, 0, 0, 0, 1, 0, 0, 0, 1});
    addFloatItem(&data, "mean_temp", 0, 7);
  }

  /// "mag" with a reference of 20, 0 and −40 µT.
  Captured run(const CommandSettings& settings = {}) {
    return runCommand<MagCalibrator>(script, {"mag", "--", "20", "0", "-40"}, settings);
  }
  Captured runWords(std::initializer_list<const char*> words, const CommandSettings& settings = {}) {
    return runCommand<MagCalibrator>(script, words, settings);
  }

  ScriptedSensor& calibrated() { return script->sensors[0]; }
  ScriptedSensor& raw() { return script->sensors[1]; }
  ScriptedSensor& temperature() { return script->sensors[2]; }
  void withoutRawStream() { script->sensors.erase(script->sensors.begin() + 1); }

  sns_registry_data& group() { return script->registry[kMagGroup]; }
  void setItem(const char* name, const std::vector<float>& values) {
    removeItem(name);
    if (values.size() == 9) {
      addMatrixItem(&group(), name, values);
    } else {
      addVectorItem(&group(), name, values, 4);
    }
  }
  void removeItem(const std::string& name) {
    sns_registry_data kept;
    for (const sns_registry_data_item& item : group().items()) {
      if (item.name() != name) *kept.add_items() = item;
    }
    group().Swap(&kept);
  }

  /// The raw stream sends these readings and then nothing.
  void sendRawReadings(const std::vector<std::vector<float>>& readings) {
    script->onRequest = [readings](ScriptedHub& hub, const sns_client_request_msg& request) {
      if (request.msg_id() != ssc::kStreamConfigRequest) return false;
      if (ssc::SensorUid(request.suid()) != kMagRawSuid) return false;
      std::chrono::milliseconds at{0};
      for (const auto& reading : readings)
        hub.SendReading(at += std::chrono::milliseconds(20), kMagRawSuid, reading);
      return true;
    };
  }

  void expectNothingStored() const {
    EXPECT_TRUE(writesOf(*script).empty());
    for (const auto& suid : {kMagSuid, kMagRawSuid}) {
      EXPECT_EQ(script->countRequests(suid, ssc::kCalibrationChangedRequest), 0);
    }
  }

  std::shared_ptr<HubScript> script = std::make_shared<HubScript>();
};
