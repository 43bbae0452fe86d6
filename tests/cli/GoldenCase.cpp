#include "cli/GoldenCase.h"

#include <filesystem>
#include <sstream>

namespace golden {
namespace {

constexpr const char* kSectionMark = "--- ";

/// A section: its header without the mark, the lines below it as they stand, and where it is.
struct Section {
  std::string header;
  std::string body;
  int line = 0;
};

struct Sections {
  std::string heading;
  std::vector<Section> list;
};

Sections splitSections(const std::string& text) {
  Sections sections;
  std::istringstream lines(text);
  std::string line;
  for (int number = 1; std::getline(lines, line); ++number) {
    if (line.rfind(kSectionMark, 0) == 0) {
      sections.list.push_back({line.substr(4), "", number});
    } else {
      (sections.list.empty() ? sections.heading : sections.list.back().body) += line + "\n";
    }
  }
  return sections;
}

/// A path that stays below the root.
bool isInnerPath(const std::string& text) {
  const std::filesystem::path path(text);
  if (path.empty() || path.is_absolute()) return false;
  for (const auto& part : path) {
    if (part == "..") return false;
  }
  return true;
}

/// Takes `prefix` off the front of `text`; false when it is not there.
bool takePrefix(const std::string& prefix, std::string* text) {
  if (text->rfind(prefix, 0) != 0) return false;
  text->erase(0, prefix.size());
  return true;
}

std::string withoutTrailingNewlines(std::string text) {
  while (!text.empty() && text.back() == '\n') text.pop_back();
  return text;
}

/// Builds a case from its sections, one after the other.
class Parser {
 public:
  std::optional<Case> parse(const Sections& sections, std::string* error) {
    case_.heading = sections.heading;
    if (sections.list.empty()) fail(1, "a case needs at least one \"--- run\"");
    for (const Section& section : sections.list) {
      if (error_.empty()) take(section);
    }
    if (error_.empty()) return case_;
    *error = error_;
    return std::nullopt;
  }

 private:
  void fail(int line, const std::string& what) {
    if (error_.empty()) error_ = "line " + std::to_string(line) + ": " + what;
  }

  void take(const Section& section) {
    if (section.header == "run") return takeRun(section);
    if (case_.runs.empty()) return fail(section.line, "the first section must be \"--- run\"");
    Run& run = case_.runs.back();
    if (section.header == "status") {
      takeOnce(section, &run.hasStatus);
      run.expected.status = withoutTrailingNewlines(section.body);
    } else if (section.header == "stdout") {
      takeOnce(section, &run.hasOutput);
      run.expected.output = decodeText(section.body);
    } else if (section.header == "stderr") {
      takeOnce(section, &run.hasErrors);
      run.expected.errors = decodeText(section.body);
    } else if (section.header == "requests") {
      takeOnce(section, &run.hasRequests);
      run.expected.requests = decodeText(section.body);
    } else if (section.header == "changes") {
      takeOnce(section, &run.hasChanges);
      run.expected.changes = decodeText(section.body);
    } else {
      takeFile(section, &run);
    }
  }

  void takeOnce(const Section& section, bool* seen) {
    if (*seen) fail(section.line, "a run has one section \"" + section.header + "\"");
    *seen = true;
  }

  /// "[given] [hex] file PATH" and "no file PATH".
  void takeFile(const Section& section, Run* run) {
    std::string path = section.header;
    const bool absent = takePrefix("no ", &path);
    const bool given = !absent && takePrefix("given ", &path);
    const bool hex = !absent && takePrefix("hex ", &path);
    if (!takePrefix("file ", &path)) return fail(section.line, "no such section: \"" + section.header + "\"");
    if (!isInnerPath(path)) return fail(section.line, "not a path below the root: \"" + path + "\"");
    if (absent && !section.body.empty())
      return fail(section.line, "a file that must not be there has no content");
    const auto content = hex ? decodeHex(section.body) : decodeText(section.body);
    if (!content) return fail(section.line, "not a hex dump");
    if (given) {
      run->given.emplace_back(path, *content);
    } else if (!run->expected.files.emplace(path, absent ? std::nullopt : content).second) {
      fail(section.line, "a run has one section for the file " + path);
    }
  }

  void takeRun(const Section& section) {
    Run run;
    run.line = section.line;
    run.settings = section.body;
    std::istringstream lines(section.body);
    std::string line;
    for (int number = section.line + 1; std::getline(lines, line); ++number) takeSetting(number, line, &run);
    case_.runs.push_back(std::move(run));
  }

  void takeSetting(int number, const std::string& line, Run* run) {
    std::string value = line;
    if (value.empty() || value.front() == '#') return;
    if (takePrefix("hub:", &value)) {
      run->hub = value.substr(std::min(value.find_first_not_of(' '), value.size()));
    } else if (takePrefix("args:", &value)) {
      const auto words = splitWords(value);
      if (!words) return fail(number, "a quote does not end");
      run->arguments.insert(run->arguments.end(), words->begin(), words->end());
    } else if (takePrefix("env: ", &value)) {
      const std::size_t equals = value.find('=');
      const bool unset = equals == std::string::npos;
      run->environment.emplace_back(
          value.substr(0, equals),
          unset ? std::nullopt : std::optional<std::string>(value.substr(equals + 1)));
    } else if (takePrefix("without: ", &value)) {
      if (!isInnerPath(value)) return fail(number, "not a path below the root: \"" + value + "\"");
      run->without.push_back(value);
    } else {
      fail(number, "not a setting of a run (hub:, args:, env:, without:): \"" + line + "\"");
    }
  }

  Case case_;
  std::string error_;
};

std::string textSection(const std::string& header, const std::string& content) {
  return kSectionMark + header + "\n" + encodeText(content);
}

std::string fileSection(const std::string& prefix, const std::string& path, const std::string& content) {
  const bool binary = isBinary(content);
  return kSectionMark + prefix + (binary ? "hex " : "") + "file " + path + "\n" +
         (binary ? encodeHex(content) : encodeText(content));
}

std::string formatRun(const Run& run) {
  std::string text = std::string(kSectionMark) + "run\n" + run.settings;
  for (const auto& [path, content] : run.given) text += fileSection("given ", path, content);
  if (run.hasStatus) text += std::string(kSectionMark) + "status\n" + run.expected.status + "\n";
  if (run.hasOutput) text += textSection("stdout", run.expected.output);
  if (run.hasErrors) text += textSection("stderr", run.expected.errors);
  if (run.hasRequests) text += textSection("requests", run.expected.requests);
  if (run.hasChanges) text += textSection("changes", run.expected.changes);
  for (const auto& [path, content] : run.expected.files) {
    text += content ? fileSection("", path, *content) : std::string(kSectionMark) + "no file " + path + "\n";
  }
  return text;
}

}  // namespace

std::optional<Case> parseCase(const std::string& text, std::string* error) {
  return Parser().parse(splitSections(text), error);
}

std::string formatCase(const Case& golden) {
  std::string text = golden.heading;
  for (const Run& run : golden.runs) text += formatRun(run);
  return text;
}

bool isComplete(const Case& golden, std::string* error) {
  for (const Run& run : golden.runs) {
    const char* missing = !run.hasStatus   ? "status"
                          : !run.hasOutput ? "stdout"
                          : !run.hasErrors ? "stderr"
                                           : nullptr;
    if (missing == nullptr) continue;
    *error = "line " + std::to_string(run.line) + ": the run has no section \"" + missing +
             "\" (an empty section says that it must be empty)";
    return false;
  }
  return true;
}

}  // namespace golden
