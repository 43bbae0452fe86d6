#include "fault/FaultCell.h"

#include <csignal>
#include <cstring>

#include <unistd.h>

#include "fault/HandsetFiles.h"

namespace fault {
namespace {

/// Beyond the command's own time on a good hub and its waits for responses, of the hub's time.
constexpr double kPatience_s = 10;
/// Real time after which a cell counts as hung. A cell takes milliseconds, some tens of them with a
/// sanitizer.
constexpr unsigned kHang_s = 60;

char runningCell[256];

void reportHang(int) {
  for (const char* text : {"hangs: ", static_cast<const char*>(runningCell), "\n"}) {
    if (::write(STDERR_FILENO, text, std::strlen(text)) < 0) break;
  }
  ::_exit(1);
}

/// Ends the test program when a command hangs, and says which. As long as the object lives.
class HangGuard {
 public:
  explicit HangGuard(const std::string& cell) {
    (void)::strncpy(runningCell, cell.c_str(), sizeof(runningCell) - 1);
    (void)std::signal(SIGALRM, reportHang);
    ::alarm(kHang_s);
  }
  HangGuard(const HangGuard&) = delete;
  HangGuard& operator=(const HangGuard&) = delete;
  ~HangGuard() { ::alarm(0); }
};

bool contains(const std::string& text, const std::string& part) {
  return text.find(part) != std::string::npos;
}

std::string shown(const Captured& captured) {
  return "\n--- standard output\n" + captured.out + "--- standard error\n" + captured.err;
}

}  // namespace

ModeUnderTest::ModeUnderTest(const CommandMode& mode) : mode_(mode) {
  const HangGuard guard(mode_.title());
  const std::string unready = prepareHandset(mode_, ready_.path());
  if (!unready.empty()) good_.problems.push_back(unready);
  copyFolder(ready_.path(), calibrated_.path());
  const WatchedRun whole = run(calibrated_.path(), {});
  traffic_ = whole.traffic;
  good_.result = whole.captured.result;
  checkOutput(whole, {}, &good_);
  if (!mode_.streamed.empty() && traffic_.readings.empty()) {
    good_.problems.push_back("the sensor named as the one that is measured is not the one");
  }
  const bool stored = registryFiles(ready_.path()) != registryFiles(calibrated_.path());
  if (stored != mode_.storesInRegistry)
    good_.problems.emplace_back("stores, or does not, unlike its row says");
}

WatchedRun ModeUnderTest::run(const std::filesystem::path& root,
                              const std::vector<std::string>& overrides) const {
  std::vector<std::string> all = mode_.world;
  all.insert(all.end(), overrides.begin(), overrides.end());
  return runWatched(root, mode_.device, mode_.words, all,
                    mode_.streamed.empty() ? mode_.lookedUp : mode_.streamed);
}

std::optional<FaultCell> ModeUnderTest::Try(const FaultRow& row) const {
  const auto overrides = row.overrides(mode_, traffic_);
  if (!overrides) return std::nullopt;
  const HangGuard guard(mode_.title() + " / " + row.name);
  const std::filesystem::path& start = row.onCalibrated ? calibrated_.path() : ready_.path();
  const Files before = registryFiles(start);
  if (row.onCalibrated && before.count(mode_.group) == 0) return std::nullopt;
  const support::TemporaryFolder root;
  copyFolder(start, root.path());

  const WatchedRun faulty = run(root.path(), *overrides);
  FaultCell cell;
  cell.result = faulty.captured.result;
  checkOutput(faulty, row.expected(mode_), &cell);
  checkTime(faulty, &cell);
  checkRegistry(before, registryFiles(root.path()), cell.result == 0 ? Stored::kPerhaps : row.stored, &cell);
  const std::string lost = faultOfWorkingFiles(mode_, start, root.path());
  if (!lost.empty()) cell.problems.push_back(lost);
  // Where nothing has changed the next run is the one on a good hub, which is known.
  if (cell.result != 0 && !holdSameState(start, root.path())) checkRecovery(root.path(), &cell);
  return cell;
}

void ModeUnderTest::checkOutput(const WatchedRun& run, const Expected& expected, FaultCell* cell) const {
  const Captured& captured = run.captured;
  const std::string printed = captured.out + captured.err;
  const auto problem = [&](const std::string& text) { cell->problems.push_back(text + shown(captured)); };
  if (captured.result != expected.result) {
    problem("result " + std::to_string(captured.result) + ", should be " + std::to_string(expected.result));
  }
  if (!contains(printed, expected.says)) problem("does not say \"" + expected.says + "\"");
  const bool failed = captured.result != 0;
  if (failed && contains(captured.out, mode_.successLine())) problem("fails, and says that it succeeded");
  if (!failed && contains(printed, "failed.")) problem("succeeds, and says that it failed");
  // A request to restart the handset says what to do about it.
  const bool said = contains(captured.err, "ERROR: ") || contains(captured.out, "WARN: ") ||
                    contains(captured.out, "Reboot device");
  if (failed && !said && expected.reason == Reason::kSaid) {
    problem("fails without saying why");
  }
  if (failed && !mode_.begins.empty() && contains(captured.out, mode_.begins) &&
      !contains(captured.out, mode_.closes + " failed")) {
    problem("begins, fails, and does not close");
  }
}

void ModeUnderTest::checkTime(const WatchedRun& run, FaultCell* cell) const {
  const double allowed = traffic_.end - traffic_.waited + run.traffic.waited + kPatience_s;
  if (run.traffic.end <= allowed) return;
  cell->problems.push_back("takes " + std::to_string(run.traffic.end) + " s instead of at most " +
                           std::to_string(allowed) + " s" + shown(run.captured));
}

void ModeUnderTest::checkRegistry(const Files& before, const Files& after, Stored stored,
                                  FaultCell* cell) const {
  for (const auto& [name, content] : before) {
    if (after.count(name) == 0 && stored == Stored::kNothing) {
      cell->problems.push_back("registry file " + name + " is gone");
    }
  }
  const Files whole = registryFiles(calibrated_.path());
  for (const auto& [name, content] : after) {
    const auto old = before.find(name);
    if (old != before.end() && old->second == content) continue;
    if (stored == Stored::kNothing) {
      cell->problems.push_back("writes registry file " + name);
      continue;
    }
    const auto good = whole.find(name);
    const auto names = itemNames(content);
    // An item of another kind that was read is written back as it is: a group of its own.
    if (!names || (good != whole.end() && names != itemNames(good->second))) {
      cell->problems.push_back("registry file " + name + " is not whole:\n" + content);
    }
  }
}

void ModeUnderTest::checkRecovery(const std::filesystem::path& root, FaultCell* cell) const {
  const WatchedRun again = run(root, {});
  if (again.captured.result == 0) return;
  cell->problems.push_back("afterwards, on a good hub, ends with " + std::to_string(again.captured.result) +
                           shown(again.captured));
}

}  // namespace fault
