#pragma once

#include <string>
#include <vector>

#include "ssc/Exchange.h"
#include "ssc/SensorUid.h"

namespace ssc {

/// Looks sensors up by their data type.
class SuidUtil {
 public:
  explicit SuidUtil(Connection* connection) : exchange_(connection) {}

  /// Every SUID that publishes `dataType`, in the hub's order. 0; kNotFound when nobody publishes it;
  /// kIoError when the hub answers with an error; kTimedOut without an answer; or what sending returned.
  int Lookup(const std::string& dataType, std::vector<SensorUid>* suids);

 private:
  Exchange exchange_;
};

}  // namespace ssc
