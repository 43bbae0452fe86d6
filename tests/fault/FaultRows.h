// What goes wrong, and when: the rows of the fault matrix, each with what must come of it.
#pragma once

#include <functional>
#include <optional>
#include <string>
#include <vector>

#include "fault/CommandModes.h"
#include "fault/WatchedRun.h"

namespace fault {

/// Whether a failure has to be explained. Some messages are fixed, and there is nothing beside them.
enum class Reason { kSaid, kUnsaid };

/// Whether a command that ends well says so. One whose request the hub did not carry out does not.
enum class Success { kClaimed, kUnclaimed };

/// What must come of a fault.
struct Expected {
  int result = 0;
  std::string says = {};  ///< part of what is printed; empty: anything
  Reason reason = Reason::kSaid;
  Success success = Success::kClaimed;
};

/// What a command may have stored. Whatever it stores is whole.
enum class Stored {
  kNothing,
  kPerhaps,  ///< it failed when it had begun to store
  kAll,      ///< it succeeded
};

/// Whom a fault strikes: only what strikes a sensor can strike another one than the command's own.
enum class Strikes { kSensor, kCommand };

struct FaultRow {
  std::string family;  ///< rows of one stand together
  std::string name;
  /// The overrides that make it happen, made with the traffic of the same command on a good hub; nothing
  /// where it cannot happen to the command.
  std::function<std::optional<std::vector<std::string>>(const CommandMode&, const Traffic& good)> overrides;
  std::function<Expected(const CommandMode&)> expected;
  Stored stored = Stored::kNothing;  ///< by a command that failed
  Strikes strikes = Strikes::kCommand;
  bool mayHaveBegun = true;   ///< false: it fails before the command changes anything
  bool onCalibrated = false;  ///< happens to a handset that the command has calibrated once before
};

[[nodiscard]] const std::vector<FaultRow>& faultRows();

}  // namespace fault
