#include "fault/ReliabilityPage.h"

#include <algorithm>
#include <cstdlib>

#include "support/TemporaryFolder.h"

namespace fault {
namespace {

constexpr const char* kNotPossible = "·";

std::string cellText(const std::optional<FaultCell>& cell) {
  if (!cell) return kNotPossible;
  return cell->result < 0 ? "−" + std::to_string(-static_cast<long long>(cell->result))
                          : std::to_string(cell->result);
}

/// The modes of one table, by their index: those of one command, or those with another sensor struck.
using Columns = std::vector<std::size_t>;

std::vector<Columns> columnsByFamily() {
  std::vector<Columns> families;
  const auto& modes = commandModes();
  for (std::size_t i = 0; i < modes.size(); ++i) {
    if (i == 0 || modes[i].family != modes[i - 1].family ||
        modes[i].struck.empty() != modes[i - 1].struck.empty()) {
      families.emplace_back();
    }
    families.back().push_back(i);
  }
  return families;
}

std::string tableOf(const Columns& columns, const std::vector<ModeResults>& modes) {
  std::string head = "| |";
  std::string rule = "|---|";
  for (const std::size_t column : columns) {
    const CommandMode& mode = commandModes()[column];
    head += " " + mode.name + (mode.struck.empty() ? "" : ": " + mode.struck) + " |";
    rule += "---:|";
  }
  const CommandMode& first = commandModes()[columns.front()];
  std::string table = "### " + first.family + (first.struck.empty() ? "" : ": another sensor is struck") +
                      "\n\n" + head + "\n" + rule + "\n";
  std::string family;
  for (std::size_t row = 0; row < faultRows().size(); ++row) {
    const bool possible = std::any_of(columns.begin(), columns.end(), [&](std::size_t column) {
      return modes[column].cells[row].has_value();
    });
    if (!possible) continue;
    if (faultRows()[row].family != family) {
      family = faultRows()[row].family;
      table += "| **" + family + "** |" + std::string(columns.size(), '|') + "\n";
    }
    table += "| " + faultRows()[row].name + " |";
    for (const std::size_t column : columns) table += " " + cellText(modes[column].cells[row]) + " |";
    table += "\n";
  }
  return table;
}

}  // namespace

std::size_t countCells(const std::vector<ModeResults>& modes) {
  std::size_t count = 0;
  for (const ModeResults& mode : modes) {
    count += static_cast<std::size_t>(std::count_if(mode.cells.begin(), mode.cells.end(),
                                                    [](const auto& cell) { return cell.has_value(); }));
  }
  return count;
}

std::string checkSection(const std::string& page, const std::string& name, const std::string& text) {
  const std::string begin = "<!-- " + name + ": written by the tests -->\n";
  const std::string end = "<!-- end of " + name + " -->\n";
  const std::string content = support::readFile(page).value_or("");
  const std::size_t from = content.find(begin);
  const std::size_t to = content.find(end);
  if (from == std::string::npos || to == std::string::npos || to < from) {
    return "the page has no place for \"" + name + "\"";
  }
  const std::size_t body = from + begin.size();
  if (content.substr(body, to - body) == text) return "";
  if (std::getenv("VANTLE_UPDATE_RELIABILITY") == nullptr) {  // NOLINT: no threads yet
    return "\"" + name +
           "\" is not what the tests find: write it with VANTLE_UPDATE_RELIABILITY=1. Now it is\n" + text;
  }
  const bool written = support::writeFile(page, content.substr(0, body) + text + content.substr(to));
  return written ? "" : "the page cannot be written";
}

std::string pageWithMatrix(const std::string& page, const std::vector<ModeResults>& modes) {
  std::string text = std::to_string(countCells(modes)) + " cells: " + std::to_string(commandModes().size()) +
                     " modes, " + std::to_string(faultRows().size()) + " faults.\n";
  for (const Columns& columns : columnsByFamily()) text += "\n" + tableOf(columns, modes);
  return checkSection(page, "matrix", text);
}

}  // namespace fault
