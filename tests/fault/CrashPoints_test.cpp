// Every command that changes files, killed at each of its system calls that does, or with that call failing:
// what is on the disk afterwards is whole, and the command can be repeated.
#include <array>
#include <map>

#include <gtest/gtest.h>

#include "fault/CommandModes.h"
#include "fault/FileFaults.h"
#include "fault/HandsetFiles.h"
#include "fault/ReliabilityPage.h"
#include "fault/WatchedRun.h"
#include "ssc/MessageIds.h"
#include "support/Process.h"
#include "support/TemporaryFolder.h"

namespace fault {
namespace {

/// A record of what happened, which nobody reads back: a command does not depend on it.
constexpr const char* kLog = "data/app-ephemeral/vantle.log";

#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
/// Programs start slowly with a sanitizer: every so manieth point has to do.
constexpr std::size_t kStride = 5;
#else
constexpr std::size_t kStride = 1;
#endif

struct FaultKind {
  FileFault fault;
  const char* name;
};
constexpr std::array<FaultKind, 4> kKinds{{{FileFault::kKill, "killed"},
                                           {FileFault::kNoSpace, "disk full from there on"},
                                           {FileFault::kIoError, "input/output error"},
                                           {FileFault::kShortWrite, "half written"}}};

/// How many points were tried with each kind.
using Points = std::array<std::size_t, kKinds.size()>;

/// A command that is about to change files, again and again.
class CrashingCommand {
 public:
  explicit CrashingCommand(const CommandMode& mode) : mode_(mode) {
    EXPECT_EQ(prepareHandset(mode_, ready_.path()), "");
    before_ = registryFiles(ready_.path());
    copyFolder(ready_.path(), done_.path());
    const WatchedRun good = runWatched(done_.path(), mode_.device, mode_.words, mode_.world, mode_.lookedUp);
    EXPECT_EQ(good.captured.result, 0) << good.captured.err;
    writesOnce_ = good.traffic.CountRequests(ssc::kRegistryDataType, ssc::kRegistryWriteRequest) <= 1;
    after_ = registryFiles(done_.path());
  }

  /// Tries all points of one kind; how many there were. Nothing when programs cannot be traced here.
  std::optional<std::size_t> TryAll(const FaultKind& kind) {
    for (std::size_t at = 0;; at += kStride) {
      const support::TemporaryFolder root;
      copyFolder(ready_.path(), root.path());
      const auto run =
          runWithFileFault(commandLine(), environment(root.path()), root.path(), {kLog}, {kind.fault, at});
      if (!run) return std::nullopt;
      const std::string where = at < run->calls.size() ? run->calls[at].name + " " + run->calls[at].path : "";
      SCOPED_TRACE(mode_.title() + ", " + kind.name + " at call " + std::to_string(at) + ": " + where);
      check(*run, root.path());
      // Where it does not end where it was struck, nothing is left to strike.
      if (at >= run->calls.size()) return run->calls.size();
    }
  }

 private:
  [[nodiscard]] std::vector<std::string> commandLine() const {
    std::vector<std::string> words{VANTLE_PROGRAM, "--device", mode_.device};
    words.insert(words.end(), mode_.words.begin(), mode_.words.end());
    return words;
  }

  [[nodiscard]] std::vector<std::pair<std::string, std::string>> environment(
      const std::filesystem::path& root) const {
    std::string hub = "sim:" + mode_.device + "?";
    for (const std::string& text : mode_.world) hub += text + "&";
    auto variables = support::sanitizerEnvironment();
    // The leak sanitizer cannot look at a program that is traced.
    variables.emplace_back("LSAN_OPTIONS", "detect_leaks=0");
    std::string asan = "detect_leaks=0";
    for (auto& [name, value] : variables) {
      if (name == "ASAN_OPTIONS") asan = value + ":" + asan;
    }
    std::erase_if(variables, [](const auto& each) { return each.first == "ASAN_OPTIONS"; });
    variables.emplace_back("ASAN_OPTIONS", asan);
    variables.emplace_back("VANTLE_HUB", hub);
    variables.emplace_back("VANTLE_ROOT", root.string());
    return variables;
  }

  void check(const FaultedRun& run, const std::filesystem::path& root) const {
    EXPECT_FALSE(run.crashed) << "signal " << run.status << "\n" << run.output;
    if (!run.killed && run.status != 0) {
      EXPECT_EQ(run.output.find(mode_.successLine()), std::string::npos) << run.output;
      EXPECT_TRUE(run.output.find("ERROR: ") != std::string::npos ||
                  run.output.find("WARN: ") != std::string::npos)
          << run.output;
    }
    checkRegistry(run, root);
    if (!run.killed && run.status == 0 && !hasUndeleted(run)) {
      EXPECT_TRUE(holdSameRecords(done_.path(), root)) << "it says that it kept its record\n" << run.output;
    }
    EXPECT_EQ(faultOfWorkingFiles(mode_, ready_.path(), root), "");
    checkAgain(root);
  }

