#include "simhub/ScenarioReader.h"

#include <cmath>
#include <limits>

namespace simhub {
namespace {

constexpr double kMaxSeconds = 1e9;
constexpr double kMaxMilliseconds = 1e6;
constexpr std::int64_t kMaxInteger = std::numeric_limits<std::int64_t>::max();
constexpr std::int64_t kMaxBatch = 1000;
constexpr int kMaxRegistryDepth = 16;
/// The key that gives a registry table's items a version. No item's name: it needs quotes.
constexpr const char* kVersionKey = "@version";

void readHub(const toml::table& table, HubConfig* hub, Problems& problems) {
  TableReader reader(table, "hub", problems);
  std::int64_t number = 0;
  double milliseconds = 0;
  if (reader.Integer("seed", 0, kMaxInteger, &number)) hub->seed = static_cast<std::uint64_t>(number);
  if (reader.Integer("start_ticks", 0, kMaxInteger / 2, &number)) {
    hub->startTicks = static_cast<std::uint64_t>(number);
  }
  if (reader.Number("response_latency_ms", 0, kMaxMilliseconds, &milliseconds)) {
    hub->responseLatency = fromSeconds(milliseconds * 1e-3);
  }
  if (reader.Number("answer_latency_ms", 0, kMaxMilliseconds, &milliseconds)) {
    hub->answerLatency = fromSeconds(milliseconds * 1e-3);
  }
  if (reader.Integer("batch", 1, kMaxBatch, &number)) hub->batch = static_cast<std::uint32_t>(number);
  (void)reader.Text("request_log", &hub->requestLog);
  reader.RejectOthers();
}

/// A value of the signal under `key`.
bool readValue(const WorldSignalRow& row, std::string_view key, TableReader& reader, SignalValue* value) {
  std::vector<double> numbers;
  if (!reader.Numbers(key, row.dimension, row.dimension, row.low, row.high, &numbers)) return false;
  *value = {};
  std::copy(numbers.begin(), numbers.end(), value->begin());
  return true;
}

/// One {at, value, ramp or approach} of a signal.
bool readMove(const WorldSignalRow& row, const toml::table& table, const std::string& path, SignalMove* move,
              Problems& problems) {
  TableReader reader(table, path, problems);
  const bool hasTime = reader.Number("at", 0, kMaxSeconds, &move->at);
  const bool hasValue = readValue(row, "value", reader, &move->target);
  const bool isRamp = reader.Number("ramp", 0, kMaxSeconds, &move->duration);
  const bool isApproach = reader.Number("approach", 0, kMaxSeconds, &move->duration);
  if (isRamp) move->shape = SignalMove::Shape::kRamp;
  if (isApproach) move->shape = SignalMove::Shape::kApproach;
  if (isRamp && isApproach) reader.Problem("approach", "is either a ramp or an approach");
  reader.RejectOthers();
  if (table.get("at") == nullptr) reader.Problem("", "has no \"at\"");
  if (table.get("value") == nullptr) reader.Problem("", "has no \"value\"");
  return hasTime && hasValue;
}

void readMoves(const WorldSignalRow& row, const toml::array& list, const std::string& path, World* world,
               Problems& problems) {
  std::vector<SignalMove> moves;
  for (const toml::node& node : list) {
    SignalMove move;
    const toml::table* const table = node.as_table();
    if (table == nullptr) {
      problems.Add(&node, path, "numbers and moves do not mix in one list");
      return;
    }
    if (!readMove(row, *table, path, &move, problems)) return;
    if (!moves.empty() && move.at <= moves.back().at) {
      problems.Add(&node, path, "the moves have to stand in the order of their times");
      return;
    }
    moves.push_back(move);
  }
  world->Set(row.signal, Signal(row.initial, std::move(moves)));
}

void readWorld(const toml::table& table, World* world, Problems& problems) {
  TableReader reader(table, "world", problems);
  for (const WorldSignalRow& row : worldSignals()) readWorldSignal(row, reader, world, problems);
  readRotation(reader, world, problems);
  reader.RejectOthers();
}

void readRegistryItems(const toml::table& table, const std::string& path, int depth, sns_registry_data* data,
                       Problems& problems) {
  TableReader reader(table, path, problems);
  if (depth > kMaxRegistryDepth) {
    reader.Problem("", "subgroups nested too deeply");
    return;
  }
  std::int64_t version = 0;
  const bool hasVersion = reader.Integer(kVersionKey, std::numeric_limits<std::int32_t>::min(),
                                         std::numeric_limits<std::int32_t>::max(), &version);
  for (const auto& [key, node] : table) {
    if (key.str() == kVersionKey) continue;
    sns_registry_data_item* const item = data->add_items();
    item->set_name(std::string(key.str()));
    if (hasVersion) item->set_version(static_cast<std::int32_t>(version));
    if (const toml::table* const subgroup = node.as_table()) {
      readRegistryItems(*subgroup, reader.PathOf(key.str()), depth + 1, item->mutable_subgrp(), problems);
    } else if (node.is_string()) {
      item->set_str(node.as_string()->get());
    } else if (node.is_integer()) {
      item->set_sint(node.as_integer()->get());
    } else if (node.is_floating_point()) {
      const double number = node.as_floating_point()->get();
      if (std::isfinite(number) &&
          std::fabs(number) > static_cast<double>(std::numeric_limits<float>::max())) {
        reader.Problem(key.str(), showNumber(number) + " does not fit a single-precision float");
        continue;
      }
      item->set_flt(static_cast<float>(number));
    } else {
      reader.Problem(key.str(), "an item is text, an integer, a number with a point, or a table");
    }
  }
}

void readRegistry(const toml::table& table, std::map<std::string, sns_registry_data>* registry,
                  Problems& problems) {
  TableReader reader(table, "registry", problems);
  for (const auto& [key, node] : table) {
    const std::string group(key.str());
    if (const toml::table* const items = reader.Table(group)) {
      readRegistryItems(*items, reader.PathOf(group), 0, &(*registry)[group], problems);
    }
  }
}

}  // namespace

void readWorldSignal(const WorldSignalRow& row, TableReader& reader, World* world, Problems& problems) {
  const toml::node* const node = reader.Node(row.name);
  if (node == nullptr) return;
  const toml::array* const list = node->as_array();
  if (list != nullptr && !list->empty() && list->front().is_table()) {
    readMoves(row, *list, reader.PathOf(row.name), world, problems);
    return;
  }
  SignalValue value{};
  if (readValue(row, row.name, reader, &value)) world->Set(row.signal, Signal(value));
}

void readScenario(toml::table& table, Scenario* scenario, Problems& problems) {
  TableReader reader(table, "", problems);
  if (const toml::table* const hub = reader.Table("hub")) readHub(*hub, &scenario->hub, problems);
  if (const toml::table* const world = reader.Table("world")) readWorld(*world, &scenario->world, problems);
  if (reader.Table("sensor") != nullptr) {
    readSensors(*table["sensor"].as_table(), &scenario->sensors, problems);
  }
  if (const toml::table* const registry = reader.Table("registry")) {
    readRegistry(*registry, &scenario->registry, problems);
  }
  if (const toml::table* const faults = reader.Table("fault")) {
    readFaults(*faults, scenario->sensors, &scenario->faults, problems);
  }
  reader.RejectOthers();
}

}  // namespace simhub
