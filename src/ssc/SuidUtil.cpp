#include "ssc/SuidUtil.h"

#include "proto/sns_suid.pb.h"

namespace ssc {

int SuidUtil::Lookup(const std::string& dataType, std::vector<SensorUid>* suids) {
  sns_suid_req query;
  query.set_data_type(dataType);
  query.set_register_updates(false);
  query.set_default_only(false);
  sns_client_request_msg request = Client::MakeRequest(kSuidLookupSensor);
  request.set_msg_id(kSuidRequest);
  request.mutable_request()->set_payload(query.SerializeAsString());

  sns_suid_event answer;
  const int result =
      exchange_.Run(kSuidLookupSensor, request, [&](const Exchange::Event& event) -> std::optional<int> {
        if (event.msg_id() == kErrorEvent) return kIoError;
        if (event.msg_id() != kSuidEvent) return std::nullopt;
        if (!answer.ParseFromString(event.payload())) return kMalformed;
        if (answer.data_type() != dataType) return std::nullopt;
        return kOk;
      });
  if (result != kOk) return result;
  if (answer.suid().empty()) return kNotFound;
  suids->clear();
  for (const sns_std_suid& suid : answer.suid()) suids->emplace_back(suid);
  return kOk;
}

}  // namespace ssc
