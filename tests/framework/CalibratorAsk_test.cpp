// Asking a sensor one thing and waiting for the event that answers.
#include <gtest/gtest.h>

#include "framework/PlainCalibrator.h"
#include "support/Capture.h"
#include "support/ScriptedHub.h"

namespace {

using std::chrono::milliseconds;
using std::chrono::seconds;

constexpr std::uint32_t kRequest = 778;
constexpr std::uint32_t kAnswer = 779;

class CalibratorAsk : public testing::Test {
 protected:
  CalibratorAsk() {
    script->sensors = {{sensor, "sar", "chipa"}};
    connection = connectTo(script);
    calibrator = std::make_unique<PlainCalibrator>(connection.get());
    calibrator->onOtherEvent = [this](std::uint32_t messageId) {
      awaitedAtEvent = calibrator->awaitsAnswer;
      return messageId == kAnswer;
    };
  }

  /// Lets the sensor answer with an event of this id so much later.
  void answerWith(std::uint32_t messageId, milliseconds delay) {
    script->onRequest = [this, messageId, delay](ScriptedHub& hub, const sns_client_request_msg& request) {
      if (request.msg_id() != kRequest) return false;
      hub.SendEvent(delay, sensor, messageId, "");
      return true;
    };
  }

  Captured ask() {
    sns_client_request_msg request = ssc::Client::MakeRequest(sensor);
    request.set_msg_id(kRequest);
    return capture([&] { return calibrator->AskSensor(request); });
  }

  [[nodiscard]] milliseconds elapsed() const {
    return std::chrono::duration_cast<milliseconds>(connection->clock().now().time_since_epoch());
  }

  const ssc::SensorUid sensor{1, 1};
  bool awaitedAtEvent = false;
  std::shared_ptr<HubScript> script = std::make_shared<HubScript>();
  std::unique_ptr<ssc::Connection> connection;
  std::unique_ptr<PlainCalibrator> calibrator;
};

TEST_F(CalibratorAsk, EndsWithTheAnswer) {
  answerWith(kAnswer, milliseconds(20));
  const Captured captured = ask();
  EXPECT_EQ(captured.result, 0);
  EXPECT_EQ(captured.out + captured.err, "");
  EXPECT_EQ(elapsed(), milliseconds(20));
  EXPECT_EQ(script->requestIdsTo(sensor), std::vector<std::uint32_t>({kRequest}));
}

TEST_F(CalibratorAsk, TheAnswerIsAwaitedMeanwhileOnly) {
  EXPECT_FALSE(calibrator->awaitsAnswer);
  answerWith(kAnswer, milliseconds(20));
  ask();
  EXPECT_TRUE(awaitedAtEvent);
  EXPECT_FALSE(calibrator->awaitsAnswer);
}

TEST_F(CalibratorAsk, WithoutAnAnswerTimesOutAfterThreeSecondsInSilence) {
  answerWith(kAnswer + 1, milliseconds(20));
  const Captured captured = ask();
  EXPECT_EQ(captured.result, -110);
  EXPECT_EQ(captured.out + captured.err, "");
  EXPECT_EQ(elapsed(), seconds(3));
  EXPECT_FALSE(calibrator->awaitsAnswer);
}

TEST_F(CalibratorAsk, ARefusedRequestIsTheResultAtOnce) {
  script->refuses = [](const sns_client_request_msg&) { return true; };
  const Captured captured = ask();
  EXPECT_EQ(captured.result, -5);
  EXPECT_EQ(captured.out + captured.err, "");
  EXPECT_EQ(elapsed(), milliseconds(0));
  EXPECT_FALSE(calibrator->awaitsAnswer);
}

TEST_F(CalibratorAsk, TheResultOfAnEarlierWaitIsForgotten) {
  answerWith(1025, milliseconds(20));
  EXPECT_EQ(ask().result, -2147483647);  // an empty payload is no reading
  answerWith(kAnswer, milliseconds(20));
  EXPECT_EQ(ask().result, 0);
}

TEST_F(CalibratorAsk, SamplesOfAnEarlierCollectionAreDropped) {
  calibrator->samples[sensor].emplace_back();
  answerWith(kAnswer, milliseconds(20));
  ask();
  EXPECT_TRUE(calibrator->samples.empty());
}

}  // namespace
