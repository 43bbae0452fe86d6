// Collecting: events, early ends, reconnections, printing.
#include <gtest/gtest.h>

#include "framework/PlainCalibrator.h"
#include "ssc/Log.h"
#include "support/Capture.h"
#include "support/ScriptedHub.h"

namespace {

using std::chrono::milliseconds;
using std::chrono::seconds;

constexpr int kTimedOut = -110;
constexpr int kMalformed = -2147483647;

class CalibratorCollect : public testing::Test {
 protected:
  CalibratorCollect() {
    script->sensors = {{a, "pressure", "chipa"}, {b, "sensor_temperature", "chipa"}};
    connection = connectTo(script);
    calibrator = std::make_unique<PlainCalibrator>(connection.get());
  }
  void TearDown() override { ssc::setLogLevel(ssc::kLogInfo); }

  /// Streams sensor a at 10 Hz for the period, without printing.
  template <class Period>
  Captured collect(Period period) {
    calibrator->SetSensorInfo(a, "Barometer", 10);
    return capture([&] { return calibrator->CollectSamples(period, false); });
  }

  /// Lets `act` happen when the stream of sensor a is asked for, instead of a stream.
  void whenStreamed(const std::function<void(ScriptedHub&)>& act) {
    script->onRequest = [this, act](ScriptedHub& hub, const sns_client_request_msg& request) {
      if (ssc::SensorUid(request.suid()) != a || request.msg_id() != 513) return false;
      act(hub);
      return true;
    };
  }

  [[nodiscard]] milliseconds elapsed() const {
    return std::chrono::duration_cast<milliseconds>(connection->clock().now().time_since_epoch());
  }

