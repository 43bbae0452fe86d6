#include "simhub/RegistryValues.h"

namespace simhub {

using Item = sns_registry_data_item;

const Item* findRegistryItem(const sns_registry_data& group, std::string_view name) {
  for (const Item& item : group.items()) {
    if (item.name() == name) return &item;
  }
  return nullptr;
}

std::optional<float> registryFloat(const sns_registry_data& group, std::string_view name) {
  const Item* const item = findRegistryItem(group, name);
  if (item == nullptr || item->data_case() != Item::kFlt) return std::nullopt;
  return item->flt();
}

std::optional<double> registryNumber(const sns_registry_data& group, std::string_view name) {
  const Item* const item = findRegistryItem(group, name);
  if (item != nullptr && item->data_case() == Item::kSint) return static_cast<double>(item->sint());
  return registryFloat(group, name);
}

std::optional<std::int64_t> registryInteger(const sns_registry_data& group, std::string_view name) {
  const Item* const item = findRegistryItem(group, name);
  if (item == nullptr || item->data_case() != Item::kSint) return std::nullopt;
  return item->sint();
}

std::vector<float> registryFloats(const sns_registry_data& group, std::string_view name) {
  const Item* const subgroup = findRegistryItem(group, name);
  if (subgroup == nullptr || subgroup->data_case() != Item::kSubgrp) return {};
  return registryFloats(subgroup->subgrp());
}

std::vector<float> registryFloats(const sns_registry_data& group) {
  std::vector<float> values;
  for (const Item& item : group.items()) {
    if (item.data_case() == Item::kFlt) values.push_back(item.flt());
  }
  return values;
}

}  // namespace simhub
