#pragma once

#include "light/AmbientLightCommand.h"

/// "als" of handsets with a classic ambient light sensor: scales the sensor to a light source of known
/// illuminance, or verifies the scale that it has.
class AlsCalibrator final : public AmbientLightCommand {
 public:
  explicit AlsCalibrator(ssc::Connection* hubConnection);

  [[nodiscard]] int Run(const Arguments& arguments) override;
  /// Restores the neutral scale. Knows no dry run and serves every device type.
  [[nodiscard]] int Reset();
  [[nodiscard]] int ParseArgs(const Arguments& arguments);
  [[nodiscard]] int Verify();
  [[nodiscard]] int Calibrate();

 private:
  [[nodiscard]] int parseReference(const std::vector<const char*>& words);

  /// Calibrate without its first and last line.
  [[nodiscard]] int measureAndStore();
  /// Verify without its first and last line.
  [[nodiscard]] int measureAndCompare();
  /// Collects, multiplies by `correctionFactor` and prints. 0 when the samples can be measured.
  [[nodiscard]] int collect(float correctionFactor);
  /// Collects, and prints the mean and the deviation. 0 when there is a finite mean.
  [[nodiscard]] int measure(float correctionFactor, float* mean);
  void reportPreviousScale(float previousScale) const;
  [[nodiscard]] int store(float scale, sns_registry_data* data);

  float referenceLux = -1;  ///< negative: not given
};