  const ssc::SensorUid a{1, 1};
  const ssc::SensorUid b{2, 2};
  std::shared_ptr<HubScript> script = std::make_shared<HubScript>();
  std::unique_ptr<ssc::Connection> connection;
  std::unique_ptr<PlainCalibrator> calibrator;
};

sns_client_event_msg messageOf(const ssc::SensorUid& suid,
                               const std::vector<std::pair<std::uint32_t, std::string>>& events) {
  sns_client_event_msg message;
  suid.CopyTo(message.mutable_suid());
  for (const auto& [id, payload] : events) {
    auto* event = message.add_events();
    event->set_msg_id(id);
    event->set_timestamp(19'200'000);
    event->set_payload(payload);
  }
  return message;
}

TEST_F(CalibratorCollect, StoresTheSamplesOfThePeriodInOrder) {
  script->sensors[0].reading = [](int index) { return std::vector<float>{static_cast<float>(index), 7}; };
  EXPECT_EQ(collect(seconds(1)).result, kTimedOut);
  const auto& stored = calibrator->samples[a];
  ASSERT_EQ(stored.size(), 10U);
  EXPECT_EQ(stored[3].values, SampleData({3, 7}));
  EXPECT_DOUBLE_EQ(stored[3].time, 0.4);
  EXPECT_EQ(elapsed(), seconds(1));
}

TEST_F(CalibratorCollect, SaysThatItCollects) {
  EXPECT_EQ(collect(seconds(1)).out, "Collecting samples...\n");
}

TEST_F(CalibratorCollect, EnablesAndDisablesEachSensorInKeyOrder) {
  calibrator->SetSensorInfo(b, "Temperature", 5);
  collect(milliseconds(100));
  ASSERT_EQ(script->requests.size(), 4U);
  EXPECT_EQ(script->requestIdsTo(a), std::vector<std::uint32_t>({513, 10}));
  EXPECT_EQ(script->requestIdsTo(b), std::vector<std::uint32_t>({513, 10}));
  EXPECT_EQ(ssc::SensorUid(script->requests[0].suid()), a);
  EXPECT_EQ(ssc::SensorUid(script->requests[1].suid()), b);
  sns_std_sensor_config config;
  ASSERT_TRUE(config.ParseFromString(script->requests[1].request().payload()));
  EXPECT_EQ(config.sample_rate(), 5.0F);
}

TEST_F(CalibratorCollect, APeriodOfZeroTimesOutAtOnceAfterTheRequests) {
  EXPECT_EQ(collect(seconds(0)).result, kTimedOut);
  EXPECT_EQ(elapsed(), milliseconds(0));
  EXPECT_EQ(script->requestIdsTo(a), std::vector<std::uint32_t>({513, 10}));
}

TEST_F(CalibratorCollect, ForgetsTheSamplesOfTheCollectionBefore) {
  script->sensors[0].reading = [](int) { return std::vector<float>{1}; };
  collect(seconds(1));
  collect(milliseconds(300));
  EXPECT_EQ(calibrator->samples[a].size(), 3U);
}

TEST_F(CalibratorCollect, AHandlerThatHasEnoughEndsItWithSuccess) {
  script->sensors[0].reading = [](int) { return std::vector<float>{1}; };
  calibrator->endsAfter = [](std::size_t count) { return count >= 5; };
  EXPECT_EQ(collect(seconds(10)).result, 0);
  EXPECT_EQ(calibrator->samples[a].size(), 5U);
  EXPECT_EQ(elapsed(), milliseconds(500));
}

TEST_F(CalibratorCollect, TheRestOfAMessageIsNotLookedAtOnceAHandlerHasEnough) {
  whenStreamed([&](ScriptedHub& hub) {
    hub.SendMessage(milliseconds(1), messageOf(a, {{1025, encodeReading({1})}, {1025, encodeReading({2})}}));
  });
  calibrator->endsAfter = [](std::size_t) { return true; };
  EXPECT_EQ(collect(seconds(1)).result, 0);
  EXPECT_EQ(calibrator->samples[a].size(), 1U);
}

TEST_F(CalibratorCollect, StoresOnlySensorEvents) {
  whenStreamed([&](ScriptedHub& hub) {
    hub.SendMessage(milliseconds(1), messageOf(a, {{128, "not an event"}, {1025, encodeReading({4})}}));
  });
  EXPECT_EQ(collect(seconds(1)).result, kTimedOut);
  ASSERT_EQ(calibrator->samples[a].size(), 1U);
  EXPECT_EQ(calibrator->samples[a][0].values, SampleData({4}));
  EXPECT_EQ(calibrator->samples[a][0].time, 1.0);
}

TEST_F(CalibratorCollect, AnotherEventMayEndItBeforeTheRestOfItsMessage) {
  whenStreamed([&](ScriptedHub& hub) {
    hub.SendMessage(milliseconds(20), messageOf(a, {{1025, encodeReading({4})},
                                                    {770, "ignored"},
                                                    {771, "awaited"},
                                                    {772, "never looked at"},
                                                    {1025, encodeReading({5})}}));
  });
  std::vector<std::uint32_t> others;
  calibrator->onOtherEvent = [&](std::uint32_t messageId) {
    others.push_back(messageId);
    return messageId == 771;
  };
  EXPECT_EQ(collect(seconds(1)).result, 0);
  EXPECT_EQ(elapsed(), milliseconds(20));
  EXPECT_EQ(others, std::vector<std::uint32_t>({770, 771}));
  EXPECT_EQ(calibrator->samples[a].size(), 1U);
}

TEST_F(CalibratorCollect, AMalformedEventEndsItAndTheRestOfItsMessageIsDropped) {
  whenStreamed([&](ScriptedHub& hub) {
    hub.SendMessage(
        milliseconds(30),
        messageOf(a, {{1025, encodeReading({1})}, {1025, "\xff\xff\xff"}, {1025, encodeReading({2})}}));
  });
  const Captured captured = collect(seconds(1));
  EXPECT_EQ(captured.result, kMalformed);
  EXPECT_EQ(captured.err, "ERROR: Received malformed sensor event\n");
  EXPECT_EQ(calibrator->samples[a].size(), 1U);
  EXPECT_EQ(elapsed(), milliseconds(30));
}

TEST_F(CalibratorCollect, AnErrorThatTheHubReportsIsSaidAndEndsNothing) {
  whenStreamed([&](ScriptedHub& hub) {
    hub.SendMessage(milliseconds(30), messageOf(a, {{130, "\x08\x07"}, {1025, encodeReading({1})}}));
    hub.SendMessage(milliseconds(40), messageOf(a, {{130, "\xff"}}));
  });
  const Captured captured = collect(seconds(1));
  EXPECT_EQ(captured.result, kTimedOut);
  EXPECT_EQ(captured.out, "Collecting samples...\nWARN: The hub reports error 7 of Barometer\n");
  EXPECT_EQ(calibrator->samples[a].size(), 1U);
}

TEST_F(CalibratorCollect, AnEventWithoutStatusIsMalformed) {
  whenStreamed([&](ScriptedHub& hub) { hub.SendEvent(milliseconds(1), a, 1025, ""); });
  EXPECT_EQ(collect(seconds(1)).result, kMalformed);
}

TEST_F(CalibratorCollect, DropsEventsWithTooFewValuesAndSaysSoOnce) {
  calibrator->SetSensorInfo(a, "Magnetometer", 10, 3);
  whenStreamed([&](ScriptedHub& hub) {
    hub.SendReading(milliseconds(1), a, {1, 2});
    hub.SendReading(milliseconds(2), a, {});
    hub.SendReading(milliseconds(3), a, {1, 2, 3});
    hub.SendReading(milliseconds(4), a, {1, 2, 3, 4});
  });
  const Captured captured = collect(seconds(1));
  EXPECT_EQ(calibrator->samples[a].size(), 2U);
  EXPECT_EQ(captured.out,
            "Collecting samples...\n"
            "WARN: Dropping Magnetometer events with fewer than 3 values (this is said once)\n");
}

TEST_F(CalibratorCollect, AnEventWithoutValuesIsNeverASample) {
  script->sensors[0].reading = [](int) { return std::vector<float>{}; };
  collect(seconds(1));
  EXPECT_TRUE(calibrator->samples[a].empty());
}

TEST_F(CalibratorCollect, ARefusedRequestIsTheResult) {
  script->refuses = [](const sns_client_request_msg& request) { return request.msg_id() == 513; };
  EXPECT_EQ(collect(seconds(1)).result, -5);
  EXPECT_EQ(elapsed(), milliseconds(0));
}

TEST_F(CalibratorCollect, ACollectionThatNeverBeganHasNoSamples) {
  calibrator->SetSensorInfo(b, "Temperature", 5);
  script->onRequest = [this](ScriptedHub& hub, const sns_client_request_msg& request) {
    // Sensor a has begun to stream when sensor b is asked.
    if (ssc::SensorUid(request.suid()) == b && request.msg_id() == 513) {
      for (int i = 0; i < 50; ++i) hub.SendReading(milliseconds(0), a, {1});
    }
    return false;
  };
  script->refuses = [this](const sns_client_request_msg& request) {
    return ssc::SensorUid(request.suid()) == b && request.msg_id() == 513;
  };
  const Captured captured = collect(seconds(1));
  EXPECT_EQ(captured.result, -5);
  EXPECT_TRUE(calibrator->samples.empty());
  EXPECT_EQ(captured.out, "Collecting samples...\nWARN: Unable to start the sensors. Error = -5\n");
}

TEST_F(CalibratorCollect, APeriodWhoseSamplesNoMemoryCouldHoldIsRefusedAtOnce) {
  const Captured captured = collect(std::chrono::hours(24 * 365) * 100'000);
  EXPECT_EQ(captured.result, ssc::kInvalid);
  EXPECT_EQ(captured.out, "");
  EXPECT_EQ(captured.err,
            "ERROR: The samples of 3153600000000 seconds take 2522880000 MB, more memory than there is\n");
  EXPECT_TRUE(script->requests.empty());
}

TEST_F(CalibratorCollect, SamplesThatAreNotKeptTakeNoMemory) {
  script->sensors[0].reading = [](int) { return std::vector<float>{1}; };
  calibrator->keepsSamples = false;
  calibrator->endsAfter = [](std::size_t count) { return count >= 5; };
  EXPECT_EQ(collect(seconds(2'147'483'647)).result, 0);
}

TEST_F(CalibratorCollect, TracesItsHandlersAtTheHighestLevel) {
  script->sensors[0].reading = [](int) { return std::vector<float>{1}; };
  ssc::setLogLevel(ssc::kLogVerbose);
  const Captured captured = collect(milliseconds(100));
  EXPECT_NE(
      captured.out.find("VERBOSE: virtual void Calibrator::OnEvent(const sns_client_event_msg &) -->\n"
                        "VERBOSE: virtual void Calibrator::OnEvent(const sns_client_event_msg &) <--\n"),
      std::string::npos);
}

class CalibratorReconnect : public CalibratorCollect, public testing::WithParamInterface<int> {
 protected:
  /// The hub goes away `times` times, 100 ms after each time that the stream was asked for.
  void loseHub(int times) {
    script->sensors[0].reading = [](int) { return std::vector<float>{1}; };
    script->onRequest = [this, times](ScriptedHub& hub, const sns_client_request_msg& request) {
      if (request.msg_id() == 513 && losses < times) {
        ++losses;
        hub.GoAwayAndReturn(milliseconds(150), milliseconds(50));
      }
      return false;
    };
  }
  int losses = 0;
};

TEST_P(CalibratorReconnect, IsSurvivedByStreamingAgain) {
  loseHub(GetParam());
  EXPECT_EQ(collect(seconds(2)).result, kTimedOut);
  EXPECT_EQ(script->countRequests(a, 513), GetParam() + 1);
  // One sample at 100 ms of each stream that was cut at 150 ms, then 10 a second of what is left.
  const int left = 20 - 2 * GetParam();
  EXPECT_EQ(calibrator->samples[a].size(), static_cast<std::size_t>(GetParam() + left));
  EXPECT_EQ(elapsed(), seconds(2));
}
INSTANTIATE_TEST_SUITE_P(OneToThreeTimes, CalibratorReconnect, testing::Values(1, 2, 3));

using CalibratorReconnectTooOften = CalibratorReconnect;

TEST_F(CalibratorReconnectTooOften, TheFourthTimeEndsIt) {
  loseHub(4);
  ssc::setLogLevel(ssc::kLogDebug);
  const Captured captured = collect(seconds(10));
  EXPECT_EQ(captured.result, -11);
  EXPECT_EQ(elapsed(), milliseconds(800));
  EXPECT_EQ(captured.out,
            "Collecting samples...\nDEBUG: Retry 1\nDEBUG: Retry 2\nDEBUG: Retry 3\n"
            "WARN: The hub went away more than 3 times\n"
            "DEBUG: Exhausted all retries\nDEBUG: Retry failed\n");
}

TEST_F(CalibratorReconnectTooOften, RetriesAreCountedOverTheWholeRunAndStartAgainOnceExhausted) {
  loseHub(2);
  EXPECT_EQ(collect(seconds(1)).result, kTimedOut);
  losses = 0;
  EXPECT_EQ(collect(seconds(1)).result, -11);  // the fourth in all
  losses = 0;
  EXPECT_EQ(collect(seconds(1)).result, kTimedOut);  // the counter has started again
}

TEST_F(CalibratorReconnectTooOften, AHubThatRefusesToStreamAgainEndsIt) {
  loseHub(1);
  script->refuses = [this](const sns_client_request_msg& request) {
    return request.msg_id() == 513 && losses == 1;
  };
  ssc::setLogLevel(ssc::kLogDebug);
  const Captured captured = collect(seconds(10));
  EXPECT_EQ(captured.result, -5);
  EXPECT_EQ(captured.out,
            "Collecting samples...\nDEBUG: Retry 1\n"
            "WARN: Unable to start the sensors after the hub was away. Error = -5\n"
            "DEBUG: Retry failed\n");
}

TEST_F(CalibratorReconnectTooOften, AReconnectionIsTracedAtTheHighestLevel) {
  loseHub(1);
  script->sensors[0].reading = nullptr;
  ssc::setLogLevel(ssc::kLogVerbose);
  EXPECT_EQ(collect(seconds(1)).out,
            "Collecting samples...\n"
            "VERBOSE: virtual void Calibrator::OnReconnect() -->\n"
            "DEBUG: Retry 1\n"
            "VERBOSE: virtual void Calibrator::OnReconnect() <--\n");
}

TEST_F(CalibratorReconnectTooOften, AHubThatStaysAwayIsATimeOut) {
  script->onRequest = [](ScriptedHub& hub, const sns_client_request_msg& request) {
    if (request.msg_id() == 513) hub.GoAwayAndReturn(milliseconds(150), std::chrono::hours(1));
    return false;
  };
  EXPECT_EQ(collect(seconds(1)).result, kTimedOut);
}

class CalibratorPrint : public CalibratorCollect {
 protected:
  void store(const ssc::SensorUid& suid, double time, const SampleData& values) {
    calibrator->samples[suid].emplace_back(time, values.begin(), values.end());
  }
  std::string printed() {
    return capture([&] { calibrator->PrintSamples(); }).out;
  }
};

TEST_F(CalibratorPrint, EachSensorsSamplesAndRateInKeyOrder) {
  calibrator->SetSensorInfo(b, "Temperature", 5);
  calibrator->SetSensorInfo(a, "Barometer", 10);
  store(b, 2, {25.5F});
  store(a, 1, {1000, -0.5F});
  store(a, 1.25, {1001, 0.5F});
  store(a, 1.5, {1002, 1});
  EXPECT_EQ(printed(),
            "\n"
            "Barometer Samples:\n"
            "1.000000    1000.000000      -0.500000\n"
            "1.250000    1001.000000       0.500000\n"
            "1.500000    1002.000000       1.000000\n"
            "(count 3 @ ~4.000 Hz)\n\n"
            "Temperature Samples:\n"
            "2.000000      25.500000\n");
}

TEST_F(CalibratorPrint, SamplesOfOneMomentHaveAnInfiniteRate) {
  calibrator->SetSensorInfo(a, "Barometer", 10);
  store(a, 1, {1});
  store(a, 1, {2});
  EXPECT_EQ(
      printed(),
      "\nBarometer Samples:\n1.000000       1.000000\n1.000000       2.000000\n(count 2 @ ~inf Hz)\n\n");
}

TEST_F(CalibratorPrint, NothingAtAllWhenQuiet) {
  calibrator->quiet = true;
  store(a, 1, {1});
  EXPECT_EQ(printed(), "");
}

TEST_F(CalibratorPrint, AnEmptyLineWhenThereAreNoSamples) { EXPECT_EQ(printed(), "\n"); }

TEST_F(CalibratorPrint, ASensorThatNobodyRegisteredHasNoName) {
  store(a, 1, {1});
  EXPECT_EQ(printed(), "\n Samples:\n1.000000       1.000000\n");
  EXPECT_EQ(calibrator->sensorInfo.count(a), 1U);
}

TEST_F(CalibratorPrint, ManySamplesAreAllPrinted) {
  calibrator->SetSensorInfo(a, "Barometer", 10);
  for (int i = 0; i < 2000; ++i) store(a, i, {static_cast<float>(i)});
  const std::string text = printed();
  EXPECT_EQ(std::count(text.begin(), text.end(), '\n'), 2 + 2000 + 2);
  EXPECT_NE(text.find("\n1999.000000    1999.000000\n(count 2000 @ ~1.000 Hz)\n\n"), std::string::npos);
}

TEST_F(CalibratorPrint, ACollectionPrintsWhenAsked) {
  script->sensors[0].reading = [](int) { return std::vector<float>{1}; };
  calibrator->SetSensorInfo(a, "Barometer", 10);
  const Captured captured = capture([&] { return calibrator->CollectSamples(milliseconds(100), true); });
  EXPECT_EQ(captured.out, "Collecting samples...\n\nBarometer Samples:\n0.100000       1.000000\n");
}

TEST_F(CalibratorCollect, TheFirstSensorInfoOfASensorCounts) {
  calibrator->SetSensorInfo(a, "First", 20);
  calibrator->SetSensorInfo(a, "Second", 50, 9);
  ASSERT_EQ(calibrator->sensorInfo.size(), 1U);
  EXPECT_EQ(calibrator->sensorInfo[a].name, "First");
  EXPECT_EQ(calibrator->sensorInfo[a].rate, 20.0F);
  EXPECT_EQ(calibrator->sensorInfo[a].minimumValues, 1U);
}

TEST_F(CalibratorCollect, ARateThatIsNotAboveZeroAsksForReportsOnChange) {
  calibrator->SetSensorInfo(a, "Proximity", 0);
  const auto requests = calibrator->GetAllConfigRequests();
  ASSERT_EQ(requests.size(), 1U);
  sns_client_request_msg request;
  ASSERT_TRUE(request.ParseFromString(requests[0]));
  EXPECT_EQ(request.msg_id(), 514U);
}

}  // namespace
