// The folder that stands for a simulated handset's file system.
#pragma once

#include <string>

namespace simhub {

/// Where it lies: the environment variable VANTLE_ROOT, else "vantle-sim" under XDG_STATE_HOME, else under
/// ~/.local/state. Empty, with `error` set, when none of these is set.
[[nodiscard]] std::string simulatedRoot(std::string* error);

/// Creates it with the folders and device nodes that the program relies on; what is there stays. False with
/// the path and reason in `error`.
[[nodiscard]] bool prepareSimulatedRoot(const std::string& root, std::string* error);

}  // namespace simhub
