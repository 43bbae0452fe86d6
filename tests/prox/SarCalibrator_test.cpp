// What needs a hub that answers oddly. Whole runs of the command are golden cases.
#include "prox/SarCalibrator.h"

#include <limits>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "proto/sns_oem_sar.pb.h"
#include "support/ArgumentWords.h"
#include "support/Capture.h"
#include "support/ScriptedHub.h"

namespace {

using std::chrono::milliseconds;
using testing::HasSubstr;
using testing::Not;

constexpr const char* kGroup = "sarchip_0_platform.fac_cal";
constexpr std::uint32_t kRequest = 778;
constexpr std::uint32_t kResponse = 779;
constexpr int kMalformed = -2147483647;

std::string offsets(float top, float bottom) {
  sns_sar_comp_resp response;
  response.set_top_offset(top);
  response.set_bottom_offset(bottom);
  return response.SerializeAsString();
}

class SarTest : public testing::Test {
 protected:
  SarTest() {
    script->sensors = {{sar, "sar", "SARCHIP", SNS_STD_SENSOR_STREAM_TYPE_ON_CHANGE}};
    addFloatItem(&script->registry[kGroup], "max_offset_top", 1, 3);
    addFloatItem(&script->registry[kGroup], "max_offset_bottom", 2, 5);
    script->onRequest = [this](ScriptedHub& hub, const sns_client_request_msg& request) {
      if (ssc::SensorUid(request.suid()) != sar) return false;
      if (request.msg_id() == 1) return sendAttributes(hub);
      if (request.msg_id() != kRequest) return false;
      EXPECT_TRUE(request.has_request() && !request.request().has_payload());
      if (onCompensation) onCompensation(hub);
      return true;
    };
  }

  bool sendAttributes(ScriptedHub& hub) const {
    sns_std_attr_event attributes;
    if (hasName) {
      auto* const name = attributes.add_attributes();
      name->set_attr_id(0);
      name->mutable_value()->add_values()->set_str("SARCHIP");
    }
    auto* const index = attributes.add_attributes();
    index->set_attr_id(29);
    index->mutable_value()->add_values()->set_sint(0);
    hub.SendEvent(milliseconds(1), sar, 128, attributes.SerializeAsString());
    return true;
  }

  /// The sensor answers with this event.
  void answer(std::uint32_t messageId, const std::string& payload) {
    onCompensation = [this, messageId, payload](ScriptedHub& hub) {
      hub.SendEvent(milliseconds(10), sar, messageId, payload);
    };
  }

  Captured run(std::initializer_list<const char*> words = {"sar"}) {
    calibrator.reset();  // before the connection that it uses
    connection = connectTo(script);
    calibrator = std::make_unique<SarCalibrator>(connection.get());
    ArgumentWords argumentWords(words);
    Calibrator::Arguments arguments;
    arguments.command = "sar";
    arguments.argc = argumentWords.argc();
    arguments.argv = argumentWords.argv();
    return capture([&] { return calibrator->Run(arguments); });
  }

  [[nodiscard]] float stored(int index) const { return script->registry[kGroup].items(index).flt(); }