  /// Whether it says that something is left that should not be.
  [[nodiscard]] bool hasUndeleted(const FaultedRun& run) const {
    return mode_.bearsUndeleted && (run.output.find("WARN: Unable to delete") != std::string::npos ||
                                    run.output.find("WARN: Unable to remove") != std::string::npos);
  }

  void checkRegistry(const FaultedRun& run, const std::filesystem::path& root) const {
    std::string complaints;
    const Files now = registryFilesAfterStart(root, &complaints);
    EXPECT_EQ(complaints, "");
    if (!run.killed && run.status == 0 && !hasUndeleted(run)) {
      EXPECT_EQ(now, after_) << "it says that it stored\n" << run.output;
    } else if (writesOnce_ && !mode_.bearsUndeleted) {
      EXPECT_TRUE(now == before_ || now == after_) << "one write is stored in part\n" << run.output;
    }
    for (const auto& [name, content] : now) {
      const auto good = after_.find(name);
      EXPECT_TRUE(good != after_.end() || before_.count(name) != 0) << name << " is left over";
      EXPECT_TRUE(itemNames(content).has_value()) << name << " is no group:\n" << content;
      if (good == after_.end()) continue;
      EXPECT_EQ(itemNames(content), itemNames(good->second)) << name;
    }
  }

  /// The next run has to succeed. What was deleted already cannot be deleted again.
  void checkAgain(const std::filesystem::path& root) const {
    // Where nothing has changed yet it is the good run, which is known.
    if (holdSameState(ready_.path(), root)) return;
    if (mode_.deletesOnce && holdSameState(done_.path(), root)) return;
    const WatchedRun again = runWatched(root, mode_.device, mode_.words, mode_.world, mode_.lookedUp);
    EXPECT_EQ(again.captured.result, 0) << again.captured.out << again.captured.err;
  }

  const CommandMode& mode_;
  support::TemporaryFolder ready_;
  support::TemporaryFolder done_;
  Files before_;
  Files after_;
  bool writesOnce_ = true;
};

/// The points of a mode. They are tried once, by whichever test asks first.
const std::optional<Points>& pointsOf(std::size_t modeIndex) {
  static std::map<std::size_t, std::optional<Points>> known;
  const auto found = known.find(modeIndex);
  if (found != known.end()) return found->second;
  std::optional<Points>& points = known[modeIndex];
  CrashingCommand command(commandModes()[modeIndex]);
  Points tried{};
  for (std::size_t i = 0; i < kKinds.size(); ++i) {
    const auto count = command.TryAll(kKinds[i]);
    if (!count) return points;
    tried[i] = *count;
  }
  points = tried;
  return points;
}

std::vector<std::size_t> modesThatChangeFiles() {
  std::vector<std::size_t> indices;
  for (std::size_t i = 0; i < commandModes().size(); ++i) {
    const CommandMode& mode = commandModes()[i];
    if (mode.changesFiles() && mode.struck.empty()) indices.push_back(i);
  }
  return indices;
}

class CrashPoints : public testing::TestWithParam<std::size_t> {};

TEST_P(CrashPoints, LeaveWholeFilesAndACommandThatCanBeRepeated) {
  const auto& points = pointsOf(GetParam());
  if (!points) GTEST_SKIP() << "programs cannot be traced here";
  EXPECT_GE(points->front(), 1U) << "a command that changes no file at all";
}

std::string testName(const testing::TestParamInfo<std::size_t>& mode) {
  return testNameOf(commandModes()[mode.param].title());
}

INSTANTIATE_TEST_SUITE_P(Commands, CrashPoints, testing::ValuesIn(modesThatChangeFiles()), testName);

TEST(CrashPointsPage, ShowsHowManyThereAre) {
  if (kStride > 1) GTEST_SKIP() << "with a sanitizer not all are tried";
  std::string table = "| |";
  std::string rule = "|---|";
  for (const FaultKind& kind : kKinds) {
    table += std::string(" ") + kind.name + " |";
    rule += "---:|";
  }
  table += "\n" + rule + "\n";
  Points sum{};
  std::size_t all = 0;
  const auto addRow = [&](const std::string& title, const Points& points) {
    table += "| " + title + " |";
    for (const std::size_t count : points) table += " " + std::to_string(count) + " |";
    table += "\n";
  };
  for (const std::size_t mode : modesThatChangeFiles()) {
    const auto& points = pointsOf(mode);
    if (!points) GTEST_SKIP() << "programs cannot be traced here";
    for (std::size_t i = 0; i < points->size(); ++i) sum[i] += (*points)[i];
    addRow(commandModes()[mode].title(), *points);
  }
  for (const std::size_t count : sum) all += count;
  addRow("in all", sum);
  EXPECT_EQ(checkSection(VANTLE_RELIABILITY_PAGE, "crash points",
                         std::to_string(all) + " points were tried.\n\n" + table),
            "");
}

}  // namespace
}  // namespace fault
