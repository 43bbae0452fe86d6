// Many commands against one hub in another process, one after the other and many at once: nobody leaks, no
// stored value is lost, nobody sees what is another's. How many is VANTLE_SOAK (scripts/soak), by default
// few.
#include <algorithm>
#include <array>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <thread>

#include <gtest/gtest.h>

#include "fault/HandsetFiles.h"
#include "proto/sns_registry.pb.h"
#include "simhub/RegistryJson.h"
#include "support/Process.h"
#include "support/TemporaryFolder.h"

namespace fault {
namespace {

/// Nothing takes this long unless it hangs, not even with a sanitizer on a busy machine.
constexpr std::chrono::seconds kPatience{60};
/// Commands that count their samples need not wait for them in real time.
constexpr const char* kHubSpeed = "50";
constexpr std::size_t kAtOnce = 16;
constexpr std::size_t kCommandsByDefault = 60;

#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
/// A sanitizer keeps what was released.
constexpr bool kMemoryIsOwn = false;
#else
constexpr bool kMemoryIsOwn = true;
#endif
/// What a hub's memory may grow by, however many commands it serves: the allocator's rounding.
constexpr std::size_t kGrowthKiB = 1024;

/// A command that raises the version of an item each time.
struct Writer {
  std::vector<std::string> words;
  const char* group;
  const char* item;
};
const std::vector<Writer>& writers() {
  static const std::vector<Writer> all{
      {{"-q", "als", "300"}, "lightchip_0_platform.als.fac_cal", "scale"},
      {{"-q", "prox", "near"}, "proxchip_0_platform.prox.fac_cal", "near_threshold"},
      {{"mag-orient", "+y", "-x", "+z"}, "magchip_0_platform.orient", "y"},
      {{"mag-softiron", "1", "0.5", "0", "0", "1", "0", "0", "0", "1"},
       "magchip_0_platform.mag.fac_cal.corr_mat",
       "0_1"},
      {{"mag-sensitivity", "-s", "normal", "1", "-2", "3"}, "magchip_0_platform.sensitivity", "y"},
      {{"mag-sensitivity", "-s", "fast", "4", "-5", "6"}, "magchip_0_platform.sensitivity_fast", "z"},
      {{"-r", "baro"}, "barochip_0_platform.pressure.fac_cal", "mean_temp"},
      {{"-r", "imu-multipoint"}, "imuchip_0_platform.gyro.fac_cal", "mean_temp"},
  };
  return all;
}

/// Commands that store nothing.
const std::vector<std::vector<std::string>>& measurements() {
  static const std::vector<std::vector<std::string>> all{{"-q", "als", "-c", "-s", "2", "-v", "90", "300"},
                                                         {"-q", "-n", "prox", "far"},
                                                         {"-n", "-q", "als", "300"}};
  return all;
}

std::size_t commandCount() {
  const char* const text = std::getenv("VANTLE_SOAK");  // NOLINT: no threads yet
  const long count = text != nullptr ? std::strtol(text, nullptr, 10) : 0;
  return count > 0 ? static_cast<std::size_t>(count) : kCommandsByDefault;
}

struct Footprint {
  std::size_t residentKiB = 0;
  std::size_t descriptors = 0;
};

Footprint footprintOf(pid_t process) {
  const std::filesystem::path folder = "/proc/" + std::to_string(process);
  Footprint footprint;
  std::ifstream status(folder / "status");
  for (std::string line; std::getline(status, line);) {
    if (line.starts_with("VmRSS:")) footprint.residentKiB = std::strtoul(line.c_str() + 6, nullptr, 10);
  }
  std::error_code ignored;
  for (const auto& entry : std::filesystem::directory_iterator(folder / "fd", ignored)) {
    (void)entry;
    ++footprint.descriptors;
  }
  return footprint;
}

/// How many commands a second ended since then, to a tenth.
std::string rateSince(std::chrono::steady_clock::time_point begin, std::size_t commands) {
  const std::chrono::duration<double> passed = std::chrono::steady_clock::now() - begin;
  std::array<char, 32> text;
  std::snprintf(text.data(), text.size(), "%.1f a second", static_cast<double>(commands) / passed.count());
  return text.data();
}

class Soak : public testing::Test {
 protected:
  void SetUp() override {
    support::makeDeviceFolders(root());
    support::Command command{VANTLE_HUB_PROGRAM, "vantle-hub", {}, environment(), "", ""};
    command.arguments = {"--socket", socket(), "--scenario", "o1v1", "--speed", kHubSpeed};
    ASSERT_TRUE(hub.start(command));
    ASSERT_TRUE(hub.waitForText("listening on", kPatience));
  }

  [[nodiscard]] std::filesystem::path root() const { return folder.path() / "root"; }
  [[nodiscard]] std::string socket() const { return folder.path() / "hub"; }

