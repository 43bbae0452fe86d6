// Every command, on the handset that has it, against a hub that the input makes odd: look-up, attributes,
// registry, readings, answers, responses. Whatever the hub does, the command must end with a result within
// its own waits, and store only what is finite.
#include <chrono>
#include <cmath>
#include <cstdlib>
#include <filesystem>
#include <map>
#include <string>
#include <vector>

#include "fuzz/FuzzCheck.h"
#include "fuzz/FuzzedHub.h"
#include "main/Commands.h"
#include "proto/sns_oem_sar.pb.h"
#include "proto/sns_proximity.pb.h"
#include "simhub/Scenario.h"
#include "ssc/Connection.h"

namespace {

using fuzz::check;

/// Far beyond all the waits of one run together.
constexpr std::chrono::minutes kLongestRun{10};
constexpr std::uint32_t kProximityEvent = 769;
constexpr std::uint8_t kDryRun = 0x80;

struct Call {
  const char* scenario;
  DeviceType device;
  bool reset;
  std::vector<std::string> words;
};

const std::vector<Call>& calls() {
  using enum DeviceType;
  static const std::vector<Call> all{
      {"o1v1", o1v1, false, {"als", "-s", "2", "300"}},
      {"o1v1", o1v1, false, {"als", "-v", "50", "300"}},
      {"o1v1", o1v1, true, {"als"}},
      {"o1v1", o1v1, false, {"baro", "-t", "1", "1013.25"}},
      {"e4d4", e4d4, false, {"baro", "-t", "1", "1013.25"}},
      {"o1v1", o1v1, true, {"baro"}},
      {"o1v1", o1v1, false, {"mag", "-t", "1", "0", "22", "42"}},
      {"e4d4", e4d4, false, {"mag", "-t", "1", "0", "22", "42"}},
      {"o1v1", o1v1, true, {"mag"}},
      {"o1v1", o1v1, false, {"mag-orient", "+x", "-y", "-z"}},
      {"o1v1", o1v1, true, {"mag-orient"}},
      {"o1v1", o1v1, false, {"mag-softiron", "1", "0", "0", "0", "1", "0", "0", "0", "1"}},
      {"o1v1", o1v1, false, {"mag-sensitivity", "-s", "fast", "1", "2", "3"}},
      {"o1v1", o1v1, true, {"mag-sensitivity"}},
      {"o1v1", o1v1, false, {"imu-multipoint", "-t", "1", "first"}},
      {"o1v1", o1v1, false, {"imu-multipoint", "-t", "1", "last"}},
      {"p2m2", p2m2, false, {"imu-multipoint", "-t", "1", "-p", "a+z"}},
      {"p2m2", p2m2, false, {"imu-multipoint", "-t", "1", "-p", "g+z", "--use-gyro-rate"}},
      {"p2m2", p2m2, false, {"imu-multipoint", "-t", "1", "-p", "a+z", "last"}},
      {"p2m2", p2m2, true, {"imu-multipoint"}},
      {"o1v1", o1v1, false, {"imu-thermal", "3"}},
      {"o1v1", o1v1, false, {"imu-thermal", "--use-old-bump", "--bump-bsize", "5", "3"}},
      {"t5h5", t5h5, false, {"imu-thermal", "3"}},
      {"p2m2", p2m2, false, {"color", "-s", "2", "-w", "500", "2800"}},
      {"p2m2", p2m2, false, {"color", "-s", "2", "-v", "50", "500", "2800"}},
      {"p2m2", p2m2, true, {"color"}},
      {"o1v1", o1v1, false, {"prox", "-s", "2", "far"}},
      {"o1v1", o1v1, true, {"prox"}},
      {"o1v1", o1v1, false, {"sar"}},
      {"t5h5", t5h5, false, {"als", "-s", "2", "-w", "500", "5000"}},
      {"t5h5", t5h5, false, {"als", "-s", "2", "-v", "50", "500"}},
      {"t5h5", t5h5, false, {"als", "trigger", "enable"}},
      {"t5h5", t5h5, false, {"als", "itime", "50000"}},
      {"t5h5", t5h5, true, {"als"}},
  };
  return all;
}

/// The simulated handset's folders, emptied for every run.
const std::filesystem::path& emptyRoot() {
  static const std::filesystem::path root = [] {
    std::string pattern = (std::filesystem::temp_directory_path() / "vantle-fuzz-XXXXXX").string();
    check(::mkdtemp(pattern.data()) != nullptr, "there is a temporary folder");
    (void)::setenv("VANTLE_ROOT", pattern.c_str(), 1);  // NOLINT: no threads yet
    // libFuzzer ends the process by itself.
    static std::string made = pattern;
    (void)std::atexit([] {
      std::error_code ignored;
      std::filesystem::remove_all(made, ignored);
    });
    return std::filesystem::path(pattern);
  }();
  std::error_code ignored;
  for (const auto& folder : std::filesystem::directory_iterator(root, ignored)) {
    std::filesystem::remove_all(folder.path(), ignored);
  }
  for (const char* const folder : {"data/app-ephemeral", "persist/sensors", "mnt/vendor/persist/sensors"}) {
    std::filesystem::create_directories(root / folder, ignored);
  }
  return root;
}

std::string encodeProximity(const std::vector<float>& values) {
  sns_proximity_event event;
  event.set_proximity_event_type(SNS_PROXIMITY_EVENT_TYPE_NEAR);
  event.set_status(SNS_STD_SENSOR_SAMPLE_STATUS_ACCURACY_HIGH);
  const float counts = values.empty() ? 0 : std::fabs(values.front());
  event.set_raw_adc(counts < 4e9F ? static_cast<std::uint32_t>(counts) : 0xffffffffU);
  for (std::size_t i = 1; i < values.size(); ++i) event.add_data(values[i]);
  return event.SerializeAsString();
}

std::vector<float> readingOf(const std::string& dataType, const std::string& scenario) {
  const bool hasRaw = scenario == "p2m2" || scenario == "t5h5";
  if (dataType == "accel") {
    return hasRaw ? std::vector<float>{0, 0, 9.8F, 0.1F, 0.1F, 9.7F} : std::vector<float>{0, 0, 9.8F};
  }
  if (dataType == "gyro") {
    return hasRaw ? std::vector<float>{0, 0, 0, 0.01F, 0, 0.02F} : std::vector<float>{0.01F, 0, 0};
  }
  if (dataType.starts_with("mag")) return {1, 22, 42};
  if (dataType.starts_with("pressure")) return {1016};
  if (dataType == "sensor_temperature") return {27.5F};
  if (dataType == "ambient_light") return {240};
  if (dataType.starts_with("proximity")) return {140, 2, 3};
  return {500, 4000, 3000, 1000, 1100, 900, 200, 4};  // colors, and light under a display
}

void addGroup(const std::string& name, const sns_registry_data& items, fuzz::HubWorld* world) {
  world->registry[name] = items;
  for (const sns_registry_data_item& item : items.items()) {
    if (item.has_subgrp()) addGroup(name + "." + item.name(), item.subgrp(), world);
  }
}

fuzz::HubWorld makeHandset(const std::string& name) {
  simhub::Scenario scenario;
  std::string error;
  check(simhub::loadScenario(name, {}, &scenario, &error), "the built-in handsets load");
  fuzz::HubWorld world;
  for (const simhub::SensorConfig& sensor : scenario.sensors) {
    if (!sensor.present) continue;
    fuzz::HubWorld::Sensor made{sensor.dataType, sensor.name, readingOf(sensor.dataType, name)};
    if (sensor.dataType.starts_with("proximity")) {
      made.readingId = kProximityEvent;
      made.encode = encodeProximity;
    }
    sns_sar_comp_resp compensation;
    compensation.set_top_offset(100);
    compensation.set_bottom_offset(100);
    made.answers[778] = {779, compensation.SerializeAsString()};
    for (std::uint32_t id = 7800; id <= 7814; id += 2)
      made.answers[id] = {id + 1, std::string("\x08\x01", 2)};
    world.sensors.push_back(std::move(made));
  }
  for (const auto& [group, items] : scenario.registry) addGroup(group, items, &world);
  return world;
}

/// As it was made; reading a scenario takes longer than a command.
const fuzz::HubWorld& handset(const std::string& name) {
  static std::map<std::string, fuzz::HubWorld> known;
  const auto found = known.find(name);
  return found != known.end() ? found->second : known.emplace(name, makeHandset(name)).first->second;
}

int runCommand(const Call& call, bool dryRun, ssc::Connection* connection) {
  std::vector<std::string> words = call.words;
  std::vector<char*> argv;
  for (std::string& word : words) argv.push_back(word.data());
  argv.push_back(nullptr);
  Calibrator::Arguments arguments;
  arguments.deviceType = call.device;
  arguments.dryRun = dryRun;
  arguments.reset = call.reset;
  arguments.quiet = true;
  arguments.command = words.front();
  arguments.argc = static_cast<std::int32_t>(words.size());
  arguments.argv = argv.data();
  const auto calibrator = makeCalibrator(arguments.command, arguments.deviceType, connection);
  check(calibrator != nullptr, "the handset has the command");
  return calibrator->Run(arguments);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  fuzz::FuzzInput input(data, size);
  const std::uint8_t mode = input.byte();
  const Call& call = calls()[(mode & ~kDryRun) % calls().size()];
  (void)emptyRoot();
  fuzz::HubWorld world = handset(call.scenario);
  int result = 0;
  {
    const auto connection =
        ssc::Connection::Over(ssc::makeEmbeddedLink(std::make_unique<fuzz::FuzzedHub>(&world, &input)));
    const auto begin = connection->clock().now();
    result = runCommand(call, (mode & kDryRun) != 0, connection.get());
    check(connection->clock().now() - begin < kLongestRun, "a run ends within its own deadlines");
  }
  check(result <= 0, "a result is 0 or negative");
  check(world.wroteFinite, "only finite numbers are stored");
  return 0;
}
