#pragma once

#include <cstdint>
#include <string>

#include "framework/Calibrator.h"
#include "proto/sns_proximity.pb.h"
#include "ssc/RegistryUtil.h"

/// What all variants of "prox" are made of: one streaming proximity sensor, found once; so many readings of
/// high accuracy in so much time; and the registry group of the sensor's calibration.
class ProximityCommand : public Calibrator {
 public:
  /// Finds the sensor and its range, once. 0, or the failure of the look-up after a level-0 message.
  [[nodiscard]] int LookupSuid();

 protected:
  /// The sensor that a variant reads, and how fast. The texts must outlive the command.
  struct Source {
    const char* dataType;
    const char* displayName;
    const char* lookupFailure;  ///< level-0 message
    std::int32_t rateHz;
  };

  ProximityCommand(ssc::Connection* hubConnection, const char* usage, const char* options,
                   const Source& source);

  // Arguments.

  /// What every ParseArgs begins with.
  void SetDefaults(const Arguments& arguments, std::int32_t samplesToCollect);
  /// Carries out -h and -s SAMPLES; any other option is a usage error. 0, kHelpPrinted or ssc::kInvalid.
  [[nodiscard]] int HandleOption(const Arguments& arguments, int option, const char* argument);

  // Collecting.

  enum class Printing { kNone, kSamples };
  /// Streams the sensor until a handler ends it. The time for that is what the samples themselves take, in
  /// whole seconds, and three seconds more: the sensor needs a while to become accurate. Results as of
  /// CollectSamples, each failure after a level-0 message; ssc::kTimedOut is a failure here.
  [[nodiscard]] int CollectReadings(Printing printing);

  // Events. On the event thread, mutex held.

  static constexpr std::uint32_t kProximityEvent = 769;
  /// Another sensor's message is none of ours: the registry sensor's write event has the id of a proximity
  /// event.
  [[nodiscard]] bool IsFromSensor(const sns_client_event_msg& message) const;
  /// Null after a level-0 message, with the collection's status set, when the payload does not parse.
  [[nodiscard]] const sns_proximity_event* ParseReading(const std::string& payload);
  /// Whether the reading counts; logged at level 3 when not.
  [[nodiscard]] static bool IsAccurate(const sns_proximity_event& reading);

  // Storing.

  [[nodiscard]] std::string GroupName() const;
  /// The factory test makes the sensor read its calibration again. Its answer is not waited for.
  [[nodiscard]] int RequestReread();
  /// What every reset ends with: writes the group and makes the sensor read it. Asks for a reboot when the
  /// latter cannot be sent. 0 or the library's result.
  [[nodiscard]] int StoreDefaults(ssc::RegistryUtil& registry, const sns_registry_data& data);

  float rangeHigh_ = 0;  ///< the sensor's selected range: what a far event counts as distance
  std::int32_t samplesToCollect_ = 0;
  ssc::SensorUid suid_;

 private:
  const Source source_;
  std::string sensorName_;     ///< the sensor's package
  sns_proximity_event event_;  ///< guarded by mutex: the event at hand, kept for its buffer
};
