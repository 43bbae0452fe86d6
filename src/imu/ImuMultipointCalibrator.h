#pragma once

#include <array>
#include <map>
#include <string>
#include <vector>

#include "framework/Calibrator.h"
#include "framework/Matrix3by3.h"
#include "imu/ImuMultipointFile.h"
#include "imu/ImuMultipointFit.h"
#include "imu/ImuMultipointSolution.h"

/// Removes what earlier steps left for the last one. A file that is not there is fine.
void ClearIntermediateFiles();

/// "imu-multipoint": calibrates accelerometer and gyroscope from several poses and rotations. One run is one
/// step; what it measured waits in a file for the last step, which computes, prints and stores.
///
/// Handsets whose inertial events carry uncalibrated values name the phase of each step ("a+x" … "g+z"); the
/// last step solves for full 3×3 corrections. On all others a step is just another position at rest; the last
/// step fits a scale and a bias for each axis of the accelerometer, and averages the gyroscope.
class ImuMultipointCalibrator final : public Calibrator {
 public:
  using CalibrationInfo = ImuCalibrationInfo;

  explicit ImuMultipointCalibrator(ssc::Connection* hubConnection);

  [[nodiscard]] int Run(const Arguments& arguments) override;
  [[nodiscard]] int ParseArgs(const Arguments& arguments);
  [[nodiscard]] int LookupSuids();
  [[nodiscard]] int Calibrate();
  /// Stores the neutral calibration of both sensors. Knows no dry run.
  [[nodiscard]] int Reset();

  /// Drops readings below high accuracy and, where events carry calibrated and uncalibrated values, keeps the
  /// uncalibrated ones.
  bool OnSensorEvent(const ssc::SensorUid& suid, std::uint64_t timestamp,
                     const sns_std_sensor_event& event) override;

  // The file of the per-phase procedure. `path` is a device path.

  /// 0, or -1 after a level-0 message.
  [[nodiscard]] static int AppendCalibrationInfoToFile(const CalibrationInfo& info, const char* path);
  /// Empty, after a level-0 message, when it cannot be read.
  [[nodiscard]] static std::vector<CalibrationInfo> ReadCalibrationInfoListFromFile(const char* path);

 private:
  enum Step : int { kFirst = 0, kIntermediate = 1, kLast = 2 };

  /// Largest values that are accepted; not above 0: whatever comes.
  struct Limits {
    float accelBias = 0;   ///< m/s²
    float accelScale = 0;  ///< of the scale itself, not of its distance from 1
    float accelStdev = 0;  ///< m/s²
    float gyroBias = 0;
    float gyroStdev = 0;
  };

  /// One option of ParseArgs. 0, kHelpPrinted or ssc::kInvalid.
  [[nodiscard]] int takeOption(const Arguments& arguments, int option, const char* argument);
  /// Where the number of a limit or of the window goes; null for any other option.
  [[nodiscard]] float* limitOf(int option);

  /// Whether each step names its phase.
  [[nodiscard]] bool isPerPhase() const;
  /// Calibrate without its first and last line.
  [[nodiscard]] int runStep();
  [[nodiscard]] int collect();
  [[nodiscard]] int collectPhase();
  [[nodiscard]] int collectPosition();

  // Checking what was collected.

  [[nodiscard]] int VerifyPosition() const;
  [[nodiscard]] bool ValidateStationaryAccel(const SampleData& accelMean) const;
  [[nodiscard]] int CleanData();
  [[nodiscard]] int VerifyStandardDeviations();
  [[nodiscard]] int verifySensor(const ssc::SensorUid& suid, const char* label, float stdevLimit);
  [[nodiscard]] static int checkStdev(const char* label, const SampleData& stdev, float limit);
  /// ssc::kNoData, after a level-0 message.
  [[nodiscard]] static int notEnoughSamples(const char* label);

  // The per-phase procedure.

  [[nodiscard]] CalibrationInfo GenerateCalibrationInfo() const;
  [[nodiscard]] SampleData measureRotation(double* integrationTime) const;
  [[nodiscard]] SampleData measureSteadyRate() const;
  [[nodiscard]] SampleData GetAccelMean() const { return meanOfSensor(accelSuid_); }
  [[nodiscard]] SampleData GetGyroMean() const { return meanOfSensor(gyroSuid_); }
  [[nodiscard]] SampleData GetTempMean() const { return meanOfSensor(temperatureSuid_); }
  [[nodiscard]] SampleData meanOfSensor(const ssc::SensorUid& suid) const;
  [[nodiscard]] int solvePhases();
  [[nodiscard]] int calibrateAccelPhases(const std::vector<CalibrationInfo>& records);
  [[nodiscard]] int calibrateGyroPhases(const std::vector<CalibrationInfo>& records);
  [[nodiscard]] AccelCalibrationInput GenerateAccelCalibrationInput(
      const std::vector<CalibrationInfo>& records) const;
  [[nodiscard]] static AccelCalibrationOutput CalibrateAccel2019(const AccelCalibrationInput& input);
  [[nodiscard]] int UpdateAccelRegistry(const AccelCalibrationOutput& output) const;
  [[nodiscard]] GyroCalibrationInput GenerateGyroCalibrationInput(
      const std::vector<CalibrationInfo>& records) const;
  [[nodiscard]] static GyroCalibrationOutput CalibrateGyro2019(const GyroCalibrationInput& input);
  [[nodiscard]] int UpdateGyroRegistry(const GyroCalibrationOutput& output) const;
  /// 0, or ssc::kInvalid after a level-0 message.
  [[nodiscard]] static int requireFinite(const std::string& whose, const Matrix3by3<double>& scale,
                                         const std::array<double, 3>& bias, double temperature);

  // The positional procedure.

  [[nodiscard]] int AppendMultipointData();
  [[nodiscard]] int ReadMultipointData();
  [[nodiscard]] int solvePositions();
  [[nodiscard]] int CalibrateAccel();
  [[nodiscard]] int CalibrateGyro();
  /// What is stored now, reported when it is not neutral.
  [[nodiscard]] int readAccelCorrection(const sns_registry_data& data, AxisCorrection* current) const;
  /// Prints the correction and holds it against its limits.
  [[nodiscard]] int checkAccelCorrection(const AxisCorrection& correction) const;
  /// The mean temperature over the stored positions.
  [[nodiscard]] float positionsTemperature() const;
  [[nodiscard]] int writeGroup(const std::string& group, const sns_registry_data& data) const;

  [[nodiscard]] int resetAccel();
  [[nodiscard]] int resetGyro();

  std::string phase_;
  float gravity_ = 0;  ///< m/s²
  Limits limits_;
  /// By sensor: the mean of this run's samples, or one mean for each stored position.
  std::map<ssc::SensorUid, std::vector<SampleData>> means_;
  int seconds_ = 0;
  std::string packageName_;
  Step step_ = kIntermediate;
  ssc::SensorUid accelSuid_;
  ssc::SensorUid gyroSuid_;
  ssc::SensorUid temperatureSuid_;
  Matrix3by3<double> accelReference_;
  Matrix3by3<double> gyroReference_;
  bool useGyroRate_ = false;
  float constRateWindow_ = 0;      ///< s; 0: not given
  sns_std_sensor_event rawEvent_;  ///< guarded by mutex: the event at hand with its uncalibrated values
};
