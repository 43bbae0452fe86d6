#pragma once

#include <cstdint>
#include <map>
#include <optional>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "framework/Calibrator.h"
#include "framework/ProgressLine.h"

/// "imu-thermal": measures how the readings of the accelerometer and the gyroscope drift while the handset
/// lies still and warms up, and stores for each a straight line of the temperature. Prints the same of the
/// magnetometer and the barometer, and stores nothing of them.
class ImuThermalCalibrator final : public Calibrator {
 public:
  explicit ImuThermalCalibrator(ssc::Connection* hubConnection);

  [[nodiscard]] int Run(const Arguments& arguments) override;
  [[nodiscard]] int ParseArgs(const Arguments& arguments);
  [[nodiscard]] int LookupSuids();
  [[nodiscard]] int Calibrate();
  /// Deletes the stored models. Asks the hub nothing, and knows no dry run.
  [[nodiscard]] int Reset();

  [[nodiscard]] int ValidateTemperatures();
  /// 0, also when there is too little to compare; ssc::kInvalid after a bump.
  [[nodiscard]] int DetectBumpsByTemperature();
  [[nodiscard]] int DetectBumpsByTime();
  /// Fits the accelerometer or the gyroscope, and prints and stores the model.
  [[nodiscard]] int CalibrateSensor(const ssc::SensorUid& sensor);

  /// Gives each sample of the sensor its temperature, once, and drops the samples that get none.
  void InterpolateTemperature(const ssc::SensorUid& sensor, const ssc::SensorUid& temperature);
  /// Fits the sensor, and prints the model under `name` when there is one. `scale` and `bias` may be null.
  /// 0, or ssc::kNoData after a level-0 message.
  [[nodiscard]] int CorrelateTemperature(const ssc::SensorUid& sensor, const ssc::SensorUid& temperature,
                                         const char* name, SampleData* scale, SampleData* bias);
  static void PrintScaleAndBias(const char* name, const SampleData& scale, const SampleData& bias);

  bool OnSensorEvent(const ssc::SensorUid& suid, std::uint64_t timestamp,
                     const sns_std_sensor_event& event) override;

 private:
  struct StoredModel;
  enum class Rejection { kNoTemperature, kBackInTime };

  [[nodiscard]] bool hasRawValues() const;
  [[nodiscard]] bool isInertial(const ssc::SensorUid& suid) const;
  [[nodiscard]] bool isTemperature(const ssc::SensorUid& suid) const;
  [[nodiscard]] int takeOption(const Arguments& arguments, int option, const char* argument);
  /// Looks up a sensor and the temperature sensor of its package, and has both streamed.
  [[nodiscard]] int lookupWithTemperature(const char* dataType, const char* name, std::size_t axes,
                                          ssc::SensorUid* sensor, ssc::SensorUid* temperature);
  /// Whether the sample is kept; says once for each sensor that one is not.
  [[nodiscard]] bool isUsable(const ssc::SensorUid& suid, double time, const sns_std_sensor_event& event);
  void rejectSample(const ssc::SensorUid& suid, Rejection why);
  void updateProgress();
  /// Calibrate without its first and last line.
  [[nodiscard]] int measureAndStore();
  [[nodiscard]] int collect();
  [[nodiscard]] static int reportBump(float jump);
  [[nodiscard]] int readStored(const char* sensorWord, StoredModel* stored);
  void mergeStored(const char* sensorName, const StoredModel& stored, SampleData* scale,
                   SampleData* bias) const;
  [[nodiscard]] int requireFiniteModel(const ssc::SensorUid& sensor, const SampleData& scale,
                                       const SampleData& bias);
  [[nodiscard]] int store(const SampleData& scale, const SampleData& bias, StoredModel* stored);

  std::int32_t bumpBucketSize_ = 0;  ///< samples to a group of the old bump detector
  float bumpTemperatureRange_ = 0;   ///< °C to a group of the present one
  float bumpThreshold_ = 0;          ///< sensor units between the means of neighbouring groups
  std::int32_t durationSeconds_ = -1;
  bool skipTemperatureCheck_ = false;
  bool useOldBumpDetector_ = false;

  ssc::SensorUid accelSuid_;
  ssc::SensorUid gyroSuid_;
  ssc::SensorUid imuTemperatureSuid_;
  ssc::SensorUid magSuid_;
  ssc::SensorUid magTemperatureSuid_;
  ssc::SensorUid pressureSuid_;
  ssc::SensorUid pressureTemperatureSuid_;

  /// °C, one for each sample that InterpolateTemperature left of the sensor.
  std::map<ssc::SensorUid, std::vector<float>> temperatures_;

  sns_std_sensor_event rawEvent_;                                  ///< guarded by mutex: kept for its buffer
  std::set<std::pair<ssc::SensorUid, Rejection>> rejectionsSaid_;  ///< guarded by mutex
  ProgressLine progress_;  ///< guarded by mutex while a collection runs
};
