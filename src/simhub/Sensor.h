// What every simulated sensor is: an identity, the standard attributes, and readings of the world. The hub
// does what is common to all (look-up, attributes, streams, accuracy, test, notification); a model adds what
// it measures, how the registry's calibration acts on it, and requests of its own.
#pragma once

#include <cstdint>
#include <functional>
#include <memory>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "proto/sns_registry.pb.h"
#include "proto/sns_std.pb.h"
#include "simhub/HubTime.h"
#include "simhub/NoiseGenerator.h"
#include "simhub/Protocol.h"
#include "simhub/Scenario.h"
#include "simhub/Suid.h"
#include "simhub/World.h"

namespace simhub {

/// A request of a sensor's own kind.
struct SensorRequest {
  Time time;
  std::uint32_t messageId;
  const std::string& payload;
  bool refuse;  ///< the sensor has to answer with its failure
};

/// An event that answers such a request.
struct SensorAnswer {
  std::uint32_t messageId = 0;
  std::string payload;
  Time delay{0};  ///< more than the hub's own latency
};

/// Reads a group of the registry; empty when there is none, or none that can be used.
using RegistryReader = std::function<sns_registry_data(const std::string& group)>;

/// What the sensors of one hub live in.
struct SensorSurroundings {
  const World& world;
  std::uint64_t seed;      ///< the scenario's
  std::string te2Table{};  ///< as in HubFiles
};

class Sensor {
 public:
  /// `config` and the world outlive the sensor.
  Sensor(const SensorConfig& config, const SensorSurroundings& surroundings);
  virtual ~Sensor() = default;
  Sensor(const Sensor&) = delete;
  Sensor& operator=(const Sensor&) = delete;

  [[nodiscard]] const SensorConfig& Config() const { return config_; }
  [[nodiscard]] const simhub::Suid& Suid() const { return suid_; }
  /// The registry group of its calibration; empty when it has none.
  [[nodiscard]] std::string CalibrationGroup() const;

  /// The message id of its readings.
  [[nodiscard]] virtual std::uint32_t EventId() const { return kSensorEvent; }

  /// Takes a reading of the world as it was at `time`. `values` comes empty. Calls come in the order of time.
  virtual void Read(Time time, std::vector<float>* values) = 0;
  /// The reading's event, replacing `payload`.
  virtual void Encode(std::span<const float> values, sns_std_sensor_sample_status status,
                      std::string* payload);

  /// Takes what the sensor needs from the registry: at the hub's start, and whenever the sensor is told to
  /// read it again. Here: the group of its calibration, if it has one, for ApplyCalibration.
  virtual void LoadCalibration(const RegistryReader& read);
  /// An empty group is the neutral calibration.
  virtual void ApplyCalibration(const sns_registry_data& /*group*/) {}

  /// Carries out a request of the sensor's own kind. False: it knows no such request.
  virtual bool HandleRequest(const SensorRequest& /*request*/, std::vector<SensorAnswer>* /*answers*/) {
    return false;
  }

  /// The hub starts again: what requests changed is forgotten. The noise goes on.
  virtual void Restart() {}

 protected:
  [[nodiscard]] const World& TheWorld() const { return world_; }
  /// Turns true values into readings that err, in place.
  void Err(Time time, std::span<double> values);

 private:
  const SensorConfig& config_;
  const World& world_;
  const simhub::Suid suid_;
  NoiseGenerator noise_;
  sns_std_sensor_event event_;  ///< reused, so that a reading allocates nothing
};

/// Makes the sensor of a section.
using SensorMaker = std::function<std::unique_ptr<Sensor>(const SensorConfig&, const SensorSurroundings&)>;

/// The package a sensor's name stands for, in lower case: cut at the first blank, else at the first
/// underscore.
[[nodiscard]] std::string packageName(std::string_view sensorName);

/// The attributes of a sensor.
void describeSensor(const SensorConfig& config, sns_std_attr_event* attributes);

}  // namespace simhub
