#pragma once

#include <string>

#include "framework/Calibrator.h"

/// "als" of handsets with a classic ambient light sensor: scales the sensor to a light source of known
/// illuminance, or verifies the scale that it has.
class AlsCalibrator final : public Calibrator {
 public:
  explicit AlsCalibrator(ssc::Connection* hubConnection);

  [[nodiscard]] int Run(const Arguments& arguments) override;
  /// Restores the neutral scale. Knows no dry run and serves every device type.
  [[nodiscard]] int Reset();
  [[nodiscard]] int ParseArgs(const Arguments& arguments);
  [[nodiscard]] int LookupSuid();
  [[nodiscard]] int Verify();
  [[nodiscard]] int Calibrate();

  /// Keeps samples of high accuracy only; true when there are enough of them.
  bool OnSensorEvent(const ssc::SensorUid& eventSuid, std::uint64_t timestamp,
                     const sns_std_sensor_event& event) override;

 private:
  void setDefaults();
  [[nodiscard]] int parseOptions(const Arguments& arguments, std::vector<const char*>* words);
  [[nodiscard]] int parseReference(const std::vector<const char*>& words);
  [[nodiscard]] std::string groupName() const;
  [[nodiscard]] bool hasEnoughSamples() const;
  /// What the samples are to be multiplied by: 1 with -c or when the registry has no factor.
  [[nodiscard]] float correctionFactorOf(const sns_registry_data& data) const;

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
  [[nodiscard]] int requestReread();

  bool correctedOnly = false;  ///< samples are used as the sensor reports them
  float referenceLux = -1;     ///< negative: not given
  std::int32_t sampleCount = 5;
  std::string sensorName;  ///< the sensor's package
  ssc::SensorUid suid;
  float verifyPercent = 0;  ///< 0: calibrate
};
