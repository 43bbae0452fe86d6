#include "simhub/RegistrySensor.h"

#include <algorithm>

#include "simhub/Protocol.h"

namespace simhub {
namespace {

using Answer = RegistrySensor::Answer;

Answer failure(sns_std_error error) { return {0, {}, error}; }

void removeItem(const std::string& name, sns_registry_data* group) {
  auto* const items = group->mutable_items();
  const auto last =
      std::remove_if(items->begin(), items->end(), [&](const auto& item) { return item.name() == name; });
  items->erase(last, items->end());
}

void changeKind(const std::string& name, sns_registry_data* group) {
  for (sns_registry_data_item& item : *group->mutable_items()) {
    if (item.name() != name) continue;
    if (item.data_case() == sns_registry_data_item::kSubgrp) {
      item.set_flt(0);
    } else {
      item.mutable_subgrp();
    }
  }
}

}  // namespace

Answer RegistrySensor::Handle(std::uint32_t messageId, const std::string& payload, Time now) {
  if (messageId == kRegistryReadRequest) return read(payload, now);
  if (messageId == kRegistryWriteRequest) return write(payload, now);
  return failure(SNS_STD_ERROR_NOT_SUPPORTED);
}

Answer RegistrySensor::read(const std::string& payload, Time now) {
  sns_registry_read_req request;
  if (!request.ParseFromString(payload)) return failure(SNS_STD_ERROR_INVALID_TYPE);
  const std::string& group = request.name();
  const bool isMissing = faults_.OnRegistry(FaultKind::kGroupMissing, group, now);
  if (faults_.OnRegistry(FaultKind::kReadFails, group, now)) return failure(SNS_STD_ERROR_FAILED);
  sns_registry_read_event event;
  event.set_name(group);
  const RegistryStore::Result result = store_.Read(group, event.mutable_data());
  if (isMissing || result == RegistryStore::Result::kMissing) return failure(SNS_STD_ERROR_NOT_AVAILABLE);
  if (result != RegistryStore::Result::kOk) return failure(SNS_STD_ERROR_FAILED);
  std::vector<std::string> items;
  (void)faults_.OnRegistry(FaultKind::kItemMissing, group, now, &items);
  for (const std::string& item : items) removeItem(item, event.mutable_data());
  items.clear();
  (void)faults_.OnRegistry(FaultKind::kItemKind, group, now, &items);
  for (const std::string& item : items) changeKind(item, event.mutable_data());
  return {kRegistryReadEvent, event.SerializeAsString()};
}

Answer RegistrySensor::write(const std::string& payload, Time now) {
  sns_registry_write_req request;
  if (!request.ParseFromString(payload)) return failure(SNS_STD_ERROR_INVALID_TYPE);
  const std::optional<std::uint64_t> freeBytes = faults_.FreeBytes(now);
  if (!freeBytes) {
    files_.LimitFreeBytes(std::nullopt);
  } else if (!files_.IsLimited()) {
    files_.LimitFreeBytes(freeBytes);
  }
  const bool fails = faults_.OnRegistry(FaultKind::kWriteFails, request.name(), now);
  sns_registry_write_event event;
  event.set_status(!fails && store_.Write(request.name(), request.data()) ? SNS_REGISTRY_WRITE_STATUS_SUCCESS
                                                                          : SNS_REGISTRY_WRITE_STATUS_FAILED);
  return {kRegistryWriteEvent, event.SerializeAsString()};
}

}  // namespace simhub
