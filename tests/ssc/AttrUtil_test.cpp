#include "ssc/AttrUtil.h"

#include <cstdint>
#include <string>

#include <gtest/gtest.h>

#include "ssc/FakeHub.h"
#include "ssc/TestClient.h"

namespace {

using namespace ssctest;
using namespace std::chrono_literals;
using ssc::AttrUtil;
using ssc::Clock;
using Value = sns_std_attr_value::sns_std_attr_value_data;

/// Appends an attribute with one value and gives the value to be filled in.
Value* add(std::int32_t id, sns_std_attr_event* attributes) {
  sns_std_attr* attribute = attributes->add_attributes();
  attribute->set_attr_id(id);
  return attribute->mutable_value()->add_values();
}

sns_std_attr_event sensorAttributes() {
  sns_std_attr_event attributes;
  add(2, &attributes)->set_str("pressure");
  add(0, &attributes)->set_str("chipa Pressure Sensor");
  add(16, &attributes)->set_sint(1);
  add(29, &attributes)->set_sint(-3);
  add(23, &attributes)->set_flt(300.0F);
  attributes.mutable_attributes(4)->mutable_value()->add_values()->set_flt(1250.0F);
  return attributes;
}

TEST(AttrUtilLoad, AsksTheSensorAndGivesWhatItAnswers) {
  const SimulatedRig rig([](const Request& request) {
    return Outgoings{accept(request), event(kSensor, 128, sensorAttributes().SerializeAsString(), 5ms)};
  });
  sns_std_attr_event attributes;
  add(99, &attributes)->set_str("left over");
  EXPECT_EQ(AttrUtil(rig.connection.get()).LoadAttributes(kSensor, &attributes), ssc::kOk);
  EXPECT_EQ(attributes.SerializeAsString(), sensorAttributes().SerializeAsString());
  EXPECT_EQ(rig.now(), Clock::TimePoint(5ms));
  ASSERT_EQ(rig.requests().size(), 1U);
  EXPECT_EQ(rig.requests()[0].suid(), kSensor);
  EXPECT_EQ(rig.requests()[0].message.msg_id(), 1U);
  sns_std_attr_req query;
  ASSERT_TRUE(query.ParseFromString(rig.requests()[0].payload()));
  EXPECT_FALSE(query.register_updates());
}

/// What loading comes to when the hub answers with `outgoings` after it has accepted the request.
int loadResult(const Outgoings& outgoings, sns_std_attr_event* attributes) {
  const SimulatedRig rig([&](const Request& request) { return Outgoings{accept(request)} + outgoings; });
  return AttrUtil(rig.connection.get()).LoadAttributes(kSensor, attributes);
}

TEST(AttrUtilLoad, FailuresLeaveTheResultAlone) {
  sns_std_attr_event attributes = sensorAttributes();
  const std::string before = attributes.SerializeAsString();
  EXPECT_EQ(loadResult({}, &attributes), ssc::kTimedOut);
  EXPECT_EQ(loadResult({event(kSensor, 128, "\xff")}, &attributes), ssc::kMalformed);
  EXPECT_EQ(loadResult({event(kSensor, 130, "\x08\x01")}, &attributes), ssc::kIoError);
  EXPECT_EQ(loadResult({goAway()}, &attributes), ssc::kNotConnected);
  EXPECT_EQ(loadResult({event(kOtherSensor, 128, "")}, &attributes), ssc::kTimedOut);
  EXPECT_EQ(attributes.SerializeAsString(), before);
}

TEST(AttrUtilLoad, SamplesOfTheSensorAreNoAnswer) {
  sns_std_attr_event attributes;
  EXPECT_EQ(loadResult(stream(kSensor, 20, 0ns, 1ms) +
                           Outgoings{event(kSensor, 128, sensorAttributes().SerializeAsString(), 10ms)},
                       &attributes),
            ssc::kOk);
  EXPECT_EQ(attributes.attributes_size(), 5);
}

TEST(AttrUtilLoad, AnswerThatNestsWithoutEndIsMalformed) {
  // Deeper than any parser should follow: subtype in value in subtype …
  std::string nested;
  for (int i = 0; i < 5000; ++i) {
    const auto prefix = [](std::size_t size) {
      std::string varint;
      for (; size > 0x7f; size >>= 7) varint += static_cast<char>((size & 0x7f) | 0x80);
      return varint + static_cast<char>(size);
    };
    nested = "\x0a" + prefix(nested.size()) + nested;
  }
  sns_std_attr_event attributes;
  EXPECT_EQ(loadResult({event(kSensor, 128, nested)}, &attributes), ssc::kMalformed);
}

TEST(AttrUtilRead, GivesEachAttributeOfItsKind) {
  const sns_std_attr_event attributes = sensorAttributes();
  sns_std_sensor_stream_type streamType{};
  EXPECT_EQ(AttrUtil::GetStreamType(attributes, &streamType), ssc::kOk);
  EXPECT_EQ(streamType, SNS_STD_SENSOR_STREAM_TYPE_ON_CHANGE);
  std::string name;
  EXPECT_EQ(AttrUtil::GetName(attributes, &name), ssc::kOk);
  EXPECT_EQ(name, "chipa Pressure Sensor");
  std::int64_t index = 0;
  EXPECT_EQ(AttrUtil::GetSensorIndex(attributes, &index), ssc::kOk);
  EXPECT_EQ(index, -3);
  float low = 0;
  float high = 0;
  EXPECT_EQ(AttrUtil::GetSelectedRange(attributes, &low, &high), ssc::kOk);
  EXPECT_EQ(low, 300.0F);
  EXPECT_EQ(high, 1250.0F);
}

/// Each reader's result for the same attributes; what they read into must stay as it was.
void expectAll(const sns_std_attr_event& attributes, int expected) {
  auto streamType = SNS_STD_SENSOR_STREAM_TYPE_SINGLE_OUTPUT;
  EXPECT_EQ(AttrUtil::GetStreamType(attributes, &streamType), expected);
  EXPECT_EQ(streamType, SNS_STD_SENSOR_STREAM_TYPE_SINGLE_OUTPUT);
  std::string name = "as it was";
  EXPECT_EQ(AttrUtil::GetName(attributes, &name), expected);
  EXPECT_EQ(name, "as it was");
  std::int64_t index = 17;
  EXPECT_EQ(AttrUtil::GetSensorIndex(attributes, &index), expected);
  EXPECT_EQ(index, 17);
  float low = -1;
  float high = -2;
  EXPECT_EQ(AttrUtil::GetSelectedRange(attributes, &low, &high), expected);
  EXPECT_EQ(low, -1.0F);
  EXPECT_EQ(high, -2.0F);
}

TEST(AttrUtilRead, AbsentAttributesAreNoData) {
  expectAll({}, ssc::kNoData);
  sns_std_attr_event others;
  for (const std::int32_t id : {1, 2, 3, 4, 6, 7, 11, 18, 20, 22, -1, 1000}) add(id, &others)->set_sint(1);
  expectAll(others, ssc::kNoData);
}

TEST(AttrUtilRead, AttributesWithoutAValueAreNoData) {
  sns_std_attr_event attributes;
  for (const std::int32_t id : {0, 16, 23, 29}) {
    attributes.add_attributes()->set_attr_id(id);
    attributes.mutable_attributes()->rbegin()->mutable_value();
  }
  expectAll(attributes, ssc::kNoData);
  for (sns_std_attr& attribute : *attributes.mutable_attributes()) attribute.mutable_value()->add_values();
  expectAll(attributes, ssc::kNoData);
}

TEST(AttrUtilRead, AttributesOfAnotherKindAreNoData) {
  sns_std_attr_event booleans;
  for (const std::int32_t id : {0, 16, 23, 29}) add(id, &booleans)->set_boolean(true);
  expectAll(booleans, ssc::kNoData);

  sns_std_attr_event subtypes;
  for (const std::int32_t id : {0, 16, 23, 29}) {
    Value* inner = add(id, &subtypes)->mutable_subtype()->add_values();
    inner->set_str("x");
    inner->set_sint(1);
    inner->set_flt(1.0F);
  }
  expectAll(subtypes, ssc::kNoData);
}

TEST(AttrUtilRead, StreamTypeOutOfItsRangeIsNoData) {
  for (const std::int64_t value : {-1L, 3L, 4294967296L, INT64_MIN, INT64_MAX}) {
    sns_std_attr_event attributes;
    add(16, &attributes)->set_sint(value);
    auto streamType = SNS_STD_SENSOR_STREAM_TYPE_SINGLE_OUTPUT;
    EXPECT_EQ(AttrUtil::GetStreamType(attributes, &streamType), ssc::kNoData) << value;
  }
  for (const std::int64_t value : {0, 1, 2}) {
    sns_std_attr_event attributes;
    add(16, &attributes)->set_sint(value);
    sns_std_sensor_stream_type streamType{};
    EXPECT_EQ(AttrUtil::GetStreamType(attributes, &streamType), ssc::kOk);
    EXPECT_EQ(streamType, value);
  }
}

TEST(AttrUtilRead, NameLosesItsTerminatingZeroOnly) {
  for (const auto& [stored, expected] : std::initializer_list<std::pair<std::string, std::string>>{
           {std::string("chipa\0", 6), "chipa"},
           {"chipa ", "chipa "},
           {std::string("a\0b", 3), std::string("a\0b", 3)},
           {std::string(1, '\0'), ""},
           {"", ""}}) {
    sns_std_attr_event attributes;
    add(0, &attributes)->set_str(stored);
    std::string name = "as it was";
    EXPECT_EQ(AttrUtil::GetName(attributes, &name), ssc::kOk);
    EXPECT_EQ(name, expected);
  }
}

TEST(AttrUtilRead, ShortRangesAreNoData) {
  sns_std_attr_event attributes;
  add(23, &attributes)->set_flt(1.0F);
  float low = -1;
  float high = -2;
  EXPECT_EQ(AttrUtil::GetSelectedRange(attributes, &low, &high), ssc::kNoData);
  Value* second = attributes.mutable_attributes(0)->mutable_value()->add_values();
  EXPECT_EQ(AttrUtil::GetSelectedRange(attributes, &low, &high), ssc::kNoData);
  second->set_sint(2);
  EXPECT_EQ(AttrUtil::GetSelectedRange(attributes, &low, &high), ssc::kNoData);
  EXPECT_EQ(low, -1.0F);
  EXPECT_EQ(high, -2.0F);
  second->set_flt(2.0F);
  EXPECT_EQ(AttrUtil::GetSelectedRange(attributes, &low, &high), ssc::kOk);
  EXPECT_EQ(high, 2.0F);
}

}  // namespace
