#include "light/AmbientLightCommand.h"

#include "framework/ParseNumber.h"
#include "framework/RegistryItems.h"
#include "ssc/Log.h"
#include "ssc/RegistryUtil.h"

namespace {

constexpr const char* kGroupSuffix = "_0_platform.als.fac_cal";
constexpr const char* kCorrectionFactor =
    "corr_factor";  // float, optional; multiplied by readers of the stream

constexpr float kMaxPercent = 100.0F;
constexpr float kNoCorrection = 1.0F;

}  // namespace

AmbientLightCommand::AmbientLightCommand(ssc::Connection* hubConnection, const char* usage,
                                         const char* options, const Source& source)
    : Calibrator(hubConnection, usage, options), sampleCount(source.defaultSamples), source_(source) {}

void AmbientLightCommand::SetDefaults(const Arguments& arguments) {
  correctedOnly = false;
  sampleCount = source_.defaultSamples;
  verifyPercent = 0;
  CopyGlobalOptions(arguments);
}

int AmbientLightCommand::HandleOption(const Arguments& arguments, int option, const char* argument) {
  switch (option) {
    case 'c':
      correctedOnly = true;
      return ssc::kOk;
    case 'h':
      PrintUsage(false);
      return kHelpPrinted;
    case 's':
      if (parseInt(argument, &sampleCount) != ssc::kOk || sampleCount <= 0) {
        return UsageError("SAMPLES must be a positive integer");
      }
      return ssc::kOk;
    case 'v':
      if (parseFloat(argument, &verifyPercent) != ssc::kOk || !(verifyPercent > 0) ||
          verifyPercent > kMaxPercent) {
        return UsageError("PERCENT must be in the range (0.0, 100.0]");
      }
      return ssc::kOk;
    default:
      return InvalidOption(arguments, option);
  }
}

int AmbientLightCommand::LookupSuid() {
  if (!suid.IsZero() && !sensorName_.empty()) return ssc::kOk;
  ssc::say("Searching for ambient light sensor...\n");
  std::map<std::string, ssc::SensorUid> suids;
  const int result =
      LookupSuidsByName({source_.dataType}, &suids, &sensorName_, SNS_STD_SENSOR_STREAM_TYPE_STREAMING);
  if (result != ssc::kOk) {
    ssc::log(ssc::kLogError, "Unable to find streaming ambient light sensor");
    return result;
  }
  suid = suids[source_.dataType];
  SetSensorInfo(suid, "Ambient Light", static_cast<float>(source_.rateHz), source_.valuesPerEvent);
  return ssc::kOk;
}

std::string AmbientLightCommand::GroupName() const { return sensorName_ + kGroupSuffix; }

bool AmbientLightCommand::OnSensorEvent(const ssc::SensorUid& eventSuid, std::uint64_t timestamp,
                                        const sns_std_sensor_event& event) {
  if (eventSuid != suid) return false;
  if (HasEnoughSamples()) return true;
  if (event.status() != SNS_STD_SENSOR_SAMPLE_STATUS_ACCURACY_HIGH) {
    ssc::log(ssc::kLogDebug, "Dropping ALS sample (%.3f)", static_cast<double>(event.data(0)));
    return false;
  }
  Calibrator::OnSensorEvent(eventSuid, timestamp, event);
  return HasEnoughSamples();
}

bool AmbientLightCommand::HasEnoughSamples() const {
  const auto collected = samples.find(suid);
  return collected != samples.end() && collected->second.size() >= static_cast<std::size_t>(sampleCount);
}

float AmbientLightCommand::CorrectionFactorOf(const sns_registry_data& data) const {
  if (correctedOnly || ssc::RegistryUtil::FindDataItem(kCorrectionFactor, data) == nullptr) {
    return kNoCorrection;
  }
  return floatItem(kCorrectionFactor, data);
}

int AmbientLightCommand::ReadCorrectionFactor(float* factor) {
  *factor = kNoCorrection;
  if (correctedOnly) return ssc::kOk;
  ssc::say("Reading registry...\n");
  sns_registry_data data;
  const int result = ssc::RegistryUtil(connection).Read(GroupName(), &data);
  if (result == ssc::kOk) *factor = CorrectionFactorOf(data);
  return result;
}

int AmbientLightCommand::ReportMeasurement(const LuxMeasurement& measurement) const {
  ssc::say("MEAN:  %14.6f\n", static_cast<double>(measurement.mean));
  if (sampleCount >= 2) ssc::say("STDEV: %14.6f\n", static_cast<double>(measurement.stdev));
  return RequireFinite("The mean of the ambient light", {measurement.mean});
}

int AmbientLightCommand::CompareWithReference(float mean, float referenceLux) const {
  const float difference = differencePercent(mean, referenceLux);
  ssc::say("DIFF:  %14.6f%%\n", static_cast<double>(difference));
  if (isWithinTolerance(difference, verifyPercent)) return ssc::kOk;
  ssc::say("Difference exceeds |%.3f%%| tolerance.\n", static_cast<double>(verifyPercent));
  return ssc::kInvalid;
}

int AmbientLightCommand::RequestReread() { return SendRequest(MakeFactoryTestRequest(suid)); }

int AmbientLightCommand::RestoreDefaults(const std::function<int(sns_registry_data*)>& change) {
  int result = LookupSuid();
  if (result != ssc::kOk) return result;
  ssc::RegistryUtil registry(connection);
  sns_registry_data data;
  result = registry.Read(GroupName(), &data);
  if (result != ssc::kOk) return result;
  ssc::say("Resetting ALS calibration...\n");
  result = change(&data);
  if (result == ssc::kOk) result = StoreGroup(registry, GroupName(), data);
  if (result != ssc::kOk) return result;
  result = RequestReread();
  if (result != ssc::kOk) ssc::say("Reboot device for default calibration to take effect.\n");
  return result;
}
