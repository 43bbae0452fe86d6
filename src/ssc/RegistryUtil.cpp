#include "ssc/RegistryUtil.h"

#include <algorithm>
#include <array>
#include <cstdint>
#include <limits>
#include <string_view>

#include "ssc/Log.h"
#include "ssc/SuidUtil.h"

namespace ssc {
namespace {

constexpr std::array<const char*, 3> kVectorItems{"x", "y", "z"};
constexpr std::array<const char*, 9> kMatrixItems{"0_0", "0_1", "0_2", "1_0", "1_1",
                                                  "1_2", "2_0", "2_1", "2_2"};
constexpr std::size_t kDiagonalStep = 4;  // from one diagonal element to the next in row order

sns_registry_data_item* findHere(std::string_view name, sns_registry_data* data) {
  for (sns_registry_data_item& item : *data->mutable_items()) {
    if (item.name() == name) return &item;
  }
  return nullptr;
}

/// The version after that of `item`, which may be null or have none.
std::int32_t nextVersion(const sns_registry_data_item* item) {
  if (item == nullptr || !item->has_version() || item->version() == std::numeric_limits<std::int32_t>::max())
    return 1;
  return item->version() + 1;
}

/// Replaces the subgroup's items by float items; an item that was there has its version advanced.
template <std::size_t Count>
void replaceByFloats(const std::array<const char*, Count>& names, const std::vector<float>& values,
                     sns_registry_data* subgroup) {
  sns_registry_data replacement;
  for (std::size_t i = 0; i < std::min(Count, values.size()); ++i) {
    sns_registry_data_item* item = replacement.add_items();
    item->set_name(names[i]);
    item->set_version(nextVersion(findHere(names[i], subgroup)));
    item->set_flt(values[i]);
  }
  subgroup->Swap(&replacement);
}

/// The event that answers a write.
std::optional<int> matchWriteAnswer(const Exchange::Event& event) {
  if (event.msg_id() == kErrorEvent) return kIoError;
  if (event.msg_id() != kRegistryWriteEvent) return std::nullopt;
  sns_registry_write_event answer;
  if (!answer.ParseFromString(event.payload())) return kMalformed;
  return answer.status() == SNS_REGISTRY_WRITE_STATUS_SUCCESS ? kOk : kIoError;
}

}  // namespace

std::string RegistryUtil::RegistryPath() { return "/mnt/vendor/persist/sensors/registry/registry/"; }

int RegistryUtil::lookup() {
  if (registry_) return kOk;
  std::vector<SensorUid> suids;
  SuidUtil suidUtil(connection_);
  const int result = suidUtil.Lookup(kRegistryDataType, &suids);
  if (result == kOk) {
    registry_ = suids.front();
  } else {
    log(kLogError, "Unable to find the hub's registry. Error = %d", result);
  }
  return result;
}

int RegistryUtil::Read(const std::string& group, sns_registry_data* out, Absence absence) {
  const int found = lookup();
  if (found != kOk) return found;
  sns_registry_read_req query;
  query.set_name(group);
  sns_client_request_msg request = Client::MakeRequest(*registry_);
  request.set_msg_id(kRegistryReadRequest);
  request.mutable_request()->set_payload(query.SerializeAsString());

  sns_registry_read_event answer;
  const int result =
      exchange_.Run(*registry_, request, [&](const Exchange::Event& event) -> std::optional<int> {
        if (event.msg_id() == kErrorEvent) return kNotFound;
        if (event.msg_id() != kRegistryReadEvent) return std::nullopt;
        if (!answer.ParseFromString(event.payload())) return kMalformed;
        if (answer.name() != group) return std::nullopt;
        return kOk;
      });
  if (result == kOk) {
    out->Swap(answer.mutable_data());
  } else if (result != kNotFound || absence == Absence::kReported) {
    log(kLogError, "Unable to read registry group \"%s\". Error = %d", group.c_str(), result);
  }
  return result;
}

int RegistryUtil::Write(const std::string& group, const sns_registry_data& data, const std::string* group2,
                        const sns_registry_data* data2) {
  const int found = lookup();
  if (found != kOk) return found;
  const int result = writeGroup(group, data);
  if (result != kOk || group2 == nullptr || data2 == nullptr) return result;
  return writeGroup(*group2, *data2);
}

int RegistryUtil::writeGroup(const std::string& group, const sns_registry_data& data) {
  sns_registry_write_req write;
  write.set_name(group);
  *write.mutable_data() = data;
  sns_client_request_msg request = Client::MakeRequest(*registry_);
  request.set_msg_id(kRegistryWriteRequest);
  request.mutable_request()->set_payload(write.SerializeAsString());
  return exchange_.Run(*registry_, request, matchWriteAnswer);
}

sns_registry_data_item* RegistryUtil::FindDataItem(const std::string& name, sns_registry_data* data) {
  if (sns_registry_data_item* item = findHere(name, data)) return item;
  for (std::size_t dot = name.find('.'); dot != std::string::npos; dot = name.find('.', dot + 1)) {
    sns_registry_data_item* group = findHere(std::string_view(name).substr(0, dot), data);
    if (group == nullptr || !group->has_subgrp()) continue;
    if (sns_registry_data_item* item = FindDataItem(name.substr(dot + 1), group->mutable_subgrp()))
      return item;
  }
  return nullptr;
}

const sns_registry_data_item* RegistryUtil::FindDataItem(const std::string& name,
                                                         const sns_registry_data& data) {
  return FindDataItem(name, const_cast<sns_registry_data*>(&data));  // which changes nothing
}

sns_registry_data_item* RegistryUtil::GetIncrementedDataItem(const std::string& name,
                                                             sns_registry_data* data) {
  sns_registry_data_item* item = FindDataItem(name, data);
  if (item == nullptr) {
    std::string_view rest = name;
    for (std::size_t dot = rest.find('.'); dot != std::string_view::npos; dot = rest.find('.')) {
      sns_registry_data_item* group = findHere(rest.substr(0, dot), data);
      if (group == nullptr) {
        group = data->add_items();
        group->set_name(std::string(rest.substr(0, dot)));
      }
      data = group->mutable_subgrp();
      rest.remove_prefix(dot + 1);
    }
    item = data->add_items();
    item->set_name(std::string(rest));
  }
  item->set_version(nextVersion(item));
  return item;
}

void RegistryUtil::CreateRegistryVector(const std::vector<float>& values, sns_registry_data* subgroup) {
  replaceByFloats(kVectorItems, values, subgroup);
}

std::vector<float> RegistryUtil::GetRegistryVector(const sns_registry_data& subgroup) {
  std::vector<float> values;
  values.reserve(static_cast<std::size_t>(subgroup.items_size()));
  for (const sns_registry_data_item& item : subgroup.items()) values.push_back(item.flt());
  return values;
}

void RegistryUtil::CreateRegistryMatrix(const std::vector<float>& values, sns_registry_data* subgroup) {
  if (values.size() == kMatrixItems.size()) {
    replaceByFloats(kMatrixItems, values, subgroup);
  } else if (values.size() == kVectorItems.size()) {
    std::vector<float> matrix(kMatrixItems.size(), 0.0F);
    for (std::size_t i = 0; i < values.size(); ++i) matrix[i * kDiagonalStep] = values[i];
    replaceByFloats(kMatrixItems, matrix, subgroup);
  }
}

std::vector<float> RegistryUtil::GetRegistryMatrix(const sns_registry_data& subgroup, bool diagonal) {
  std::vector<float> values;
  for (std::size_t i = 0; i < kMatrixItems.size(); i += diagonal ? kDiagonalStep : 1) {
    const sns_registry_data_item* item = FindDataItem(kMatrixItems[i], subgroup);
    if (item == nullptr || !item->has_flt()) return {};
    values.push_back(item->flt());
  }
  return values;
}

}  // namespace ssc
