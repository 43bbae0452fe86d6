// The whole SAR command against a hub that the input makes odd: look-up, attributes, the compensation's
// answer, registry, responses. Whatever the hub does, the command must end with a result and store only
// finite offsets.
#include <chrono>
#include <string>
#include <vector>

#include "fuzz/FuzzCheck.h"
#include "fuzz/FuzzedCommand.h"
#include "fuzz/FuzzedHub.h"
#include "proto/sns_oem_sar.pb.h"
#include "prox/SarCalibrator.h"
#include "ssc/Connection.h"

namespace {

using fuzz::check;

/// Far beyond all the waits of one run together.
constexpr std::chrono::minutes kLongestRun{1};

/// The first byte of the input: how the command is called. Not with a reset, which deletes a file.
constexpr std::uint8_t kDryRun = 1;
constexpr std::uint8_t kSecond = 2;

fuzz::HubWorld sensors() {
  fuzz::HubWorld world;
  sns_sar_comp_resp response;
  response.set_top_offset(8000);
  response.set_bottom_offset(7000);
  for (const char* const id : {"0", "1"}) {
    world.sensors.push_back({"sar", "CHIP", {1, 2}});
    world.sensors.back().answers = {{778, {779, response.SerializeAsString()}}};
    sns_registry_data& group = world.registry["chip_" + std::string(id) + "_platform.fac_cal"];
    for (const char* const name : {"max_offset_top", "max_offset_bottom"}) {
      auto* const item = group.add_items();
      item->set_name(name);
      item->set_flt(16383);
    }
  }
  return world;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  fuzz::FuzzInput input(data, size);
  const std::uint8_t mode = input.byte();
  const bool wellBehaved = input.empty();
  Calibrator::Arguments arguments;
  arguments.dryRun = (mode & kDryRun) != 0;
  fuzz::HubWorld world = sensors();
  int result = 0;
  {
    const auto connection =
        ssc::Connection::Over(ssc::makeEmbeddedLink(std::make_unique<fuzz::FuzzedHub>(&world, &input)));
    const auto begin = connection->clock().now();
    const std::vector<std::string> words{"sar", "-i", (mode & kSecond) != 0 ? "1" : "0"};
    result = fuzz::runCommand<SarCalibrator>(arguments, words, connection.get());
    check(connection->clock().now() - begin < kLongestRun, "a run ends within its own deadlines");
  }
  check(result <= 0, "a result is 0 or negative");
  check(result == 0 || !wellBehaved, "a command with a well-behaved hub succeeds");
  check(world.wroteFinite, "only finite numbers are stored");
  check(world.writes <= (arguments.dryRun ? 0 : 1), "the group is written at most once");
  return 0;
}
