// The kinds of sensors there are. A new kind is one row of sensorModels() and one class in sensors/.
#pragma once

#include <cstddef>
#include <memory>
#include <span>
#include <string_view>

#include "simhub/Sensor.h"

namespace simhub {

/// A key that a model's [sensor.KEY] may have besides those of every sensor: a number or a list of numbers.
struct SensorParameter {
  const char* key;
  std::size_t minCount;
  std::size_t maxCount;
  double low;  ///< each number's range
  double high;
  double initial;       ///< each of minCount numbers where the scenario says nothing
  const char* meaning;  ///< with its unit
};

struct SensorModel {
  const char* name;
  /// What follows the package's name in the name of its calibration's registry group; empty when there is
  /// none.
  const char* calibrationSuffix;
  std::span<const SensorParameter> parameters;
  std::unique_ptr<Sensor> (*make)(const SensorConfig& config, const SensorSurroundings& surroundings);
  const char* meaning;
};

[[nodiscard]] std::span<const SensorModel> sensorModels();
[[nodiscard]] const SensorModel* findSensorModel(std::string_view name);
/// By the section's model, which has to be one of those.
[[nodiscard]] std::unique_ptr<Sensor> makeSensor(const SensorConfig& config,
                                                 const SensorSurroundings& surroundings);

}  // namespace simhub
