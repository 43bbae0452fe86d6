#include "fault/FaultCell.h"

#include <csignal>
#include <cstring>

#include <unistd.h>

namespace fault {
namespace {

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

void append(const Problems& more, Problems* problems) {
  problems->insert(problems->end(), more.begin(), more.end());
}

}  // namespace

ModeUnderTest::ModeUnderTest(const CommandMode& mode) : mode_(mode) {
  const HangGuard guard(mode_.title());
  const std::string unready = prepareHandset(mode_, ready_.path());
  if (!unready.empty()) goodCell_.problems.push_back(unready);
  copyFolder(ready_.path(), calibrated_.path());
  good_ = run(calibrated_.path(), {});
  registry_ = {registryFiles(ready_.path()), registryFiles(calibrated_.path())};
  goodCell_.result = good_.captured.result;
  append(checkRow(mode_, good_), &goodCell_.problems);
  append(checkOutput(mode_, {}, good_.captured, {}), &goodCell_.problems);
  append(checkRecords(mode_, {}, ready_.path(), calibrated_.path()), &goodCell_.problems);
  if (mode_.storesInRegistry == (registry_.ready == registry_.done)) {
    goodCell_.problems.emplace_back("the row is wrong: it stores, or does not");
  }
}

WatchedRun ModeUnderTest::run(const std::filesystem::path& root,
                              const std::vector<std::string>& overrides) const {
  std::vector<std::string> all = mode_.world;
  all.insert(all.end(), overrides.begin(), overrides.end());
  return runWatched(root, mode_.device, mode_.words, all,
                    mode_.streamed.empty() ? mode_.lookedUp : mode_.streamed);
}

Stored ModeUnderTest::storedBy(int result, const FaultRow& row) const {
  if (result == 0) return mode_.storesInRegistry ? Stored::kAll : Stored::kNothing;
  if (!mode_.storesInRegistry || !row.mayHaveBegun) return Stored::kNothing;
  return mode_.storesOnTheWay ? Stored::kPerhaps : row.stored;
}

std::optional<FaultCell> ModeUnderTest::Try(const FaultRow& row) const {
  if (!mode_.struck.empty() && row.strikes != Strikes::kSensor) return std::nullopt;
  const auto overrides = row.overrides(mode_, good_.traffic);
  if (!overrides) return std::nullopt;
  const HangGuard guard(mode_.title() + " / " + row.name);
  const std::filesystem::path& start = row.onCalibrated ? calibrated_.path() : ready_.path();
  const Files before = row.onCalibrated ? registry_.done : registry_.ready;
  if (row.onCalibrated && before.count(mode_.group) == 0) return std::nullopt;
  const support::TemporaryFolder root;
  copyFolder(start, root.path());

  const WatchedRun faulty = run(root.path(), *overrides);
  const int result = faulty.captured.result;
  FaultCell cell;
  cell.result = result;
  append(checkOutput(mode_, good_.captured, faulty.captured, row.expected(mode_)), &cell.problems);
  append(checkTime(good_.traffic, faulty.traffic), &cell.problems);
  append(checkRegistry(registry_, before, registryFiles(root.path()), storedBy(result, row)), &cell.problems);
  append(checkRecords(mode_, {result != 0, row.mayHaveBegun || result == 0}, start, root.path()),
         &cell.problems);
  // Where nothing has changed the next run is the one on a good hub, which is known.
  if (result != 0 && !holdSameState(start, root.path())) append(checkRecovery(root.path()), &cell.problems);
  return cell;
}

Problems ModeUnderTest::checkRecovery(const std::filesystem::path& root) const {
  const Captured again = run(root, {}).captured;
  if (again.result == 0) return {};
  return {"afterwards, on a good hub, ends with " + std::to_string(again.result) + "\n" + again.out +
          again.err};
}

}  // namespace fault
