#include "simhub/sensors/LightControl.h"

#include <cmath>

#include "proto/sns_oem_als.pb.h"

namespace simhub {
namespace {

constexpr float kShortestIntegrationUs = 2.78F;
constexpr float kLongestIntegrationUs = 182000;

// ---- What requests set; false: it cannot be set. ----

template <class Request>
bool setMode(const Request& request, bool* enabled) {
  *enabled = request.mode() == SNS_OEM_ALS_MODE_ENABLE;
  return *enabled || request.mode() == SNS_OEM_ALS_MODE_DISABLE;
}

template <class Request>
bool setGain(const Request& request, LightControl* control) {
  if (!request.has_gain() || request.gain() > kHighestGain) return false;
  if (request.gain() < 0) return true;
  control->autoGain = false;
  control->gain = request.gain();
  return true;
}

template <class Request>
bool setIntegrationTime(const Request& request, LightControl* control) {
  const float microseconds = request.integration_time_us();
  if (!request.has_integration_time_us() || std::isnan(microseconds)) return false;
  if (microseconds < 0) return true;
  control->integrationUs = microseconds == 0 ? control->ownIntegrationUs : static_cast<double>(microseconds);
  return microseconds == 0 ||
         (microseconds >= kShortestIntegrationUs && microseconds <= kLongestIntegrationUs);
}

template <class Request>
bool setTrigger(const Request& request, LightControl* control) {
  if (!request.has_delay_ms() || !std::isfinite(request.delay_ms())) return false;
  control->triggered = true;
  control->delayMs = static_cast<double>(request.delay_ms());
  return true;
}

// ---- One overload a request. ----

bool set(const sns_oem_als_trigger_req& request, LightControl* control) {
  return setMode(request, &control->triggered) && (!control->triggered || setTrigger(request, control));
}
bool set(const sns_oem_auto_gain_req& request, LightControl* control) {
  return setMode(request, &control->autoGain);
}
bool set(const sns_oem_delay_calib_req& request, LightControl* control) {
  return setGain(request, control) && setIntegrationTime(request, control) && setTrigger(request, control);
}
bool set(const sns_oem_gain_calib_req& request, LightControl* control) {
  return setGain(request, control) && setIntegrationTime(request, control);
}
bool set(const sns_oem_pwm_req& request, LightControl* control) {
  return setGain(request, control) && setIntegrationTime(request, control);
}
bool set(const sns_oem_set_gain_req& request, LightControl* control) { return setGain(request, control); }
bool set(const sns_oem_set_itime_req& request, LightControl* control) {
  return setIntegrationTime(request, control);
}
bool set(const sns_oem_set_gain_itime_req& request, LightControl* control) {
  return setGain(request, control) && setIntegrationTime(request, control);
}

// ---- What an answer says besides success. ----

void report(const LightControl& control, sns_oem_als_trigger_resp* answer) {
  answer->set_enabled(control.triggered);
}
void report(const LightControl& control, sns_oem_auto_gain_resp* answer) {
  answer->set_enabled(control.autoGain);
}
template <class Answer>
void report(const LightControl& /*control*/, Answer* /*answer*/) {}

/// The answer's payload.
template <class Request, class Answer>
std::string handle(const SensorRequest& request, LightControl* control) {
  Request message;
  LightControl wanted = *control;
  const bool done = !request.refuse && message.ParseFromString(request.payload) && set(message, &wanted);
  if (done) *control = wanted;
  Answer answer;
  answer.set_success(done);
  report(*control, &answer);
  return answer.SerializeAsString();
}

struct Row {
  std::uint32_t messageId;
  std::string (*handle)(const SensorRequest& request, LightControl* control);
};
constexpr Row kRows[] = {
    {kAlsTriggerRequest, handle<sns_oem_als_trigger_req, sns_oem_als_trigger_resp>},
    {kAlsAutoGainRequest, handle<sns_oem_auto_gain_req, sns_oem_auto_gain_resp>},
    {kAlsDelayCalibrationRequest, handle<sns_oem_delay_calib_req, sns_oem_delay_calib_resp>},
    {kAlsGainCalibrationRequest, handle<sns_oem_gain_calib_req, sns_oem_gain_calib_resp>},
    {kAlsPwmRequest, handle<sns_oem_pwm_req, sns_oem_pwm_resp>},
    {kAlsSetGainRequest, handle<sns_oem_set_gain_req, sns_oem_set_gain_resp>},
    {kAlsSetIntegrationTimeRequest, handle<sns_oem_set_itime_req, sns_oem_set_itime_resp>},
    {kAlsSetGainAndIntegrationTimeRequest, handle<sns_oem_set_gain_itime_req, sns_oem_set_gain_itime_resp>},
};

}  // namespace

bool controlLight(const SensorRequest& request, LightControl* control, std::vector<SensorAnswer>* answers) {
  for (const Row& row : kRows) {
    if (row.messageId != request.messageId) continue;
    answers->push_back({row.messageId + 1, row.handle(request, control)});
    return true;
  }
  return false;
}

}  // namespace simhub
