// Reading and writing registry groups.
#include "ssc/RegistryUtil.h"

#include <functional>
#include <string>

#include <gtest/gtest.h>

#include "ssc/FakeHub.h"
#include "ssc/RegistryHub.h"

namespace {

using namespace ssctest;
using namespace std::chrono_literals;
using ssc::Clock;
using ssc::RegistryUtil;

class RegistryUtilTest : public testing::Test {
 protected:
  RegistryUtilTest()
      : rig_([this](const Request& request) { return hub_(request); }), util_(rig_.connection.get()) {
    hub_.groups["g"] = groupOf("a", 5);
  }

  int read(const std::string& group, sns_registry_data* data) {
    testing::internal::CaptureStderr();
    const int result = util_.Read(group, data);
    shown_ = testing::internal::GetCapturedStderr();
    return result;
  }
  int readResult() {
    sns_registry_data data;
    return read("g", &data);
  }
  int writeResult() { return util_.Write("g", groupOf("a", 6)); }

  RegistryHub hub_;
  SimulatedRig rig_;
  RegistryUtil util_;
  std::string shown_;
};

TEST_F(RegistryUtilTest, ReadLooksTheRegistryUpOnceAndGivesTheGroup) {
  sns_registry_data data = groupOf("left over", 1);
  EXPECT_EQ(read("g", &data), ssc::kOk);
  EXPECT_EQ(data.SerializeAsString(), groupOf("a", 5).SerializeAsString());
  EXPECT_EQ(read("g", &data), ssc::kOk);
  EXPECT_EQ(shown_, "");
  const auto requests = rig_.requests();
  ASSERT_EQ(requests.size(), 3U);
  sns_suid_req lookup;
  ASSERT_TRUE(lookup.ParseFromString(requests[0].payload()));
  EXPECT_EQ(lookup.data_type(), "registry");
  EXPECT_EQ(requests[1].suid(), kRegistry);
  EXPECT_EQ(requests[1].message.msg_id(), 512U);
  sns_registry_read_req query;
  ASSERT_TRUE(query.ParseFromString(requests[1].payload()));
  EXPECT_EQ(query.name(), "g");
}

TEST_F(RegistryUtilTest, NestedGroupsAndStringsWithTheirZeroComeAsTheyAre) {
  sns_registry_data stored;
  sns_registry_data_item* group = stored.add_items();
  group->set_name("bias");
  group->set_version(3);
  RegistryUtil::CreateRegistryVector({1, 2, 3}, group->mutable_subgrp());
  sns_registry_data_item* text = stored.add_items();
  text->set_name("t");
  text->set_str(std::string("abc\0", 4));
  hub_.groups["nested"] = stored;
  sns_registry_data data;
  EXPECT_EQ(read("nested", &data), ssc::kOk);
  EXPECT_EQ(data.SerializeAsString(), stored.SerializeAsString());
}

TEST_F(RegistryUtilTest, GroupThatDoesNotExistIsNotFoundAndSaidSo) {
  sns_registry_data data = groupOf("as it was", 1);
  EXPECT_EQ(read("no such group", &data), ssc::kNotFound);
  EXPECT_EQ(data.SerializeAsString(), groupOf("as it was", 1).SerializeAsString());
  EXPECT_NE(shown_.find("\"no such group\""), std::string::npos);
  EXPECT_EQ(shown_.compare(0, 7, "ERROR: "), 0);
}

TEST_F(RegistryUtilTest, HubWithoutARegistryIsNotFoundAndSaidSo) {
  hub_.sensors.clear();
  EXPECT_EQ(readResult(), ssc::kNotFound);
  EXPECT_EQ(shown_, "ERROR: Unable to find the hub's registry. Error = -2\n");
  testing::internal::CaptureStderr();
  EXPECT_EQ(writeResult(), ssc::kNotFound);
  EXPECT_EQ(testing::internal::GetCapturedStderr(), shown_);
}

TEST_F(RegistryUtilTest, ReadWithoutAnAnswerTimesOut) {
  hub_.silent = true;
  EXPECT_EQ(readResult(), ssc::kTimedOut);
  EXPECT_EQ(rig_.now(), Clock::TimePoint(3s));
}

TEST_F(RegistryUtilTest, ReadAnswerThatDoesNotParseIsMalformed) {
  for (const std::string& payload :
       {std::string("\xff\xff\xff"), std::string(), std::string("\x0a\x01g", 3)}) {
    hub_.instead = {event(kRegistry, 768, payload)};
    EXPECT_EQ(readResult(), ssc::kMalformed);
  }
}

TEST_F(RegistryUtilTest, ReadAnswerThatNestsWithoutEndIsMalformed) {
  sns_registry_data data;
  sns_registry_data* deepest = &data;
  for (int i = 0; i < 200; ++i) {
    deepest->add_items()->set_name("s");
    deepest = deepest->mutable_items(0)->mutable_subgrp();
  }
  sns_registry_read_event answer;
  answer.set_name("g");
  *answer.mutable_data() = data;
  hub_.instead = {event(kRegistry, 768, answer.SerializeAsString())};
  EXPECT_EQ(readResult(), ssc::kMalformed);
}

TEST_F(RegistryUtilTest, AnswerToSomebodyElsesReadIsIgnored) {
  sns_registry_read_event other;
  other.set_name("other");
  *other.mutable_data() = groupOf("b", 9);
  sns_registry_read_event own;
  own.set_name("g");
  *own.mutable_data() = groupOf("a", 5);
  hub_.instead = {event(kRegistry, 768, other.SerializeAsString()), event(kRegistry, 769, "\x08\x01"),
                  event(kOtherSensor, 130, "\x08\x01"), event(kRegistry, 768, own.SerializeAsString(), 1ms)};
  sns_registry_data data;
  EXPECT_EQ(read("g", &data), ssc::kOk);
  EXPECT_EQ(data.SerializeAsString(), groupOf("a", 5).SerializeAsString());
}

TEST_F(RegistryUtilTest, WriteSendsTheGroupAndTellsHowItWent) {
  EXPECT_EQ(writeResult(), ssc::kOk);
  EXPECT_EQ(hub_.groups["g"].SerializeAsString(), groupOf("a", 6).SerializeAsString());
  hub_.unwritable = "g";
  EXPECT_EQ(util_.Write("g", groupOf("a", 7)), ssc::kIoError);
  EXPECT_EQ(hub_.groups["g"].SerializeAsString(), groupOf("a", 6).SerializeAsString());
}

TEST_F(RegistryUtilTest, WriteAnswers) {
  hub_.instead = {event(kRegistry, 130, "\x08\x01")};
  EXPECT_EQ(writeResult(), ssc::kIoError);
  hub_.instead = {event(kRegistry, 769, "\xff")};
  EXPECT_EQ(writeResult(), ssc::kMalformed);
  hub_.instead = {event(kRegistry, 769, "")};
  EXPECT_EQ(writeResult(), ssc::kMalformed);
  hub_.instead = {goAway(), comeBack(1ms)};
  EXPECT_EQ(writeResult(), ssc::kNotConnected);
  rig_.connection->clock().sleepFor(1s);
  hub_.instead.clear();
  hub_.silent = true;
  EXPECT_EQ(writeResult(), ssc::kTimedOut);
}

TEST_F(RegistryUtilTest, TwoGroupsAreWrittenOneAfterTheOther) {
  const std::string second = "h";
  const sns_registry_data data = groupOf("b", 7);
  EXPECT_EQ(util_.Write("g", groupOf("a", 6), &second, &data), ssc::kOk);
  EXPECT_EQ(hub_.groups["g"].SerializeAsString(), groupOf("a", 6).SerializeAsString());
  EXPECT_EQ(hub_.groups["h"].SerializeAsString(), data.SerializeAsString());
}

TEST_F(RegistryUtilTest, SecondGroupIsNotWrittenWhenTheFirstFailed) {
  const std::string second = "h";
  const sns_registry_data data = groupOf("b", 7);
  hub_.unwritable = "g";
  EXPECT_EQ(util_.Write("g", groupOf("a", 6), &second, &data), ssc::kIoError);
  EXPECT_EQ(hub_.groups.count("h"), 0U);
}

TEST_F(RegistryUtilTest, SecondGroupsFailureIsTheResult) {
  const std::string second = "h";
  const sns_registry_data data = groupOf("b", 7);
  hub_.unwritable = "h";
  EXPECT_EQ(util_.Write("g", groupOf("a", 6), &second, &data), ssc::kIoError);
  EXPECT_EQ(hub_.groups["g"].SerializeAsString(), groupOf("a", 6).SerializeAsString());
}

TEST_F(RegistryUtilTest, SecondGroupTakesBothItsNameAndItsData) {
  const std::string second = "h";
  const sns_registry_data data = groupOf("b", 7);
  EXPECT_EQ(util_.Write("g", groupOf("a", 6), &second, nullptr), ssc::kOk);
  EXPECT_EQ(util_.Write("g", groupOf("a", 6), nullptr, &data), ssc::kOk);
  EXPECT_EQ(hub_.groups.size(), 1U);
}

TEST_F(RegistryUtilTest, GroupThatDoesNotFitADatagramIsInvalid) {
  sns_registry_data data;
  data.add_items()->set_name("t");
  data.mutable_items(0)->set_str(std::string(70000, 'x'));
  EXPECT_EQ(util_.Write("g", data), ssc::kInvalid);
}

TEST(RegistryUtilPath, IsTheHandsetsWithTheClosingSlash) {
  EXPECT_EQ(RegistryUtil::RegistryPath(), "/mnt/vendor/persist/sensors/registry/registry/");
}

}  // namespace
