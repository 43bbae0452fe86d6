#pragma once

#include <chrono>
#include <functional>
#include <string>
#include <vector>

#include "light/AmbientLightCommand.h"
#include "light/UdAlsArguments.h"
#include "light/UdAlsGain.h"
#include "light/UdAlsRequests.h"

/// "als" of handsets whose light sensor looks through the display: scales it, sets it up by requests of its
/// own, and measures what the display does to it. One step of a calibration a run; the steps meet in a
/// working file. Sources: UdAlsCalibrator.cpp (the run, requests, events), UdAlsSteps.cpp (collecting and
/// files), UdAlsCalibrations.cpp (what the steps lead to), UdAlsDelayScan.cpp (delays and the TE2 signal),
/// UdAlsReset.cpp.
class UdAlsCalibrator final : public AmbientLightCommand {
 public:
  explicit UdAlsCalibrator(ssc::Connection* hubConnection);

  [[nodiscard]] int Run(const Arguments& arguments) override;
  /// Restores the defaults of the device type. Knows no dry run.
  [[nodiscard]] int Reset(const Arguments& arguments);
  [[nodiscard]] int ParseArgs(const Arguments& arguments);

  // Computations over the working file's records, each with its closing line. 0; ssc::kNoData for too few
  // records or a fit that cannot be made; ssc::kInvalid for a result that is not finite; or what reading the
  // file, or reading or writing the registry, returned.

  [[nodiscard]] int CalibrateLux();
  [[nodiscard]] int GainCalibrate();
  [[nodiscard]] int IRGainCalibrate();
  [[nodiscard]] int PwmCalibrate();
  [[nodiscard]] int ScreenPatternCalibrate();
  [[nodiscard]] int DelayCalibrate();
  /// Compares the stream with the reference. ssc::kInvalid outside the tolerance.
  [[nodiscard]] int Verify();

  /// Writes the edges into the display's TE2 table. ssc::kNotPermitted when that fails.
  [[nodiscard]] int SetTe2(int risingEdge, int fallingEdge);
  /// One step of a delay scan: sets the delay, collects.
  [[nodiscard]] int SetAlsDelayAndCollectData(float delay, const char* csvPath);

  // One step: collects, prints the means, logs the samples, appends a record to the working file.

  [[nodiscard]] int CollectData(const char* csvPath);
  [[nodiscard]] int CollectDelayCalData(const char* csvPath);

  // Files. 0; ssc::kNoData for too few values; ssc::kNotPermitted when a file cannot be opened;
  // ssc::kShortFile for a short read or write.

  /// Appends a line; with -r the file holds that line alone afterwards.
  [[nodiscard]] int SaveDataToCsv(const char* path, const SampleData& sample);
  /// Appends a line. A log that cannot be opened is left out without a word.
  [[nodiscard]] int SaveDelayDataToCsv(const char* path, const SampleData& sample);
  [[nodiscard]] int SaveData(const SampleData& means);
  /// Records as of UdAlsFiles.h. Those before an error are kept.
  [[nodiscard]] int LoadData(std::vector<SampleData>* records);

  void OnEvent(const sns_client_event_msg& message) override;
  void OnReconnect() override;
  /// Keeps the first eight values; prints the sample at once at the highest log level.
  bool OnSensorEvent(const ssc::SensorUid& eventSuid, std::uint64_t timestamp,
                     const sns_std_sensor_event& event) override;

 protected:
  bool OnOtherEvent(const Event& event) override;

 private:
  // The run (UdAlsCalibrator.cpp).
  [[nodiscard]] int dispatch();
  /// Says what it does, and sends the mode's request.
  [[nodiscard]] int configure();
  /// Sends the mode's request and waits for the answer. A failure is a level-0 message; an answer that says
  /// "failed" is logged when it comes, and none.
  [[nodiscard]] int sendRequest(const UdAlsRequest& request);
  [[nodiscard]] int runLux();
  /// A step, as far as one is asked for, and the computation, as far as that is.
  [[nodiscard]] int runStep(const char* csvPath, int (UdAlsCalibrator::*calibrate)());
  [[nodiscard]] int sampleOnly();
  [[nodiscard]] int makeScaleNeutral();

  // Steps (UdAlsSteps.cpp).
  /// Streams until there are enough samples. 0, or a failure after a level-0 message.
  [[nodiscard]] int collect(std::chrono::seconds period, bool print);
  /// What CollectSamples may take for a step.
  [[nodiscard]] std::chrono::seconds stepPeriod() const;
  [[nodiscard]] int collectStep(const char* csvPath,
                                int (UdAlsCalibrator::*log)(const char*, const SampleData&));
  [[nodiscard]] int appendRecord(const SampleData& means);
  void printMeans(const SampleData& means) const;
  /// 0, also where there is no file, or kNotPermitted after a level-0 message.
  [[nodiscard]] static int removeDataFile();
  static void startLog(const char* path, const char* header);
  /// The delay of the step: of the TE2 signal while that is scanned.
  [[nodiscard]] float delayOfStep() const;

  // Computations (UdAlsCalibrations.cpp).
  [[nodiscard]] int calibrateLux();
  [[nodiscard]] int calibrateGain();
  [[nodiscard]] int calibrateIrGain();
  [[nodiscard]] int calibratePwm();
  [[nodiscard]] int calibratePattern();
  [[nodiscard]] int calibrateDelay();
  [[nodiscard]] int measureAndCompare();
  /// Loads at least `least` records. ssc::kNoData after a level-0 message that there is too little for
  /// `what`.
  [[nodiscard]] int loadRecords(std::size_t least, const char* what, std::vector<SampleData>* records);
  /// Reads the group, lets `change` put the results into it (0, or a result that ends it with nothing
  /// written), writes it and tells the sensor. `shown` is said between the announcement of the write and the
  /// write.
  [[nodiscard]] int store(const std::function<int(sns_registry_data*)>& change,
                          const std::string& shown = std::string());
  [[nodiscard]] int storeGainRatios(const std::vector<std::pair<const char*, GainRatios>>& channels);

  // Delays (UdAlsDelayScan.cpp).
  [[nodiscard]] int scanDelays();
  [[nodiscard]] int scanTe2Delays();
  [[nodiscard]] int runDelayScan();
  static void programTe2(float delay);

  UdAlsArguments words_;
  float te2Delay_ = UdAlsArguments::kNotGiven;  ///< of the TE2 signal, while it is scanned
};
