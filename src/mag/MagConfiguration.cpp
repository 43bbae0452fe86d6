#include "mag/MagConfiguration.h"

#include <algorithm>
#include <cerrno>
#include <cmath>
#include <cstdio>
#include <cstring>
#include <string_view>

#include "framework/ParseNumber.h"
#include "framework/RegistryItems.h"
#include "ssc/Log.h"
#include "ssc/RegistryUtil.h"

namespace {

constexpr const char* kMag = "mag";

std::string parentGroup(const std::string& group) { return group.substr(0, group.rfind('.')); }

/// The group `outer` as far as it is to be written: the item with its version raised. What is known of the
/// item already, `values`, stays in its subgroup, so that the values' versions count on.
int makeOuterItem(ssc::RegistryUtil& registry, const std::string& outer, const char* item,
                  sns_registry_data* values, sns_registry_data* out) {
  sns_registry_data stored;
  const int result = registry.Read(outer, &stored, ssc::RegistryUtil::Absence::kExpected);
  if (result != ssc::kOk && result != ssc::kNotFound) return result;
  sns_registry_data_item* const made = out->add_items();
  // The hub merges what it is given: the group's other items stay, and need not be sent.
  made->Swap(ssc::RegistryUtil::GetIncrementedDataItem(item, &stored));
  made->mutable_subgrp()->Swap(values);
  return ssc::kOk;
}

}  // namespace

int MagConfiguration::GetMagName() {
  ssc::say("Searching for magnetometer...\n");
  const int result = LookupSuidsByName({kMag}, nullptr, &packageName_, SNS_STD_SENSOR_STREAM_TYPE_STREAMING);
  if (result != ssc::kOk) {
    ssc::log(ssc::kLogError, "Unable to look up the magnetometer. Error = %d", result);
  }
  return result;
}

int MagConfiguration::ReadAndStore(const Group& group, const StoreValues& storeValues) {
  const std::string name = packageName_ + group.suffix;
  ssc::RegistryUtil registry(connection);
  sns_registry_data data;
  int result = registry.Read(name, &data);
  if (result != ssc::kOk) return result;
  ssc::say("Writing registry...\n");
  if (ssc::RegistryUtil::FindDataItem(group.probe, data) == nullptr) {
    sns_registry_data outer;
    result = makeOuterItem(registry, parentGroup(name), group.item, &data, &outer);
    if (result != ssc::kOk) return result;
    sns_registry_data* const values = outer.mutable_items(0)->mutable_subgrp();
    storeValues(values);
    return writeGroup(parentGroup(name), outer, name, *values);
  }
  if (std::string_view(group.probe) == group.item) {
    sns_registry_data* const values =
        ssc::RegistryUtil::GetIncrementedDataItem(group.item, &data)->mutable_subgrp();
    storeValues(values);
    return writeGroup(name, data, name, *values);
  }
  storeValues(&data);
  return writeGroup(name, data, name, data);
}

int MagConfiguration::writeGroup(const std::string& outer, const sns_registry_data& outerData,
                                 const std::string& group, const sns_registry_data& values) {
  const int result = ssc::RegistryUtil(connection).Write(outer, outerData, &group, &values);
  if (result != ssc::kOk) ssc::log(ssc::kLogWarn, "Failed to write registry. Error = %d", result);
  return result;
}

int MagConfiguration::RemoveGroupFile(const Group& group, AbsentFile absent) const {
  std::string path;
  const int result = registryFilePath(packageName_ + group.suffix, &path);
  if (result != ssc::kOk) return result;
  if (absent == AbsentFile::kIsFine) {
    std::FILE* const file = std::fopen(path.c_str(), "re");
    if (file == nullptr && errno == ENOENT) return ssc::kOk;
    if (file != nullptr) std::fclose(file);
  }
  if (std::remove(path.c_str()) == 0) return ssc::kOk;
  ssc::log(ssc::kLogError, "Unable to delete the registry file %s%s: %s", packageName_.c_str(), group.suffix,
           std::strerror(errno));
  return ssc::kNotPermitted;
}

std::vector<const char*> MagConfiguration::WordsOf(const Arguments& arguments) {
  return {arguments.argv + 1, arguments.argv + std::max(arguments.argc, 1)};
}

bool MagConfiguration::AsksForHelp(const std::vector<const char*>& words) {
  return !words.empty() && std::string_view(words.front()) == "-h";
}

int MagConfiguration::ParseValues(const std::vector<const char*>& words, std::size_t count,
                                  std::vector<float>* values) const {
  values->clear();
  for (std::size_t i = 0; i < std::min(count, words.size()); ++i) {
    float value = 0;
    // Nothing computes with the values before they are stored: "nan" has to be caught here.
    if (parseFloat(words[i], &value) != ssc::kOk || !std::isfinite(value)) {
      return UsageError("Failed to parse '%s' as a mag value", words[i]);
    }
    values->push_back(value);
  }
  IgnoreExtraArguments(words, count);
  return ssc::kOk;
}
