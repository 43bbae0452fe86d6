#pragma once

#include <optional>
#include <string>

#include "framework/Calibrator.h"
#include "framework/DataFile.h"
#include "light/ColorFit.h"

/// "color" of handsets with a color sensor: takes a record of means under each of several light sources, one
/// of them an infrared lamp, in a run of its own each; computes from all of them the scales of the light
/// sensor and the lines that turn ratios of channels into color temperatures; or verifies what is stored.
class ColorCalibrator final : public Calibrator {
 public:
  explicit ColorCalibrator(ssc::Connection* hubConnection);

  [[nodiscard]] int Run(const Arguments& arguments) override;
  /// Stores neutral values. Knows no dry run and serves every device type.
  [[nodiscard]] int Reset();
  [[nodiscard]] int ParseArgs(const Arguments& arguments);
  [[nodiscard]] int FindSensors();
  [[nodiscard]] int Verify();
  [[nodiscard]] int CollectData();
  [[nodiscard]] int Calibrate();

  /// Keeps samples of high accuracy; true when both sensors have enough with an infrared. A change of a
  /// sensor's gain starts it afresh.
  bool OnSensorEvent(const ssc::SensorUid& suid, std::uint64_t timestamp,
                     const sns_std_sensor_event& event) override;

  /// Appends the means (see colorMeans) with the reference to the working file and the log. ssc::kNoData,
  /// ssc::kNotPermitted or ssc::kShortFile after a level-0 message.
  [[nodiscard]] int SaveData(const SampleData& means);
  /// The records of the working file. On a failure, which is a level-0 message and a result as above,
  /// `records` are those that are whole.
  [[nodiscard]] int LoadData(std::vector<SampleData>* records);

  /// Verification: turns the collected samples into what the stored calibration makes of them. Both fail with
  /// ssc::kInvalid where there is none that can be used.
  [[nodiscard]] int UnbatchAls();
  [[nodiscard]] int UnbatchColor();

 private:
  /// What a calibration stores. Neutral initially.
  struct Parameters {
    float crosstalk = 0;
    std::optional<float> irRatio;  ///< nothing: the stored one stays
    float luxScale = 1;
    std::optional<float> bmScale;  ///< nothing: the stored one stays
    SampleData brFit{0, 1};        ///< K, and K per unit of the ratio, like the others
    SampleData bmrmFit{0, 1};
    SampleData bocFit{0, 1};
  };

  void setDefaults();
  [[nodiscard]] bool isVerifying() const { return verifyPercent > 0; }
  [[nodiscard]] int parseOptions(const Arguments& arguments, std::vector<const char*>* words);
  [[nodiscard]] int parseReferences(const std::vector<const char*>& words);
  [[nodiscard]] static int removeDataFile();
  [[nodiscard]] std::string alsGroup() const;
  [[nodiscard]] std::string colorGroup() const;
  [[nodiscard]] bool hasEnoughSamples() const;

  /// CollectData without its closing lines.
  [[nodiscard]] int collectRecord();
  [[nodiscard]] int collect();
  void printMeans(const SampleData& means) const;
  [[nodiscard]] FileStart fileStart() const { return clearData ? FileStart::kTruncate : FileStart::kKeep; }
  void appendToLog(const SampleData& means) const;

  /// Calibrate without its last line.
  [[nodiscard]] int computeAndStore();
  [[nodiscard]] int compute(std::vector<SampleData> records, Parameters* parameters);
  /// Takes the record of the infrared lamp out of the others.
  [[nodiscard]] int takeIrOnly(std::vector<SampleData>* records, SampleData* irOnly);
  [[nodiscard]] int fitLines(const std::vector<SampleData>& records, Parameters* parameters);
  [[nodiscard]] static int checkFinite(const Parameters& parameters);
  [[nodiscard]] int readGroups(sns_registry_data* als, sns_registry_data* color);
  [[nodiscard]] int writeGroups(const Parameters& parameters, sns_registry_data als, sns_registry_data color);

  /// Verify without its last line.
  [[nodiscard]] int measureAndCompare();
  [[nodiscard]] int compare(float luxMean, float cctMean) const;

  ssc::SensorUid alsSuid;    ///< "ambient_light_raw"
  bool clearData = false;    ///< the first step: what was collected before goes
  bool clearOnly = false;    ///< only that
  ssc::SensorUid colorSuid;  ///< "color_raw"
  float referenceCct = -1;   ///< K; negative: not given
  float referenceLux = -1;   ///< negative: not given
  std::int32_t sampleCount = 10;
  std::string sensorName;          ///< the sensors' package
  float verifyPercent = 0;         ///< 0: calibrate
  bool writeAfterCollect = false;  ///< the last step
  bool writeOnly = false;          ///< without a step

  std::map<ssc::SensorUid, std::int32_t> irCounts_;  ///< guarded by mutex: samples with an infrared
};
