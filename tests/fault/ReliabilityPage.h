// The tables of docs/reliability.md, which the tests themselves write: with VANTLE_UPDATE_RELIABILITY set
// they put what they found into the page, without it the page has to say just that.
#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <vector>

#include "fault/FaultCell.h"

namespace fault {

/// What came of every row of faultRows() in one mode; nothing where it cannot happen.
struct ModeResults {
  FaultCell good;
  std::vector<std::optional<FaultCell>> cells;
};

[[nodiscard]] std::size_t countCells(const std::vector<ModeResults>& modes);

/// Compares the page's section of that name with `text`, or puts it there. Empty, or what is wrong.
[[nodiscard]] std::string checkSection(const std::string& page, const std::string& name,
                                       const std::string& text);

/// The same for the matrix; `modes` are those of commandModes().
[[nodiscard]] std::string pageWithMatrix(const std::string& page, const std::vector<ModeResults>& modes);

}  // namespace fault