  const ssc::SensorUid sar{1, 1};
  bool hasName = true;
  std::function<void(ScriptedHub&)> onCompensation;
  std::shared_ptr<HubScript> script = std::make_shared<HubScript>();
  std::unique_ptr<ssc::Connection> connection;
  std::unique_ptr<SarCalibrator> calibrator;
};

TEST_F(SarTest, StoresTheOffsetsWithTheirMargin) {
  answer(kResponse, offsets(16353, 100));
  const Captured captured = run();
  EXPECT_EQ(captured.result, 0) << captured.err;
  EXPECT_THAT(captured.out, HasSubstr("TOP_OFFSET: 16383\nBOT_OFFSET:   130\nWriting registry...\n"));
  EXPECT_EQ(stored(0), 16383);
  EXPECT_EQ(script->registry[kGroup].items(0).version(), 4);
  EXPECT_EQ(stored(1), 130);
  EXPECT_EQ(script->registry[kGroup].items(1).version(), 6);
  EXPECT_EQ(script->requestIdsTo(sar), (std::vector<std::uint32_t>{1, 514, kRequest, 10}));
}

TEST_F(SarTest, OffsetsThatAreNoNumbersAreNotStored) {
  for (const auto& payload : {offsets(std::numeric_limits<float>::quiet_NaN(), 5),
                              offsets(5, std::numeric_limits<float>::quiet_NaN()),
                              offsets(-std::numeric_limits<float>::infinity(), 5)}) {
    answer(kResponse, payload);
    const Captured captured = run();
    EXPECT_EQ(captured.result, -22);
    EXPECT_THAT(captured.err, HasSubstr("offset is not a finite number"));
    EXPECT_THAT(captured.out, HasSubstr("SAR calibration failed.\n"));
    EXPECT_EQ(stored(0), 1);
  }
}

TEST_F(SarTest, AResponseThatDoesNotParseFailsTheCalibrationAtOnce) {
  sns_sar_comp_resp half;
  half.set_top_offset(5);
  for (const auto& payload : {std::string("\xff\xff"), std::string(), half.SerializeAsString()}) {
    answer(kResponse, payload);
    const Captured captured = run();
    EXPECT_EQ(captured.result, kMalformed);
    EXPECT_THAT(captured.err, HasSubstr("Received malformed SAR compensation response"));
    EXPECT_THAT(captured.out, HasSubstr("SAR calibration failed.\n"));
    EXPECT_THAT(captured.out, Not(HasSubstr("OFFSET")));
    EXPECT_EQ(stored(0), 1);
    EXPECT_EQ(script->requestIdsTo(sar).back(), 10U) << "the sensor is stopped all the same";
  }
}

TEST_F(SarTest, OtherEventsAreNotTheResponse) {
  // Readings, also ones whose message the response ends, and what no handler knows.
  onCompensation = [this](ScriptedHub& hub) {
    hub.SendReading(milliseconds(5), sar, {1, 2});
    hub.SendEvent(milliseconds(6), sar, 780, offsets(1, 1));
    sns_client_event_msg message;
    sar.CopyTo(message.mutable_suid());
    for (const std::uint32_t id : {1025U, kResponse, kResponse}) {
      auto* const event = message.add_events();
      event->set_msg_id(id);
      event->set_timestamp(0);
      // Only the first response counts.
      event->set_payload(id == 1025U ? "\xff" : offsets(message.events_size() == 2 ? 70.0F : 90.0F, 80));
    }
    hub.SendMessage(milliseconds(20), message);
  };
  const Captured captured = run();
  EXPECT_EQ(captured.result, 0) << captured.err;
  EXPECT_THAT(captured.out, HasSubstr("TOP_OFFSET:   100\nBOT_OFFSET:   110\n"));
}

TEST_F(SarTest, AResponseWithinThreeSecondsCounts) {
  for (const int delay : {2990, 3010}) {
    onCompensation = [this, delay](ScriptedHub& hub) {
      hub.SendEvent(milliseconds(delay), sar, kResponse, offsets(1, 1));
    };
    EXPECT_EQ(run().result, delay < 3000 ? 0 : -110);
  }
}

TEST_F(SarTest, ASensorWithoutANameIsNotUsed) {
  hasName = false;
  const Captured captured = run();
  EXPECT_EQ(captured.result, -61);
  EXPECT_THAT(captured.err, HasSubstr("Unable to find a SAR sensor"));
}

TEST_F(SarTest, EachRunStartsFromTheDefaults) {
  answer(kResponse, offsets(1, 1));
  EXPECT_EQ(run({"sar", "-i", "5"}).result, -2);
  ArgumentWords words({"sar"});
  Calibrator::Arguments arguments;
  arguments.command = "sar";
  arguments.argc = words.argc();
  arguments.argv = words.argv();
  EXPECT_EQ(capture([&] { return calibrator->Run(arguments); }).result, 0);
}

}  // namespace
