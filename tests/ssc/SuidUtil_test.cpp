#include "ssc/SuidUtil.h"

#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "proto/sns_suid.pb.h"
#include "ssc/FakeHub.h"
#include "ssc/TestClient.h"

namespace {

using namespace ssctest;
using namespace std::chrono_literals;
using ssc::Clock;
using ssc::kSuidLookupSensor;
using ssc::SensorUid;

std::string suidEvent(const std::string& dataType, const std::vector<SensorUid>& suids) {
  sns_suid_event answer;
  answer.set_data_type(dataType);
  for (const SensorUid& suid : suids) suid.CopyTo(answer.add_suid());
  return answer.SerializeAsString();
}

Outgoing answerTo(const std::string& dataType, const std::vector<SensorUid>& suids,
                  Clock::Duration after = {}) {
  return event(kSuidLookupSensor, 768, suidEvent(dataType, suids), after);
}

struct Lookup {
  int result = 1;
  std::vector<SensorUid> suids;
  Clock::TimePoint end;
};

/// Looks "pressure" up at a hub that answers with `outgoings` after it has accepted the request.
Lookup lookUp(const Outgoings& outgoings) {
  const SimulatedRig rig([&](const Request& request) { return Outgoings{accept(request)} + outgoings; });
  Lookup lookup;
  lookup.suids = {kOtherSensor};
  ssc::SuidUtil util(rig.connection.get());
  lookup.result = util.Lookup("pressure", &lookup.suids);
  lookup.end = rig.now();
  return lookup;
}

TEST(SuidUtil, AsksTheLookUpSensorForTheDataType) {
  const SimulatedRig rig([](const Request& request) {
    return Outgoings{accept(request), answerTo("pressure", {kSensor})};
  });
  std::vector<SensorUid> suids;
  EXPECT_EQ(ssc::SuidUtil(rig.connection.get()).Lookup("pressure", &suids), ssc::kOk);
  ASSERT_EQ(rig.requests().size(), 1U);
  const Request request = rig.requests()[0];
  EXPECT_EQ(request.message.suid().suid_low(), 0xababababababababU);
  EXPECT_EQ(request.message.suid().suid_high(), 0xababababababababU);
  EXPECT_EQ(request.message.msg_id(), 512U);
  sns_suid_req query;
  ASSERT_TRUE(query.ParseFromString(request.payload()));
  EXPECT_EQ(query.data_type(), "pressure");
  EXPECT_FALSE(query.register_updates());
  EXPECT_FALSE(query.default_only());
}

TEST(SuidUtil, GivesEverySuidInTheHubsOrderAndNothingElse) {
  const Lookup lookup = lookUp({answerTo("pressure", {{9, 9}, {1, 1}, {5, 0}, {1, 1}}, 20ms)});
  EXPECT_EQ(lookup.result, ssc::kOk);
  EXPECT_EQ(lookup.suids, (std::vector<SensorUid>{{9, 9}, {1, 1}, {5, 0}, {1, 1}}));
  EXPECT_EQ(lookup.end, Clock::TimePoint(20ms));
}

TEST(SuidUtil, DataTypeThatNobodyPublishesIsNotFound) {
  EXPECT_EQ(lookUp({answerTo("pressure", {})}).result, ssc::kNotFound);
}

TEST(SuidUtil, NoAnswerTimesOutThreeSecondsAfterTheResponse) {
  const Lookup lookup = lookUp({});
  EXPECT_EQ(lookup.result, ssc::kTimedOut);
  EXPECT_EQ(lookup.end, Clock::TimePoint(3s));
  EXPECT_EQ(lookUp({answerTo("pressure", {kSensor}, 3001ms)}).result, ssc::kTimedOut);
}

TEST(SuidUtil, AnswerThatDoesNotParseIsMalformed) {
  EXPECT_EQ(lookUp({event(kSuidLookupSensor, 768, "\xff\xff")}).result, ssc::kMalformed);
  EXPECT_EQ(lookUp({event(kSuidLookupSensor, 768, "")}).result, ssc::kMalformed);  // no data type
}

TEST(SuidUtil, AnErrorEndsItAtOnce) {
  const Lookup lookup = lookUp({event(kSuidLookupSensor, 130, "\x08\x01")});
  EXPECT_EQ(lookup.result, ssc::kIoError);
  EXPECT_LT(lookup.end, Clock::TimePoint(1s));
  EXPECT_EQ(lookup.suids, std::vector<SensorUid>{kOtherSensor});  // as they were
}

TEST(SuidUtil, AnswersToOtherQuestionsAreIgnored) {
  const Lookup lookup = lookUp({answerTo("accel", {{7, 7}}), event(kSuidLookupSensor, 769, "\xff"),
                                event(kOtherSensor, 768, suidEvent("pressure", {{8, 8}})),
                                answerTo("pressure", {kSensor}, 1ms)});
  EXPECT_EQ(lookup.result, ssc::kOk);
  EXPECT_EQ(lookup.suids, std::vector<SensorUid>{kSensor});
}

TEST(SuidUtil, AnswerAmongOtherEventsOfOneMessageCounts) {
  const Lookup lookup = lookUp({raw(eventDatagram(
      kSuidLookupSensor,
      {{1, "x", 0}, {768, suidEvent("accel", {{7, 7}}), 0}, {768, suidEvent("pressure", {kSensor}), 0}}))});
  EXPECT_EQ(lookup.result, ssc::kOk);
  EXPECT_EQ(lookup.suids, std::vector<SensorUid>{kSensor});
}

TEST(SuidUtil, AnswerBeforeTheResponseCounts) {
  const SimulatedRig rig([](const Request& request) {
    return Outgoings{answerTo("pressure", {kSensor}), accept(request, 10ms)};
  });
  std::vector<SensorUid> suids;
  EXPECT_EQ(ssc::SuidUtil(rig.connection.get()).Lookup("pressure", &suids), ssc::kOk);
  EXPECT_EQ(suids, std::vector<SensorUid>{kSensor});
}

TEST(SuidUtil, EndsAtOnceWhenTheHubGoesAway) {
  const Lookup lookup = lookUp({goAway(15ms), comeBack(20ms), answerTo("pressure", {kSensor}, 30ms)});
  EXPECT_EQ(lookup.result, ssc::kNotConnected);
  EXPECT_EQ(lookup.end, Clock::TimePoint(15ms));
}

TEST(SuidUtil, RefusedRequestIsAnIoError) {
  const SimulatedRig rig([](const Request& request) { return Outgoings{refuse(request)}; });
  std::vector<SensorUid> suids;
  EXPECT_EQ(ssc::SuidUtil(rig.connection.get()).Lookup("pressure", &suids), ssc::kIoError);
}

TEST(SuidUtil, OneHelperServesManyLookUps) {
  const SimulatedRig rig([](const Request& request) {
    sns_suid_req query;
    EXPECT_TRUE(query.ParseFromString(request.payload()));
    return Outgoings{accept(request), answerTo(query.data_type(), {SensorUid(query.data_type().size(), 0)})};
  });
  ssc::SuidUtil util(rig.connection.get());
  std::vector<SensorUid> suids;
  for (const std::string dataType : {"a", "bb", "", "ccc"}) {
    EXPECT_EQ(util.Lookup(dataType, &suids), ssc::kOk);
    EXPECT_EQ(suids, (std::vector<SensorUid>{{dataType.size(), 0}}));
  }
}

TEST(SuidUtil, LateAnswerOfATimedOutLookUpIsNotTakenForTheNextOnes) {
  int count = 0;
  const SimulatedRig rig([&count](const Request& request) -> Outgoings {
    if (count++ == 0) return {accept(request), answerTo("pressure", {kSensor}, 3500ms)};
    return {accept(request), answerTo("accel", {kOtherSensor}, 1s)};
  });
  ssc::SuidUtil util(rig.connection.get());
  std::vector<SensorUid> suids;
  EXPECT_EQ(util.Lookup("pressure", &suids), ssc::kTimedOut);
  EXPECT_EQ(util.Lookup("accel", &suids), ssc::kOk);
  EXPECT_EQ(suids, std::vector<SensorUid>{kOtherSensor});
}

}  // namespace
