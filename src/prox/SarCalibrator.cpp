#include "prox/SarCalibrator.h"

#include <cerrno>
#include <cstdio>
#include <cstring>

#include "framework/CommandOptions.h"
#include "framework/LowerCase.h"
#include "framework/ParseNumber.h"
#include "framework/RegistryItems.h"
#include "proto/sns_oem_sar.pb.h"
#include "ssc/AttrUtil.h"
#include "ssc/Log.h"
#include "ssc/RegistryUtil.h"
#include "ssc/SuidUtil.h"

namespace {

constexpr const char* kUsage = "Usage: vantle sar [-h] [-i ID]\n";
constexpr const char* kOptions = R"(Options:
  -h         Print this help and exit.
  -i ID      Calibrate the sensor with the given hardware ID.

)";

constexpr const char* kGroupSuffix =
    "_platform.fac_cal";                                 // behind the sensor's name, '_' and its hardware ID
constexpr const char* kMaxOffsetTop = "max_offset_top";  // float, counts
constexpr const char* kMaxOffsetBottom = "max_offset_bottom";  // float, counts

constexpr const char* kSar = "sar";
constexpr std::uint32_t kCompensationRequest = 778;
constexpr std::uint32_t kCompensationResponse = 779;
constexpr float kNoRate = -1.0F;  // the sensor runs at its own
/// What the sensor needs to run before it can compensate.
constexpr std::chrono::milliseconds kStartTime{50};

}  // namespace

SarCalibrator::SarCalibrator(ssc::Connection* hubConnection) : Calibrator(hubConnection, kUsage, kOptions) {}

int SarCalibrator::Run(const Arguments& arguments) {
  // Unlike in most commands, a reset too looks at the words: they select the sensor.
  int result = ParseArgs(arguments);
  if (result == kHelpPrinted) return ssc::kOk;
  if (result != ssc::kOk) return result;
  if (arguments.reset) return Reset();
  result = LookupSuid();
  return result == ssc::kOk ? Calibrate() : result;
}

int SarCalibrator::ParseArgs(const Arguments& arguments) {
  hardwareId_ = 0;
  CopyGlobalOptions(arguments);
  CommandOptions options(arguments, "hi:");
  for (int option; (option = options.Next()) != CommandOptions::kEnd;) {
    switch (option) {
      case 'h':
        PrintUsage(false);
        return kHelpPrinted;
      case 'i':
        if (parseInt(options.argument(), &hardwareId_) != ssc::kOk || hardwareId_ < 0) {
          return UsageError("ID must start from 0");
        }
        break;
      default:
        return InvalidOption(arguments, option);
    }
  }
  IgnoreExtraArguments(options.words(), 0);
  return ssc::kOk;
}

int SarCalibrator::LookupSuid() {
  ssc::say("Searching for SAR sensor...\n");
  std::vector<ssc::SensorUid> suids;
  int result = ssc::SuidUtil(connection).Lookup(kSar, &suids);
  if (result == ssc::kOk) result = selectSensor(suids);
  if (result != ssc::kOk) {
    ssc::log(ssc::kLogError, "Unable to find a SAR sensor with the hardware ID %d", hardwareId_);
    return result;
  }
  SetSensorInfo(suid_, "SAR", kNoRate);
  return ssc::kOk;
}

int SarCalibrator::selectSensor(const std::vector<ssc::SensorUid>& suids) {
  ssc::AttrUtil attributeUtil(connection);
  for (const ssc::SensorUid& suid : suids) {
    sns_std_attr_event attributes;
    std::int64_t index = 0;
    // A sensor that does not say which one it is cannot be the one wanted.
    if (!LoadCandidate(attributeUtil, kSar, suid, &attributes) ||
        ssc::AttrUtil::GetSensorIndex(attributes, &index) != ssc::kOk || index != hardwareId_) {
      continue;
    }
    const int result = ssc::AttrUtil::GetName(attributes, &sensorName_);
    if (result != ssc::kOk) return result;
    sensorName_ = toLowerAscii(sensorName_);
    suid_ = suid;
    return ssc::kOk;
  }
  return ssc::kNotFound;
}

std::string SarCalibrator::groupName() const {
  return sensorName_ + "_" + std::to_string(hardwareId_) + kGroupSuffix;
}

