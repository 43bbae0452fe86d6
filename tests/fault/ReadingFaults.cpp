// What goes wrong with readings.
#include <string>

#include "fault/FaultRowTables.h"
#include "ssc/MessageIds.h"
#include "ssc/Results.h"

namespace fault {
namespace {

bool measuresOffsets(const CommandMode& mode) {
  return mode.family == "prox with offset" || mode.family == "prox under the display";
}

/// Whether it needs values that stand behind others.
bool takesRawValues(const CommandMode& mode) { return mode.Is("imu-thermal raw") && !isThermometer(mode); }

/// Whether the accuracy of the sensor's readings does not matter.
bool countsInaccurate(const CommandMode& mode) {
  return mode.family == "baro" || (isThermometer(mode) && mode.family != "imu-multipoint");
}

Expected notANumber(const CommandMode& mode, std::size_t moment) {
  // Proximity's counts are whole numbers, 0 instead of none; only its offsets are not.
  if (moment == kAfter || mode.family == "prox" || mode.family == "prox with offset") return {};
  if (computesPulses(mode) && moment == kMiddle) return {};
  // These show what they get.
  if (mode.ending == Ending::kShown || mode.Is("als under the display sample") ||
      mode.Is("prox under the display sample") || mode.Is("prox under the display offset, automatic")) {
    return {};
  }
  // Without an infrared that is a number a reading of colors does not count, and what is no temperature is
  // none.
  if (mode.family == "color" || (isThermometer(mode) && mode.family == "imu-thermal"))
    return lost(mode, moment);
  if (computesPulses(mode)) return {ssc::kInvalid, "nothing to scale"};
  if (mode.Is("prox under the display offset")) return {ssc::kInvalid, "cannot be stored"};
  // Its pose, or its steady rotation, is looked for in what is no number.
  const bool isSought = mode.device == "p2m2" && mode.struck.empty() && !mode.Is("imu-multipoint turn");
  return {ssc::kInvalid, isSought ? "nan" : "finite"};
}

using ReadingExpectation = Expected (*)(const CommandMode& mode, std::size_t moment);

}  // namespace

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
         return countsInaccurate(mode) ? Expected{} : lost(mode, moment);
       }},
      {"short_event",
       {"values=0"},
       [](const CommandMode& mode, std::size_t moment) {
         if (takesRawValues(mode) && moment == kFirst)
           return Expected{ssc::kNoData, "raw data not available"};
         const bool isMalformed = measuresOffsets(mode) && moment != kAfter;
         return isMalformed ? collectionFails(mode, ssc::kMalformed, "Received malformed")
                            : lost(mode, moment);
       }},
      {"extra_values",
       {"values=3"},
       [](const CommandMode& mode, std::size_t moment) {
         // A record has room for one temperature.
         const bool isRecorded = isThermometer(mode) && mode.device == "p2m2" && moment == kFirst;
         return isRecorded ? Expected{ssc::kInvalid, "has invalid dimension"} : Expected{};
       }},
      {"nan", {}, notANumber},
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
    for (std::size_t moment = 0; moment < moments().size(); ++moment) {
      FaultRow row;
      row.family = "Readings";
      row.name = std::string(kind.fault) + ", " + moments()[moment].name;
      row.strikes = Strikes::kSensor;
      row.overrides = [kind, moment](const CommandMode& mode, const Traffic& good) -> Made {
        if (mode.streamed.empty() || good.readings.empty()) return std::nullopt;
        std::vector<std::string> keys = kind.keys;
        keys.push_back("sensor=" + mode.streamed);
        keys.push_back(fromKey(moments()[moment].from(good.readings)));
        return faultOf(kind.fault, keys);
      };
      row.expected = [kind, moment](const CommandMode& mode) { return kind.expected(mode, moment); };
      rows->push_back(row);
    }
  }
}

}  // namespace fault
