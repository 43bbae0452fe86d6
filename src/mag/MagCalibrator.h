#pragma once

#include <string>
#include <vector>

#include "framework/Calibrator.h"
#include "framework/Matrix3by3.h"

/// "mag": measures the magnetometer's hard-iron offset in a reference field, through the soft-iron correction
/// that is stored already, and stores it, with the chip's mean temperature where it has one, in the factory
/// calibration.
class MagCalibrator final : public Calibrator {
 public:
  explicit MagCalibrator(ssc::Connection* hubConnection);

  [[nodiscard]] int Run(const Arguments& arguments) override;
  [[nodiscard]] int ParseArgs(const Arguments& arguments);
  [[nodiscard]] int LookupSuids();
  [[nodiscard]] int Calibrate();
  /// Stores a bias of zero. Knows no dry run.
  [[nodiscard]] int Reset();

  /// Keeps the magnetometer's samples of high accuracy only.
  bool OnSensorEvent(const ssc::SensorUid& suid, std::uint64_t timestamp,
                     const sns_std_sensor_event& event) override;

 private:
  /// The stored calibration that the new one starts from.
  struct Stored {
    SampleData bias;                      ///< µT
    Matrix3by3<float> inverseCorrection;  ///< of "corr_mat"; zeros when that has none
  };

  [[nodiscard]] std::string groupName() const;
  /// Calibrate without its first and last line.
  [[nodiscard]] int measureAndStore();
  [[nodiscard]] static int readStored(const sns_registry_data& data, Stored* stored);
  [[nodiscard]] int collect();
  void reportPreviousBias(const SampleData& previousBias) const;
  [[nodiscard]] int parseReference(const std::vector<const char*>& words);
  [[nodiscard]] SampleData computeBias(const SampleData& mean, const Stored& stored) const;
  [[nodiscard]] int checkBias(const SampleData& bias) const;
  [[nodiscard]] int store(const SampleData& bias, float temperature, sns_registry_data* data);

  float limit_ = 0;       ///< µT; not above 0: no limit
  SampleData reference_;  ///< µT: x, y, z
  int seconds_ = 2;
  std::string packageName_;
  bool raw_ = false;  ///< the stream is the uncalibrated one
  ssc::SensorUid magSuid_;
  ssc::SensorUid temperatureSuid_;  ///< only of devices with a temperature channel
};
