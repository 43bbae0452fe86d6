// Reads the [sensor.KEY] sections of a scenario.
#include <algorithm>

#include "simhub/Protocol.h"
#include "simhub/ScenarioReader.h"
#include "simhub/SensorModels.h"

namespace simhub {
namespace {

constexpr double kMaxReading = 1e9;
constexpr double kMinRate = 1e-3;  // Hz
constexpr double kMaxMilliseconds = 1e6;
constexpr std::int64_t kMaxBatch = 1000;
constexpr std::size_t kMaxListed = 32;  // rates, resolutions, ranges
constexpr int kMaxLikes = 8;

struct StreamTypeName {
  const char* name;
  sns_std_sensor_stream_type type;
};
constexpr StreamTypeName kStreamTypes[] = {
    {"streaming", SNS_STD_SENSOR_STREAM_TYPE_STREAMING},
    {"on_change", SNS_STD_SENSOR_STREAM_TYPE_ON_CHANGE},
    {"single_output", SNS_STD_SENSOR_STREAM_TYPE_SINGLE_OUTPUT},
};

/// Lays the table of the sensor that this one is like under its own. What makes a sensor a sensor of its own
/// is not taken over. False: reported.
bool resolveLike(toml::table& all, const std::string& key, int depth, Problems& problems) {
  toml::table& own = *all[key].as_table();
  TableReader reader(own, "sensor." + showKey(key), problems);
  std::string other;
  if (!reader.Text("like", &other)) return true;
  const bool exists = all[other].is_table();
  if (!exists || depth >= kMaxLikes) {
    reader.Problem("like", exists ? "sensors are like each other in a circle"
                                  : "there is no [sensor." + showKey(other) + "]");
    return false;
  }
  if (!resolveLike(all, other, depth + 1, problems)) return false;
  toml::table merged = *all[other].as_table();
  for (const char* const notShared : {"present", "data_type"}) merged.erase(notShared);
  own.erase("like");
  mergeTables(merged, std::move(own));  // moved, not copied: copies do not know their line
  all.insert_or_assign(key, std::move(merged));
  return true;
}

void readIdentity(TableReader& reader, SensorConfig* config) {
  std::int64_t number = 0;
  (void)reader.Flag("present", &config->present);
  (void)reader.Text("name", &config->name);
  (void)reader.Text("vendor", &config->vendor);
  (void)reader.Text("data_type", &config->dataType);
  (void)reader.Text("registry_group", &config->registryGroup);
  (void)reader.Integer("version", 0, INT32_MAX, &config->version);
  (void)reader.Integer("hardware_id", 0, INT32_MAX, &config->hardwareId);
  (void)reader.Integer("rigid_body", 0, INT32_MAX, &config->rigidBody);
  (void)reader.Flag("physical", &config->physical);
  (void)reader.Flag("calibrated", &config->calibrated);
  if (reader.Integer("batch", 1, kMaxBatch, &number)) config->batch = static_cast<std::uint32_t>(number);
  std::string stream;
  if (reader.Text("stream", &stream)) {
    const auto* const known = std::find_if(std::begin(kStreamTypes), std::end(kStreamTypes),
                                           [&](const StreamTypeName& row) { return stream == row.name; });
    if (known == std::end(kStreamTypes)) {
      reader.Problem("stream", "\"" + stream + "\" is not streaming, on_change or single_output");
    } else {
      config->streamType = known->type;
    }
  }
}

void readRanges(TableReader& reader, SensorConfig* config, Problems& problems) {
  const toml::node* const node = reader.Node("ranges");
  const toml::array* const list = node != nullptr ? node->as_array() : nullptr;
  if (node != nullptr && list == nullptr) reader.Problem("ranges", "has to be a list of [low, high]");
  for (std::size_t i = 0; list != nullptr && i < std::min(list->size(), kMaxListed); ++i) {
    const toml::array* const pair = list->get(i)->as_array();
    const auto low = pair != nullptr && pair->size() == 2 ? pair->get(0)->value<double>() : std::nullopt;
    const auto high = pair != nullptr && pair->size() == 2 ? pair->get(1)->value<double>() : std::nullopt;
    if (!low || !high || !(*low <= *high)) {
      problems.Add(list->get(i), reader.PathOf("ranges"), "a range is [low, high]");
      return;
    }
    config->ranges.push_back({*low, *high});
  }
  std::int64_t selected = 0;
  const auto last = static_cast<std::int64_t>(config->ranges.size()) - 1;
  if (reader.Integer("selected_range", 0, std::max<std::int64_t>(last, 0), &selected)) {
    config->selectedRange = static_cast<std::size_t>(selected);
  }
}

void readTiming(TableReader& reader, SensorConfig* config) {
  double milliseconds = 0;
  if (reader.Number("latency_ms", 0, kMaxMilliseconds, &milliseconds)) {
    config->latency = fromSeconds(milliseconds * 1e-3);
  }
  if (reader.Number("settling_ms", 0, kMaxMilliseconds, &milliseconds)) {
    config->settling = fromSeconds(milliseconds * 1e-3);
  }
  if (reader.Numbers("rates", 1, kMaxListed, kMinRate, kMaxSensorRate, &config->rates) &&
      !std::is_sorted(config->rates.begin(), config->rates.end())) {
    reader.Problem("rates", "have to ascend");
  }
  (void)reader.Numbers("resolutions", 1, kMaxListed, 0, kMaxReading, &config->resolutions);
}

/// One number for all channels, or one for each.
void readChannels(TableReader& reader, const char* key, double low,
                  std::array<double, kMaxChannels>* channels) {
  std::vector<double> numbers;
  if (!reader.Numbers(key, 1, kMaxChannels, low, kMaxReading, &numbers)) return;
  channels->fill(numbers.size() == 1 ? numbers.front() : 0);
  std::copy(numbers.begin(), numbers.end(), channels->begin());
}

/// A whole matrix in row order, its diagonal, or one number for all of the diagonal.
void readMatrix(TableReader& reader, const char* key, ErrorModel::Matrix* matrix) {
  std::vector<double> numbers;
  if (!reader.Numbers(key, 1, 9, -kMaxReading, kMaxReading, &numbers)) return;
  if (numbers.size() == 9) {
    std::copy(numbers.begin(), numbers.end(), matrix->begin());
    return;
  }
  if (numbers.size() != 1 && numbers.size() != 3) {
    reader.Problem(key,
                   "a matrix is nine numbers in row order, three for its diagonal, or one for all of that");
    return;
  }
  matrix->fill(0);
  for (std::size_t i = 0; i < 3; ++i) (*matrix)[4 * i] = numbers[numbers.size() == 3 ? i : 0];
}

void readError(TableReader& reader, ErrorModel* error) {
  readChannels(reader, "bias", -kMaxReading, &error->bias);
  readChannels(reader, "temperature_slope", -kMaxReading, &error->temperatureSlope);
  readChannels(reader, "noise", 0, &error->noise);
  readMatrix(reader, "scale", &error->scale);
  readMatrix(reader, "soft_iron", &error->softIron);
  (void)reader.Number("reference_temperature", -273.15, 1000, &error->referenceTemperature);
  (void)reader.Number("quantisation", 0, kMaxReading, &error->quantisation);
}

void readSensor(const toml::table& table, SensorConfig* config, Problems& problems) {
  TableReader reader(table, "sensor." + showKey(config->key), problems);
  const bool hasModel = reader.Text("model", &config->model);
  readIdentity(reader, config);
  readRanges(reader, config, problems);
  readTiming(reader, config);
  readError(reader, &config->error);
  const SensorModel* const model = findSensorModel(config->model);
  if (!hasModel || model == nullptr) {
    std::string known;
    for (const SensorModel& row : sensorModels())
      known += (known.empty() ? "" : ", ") + std::string(row.name);
    reader.Problem(hasModel ? "model" : "", "needs a model out of: " + known);
    return;  // its keys are not known
  }
  for (const SensorParameter& parameter : model->parameters) {
    std::vector<double>& values = config->parameters[parameter.key];
    values.assign(std::max<std::size_t>(parameter.minCount, 1), parameter.initial);
    (void)reader.Numbers(parameter.key, parameter.minCount, parameter.maxCount, parameter.low, parameter.high,
                         &values);
  }
  // An absent sensor is often one that a base has and nobody has named.
  if (config->present && config->name.empty()) reader.Problem("", "needs a name");
  reader.RejectOthers();
}

}  // namespace

void readSensors(toml::table& table, std::vector<SensorConfig>* sensors, Problems& problems) {
  std::vector<std::string> keys;
  for (const auto& [key, node] : table) keys.emplace_back(key.str());
  for (const std::string& key : keys) {
    TableReader reader(table, "sensor", problems);
    SensorConfig config;
    config.key = config.dataType = key;
    if (key == kRegistryDataType || key == kSuidDataType) {
      reader.Problem(key, "is a sensor of the hub's own");
      continue;
    }
    if (reader.Table(key) == nullptr || !resolveLike(table, key, 0, problems)) continue;
    readSensor(*table[key].as_table(), &config, problems);
    if (config.present) sensors->push_back(std::move(config));
  }
}

}  // namespace simhub
