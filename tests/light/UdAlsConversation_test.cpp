// Requests, their answers, and samples among them, at moments that a whole run cannot choose.
#include <gmock/gmock.h>

#include "light/UdAlsCommand.h"
#include "ssc/Log.h"

namespace {

using testing::HasSubstr;
using testing::Not;

constexpr int kMalformed = -2147483647;

const std::string kSuccessOn("\x08\x01\x10\x01", 4);
const std::string kFailureOn("\x08\x00\x10\x01", 4);
const std::string kNonsense("\x08", 1);

class UdAlsConversation : public UdAlsCommand {
 protected:
  void TearDown() override { ssc::setLogLevel(ssc::kLogInfo); }

  static std::string encoded(float lux) { return encodeReading(reading(lux)); }
};

TEST_F(UdAlsConversation, TheAnswerEndsTheWait) {
  answerWith(7800, {{7801, kSuccessOn}});
  const Captured captured = run({"trigger", "enable", "5"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_EQ(captured.out,
            "Searching for ambient light sensor...\nEnabling ALS TRIGGER...\nALS trigger enabled.\n");
  EXPECT_EQ(captured.err, "");
  EXPECT_EQ(elapsed(), Milliseconds(10));
  EXPECT_EQ(script->countRequests(light, kStream), 0);
}

TEST_F(UdAlsConversation, ARefusalIsLoggedAndNoFailure) {
  answerWith(7800, {{7801, kFailureOn}});
  const Captured captured = run({"trigger", "disable"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_EQ(captured.err, "ERROR: Failed to enable ALS trigger\n");
}

TEST_F(UdAlsConversation, ANonsensicalAnswerIsTheResult) {
  answerWith(7810, {{7811, kNonsense}});
  const Captured captured = run({"gain", "3"});
  EXPECT_EQ(captured.result, kMalformed);
  EXPECT_EQ(captured.err, "ERROR: Received malformed set gain response\nERROR: Set gain request failed\n");
}

struct SilentCase {
  std::vector<const char*> words;
  std::uint32_t request;
  const char* failure;
};

TEST_F(UdAlsConversation, SilenceAfterEachRequestIsATimeOut) {
  const SilentCase cases[] = {
      {{"trigger"}, 7800, "ALS TRIGGER request failed"},
      {{"autogain", "enable"}, 7802, "Auto gain request failed"},
      {{"caldelay", "100", "3", "0", "5", "1"}, 7804, "Delay calibration request failed"},
      {{"calgain", "100", "3"}, 7806, "Gain calibration request failed"},
      {{"calgain", "ir", "100", "3"}, 7806, "IR Gain calibration request failed"},
      {{"pwm", "100", "3", "128"}, 7808, "Display PWM sacling request failed"},
      {{"delay", "5"}, 7800, "Set ALS delay request failed"},
      {{"gain", "3"}, 7810, "Set gain request failed"},
      {{"itime", "100"}, 7812, "Set integration time request failed"},
      {{"gain", "3", "itime", "100"}, 7814, "Set gain and integration time request failed"},
      {{"itime", "100", "gain", "3"}, 7814, "Set gain and integration time request failed"},
  };
  for (const SilentCase& row : cases) {
    staySilent(row.request);
    const Captured captured = run(row.words);
    EXPECT_EQ(captured.result, -110) << row.failure;
    EXPECT_EQ(captured.err, std::string("ERROR: ") + row.failure + '\n');
    EXPECT_EQ(elapsed(), Milliseconds(3000)) << row.failure;
    // No closing line either: nothing has been calibrated yet.
    EXPECT_THAT(captured.out, Not(HasSubstr("failed"))) << row.failure;
  }
}

TEST_F(UdAlsConversation, ARequestThatTheHubRefusesIsTheResult) {
  script->refuses = [](const sns_client_request_msg& request) { return request.msg_id() == 7812; };
  answers.erase(7812);
  const Captured captured = run({"itime", "100"});
  EXPECT_EQ(captured.result, -5);
  EXPECT_THAT(captured.err, HasSubstr("ERROR: Set integration time request failed\n"));
}

TEST_F(UdAlsConversation, TheIdOfARequestIsNoAnswer) {
  answerWith(7802, {{7802, kSuccessOn}, {7804, kSuccessOn}, {7816, kSuccessOn}});
  EXPECT_EQ(run({"autogain"}).result, -110);
}

TEST_F(UdAlsConversation, AnyAnswerEndsTheWait) {
  // The hub brings only what this client asked for: which answer it is does not matter.
  answerWith(7802, {{7811, kSuccessOn}});
  const Captured captured = run({"autogain"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_THAT(captured.out, HasSubstr("Set gain succeeded.\n"));
}

TEST_F(UdAlsConversation, SamplesBeforeTheAnswerAreTakenFirst) {
  answerWith(7810, {{1025, encoded(1)}, {7811, kSuccessOn}});
  const Captured captured = run({"gain", "3"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_THAT(captured.out, HasSubstr("Set gain succeeded.\n"));
}

TEST_F(UdAlsConversation, ASampleThatIsTheLastNeededHidesTheAnswerBehindIt) {
  answerWith(7810, {{1025, encoded(1)}, {7811, kSuccessOn}});
  const Captured captured = run({"-s", "1", "gain", "3"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_THAT(captured.out, Not(HasSubstr("Set gain succeeded.\n")));
  EXPECT_EQ(elapsed(), Milliseconds(10));
}

TEST_F(UdAlsConversation, AMalformedSampleHidesTheAnswerBehindIt) {
  answerWith(7810, {{1025, kNonsense}, {7811, kSuccessOn}});
  const Captured captured = run({"gain", "3"});
  EXPECT_EQ(captured.result, kMalformed);
  EXPECT_EQ(captured.err, "ERROR: Received malformed sensor event\nERROR: Set gain request failed\n");
  EXPECT_THAT(captured.out, Not(HasSubstr("Set gain succeeded.\n")));
}

TEST_F(UdAlsConversation, WhatFollowsTheAnswerIsLeftAlone) {
  answerWith(7810, {{7811, kSuccessOn}, {7811, kSuccessOn}, {1025, kNonsense}});
  const Captured captured = run({"gain", "3"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_EQ(captured.out, "Searching for ambient light sensor...\nSet gain...\nSet gain succeeded.\n");
}

TEST_F(UdAlsConversation, SamplesOfAStepBeforeDoNotPassForAnAnswer) {
  // Of the second step's request: the stream of the first still brings a sample before the sensor is silent.
  int request = 0;
  answers[7804] = [&](ScriptedHub& hub) {
    if (++request == 1) return hub.SendMessage(Milliseconds(10), messageOf({{7805, kSuccessOn}}));
    hub.SendReading(Milliseconds(10), light, reading(1));
  };
  const Captured captured = run({"-s", "3", "caldelay", "100", "3", "1", "2", "1"});
  EXPECT_EQ(captured.result, -110);
  EXPECT_THAT(captured.err, HasSubstr("Delay calibration request failed"));
}

TEST_F(UdAlsConversation, AHubThatGoesAwayBeforeTheAnswerIsNotAskedToStream) {
  answers[7810] = [](ScriptedHub& hub) { hub.GoAwayAndReturn(Milliseconds(10), Milliseconds(100)); };
  const Captured captured = run({"gain", "3"});
  EXPECT_EQ(captured.result, -110);
  EXPECT_EQ(script->countRequests(light, kStream), 0);
  EXPECT_THAT(captured.err, HasSubstr("Set gain request failed"));
}

TEST_F(UdAlsConversation, AHubThatComesBackWhileSamplesAreTakenStreamsAgain) {
  script->sensors[0].reading = [](int index) { return reading(static_cast<float>(index)); };
  int streams = 0;
  const auto answerRequests = script->onRequest;
  script->onRequest = [&, answerRequests](ScriptedHub& hub, const sns_client_request_msg& request) {
    if (request.msg_id() == kStream && ++streams == 1) {
      hub.GoAwayAndReturn(Milliseconds(500), Milliseconds(100));
    }
    return answerRequests(hub, request);
  };
  const Captured captured = run({"sample"});
  EXPECT_EQ(captured.result, 0) << captured.err;
  EXPECT_EQ(streams, 2);
}

// Samples.

TEST_F(UdAlsConversation, EventsOfAnotherSensorDoNotCount) {
  answers[kStream] = [this](ScriptedHub& hub) {
    for (int i = 1; i <= 20; ++i) hub.SendReading(Milliseconds(i), {9, 9}, reading(7));
    for (int i = 1; i <= 10; ++i) hub.SendReading(Milliseconds(100 + i), light, reading(50));
  };
  globals.quiet = false;
  const Captured captured = run({"sample"});
  EXPECT_EQ(captured.result, 0) << captured.err;
  EXPECT_THAT(captured.out, HasSubstr("LUX_MEAN:       50.000000\n"));
  EXPECT_THAT(captured.out, Not(HasSubstr("7.000000")));  // nor are they printed
  EXPECT_EQ(elapsed(), Milliseconds(110));
}

TEST_F(UdAlsConversation, OnlyTheFirstEightValuesCount) {
  answers[kStream] = [this](ScriptedHub& hub) {
    std::vector<float> longer = reading(50);
    longer.insert(longer.end(), {1e9F, 2e9F});
    for (int i = 1; i <= 10; ++i) hub.SendReading(Milliseconds(i), light, longer);
  };
  globals.quiet = false;
  const Captured captured = run({"100"});
  EXPECT_EQ(captured.result, 0) << captured.err;
  EXPECT_EQ(content(kDataFile).size(), 48U);
  EXPECT_THAT(captured.out, HasSubstr("    1000.000000\n"));
  EXPECT_THAT(captured.out, Not(HasSubstr("1000000000.000000")));
}

TEST_F(UdAlsConversation, EventsOfFewerThanEightValuesAreDroppedAndOnceSaid) {
  answers[kStream] = [this](ScriptedHub& hub) {
    for (int i = 1; i <= 5; ++i) hub.SendReading(Milliseconds(i), light, {1, 2, 3, 4, 5, 6, 7});
    for (int i = 6; i <= 15; ++i) hub.SendReading(Milliseconds(i), light, reading(50));
  };
  const Captured captured = run({"sample"});
  EXPECT_EQ(captured.result, 0) << captured.err;
  EXPECT_THAT(captured.out, HasSubstr("LUX_MEAN:       50.000000\n"));
  EXPECT_THAT(
      captured.out,
      HasSubstr("WARN: Dropping Ambient Light events with fewer than 8 values (this is said once)\n"));
}

TEST_F(UdAlsConversation, ALateAnswerThatEndsACollectionIsNoSample) {
  answers[kStream] = [this](ScriptedHub& hub) {
    hub.SendMessage(Milliseconds(10), messageOf({{7811, kSuccessOn}}));
  };
  const Captured none = run({"sample"});
  EXPECT_EQ(none.result, -61);
  EXPECT_THAT(none.err, HasSubstr("No Ambient Light samples were received"));

  answers[kStream] = [this](ScriptedHub& hub) {
    hub.SendMessage(Milliseconds(10),
                    messageOf({{1025, encoded(1)}, {1025, encoded(2)}, {7811, kSuccessOn}}));
  };
  const Captured some = run({"sample"});
  EXPECT_EQ(some.result, -61);
  EXPECT_THAT(some.err, HasSubstr("Only 2 of 10 light sensor samples were received"));
}

TEST_F(UdAlsConversation, SamplesArePrintedAtOnceAtTheHighestLevel) {
  answers[kStream] = [this](ScriptedHub& hub) { hub.SendReading(Milliseconds(20), light, reading(50)); };
  const std::string line =
      "      50.000000      10.000000      20.000000      30.000000      40.000000       5.000000       "
      "8.000000"
      "    1000.000000\n";
  globals.quiet = false;
  const auto count = [&](const std::string& text) {
    std::size_t times = 0;
    for (std::size_t at = text.find(line); at != std::string::npos; at = text.find(line, at + 1)) ++times;
    return times;
  };
  ssc::setLogLevel(ssc::kLogDebug);
  EXPECT_EQ(count(run({"-s", "1", "sample"}).out), 1U);
  ssc::setLogLevel(ssc::kLogVerbose);
  EXPECT_EQ(count(run({"-s", "1", "sample"}).out), 2U);
  globals.quiet = true;
  EXPECT_EQ(count(run({"-s", "1", "sample"}).out), 0U);
}

TEST_F(UdAlsConversation, TracesItsHandlerAndTheAnswer) {
  ssc::setLogLevel(ssc::kLogVerbose);
  const Captured captured = run({"gain", "3"});
  EXPECT_THAT(captured.out, HasSubstr("virtual void UdAlsCalibrator::OnEvent(const sns_client_event_msg &)"));
  EXPECT_THAT(captured.out, HasSubstr("DEBUG: Got a response\nSet gain succeeded.\n"));
}

TEST_F(UdAlsConversation, ASampleOfLowAccuracyIsDroppedAndSaidAtDebugLevel) {
  ssc::setLogLevel(ssc::kLogDebug);
  script->sensors[0].status = SNS_STD_SENSOR_SAMPLE_STATUS_ACCURACY_MEDIUM;
  const Captured captured = run({"-s", "1", "sample"});
  EXPECT_EQ(captured.result, -110);
  EXPECT_THAT(captured.out, HasSubstr("DEBUG: Dropping ALS sample (50.000)\n"));
  EXPECT_EQ(captured.err, "ERROR: Timed out waiting for light sensor samples\n");
}

}  // namespace
