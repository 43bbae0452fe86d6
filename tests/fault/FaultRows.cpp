#include "fault/FaultRowTables.h"
#include "ssc/Results.h"

namespace fault {
namespace {

/// The phase's pose is checked first, and readings that are not there are in none.
bool checksPose(const CommandMode& mode) {
  return mode.device == "p2m2" && mode.family == "imu-multipoint" && !turns(mode);
}

}  // namespace

Overrides faultOf(const std::string& kind, const std::vector<std::string>& keys) {
  // In quotes: "nan" alone would be a number.
  Overrides overrides{"fault.a.kind=\"" + kind + "\""};
  for (const std::string& key : keys) overrides.push_back("fault.a." + key);
  return overrides;
}

const std::array<Moment, kMomentCount>& moments() {
  static constexpr std::array<Moment, kMomentCount> all{{
      {"from the first reading on", [](const std::vector<double>&) { return 0.0; }},
      {"from the middle on",
       [](const std::vector<double>& readings) { return (readings.front() + readings.back()) / 2; }},
      {"after the last reading", [](const std::vector<double>& readings) { return readings.back() + 0.001; }},
  }};
  return all;
}

std::string fromKey(double seconds) { return "from=" + std::to_string(seconds); }

bool counts(const CommandMode& mode) { return mode.ending == Ending::kSampleCount; }

Expected lost(const CommandMode& mode, std::size_t moment) {
  if (moment == kAfter) return {};
  if (counts(mode)) {
    return {ssc::kTimedOut,
            mode.family == "color" ? "samples were received in time" : "Timed out waiting for"};
  }
  if (moment == kMiddle || mode.ending == Ending::kShown) return {};
  if (checksPose(mode) && mode.streamed == "accel") return nothingCame(mode);
  const bool isFitted = mode.family == "imu-thermal" && !isThermometer(mode);
  return {ssc::kNoData, isFitted ? "Insufficient data" : "samples were"};
}

Expected nothingCame(const CommandMode& mode) {
  if (counts(mode)) return lost(mode, kFirst);
  if (checksPose(mode)) return {ssc::kInvalid, "Stationary accel data validation failed"};
  // Verifies each sensor that came, and then misses what it was about.
  if (turns(mode)) return {ssc::kInvalid, "unable to obtain rotation data"};
  return {ssc::kNoData, "samples were"};
}

bool turns(const CommandMode& mode) {
  return mode.Is("imu-multipoint turn") || mode.Is("imu-multipoint turn at a rate");
}

bool computesPulses(const CommandMode& mode) { return mode.item == "ppulse" || mode.item == "pldrive"; }

bool storesPulses(const CommandMode& mode) { return computesPulses(mode) && mode.storesInRegistry; }

bool isThermometer(const CommandMode& mode) { return mode.struck.find("thermometer") != std::string::npos; }

bool saysNoMore(const CommandMode& mode) { return mode.group == "lightchip_0_platform.als.fac_cal"; }

Expected collectionFails(const CommandMode& mode, int result, const std::string& says) {
  // Stores 0 then, and calls that success: production lines rely on it.
  if (storesPulses(mode)) return {};
  if (saysNoMore(mode)) return {result, "", Reason::kUnsaid};
  return {result, says};
}

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