  [[nodiscard]] std::vector<std::pair<std::string, std::string>> environment() const {
    auto variables = support::sanitizerEnvironment();
    variables.emplace_back("VANTLE_ROOT", root().string());
    return variables;
  }

  [[nodiscard]] support::Outcome vantle(const std::vector<std::string>& words) const {
    support::Command command{VANTLE_PROGRAM, "vantle", words, environment(), "", ""};
    command.environment.emplace_back("VANTLE_HUB", "unix:" + socket());
    return support::run(command, kPatience);
  }

  /// The version of a stored item; 0 when there is none.
  [[nodiscard]] std::int32_t version(const Writer& writer) const {
    const Files files = registryFiles(root());
    const auto file = files.find(writer.group);
    sns_registry_data items;
    std::string error;
    if (file == files.end() || !simhub::parseRegistryGroup(file->second, &items, &error)) return 0;
    for (const sns_registry_data_item& item : items.items()) {
      if (item.name() == writer.item) return item.version();
    }
    return 0;
  }

  /// The hub's, once it has noticed that those who were served before are gone: it serves one more.
  [[nodiscard]] Footprint footprintAtRest() const {
    const support::Outcome outcome = vantle(measurements().front());
    EXPECT_TRUE(outcome.exitedWith(0)) << outcome.describe() << outcome.output << outcome.errors;
    return footprintOf(hub.pid());
  }

  void expectSameFootprint(const Footprint& begin, const Footprint& end) {
    // The last client may not have been noticed to be gone.
    EXPECT_LE(end.descriptors, begin.descriptors + 1);
    if (kMemoryIsOwn) {
      EXPECT_LE(end.residentKiB, begin.residentKiB + kGrowthKiB);
    }
    RecordProperty("residentKiB",
                   std::to_string(begin.residentKiB) + " to " + std::to_string(end.residentKiB));
    RecordProperty("descriptors",
                   std::to_string(begin.descriptors) + " to " + std::to_string(end.descriptors));
  }

  support::TemporaryFolder folder;
  support::Process hub;
};

TEST_F(Soak, ManyCommandsInARowLeaveTheHubAsItWas) {
  const std::size_t count = commandCount();
  const std::size_t warm = std::max(count / 10, writers().size());
  Footprint begin;
  const auto start = std::chrono::steady_clock::now();
  for (std::size_t i = 0; i < count; ++i) {
    const support::Outcome outcome = vantle(writers()[i % writers().size()].words);
    ASSERT_TRUE(outcome.exitedWith(0))
        << "command " << i << ": " << outcome.describe() << outcome.output << outcome.errors;
    if (i == warm) begin = footprintOf(hub.pid());
  }
  RecordProperty("commands", std::to_string(count));
  RecordProperty("rate", rateSince(start, count));
  expectSameFootprint(begin, footprintOf(hub.pid()));
  for (std::size_t i = 0; i < writers().size(); ++i) {
    const std::size_t runs = count / writers().size() + (i < count % writers().size() ? 1 : 0);
    EXPECT_EQ(version(writers()[i]), static_cast<std::int32_t>(runs)) << writers()[i].group;
  }
}

TEST_F(Soak, ManyCommandsAtOnceLoseNothing) {
  // A lane for each that writes, and as many that only measure; each writes its own group.
  const std::size_t rounds = std::max<std::size_t>(commandCount() / (kAtOnce * 4), 2);
  std::vector<std::string> failures(kAtOnce);
  std::vector<std::thread> lanes;
  const Footprint begin = footprintAtRest();
  const auto start = std::chrono::steady_clock::now();
  for (std::size_t lane = 0; lane < kAtOnce; ++lane) {
    lanes.emplace_back([&, lane] {
      const std::vector<std::string>& words =
          lane < writers().size() ? writers()[lane].words : measurements()[lane % measurements().size()];
      for (std::size_t round = 0; round < rounds && failures[lane].empty(); ++round) {
        const support::Outcome outcome = vantle(words);
        if (!outcome.exitedWith(0)) failures[lane] = outcome.describe() + outcome.output + outcome.errors;
      }
    });
  }
  for (std::thread& lane : lanes) lane.join();
  RecordProperty("commands", std::to_string(rounds * kAtOnce));
  RecordProperty("rate", rateSince(start, rounds * kAtOnce));
  for (const std::string& failure : failures) EXPECT_EQ(failure, "");
  expectSameFootprint(begin, footprintAtRest());
  for (const Writer& writer : writers()) {
    EXPECT_EQ(version(writer), static_cast<std::int32_t>(rounds)) << writer.group;
  }
  std::string complaints;
  for (const auto& [name, content] : registryFilesAfterStart(root(), &complaints)) {
    EXPECT_TRUE(itemNames(content).has_value()) << name;
  }
  EXPECT_EQ(complaints, "");
}

}  // namespace
}  // namespace fault
