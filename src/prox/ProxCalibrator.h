#pragma once

#include "prox/ProximityCommand.h"
#include "prox/ProximityThresholds.h"

/// "prox" of handsets whose proximity sensor decides near and far by two thresholds: sets one of them to what
/// the sensor reads with a target at that distance, and keeps the other apart from it.
class ProxCalibrator final : public ProximityCommand {
 public:
  explicit ProxCalibrator(ssc::Connection* hubConnection);

  [[nodiscard]] int Run(const Arguments& arguments) override;
  /// Restores the default thresholds. Knows no dry run.
  [[nodiscard]] int Reset();
  [[nodiscard]] int ParseArgs(const Arguments& arguments);
  [[nodiscard]] int Calibrate();

  /// Keeps proximity events of high accuracy as samples of three values: raw counts, distance, and whatever
  /// the event adds. Wakes the command when there are enough of them.
  void OnEvent(const sns_client_event_msg& message) override;

 private:
  [[nodiscard]] bool hasEnoughSamples() const;
  /// Whether the wait is to end.
  [[nodiscard]] bool takeEvents(const sns_client_event_msg& message);

  /// Calibrate without its first and last line.
  [[nodiscard]] int measureAndStore();
  [[nodiscard]] int store(float threshold);
  /// Moves and writes the other mode's threshold when it is too close to the new one.
  [[nodiscard]] int keepApart(float threshold, sns_registry_data* data);

  ProximityMode mode_ = ProximityMode::kNear;
};
