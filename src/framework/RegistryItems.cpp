#include "framework/RegistryItems.h"

#include "ssc/DevicePath.h"
#include "ssc/Log.h"
#include "ssc/RegistryUtil.h"
#include "ssc/Results.h"

namespace {

const sns_registry_data_item* findOrReport(const char* name, const sns_registry_data& data,
                                           const char* owner) {
  const sns_registry_data_item* item = ssc::RegistryUtil::FindDataItem(name, data);
  if (item == nullptr) {
    ssc::log(ssc::kLogError, "Invalid registry; missing %s%s\"%s\"", owner != nullptr ? owner : "",
             owner != nullptr ? " " : "", name);
  }
  return item;
}

int readMatrixNumbers(const char* name, const sns_registry_data& data, bool diagonal,
                      std::vector<float>* values) {
  const sns_registry_data_item* item = findOrReport(name, data, nullptr);
  if (item == nullptr) return ssc::kInvalid;
  *values = ssc::RegistryUtil::GetRegistryMatrix(item->subgrp(), diagonal);
  if (!values->empty()) return ssc::kOk;
  ssc::log(ssc::kLogError, "Invalid registry; \"%s\" does not hold a 3x3 matrix", name);
  return ssc::kInvalid;
}

/// Makes the item hold a subgroup, and returns that.
sns_registry_data* subgroupForWriting(const char* name, sns_registry_data* data) {
  return ssc::RegistryUtil::GetIncrementedDataItem(name, data)->mutable_subgrp();
}

}  // namespace

int requireItem(const char* name, const sns_registry_data& data, const char* owner) {
  return findOrReport(name, data, owner) == nullptr ? ssc::kInvalid : ssc::kOk;
}

float floatItem(const char* name, const sns_registry_data& data) {
  const sns_registry_data_item* item = ssc::RegistryUtil::FindDataItem(name, data);
  return item != nullptr && item->has_flt() ? item->flt() : 0.0F;
}

std::int64_t intItem(const char* name, const sns_registry_data& data) {
  const sns_registry_data_item* item = ssc::RegistryUtil::FindDataItem(name, data);
  return item != nullptr && item->has_sint() ? item->sint() : 0;
}

int readVectorItem(const char* name, std::size_t count, const sns_registry_data& data,
                   std::vector<float>* values) {
  const sns_registry_data_item* item = findOrReport(name, data, nullptr);
  if (item == nullptr) return ssc::kInvalid;
  values->clear();
  for (const sns_registry_data_item& number : item->subgrp().items()) {
    if (values->size() == count || !number.has_flt()) break;
    values->push_back(number.flt());
  }
  if (values->size() == count) return ssc::kOk;
  ssc::log(ssc::kLogError, "Invalid registry; \"%s\" does not hold a vector of %zu", name, count);
  return ssc::kInvalid;
}

int readMatrixItem(const char* name, const sns_registry_data& data, std::vector<float>* values) {
  return readMatrixNumbers(name, data, false, values);
}

int readDiagonalItem(const char* name, const sns_registry_data& data, std::vector<float>* values) {
  return readMatrixNumbers(name, data, true, values);
}

// Setting one kind of data clears another kind: the item's data is a oneof.

void setFloatItem(const char* name, float value, sns_registry_data* data) {
  ssc::RegistryUtil::GetIncrementedDataItem(name, data)->set_flt(value);
}

void setIntItem(const char* name, std::int64_t value, sns_registry_data* data) {
  ssc::RegistryUtil::GetIncrementedDataItem(name, data)->set_sint(value);
}

void setStringItem(const char* name, std::string_view value, sns_registry_data* data) {
  ssc::RegistryUtil::GetIncrementedDataItem(name, data)->set_str(std::string(value));
}

void setVectorItem(const char* name, const std::vector<float>& values, sns_registry_data* data) {
  ssc::RegistryUtil::CreateRegistryVector(values, subgroupForWriting(name, data));
}

void setMatrixItem(const char* name, const std::vector<float>& values, sns_registry_data* data) {
  ssc::RegistryUtil::CreateRegistryMatrix(values, subgroupForWriting(name, data));
}

int registryFilePath(const std::string& group, std::string* path) {
  if (!ssc::isSafeFileName(group)) {
    ssc::log(ssc::kLogError, "Invalid registry group name '%s'", group.c_str());
    return ssc::kInvalid;
  }
  *path = ssc::devicePath(ssc::RegistryUtil::RegistryPath() + group);
  return ssc::kOk;
}
