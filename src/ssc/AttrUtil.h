#pragma once

#include <cstdint>
#include <string>

#include "proto/sns_std.pb.h"
#include "ssc/Exchange.h"
#include "ssc/SensorUid.h"

namespace ssc {

/// Ids of the attributes that a sensor publishes.
enum AttributeId : std::int32_t {
  kAttributeName = 0,
  kAttributeVendor = 1,
  kAttributeDataType = 2,
  kAttributeAvailable = 3,
  kAttributeVersion = 4,
  kAttributeRates = 6,
  kAttributeResolutions = 7,
  kAttributeRanges = 11,
  kAttributeStreamType = 16,
  kAttributeRigidBody = 18,
  kAttributePhysicalSensor = 20,
  kAttributeSelectedResolution = 22,
  kAttributeSelectedRange = 23,
  kAttributeHardwareId = 29,  ///< provisional: not confirmed on a handset
};

/// Loads a sensor's attributes and reads them. The readers return 0, or kNoData when the attribute is absent
/// or of another kind; `out` is set on success only.
class AttrUtil {
 public:
  explicit AttrUtil(Connection* connection) : exchange_(connection) {}

  /// 0; kTimedOut without an answer; kMalformed when it does not parse; or what sending returned.
  int LoadAttributes(const SensorUid& suid, sns_std_attr_event* attributes);

  static int GetStreamType(const sns_std_attr_event& attributes, sns_std_sensor_stream_type* out);
  static int GetName(const sns_std_attr_event& attributes, std::string* out);
  /// The hardware id, which tells sensors of one data type apart.
  static int GetSensorIndex(const sns_std_attr_event& attributes, std::int64_t* out);
  /// The range that the sensor is set to, in the unit of its readings.
  static int GetSelectedRange(const sns_std_attr_event& attributes, float* low, float* high);

 private:
  Exchange exchange_;
};

}  // namespace ssc
