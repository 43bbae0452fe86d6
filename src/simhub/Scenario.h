// What a simulated hub is made of: the hub's own settings, the world, the sensors, the registry's built-in
// defaults and the faults. Read from TOML, checked whole, and changed by overrides that are checked the same
// way.
#pragma once

#include <cstdint>
#include <map>
#include <string>
#include <vector>

#include "proto/sns_registry.pb.h"
#include "proto/sns_std.pb.h"
#include "simhub/ErrorModel.h"
#include "simhub/Fault.h"
#include "simhub/HubTime.h"
#include "simhub/World.h"

namespace simhub {

struct HubConfig {
  std::uint64_t seed = 1;
  std::uint64_t startTicks = 0;   ///< the 19.2 MHz counter when the hub starts
  Time responseLatency{200'000};  ///< from a request to its QMI response
  Time answerLatency{300'000};    ///< from the response to the events that answer the request
  std::uint32_t batch = 1;        ///< readings per message of every sensor that says nothing itself
  std::string requestLog;         ///< file that gets one line per request; empty: none
};

/// The fastest that a sensor runs, Hz, whatever is asked of it: time has to pass between two readings.
inline constexpr double kMaxSensorRate = 1e5;

/// One [sensor.KEY].
struct SensorConfig {
  std::string key;
  std::string model;
  bool present = true;
  std::string dataType;
  std::string name;
  std::string vendor = "vantle";
  std::int64_t version = 1;
  sns_std_sensor_stream_type streamType = SNS_STD_SENSOR_STREAM_TYPE_STREAMING;
  std::vector<double> rates;  ///< Hz, ascending; the sensor runs at most at the last (none: kMaxSensorRate)
  std::vector<double> resolutions;
  std::vector<std::vector<double>> ranges;  ///< each low, high
  std::size_t selectedRange = 0;
  bool physical = true;
  std::int64_t rigidBody = 0;
  std::int64_t hardwareId = 0;
  Time latency{2'000'000};    ///< from the moment of a reading to its message
  Time settling{0};           ///< from switching on to high accuracy
  std::uint32_t batch = 0;    ///< readings per message; 0: the hub's
  bool calibrated = false;    ///< whether the stream has the registry's calibration applied
  std::string registryGroup;  ///< where that stands; empty: the model's, after the package's name
  ErrorModel error;
  std::map<std::string, std::vector<double>> parameters;  ///< the model's own, all of them present

  /// A parameter that is one number.
  [[nodiscard]] double Parameter(const std::string& parameterName) const {
    return parameters.at(parameterName).front();
  }
};

struct Scenario {
  std::string name;
  HubConfig hub;
  World world;
  std::vector<SensorConfig> sensors;  ///< in the order of their keys, which is the order of the look-up
  std::map<std::string, sns_registry_data> registry;  ///< built-in defaults by group; subgroups nested
  std::vector<Fault> faults;                          ///< in the order of their names
};

/// The scenario where nobody asks for another.
inline constexpr const char* kDefaultScenario = "o1v1";

/// Names of the built-in scenarios.
[[nodiscard]] std::vector<std::string> builtInScenarios();

/// Loads a scenario: `nameOrFile` is a built-in name, or else a file ("" means the default).
/// `overrides` are "KEY=VALUE" with a dotted key, as they would stand in the file; a value that is no TOML
/// value is taken as text. False: `error` holds one line for each fault found, "FILE:LINE: KEY: what is
/// wrong".
[[nodiscard]] bool loadScenario(const std::string& nameOrFile, const std::vector<std::string>& overrides,
                                Scenario* scenario, std::string* error);

/// The same for TOML text; `source` stands for the file in messages, and files that it extends are looked for
/// in its folder.
[[nodiscard]] bool parseScenario(const std::string& text, const std::string& source,
                                 const std::vector<std::string>& overrides, Scenario* scenario,
                                 std::string* error);

}  // namespace simhub
