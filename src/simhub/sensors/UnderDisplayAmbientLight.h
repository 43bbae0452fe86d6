#pragma once

#include <array>
#include <string>

#include "simhub/Sensor.h"
#include "simhub/sensors/LightControl.h"
#include "simhub/sensors/LuxEstimate.h"

namespace simhub {

/// Eight values: lux, the counts of the channels C, R, G, B and IR, the gain setting and the integration time
/// in µs. It sees the light outside through the display, and the display's own: a share of it that depends on
/// when it integrates within the display's refresh, and pulses at low brightness. The channels are as
/// measured; lux is made of them by the registry's calibration. Once started it integrates in its own time,
/// with automatic gain, triggered after the registry's delay, until its requests say otherwise.
class UnderDisplayAmbientLight final : public Sensor {
 public:
  UnderDisplayAmbientLight(const SensorConfig& config, const SensorSurroundings& surroundings);

  void Read(Time time, std::vector<float>* values) override;
  void ApplyCalibration(const sns_registry_data& group) override;
  bool HandleRequest(const SensorRequest& request, std::vector<SensorAnswer>* answers) override;
  void Restart() override;

 private:
  static constexpr std::size_t kChannels = kFilteredChannels + 1;  // C, R, G, B, IR
  using Channels = std::array<double, kChannels>;

  [[nodiscard]] DisplayPicture picture(Time time) const;
  [[nodiscard]] double leakShare(Time time) const;
  [[nodiscard]] Channels trueCounts(Time time, const DisplayPicture& display) const;
  [[nodiscard]] int highestGainFor(const Channels& counts) const;
  [[nodiscard]] double amplification(std::size_t channel) const;

  const std::string te2Table_;
  LightControl control_;
  LuxCalibration calibration_;
};

}  // namespace simhub
