#include "simhub/Scenario.h"

#include <cerrno>
#include <cstring>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include "simhub/EmbeddedScenarios.h"
#include "simhub/ScenarioReader.h"
#include "simhub/Toml.h"

namespace simhub {
namespace {

constexpr std::string_view kCommon = "common";  // what the built-in ones extend; not a handset by itself
constexpr std::size_t kMaxFileBytes = std::size_t{4} << 20;
constexpr int kMaxExtends = 8;

const EmbeddedScenario* findEmbedded(std::string_view name) {
  for (const EmbeddedScenario& scenario : embeddedScenarios()) {
    if (scenario.name == name) return &scenario;
  }
  return nullptr;
}

std::string builtInList() {
  std::string list;
  for (const std::string& name : builtInScenarios()) list += (list.empty() ? "" : ", ") + name;
  return list;
}

bool readFile(const std::string& path, std::string* text, std::string* error) {
  const int fd = ::open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK);  // not held up by a named pipe
  if (fd < 0) {
    *error = std::strerror(errno);
    return false;
  }
  struct stat status {};
  const bool isFile = ::fstat(fd, &status) == 0 && S_ISREG(status.st_mode);
  if (!isFile) *error = "is no file";
  bool ok = isFile;
  char buffer[4096];
  while (ok) {
    const ssize_t got = ::read(fd, buffer, sizeof buffer);
    if (got == 0) break;
    if (got < 0 && errno == EINTR) continue;
    ok = got > 0 && text->size() + static_cast<std::size_t>(got) <= kMaxFileBytes;
    if (ok) text->append(buffer, static_cast<std::size_t>(got));
    if (!ok) *error = got < 0 ? std::strerror(errno) : "is too large for a scenario";
  }
  (void)::close(fd);
  return ok;
}

bool parseWithBase(const std::string& text, const std::string& source, int depth, toml::table* table,
                   Problems* problems);

/// Loads what a name or a file name stands for. `folder` (with a slash, or empty) is where relative names
/// start.
bool loadTable(const std::string& nameOrFile, const std::string& folder, int depth, toml::table* table,
               Problems* problems) {
  if (const EmbeddedScenario* const embedded = findEmbedded(nameOrFile)) {
    return parseWithBase(std::string(embedded->text), nameOrFile + ".toml", depth, table, problems);
  }
  const std::string path = nameOrFile.rfind('/', 0) == 0 ? nameOrFile : folder + nameOrFile;
  std::string text;
  std::string error;
  if (!readFile(path, &text, &error)) {
    problems->AddText("scenario \"" + nameOrFile + "\": neither built in (" + builtInList() +
                      ") nor a file that can be read: " + error);
    return false;
  }
  return parseWithBase(text, path, depth, table, problems);
}

bool parseWithBase(const std::string& text, const std::string& source, int depth, toml::table* table,
                   Problems* problems) {
  toml::table own;
  if (!parseToml(text, source, &own, problems)) return false;
  problems->SetSource(source);
  std::string base;
  TableReader reader(own, "", *problems);
  if (!reader.Text("extends", &base)) {
    *table = std::move(own);
    return problems->None();
  }
  if (depth >= kMaxExtends) {
    reader.Problem("extends", "too many scenarios extend each other");
    return false;
  }
  const std::size_t slash = source.rfind('/');
  const std::string folder = slash == std::string::npos ? "" : source.substr(0, slash + 1);
  if (!loadTable(base, folder, depth + 1, table, problems)) return false;
  own.erase("extends");
  mergeTables(*table, std::move(own));
  problems->SetSource(source);
  return true;
}

bool finish(toml::table table, const std::string& name, const std::vector<std::string>& overrides,
            Scenario* scenario, Problems* problems) {
  for (const std::string& text : overrides) {
    toml::table change;
    if (parseOverride(text, &change, problems)) mergeTables(table, std::move(change));
  }
  *scenario = Scenario{};
  scenario->name = name;
  if (problems->None()) readScenario(table, scenario, *problems);
  return problems->None();
}

}  // namespace

std::vector<std::string> builtInScenarios() {
  std::vector<std::string> names;
  for (const EmbeddedScenario& scenario : embeddedScenarios()) {
    if (scenario.name != kCommon) names.emplace_back(scenario.name);
  }
  return names;
}

bool loadScenario(const std::string& nameOrFile, const std::vector<std::string>& overrides,
                  Scenario* scenario, std::string* error) {
  const std::string name = nameOrFile.empty() ? kDefaultScenario : nameOrFile;
  Problems problems;
  toml::table table;
  const bool ok = loadTable(name, "", 0, &table, &problems) &&
                  finish(std::move(table), name, overrides, scenario, &problems);
  if (!ok) *error = problems.Text();
  return ok;
}

bool parseScenario(const std::string& text, const std::string& source,
                   const std::vector<std::string>& overrides, Scenario* scenario, std::string* error) {
  Problems problems;
  toml::table table;
  const bool ok = parseWithBase(text, source, 0, &table, &problems) &&
                  finish(std::move(table), source, overrides, scenario, &problems);
  if (!ok) *error = problems.Text();
  return ok;
}

}  // namespace simhub
