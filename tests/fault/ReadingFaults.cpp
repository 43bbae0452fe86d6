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
    for (std::size_t moment = 0; moment < moments().size(); ++moment) {
      FaultRow row;
      row.family = "Readings";
      row.name = std::string(kind.fault) + ", " + moments()[moment].name;
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
