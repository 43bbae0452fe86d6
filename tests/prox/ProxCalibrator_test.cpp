// What needs a hub that behaves oddly at a chosen moment, or two runs of one calibrator. Whole runs of the
// command are golden cases.
#include "prox/ProxCalibrator.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "support/ArgumentWords.h"
#include "support/Capture.h"
#include "support/ScriptedHub.h"

namespace {

using testing::HasSubstr;
using testing::Not;

constexpr const char* kGroup = "chipa_0_platform.prox.fac_cal";
constexpr std::uint32_t kProximityEvent = 769;
constexpr auto kHigh = SNS_STD_SENSOR_SAMPLE_STATUS_ACCURACY_HIGH;

struct Reading {
  unsigned counts;
  bool isNear;
  sns_std_sensor_sample_status status = kHigh;
};

std::string encodeProximity(const Reading& reading) {
  sns_proximity_event event;
  event.set_proximity_event_type(reading.isNear ? SNS_PROXIMITY_EVENT_TYPE_NEAR
                                                : SNS_PROXIMITY_EVENT_TYPE_FAR);
  event.set_raw_adc(reading.counts);
  event.set_status(reading.status);
  return event.SerializeAsString();
}

sns_client_event_msg messageOf(const ssc::SensorUid& suid, const std::vector<Reading>& readings) {
  sns_client_event_msg message;
  suid.CopyTo(message.mutable_suid());
  for (const Reading& reading : readings) {
    auto* const event = message.add_events();
    event->set_msg_id(kProximityEvent);
    event->set_timestamp(0);
    event->set_payload(encodeProximity(reading));
  }
  return message;
}

class ProxTest : public testing::Test {
 protected:
  ProxTest() {
    script->sensors = {{proximity, "proximity", "ChipA proximity sensor"}};
    sns_registry_data data;
    addFloatItem(&data, "near_threshold", 140, std::nullopt);
    addFloatItem(&data, "far_threshold", 20, 7);
    addFloatItem(&data, "other", 1, 9);
    script->registry[kGroup] = data;
  }

  /// Messages that come, in turn, when the sensor is streamed.
  void send(const std::vector<sns_client_event_msg>& messages) {
    script->onRequest = [this, messages](ScriptedHub& hub, const sns_client_request_msg& request) {
      if (request.msg_id() == 513 && ssc::SensorUid(request.suid()) == proximity) {
        std::chrono::milliseconds delay{0};
        for (const auto& message : messages) hub.SendMessage(delay += std::chrono::milliseconds(1), message);
      }
      return false;
    };
  }

  Captured run(std::initializer_list<const char*> words) {
    if (calibrator == nullptr) {
      connection = connectTo(script);
      calibrator = std::make_unique<ProxCalibrator>(connection.get());
    }
    ArgumentWords argumentWords(words);
    Calibrator::Arguments arguments;
    arguments.command = "prox";
    arguments.argc = argumentWords.argc();
    arguments.argv = argumentWords.argv();
    arguments.dryRun = dryRun;
    return capture([&] { return calibrator->Run(arguments); });
  }

  const ssc::SensorUid proximity{1, 1};
  bool dryRun = true;
  std::shared_ptr<HubScript> script = std::make_shared<HubScript>();
  std::unique_ptr<ssc::Connection> connection;
  std::unique_ptr<ProxCalibrator> calibrator;
};

TEST_F(ProxTest, SetsOnlyItsOwnThresholdAndItsVersion) {
  dryRun = false;
  send({messageOf(proximity, {{100, true}, {102, true}})});
  const Captured captured = run({"prox", "-s", "2"});
  EXPECT_EQ(captured.result, 0) << captured.err;
  const sns_registry_data& stored = script->registry.at(kGroup);
  ASSERT_EQ(stored.items_size(), 3);
  EXPECT_EQ(stored.items(0).flt(), 101.0F);
  EXPECT_EQ(stored.items(0).version(), 1);
  EXPECT_EQ(stored.items(1).flt(), 20.0F);
  EXPECT_EQ(stored.items(1).version(), 7);
  EXPECT_EQ(stored.items(2).version(), 9);
  EXPECT_EQ(script->countRequests(proximity, 515), 1);
  EXPECT_EQ(script->countRequests(proximity, 610), 0);
}

TEST_F(ProxTest, RegistrysWriteEventsAreNoProximityEvents) {
  // The registry sensor's write event has the same message id.
  send({messageOf(HubScript::registrySuid(), {{200, true}, {200, true}}),
        messageOf(proximity, {{100, true}, {102, true}})});
  const Captured captured = run({"prox", "-s", "2"});
  EXPECT_EQ(captured.result, 0) << captured.err;
  EXPECT_THAT(captured.out, HasSubstr("NEAR_THRESHOLD: 101\n"));
}

TEST_F(ProxTest, NearTargetCountsWithTheDistanceThatAFarOneBeforeItInTheMessageLeft) {
  send({messageOf(proximity, {{150, true}, {50, false}, {151, true}}),
        messageOf(proximity, {{152, true}, {51, false}})});
  const Captured captured = run({"prox", "-s", "5"});
  EXPECT_EQ(captured.result, 0) << captured.err;
  EXPECT_THAT(captured.out, HasSubstr("0.000000     150.000000       0.000000       0.000000\n"
                                      "0.000000      50.000000       5.000000       0.000000\n"
                                      "0.000000     151.000000       5.000000       0.000000\n"
                                      "0.000000     152.000000       0.000000       0.000000\n"
                                      "0.000000      51.000000       5.000000       0.000000\n"));
}

TEST_F(ProxTest, MoreEventsThanNeededAreNotStored) {
  send({messageOf(proximity, {{100, true}, {100, true}, {200, true}}), messageOf(proximity, {{200, true}})});
  const Captured captured = run({"prox", "-s", "2"});
  EXPECT_EQ(captured.result, 0) << captured.err;
  EXPECT_THAT(captured.out, HasSubstr("NEAR_THRESHOLD: 100\n"));
}

TEST_F(ProxTest, OnlyHighAccuracyCounts) {
  send({messageOf(proximity, {{1, true, SNS_STD_SENSOR_SAMPLE_STATUS_UNRELIABLE},
                              {2, true, SNS_STD_SENSOR_SAMPLE_STATUS_ACCURACY_LOW},
                              {3, true, SNS_STD_SENSOR_SAMPLE_STATUS_ACCURACY_MEDIUM},
                              {100, true}})});
  const Captured captured = run({"prox", "-s", "1"});
  EXPECT_EQ(captured.result, 0) << captured.err;
  EXPECT_THAT(captured.out, HasSubstr("NEAR_THRESHOLD: 100\n"));
}

TEST_F(ProxTest, EachRunStartsFromTheDefaultsAndLooksUpOnce) {
  send({messageOf(proximity, std::vector<Reading>(10, {100, true}))});
  const Captured first = run({"prox", "-s", "1", "far"});
  EXPECT_EQ(first.result, 0) << first.err;
  EXPECT_THAT(first.out, HasSubstr("Searching for proximity sensor...\n"));
  EXPECT_THAT(first.out, HasSubstr("FAR_THRESHOLD: 100\n"));
  const Captured second = run({"prox"});
  EXPECT_EQ(second.result, 0) << second.err;
  EXPECT_THAT(second.out, Not(HasSubstr("Searching")));
  EXPECT_THAT(second.out, HasSubstr("(count 10 @"));
  EXPECT_THAT(second.out, HasSubstr("NEAR_THRESHOLD: 100\n"));
}

}  // namespace
