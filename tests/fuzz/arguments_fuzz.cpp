// Any words behind any command: the first byte says which command, the second on which handset and with which
// global options, then the words, each ended by a zero byte. The hub has no sensor, so that a command that
// likes its words ends at the look-up.
#include <array>
#include <cstdlib>
#include <string>
#include <vector>

#include "fuzz/FuzzCheck.h"
#include "fuzz/FuzzedHub.h"
#include "main/Commands.h"
#include "ssc/Connection.h"

namespace {

using fuzz::check;

constexpr std::array<const char*, 11> kCommands{
    "als",        "baro",         "color", "imu-multipoint",  "imu-thermal", "mag",
    "mag-orient", "mag-softiron", "prox",  "mag-sensitivity", "sar"};
constexpr std::uint8_t kDevices = 6;
constexpr std::uint8_t kDryRun = 0x40;
constexpr std::uint8_t kReset = 0x80;
constexpr std::size_t kMostWords = 64;

std::vector<std::string> wordsOf(const char* command, fuzz::FuzzInput* input) {
  std::vector<std::string> words{command};
  while (!input->empty() && words.size() < kMostWords) {
    words.emplace_back();
    while (!input->empty()) {
      const std::uint8_t byte = input->byte();
      if (byte == 0) break;
      words.back() += static_cast<char>(byte);
    }
  }
  return words;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  (void)::setenv("VANTLE_ROOT", "/nonexistent", 1);  // NOLINT: no threads yet
  fuzz::FuzzInput input(data, size);
  const char* const command = kCommands[input.byte() % kCommands.size()];
  const std::uint8_t options = input.byte();
  std::vector<std::string> words = wordsOf(command, &input);
  std::vector<char*> argv;
  for (std::string& word : words) argv.push_back(word.data());
  argv.push_back(nullptr);

  Calibrator::Arguments arguments;
  arguments.deviceType = static_cast<DeviceType>(options % kDevices);
  arguments.dryRun = (options & kDryRun) != 0;
  arguments.reset = (options & kReset) != 0;
  arguments.command = command;
  arguments.argc = static_cast<std::int32_t>(words.size());
  arguments.argv = argv.data();

  fuzz::HubWorld world;
  fuzz::FuzzInput wellBehaved(nullptr, 0);
  const auto connection =
      ssc::Connection::Over(ssc::makeEmbeddedLink(std::make_unique<fuzz::FuzzedHub>(&world, &wellBehaved)));
  const auto calibrator = makeCalibrator(arguments.command, arguments.deviceType, connection.get());
  if (calibrator == nullptr) return 0;
  check(calibrator->Run(arguments) <= 0, "a result is 0 or negative");
  check(world.writes == 0, "without a sensor nothing is stored");
  return 0;
}
