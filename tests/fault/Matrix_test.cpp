// Every command, in each of its modes that collect or write, against every fault of the hub: whatever goes
// wrong, it ends in time with the right result, says why, claims no success that is none, and leaves behind
// only what the next run can use.
#include <map>
#include <memory>

#include <gtest/gtest.h>

#include "fault/FaultCell.h"
#include "fault/ReliabilityPage.h"

namespace fault {
namespace {

/// The cells of a mode. They are tried once, by whichever test asks first.
const ModeResults& resultsOf(std::size_t modeIndex) {
  static std::map<std::size_t, ModeResults> known;
  const auto found = known.find(modeIndex);
  if (found != known.end()) return found->second;
  const ModeUnderTest mode(commandModes()[modeIndex]);
  ModeResults& results = known[modeIndex];
  results.good = mode.good();
  for (const FaultRow& row : faultRows()) results.cells.push_back(mode.Try(row));
  return results;
}

class FaultMatrix : public testing::TestWithParam<std::size_t> {};

TEST_P(FaultMatrix, CommandWithstandsEveryFault) {
  const ModeResults& results = resultsOf(GetParam());
  EXPECT_EQ(results.good.result, 0);
  for (const std::string& problem : results.good.problems) ADD_FAILURE() << "on a good hub: " << problem;
  std::size_t tried = 0;
  for (std::size_t i = 0; i < faultRows().size(); ++i) {
    if (!results.cells[i]) continue;
    ++tried;
    for (const std::string& problem : results.cells[i]->problems) {
      ADD_FAILURE() << faultRows()[i].name << ": " << problem;
    }
  }
  // Without the hub a command has nothing to fear from it but that it is gone.
  EXPECT_GE(tried, commandModes()[GetParam()].lookedUp.empty() ? 1U : 10U)
      << "a command that hardly a fault can happen to is not tried at all";
}

std::string testName(const testing::TestParamInfo<std::size_t>& mode) {
  return testNameOf(commandModes()[mode.param].title());
}

INSTANTIATE_TEST_SUITE_P(Commands, FaultMatrix, testing::Range(std::size_t{0}, commandModes().size()),
                         testName);

TEST(FaultMatrixPage, ShowsWhatTheCommandsDo) {
  std::vector<ModeResults> all;
  for (std::size_t i = 0; i < commandModes().size(); ++i) all.push_back(resultsOf(i));
  EXPECT_GE(countCells(all), 600U);
  EXPECT_EQ(pageWithMatrix(VANTLE_RELIABILITY_PAGE, all), "");
}

}  // namespace
}  // namespace fault
