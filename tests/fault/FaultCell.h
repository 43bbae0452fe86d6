// One cell of the fault matrix: a command in one of its modes, one fault, and what came of it.
#pragma once

#include <optional>
#include <string>
#include <vector>

#include "fault/CommandModes.h"
#include "fault/FaultChecks.h"
#include "fault/FaultRows.h"
#include "fault/HandsetFiles.h"
#include "fault/WatchedRun.h"
#include "support/TemporaryFolder.h"

namespace fault {

struct FaultCell {
  int result = 0;
  Problems problems;  ///< each with what was printed; empty: everything is as it must be
};

/// A handset on which a command is about to run in one of its modes; every cell starts from a copy of it.
class ModeUnderTest {
 public:
  explicit ModeUnderTest(const CommandMode& mode);

  /// The command on a good hub: its problems are those of the matrix itself.
  [[nodiscard]] const FaultCell& good() const { return goodCell_; }
  /// Nothing where the fault cannot happen to the command.
  [[nodiscard]] std::optional<FaultCell> Try(const FaultRow& row) const;

 private:
  [[nodiscard]] WatchedRun run(const std::filesystem::path& root,
                               const std::vector<std::string>& overrides) const;
  /// Whether and what a run that ended so may have stored.
  [[nodiscard]] Stored storedBy(int result, const FaultRow& row) const;
  /// The command has to succeed on what the fault has left behind.
  [[nodiscard]] Problems checkRecovery(const std::filesystem::path& root) const;

  const CommandMode& mode_;
  support::TemporaryFolder ready_;       ///< as the command finds it
  support::TemporaryFolder calibrated_;  ///< as it leaves it
  RegistryStates registry_;
  WatchedRun good_;
  FaultCell goodCell_;
};

}  // namespace fault
