// Reads the [fault.NAME] sections of a scenario.
#include <algorithm>
#include <limits>
#include <sstream>

#include "simhub/Protocol.h"
#include "simhub/ScenarioReader.h"

namespace simhub {
namespace {

constexpr double kMaxSeconds = 1e9;
constexpr double kLateByDefault = 5;  // s: later than anybody waits for a response
constexpr std::int64_t kWrongIdByDefault = 1024;
constexpr std::int64_t kMaxCount = std::numeric_limits<std::int64_t>::max();

bool hasKey(const FaultKindRow& row, std::string_view key) {
  std::istringstream keys(row.keys);
  std::string each;
  while (keys >> each) {
    if (each == key) return true;
  }
  return false;
}

/// Reads those of a kind's keys that it has.
class FaultReader {
 public:
  FaultReader(TableReader& reader, const FaultKindRow& row) : reader_(reader), row_(row) {}

  void Text(const char* key, std::string* value) {
    if (hasKey(row_, key)) (void)reader_.Text(key, value);
  }
  template <class T>
  void Integer(const char* key, std::int64_t low, std::int64_t high, T* value) {
    std::int64_t number = 0;
    if (hasKey(row_, key) && reader_.Integer(key, low, high, &number)) *value = static_cast<T>(number);
  }
  template <class T>
  void Seconds(const char* key, T* value) {
    double seconds = 0;
    if (hasKey(row_, key) && reader_.Number(key, 0, kMaxSeconds, &seconds)) *value = fromSeconds(seconds);
  }

 private:
  TableReader& reader_;
  const FaultKindRow& row_;
};

void readWindow(TableReader& reader, Fault* fault) {
  double seconds = 0;
  std::int64_t number = 0;
  if (reader.Number("from", 0, kMaxSeconds, &seconds)) fault->from = fromSeconds(seconds);
  if (reader.Number("until", 0, kMaxSeconds, &seconds)) fault->until = fromSeconds(seconds);
  if (reader.Integer("after", 0, kMaxCount, &number)) fault->after = static_cast<std::uint64_t>(number);
  if (reader.Integer("count", 0, kMaxCount, &number)) fault->count = static_cast<std::uint64_t>(number);
}

void readKeys(TableReader& reader, const FaultKindRow& row, Fault* fault) {
  FaultReader keys(reader, row);
  keys.Text("sensor", &fault->sensor);
  keys.Text("group", &fault->group);
  keys.Text("item", &fault->item);
  keys.Integer("message", 0, std::numeric_limits<std::uint32_t>::max(), &fault->message);
  keys.Integer("values", 0, 4096, &fault->values);
  keys.Integer("error", 0, std::numeric_limits<std::uint16_t>::max(), &fault->error);
  keys.Integer("id", 0, std::numeric_limits<std::uint32_t>::max(), &fault->id);
  keys.Seconds("delay", &fault->delay);
  keys.Seconds("down_for", &fault->downFor);
  keys.Integer("times", 1, std::numeric_limits<std::int32_t>::max(), &fault->times);
  keys.Integer("free_bytes", 0, kMaxCount, &fault->freeBytes);
}

void setDefaults(Fault* fault) {
  fault->id = kWrongIdByDefault;
  fault->delay = fromSeconds(kLateByDefault);
  fault->values = fault->kind == FaultKind::kExtraValues ? 1 : 0;
  fault->error = fault->kind == FaultKind::kQmiError ? std::uint32_t{kQmiInternalError}
                                                     : std::uint32_t{SNS_STD_ERROR_FAILED};
}

bool isAddressee(const std::string& name, const std::vector<SensorConfig>& sensors) {
  if (name.empty() || name == kRegistryDataType || name == kSuidDataType) return true;
  return std::any_of(sensors.begin(), sensors.end(), [&](const SensorConfig& sensor) {
    return name == sensor.key || name == sensor.dataType;
  });
}

void readFault(const toml::table& table, const std::vector<SensorConfig>& sensors, std::vector<Fault>* faults,
               const std::string& name, Problems& problems) {
  TableReader reader(table, "fault." + showKey(name), problems);
  std::string kind;
  const bool hasKind = reader.Text("kind", &kind);
  const FaultKindRow* const row = findFaultKind(kind);
  if (row == nullptr) {
    std::string known;
    for (const FaultKindRow& each : faultKinds())
      known += (known.empty() ? "" : ", ") + std::string(each.name);
    reader.Problem(hasKind ? "kind" : "", "needs a kind out of: " + known);
    return;
  }
  Fault fault;
  fault.name = name;
  fault.kind = row->kind;
  setDefaults(&fault);
  readWindow(reader, &fault);
  readKeys(reader, *row, &fault);
  if (!isAddressee(fault.sensor, sensors)) {
    reader.Problem("sensor", "there is no sensor \"" + fault.sensor + "\"");
  }
  if (hasKey(*row, "item") && fault.item.empty()) reader.Problem("", "needs an item");
  if (fault.kind == FaultKind::kHubAway && fault.times > 1 && fault.after == 0) {
    reader.Problem("times", "more than once needs \"after\": so many readings after it is back");
  }
  reader.RejectOthers();
  faults->push_back(std::move(fault));
}

}  // namespace

void readFaults(const toml::table& table, const std::vector<SensorConfig>& sensors,
                std::vector<Fault>* faults, Problems& problems) {
  TableReader reader(table, "fault", problems);
  for (const auto& [key, node] : table) {
    const std::string name(key.str());
    if (const toml::table* const fault = reader.Table(name))
      readFault(*fault, sensors, faults, name, problems);
  }
}

}  // namespace simhub
