#include "ssc/AttrUtil.h"

namespace ssc {
namespace {

using Value = sns_std_attr_value::sns_std_attr_value_data;

/// The attribute's first value, or null.
const Value* firstValue(const sns_std_attr_event& attributes, AttributeId id) {
  for (const sns_std_attr& attribute : attributes.attributes()) {
    if (attribute.attr_id() == id && !attribute.value().values().empty()) return &attribute.value().values(0);
  }
  return nullptr;
}

}  // namespace

int AttrUtil::LoadAttributes(const SensorUid& suid, sns_std_attr_event* attributes) {
  sns_std_attr_req query;
  query.set_register_updates(false);
  sns_client_request_msg request = Client::MakeRequest(suid);
  request.set_msg_id(kAttributesRequest);
  request.mutable_request()->set_payload(query.SerializeAsString());

  sns_std_attr_event answer;
  const int result = exchange_.Run(suid, request, [&](const Exchange::Event& event) -> std::optional<int> {
    if (event.msg_id() == kErrorEvent) return kIoError;
    if (event.msg_id() != kAttributesEvent) return std::nullopt;
    return answer.ParseFromString(event.payload()) ? kOk : kMalformed;
  });
  if (result == kOk) attributes->Swap(&answer);
  return result;
}

int AttrUtil::GetStreamType(const sns_std_attr_event& attributes, sns_std_sensor_stream_type* out) {
  const Value* value = firstValue(attributes, kAttributeStreamType);
  if (value == nullptr || !value->has_sint()) return kNoData;
  if (value->sint() < sns_std_sensor_stream_type_MIN || value->sint() > sns_std_sensor_stream_type_MAX)
    return kNoData;
  *out = static_cast<sns_std_sensor_stream_type>(value->sint());
  return kOk;
}

int AttrUtil::GetName(const sns_std_attr_event& attributes, std::string* out) {
  const Value* value = firstValue(attributes, kAttributeName);
  if (value == nullptr || !value->has_str()) return kNoData;
  *out = value->str();
  // A name may come with its terminating zero byte.
  while (!out->empty() && out->back() == '\0') out->pop_back();
  return kOk;
}

int AttrUtil::GetSensorIndex(const sns_std_attr_event& attributes, std::int64_t* out) {
  const Value* value = firstValue(attributes, kAttributeHardwareId);
  if (value == nullptr || !value->has_sint()) return kNoData;
  *out = value->sint();
  return kOk;
}

int AttrUtil::GetSelectedRange(const sns_std_attr_event& attributes, float* low, float* high) {
  for (const sns_std_attr& attribute : attributes.attributes()) {
    if (attribute.attr_id() != kAttributeSelectedRange) continue;
    const auto& values = attribute.value().values();
    if (values.size() < 2 || !values[0].has_flt() || !values[1].has_flt()) return kNoData;
    *low = values[0].flt();
    *high = values[1].flt();
    return kOk;
  }
  return kNoData;
}

}  // namespace ssc
