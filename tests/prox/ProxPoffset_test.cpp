// What needs a hub that behaves oddly at a chosen moment, or two runs of one command. Whole runs are golden
// cases.
#include "prox/ProxPoffset.h"

#include "prox/OffsetCommandTest.h"
#include "ssc/Results.h"

namespace {

using testing::HasSubstr;
using testing::Not;

class ProxPoffsetTest : public OffsetCommandTest<ProxPoffset> {
 protected:
  ProxPoffsetTest() : OffsetCommandTest("proximity") {}
};

TEST_F(ProxPoffsetTest, AveragesTheReadingsInTheOrderInWhichTheyCome) {
  stream({readings({{10}, {11}}), readings({{12}, {13}, {14}, {1000}}), readings({{1000}})});
  const Captured captured = run({"prox"});
  EXPECT_EQ(captured.result, 0) << captured.err;
  EXPECT_THAT(captured.out, HasSubstr("Collecting samples...\n"
                                      "0.000000      10.000000       0.000000      60.000000       2.000000\n"
                                      "0.000000      11.000000       0.000000      60.000000       2.000000\n"
                                      "0.000000      12.000000       0.000000      60.000000       2.000000\n"
                                      "0.000000      13.000000       0.000000      60.000000       2.000000\n"
                                      "0.000000      14.000000       0.000000      60.000000       2.000000\n"
                                      "\n"
                                      "ADC_AVG:      12.000000\n"));
  EXPECT_EQ(script->countRequests(sensor, 770), 0);
}

TEST_F(ProxPoffsetTest, FarReadingsHaveTheRangesEndAndOthersNothingBehindIt) {
  stream({readings({{7, {}, false}, {8, {1}}})});
  const Captured captured = run({"prox", "-s", "2"});
  EXPECT_EQ(captured.result, 0) << captured.err;
  EXPECT_THAT(captured.out, HasSubstr("0.000000       7.000000       5.000000\n"
                                      "0.000000       8.000000       0.000000       1.000000\n"
                                      "\nADC_AVG:       7.500000\n"));
}

TEST_F(ProxPoffsetTest, NoLightAtAllIsAnAverageOfItsOwn) {
  stream({readings(5, {0})});
  const Captured captured = run({"prox", "sample"});
  EXPECT_EQ(captured.result, 0) << captured.err;
  EXPECT_THAT(captured.out, HasSubstr("ADC_AVG:       0.000000\n"));
}

TEST_F(ProxPoffsetTest, OnlyHighAccuracyCounts) {
  stream({readings({{1, {}, true, SNS_STD_SENSOR_SAMPLE_STATUS_UNRELIABLE},
                    {2, {}, true, SNS_STD_SENSOR_SAMPLE_STATUS_ACCURACY_LOW},
                    {3, {}, true, SNS_STD_SENSOR_SAMPLE_STATUS_ACCURACY_MEDIUM},
                    {100}})});
  const Captured captured = run({"prox", "-s", "1"});
  EXPECT_EQ(captured.result, 0) << captured.err;
  EXPECT_THAT(captured.out, HasSubstr("ADC_AVG:     100.000000\n"));
}

TEST_F(ProxPoffsetTest, MalformedReadingEndsTheCollectionAtOnce) {
  stream({{{kReadingId, ProximityReading{10}.Encode()}, {kReadingId, "\xff"}}, readings(5, {10})});
  const Captured captured = run({"prox"});
  EXPECT_EQ(captured.result, ssc::kMalformed);
  EXPECT_THAT(captured.err, HasSubstr("Received malformed proximity event"));
  EXPECT_THAT(captured.out, Not(HasSubstr("ADC_AVG")));
}

TEST_F(ProxPoffsetTest, RequestCarriesWhatIsAskedFor) {
  stream({readings(1, {10})});
  answerPoffset(true, true);
  EXPECT_EQ(run({"prox", "poffset", "enable", "-s", "1"}).result, 0);
  EXPECT_EQ(requestOf<sns_oem_poffset_req>(770).enable(), SNS_OEM_PROXIMITY_MODE_ENABLE);
}

TEST_F(ProxPoffsetTest, PoffsetAloneDisables) {
  stream({readings(1, {10})});
  answerPoffset(true, false);
  const Captured captured = run({"prox", "poffset", "-s", "1"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_THAT(captured.out, HasSubstr("Disabling POFFSET calibration...\nPOFFSET disabled.\n"
                                      "Collecting samples...\n"));
  EXPECT_EQ(requestOf<sns_oem_poffset_req>(770).enable(), SNS_OEM_PROXIMITY_MODE_DISABLE);
}

TEST_F(ProxPoffsetTest, RejectionIsReportedWithTheStateInForceAndTheSensorIsSampledAllTheSame) {
  stream({readings(1, {10})});
  answerPoffset(false, false);
  const Captured captured = run({"prox", "poffset", "enable", "-s", "1"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_THAT(captured.err, HasSubstr("Failed to disable POFFSET\n"));
  EXPECT_THAT(captured.out, HasSubstr("ADC_AVG:      10.000000\n"));
}

TEST_F(ProxPoffsetTest, AnswerWithoutFieldsIsARejection) {
  stream({readings(1, {10})});
  reply(770, {{{771, ""}}});
  const Captured captured = run({"prox", "poffset", "-s", "1"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_THAT(captured.err, HasSubstr("Failed to disable POFFSET\n"));
}

TEST_F(ProxPoffsetTest, MalformedAnswerFailsTheRequest) {
  reply(770, {{{771, "\xff"}}});
  const Captured captured = run({"prox", "poffset"});
  EXPECT_EQ(captured.result, ssc::kMalformed);
  EXPECT_THAT(captured.err, HasSubstr("Received malformed poffset response\n"));
  EXPECT_THAT(captured.err, HasSubstr("POFFSET request failed\n"));
  EXPECT_EQ(script->countRequests(sensor, 513), 0);
}

TEST_F(ProxPoffsetTest, MissingAnswerFailsTheRequestAfterItsTime) {
  const Captured captured = run({"prox", "poffset"});
  EXPECT_EQ(captured.result, ssc::kTimedOut);
  EXPECT_THAT(captured.err, HasSubstr("POFFSET request failed\n"));
  EXPECT_EQ(script->countRequests(sensor, 513), 0);
}

TEST_F(ProxPoffsetTest, RefusedRequestFails) {
  script->refuses = [](const sns_client_request_msg& request) { return request.msg_id() == 770; };
  const Captured captured = run({"prox", "poffset"});
  EXPECT_EQ(captured.result, ssc::kIoError);
  EXPECT_THAT(captured.err, HasSubstr("POFFSET request failed\n"));
}

TEST_F(ProxPoffsetTest, OtherSensorsAndOtherEventsAnswerNothing) {
  reply(770, {{{130, ""}, {773, encodeAnswer<sns_oem_ore_resp>(true, true)}}});
  const auto sendReply = script->onRequest;
  script->onRequest = [&](ScriptedHub& hub, const sns_client_request_msg& request) {
    if (request.msg_id() == 770) {
      hub.SendMessage(std::chrono::milliseconds(1),
                      messageOf({2, 2}, {{771, encodeAnswer<sns_oem_poffset_resp>(true, true)}}));
    }
    return sendReply(hub, request);
  };
  const Captured captured = run({"prox", "poffset"});
  EXPECT_EQ(captured.result, ssc::kTimedOut);
  EXPECT_EQ(captured.out, "Searching for proximity sensor...\nDisabling POFFSET calibration...\n");
}

TEST_F(ProxPoffsetTest, NothingBehindAnAnswerInItsMessageCounts) {
  stream({readings(1, {10})});
  reply(770, {{{771, encodeAnswer<sns_oem_poffset_resp>(true, false)},
               {771, encodeAnswer<sns_oem_poffset_resp>(false, false)}}});
  const Captured captured = run({"prox", "poffset", "-s", "1"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_EQ(captured.err, "");
}

TEST_F(ProxPoffsetTest, ReadingsThatComeBeforeTheAnswerDoNotCount) {
  stream({readings(5, {10})});
  reply(770, {readings(5, {1000}), {{771, encodeAnswer<sns_oem_poffset_resp>(true, false)}}});
  const Captured captured = run({"prox", "poffset"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_THAT(captured.out, HasSubstr("ADC_AVG:      10.000000\n"));
  EXPECT_THAT(captured.out, Not(HasSubstr("1000.0")));
}

TEST_F(ProxPoffsetTest, HubThatComesBackDuringTheRequestHasForgottenIt) {
  stream({readings(5, {10})});
  script->onRequest = [&](ScriptedHub& hub, const sns_client_request_msg& request) {
    if (request.msg_id() == 770) {
      hub.GoAwayAndReturn(std::chrono::milliseconds(10), std::chrono::milliseconds(10));
    }
    if (request.msg_id() == 513) {
      hub.SendMessage(std::chrono::milliseconds(1), messageOf(sensor, readings(5, {10})));
    }
    return false;
  };
  const Captured captured = run({"prox", "poffset"});
  EXPECT_EQ(captured.result, ssc::kTimedOut);
  EXPECT_THAT(captured.err, HasSubstr("POFFSET request failed\n"));
  EXPECT_THAT(captured.out, Not(HasSubstr("10.000000")));
  EXPECT_EQ(script->countRequests(sensor, 513), 1);
}

TEST_F(ProxPoffsetTest, AnswerDuringTheSamplingEndsItWithTheReadingsThereAre) {
  stream(
      {readings({{10}, {20}}), {{771, encodeAnswer<sns_oem_poffset_resp>(true, true)}}, readings(5, {90})});
  const Captured captured = run({"prox"});
  EXPECT_EQ(captured.result, 0) << captured.err;
  EXPECT_THAT(captured.out, HasSubstr("POFFSET enabled.\n\nADC_AVG:      15.000000\n"));
}

TEST_F(ProxPoffsetTest, SamplingThatEndsWithoutAReadingHasNoAverage) {
  stream({{{771, encodeAnswer<sns_oem_poffset_resp>(true, true)}}});
  const Captured captured = run({"prox"});
  EXPECT_EQ(captured.result, ssc::kNoData);
  EXPECT_THAT(captured.err, HasSubstr("No Proximity samples were received\n"));
  EXPECT_THAT(captured.out, Not(HasSubstr("ADC_AVG")));
}

TEST_F(ProxPoffsetTest, EachRunStartsFromTheDefaultsAndLooksUpOnce) {
  stream({{{kReadingId, "\xff"}}});
  stream({readings(9, {10})});
  EXPECT_EQ(run({"prox", "-s", "2"}).result, ssc::kMalformed);
  answerPoffset(true, false);
  const Captured second = run({"prox", "poffset", "-s", "7"});
  EXPECT_EQ(second.result, 0) << second.err;
  EXPECT_THAT(second.out, Not(HasSubstr("Searching")));
  const Captured third = run({"prox"});
  EXPECT_EQ(third.result, 0) << third.err;
  EXPECT_THAT(third.out, HasSubstr("ADC_AVG:      10.000000\n"));
  EXPECT_EQ(std::count(third.out.begin(), third.out.end(), '\n'), 1 + 5 + 2);
  EXPECT_EQ(script->countRequests(sensor, 770), 1);
}

TEST_F(ProxPoffsetTest, KnowsNoReset) {
  arguments.reset = true;
  stream({readings(5, {10})});
  const Captured captured = run({"prox"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_THAT(captured.out, HasSubstr("ADC_AVG:      10.000000\n"));
}

}  // namespace
