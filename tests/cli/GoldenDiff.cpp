#include "cli/GoldenDiff.h"

#include <algorithm>
#include <charconv>
#include <cstddef>
#include <cstdint>
#include <sstream>
#include <vector>

namespace golden {
namespace {

constexpr std::size_t kContextLines = 3;
/// Above this many line pairs a difference is shown without looking for lines in common.
constexpr std::size_t kLargestTable = 4'000'000;
constexpr std::int64_t kStatusValues = 256;

/// One line of a difference: ' ' in both, '-' expected only, '+' actual only.
struct Edit {
  char mark;
  std::string line;
};

std::vector<std::string> linesOf(const std::string& content) {
  std::vector<std::string> lines;
  std::istringstream stream(encodeText(content));
  for (std::string line; std::getline(stream, line);) lines.push_back(line);
  return lines;
}

/// The longest common subsequence's length for every pair of tails.
class CommonLengths {
 public:
  CommonLengths(const std::vector<std::string>& a, const std::vector<std::string>& b)
      : width_(b.size() + 1), lengths_((a.size() + 1) * width_) {
    for (std::size_t i = a.size(); i-- > 0;) {
      for (std::size_t j = b.size(); j-- > 0;) {
        lengths_[i * width_ + j] = a[i] == b[j] ? at(i + 1, j + 1) + 1 : std::max(at(i + 1, j), at(i, j + 1));
      }
    }
  }
  [[nodiscard]] std::uint32_t at(std::size_t i, std::size_t j) const { return lengths_[i * width_ + j]; }

 private:
  std::size_t width_;
  std::vector<std::uint32_t> lengths_;
};

std::vector<Edit> editsBetween(const std::vector<std::string>& a, const std::vector<std::string>& b) {
  std::vector<Edit> edits;
  std::size_t i = 0;
  std::size_t j = 0;
  if (a.size() * b.size() <= kLargestTable) {
    const CommonLengths common(a, b);
    while (i < a.size() && j < b.size()) {
      if (a[i] == b[j]) {
        edits.push_back({' ', a[i++]});
        ++j;
      } else if (common.at(i + 1, j) >= common.at(i, j + 1)) {
        edits.push_back({'-', a[i++]});
      } else {
        edits.push_back({'+', b[j++]});
      }
    }
  }
  while (i < a.size()) edits.push_back({'-', a[i++]});
  while (j < b.size()) edits.push_back({'+', b[j++]});
  return edits;
}

std::optional<std::int64_t> asNumber(const std::string& text) {
  std::int64_t value = 0;
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), value);
  if (error != std::errc() || end != text.data() + text.size()) return std::nullopt;
  return value;
}

std::string underName(const std::string& section, const std::string& difference) {
  return difference.empty() ? "" : "in " + section + " (- expected, + actual):\n" + difference;
}

std::string compareFile(const std::string& path, const std::optional<std::string>& expected,
                        const std::optional<std::string>& actual) {
  const std::string section = "file " + path;
  if (!expected) return actual ? "in no " + section + ":\n  the file is there\n" : "";
  if (!actual) return "in " + section + ":\n  there is no such file\n";
  if (*expected == *actual) return "";
  if (isBinary(*expected) || isBinary(*actual)) {
    return underName(section, differenceOf(encodeHex(*expected), encodeHex(*actual)));
  }
  return underName(section, differenceOf(*expected, *actual));
}

}  // namespace

std::string differenceOf(const std::string& expected, const std::string& actual) {
  if (expected == actual) return "";
  const std::vector<Edit> edits = editsBetween(linesOf(expected), linesOf(actual));
  std::vector<bool> shown(edits.size(), false);
  for (std::size_t i = 0; i < edits.size(); ++i) {
    if (edits[i].mark == ' ') continue;
    const std::size_t begin = i - std::min(i, kContextLines);
    const std::size_t end = std::min(i + kContextLines + 1, edits.size());
    std::fill(shown.begin() + static_cast<std::ptrdiff_t>(begin),
              shown.begin() + static_cast<std::ptrdiff_t>(end), true);
  }
  std::string text;
  for (std::size_t i = 0; i < edits.size(); ++i) {
    if (shown[i]) {
      text += std::string("  ") + edits[i].mark + edits[i].line + "\n";
    } else if (i == 0 || shown[i - 1]) {
      text += "  ...\n";
    }
  }
  return text;
}

bool sameStatus(const std::string& expected, const std::string& actual) {
  const auto a = asNumber(expected);
  const auto b = asNumber(actual);
  if (!a || !b) return expected == actual;
  return (*a - *b) % kStatusValues == 0;
}

std::string compareRun(const Run& run, const Result& actual) {
  std::string text;
  if (!sameStatus(run.expected.status, actual.status)) {
    text += underName("status", "  -" + run.expected.status + "\n  +" + actual.status + "\n");
  }
  text += underName("stdout", differenceOf(run.expected.output, actual.output));
  text += underName("stderr", differenceOf(run.expected.errors, actual.errors));
  if (run.hasRequests) text += underName("requests", differenceOf(run.expected.requests, actual.requests));
  if (run.hasChanges) text += underName("changes", differenceOf(run.expected.changes, actual.changes));
  for (const auto& [path, content] : run.expected.files) {
    const auto found = actual.files.find(path);
    text += compareFile(path, content, found == actual.files.end() ? std::nullopt : found->second);
  }
  return text;
}

void updateRun(const Result& actual, Run* run) {
  Result& expected = run->expected;
  if (!run->hasStatus || !sameStatus(expected.status, actual.status)) expected.status = actual.status;
  expected.output = actual.output;
  expected.errors = actual.errors;
  run->hasStatus = run->hasOutput = run->hasErrors = true;
  if (run->hasRequests) expected.requests = actual.requests;
  if (run->hasChanges) expected.changes = actual.changes;
  for (auto& [path, content] : expected.files) {
    const auto found = actual.files.find(path);
    content = found == actual.files.end() ? std::nullopt : found->second;
  }
}

}  // namespace golden
