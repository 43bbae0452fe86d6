#pragma once

#include <chrono>
#include <set>

#include "ssc/Client.h"

/// Tells sensors that their calibration changed and waits until each has confirmed. Made for one use, on the
/// calibrator's connection. Logs nothing: the caller knows what a failure means for its user.
class Notifier final : public ssc::Client {
 public:
  /// How long all confirmations together may take.
  static constexpr std::chrono::seconds kConfirmationTimeout{3};

  explicit Notifier(ssc::Connection* hubConnection) : ssc::Client(hubConnection) {}

  void OnEvent(const sns_client_event_msg& message) override;

  /// 0 when every sensor has confirmed (at once, sending nothing, for none); ssc::kTimedOut when one has not;
  /// or what sending returned.
  [[nodiscard]] int NotifyCalibrationCompleted(const ssc::SensorUid& suid);
  [[nodiscard]] int NotifyCalibrationCompleted(const std::set<ssc::SensorUid>& suids);

 private:
  std::set<ssc::SensorUid> pending_;  ///< guarded by mutex: who has not confirmed yet
};
