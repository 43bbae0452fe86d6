// Reading numbers out of a registry group.
#pragma once

#include <cstdint>
#include <optional>
#include <string_view>
#include <vector>

#include "proto/sns_registry.pb.h"

namespace simhub {

/// The item of that name, or null.
[[nodiscard]] const sns_registry_data_item* findRegistryItem(const sns_registry_data& group,
                                                             std::string_view name);
/// A float item.
[[nodiscard]] std::optional<float> registryFloat(const sns_registry_data& group, std::string_view name);
/// A float or an integer item.
[[nodiscard]] std::optional<double> registryNumber(const sns_registry_data& group, std::string_view name);
/// An integer item.
[[nodiscard]] std::optional<std::int64_t> registryInteger(const sns_registry_data& group,
                                                          std::string_view name);
/// The floats of a subgroup in their order: a vector's components, a matrix's elements in row order. Empty
/// when there is no such subgroup.
[[nodiscard]] std::vector<float> registryFloats(const sns_registry_data& group, std::string_view name);

/// The floats of a group that is itself a vector or matrix.
[[nodiscard]] std::vector<float> registryFloats(const sns_registry_data& group);

}  // namespace simhub
