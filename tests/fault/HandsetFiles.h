// What a command leaves behind on a simulated handset, and what must hold of it whatever happened.
#pragma once

#include <filesystem>
#include <map>
#include <optional>
#include <string>

#include "fault/CommandModes.h"

namespace fault {

/// Contents by name.
using Files = std::map<std::string, std::string>;

/// The files of the registry, those that a write has under way among them.
[[nodiscard]] Files registryFiles(const std::filesystem::path& root);

/// The same as a hub finds them that starts now: it completes, or drops, a write that was cut off. What it
/// complains about is added to `complaints`.
[[nodiscard]] Files registryFilesAfterStart(const std::filesystem::path& root, std::string* complaints);

/// Whether the files that steps read again are the same.
[[nodiscard]] bool holdSameRecords(const std::filesystem::path& one, const std::filesystem::path& other);

/// Whether the registry and the files between steps are, to the byte, the same: a command then finds just
/// what it would have found.
[[nodiscard]] bool holdSameState(const std::filesystem::path& one, const std::filesystem::path& other);

/// The names of the items in a group's file, if it is one.
[[nodiscard]] std::optional<std::string> itemNames(const std::string& file);

/// What is wrong with the files between the steps of a procedure, when those of `before` must not be lost;
/// empty: nothing.
[[nodiscard]] std::string faultOfWorkingFiles(const CommandMode& mode, const std::filesystem::path& before,
                                              const std::filesystem::path& after);

void copyFolder(const std::filesystem::path& from, const std::filesystem::path& to);

/// Makes `root` a handset on which the mode's command is about to run. Empty, or what went wrong.
[[nodiscard]] std::string prepareHandset(const CommandMode& mode, const std::filesystem::path& root);

}  // namespace fault
