#include "cli/GoldenRunner.h"

#include <system_error>
#include <utility>

#include "cli/GoldenDiff.h"
#include "support/Process.h"

namespace golden {
namespace {

namespace fs = std::filesystem;

constexpr const char* kRootName = "$ROOT";
constexpr const char* kLogFile = "data/app-ephemeral/vantle.log";
constexpr const char* kRequestLogKey = "hub.request_log=";

void replaceAll(const std::string& from, const std::string& to, std::string* text) {
  for (std::size_t at = text->find(from); at != std::string::npos; at = text->find(from, at + to.size())) {
    text->replace(at, from.size(), to);
  }
}

/// The length of a time stamp "2024-02-30 12:34:56.789Z " at the front of a log line; 0 when there is none.
std::size_t stampLength(const std::string& line) {
  static const std::string pattern = "0000-00-00 00:00:00.000Z ";
  if (line.size() < pattern.size()) return 0;
  for (std::size_t i = 0; i < pattern.size(); ++i) {
    const bool digit = line[i] >= '0' && line[i] <= '9';
    if (pattern[i] == '0' ? !digit : line[i] != pattern[i]) return 0;
  }
  return pattern.size();
}

std::string withoutStamps(const std::string& log) {
  std::string result;
  for (std::size_t at = 0; at < log.size();) {
    const std::size_t end = log.find('\n', at);
    const std::size_t length = (end == std::string::npos ? log.size() : end + 1) - at;
    const std::string line = log.substr(at, length);
    result += line.substr(stampLength(line));
    at += length;
  }
  return result;
}

/// The status as a case states it: the values that mean a negative result with their sign.
std::string statusOf(const support::Outcome& outcome) {
  if (outcome.end != support::Outcome::End::kExited) return outcome.describe();
  return std::to_string(outcome.status > 127 ? outcome.status - 256 : outcome.status);
}

/// Sets or unsets a variable in a list of them.
void setVariable(const std::string& name, const std::optional<std::string>& value,
                 support::Command* command) {
  std::erase_if(command->environment, [&](const auto& variable) { return variable.first == name; });
  if (value) command->environment.emplace_back(name, *value);
}

std::string changesBetween(const Files& before, const Files& after) {
  std::string text;
  for (const auto& [path, content] : before) {
    const auto now = after.find(path);
    if (now == after.end()) {
      text += "gone " + path + "\n";
    } else if (now->second != content) {
      text += "changed " + path + "\n";
    }
  }
  for (const auto& [path, content] : after) {
    if (!before.contains(path)) text += "new " + path + "\n";
  }
  return text;
}

/// An access that a case wants to see refused must be refused to whoever runs the tests, so folders are
/// removed rather than made unreadable.
void removeBelow(const fs::path& root, const std::string& path) {
  std::error_code ignored;
  fs::remove_all(root / path, ignored);
}

}  // namespace

Runner::Runner(std::filesystem::path program)
    : program_(std::move(program)), root_(folder_.path() / "root"), requestLog_(folder_.path() / "requests") {
  support::makeDeviceFolders(root_);
}

std::string Runner::withRoot(std::string text) const {
  replaceAll(kRootName, root_.string(), &text);
  return text;
}

std::string Runner::withoutRoot(std::string text) const {
  replaceAll(root_.string(), kRootName, &text);
  return text;
}

void Runner::prepare(const Run& run) const {
  for (const std::string& path : run.without) removeBelow(root_, path);
  for (const auto& [path, content] : run.given) {
    if (!support::writeFile(root_ / path, content)) std::fprintf(stderr, "cannot write %s\n", path.c_str());
  }
  removeBelow(folder_.path(), requestLog_.filename().string());
}

Files Runner::snapshot() const {
  Files files;
  std::error_code error;
  for (fs::recursive_directory_iterator at(root_, error), end; !error && at != end; at.increment(error)) {
    if (auto content = support::readFile(at->path())) {
      files.emplace(at->path().lexically_relative(root_).string(), std::move(*content));
    }
  }
  return files;
}

std::string Runner::normalised(const std::string& path, const std::string& content) const {
  return withoutRoot(path == kLogFile ? withoutStamps(content) : content);
}

Result Runner::run(const Run& run) {
  prepare(run);
  support::Command command{program_.string(), "vantle", {}, {}, "", root_.string()};
  command.environment = support::sanitizerEnvironment();
  setVariable("PATH", "/usr/bin:/bin", &command);
  setVariable("HOME", (root_ / "home").string(), &command);
  setVariable("LC_ALL", "C", &command);
  setVariable("TZ", "UTC", &command);
  setVariable("VANTLE_ROOT", root_.string(), &command);
  if (run.hub) {
    std::string hub = withRoot(*run.hub);
    if (run.hasRequests) {
      hub += (hub.find('?') == std::string::npos ? '?' : '&') + (kRequestLogKey + requestLog_.string());
    }
    setVariable("VANTLE_HUB", hub, &command);
  }
  for (const auto& [name, value] : run.environment) {
    setVariable(name, value ? std::optional(withRoot(*value)) : std::nullopt, &command);
  }
  for (const std::string& word : run.arguments) command.arguments.push_back(withRoot(word));

  Files before = snapshot();
  const support::Outcome outcome = support::run(command, kRunDeadline);
  Files after = snapshot();

  Result result;
  result.status = statusOf(outcome);
  result.output = withoutRoot(outcome.output);
  result.errors = withoutRoot(outcome.errors);
  if (run.hasRequests) {
    result.requests =
        withoutRoot(support::readFile(requestLog_).value_or("(the hub wrote no request log)\n"));
  }
  for (const auto& [path, expected] : run.expected.files) {
    const auto found = after.find(path);
    result.files[path] = found == after.end() ? std::nullopt : std::optional(normalised(path, found->second));
  }
  // Every run adds to the log file; that is no news.
  before.erase(kLogFile);
  after.erase(kLogFile);
  result.changes = changesBetween(before, after);
  return result;
}

std::string checkCase(const std::filesystem::path& program, bool update, Case* golden) {
  std::string incomplete;
  if (!isComplete(*golden, &incomplete) && !update) return incomplete;
  std::string text = incomplete;
  Runner runner(program);
  for (std::size_t i = 0; i < golden->runs.size(); ++i) {
    Run& run = golden->runs[i];
    const Result actual = runner.run(run);
    const std::string difference = compareRun(run, actual);
    if (!difference.empty()) {
      text +=
          "run " + std::to_string(i + 1) + " (line " + std::to_string(run.line) + ") differs\n" + difference;
    }
    if (update) updateRun(actual, &run);
  }
  return text;
}

}  // namespace golden
