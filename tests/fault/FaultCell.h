// One cell of the fault matrix: a command in one of its modes, one fault, and what came of it.
#pragma once

#include <optional>
#include <string>
#include <vector>

#include "fault/CommandModes.h"
#include "fault/FaultRows.h"
#include "fault/HandsetFiles.h"
#include "fault/WatchedRun.h"
#include "support/TemporaryFolder.h"

namespace fault {

struct FaultCell {
  int result = 0;
  /// What is wrong with it, each with what was printed; empty: everything is as it must be.
  std::vector<std::string> problems;
};

/// A handset on which a command is about to run in one of its modes; every cell starts from a copy of it.
class ModeUnderTest {
 public:
  explicit ModeUnderTest(const CommandMode& mode);

  /// The command on a good hub: its problems are those of the matrix itself.
  [[nodiscard]] const FaultCell& good() const { return good_; }
  /// Nothing where the fault cannot happen to the command.
  [[nodiscard]] std::optional<FaultCell> Try(const FaultRow& row) const;

 private:
  [[nodiscard]] WatchedRun run(const std::filesystem::path& root,
                               const std::vector<std::string>& overrides) const;
  void checkOutput(const WatchedRun& run, const Expected& expected, FaultCell* cell) const;
  void checkTime(const WatchedRun& run, FaultCell* cell) const;
  void checkRegistry(const Files& before, const Files& after, Stored stored, FaultCell* cell) const;
  /// The command has to succeed on what the fault has left behind.
  void checkRecovery(const std::filesystem::path& root, FaultCell* cell) const;

  const CommandMode& mode_;
  support::TemporaryFolder ready_;       ///< as the command finds it
  support::TemporaryFolder calibrated_;  ///< as it leaves it
  Traffic traffic_;                      ///< on a good hub
  FaultCell good_;
};

}  // namespace fault
