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

/// What must come of a fault.
struct Expected {
  int result = 0;
  std::string says = {};  ///< part of what is printed; empty: anything
  Reason reason = Reason::kSaid;
};

/// Whether a command that failed may have stored something all the same. Whatever it stores is whole.
enum class Stored { kNothing, kPerhaps };

struct FaultRow {
  std::string family;  ///< rows of one stand together
  std::string name;
  /// The overrides that make it happen, made with the traffic of the same command on a good hub; nothing
  /// where it cannot happen to the command.
  std::function<std::optional<std::vector<std::string>>(const CommandMode&, const Traffic& good)> overrides;
  std::function<Expected(const CommandMode&)> expected;
  Stored stored = Stored::kNothing;
  bool onCalibrated = false;  ///< happens to a handset that the command has calibrated once before
};

[[nodiscard]] const std::vector<FaultRow>& faultRows();

}  // namespace fault
