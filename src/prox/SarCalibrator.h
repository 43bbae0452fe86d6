#pragma once

#include <string>

#include "framework/Calibrator.h"
#include "prox/SarOffsets.h"

/// "sar": lets one of the handset's SAR sensors compensate with nothing near it, and stores what it came to,
/// with a margin, as the most that it may ever compensate. So a hand that is there when the sensor starts is
/// not taken for part of the handset.
class SarCalibrator final : public Calibrator {
 public:
  explicit SarCalibrator(ssc::Connection* hubConnection);

  [[nodiscard]] int Run(const Arguments& arguments) override;
  /// Deletes the sensor's registry file. Knows no dry run.
  [[nodiscard]] int Reset();
  [[nodiscard]] int ParseArgs(const Arguments& arguments);
  [[nodiscard]] int LookupSuid();
  [[nodiscard]] int Calibrate();

  /// Takes the compensation's answer; the sensor's readings do not matter.
  void OnEvent(const sns_client_event_msg& message) override;

 private:
  [[nodiscard]] std::string groupName() const;
  /// Finds the sensor with the wanted hardware ID among `suids`, and reads its name.
  [[nodiscard]] int selectSensor(const std::vector<ssc::SensorUid>& suids);
  /// Calibrate without its first and last line.
  [[nodiscard]] int measureAndStore();
  /// Starts the sensor, lets it compensate and stops it. 0 when offsets_ are what it answered.
  [[nodiscard]] int compensate();
  [[nodiscard]] int requestCompensation();
  [[nodiscard]] int checkOffsets() const;
  [[nodiscard]] int store(const SarOffsets& limits);
  /// Takes a response; false when it does not parse.
  [[nodiscard]] bool takeResponse(const std::string& payload);

  std::int32_t hardwareId_ = 0;
  SarOffsets offsets_;      ///< guarded by mutex: what the sensor answered
  std::string sensorName_;  ///< the sensor's whole name, in lower case
  ssc::SensorUid suid_;
};
