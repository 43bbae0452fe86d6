#pragma once

#include "prox/ProximityOffsetCommand.h"

/// "prox" of handsets whose proximity sensor looks through the display: shows what its raw stream reads, has
/// the hub calibrate its offset and stores that, extends the offset's range, and drives the emitter so that a
/// target reads as it should.
class UdProxCalibrator final : public ProximityOffsetCommand {
 public:
  explicit UdProxCalibrator(ssc::Connection* hubConnection);

  [[nodiscard]] int Run(const Arguments& arguments) override;
  /// Restores the default emitter setting of the device type. Knows no dry run.
  [[nodiscard]] int Reset(const Arguments& arguments);
  [[nodiscard]] int ParseArgs(const Arguments& arguments);

  /// Stores the offset and its extension that the collected readings showed.
  [[nodiscard]] int UpdateRegistry();
  /// Stores the pulse number at which the target reads what it should.
  [[nodiscard]] int PulseCalibrate();
  /// Stores the pulse current at which the target reads what it should.
  [[nodiscard]] int PldriveCalibrate();

  void OnEvent(const sns_client_event_msg& message) override;
  /// Of each collection the first good reading is thrown away: it may have been begun before the sensor was
  /// set as it is now.
  bool OnProxEvent(const sns_proximity_event& reading, std::uint64_t timestamp) override;

 private:
  // Arguments.
  [[nodiscard]] int parseTask(const std::vector<const char*>& words);
  /// The words from index `first` on that the task needs; further ones are ignored.
  [[nodiscard]] int parseValues(const std::vector<const char*>& words, std::size_t first);
  [[nodiscard]] int parseTarget(const char* word);
  [[nodiscard]] int parsePulse(const char* word, const char* what, float* value);

  // The tasks.
  [[nodiscard]] int sample();
  [[nodiscard]] int poffset();
  [[nodiscard]] int ore();
  /// Collects, and requires readings of a collection that ended well.
  [[nodiscard]] int collect(Printing printing);
  /// Prints the average and requires that it is above 0.
  [[nodiscard]] int requireLight(float average) const;
  [[nodiscard]] int readGroup(const char* item, sns_registry_data* data);
  [[nodiscard]] int writeAndNotify(const sns_registry_data& data);
  // PulseCalibrate, PldriveCalibrate and UpdateRegistry without their first and last lines.
  [[nodiscard]] int calibratePulses(sns_registry_data* data);
  [[nodiscard]] int measurePulses(float stored, float* pulseNumber);
  [[nodiscard]] int calibrateCurrent(sns_registry_data* data);
  [[nodiscard]] int measureCurrent(std::int64_t stored, std::int64_t* current);
  [[nodiscard]] int storeOffset(sns_registry_data* data);

  [[nodiscard]] bool OnAnswer(std::uint32_t messageId, const std::string& payload) override;

  OffsetTask task_ = OffsetTask::kNone;
  float pulseNumber_ = 0;  ///< below 0: not given
  float pulseLength_ = 0;  ///< below 0: not given
  float pdataTarget_ = 0;  ///< raw counts; below 0: not given
  bool storesOffset_ = false;
  bool isArmed_ = false;          ///< guarded by mutex: the next good reading counts
  bool reportedMissing_ = false;  ///< guarded by mutex
};
