// The text of a registry group's file:
//
//   {
//     "items": [
//       {"name": "bias", "version": 2, "group": true},        its items stand in the file GROUP.bias
//       {"name": "mean_temp", "version": 2, "float": 27.5},
//       {"name": "position", "int": 3},
//       {"name": "axes", "string": "+x+y+z\u0000"},
//       {"name": "unset"}
//     ]
//   }
//
// Floats keep every bit: the shortest decimal that reads back as the same float, or "inf", "-inf", "nan",
// "nan:7fc00001" (the bits) in quotes. Text that is not UTF-8 stands under "string_hex" (a name: "name_hex").
#pragma once

#include <cstddef>
#include <string>

#include "proto/sns_registry.pb.h"

namespace simhub {

inline constexpr std::size_t kMaxRegistryFileBytes = std::size_t{1} << 20;

/// The file's text. Subgroups are written without their items.
[[nodiscard]] std::string formatRegistryGroup(const sns_registry_data& items);

/// Reads such a text; subgroups come out empty. False with the reason in `error` for anything else, also for
/// an item that stands twice. Bounded in memory and depth whatever the text is.
[[nodiscard]] bool parseRegistryGroup(const std::string& text, sns_registry_data* items, std::string* error);

}  // namespace simhub
