// A whole barometer calibration against a hub that the input makes odd: look-up, attributes, registry,
// streams, notification, responses. Whatever the hub does, the command must end with a result and store only
// what is finite, and only when it says so.
#include <chrono>
#include <string>
#include <vector>

#include "fuzz/FuzzCheck.h"
#include "fuzz/FuzzedHub.h"
#include "mag/BaroCalibrator.h"
#include "ssc/Connection.h"
#include "ssc/Log.h"

namespace {

using fuzz::check;

constexpr float kPressureHpa = 1016.0F;
constexpr float kTemperatureCelsius = 27.5F;
/// Far beyond all the waits of one run together.
constexpr std::chrono::minutes kLongestRun{10};

/// The first byte of the input: how the command is called and what the handset has.
constexpr std::uint8_t kDryRun = 1;
constexpr std::uint8_t kReset = 2;
constexpr std::uint8_t kNoRawStream = 4;

void addVector(const std::string& name, float value, sns_registry_data* group) {
  auto* item = group->add_items();
  item->set_name(name);
  auto* number = item->mutable_subgrp()->add_items();
  number->set_name("x");
  number->set_flt(value);
}

fuzz::HubWorld handset(bool raw) {
  fuzz::HubWorld world;
  world.sensors = {{"pressure", "chip_0", {kPressureHpa}},
                   {"sensor_temperature", "chip_0", {kTemperatureCelsius}}};
  if (raw) world.sensors.push_back({"pressure_raw", "chip_0", {kPressureHpa}});
  addVector("bias", 0, &world.registry["chip_0_platform.pressure.fac_cal"]);
  return world;
}

int runCommand(std::uint8_t mode, ssc::Connection* connection) {
  std::string words[] = {"baro", "-t", "1", "1013.25"};
  char* argv[] = {words[0].data(), words[1].data(), words[2].data(), words[3].data(), nullptr};
  Calibrator::Arguments arguments;
  arguments.dryRun = (mode & kDryRun) != 0;
  arguments.reset = (mode & kReset) != 0;
  arguments.quiet = true;
  arguments.command = words[0];
  arguments.argc = 4;
  arguments.argv = argv;
  return BaroCalibrator(connection).Run(arguments);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  fuzz::FuzzInput input(data, size);
  const std::uint8_t mode = input.byte();
  const bool wellBehaved = input.empty();
  const bool writes = (mode & kDryRun) == 0 || (mode & kReset) != 0;
  fuzz::HubWorld world = handset((mode & kNoRawStream) == 0);
  int result = 0;
  {
    const auto connection =
        ssc::Connection::Over(ssc::makeEmbeddedLink(std::make_unique<fuzz::FuzzedHub>(&world, &input)));
    const auto begin = connection->clock().now();
    result = runCommand(mode, connection.get());
    check(connection->clock().now() - begin < kLongestRun, "a run ends within its own deadlines");
  }
  check(result <= 0, "a result is 0 or negative");
  check(result == 0 || !wellBehaved, "a calibration with a well-behaved hub succeeds");
  check(world.wroteFinite, "only finite numbers are stored");
  check(world.writes <= 1, "a group is written at most once");
  check(writes || world.writes == 0, "a dry run writes nothing");
  check(!writes || result != 0 || world.writes == 1, "success says that the calibration was written");
  return 0;
}
