// What every command is made of.
//
// A calibrator is made for one command on the driver's connection, runs once and is destroyed. Its Run parses
// the command's words, looks sensors up, streams them for a while and works on what came in. Two threads meet
// here: the command's own, and the connection's event thread, which calls OnEvent, OnSensorEvent and
// OnReconnect. They run only during a collection and hold the client's mutex, so that a calibrator's own
// fields need no other lock.
#pragma once

#include <chrono>
#include <cstdint>
#include <map>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "framework/DeviceType.h"
#include "framework/Sample.h"
#include "proto/sns_registry.pb.h"
#include "proto/sns_std.pb.h"
#include "ssc/Client.h"
#include "ssc/Log.h"
#include "ssc/RegistryUtil.h"

namespace ssc {
class AttrUtil;
}

class Calibrator : public ssc::Client {
 public:
  /// What the driver hands to a command.
  struct Arguments {
    DeviceType deviceType = DeviceType::o1v1;
    bool dryRun = false;
    bool quiet = false;
    bool reset = false;
    std::string command;    ///< the command word
    std::int32_t argc = 0;  ///< words from the command word on, itself included
    char** argv = nullptr;  ///< the command word first

    /// The device type of a handset's or a family's codename, in any case; DeviceType::invalid for any other
    /// text.
    [[nodiscard]] static DeviceType DeviceNameToDeviceType(const std::string& name);
  };

  struct SensorInfo {
    std::string name;               ///< printed above the sensor's samples
    float rate = 0;                 ///< Hz; not above 0: on change
    std::size_t minimumValues = 1;  ///< an event with fewer values is dropped
  };

  void OnEvent(const sns_client_event_msg& message) override;
  void OnReconnect() override;
  ~Calibrator() override = default;

  /// The whole command. 0 or a negative result, which becomes the exit status.
  [[nodiscard]] virtual int Run(const Arguments& arguments) = 0;

  /// Event thread, mutex held: takes one event of a streaming sensor, which has at least as many values as
  /// SetSensorInfo asked for. True ends the collection. Here: stores the sample, never ends.
  virtual bool OnSensorEvent(const ssc::SensorUid& suid, std::uint64_t timestamp,
                             const sns_std_sensor_event& event);

  /// Cuts a sensor's name to its chip's: at the first blank, or, without one, at the first underscore. Null
  /// is ignored.
  static void SensorNameToPackageName(std::string* name);
  /// The attributes of one of several sensors of `dataType` among which a command chooses. False, after a
  /// level-1 message, where the hub does not tell them: the sensor is passed over, whereupon there may seem
  /// to be none, and nothing else would say that one is there.
  [[nodiscard]] static bool LoadCandidate(ssc::AttrUtil& attributeUtil, const std::string& dataType,
                                          const ssc::SensorUid& suid, sns_std_attr_event* attributes);

 protected:
  /// Result of a ParseArgs that has printed the help: Run then ends with 0.
  static constexpr int kHelpPrinted = 1;

  /// The texts must outlive the calibrator.
  Calibrator(ssc::Connection* hubConnection, const char* usage, const char* options);

  // Arguments.

  void CopyGlobalOptions(const Arguments& arguments);
  [[nodiscard]] bool DeviceHasMagTemp() const;
  /// On an error the usage line on standard error; otherwise usage and options on standard output.
  void PrintUsage(bool error) const;
  /// Logs the message at level 0, prints the usage line, and is ssc::kInvalid.
  [[nodiscard]] int UsageError(const char* format, ...) const __attribute__((format(printf, 2, 3)));
  /// The usage error of an option that CommandOptions::Next() returned and the command does not have.
  [[nodiscard]] int InvalidOption(const Arguments& arguments, int option) const;
  /// Level-0 message of a command that the handset does not have; ssc::kNotSupported. No usage.
  [[nodiscard]] static int UnsupportedDevice(const Arguments& arguments);
  /// One level-1 message for each of the words from index `first` on.
  static void IgnoreExtraArguments(const std::vector<const char*>& words, std::size_t first);

