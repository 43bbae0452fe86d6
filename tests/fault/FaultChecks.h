// What must hold of a command that something went wrong under: each check apart, over what the command
// printed and left behind. Each returns what is wrong, a sentence a problem; nothing: all is as it must be.
#pragma once

#include <string>
#include <vector>

#include "fault/CommandModes.h"
#include "fault/FaultRows.h"
#include "fault/HandsetFiles.h"
#include "fault/WatchedRun.h"

namespace fault {

using Problems = std::vector<std::string>;

/// The row itself: on a good hub the command does what its row says of it.
[[nodiscard]] Problems checkRow(const CommandMode& mode, const WatchedRun& good);

/// The result is the expected one and is explained; success is claimed where there is one, and only there;
/// what was begun is closed. `good` is what the same command prints on a good hub: a warning that stands
/// there explains nothing.
[[nodiscard]] Problems checkOutput(const CommandMode& mode, const Captured& good, const Captured& run,
                                   const Expected& expected);

/// It ends no later than 10 s after the time it takes on a good hub, beside its waits for responses.
[[nodiscard]] Problems checkTime(const Traffic& good, const Traffic& run);

/// What the registry has to hold after the run: `ready` before it, `done` after the command on a good hub.
struct RegistryStates {
  Files ready;
  Files done;
};
[[nodiscard]] Problems checkRegistry(const RegistryStates& states, const Files& before, const Files& after,
                                     Stored stored);

/// The files between steps: `failed` says whether the command did, `mayHaveBegun` whether it can have got as
/// far as changing one.
struct RecordsRun {
  bool failed = false;
  bool mayHaveBegun = true;
};
[[nodiscard]] Problems checkRecords(const CommandMode& mode, const RecordsRun& run,
                                    const std::filesystem::path& before, const std::filesystem::path& after);

}  // namespace fault
