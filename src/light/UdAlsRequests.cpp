#include "light/UdAlsRequests.h"

#include <algorithm>
#include <iterator>

#include "proto/sns_oem_als.pb.h"

namespace {

// Requests: each mode's message, and what is said around it.

std::string encodeTrigger(const UdAlsArguments& arguments) {
  const bool enables = arguments.mode == UdAlsMode::kTriggerEnable || arguments.mode == UdAlsMode::kDelay;
  sns_oem_als_trigger_req request;
  request.set_mode(enables ? SNS_OEM_ALS_MODE_ENABLE : SNS_OEM_ALS_MODE_DISABLE);
  request.set_delay_ms(enables ? arguments.alsDelay : 0);
  return request.SerializeAsString();
}

std::string encodeAutoGain(const UdAlsArguments& arguments) {
  sns_oem_auto_gain_req request;
  request.set_mode(arguments.mode == UdAlsMode::kAutoGainEnable ? SNS_OEM_ALS_MODE_ENABLE
                                                                : SNS_OEM_ALS_MODE_DISABLE);
  return request.SerializeAsString();
}

std::string encodeDelayCalibration(const UdAlsArguments& arguments) {
  sns_oem_delay_calib_req request;
  request.set_gain(arguments.gain);
  request.set_integration_time_us(arguments.integrationTime);
  request.set_delay_ms(arguments.alsDelay);
  return request.SerializeAsString();
}

std::string encodeGain(const UdAlsArguments& arguments) {
  sns_oem_set_gain_req request;
  request.set_gain(arguments.gain);
  return request.SerializeAsString();
}

std::string encodeItime(const UdAlsArguments& arguments) {
  sns_oem_set_itime_req request;
  request.set_integration_time_us(arguments.integrationTime);
  return request.SerializeAsString();
}

template <class Request>
std::string encodeGainAndItime(const UdAlsArguments& arguments) {
  Request request;
  request.set_gain(arguments.gain);
  request.set_integration_time_us(arguments.integrationTime);
  return request.SerializeAsString();
}

struct RequestRow {
  UdAlsMode mode;
  std::uint32_t messageId;
  std::string (*encode)(const UdAlsArguments&);
  const char* announcement;
  const char* failure;
};

constexpr const char* kTriggerOff = "Disabling ALS TRIGGER...\n";
constexpr const char* kTriggerFailure = "ALS TRIGGER request failed";
constexpr const char* kAutoGainOff = "Disabling Auto gain...\n";
constexpr const char* kAutoGainFailure = "Auto gain request failed";
constexpr const char* kGainItime = "Set gain and integration time...\n";
constexpr const char* kGainItimeFailure = "Set gain and integration time request failed";
constexpr const char* kDelayCalibrationFailure = "Delay calibration request failed";

constexpr RequestRow kRequests[] = {
    {UdAlsMode::kTrigger, kUdAlsTriggerRequest, encodeTrigger, kTriggerOff, kTriggerFailure},
    {UdAlsMode::kTriggerDisable, kUdAlsTriggerRequest, encodeTrigger, kTriggerOff, kTriggerFailure},
    {UdAlsMode::kTriggerEnable, kUdAlsTriggerRequest, encodeTrigger, "Enabling ALS TRIGGER...\n",
     kTriggerFailure},
    {UdAlsMode::kAutoGain, kUdAlsAutoGainRequest, encodeAutoGain, kAutoGainOff, kAutoGainFailure},
    {UdAlsMode::kAutoGainDisable, kUdAlsAutoGainRequest, encodeAutoGain, kAutoGainOff, kAutoGainFailure},
    {UdAlsMode::kAutoGainEnable, kUdAlsAutoGainRequest, encodeAutoGain, "Enabling Auto gain...\n",
     kAutoGainFailure},
    {UdAlsMode::kDelayCalibration, kUdAlsDelayCalibrationRequest, encodeDelayCalibration, "",
     kDelayCalibrationFailure},
    {UdAlsMode::kTe2DelayCalibration, kUdAlsDelayCalibrationRequest, encodeDelayCalibration, "",
     kDelayCalibrationFailure},
    {UdAlsMode::kGainCalibration, kUdAlsGainCalibrationRequest, encodeGainAndItime<sns_oem_gain_calib_req>,
     "Gain calibration...\n", "Gain calibration request failed"},
    {UdAlsMode::kIrGainCalibration, kUdAlsGainCalibrationRequest, encodeGainAndItime<sns_oem_gain_calib_req>,
     "IR Gain calibration...\n", "IR Gain calibration request failed"},
    // "sacling": scripts compare the line.
    {UdAlsMode::kPwm, kUdAlsPwmRequest, encodeGainAndItime<sns_oem_pwm_req>, "Display PWM scaling...\n",
     "Display PWM sacling request failed"},
    {UdAlsMode::kDelay, kUdAlsTriggerRequest, encodeTrigger, "Set ALS delay time...\n",
     "Set ALS delay request failed"},
    {UdAlsMode::kGain, kUdAlsSetGainRequest, encodeGain, "Set gain...\n", "Set gain request failed"},
    {UdAlsMode::kGainThenItime, kUdAlsSetGainItimeRequest, encodeGainAndItime<sns_oem_set_gain_itime_req>,
     kGainItime, kGainItimeFailure},
    {UdAlsMode::kItime, kUdAlsSetItimeRequest, encodeItime, "Set integration time...\n",
     "Set integration time request failed"},
    {UdAlsMode::kItimeThenGain, kUdAlsSetGainItimeRequest, encodeGainAndItime<sns_oem_set_gain_itime_req>,
     kGainItime, kGainItimeFailure},
};

// Responses.

struct ResponseFields {
  bool success = false;
  bool enabled = false;
};

template <class Response>
bool parseResult(const std::string& payload, ResponseFields* fields) {
  Response response;
  if (!response.ParseFromString(payload)) return false;
  fields->success = response.success();
  return true;
}

template <class Response>
bool parseSwitch(const std::string& payload, ResponseFields* fields) {
  Response response;
  if (!response.ParseFromString(payload)) return false;
  fields->success = response.success();
  fields->enabled = response.enabled();
  return true;
}

enum class Task { kSwitch, kSetting };

struct ResponseRow {
  std::uint32_t request;
  bool (*parse)(const std::string& payload, ResponseFields* fields);
  Task kind;
  const char* name;     ///< what is malformed
  const char* task;     ///< what failed; of a switch, what could not be enabled or disabled
  const char* subject;  ///< what a success is said of; null: it is not said
};

constexpr ResponseRow kResponses[] = {
    {kUdAlsTriggerRequest, parseSwitch<sns_oem_als_trigger_resp>, Task::kSwitch, "als trigger", "ALS trigger",
     "ALS trigger"},
    {kUdAlsAutoGainRequest, parseSwitch<sns_oem_auto_gain_resp>, Task::kSwitch, "auto gain", "auto gain",
     "Auto gain"},
    {kUdAlsDelayCalibrationRequest, parseResult<sns_oem_delay_calib_resp>, Task::kSetting,
     "delay calibration", "complete delay calibration", nullptr},
    {kUdAlsGainCalibrationRequest, parseResult<sns_oem_gain_calib_resp>, Task::kSetting, "gain calibration",
     "complete gain calibration", nullptr},
    {kUdAlsPwmRequest, parseResult<sns_oem_pwm_resp>, Task::kSetting, "PWM scaling", "complete PWM scaling",
     "PWM scaling"},
    {kUdAlsSetGainRequest, parseResult<sns_oem_set_gain_resp>, Task::kSetting, "set gain", "set gain",
     "Set gain"},
    {kUdAlsSetItimeRequest, parseResult<sns_oem_set_itime_resp>, Task::kSetting, "set integration time",
     "set integration time", "Set integration time"},
    {kUdAlsSetGainItimeRequest, parseResult<sns_oem_set_gain_itime_resp>, Task::kSetting,
     "set gain & integration time", "set gain & integration time", "Set gain & integration time"},
};

std::string failureText(const ResponseRow& row, bool enabled) {
  const char* const verb = enabled ? "enable " : "disable ";
  return std::string("Failed to ") + (row.kind == Task::kSwitch ? verb : "") + row.task;
}

std::string successText(const ResponseRow& row, bool enabled) {
  if (row.subject == nullptr) return {};
  const char* const state = enabled ? " enabled.\n" : " disabled.\n";
  return std::string(row.subject) + (row.kind == Task::kSwitch ? state : " succeeded.\n");
}

}  // namespace

std::optional<UdAlsRequest> udAlsRequestOf(const UdAlsArguments& arguments) {
  const auto* const row =
      std::find_if(std::begin(kRequests), std::end(kRequests),
                   [&](const RequestRow& candidate) { return candidate.mode == arguments.mode; });
  if (row == std::end(kRequests)) return std::nullopt;
  return UdAlsRequest{row->messageId, row->encode(arguments), row->announcement, row->failure};
}

std::optional<UdAlsResponse> readUdAlsResponse(std::uint32_t messageId, const std::string& payload) {
  const auto* const row =
      std::find_if(std::begin(kResponses), std::end(kResponses),
                   [=](const ResponseRow& candidate) { return candidate.request + 1 == messageId; });
  if (row == std::end(kResponses)) return std::nullopt;
  ResponseFields fields;
  if (!row->parse(payload, &fields)) {
    return UdAlsResponse{UdAlsResponse::Kind::kMalformed,
                         std::string("Received malformed ") + row->name + " response"};
  }
  return fields.success ? UdAlsResponse{UdAlsResponse::Kind::kSucceeded, successText(*row, fields.enabled)}
                        : UdAlsResponse{UdAlsResponse::Kind::kFailed, failureText(*row, fields.enabled)};
}
