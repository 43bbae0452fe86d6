#pragma once

#include "proto/sns_proximity.pb.h"
#include "simhub/Sensor.h"

namespace simhub {

/// What proximity sensors have in common: the light that a target throws back, which falls with the square of
/// the target's distance, and the window's cross-talk that adds to it; proximity events of whole counts; near
/// from the registry's "near_threshold" on, far from its "far_threshold" down, and between them what was said
/// before.
class ProximitySensor : public Sensor {
 public:
  [[nodiscard]] std::uint32_t EventId() const override { return kProximityEvent; }
  void Encode(std::span<const float> values, sns_std_sensor_sample_status status,
              std::string* payload) override;
  void ApplyCalibration(const sns_registry_data& group) override;
  void Restart() override { isNear_ = false; }

 protected:
  /// Counts go from 0 to `topCount`.
  ProximitySensor(const SensorConfig& config, const SensorSurroundings& surroundings, double topCount)
      : Sensor(config, surroundings), topCount_(topCount) {}

  /// Both kinds of light together, in counts of a sensor that does not err.
  [[nodiscard]] double LightAt(Time time) const;
  /// The light in whole counts, by which the sensor decides near or far.
  [[nodiscard]] float Count(double light);

 private:
  const double topCount_;
  float nearThreshold_ = 0;  ///< counts
  float farThreshold_ = 0;   ///< counts
  bool isNear_ = false;
  sns_proximity_event event_;  ///< reused, so that a reading allocates nothing
};

/// Two values: the light in whole counts of 0 to 255, and the same before it is cut to counts.
class Proximity final : public ProximitySensor {
 public:
  Proximity(const SensorConfig& config, const SensorSurroundings& surroundings);
  void Read(Time time, std::vector<float>* values) override;
};

}  // namespace simhub
