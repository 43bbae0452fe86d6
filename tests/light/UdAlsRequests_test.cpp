#include "light/UdAlsRequests.h"

#include <gtest/gtest.h>

#include "proto/sns_oem_als.pb.h"

namespace {

using Kind = UdAlsResponse::Kind;

UdAlsArguments settings(UdAlsMode mode) {
  UdAlsArguments arguments;
  arguments.mode = mode;
  arguments.gain = 7;
  arguments.integrationTime = 100.5F;
  arguments.alsDelay = 5.25F;
  return arguments;
}

// Requests.

struct RequestCase {
  UdAlsMode mode;
  std::uint32_t messageId;
  std::string payload;
  const char* announcement;
  const char* failure;
};

/// Payloads byte by byte: what the sensor's driver reads.
const std::string kOff("\x08\x02", 2);
const std::string kOn("\x08\x01", 2);
const std::string kTriggerOff("\x08\x02\x15\0\0\0\0", 7);
const std::string kTriggerOn("\x08\x01\x15\0\0\xa8\x40", 7);  // 5.25
const std::string kGain("\x08\x07", 2);
const std::string kItime("\x0d\0\0\xc9\x42", 5);  // 100.5
const std::string kGainAndItime("\x08\x07\x15\0\0\xc9\x42", 7);
const std::string kGainItimeAndDelay("\x08\x07\x15\0\0\xc9\x42\x1d\0\0\xa8\x40", 12);

TEST(UdAlsRequest, OfEachMode) {
  const RequestCase cases[] = {
      {UdAlsMode::kTrigger, 7800, kTriggerOff, "Disabling ALS TRIGGER...\n", "ALS TRIGGER request failed"},
      {UdAlsMode::kTriggerDisable, 7800, kTriggerOff, "Disabling ALS TRIGGER...\n",
       "ALS TRIGGER request failed"},
      {UdAlsMode::kTriggerEnable, 7800, kTriggerOn, "Enabling ALS TRIGGER...\n",
       "ALS TRIGGER request failed"},
      {UdAlsMode::kAutoGain, 7802, kOff, "Disabling Auto gain...\n", "Auto gain request failed"},
      {UdAlsMode::kAutoGainDisable, 7802, kOff, "Disabling Auto gain...\n", "Auto gain request failed"},
      {UdAlsMode::kAutoGainEnable, 7802, kOn, "Enabling Auto gain...\n", "Auto gain request failed"},
      {UdAlsMode::kDelayCalibration, 7804, kGainItimeAndDelay, "", "Delay calibration request failed"},
      {UdAlsMode::kTe2DelayCalibration, 7804, kGainItimeAndDelay, "", "Delay calibration request failed"},
      {UdAlsMode::kGainCalibration, 7806, kGainAndItime, "Gain calibration...\n",
       "Gain calibration request failed"},
      {UdAlsMode::kIrGainCalibration, 7806, kGainAndItime, "IR Gain calibration...\n",
       "IR Gain calibration request failed"},
      {UdAlsMode::kPwm, 7808, kGainAndItime, "Display PWM scaling...\n",
       "Display PWM sacling request failed"},
      {UdAlsMode::kDelay, 7800, kTriggerOn, "Set ALS delay time...\n", "Set ALS delay request failed"},
      {UdAlsMode::kGain, 7810, kGain, "Set gain...\n", "Set gain request failed"},
      {UdAlsMode::kGainThenItime, 7814, kGainAndItime, "Set gain and integration time...\n",
       "Set gain and integration time request failed"},
      {UdAlsMode::kItime, 7812, kItime, "Set integration time...\n", "Set integration time request failed"},
      {UdAlsMode::kItimeThenGain, 7814, kGainAndItime, "Set gain and integration time...\n",
       "Set gain and integration time request failed"},
  };
  for (const RequestCase& row : cases) {
    const auto request = udAlsRequestOf(settings(row.mode));
    ASSERT_TRUE(request.has_value()) << row.failure;
    EXPECT_EQ(request->messageId, row.messageId) << row.failure;
    EXPECT_EQ(request->payload, row.payload) << row.failure;
    EXPECT_STREQ(request->announcement, row.announcement);
    EXPECT_STREQ(request->failure, row.failure);
  }
}

TEST(UdAlsRequest, ModesThatOnlyReadTheStreamOrTheDisplayHaveNone) {
  for (const UdAlsMode mode :
       {UdAlsMode::kLux, UdAlsMode::kSample, UdAlsMode::kPattern, UdAlsMode::kSetTe2}) {
    EXPECT_FALSE(udAlsRequestOf(settings(mode)).has_value());
  }
}

TEST(UdAlsRequest, WhatWasNotGivenIsSentAsMinusOne) {
  UdAlsArguments arguments;
  arguments.mode = UdAlsMode::kTriggerEnable;
  sns_oem_als_trigger_req trigger;
  ASSERT_TRUE(trigger.ParseFromString(udAlsRequestOf(arguments)->payload));
  EXPECT_EQ(trigger.mode(), 1);
  EXPECT_EQ(trigger.delay_ms(), -1.0F);

  arguments.mode = UdAlsMode::kIrGainCalibration;
  sns_oem_gain_calib_req gain;
  ASSERT_TRUE(gain.ParseFromString(udAlsRequestOf(arguments)->payload));
  EXPECT_EQ(gain.gain(), -1);
  EXPECT_EQ(gain.integration_time_us(), -1.0F);
}

// Responses.

const std::string kSuccessOn("\x08\x01\x10\x01", 4);
const std::string kSuccessOff("\x08\x01\x10\x00", 4);
const std::string kFailureOn("\x08\x00\x10\x01", 4);
const std::string kFailureOff("\x08\x00\x10\x00", 4);
const std::string kSuccess("\x08\x01", 2);
const std::string kFailure("\x08\x00", 2);
const std::string kNonsense("\x08", 1);

struct ResponseCase {
  std::uint32_t messageId;
  std::string payload;
  Kind kind;
  const char* text;
};

TEST(UdAlsResponse, OfEachRequest) {
  const ResponseCase cases[] = {
      {7801, kSuccessOn, Kind::kSucceeded, "ALS trigger enabled.\n"},
      {7801, kSuccessOff, Kind::kSucceeded, "ALS trigger disabled.\n"},
      {7801, kFailureOn, Kind::kFailed, "Failed to enable ALS trigger"},
      {7801, kFailureOff, Kind::kFailed, "Failed to disable ALS trigger"},
      {7801, kNonsense, Kind::kMalformed, "Received malformed als trigger response"},
      {7803, kSuccessOn, Kind::kSucceeded, "Auto gain enabled.\n"},
      {7803, kSuccessOff, Kind::kSucceeded, "Auto gain disabled.\n"},
      {7803, kFailureOn, Kind::kFailed, "Failed to enable auto gain"},
      {7803, kFailureOff, Kind::kFailed, "Failed to disable auto gain"},
      {7803, kNonsense, Kind::kMalformed, "Received malformed auto gain response"},
      {7805, kSuccess, Kind::kSucceeded, ""},
      {7805, kFailure, Kind::kFailed, "Failed to complete delay calibration"},
      {7805, kNonsense, Kind::kMalformed, "Received malformed delay calibration response"},
      {7807, kSuccess, Kind::kSucceeded, ""},
      {7807, kFailure, Kind::kFailed, "Failed to complete gain calibration"},
      {7807, kNonsense, Kind::kMalformed, "Received malformed gain calibration response"},
      {7809, kSuccess, Kind::kSucceeded, "PWM scaling succeeded.\n"},
      {7809, kFailure, Kind::kFailed, "Failed to complete PWM scaling"},
      {7809, kNonsense, Kind::kMalformed, "Received malformed PWM scaling response"},
      {7811, kSuccess, Kind::kSucceeded, "Set gain succeeded.\n"},
      {7811, kFailure, Kind::kFailed, "Failed to set gain"},
      {7811, kNonsense, Kind::kMalformed, "Received malformed set gain response"},
      {7813, kSuccess, Kind::kSucceeded, "Set integration time succeeded.\n"},
      {7813, kFailure, Kind::kFailed, "Failed to set integration time"},
      {7813, kNonsense, Kind::kMalformed, "Received malformed set integration time response"},
      {7815, kSuccess, Kind::kSucceeded, "Set gain & integration time succeeded.\n"},
      {7815, kFailure, Kind::kFailed, "Failed to set gain & integration time"},
      {7815, kNonsense, Kind::kMalformed, "Received malformed set gain & integration time response"},
  };
  for (const ResponseCase& row : cases) {
    const auto response = readUdAlsResponse(row.messageId, row.payload);
    ASSERT_TRUE(response.has_value()) << row.messageId;
    EXPECT_EQ(response->kind, row.kind) << row.messageId << ' ' << row.text;
    EXPECT_EQ(response->text, row.text) << row.messageId;
  }
}

TEST(UdAlsResponse, ThatSaysNothingIsAFailure) {
  EXPECT_EQ(readUdAlsResponse(7801, "")->text, "Failed to disable ALS trigger");
  EXPECT_EQ(readUdAlsResponse(7815, "")->kind, Kind::kFailed);
}

TEST(UdAlsResponse, OtherIdsAreNone) {
  for (std::uint32_t id = 7800; id <= 7816; id += 2) EXPECT_FALSE(readUdAlsResponse(id, kSuccess)) << id;
  for (const std::uint32_t id : {0U, 1U, 128U, 1025U, 1110U, 7799U, 7817U}) {
    EXPECT_FALSE(readUdAlsResponse(id, kSuccess)) << id;
  }
}

}  // namespace
