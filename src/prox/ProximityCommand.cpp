#include "prox/ProximityCommand.h"

#include <chrono>

#include "framework/ParseNumber.h"
#include "ssc/AttrUtil.h"
#include "ssc/Log.h"

namespace {

constexpr const char* kGroupSuffix = "_0_platform.prox.fac_cal";
constexpr float kDefaultRangeHigh = 5.0F;
constexpr std::int32_t kExtraSeconds = 3;

}  // namespace

ProximityCommand::ProximityCommand(ssc::Connection* hubConnection, const char* usage, const char* options,
                                   const Source& source)
    : Calibrator(hubConnection, usage, options), source_(source) {}

void ProximityCommand::SetDefaults(const Arguments& arguments, std::int32_t samplesToCollect) {
  rangeHigh_ = kDefaultRangeHigh;
  samplesToCollect_ = samplesToCollect;
  CopyGlobalOptions(arguments);
}

int ProximityCommand::HandleOption(const Arguments& arguments, int option, const char* argument) {
  switch (option) {
    case 'h':
      PrintUsage(false);
      return kHelpPrinted;
    case 's':
      if (parseInt(argument, &samplesToCollect_) != ssc::kOk || samplesToCollect_ < 1) {
        return UsageError("SAMPLES must be a positive integer");
      }
      return ssc::kOk;
    default:
      return InvalidOption(arguments, option);
  }
}

int ProximityCommand::LookupSuid() {
  if (!suid_.IsZero() && !sensorName_.empty()) return ssc::kOk;
  ssc::say("Searching for proximity sensor...\n");
  std::map<std::string, ssc::SensorUid> suids;
  const int result =
      LookupSuidsByName({source_.dataType}, &suids, &sensorName_, SNS_STD_SENSOR_STREAM_TYPE_STREAMING);
  if (result != ssc::kOk) {
    ssc::log(ssc::kLogError, "%s", source_.lookupFailure);
    return result;
  }
  suid_ = suids[source_.dataType];
  SetSensorInfo(suid_, source_.displayName, static_cast<float>(source_.rateHz));

  // The range only says which distance is printed for a far target: without it the default does.
  sns_std_attr_event attributes;
  if (ssc::AttrUtil(connection).LoadAttributes(suid_, &attributes) == ssc::kOk) {
    float low = 0;
    float high = 0;
    if (ssc::AttrUtil::GetSelectedRange(attributes, &low, &high) == ssc::kOk) rangeHigh_ = high;
  }
  return ssc::kOk;
}

int ProximityCommand::CollectReadings(Printing printing) {
  const int result = CollectSamples(std::chrono::seconds(samplesToCollect_ / source_.rateHz + kExtraSeconds),
                                    printing == Printing::kSamples);
  if (result != ssc::kTimedOut) return RequireCollected(result);
  ssc::log(ssc::kLogError, "Timed out waiting for proximity sensor samples");
  return result;
}

bool ProximityCommand::IsFromSensor(const sns_client_event_msg& message) const {
  return ssc::SensorUid(message.suid()) == suid_;
}

const sns_proximity_event* ProximityCommand::ParseReading(const std::string& payload) {
  if (event_.ParseFromString(payload)) return &event_;
  ssc::log(ssc::kLogError, "Received malformed proximity event");
  status = ssc::kMalformed;
  return nullptr;
}

bool ProximityCommand::IsAccurate(const sns_proximity_event& reading) {
  if (reading.status() == SNS_STD_SENSOR_SAMPLE_STATUS_ACCURACY_HIGH) return true;
  ssc::log(ssc::kLogDebug, "Dropping proximity sample (%d)", reading.status());
  return false;
}

std::string ProximityCommand::GroupName() const { return sensorName_ + kGroupSuffix; }

int ProximityCommand::RequestReread() { return SendRequest(MakeFactoryTestRequest(suid_)); }

int ProximityCommand::StoreDefaults(ssc::RegistryUtil& registry, const sns_registry_data& data) {
  int result = StoreGroup(registry, GroupName(), data);
  if (result != ssc::kOk) return result;
  result = RequestReread();
  if (result != ssc::kOk) ssc::say("Reboot device for default calibration to take effect.\n");
  return result;
}
