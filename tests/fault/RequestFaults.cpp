// What goes wrong with requests and their answers.
#include <cstdint>
#include <optional>

#include "fault/FaultRowTables.h"
#include "ssc/MessageIds.h"
#include "ssc/Results.h"

namespace fault {
namespace {

enum class Failure {
  kRefused,     ///< the QMI response says failure
  kUnanswered,  ///< no QMI response in time
  kError,       ///< taken, and answered by an error event
};

/// When it is sent. What fails in the look-up fails before anything has changed.
enum class Stage { kLookUp, kMeasuring, kStoring };

struct Request {
  const char* name;
  Strikes strikes;
  Stage stage;
  /// Whom it goes to, in this mode; nobody: this mode has no such request.
  std::string (*addressee)(const CommandMode&);
  std::uint32_t message;
  std::size_t after;  ///< so many of its kind go well
  Expected (*expected)(const CommandMode&, Failure);
};

std::string lookUp(const CommandMode&) { return "suid"; }
std::string lookedUp(const CommandMode& mode) { return mode.lookedUp; }
std::string streamed(const CommandMode& mode) { return mode.streamed; }
std::string told(const CommandMode& mode) { return mode.streamed.empty() ? mode.lookedUp : mode.streamed; }
std::string registry(const CommandMode&) { return ssc::kRegistryDataType; }

int resultOf(Failure failure) { return failure == Failure::kUnanswered ? ssc::kTimedOut : ssc::kIoError; }

Expected lookUpFails(const CommandMode&, Failure failure) { return {resultOf(failure), "Unable to"}; }

Expected attributesFail(const CommandMode& mode, Failure failure) {
  // Of the first sensor of a chip all depends. Of the others, and of SAR sensors, one that does not say which
  // one it is cannot be the one wanted.
  const bool isFirst = mode.struck.empty() || mode.lookedUp == "accel" || mode.lookedUp == "mag" ||
                       mode.lookedUp == "pressure";
  if (isFirst && mode.family != "sar") return {resultOf(failure), "Unable to"};
  return {ssc::kNotFound, "Unable to read the attributes of"};
}

/// The hub answers a read with an error for the one reason that there is no such group.
Expected readFails(const CommandMode&, Failure failure) {
  return {failure == Failure::kError ? ssc::kNotFound : resultOf(failure), "Unable to read registry group"};
}

/// A request without a response counts as time that has run out, and then nothing was measured. A sensor that
/// answers with an error is a silent one.
Expected startFails(const CommandMode& mode, Failure failure) {
  if (saysNoMore(mode) && failure != Failure::kRefused) return lost(mode, kFirst);
  if (failure == Failure::kError) return {lost(mode, kFirst).result, "The hub reports error"};
  if (failure == Failure::kRefused)
    return collectionFails(mode, ssc::kIoError, "Unable to start the sensors");
  return {nothingCame(mode).result, "Unable to start the sensors"};
}

Expected stopFails(const CommandMode&, Failure) { return {}; }

/// It writes first of all that the scale is neutral, and measures then.
constexpr const char* kScaledBefore = "als under the display record and solve again";
constexpr const char* kNotNeutral = "Unable to make the sensor measure without its scale";

Expected writeFails(const CommandMode& mode, Failure failure) {
  if (mode.Is(kScaledBefore)) return {resultOf(failure), kNotNeutral};
  // No more than that it failed: the lines of a light calibration are fixed.
  if (mode.Is("als calibrate")) return {resultOf(failure), "ALS calibration failed.", Reason::kUnsaid};
  return {resultOf(failure), "Failed to write"};
}

Expected writeFailsAgain(const CommandMode& mode, Failure failure) {
  return {resultOf(failure), mode.Is(kScaledBefore) ? "Failed to write" : writeFails(mode, failure).says};
}

/// The calibration stays; it takes effect at the next start.
Expected noticeFails(const CommandMode& mode, Failure failure) {
  // Without it the sensor would be measured with the scale that has just been made neutral.
  if (mode.Is(kScaledBefore)) {
    return {failure == Failure::kRefused ? ssc::kIoError : ssc::kTimedOut, kNotNeutral};
  }
  return {ssc::kOk, "Unable to notify sensor"};
}

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
      {"look-up of the sensor", Strikes::kCommand, Stage::kLookUp, lookUp, ssc::kSuidRequest, 0, lookUpFails},
      {"the sensor's attributes", Strikes::kSensor, Stage::kLookUp, lookedUp, ssc::kAttributesRequest, 0,
       attributesFail},
      {"reading the registry", Strikes::kCommand, Stage::kMeasuring, registry, ssc::kRegistryReadRequest, 0,
       readFails},
      {"starting the sensor", Strikes::kSensor, Stage::kMeasuring, streamed, ssc::kStreamConfigRequest, 0,
       startFails},
      {"stopping the sensor", Strikes::kSensor, Stage::kMeasuring, streamed, ssc::kDisableRequest, 0,
       stopFails},
      {"writing the registry", Strikes::kCommand, Stage::kStoring, registry, ssc::kRegistryWriteRequest, 0,
       writeFails},
      {"writing it a second time", Strikes::kCommand, Stage::kStoring, registry, ssc::kRegistryWriteRequest,
       1, writeFailsAgain},
      {"telling the sensor", Strikes::kSensor, Stage::kStoring, told, ssc::kCalibrationChangedRequest, 0,
       noticeFails},
      {"the factory test", Strikes::kCommand, Stage::kStoring, lookedUp, ssc::kTestRequest, 0, testFails},
      {"its own request", Strikes::kCommand, Stage::kMeasuring, lookedUp, kOwnRequest, 0, ownRequestFails},
  };
  return all;
}

}  // namespace

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
      row.strikes = request.strikes;
      row.mayHaveBegun = request.stage != Stage::kLookUp;
      row.stored = request.stage == Stage::kStoring ? Stored::kPerhaps : Stored::kNothing;
      rows->push_back(row);
    }
  }
}

void addAnswerRows(std::vector<FaultRow>* rows) {
  rows->push_back({"Requests", "no such sensor",
                   [](const CommandMode& mode, const Traffic&) -> Made {
                     if (mode.lookedUp.empty()) return std::nullopt;
                     return faultOf("absent", {"sensor=" + mode.lookedUp});
                   },
                   [](const CommandMode&) {
                     return Expected{ssc::kNotFound, "Unable to"};
                   }});
  rows->back().strikes = Strikes::kSensor;
  rows->back().mayHaveBegun = false;
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
  rows->push_back({"Requests", "its own request is answered with a failure", ownRequestFault("oem_failure"),
                   [](const CommandMode& mode) {
                     if (mode.family == "sar") return Expected{ssc::kMalformed, "malformed"};
                     return Expected{ssc::kOk, "ERROR: ", Reason::kSaid, Success::kUnclaimed};
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
                     const std::string sensor = told(mode);
                     if (sensor.empty() || good.CountRequests(sensor, ssc::kCalibrationChangedRequest) == 0)
                       return std::nullopt;
                     return faultOf("no_notification", {"sensor=" + sensor});
                   },
                   [](const CommandMode& mode) { return noticeFails(mode, Failure::kUnanswered); },
                   Stored::kPerhaps});
  rows->back().strikes = Strikes::kSensor;
}

Expected groupUnreadable(const CommandMode& mode) { return readFails(mode, Failure::kError); }

Expected groupUnwritable(const CommandMode& mode) { return writeFails(mode, Failure::kRefused); }

}  // namespace fault
