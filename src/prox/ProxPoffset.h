#pragma once

#include "prox/ProximityOffsetCommand.h"

/// "prox" of handsets whose hub calibrates the proximity sensor's offset by itself: has it do so now,
/// switches that off or on, and shows what the sensor reads. Stores nothing and knows no reset.
class ProxPoffset final : public ProximityOffsetCommand {
 public:
  explicit ProxPoffset(ssc::Connection* hubConnection);

  [[nodiscard]] int Run(const Arguments& arguments) override;
  [[nodiscard]] int ParseArgs(const Arguments& arguments);

  void OnEvent(const sns_client_event_msg& message) override;
  bool OnProxEvent(const sns_proximity_event& reading, std::uint64_t timestamp) override;

 private:
  [[nodiscard]] int sample();

  OffsetTask task_ = OffsetTask::kNone;
};