  // Sensors.

  /// One sensor for each data type, all of the package (chip) of the first one, whose stream type is
  /// `streamType`. `suids` (may be null) gets them by data type, `packageName` (may be null) the package's
  /// name in lower case. 0; ssc::kNotFound when the package lacks one, after a level-0 message; or the
  /// library's result, silently.
  [[nodiscard]] int LookupSuidsByName(const std::vector<std::string>& dataTypes,
                                      std::map<std::string, ssc::SensorUid>* suids, std::string* packageName,
                                      sns_std_sensor_stream_type streamType);
  /// Looks for a sensor of `dataType` in the package of `sensor` ("pressure_raw" beside "pressure"). A
  /// package without one is normal: false, and nothing is logged that a user sees.
  [[nodiscard]] bool LookupCompanion(const ssc::SensorUid& sensor, const std::string& dataType,
                                     sns_std_sensor_stream_type streamType, ssc::SensorUid* companion);
  /// Makes the sensor one of those that a collection streams. The first call for a sensor counts.
  void SetSensorInfo(const ssc::SensorUid& suid, const std::string& name, float rateHz,
                     std::size_t minimumValues = 1);
  [[nodiscard]] std::vector<std::string> GetAllConfigRequests() const;
  void DisableAllSensors();

  // Events. On the event thread.

  using Event = sns_client_event_msg::sns_client_event;
  /// The whole of an OnEvent that traces itself as `function`: hands the message's events, one by one, to
  /// OnSensorEvent and OnOtherEvent, and wakes the waiter when one of them, or an event that does not parse,
  /// ends the wait. The rest of the message is then left alone.
  void HandleEvents(const char* function, const sns_client_event_msg& message);
  /// Mutex held: a level-1 message with the error that the event reports, after which the sensor's readings
  /// will hardly come; nothing for any other event.
  void LogErrorEvent(const ssc::SensorUid& suid, const Event& event) const;
  /// Mutex held: takes one event that is no reading of a stream. True ends the wait. Here: ignores it.
  virtual bool OnOtherEvent(const Event& event);

  // Collecting.

  /// Streams all sensors for `period` or until a handler ends it, then disables them and, when asked, prints
  /// the samples. 0 when a handler ended it; ssc::kTimedOut when the period has passed, which is the normal
  /// end of most; ssc::kMalformed after an event that does not parse; ssc::kConnectionLost; what sending
  /// returned; or ssc::kInvalid, after a level-0 message and before anything is collected, for a period whose
  /// samples no memory could hold.
  template <class Rep, class Period>
  [[nodiscard]] int CollectSamples(const std::chrono::duration<Rep, Period>& period, bool print) {
    int result = requireMemory(period);
    if (result != ssc::kOk) return result;
    const std::vector<std::string> requests = beginCollection();
    result = SendRequestsAndWait(requests, period, nullptr);
    endCollection(result, print);
    return result;
  }
  /// Sends one request, complete with its sensor, and waits for the event that answers it, for at most three
  /// seconds; `awaitsAnswer` holds meanwhile. Samples of an earlier collection are dropped: they would make
  /// the first event that a stopped stream still brings look like the last one wanted. 0 or the status that
  /// the handler set when it ended the wait; ssc::kTimedOut; or what sending returned. Logs nothing.
  [[nodiscard]] int AskSensor(const sns_client_request_msg& request);
  /// Whether a collection that runs for a time has come to its end.
  [[nodiscard]] static bool IsCollected(int result) { return result == ssc::kOk || result == ssc::kTimedOut; }
  /// 0 when IsCollected(result), else `result`, after a level-0 message where the collection itself logged
  /// none.
  [[nodiscard]] static int RequireCollected(int result);
  /// Prints every sensor's samples and rate; nothing with --quiet.
  void PrintSamples();
  /// 0 when the sensor has samples, else ssc::kNoData after a level-0 message that names it.
  [[nodiscard]] int RequireSamples(const ssc::SensorUid& suid);
  /// The same for a command that counts its samples instead of keeping them.
  [[nodiscard]] int RequireSamples(const ssc::SensorUid& suid, std::size_t count) const;
  /// 0 when all values are finite, else ssc::kInvalid after a level-0 message with `what`.
  [[nodiscard]] static int RequireFinite(const char* what, const std::vector<float>& values);

