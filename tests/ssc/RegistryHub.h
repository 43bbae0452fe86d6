// The script of a hub with a registry in memory, one attribute event per sensor and a fixed set of sensors.
// What it answers can be changed between requests.
#pragma once

#include <map>
#include <string>
#include <vector>

#include "proto/sns_registry.pb.h"
#include "proto/sns_suid.pb.h"
#include "ssc/TestClient.h"
#include "ssc/Wire.h"

namespace ssctest {

inline const ssc::SensorUid kRegistry{77, 88};

/// The calls of one script never overlap. All answering events come `delay` after the request.
struct RegistryHub {
  std::map<std::string, sns_registry_data> groups;
  std::map<std::string, std::vector<ssc::SensorUid>> sensors{{"registry", {kRegistry}}};
  std::string unwritable;  ///< a group whose writes fail
  ssc::Clock::Duration delay{0};
  /// What is answered to a registry request instead, if anything.
  std::vector<Outgoing> instead;
  bool silent = false;

  Outgoings operator()(const Request& request) {
    Outgoings answer{accept(request)};
    if (request.suid() == ssc::kSuidLookupSensor) {
      sns_suid_req query;
      query.ParseFromString(request.payload());
      sns_suid_event found;
      found.set_data_type(query.data_type());
      for (const auto& suid : sensors[query.data_type()]) suid.CopyTo(found.add_suid());
      answer.push_back(event(ssc::kSuidLookupSensor, 768, found.SerializeAsString(), delay));
    } else if (request.message.msg_id() == ssc::kAttributesRequest) {
      sns_std_attr_event attributes;
      sns_std_attr* index = attributes.add_attributes();
      index->set_attr_id(29);
      index->mutable_value()->add_values()->set_sint(static_cast<std::int64_t>(request.suid().low));
      answer.push_back(event(request.suid(), 128, attributes.SerializeAsString(), delay));
    } else if (request.suid() == kRegistry && !silent) {
      return answer + (instead.empty() ? registryAnswer(request) : instead);
    }
    return answer;
  }

  [[nodiscard]] Outgoings registryAnswer(const Request& request) {
    if (request.message.msg_id() == 512) {
      sns_registry_read_req query;
      query.ParseFromString(request.payload());
      if (groups.count(query.name()) == 0) return {event(kRegistry, 130, "\x08\x06", delay)};
      sns_registry_read_event found;
      found.set_name(query.name());
      *found.mutable_data() = groups[query.name()];
      return {event(kRegistry, 768, found.SerializeAsString(), delay)};
    }
    sns_registry_write_req write;
    write.ParseFromString(request.payload());
    sns_registry_write_event done;
    const bool fails = write.name() == unwritable;
    if (!fails) groups[write.name()] = write.data();
    done.set_status(fails ? SNS_REGISTRY_WRITE_STATUS_FAILED : SNS_REGISTRY_WRITE_STATUS_SUCCESS);
    return {event(kRegistry, 769, done.SerializeAsString(), delay)};
  }
};

/// A group of one integer item.
inline sns_registry_data groupOf(const std::string& item, std::int64_t value) {
  sns_registry_data data;
  data.add_items()->set_name(item);
  data.mutable_items(0)->set_sint(value);
  return data;
}

}  // namespace ssctest
