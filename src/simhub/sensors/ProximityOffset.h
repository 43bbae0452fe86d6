#pragma once

#include "simhub/sensors/Proximity.h"

namespace simhub {

/// What a proximity sensor takes off its light, in counts at the reference emitter setting: a number of whole
/// counts, and, with its range extended, a number of coarse steps before that.
struct ProximityOffset {
  static constexpr double kMaxSteps = 15;

  double counts = 0;
  double steps = 0;
  double stepCounts = 0;  ///< what one step takes off

  [[nodiscard]] double Light() const { return counts + steps * stepCounts; }
  /// Makes it take off `light`, as far as `range` counts and, if extended, the steps reach.
  void Learn(double light, double range, bool isExtended);
};

/// Three values: the light in whole counts of 0 to 65535, and the two parts of the offset that was taken off
/// it. The emitter's pulses and their current ("ppulse" and "pldrive" of the registry) multiply what is left
/// after the offset, so that a reading is in proportion to both.
///
/// The offset is the registry's ("poffset", "ore") until the sensor learns it anew from the light of the
/// moment: when it is told to, and, while it calibrates automatically, whenever there is less light than it
/// takes off. (It never takes off more by itself: it cannot tell dirt on the window from a target.)
class ProximityOffsetSensor final : public ProximitySensor {
 public:
  ProximityOffsetSensor(const SensorConfig& config, const SensorSurroundings& surroundings);
  void Read(Time time, std::vector<float>* values) override;
  void ApplyCalibration(const sns_registry_data& group) override;
  bool HandleRequest(const SensorRequest& request, std::vector<SensorAnswer>* answers) override;
  void Restart() override;

 private:
  [[nodiscard]] bool switchOffset(const SensorRequest& request);
  [[nodiscard]] bool switchExtension(const SensorRequest& request);
  void learn(Time time);

  ProximityOffset offset_;
  double emitter_ = 1;  ///< factor against the reference setting
  bool isAutomatic_ = false;
  bool isExtended_ = false;
};

}  // namespace simhub