  // Storing.

  /// In a dry run says that nothing is written, and is true.
  [[nodiscard]] bool SkipsWrite() const;
  enum class WriteFailure {
    kLogged,
    kLeftToCaller,  ///< only traced, at level 3
  };
  /// Writes the group. 0 or the library's result, logged at level 1 unless left to the caller.
  [[nodiscard]] static int StoreGroup(ssc::RegistryUtil& registry, const std::string& group,
                                      const sns_registry_data& data,
                                      WriteFailure failure = WriteFailure::kLogged);
  /// Says that it writes, and writes the group. 0 or the library's result, logged at level 1 unless left to
  /// the caller.
  [[nodiscard]] int WriteRegistry(const std::string& group, const sns_registry_data& data,
                                  WriteFailure failure = WriteFailure::kLogged);
  /// The same for groups that belong together, said once: in their order, up to the first that fails.
  [[nodiscard]] int WriteRegistry(const std::vector<std::pair<std::string, const sns_registry_data*>>& groups,
                                  WriteFailure failure = WriteFailure::kLogged);
  /// The same without saying that it writes: for commands that print results in between.
  [[nodiscard]] int WriteRegistryGroups(
      const std::vector<std::pair<std::string, const sns_registry_data*>>& groups,
      WriteFailure failure = WriteFailure::kLogged);
  /// Tells the sensors that their calibration changed; a failure is two warnings, since what was written
  /// stays.
  void NotifyOrWarn(const std::set<ssc::SensorUid>& suids,
                    const char* warning = "Unable to notify sensor of completed calibration",
                    const char* advice = "A reboot may be required for the calibration to take effect");
  /// The closing line: "<what> succeeded." or "<what> failed.". Returns `result`.
  static int Conclude(const char* what, int result);
  [[nodiscard]] static const char* Outcome(int result) { return result == ssc::kOk ? "succeeded" : "failed"; }

  /// Level of what says, beside a command's own lines, why a collection failed. A command that is to say no
  /// more than its own lines traces it.
  int hubTroubleLevel = ssc::kLogWarn;
  bool keepsSamples = true;  ///< false in a command that only adds its samples up
  bool dryRun = false;
  bool quiet = false;
  DeviceType deviceType = DeviceType::o1v1;
  std::map<ssc::SensorUid, std::vector<Sample>>
      samples;  ///< guarded by mutex: of the last collection, as they came
  std::map<ssc::SensorUid, SensorInfo> sensorInfo;  ///< what a collection streams
  bool awaitsAnswer = false;                        ///< guarded by mutex: AskSensor is waiting

 private:
  [[nodiscard]] int requireMemory(std::chrono::duration<double> period) const;
  std::vector<std::string> beginCollection();
  void endCollection(int result, bool print);
  [[nodiscard]] bool endsWait(const ssc::SensorUid& suid, const Event& event);
  [[nodiscard]] bool isShort(const ssc::SensorUid& suid, const sns_std_sensor_event& event);

  std::uint32_t retryCount_ = 0;  ///< guarded by mutex
  const char* const usage_;
  const char* const options_;
  std::set<ssc::SensorUid> shortEventsReported_;  ///< guarded by mutex
  sns_std_sensor_event event_;  ///< guarded by mutex: the event at hand, kept for its buffer
};
