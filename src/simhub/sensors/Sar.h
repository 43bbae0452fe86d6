#pragma once

#include "simhub/Sensor.h"

namespace simhub {

/// A sensor of hands near the antenna, with two electrodes. Two values, in counts: what the top and the
/// bottom electrode see beyond what the sensor has compensated. On request it compensates: takes what it sees
/// then, the handset's own part and the noise of a reading included, for nothing. It never compensates more
/// than the registry's "max_offset_top" and "max_offset_bottom".
class Sar final : public Sensor {
 public:
  using Sensor::Sensor;
  void Read(Time time, std::vector<float>* values) override;
  void ApplyCalibration(const sns_registry_data& group) override;
  bool HandleRequest(const SensorRequest& request, std::vector<SensorAnswer>* answers) override;
  void Restart() override { compensated_ = {}; }

 private:
  /// What the electrodes see; `bias` is the handset's own part.
  [[nodiscard]] std::array<double, 2> see(Time time);

  std::array<double, 2> compensated_{};
  std::array<double, 2> most_{};
};

}  // namespace simhub
