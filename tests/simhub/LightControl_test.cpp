#include "simhub/sensors/LightControl.h"

#include <limits>

#include <gtest/gtest.h>

#include "proto/sns_oem_als.pb.h"
#include "simhub/Protocol.h"

namespace {

constexpr float kNan = std::numeric_limits<float>::quiet_NaN();
constexpr float kInfinity = std::numeric_limits<float>::infinity();

struct Control : simhub::LightControl {
  Control() { ownIntegrationUs = integrationUs = 1000; }
};

/// What the sensor answers: nothing when it is no request of its own.
std::optional<simhub::SensorAnswer> ask(simhub::LightControl* control, std::uint32_t messageId,
                                        const std::string& payload, bool refuse = false) {
  std::vector<simhub::SensorAnswer> answers;
  const bool known = simhub::controlLight({simhub::Time{0}, messageId, payload, refuse}, control, &answers);
  EXPECT_EQ(answers.size(), known ? 1U : 0U);
  if (answers.empty()) return std::nullopt;
  return answers.front();
}

/// Whether the request succeeded, in an answer of the next message id.
template <class Answer>
bool succeeds(simhub::LightControl* control, std::uint32_t messageId, const std::string& payload,
              bool refuse = false) {
  const auto answer = ask(control, messageId, payload, refuse);
  Answer decoded;
  EXPECT_TRUE(answer && answer->messageId == messageId + 1);
  EXPECT_TRUE(answer && decoded.ParseFromString(answer->payload) && decoded.has_success());
  return decoded.success();
}

sns_oem_als_trigger_resp trigger(simhub::LightControl* control, int mode, float delay, bool refuse = false) {
  sns_oem_als_trigger_req request;
  request.set_mode(mode);
  request.set_delay_ms(delay);
  sns_oem_als_trigger_resp answer;
  EXPECT_TRUE(answer.ParseFromString(
      ask(control, simhub::kAlsTriggerRequest, request.SerializeAsString(), refuse)->payload));
  return answer;
}

sns_oem_auto_gain_resp autoGain(simhub::LightControl* control, int mode, bool refuse = false) {
  sns_oem_auto_gain_req request;
  request.set_mode(mode);
  sns_oem_auto_gain_resp answer;
  EXPECT_TRUE(answer.ParseFromString(
      ask(control, simhub::kAlsAutoGainRequest, request.SerializeAsString(), refuse)->payload));
  return answer;
}

std::string gainPayload(int gain) {
  sns_oem_set_gain_req request;
  request.set_gain(gain);
  return request.SerializeAsString();
}

bool setGain(simhub::LightControl* control, int gain, bool refuse = false) {
  return succeeds<sns_oem_set_gain_resp>(control, simhub::kAlsSetGainRequest, gainPayload(gain), refuse);
}

bool setIntegrationTime(simhub::LightControl* control, float microseconds) {
  sns_oem_set_itime_req request;
  request.set_integration_time_us(microseconds);
  return succeeds<sns_oem_set_itime_resp>(control, simhub::kAlsSetIntegrationTimeRequest,
                                          request.SerializeAsString());
}

template <class Request>
std::string both(int gain, float microseconds) {
  Request request;
  request.set_gain(gain);
  request.set_integration_time_us(microseconds);
  return request.SerializeAsString();
}

TEST(LightControl, StartsTriggeredWithAutomaticGain) {
  const simhub::LightControl control;
  EXPECT_TRUE(control.triggered);
  EXPECT_TRUE(control.autoGain);
  EXPECT_LT(control.delayMs, 0) << "the registry's";
}

TEST(LightControl, TriggerIsSwitchedOffAndOnWithADelay) {
  Control control;
  const auto off = trigger(&control, SNS_OEM_ALS_MODE_DISABLE, 0);
  EXPECT_TRUE(off.success());
  EXPECT_FALSE(off.enabled());
  EXPECT_FALSE(control.triggered);
  const auto on = trigger(&control, SNS_OEM_ALS_MODE_ENABLE, 4.5F);
  EXPECT_TRUE(on.success());
  EXPECT_TRUE(on.enabled());
  EXPECT_TRUE(control.triggered);
  EXPECT_EQ(control.delayMs, 4.5);
}

TEST(LightControl, RefusedTriggerAnswersTheStateThatStaysInForce) {
  Control control;
  const auto refused = trigger(&control, SNS_OEM_ALS_MODE_DISABLE, 0, true);
  EXPECT_FALSE(refused.success());
  EXPECT_TRUE(refused.enabled());
  EXPECT_TRUE(control.triggered);
}

TEST(LightControl, TriggerNeedsAModeAndAFiniteDelay) {
  Control control;
  EXPECT_FALSE(trigger(&control, 0, 4).success());
  EXPECT_FALSE(trigger(&control, 3, 4).success());
  EXPECT_FALSE(trigger(&control, SNS_OEM_ALS_MODE_ENABLE, kNan).success());
  EXPECT_FALSE(trigger(&control, SNS_OEM_ALS_MODE_ENABLE, kInfinity).success());
  EXPECT_LT(control.delayMs, 0);
  EXPECT_TRUE(control.triggered);
}

TEST(LightControl, AutomaticGainIsSwitchedOffAndOn) {
  Control control;
  control.gain = 7;
  const auto off = autoGain(&control, SNS_OEM_ALS_MODE_DISABLE);
  EXPECT_TRUE(off.success());
  EXPECT_FALSE(off.enabled());
  EXPECT_FALSE(control.autoGain);
  EXPECT_EQ(control.gain, 7) << "the setting that it had taken stays";
  EXPECT_TRUE(autoGain(&control, SNS_OEM_ALS_MODE_ENABLE).enabled());
  EXPECT_TRUE(control.autoGain);
  const auto refused = autoGain(&control, SNS_OEM_ALS_MODE_DISABLE, true);
  EXPECT_FALSE(refused.success());
  EXPECT_TRUE(refused.enabled());
}

TEST(LightControl, GainIsSetFrom0To11AndEndsAutomaticGain) {
  for (const int gain : {0, 11}) {
    Control control;
    EXPECT_TRUE(setGain(&control, gain));
    EXPECT_EQ(control.gain, gain);
    EXPECT_FALSE(control.autoGain);
  }
}

TEST(LightControl, GainAbove11IsRefusedAndChangesNothing) {
  Control control;
  EXPECT_FALSE(setGain(&control, 12));
  EXPECT_TRUE(control.autoGain);
  EXPECT_EQ(control.gain, 11);
}

TEST(LightControl, NegativeGainLeavesWhatIsInForce) {
  Control control;
  EXPECT_TRUE(setGain(&control, -1));
  EXPECT_TRUE(control.autoGain);
  EXPECT_TRUE(setGain(&control, 3));
  EXPECT_TRUE(setGain(&control, -1));
  EXPECT_EQ(control.gain, 3);
}

TEST(LightControl, IntegrationTimeIsSetWithinItsLimits) {
  Control control;
  EXPECT_TRUE(setIntegrationTime(&control, 2.78F));
  EXPECT_FLOAT_EQ(static_cast<float>(control.integrationUs), 2.78F);
  EXPECT_TRUE(setIntegrationTime(&control, 182000));
  EXPECT_EQ(control.integrationUs, 182000);
  for (const float refused : {2.77F, 182001.0F, kNan, kInfinity}) {
    EXPECT_FALSE(setIntegrationTime(&control, refused)) << refused;
    EXPECT_EQ(control.integrationUs, 182000);
  }
}

TEST(LightControl, IntegrationTimeOf0IsTheSensorsOwnAndANegativeOneLeavesWhatIsInForce) {
  Control control;
  EXPECT_TRUE(setIntegrationTime(&control, 500));
  EXPECT_TRUE(setIntegrationTime(&control, -1));
  EXPECT_EQ(control.integrationUs, 500);
  EXPECT_TRUE(setIntegrationTime(&control, 0));
  EXPECT_EQ(control.integrationUs, 1000);
}

TEST(LightControl, GainAndIntegrationTimeAreSetTogetherOrNotAtAll) {
  Control control;
  EXPECT_TRUE(succeeds<sns_oem_set_gain_itime_resp>(&control, simhub::kAlsSetGainAndIntegrationTimeRequest,
                                                    both<sns_oem_set_gain_itime_req>(9, 200)));
  EXPECT_EQ(control.gain, 9);
  EXPECT_EQ(control.integrationUs, 200);
  EXPECT_FALSE(succeeds<sns_oem_set_gain_itime_resp>(&control, simhub::kAlsSetGainAndIntegrationTimeRequest,
                                                     both<sns_oem_set_gain_itime_req>(8, 1e6F)));
  EXPECT_EQ(control.gain, 9);
  EXPECT_EQ(control.integrationUs, 200);
}

TEST(LightControl, CalibrationsOfGainAndPulsesSetGainAndIntegrationTime) {
  Control gain;
  EXPECT_TRUE(succeeds<sns_oem_gain_calib_resp>(&gain, simhub::kAlsGainCalibrationRequest,
                                                both<sns_oem_gain_calib_req>(8, 300)));
  EXPECT_EQ(gain.gain, 8);
  EXPECT_EQ(gain.integrationUs, 300);
  Control pulses;
  EXPECT_TRUE(succeeds<sns_oem_pwm_resp>(&pulses, simhub::kAlsPwmRequest, both<sns_oem_pwm_req>(10, 400)));
  EXPECT_EQ(pulses.gain, 10);
  EXPECT_EQ(pulses.integrationUs, 400);
}

TEST(LightControl, DelayCalibrationTriggersAfterItsDelay) {
  Control control;
  control.triggered = false;
  sns_oem_delay_calib_req request;
  request.set_gain(10);
  request.set_integration_time_us(150);
  request.set_delay_ms(3.25F);
  EXPECT_TRUE(succeeds<sns_oem_delay_calib_resp>(&control, simhub::kAlsDelayCalibrationRequest,
                                                 request.SerializeAsString()));
  EXPECT_TRUE(control.triggered);
  EXPECT_EQ(control.delayMs, 3.25);
  EXPECT_EQ(control.gain, 10);
  EXPECT_EQ(control.integrationUs, 150);
}

TEST(LightControl, RequestsWithoutTheirNumbersAreRefused) {
  Control control;
  EXPECT_FALSE(succeeds<sns_oem_set_gain_resp>(&control, simhub::kAlsSetGainRequest, ""));
  EXPECT_FALSE(succeeds<sns_oem_set_itime_resp>(&control, simhub::kAlsSetIntegrationTimeRequest, ""));
  EXPECT_FALSE(succeeds<sns_oem_delay_calib_resp>(&control, simhub::kAlsDelayCalibrationRequest,
                                                  both<sns_oem_delay_calib_req>(5, 100)));
  EXPECT_TRUE(control.autoGain);
}

TEST(LightControl, WhatCannotBeDecodedIsRefused) {
  Control control;
  EXPECT_FALSE(succeeds<sns_oem_set_gain_resp>(&control, simhub::kAlsSetGainRequest, "\xff\xff"));
  EXPECT_TRUE(control.autoGain);
}

TEST(LightControl, RefusesOnDemand) {
  Control control;
  EXPECT_FALSE(setGain(&control, 5, true));
  EXPECT_TRUE(control.autoGain);
}

TEST(LightControl, KnowsNoOtherRequests) {
  Control control;
  for (const std::uint32_t id : {7799U, 7801U, 7815U, 7816U}) EXPECT_FALSE(ask(&control, id, "")) << id;
}

}  // namespace
