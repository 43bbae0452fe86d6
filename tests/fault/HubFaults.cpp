// What goes wrong with the hub as a whole.
#include "fault/FaultRowTables.h"
#include "ssc/MessageIds.h"
#include "ssc/Results.h"

namespace fault {
namespace {

Expected succeeds(const CommandMode&) { return {}; }

void addHubRow(const std::string& name, Made (*overrides)(const CommandMode&, const Traffic&),
               Expected (*expected)(const CommandMode&), std::vector<FaultRow>* rows) {
  rows->push_back({"Hub", name, overrides, expected});
}

Made awayFrom(const CommandMode& mode, std::size_t moment, const Traffic& good,
              std::vector<std::string> keys) {
  if (mode.streamed.empty() || good.readings.empty()) return std::nullopt;
  const double from = moment == kFirst ? good.readings.front() - 1e-4 : moments()[moment].from(good.readings);
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
  if (!mode.storesInRegistry && !mode.asksAfterwards) return {};
  if (mode.Is("als calibrate")) return {result, "", Reason::kUnsaid};
  return {result, ""};
}
Expected gone(const CommandMode& mode) { return cutOff(mode, ssc::kNotConnected); }

}  // namespace

void addHubRows(std::vector<FaultRow>* rows) {
  addHubRow(
      "gone from the start",
      [](const CommandMode&, const Traffic&) -> Made { return faultOf("hub_away", {}); },
      [](const CommandMode& mode) {
        return mode.lookedUp.empty() ? Expected{} : Expected{ssc::kNotConnected, "Unable to"};
      },
      rows);
  rows->back().mayHaveBegun = false;
  addHubRow(
      "goes before the first reading, for good",
      [](const CommandMode& mode, const Traffic& good) { return awayFrom(mode, kFirst, good, {}); },
      nothingCame, rows);
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
        const std::string from = fromKey(moments()[kMiddle].from(good.readings));
        return Overrides{"fault.a.kind=no_response", "fault.a." + from, "fault.b.kind=silent",
                         "fault.b." + from};
      },
      [](const CommandMode& mode) {
        if (counts(mode)) return lost(mode, kMiddle);
        return cutOff(mode, ssc::kTimedOut);
      },
      rows);
}

}  // namespace fault
