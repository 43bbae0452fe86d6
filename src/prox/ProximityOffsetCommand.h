#pragma once

#include <cstdint>
#include <string>

#include "prox/OffsetWords.h"
#include "prox/ProximityCommand.h"
#include "prox/ProximitySums.h"

/// What the variants of "prox" share whose sensor takes an offset off its readings: they print each reading
/// as it comes, keep only the sums, and can have the hub calibrate the offset.
class ProximityOffsetCommand : public ProximityCommand {
 public:
  /// Event thread, mutex held: takes one reading. True when these were enough.
  virtual bool OnProxEvent(const sns_proximity_event& reading, std::uint64_t timestamp) = 0;

 protected:
  ProximityOffsetCommand(ssc::Connection* hubConnection, const char* usage, const char* options,
                         const Source& source)
      : ProximityCommand(hubConnection, usage, options, source) {
    keepsSamples = false;
  }

  /// Switches the automatic calibration of the offset, which also calibrates it now. A hub that refuses is
  /// only reported. 0, or why no answer came, after a level-0 message.
  [[nodiscard]] int RequestPoffset(OffsetTask task);
  /// Sends a request and waits for its answer, for at most three seconds. Readings that come meanwhile do not
  /// count: the sensor streams again when the hub comes back, which has forgotten the request. `failure` is
  /// the level-0 message.
  [[nodiscard]] int RequestSwitch(std::uint32_t messageId, const std::string& payload, const char* failure);
  /// 0 when a collection brought readings, else ssc::kNoData after a level-0 message.
  [[nodiscard]] int RequireReadings() const;
  /// What is printed of readings that were collected.
  void PrintRawAverage() const;

  // Events. On the event thread.

  /// The whole of OnEvent, traced as `function`.
  void HandleEvents(const char* function, const sns_client_event_msg& message);
  /// Mutex held: takes an event that is no reading, if it answers a request. True: it does, and ends the
  /// wait.
  [[nodiscard]] virtual bool OnAnswer(std::uint32_t messageId, const std::string& payload);
  /// Mutex held: prints and adds up a reading. True when these were enough.
  [[nodiscard]] bool TakeReading(const sns_proximity_event& reading, std::uint64_t timestamp);

  /// How an answer calls what was switched.
  struct SwitchName {
    const char* message;  ///< in "malformed … response"
    const char* shown;
  };
  /// Mutex held: reports an answer to a request. One that does not parse fails the wait.
  template <class Answer>
  void TakeAnswer(const std::string& payload, const SwitchName& name) {
    Answer answer;
    const bool parses = answer.ParseFromString(payload);
    reportAnswer(parses, answer.success(), answer.enabled(), name);
  }

  ProximitySums sums_;  ///< guarded by mutex

 private:
  /// Whether the wait is to end.
  [[nodiscard]] bool takeEvents(const sns_client_event_msg& message);
  void reportAnswer(bool parses, bool success, bool isEnabled, const SwitchName& name);
};
