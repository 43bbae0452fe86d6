// A handset's magnetometer for the scripted hub, and commands run on it.
#pragma once

#include <initializer_list>
#include <memory>
#include <string>
#include <vector>

#include "framework/Calibrator.h"
#include "ssc/MessageIds.h"
#include "ssc/RegistryUtil.h"
#include "support/ArgumentWords.h"
#include "support/Capture.h"
#include "support/ScriptedHub.h"

inline const ssc::SensorUid kMagSuid{31, 1};
inline const ssc::SensorUid kMagRawSuid{32, 1};
inline const ssc::SensorUid kMagTemperatureSuid{33, 1};

inline constexpr const char* kMagGroup = "magchip_0_platform.mag.fac_cal";
inline constexpr const char* kMagMatrixGroup = "magchip_0_platform.mag.fac_cal.corr_mat";

/// An alternating reading about `mean`: its standard deviation is a little more than `amplitude`.
[[nodiscard]] inline std::function<std::vector<float>(int)> wobble(std::vector<float> mean,
                                                                   float amplitude = 0.5F) {
  return [mean = std::move(mean), amplitude](int index) {
    std::vector<float> reading = mean;
    for (float& value : reading) value += index % 2 == 0 ? amplitude : -amplitude;
    return reading;
  };
}

[[nodiscard]] inline ScriptedSensor magnetometer() {
  return {kMagSuid, "mag", "MagChip_0", SNS_STD_SENSOR_STREAM_TYPE_STREAMING, true, wobble({30, 5, -50})};
}

[[nodiscard]] inline ScriptedSensor rawMagnetometer() {
  return {kMagRawSuid,          "mag_raw", "MagChip_0", SNS_STD_SENSOR_STREAM_TYPE_STREAMING, true,
          wobble({40, 15, -60})};
}

[[nodiscard]] inline ScriptedSensor magThermometer() {
  return {kMagTemperatureSuid,
          "sensor_temperature",
          "MagChip_0",
          SNS_STD_SENSOR_STREAM_TYPE_STREAMING,
          true,
          [](int) { return std::vector<float>{27.5F}; }};
}

inline void addMatrixItem(sns_registry_data* data, const std::string& name,
                          const std::vector<float>& values) {
  sns_registry_data_item* const item = data->add_items();
  item->set_name(name);
  ssc::RegistryUtil::CreateRegistryMatrix(values, item->mutable_subgrp());
}

/// The numbers of a vector or matrix item, in their order.
[[nodiscard]] inline std::vector<float> numbersOf(const sns_registry_data& data, const std::string& name) {
  const sns_registry_data_item* const item = ssc::RegistryUtil::FindDataItem(name, data);
  return item == nullptr ? std::vector<float>{} : ssc::RegistryUtil::GetRegistryVector(item->subgrp());
}

[[nodiscard]] inline int versionOf(const sns_registry_data& data, const std::string& name) {
  const sns_registry_data_item* const item = ssc::RegistryUtil::FindDataItem(name, data);
  return item == nullptr || !item->has_version() ? 0 : item->version();
}

/// The groups of the registry writes that the hub has seen, in their order.
[[nodiscard]] inline std::vector<sns_registry_write_req> writesOf(const HubScript& script) {
  std::vector<sns_registry_write_req> writes;
  for (const sns_client_request_msg& request : script.requests) {
    if (ssc::SensorUid(request.suid()) != HubScript::registrySuid()) continue;
    if (request.msg_id() != ssc::kRegistryWriteRequest) continue;
    writes.emplace_back().ParseFromString(request.request().payload());
  }
  return writes;
}

struct CommandSettings {
  DeviceType deviceType = DeviceType::o1v1;
  bool dryRun = false;
  bool quiet = true;
  bool reset = false;
};

/// Runs a command, the first of `words`, on the scripted hub.
template <class Command>
[[nodiscard]] Captured runCommand(const std::shared_ptr<HubScript>& script,
                                  std::initializer_list<const char*> words,
                                  const CommandSettings& settings = {}) {
  ArgumentWords owned(words);
  Calibrator::Arguments arguments;
  arguments.deviceType = settings.deviceType;
  arguments.dryRun = settings.dryRun;
  arguments.quiet = settings.quiet;
  arguments.reset = settings.reset;
  arguments.command = *words.begin();
  arguments.argc = owned.argc();
  arguments.argv = owned.argv();
  const std::unique_ptr<ssc::Connection> connection = connectTo(script);
  return capture([&] {
    Command command(connection.get());
    return command.Run(arguments);
  });
}
