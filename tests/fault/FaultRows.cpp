#include "fault/FaultRows.h"

#include <array>
#include <cstdint>

#include "ssc/MessageIds.h"
#include "ssc/Results.h"

namespace fault {
namespace {

using Overrides = std::vector<std::string>;
using Made = std::optional<Overrides>;

bool counts(const CommandMode& mode) { return mode.ending == Ending::kSampleCount; }

Expected succeeds(const CommandMode&) { return {}; }

/// The keys of one fault.
Overrides faultOf(const std::string& kind, const std::vector<std::string>& keys) {
  // In quotes: "nan" alone would be a number.
  Overrides overrides{"fault.a.kind=\"" + kind + "\""};
  for (const std::string& key : keys) overrides.push_back("fault.a." + key);
  return overrides;
}

// Readings.

struct Moment {
  const char* name;
  /// When the fault begins; the readings of a run without it have these times.
  double (*from)(const std::vector<double>& readings);
};
enum MomentIndex : std::size_t { kFirst, kMiddle, kAfter };
constexpr std::array<Moment, 3> kMoments{{
    {"from the first reading on", [](const std::vector<double>&) { return 0.0; }},
    {"from the middle on",
     [](const std::vector<double>& readings) { return (readings.front() + readings.back()) / 2; }},
    {"after the last reading", [](const std::vector<double>& readings) { return readings.back() + 0.001; }},
}};

std::string fromKey(double seconds) { return "from=" + std::to_string(seconds); }

/// Readings that do not come, or do not count.
Expected lost(const CommandMode& mode, std::size_t moment) {
  if (moment == kAfter) return {};
  if (counts(mode)) return {ssc::kTimedOut, mode.family == "color" ? "" : "Timed out waiting for"};
  if (moment == kMiddle) return {};
  return {ssc::kNoData, ""};
}

bool measuresOffsets(const CommandMode& mode) {
  return mode.family == "prox with offset" || mode.family == "prox under the display";
}

bool measuresPulses(const CommandMode& mode) {
  return mode.Is("prox under the display pulse number") || mode.Is("prox under the display pulse current");
}

/// A collection that ends otherwise than by its time.
Expected collectionFails(const CommandMode& mode, int result, const std::string& says) {
  // Stores 0 then, and calls that success: production lines rely on it.
  if (measuresPulses(mode)) return {};
  return {result, says};
}

using ReadingExpectation = Expected (*)(const CommandMode& mode, std::size_t moment);

void addReadingRows(std::vector<FaultRow>* rows) {
  struct Kind {
    const char* fault;
    std::vector<std::string> keys;
    ReadingExpectation expected;
  };
  const Kind kinds[] = {
      {"silent", {}, lost},
      {"low_accuracy",
       {},
       [](const CommandMode& mode, std::size_t moment) {
         return mode.family == "baro" ? Expected{} : lost(mode, moment);
       }},
      {"short_event",
       {"values=0"},
       [](const CommandMode& mode, std::size_t moment) {
         const bool isMalformed = measuresOffsets(mode) && moment != kAfter;
         return isMalformed ? collectionFails(mode, ssc::kMalformed, "Received malformed")
                            : lost(mode, moment);
       }},
      {"extra_values", {"values=3"}, [](const CommandMode&, std::size_t) { return Expected{}; }},
      {"nan",
       {},
       [](const CommandMode& mode, std::size_t moment) {
         // Proximity's counts are whole numbers, 0 instead of none; only its offsets are not.
         if (moment == kAfter || mode.family == "prox" || mode.family == "prox with offset")
           return Expected{};
         if (mode.Is("als under the display sample")) return Expected{};  // it shows what it gets
         if (measuresPulses(mode) && moment == kMiddle) return Expected{};
         // Without an infrared that is a number a reading of colors does not count.
         return mode.family == "color" ? lost(mode, moment) : Expected{ssc::kInvalid, ""};
       }},
      {"malformed",
       {},
       [](const CommandMode& mode, std::size_t moment) {
         if (moment == kAfter) return Expected{};
         // A proximity event that does not parse fails the collection, but does not end it.
         return mode.family == "prox" ? Expected{ssc::kTimedOut, "Received malformed"}
                                      : collectionFails(mode, ssc::kMalformed, "Received malformed");
       }},
      {"wrong_id", {}, lost},
      {"duplicate", {}, [](const CommandMode&, std::size_t) { return Expected{}; }},
      {"reorder", {}, [](const CommandMode&, std::size_t) { return Expected{}; }},
  };
  for (const Kind& kind : kinds) {
    for (std::size_t moment = 0; moment < kMoments.size(); ++moment) {
      FaultRow row;
      row.family = "Readings";
      row.name = std::string(kind.fault) + ", " + kMoments[moment].name;
      row.overrides = [kind, moment](const CommandMode& mode, const Traffic& good) -> Made {
        if (mode.streamed.empty() || good.readings.empty()) return std::nullopt;
        std::vector<std::string> keys = kind.keys;
        keys.push_back("sensor=" + mode.streamed);
        keys.push_back(fromKey(kMoments[moment].from(good.readings)));
        return faultOf(kind.fault, keys);
      };
      row.expected = [kind, moment](const CommandMode& mode) { return kind.expected(mode, moment); };
      rows->push_back(row);
    }
  }
}

// Requests.

enum class Failure {
  kRefused,     ///< the QMI response says failure
  kUnanswered,  ///< no QMI response in time
  kError,       ///< taken, and answered by an error event
};

struct Request {
  const char* name;
  /// Whom it goes to, in this mode; nobody: this mode has no such request.
  std::string (*addressee)(const CommandMode&);
  std::uint32_t message;
  std::size_t after;  ///< so many of its kind go well
  Stored stored;
  Expected (*expected)(const CommandMode&, Failure);
};

std::string lookUp(const CommandMode&) { return "suid"; }
std::string lookedUp(const CommandMode& mode) { return mode.lookedUp; }
std::string streamed(const CommandMode& mode) { return mode.streamed; }
std::string registry(const CommandMode&) { return ssc::kRegistryDataType; }

int resultOf(Failure failure) { return failure == Failure::kUnanswered ? ssc::kTimedOut : ssc::kIoError; }

Expected lookUpFails(const CommandMode&, Failure failure) { return {resultOf(failure), "Unable to"}; }

Expected attributesFail(const CommandMode& mode, Failure failure) {
  // A SAR sensor that does not say which one it is cannot be the one wanted.
  return {mode.family == "sar" ? ssc::kNotFound : resultOf(failure), "Unable to"};
}

/// The hub answers a read with an error for the one reason that there is no such group.
Expected readFails(const CommandMode&, Failure failure) {
  return {failure == Failure::kError ? ssc::kNotFound : resultOf(failure), "Unable to read registry group"};
}

/// A request without a response counts as time that has run out, and then nothing was measured. A sensor that
/// answers with an error is a silent one.
Expected startFails(const CommandMode& mode, Failure failure) {
  if (failure == Failure::kError) return {lost(mode, kFirst).result, "The hub reports error"};
  if (failure == Failure::kRefused)
    return collectionFails(mode, ssc::kIoError, "Unable to start the sensors");
  return {lost(mode, kFirst).result, "Unable to start the sensors"};
}

Expected stopFails(const CommandMode&, Failure) { return {}; }

Expected writeFails(const CommandMode& mode, Failure failure) {
  // No more than that it failed: the lines of a light calibration are fixed.
  if (mode.Is("als calibrate")) return {resultOf(failure), "ALS calibration failed.", Reason::kUnsaid};
  return {resultOf(failure), "Failed to write"};
}

/// The calibration stays; it takes effect at the next start.
Expected noticeFails(const CommandMode&, Failure) { return {ssc::kOk, "Unable to notify sensor"}; }

/// Whether it could be sent counts, and nothing else.
Expected testFails(const CommandMode& mode, Failure failure) {
  if (failure == Failure::kError) return {};
  return {resultOf(failure), mode.begins.empty() ? "Reboot device" : "may require reboot"};
}

Expected ownRequestFails(const CommandMode&, Failure failure) {
  // An error instead of an answer: nobody answers.
  return {failure == Failure::kRefused ? ssc::kIoError : ssc::kTimedOut, ""};
}

/// In place of the id of a request that each kind of sensor has its own of.
constexpr std::uint32_t kOwnRequest = 0;

const std::vector<Request>& requests() {
  static const std::vector<Request> all{
      {"look-up of the sensor", lookUp, ssc::kSuidRequest, 0, Stored::kNothing, lookUpFails},
      {"the sensor's attributes", lookedUp, ssc::kAttributesRequest, 0, Stored::kNothing, attributesFail},
      {"reading the registry", registry, ssc::kRegistryReadRequest, 0, Stored::kNothing, readFails},
      {"starting the sensor", streamed, ssc::kStreamConfigRequest, 0, Stored::kNothing, startFails},
      {"stopping the sensor", streamed, ssc::kDisableRequest, 0, Stored::kNothing, stopFails},
      {"writing the registry", registry, ssc::kRegistryWriteRequest, 0, Stored::kPerhaps, writeFails},
      {"writing it a second time", registry, ssc::kRegistryWriteRequest, 1, Stored::kPerhaps, writeFails},
      {"telling the sensor", streamed, ssc::kCalibrationChangedRequest, 0, Stored::kPerhaps, noticeFails},
      {"the factory test", lookedUp, ssc::kTestRequest, 0, Stored::kPerhaps, testFails},
      {"its own request", lookedUp, kOwnRequest, 0, Stored::kNothing, ownRequestFails},
  };
  return all;
}

void addRequestRows(std::vector<FaultRow>* rows) {
  struct Kind {
    const char* name;
    const char* fault;
    std::vector<std::string> keys;
    std::optional<Failure> failure;  ///< nothing: it is borne
  };
  const Kind kinds[] = {
      {"refused", "qmi_error", {}, Failure::kRefused},
      {"no response", "no_response", {}, Failure::kUnanswered},
      {"response after 5 s", "late_response", {"delay=5"}, Failure::kUnanswered},
      {"response after 1 s", "late_response", {"delay=1"}, std::nullopt},
      {"answered by an error", "error_event", {}, Failure::kError},
  };
  for (const Request& request : requests()) {
    for (const Kind& kind : kinds) {
      FaultRow row;
      row.family = "Requests";
      row.name = std::string(request.name) + ": " + kind.name;
      row.overrides = [request, kind](const CommandMode& mode, const Traffic& good) -> Made {
        const std::string addressee = request.addressee(mode);
        const std::uint32_t message = request.message == kOwnRequest ? mode.ownRequest : request.message;
        if (addressee.empty() || good.CountRequests(addressee, message) <= request.after) return std::nullopt;
        std::vector<std::string> keys = kind.keys;
        keys.push_back("sensor=" + addressee);
        keys.push_back("message=" + std::to_string(message));
        keys.push_back("after=" + std::to_string(request.after));
        return faultOf(kind.fault, keys);
      };
      row.expected = [request, kind](const CommandMode& mode) {
        return kind.failure ? request.expected(mode, *kind.failure) : Expected{};
      };
      row.stored = request.stored;
      rows->push_back(row);
    }
  }
}

void addAnswerRows(std::vector<FaultRow>* rows) {
  rows->push_back({"Requests", "no such sensor",
                   [](const CommandMode& mode, const Traffic&) -> Made {
                     return faultOf("absent", {"sensor=" + mode.lookedUp});
                   },
                   [](const CommandMode&) {
                     return Expected{ssc::kNotFound, "Unable to"};
                   }});
  rows->push_back({"Requests", "no registry",
                   [](const CommandMode&, const Traffic& good) -> Made {
                     if (good.CountRequests("registry", ssc::kRegistryReadRequest) == 0) return std::nullopt;
                     return faultOf("absent", {"sensor=registry"});
                   },
                   [](const CommandMode&) {
                     return Expected{ssc::kNotFound, "registry"};
                   }});
  const auto ownRequestFault = [](const char* fault) {
    return [fault](const CommandMode& mode, const Traffic&) -> Made {
      if (mode.ownRequest == 0) return std::nullopt;
      return faultOf(fault, {"sensor=" + mode.lookedUp, "message=" + std::to_string(mode.ownRequest)});
    };
  };
  rows->push_back(
      {"Requests", "its own request is answered with a failure", ownRequestFault("oem_failure"),
       [](const CommandMode& mode) {
         return mode.family == "sar" ? Expected{ssc::kMalformed, "malformed"} : Expected{ssc::kOk, "ERROR: "};
       }});
  rows->push_back({"Requests", "its own request is answered with nonsense", ownRequestFault("oem_malformed"),
                   [](const CommandMode&) {
                     return Expected{ssc::kMalformed, "malformed"};
                   }});
  rows->push_back(
      {"Requests", "its own request is not answered", ownRequestFault("oem_silence"), [](const CommandMode&) {
         return Expected{ssc::kTimedOut, "ERROR: "};
       }});
  rows->push_back({"Requests", "the sensor does not confirm",
                   [](const CommandMode& mode, const Traffic& good) -> Made {
                     if (good.CountRequests(mode.streamed, ssc::kCalibrationChangedRequest) == 0)
                       return std::nullopt;
                     return faultOf("no_notification", {"sensor=" + mode.streamed});
                   },
                   [](const CommandMode& mode) { return noticeFails(mode, Failure::kUnanswered); },
                   Stored::kPerhaps});
}

// The registry.

void addRegistryRow(const char* name, const char* fault, std::vector<std::string> (*keys)(const CommandMode&),
                    Expected (*expected)(const CommandMode&), std::vector<FaultRow>* rows,
                    Stored stored = Stored::kNothing) {
  rows->push_back({"Registry", name,
                   [fault, keys](const CommandMode& mode, const Traffic& good) -> Made {
                     if (good.CountRequests("registry", ssc::kRegistryReadRequest) == 0) return std::nullopt;
                     const std::vector<std::string> made = keys(mode);
                     return made.empty() ? Made() : faultOf(fault, made);
                   },
                   expected, stored});
}

std::vector<std::string> groupKey(const CommandMode& mode) { return {"group=\"" + mode.group + "\""}; }

std::vector<std::string> itemKeys(const CommandMode& mode) {
  if (mode.item.empty()) return {};
  return {"group=\"" + mode.group + "\"", "item=" + mode.item};
}

std::vector<std::string> whenStoring(const CommandMode& mode, const std::string& key) {
  return mode.storesInRegistry ? std::vector<std::string>{key} : std::vector<std::string>{};
}

Expected groupUnreadable(const CommandMode& mode) { return readFails(mode, Failure::kError); }

Expected groupUnwritable(const CommandMode& mode) { return writeFails(mode, Failure::kRefused); }

/// Only some need to know what was stored before.
Expected itemOfAnotherKind(const CommandMode& mode) {
  // Light and proximity take it for 0, the phases' result and a reset replace it: that is how it is repaired.
  const bool isReplaced =
      counts(mode) || mode.family == "sar" || mode.name == "reset" || mode.Is("imu-multipoint last phase");
  return isReplaced ? Expected{} : Expected{ssc::kInvalid, "Invalid registry"};
}

void addRegistryRows(std::vector<FaultRow>* rows) {
  addRegistryRow("no such group", "group_missing", groupKey, groupUnreadable, rows);
  addRegistryRow("reading fails", "read_fails", groupKey, groupUnreadable, rows);
  addRegistryRow("torn file", "torn_file", groupKey, groupUnreadable, rows);
  rows->back().onCalibrated = true;  // what is not stored yet has no file that could be torn
  addRegistryRow(
      "an item is missing", "item_missing", itemKeys,
      [](const CommandMode&) {
        return Expected{ssc::kInvalid, "Invalid registry; missing"};
      },
      rows);
  addRegistryRow("an item is of another kind", "item_kind", itemKeys, itemOfAnotherKind, rows);
  addRegistryRow(
      "writing fails", "write_fails", [](const CommandMode& mode) { return whenStoring(mode, "count=1"); },
      groupUnwritable, rows);
  addRegistryRow(
      "disk full", "full_disk", [](const CommandMode& mode) { return whenStoring(mode, "free_bytes=0"); },
      groupUnwritable, rows);
  addRegistryRow(
      "disk full in the middle of a file", "full_disk",
      [](const CommandMode& mode) { return whenStoring(mode, "free_bytes=40"); }, groupUnwritable, rows);
}

// The hub.

void addHubRow(const std::string& name, Made (*overrides)(const CommandMode&, const Traffic&),
               Expected (*expected)(const CommandMode&), std::vector<FaultRow>* rows) {
  rows->push_back({"Hub", name, overrides, expected});
}

Made awayFrom(const CommandMode& mode, std::size_t moment, const Traffic& good,
              std::vector<std::string> keys) {
  if (mode.streamed.empty() || good.readings.empty()) return std::nullopt;
  const double from = moment == kFirst ? good.readings.front() - 1e-4 : kMoments[moment].from(good.readings);
  keys.push_back(fromKey(from));
  return faultOf("hub_away", keys);
}

Made awayTimes(const CommandMode& mode, const Traffic& good, const char* times) {
  if (mode.streamed.empty() || good.readings.size() < 5) return std::nullopt;
  return faultOf("hub_away",
                 {"sensor=" + mode.streamed, "after=1", "down_for=0.05", std::string("times=") + times});
}

/// Whatever comes after the collection cannot be sent.
Expected cutOff(const CommandMode& mode, int result) {
  // These read the registry after the collection.
  const bool asksOn = mode.storesInRegistry || mode.family == "imu-thermal" || mode.Is("color verify");
  if (!asksOn) return {};
  if (mode.Is("als calibrate")) return {result, "", Reason::kUnsaid};
  return {result, ""};
}
Expected gone(const CommandMode& mode) { return cutOff(mode, ssc::kNotConnected); }

void addHubRows(std::vector<FaultRow>* rows) {
  addHubRow(
      "gone from the start",
      [](const CommandMode&, const Traffic&) -> Made { return faultOf("hub_away", {}); },
      [](const CommandMode&) {
        return Expected{ssc::kNotConnected, "Unable to"};
      },
      rows);
  addHubRow(
      "goes before the first reading, for good",
      [](const CommandMode& mode, const Traffic& good) { return awayFrom(mode, kFirst, good, {}); },
      [](const CommandMode& mode) { return lost(mode, kFirst); }, rows);
  addHubRow(
      "goes in the middle, for good",
      [](const CommandMode& mode, const Traffic& good) { return awayFrom(mode, kMiddle, good, {}); },
      [](const CommandMode& mode) { return counts(mode) ? lost(mode, kMiddle) : gone(mode); }, rows);
  addHubRow(
      "goes after the last reading, for good",
      [](const CommandMode& mode, const Traffic& good) { return awayFrom(mode, kAfter, good, {}); }, gone,
      rows);
  rows->back().stored = Stored::kPerhaps;  // a command that counts its samples is storing by then
  addHubRow(
      "goes before the first reading, back after 0.1 s",
      [](const CommandMode& mode, const Traffic& good) {
        return awayFrom(mode, kFirst, good, {"down_for=0.1"});
      },
      succeeds, rows);
  addHubRow(
      "goes in the middle, back after 0.1 s",
      [](const CommandMode& mode, const Traffic& good) {
        return awayFrom(mode, kMiddle, good, {"down_for=0.1"});
      },
      succeeds, rows);
  addHubRow(
      "goes three times",
      [](const CommandMode& mode, const Traffic& good) { return awayTimes(mode, good, "3"); }, succeeds,
      rows);
  addHubRow(
      "goes four times",
      [](const CommandMode& mode, const Traffic& good) { return awayTimes(mode, good, "4"); },
      [](const CommandMode& mode) {
        return collectionFails(mode, ssc::kConnectionLost, "The hub went away");
      },
      rows);
  addHubRow(
      "falls silent in the middle",
      [](const CommandMode& mode, const Traffic& good) -> Made {
        if (mode.streamed.empty() || good.readings.empty()) return std::nullopt;
        const std::string from = fromKey(kMoments[kMiddle].from(good.readings));
        return Overrides{"fault.a.kind=no_response", "fault.a." + from, "fault.b.kind=silent",
                         "fault.b." + from};
      },
      [](const CommandMode& mode) {
        if (counts(mode)) return lost(mode, kMiddle);
        return cutOff(mode, ssc::kTimedOut);
      },
      rows);
}

}  // namespace

const std::vector<FaultRow>& faultRows() {
  static const std::vector<FaultRow> rows = [] {
    std::vector<FaultRow> all;
    addReadingRows(&all);
    addRequestRows(&all);
    addAnswerRows(&all);
    addRegistryRows(&all);
    addHubRows(&all);
    return all;
  }();
  return rows;
}

}  // namespace fault
