#pragma once

#include <functional>
#include <optional>
#include <string>

#include "ssc/Client.h"

namespace ssc {

/// A client for one request and the one event that answers it: what the library's own helpers are made of.
/// The exchanges of a connection take turns, for most answers do not say what they answer. They are for the
/// command's threads: a handler's would wait for an event that only its own return could deliver.
class Exchange final : public Client {
 public:
  /// How long an answering event may take.
  static constexpr std::chrono::seconds kAnswerTimeout{3};

  explicit Exchange(Connection* hubConnection) : Client(hubConnection) {}

  using Event = sns_client_event_msg::sns_client_event;
  /// Looks at one event of the sensor asked: nothing when it is not the answer, else the exchange's result.
  using Matcher = std::function<std::optional<int>(const Event&)>;

  /// Sends `request` to `suid` and waits for the event that `matcher` takes. The matcher runs on the event
  /// thread. The matcher's result; kTimedOut when no answer came within 3 s; kNotConnected when the hub went
  /// away meanwhile; or what sending returned.
  int Run(const SensorUid& suid, const sns_client_request_msg& request, Matcher matcher);

  void OnEvent(const sns_client_event_msg& message) override;
  void OnDisconnect() override;

 private:
  void finish(int result);

  // Guarded by mutex.
  SensorUid suid_;
  Matcher matcher_;
  bool done_ = false;
};

}  // namespace ssc
