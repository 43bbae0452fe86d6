#pragma once

#include "proto/sns_proximity.pb.h"
#include "simhub/Sensor.h"

namespace simhub {

/// Two values: the light that a target throws back, in whole counts of 0 to 255, and the same before it is
/// cut to counts. It falls with the square of the target's distance; the window's cross-talk adds to it.
/// Events say near from the registry's "near_threshold" on, far from its "far_threshold" down, and between
/// them what they said before.
class Proximity final : public Sensor {
 public:
  using Sensor::Sensor;
  [[nodiscard]] std::uint32_t EventId() const override { return kProximityEvent; }
  void Read(Time time, std::vector<float>* values) override;
  void Encode(std::span<const float> values, sns_std_sensor_sample_status status,
              std::string* payload) override;
  void ApplyCalibration(const sns_registry_data& group) override;
  void Restart() override { isNear_ = false; }

 private:
  float nearThreshold_ = 0;  ///< counts
  float farThreshold_ = 0;   ///< counts
  bool isNear_ = false;
  sns_proximity_event event_;  ///< reused, so that a reading allocates nothing
};

}  // namespace simhub
