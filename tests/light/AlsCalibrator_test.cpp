// What needs a hub that behaves oddly at a chosen moment, or two runs of one calibrator. Whole runs of the
// command are golden cases.
#include "light/AlsCalibrator.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "support/ArgumentWords.h"
#include "support/Capture.h"
#include "support/ScriptedHub.h"

namespace {

using testing::HasSubstr;
using testing::Not;

constexpr const char* kGroup = "chipa_0_platform.als.fac_cal";

class AlsTest : public testing::Test {
 protected:
  AlsTest() {
    script->sensors = {{light, "ambient_light", "ChipA light sensor"},
                       {otherLight, "ambient_light", "ChipB light sensor"}};
    script->sensors[0].reading = [](int) { return std::vector<float>{240.0F}; };
    script->sensors[1].reading = [](int) { return std::vector<float>{7.0F}; };
    sns_registry_data data;
    addFloatItem(&data, "scale", 1000, 3);
    addFloatItem(&data, "corr_factor", 1.25F, 5);
    script->registry[kGroup] = data;
  }

  void connect() {
    connection = connectTo(script);
    calibrator = std::make_unique<AlsCalibrator>(connection.get());
  }

  Captured run(std::initializer_list<const char*> words) {
    if (calibrator == nullptr) connect();
    ArgumentWords argumentWords(words);
    Calibrator::Arguments arguments;
    arguments.command = "als";
    arguments.argc = argumentWords.argc();
    arguments.argv = argumentWords.argv();
    arguments.dryRun = true;
    arguments.quiet = true;
    return capture([&] { return calibrator->Run(arguments); });
  }

  const ssc::SensorUid light{1, 1};
  const ssc::SensorUid otherLight{2, 2};
  std::shared_ptr<HubScript> script = std::make_shared<HubScript>();
  std::unique_ptr<ssc::Connection> connection;
  std::unique_ptr<AlsCalibrator> calibrator;
};

TEST_F(AlsTest, TakesTheFirstSensorsPackage) {
  const Captured captured = run({"als", "300"});
  EXPECT_EQ(captured.result, 0) << captured.err;
  EXPECT_THAT(captured.out, HasSubstr("MEAN:      300.000000\n"));
  EXPECT_EQ(script->countRequests(otherLight, 513), 0);
}

TEST_F(AlsTest, EachRunStartsFromTheDefaultsAndLooksUpOnce) {
  const Captured first = run({"als", "-c", "-s", "1", "-v", "50", "300"});
  EXPECT_EQ(first.result, 0) << first.err;
  EXPECT_THAT(first.out, HasSubstr("Searching for ambient light sensor...\n"));
  EXPECT_THAT(first.out, HasSubstr("MEAN:      240.000000\nDIFF:      -20.000000%\n"));

  const Captured second = run({"als", "300"});
  EXPECT_EQ(second.result, 0) << second.err;
  EXPECT_EQ(second.out,
            "ALS calibration begins at 300.000 lux.\n"
            "Reading registry...\n"
            "Collecting samples...\n"
            "MEAN:      300.000000\n"
            "STDEV:       0.000000\n"
            "SCALE:    1000.000000\n"
            "Skipping registry write due to dry run.\n"
            "ALS calibration succeeded.\n");

  const Captured third = run({"als"});
  EXPECT_EQ(third.result, -22);
  EXPECT_THAT(third.err, HasSubstr("No reference lux was specified"));
}

TEST_F(AlsTest, EventsOfAnotherSensorDoNotCount) {
  script->onRequest = [this](ScriptedHub& hub, const sns_client_request_msg& request) {
    if (request.msg_id() == 513 && ssc::SensorUid(request.suid()) == light) {
      for (int i = 1; i <= 20; ++i) hub.SendReading(std::chrono::milliseconds(i), otherLight, {7.0F});
    }
    return false;
  };
  const Captured captured = run({"als", "300"});
  EXPECT_EQ(captured.result, 0) << captured.err;
  EXPECT_THAT(captured.out, HasSubstr("MEAN:      300.000000\nSTDEV:       0.000000\n"));
}

TEST_F(AlsTest, MoreEventsThanNeededAreNotStored) {
  // All in one message, and another one behind it: what comes after the last sample needed is dropped.
  script->sensors[0].reading = nullptr;
  script->onRequest = [this](ScriptedHub& hub, const sns_client_request_msg& request) {
    if (request.msg_id() != 513 || ssc::SensorUid(request.suid()) != light) return false;
    for (int message = 0; message < 2; ++message) {
      sns_client_event_msg events;
      light.CopyTo(events.mutable_suid());
      for (int i = 0; i < 8; ++i) {
        auto* const event = events.add_events();
        event->set_msg_id(1025);
        event->set_timestamp(0);
        event->set_payload(encodeReading({i < 5 ? 100.0F : 9000.0F}));
      }
      hub.SendMessage(std::chrono::milliseconds(10), events);
    }
    return false;
  };
  const Captured captured = run({"als", "-c", "300"});
  EXPECT_EQ(captured.result, 0) << captured.err;
  EXPECT_THAT(captured.out, HasSubstr("MEAN:      100.000000\nSTDEV:       0.000000\n"));
}

TEST_F(AlsTest, SensorThatReportsOnChangeOnlyHasNoPackageAndNoGroup) {
  script->sensors = {{light, "ambient_light", "ChipA light sensor", SNS_STD_SENSOR_STREAM_TYPE_ON_CHANGE}};
  const Captured captured = run({"als", "300"});
  EXPECT_EQ(captured.result, -2);
  EXPECT_THAT(captured.err, HasSubstr("\"_0_platform.als.fac_cal\""));
  EXPECT_THAT(captured.out, HasSubstr("ALS calibration failed.\n"));
}

TEST_F(AlsTest, SensorWithoutANameIsNotUsed) {
  script->sensors[0].name.reset();
  const Captured captured = run({"als", "300"});
  EXPECT_EQ(captured.result, -61);
  EXPECT_THAT(captured.err, HasSubstr("Unable to find streaming ambient light sensor"));
  EXPECT_THAT(captured.out, Not(HasSubstr("calibration")));
}

}  // namespace