int SarCalibrator::Calibrate() {
  ssc::say("SAR calibration begins.\n");
  return Conclude("SAR calibration", measureAndStore());
}

int SarCalibrator::measureAndStore() {
  int result = compensate();
  if (result == ssc::kOk) result = checkOffsets();
  if (result != ssc::kOk) return result;
  const SarOffsets limits = maxSarOffsets(offsets_);
  ssc::say("TOP_OFFSET: %5.0f\n", static_cast<double>(limits.top));
  ssc::say("BOT_OFFSET: %5.0f\n", static_cast<double>(limits.bottom));
  return SkipsWrite() ? ssc::kOk : store(limits);
}

int SarCalibrator::compensate() {
  int result = SendRequests(GetAllConfigRequests(), nullptr);
  if (result != ssc::kOk) {
    ssc::log(ssc::kLogError, "Unable to start the SAR sensor. Error = %d", result);
    return result;
  }
  connection->clock().sleepFor(kStartTime);
  result = requestCompensation();
  DisableAllSensors();
  // A response that does not parse was reported when it came.
  if (result != ssc::kOk && result != ssc::kMalformed) {
    ssc::log(ssc::kLogError, "The SAR sensor did not compensate. Error = %d", result);
  }
  return result;
}

int SarCalibrator::requestCompensation() {
  sns_client_request_msg request = MakeRequest(suid_);
  request.set_msg_id(kCompensationRequest);
  request.mutable_request();
  return AskSensor(request);
}

void SarCalibrator::OnEvent(const sns_client_event_msg& message) {
  constexpr const char* kFunction = "virtual void SarCalibrator::OnEvent(const sns_client_event_msg &)";
  ssc::logFunc(kFunction, "-->");
  const std::lock_guard<std::mutex> guard(mutex);
  for (const auto& event : message.events()) {
    if (event.msg_id() != kCompensationResponse) continue;
    if (!takeResponse(event.payload())) {
      ssc::log(ssc::kLogError, "Received malformed SAR compensation response");
      status = ssc::kMalformed;
    }
    condition.notify_all();
    break;
  }
  ssc::logFunc(kFunction, "<--");
}

bool SarCalibrator::takeResponse(const std::string& payload) {
  sns_sar_comp_resp response;
  // An offset that is not there would be taken for 0, and its margin for a limit.
  if (!response.ParseFromString(payload) || !response.has_top_offset() || !response.has_bottom_offset()) {
    return false;
  }
  offsets_ = {response.top_offset(), response.bottom_offset()};
  return true;
}

int SarCalibrator::checkOffsets() const {
  if (const auto fault = checkSarOffsets(offsets_)) {
    const bool isTop = *fault == SarOffsetFault::kTopTooHigh;
    ssc::log(ssc::kLogError, "%s offset is too high (%.0f)", isTop ? "Top" : "Bottom",
             static_cast<double>(isTop ? offsets_.top : offsets_.bottom));
    return ssc::kInvalid;
  }
  const int result = RequireFinite("The top offset", {offsets_.top});
  return result == ssc::kOk ? RequireFinite("The bottom offset", {offsets_.bottom}) : result;
}

int SarCalibrator::store(const SarOffsets& limits) {
  sns_registry_data data;
  int result = ssc::RegistryUtil(connection).Read(groupName(), &data);
  if (result == ssc::kOk) result = requireItem(kMaxOffsetTop, data);
  if (result == ssc::kOk) result = requireItem(kMaxOffsetBottom, data);
  if (result != ssc::kOk) return result;
  setFloatItem(kMaxOffsetTop, limits.top, &data);
  setFloatItem(kMaxOffsetBottom, limits.bottom, &data);
  return WriteRegistry(groupName(), data);
}

int SarCalibrator::Reset() {
  int result = LookupSuid();
  if (result != ssc::kOk) return result;
  ssc::say("Resetting SAR calibration...\n");
  std::string path;
  result = registryFilePath(groupName(), &path);
  if (result != ssc::kOk) return result;
  if (std::remove(path.c_str()) == 0) return ssc::kOk;
  ssc::log(ssc::kLogError, "Unable to delete the registry file %s: %s", groupName().c_str(),
           std::strerror(errno));
  return ssc::kNotPermitted;
}
