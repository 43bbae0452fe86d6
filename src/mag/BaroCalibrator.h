#pragma once

#include <string>
#include <vector>

#include "framework/Calibrator.h"

/// What a barometer's samples under a known pressure say. All in hPa and 32-bit float.
struct BaroMeasurement {
  float mean = 0;
  float stdev = 0;  ///< not a number for a single sample
  float bias = 0;   ///< what the driver has to subtract from uncalibrated readings
};

/// bias = mean − reference + applied, where `appliedBiasHpa` is what the samples already have subtracted: 0
/// for uncalibrated samples, the stored bias for calibrated ones.
[[nodiscard]] BaroMeasurement measureBaro(const std::vector<Sample>& samples, float referenceHpa,
                                          float appliedBiasHpa);

/// "baro": measures the barometer's offset from a reference pressure and stores it, with the sensor's mean
/// temperature, in the factory calibration.
class BaroCalibrator final : public Calibrator {
 public:
  explicit BaroCalibrator(ssc::Connection* hubConnection);

  [[nodiscard]] int Run(const Arguments& arguments) override;
  [[nodiscard]] int ParseArgs(const Arguments& arguments);
  [[nodiscard]] int LookupSuids();
  [[nodiscard]] int Calibrate();
  /// Stores the neutral calibration. Knows no dry run.
  [[nodiscard]] int Reset();

 private:
  [[nodiscard]] std::string groupName() const;
  /// Calibrate without its first and last line.
  [[nodiscard]] int measureAndStore();
  void reportPreviousBias(float previousBias) const;
  /// Prints the measurement and checks it against its limits.
  [[nodiscard]] int check(const BaroMeasurement& measurement, float temperature) const;
  [[nodiscard]] int store(float bias, float temperature, sns_registry_data* data);

  std::string packageName_;
  float referencePressure_ = -1;  ///< hPa
  float limit_ = -1;              ///< hPa; not above 0: no limit
  int seconds_ = 2;
  ssc::SensorUid pressureSuid_;
  ssc::SensorUid temperatureSuid_;
  bool raw_ = false;  ///< the stream is the uncalibrated one
};
