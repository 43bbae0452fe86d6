// Whole commands of the light sensor under the display against a hub that the input makes odd: look-up,
// attributes, registry, readings, answers to requests, responses. Whatever the hub does, the command must end
// with a result and store only what is finite. There are no folders to write into: steps end at their record.
#include <chrono>
#include <cstdlib>
#include <string>
#include <vector>

#include "fuzz/FuzzCheck.h"
#include "fuzz/FuzzedHub.h"
#include "light/UdAlsCalibrator.h"
#include "proto/sns_oem_als.pb.h"
#include "ssc/Connection.h"

namespace {

using fuzz::check;

/// Far beyond all the waits of one run together.
constexpr std::chrono::minutes kLongestRun{10};

/// The first byte of the input: how the command is called.
constexpr std::uint8_t kDryRun = 1;
constexpr std::uint8_t kReset = 2;
constexpr int kTaskShift = 2;

struct Task {
  std::vector<std::string> words;
  bool succeeds;  ///< with a well-behaved hub, and nowhere to write
};
const std::vector<Task> kTasks{
    {{"sample"}, true},
    {{"trigger", "enable", "5"}, true},
    {{"autogain"}, true},
    {{"gain", "3", "itime", "100"}, true},
    {{"-v", "50", "400"}, true},
    {{"-w", "400"}, false},
    {{"calgain", "100", "3"}, false},
    {{"caldelay", "100", "3", "0", "5", "1"}, false},
    {{"set_te2", "8", "10"}, true},
};

fuzz::HubWorld handset() {
  fuzz::HubWorld world;
  world.sensors = {{"ambient_light_raw", "chip_0", {400, 10, 20, 30, 40, 5, 11, 1000}}};
  sns_oem_als_trigger_resp answer;
  answer.set_success(true);
  answer.set_enabled(true);
  for (std::uint32_t id = kUdAlsTriggerRequest; id <= kUdAlsSetGainItimeRequest; id += 2) {
    world.sensors[0].answers[id] = {id + 1, answer.SerializeAsString()};
  }
  auto* const scale = world.registry["chip_0_platform.als.fac_cal"].add_items();
  scale->set_name("scale");
  scale->set_flt(1);
  return world;
}

int runCommand(std::uint8_t mode, std::vector<std::string> words, ssc::Connection* connection) {
  words.insert(words.begin(), "als");
  std::vector<char*> argv;
  for (std::string& word : words) argv.push_back(word.data());
  argv.push_back(nullptr);
  Calibrator::Arguments arguments;
  arguments.deviceType = DeviceType::t5h5;
  arguments.dryRun = (mode & kDryRun) != 0;
  arguments.reset = (mode & kReset) != 0;
  arguments.quiet = true;
  arguments.command = "als";
  arguments.argc = static_cast<std::int32_t>(words.size());
  arguments.argv = argv.data();
  return UdAlsCalibrator(connection).Run(arguments);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  ::setenv("VANTLE_ROOT", "/nonexistent", 1);
  fuzz::FuzzInput input(data, size);
  const std::uint8_t mode = input.byte();
  const bool wellBehaved = input.empty();
  const bool resets = (mode & kReset) != 0;
  const Task& task = kTasks[static_cast<std::size_t>(mode >> kTaskShift) % kTasks.size()];
  fuzz::HubWorld world = handset();
  int result = 0;
  {
    const auto connection =
        ssc::Connection::Over(ssc::makeEmbeddedLink(std::make_unique<fuzz::FuzzedHub>(&world, &input)));
    const auto begin = connection->clock().now();
    result = runCommand(mode, task.words, connection.get());
    check(connection->clock().now() - begin < kLongestRun, "a run ends within its own deadlines");
  }
  check(result <= 0, "a result is 0 or negative");
  // The group lacks most of what a reset wants.
  if (wellBehaved) check((result == 0) == (task.succeeds && !resets), "a well-behaved hub decides nothing");
  check(world.wroteFinite, "only finite numbers are stored");
  check(world.writes <= 1, "a group is written at most once");
  check((mode & kDryRun) == 0 || world.writes == 0 || resets, "a dry run writes nothing");
  return 0;
}
