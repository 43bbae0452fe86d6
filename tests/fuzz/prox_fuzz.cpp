// Whole proximity commands of both variants with an offset, against a hub that the input makes odd: look-up,
// attributes, registry, readings, answers to requests, notification, responses. Whatever the hub does, the
// command must end with a result and store only what its items may hold.
#include <chrono>
#include <cmath>
#include <string>
#include <type_traits>
#include <utility>
#include <vector>

#include "fuzz/FuzzCheck.h"
#include "fuzz/FuzzedCommand.h"
#include "fuzz/FuzzedHub.h"
#include "proto/sns_oem_proximity.pb.h"
#include "proto/sns_proximity.pb.h"
#include "prox/ProxPoffset.h"
#include "prox/UdProxCalibrator.h"
#include "ssc/Connection.h"

namespace {

using fuzz::check;

constexpr std::uint32_t kProximityEvent = 769;
/// Far beyond all the waits of one run together.
constexpr std::chrono::minutes kLongestRun{10};

/// The first byte of the input: how the command is called.
constexpr std::uint8_t kDryRun = 1;
constexpr std::uint8_t kReset = 2;
constexpr std::uint8_t kUnderDisplay = 4;
constexpr int kTaskShift = 3;
const std::vector<std::vector<std::string>> kTasks{
    {"sample"},         {"poffset", "disable"},       {"poffset", "enable"}, {"ppulse", "500"},
    {"pldrive", "500"}, {"ore", "enable", "16", "4"}, {"ppulse", "1e30"},    {"pldrive", "1e38"},
};

/// Raw counts, then what is behind them.
std::string encodeReading(const std::vector<float>& values) {
  sns_proximity_event event;
  event.set_proximity_event_type(SNS_PROXIMITY_EVENT_TYPE_NEAR);
  event.set_status(SNS_STD_SENSOR_SAMPLE_STATUS_ACCURACY_HIGH);
  const float counts = values.empty() ? 0 : std::fabs(values.front());
  event.set_raw_adc(counts < 4e9F ? static_cast<std::uint32_t>(counts) : 0xffffffffU);
  for (std::size_t i = 1; i < values.size(); ++i) event.add_data(values[i]);
  return event.SerializeAsString();
}

void addInteger(const std::string& name, std::int64_t value, sns_registry_data* group) {
  auto* const item = group->add_items();
  item->set_name(name);
  item->set_sint(value);
}

fuzz::HubWorld handset(bool underDisplay) {
  fuzz::HubWorld world;
  sns_oem_poffset_resp offset;
  offset.set_success(true);
  sns_oem_ore_resp extension;
  extension.set_success(true);
  world.sensors = {{underDisplay ? "proximity_raw" : "proximity",
                    "chip_0",
                    {250, 60, 2},
                    kProximityEvent,
                    encodeReading,
                    {{770, {771, offset.SerializeAsString()}}, {772, {773, extension.SerializeAsString()}}}}};
  sns_registry_data& group = world.registry["chip_0_platform.prox.fac_cal"];
  for (const char* const name : {"version", "ore", "poffset"}) addInteger(name, 1, &group);
  addInteger("pldrive", 10, &group);
  auto* const item = group.add_items();
  item->set_name("ppulse");
  item->set_flt(15);
  return world;
}

template <class Command>
int runCommand(std::uint8_t mode, std::vector<std::string> words, ssc::Connection* connection) {
  words.insert(words.begin(), "prox");
  if (std::is_same_v<Command, UdProxCalibrator>) words.emplace_back("-w");
  Calibrator::Arguments arguments;
  arguments.deviceType = DeviceType::t5h5;
  arguments.dryRun = (mode & kDryRun) != 0;
  arguments.reset = (mode & kReset) != 0;
  return fuzz::runCommand<Command>(arguments, std::move(words), connection);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  fuzz::FuzzInput input(data, size);
  const std::uint8_t mode = input.byte();
  const bool wellBehaved = input.empty();
  const bool underDisplay = (mode & kUnderDisplay) != 0;
  const bool resets = underDisplay && (mode & kReset) != 0;
  // Without a display above it a sensor has the first three tasks.
  const std::size_t task = (mode >> kTaskShift) % (underDisplay ? kTasks.size() : 3);
  fuzz::HubWorld world = handset(underDisplay);
  int result = 0;
  {
    const auto connection =
        ssc::Connection::Over(ssc::makeEmbeddedLink(std::make_unique<fuzz::FuzzedHub>(&world, &input)));
    const auto begin = connection->clock().now();
    result = underDisplay ? runCommand<UdProxCalibrator>(mode, kTasks[task], connection.get())
                          : runCommand<ProxPoffset>(mode, kTasks[task], connection.get());
    check(connection->clock().now() - begin < kLongestRun, "a run ends within its own deadlines");
  }
  check(result <= 0, "a result is 0 or negative");
  check(result == 0 || !wellBehaved, "a command with a well-behaved hub succeeds");
  check(world.wroteFinite, "only finite numbers are stored");
  check(world.writes <= (underDisplay ? 1 : 0), "a group is written at most once");
  check((mode & kDryRun) == 0 || resets || world.writes == 0, "a dry run writes nothing");
  return 0;
}
