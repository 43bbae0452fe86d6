#include "fault/FaultChecks.h"

#include <algorithm>
#include <set>
#include <sstream>

#include "ssc/MessageIds.h"

namespace fault {
namespace {

/// Beyond the command's own time on a good hub and its waits for responses, of the hub's time.
constexpr double kPatience_s = 10;

bool contains(const std::string& text, const std::string& part) {
  return text.find(part) != std::string::npos;
}

std::string shown(const Captured& captured) {
  return "\n--- standard output\n" + captured.out + "--- standard error\n" + captured.err;
}

/// The lines that say that something is wrong. Where a request to restart the handset is one, it says what to
/// do about it.
std::set<std::string> complaints(const Captured& captured) {
  std::set<std::string> lines;
  std::istringstream text(captured.out + captured.err);
  for (std::string line; std::getline(text, line);) {
    if (line.starts_with("ERROR: ") || line.starts_with("WARN: ") || line.starts_with("Reboot device")) {
      lines.insert(line);
    }
  }
  return lines;
}

bool explains(const Captured& run, const Captured& good) {
  const std::set<std::string> usual = complaints(good);
  const std::set<std::string> all = complaints(run);
  return std::any_of(all.begin(), all.end(), [&](const auto& line) { return usual.count(line) == 0; });
}

const std::string& toldSensor(const CommandMode& mode) {
  return mode.streamed.empty() ? mode.lookedUp : mode.streamed;
}

Notice noticeIn(const CommandMode& mode, const Traffic& traffic) {
  if (mode.lookedUp.empty()) return Notice::kNone;
  if (traffic.CountRequests(toldSensor(mode), ssc::kCalibrationChangedRequest) > 0) return Notice::kWarning;
  return traffic.CountRequests(mode.lookedUp, ssc::kTestRequest) > 0 ? Notice::kFailure : Notice::kNone;
}

}  // namespace

Problems checkRow(const CommandMode& mode, const WatchedRun& good) {
  Problems problems;
  const auto expect = [&](bool holds, const char* problem) {
    if (!holds) problems.push_back(std::string("the row is wrong: ") + problem + shown(good.captured));
  };
  expect(contains(good.captured.out, mode.begins), "it does not begin as it says");
  if (mode.hasSuccessLine()) {
    expect(contains(good.captured.out, mode.successLine()), "it does not succeed as it says");
  }
  expect(mode.lookedUp.empty() == good.traffic.requests.empty(), "it asks the hub, or does not");
  expect(mode.streamed.empty() == (mode.ending == Ending::kNoSamples), "it measures, or does not");
  expect(mode.streamed.empty() || !good.traffic.readings.empty(),
         "the sensor that is measured is another one");
  expect(mode.notice == noticeIn(mode, good.traffic), "it tells the sensor, or does not");
  return problems;
}

Problems checkOutput(const CommandMode& mode, const Captured& good, const Captured& run,
                     const Expected& expected) {
  Problems problems;
  const std::string printed = run.out + run.err;
  const auto problem = [&](const std::string& text) { problems.push_back(text + shown(run)); };
  if (run.result != expected.result) {
    problem("result " + std::to_string(run.result) + ", should be " + std::to_string(expected.result));
  }
  if (!contains(printed, expected.says)) problem("does not say \"" + expected.says + "\"");
  const bool failed = run.result != 0;
  if (failed && contains(run.out, mode.successLine())) problem("fails, and says that it succeeded");
  if (!failed && mode.hasSuccessLine() && !contains(run.out, mode.successLine()) &&
      expected.success == Success::kClaimed) {
    problem("succeeds, and does not say so");
  }
  if (!failed && !mode.closes.empty() && contains(run.out, mode.closes + " failed")) {
    problem("succeeds, and says that it failed");
  }
  if (failed && expected.reason == Reason::kSaid && !explains(run, good)) problem("fails without saying why");
  if (failed && !mode.begins.empty() && contains(run.out, mode.begins) &&
      !contains(run.out, mode.closes + " failed")) {
    problem("begins, fails, and does not close");
  }
  return problems;
}

Problems checkTime(const Traffic& good, const Traffic& run) {
  const double allowed = good.end - good.waited + run.waited + kPatience_s;
  if (run.end <= allowed) return {};
  return {"takes " + std::to_string(run.end) + " s instead of at most " + std::to_string(allowed) + " s"};
}

namespace {

const std::string* contentOf(const Files& files, const std::string& name) {
  const auto found = files.find(name);
  return found == files.end() ? nullptr : &found->second;
}

bool isSame(const std::string* one, const std::string* other) {
  return one == nullptr || other == nullptr ? one == other : *one == *other;
}

/// What is wrong with one file of the registry, which was `old`, is `now`, and has its good command's `done`.
std::string faultOfGroup(const std::string* old, const std::string* now, const std::string* done,
                         Stored stored) {
  if (isSame(old, now)) return "";
  if (stored == Stored::kNothing) return now == nullptr ? "is gone" : "is written";
  if (now == nullptr) return done == nullptr ? "" : "is gone";
  const auto names = itemNames(*now);
  // An item of another kind that was read is written back as it is: a group of its own.
  if (!names || (done != nullptr && names != itemNames(*done))) return "is not whole:\n" + *now;
  return "";
}

}  // namespace

Problems checkRegistry(const RegistryStates& states, const Files& before, const Files& after, Stored stored) {
  Problems problems;
  std::set<std::string> names;
  for (const Files* files : {&states.ready, &states.done, &before, &after}) {
    for (const auto& entry : *files) names.insert(entry.first);
  }
  for (const std::string& name : names) {
    const std::string* const old = contentOf(before, name);
    const std::string* const now = contentOf(after, name);
    const std::string* const done = contentOf(states.done, name);
    const std::string fault = faultOfGroup(old, now, done, stored);
    if (!fault.empty()) problems.push_back("registry file " + name + " " + fault);
    const bool isChanged = !isSame(contentOf(states.ready, name), done);
    if (stored == Stored::kAll && isChanged && isSame(old, now)) {
      problems.push_back("registry file " + name + " is not stored");
    }
  }
  return problems;
}

Problems checkRecords(const CommandMode& mode, const RecordsRun& run, const std::filesystem::path& before,
                      const std::filesystem::path& after) {
  Problems problems;
  const std::string fault = faultOfWorkingFiles(mode, before, after);
  if (!fault.empty()) problems.push_back(fault);
  if (!run.mayHaveBegun && !holdSameState(before, after)) {
    problems.emplace_back("changes what it finds before it can have begun");
  }
  const bool changes = mode.keepsRecords || mode.dropsRecords;
  if (!run.failed && changes == holdSameRecords(before, after)) {
    problems.emplace_back(changes ? "succeeds without having kept its record" : "touches records of others");
  }
  return problems;
}

}  // namespace fault
