// The sensor of the data type "registry": reads and writes registry groups on request.
#pragma once

#include <string>

#include "proto/sns_std.pb.h"
#include "simhub/FaultPlan.h"
#include "simhub/RegistryFiles.h"
#include "simhub/RegistryStore.h"

namespace simhub {

class RegistrySensor {
 public:
  /// All references outlive the sensor.
  RegistrySensor(RegistryStore& store, RegistryFiles& files, FaultPlan& faults)
      : store_(store), files_(files), faults_(faults) {}

  /// What answers a request: an event, or an error event.
  struct Answer {
    std::uint32_t messageId = 0;
    std::string payload;
    sns_std_error error = SNS_STD_ERROR_NO_ERROR;  ///< not NO_ERROR: an error event, whatever else is set
  };
  [[nodiscard]] Answer Handle(std::uint32_t messageId, const std::string& payload, Time now);

 private:
  [[nodiscard]] Answer read(const std::string& payload, Time now);
  [[nodiscard]] Answer write(const std::string& payload, Time now);

  RegistryStore& store_;
  RegistryFiles& files_;
  FaultPlan& faults_;
};

}  // namespace simhub
