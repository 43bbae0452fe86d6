// What needs a hub that behaves oddly at a chosen moment, or two runs of one command. Whole runs are golden
// cases.
#include "prox/UdProxCalibrator.h"

#include <limits>

#include "prox/OffsetCommandTest.h"
#include "ssc/RegistryUtil.h"
#include "ssc/Results.h"

namespace {

using testing::HasSubstr;
using testing::Not;

constexpr const char* kGroup = "chipa_0_platform.prox.fac_cal";
constexpr std::size_t kEnough = 11;  // ten, and one that is thrown away

class UdProxTest : public OffsetCommandTest<UdProxCalibrator> {
 protected:
  UdProxTest() : OffsetCommandTest("proximity_raw") {
    sns_registry_data& data = script->registry[kGroup];
    addIntItem(&data, "version", 4);
    addFloatItem(&data, "ppulse", 15, 7);
    addIntItem(&data, "pldrive", 10);
    addIntItem(&data, "ore", 1);
    addIntItem(&data, "poffset", 5);
  }

  static void addIntItem(sns_registry_data* data, const std::string& name, std::int64_t value) {
    sns_registry_data_item* const item = data->add_items();
    item->set_name(name);
    item->set_version(1);
    item->set_sint(value);
  }
  /// As the hub has it now.
  const sns_registry_data_item& stored(const std::string& name) {
    return *ssc::RegistryUtil::FindDataItem(name, &script->registry.at(kGroup));
  }
  [[nodiscard]] int writes() const { return script->countRequests(HubScript::registrySuid(), 513); }
  [[nodiscard]] int notifications() const { return script->countRequests(sensor, 610); }
};

TEST_F(UdProxTest, FirstGoodReadingOfEachCollectionIsThrownAway) {
  std::vector<ProximityReading> all(12, {10});
  all[0] = {500, {}, true, SNS_STD_SENSOR_SAMPLE_STATUS_ACCURACY_LOW};
  all[1] = {900};
  stream({readings(all)});
  for (int i = 0; i < 2; ++i) {
    const Captured captured = run({"prox"});
    EXPECT_EQ(captured.result, 0) << captured.err;
    EXPECT_THAT(captured.out, HasSubstr("ADC_AVG:      10.000000\n"));
    EXPECT_THAT(captured.out, Not(HasSubstr("900.0")));
  }
}

TEST_F(UdProxTest, CollectionThatWasCutShortLeavesTheNextOneArmed) {
  stream({{{kReadingId, ProximityReading{10}.Encode()}, {kReadingId, "\xff"}}});
  stream({readings({{30}, {10}})});
  EXPECT_EQ(run({"prox"}).result, ssc::kMalformed);
  const Captured captured = run({"prox", "-s", "2"});
  EXPECT_EQ(captured.result, 0) << captured.err;
  EXPECT_THAT(captured.out, HasSubstr("ADC_AVG:      20.000000\n"));
}

TEST_F(UdProxTest, PulseNumberMakesTheAverageTheTarget) {
  stream({readings(kEnough, {250})});
  const Captured captured = run({"prox", "ppulse", "500"});
  EXPECT_EQ(captured.result, 0) << captured.err;
  EXPECT_THAT(captured.out, HasSubstr("\nADC_AVG:     250.000000\nPPULSE:        31.000000\n"
                                      "Writing registry...\n"
                                      "Proximity pulse number calibration succeeded.\n"));
  EXPECT_EQ(stored("ppulse").flt(), 31.0F);
  EXPECT_EQ(stored("ppulse").version(), 8);
  EXPECT_EQ(stored("version").version(), 1);
  EXPECT_EQ(notifications(), 1);
}

TEST_F(UdProxTest, PulseNumberOfAnotherKindCountsAsOnePulse) {
  ssc::RegistryUtil::FindDataItem("ppulse", &script->registry[kGroup])->set_sint(15);
  stream({readings(kEnough, {250})});
  const Captured captured = run({"prox", "ppulse", "5000"});
  EXPECT_EQ(captured.result, 0) << captured.err;
  EXPECT_EQ(stored("ppulse").flt(), 19.0F);  // 5000 · 1 / 250 − 1
}

TEST_F(UdProxTest, CurrentMakesTheWholeAverageTheTarget) {
  std::vector<ProximityReading> all(kEnough, {251});
  all.back() = {250};  // an average of 250.9
  stream({readings(all)});
  const Captured captured = run({"prox", "pldrive", "500"});
  EXPECT_EQ(captured.result, 0) << captured.err;
  EXPECT_THAT(captured.out, HasSubstr("NEW PLDRIVE:        20.000000\n"));
  EXPECT_EQ(stored("pldrive").sint(), 20);
  EXPECT_EQ(stored("pldrive").version(), 2);
}

TEST_F(UdProxTest, NegativeStoredCurrentBecomesTheLeast) {
  ssc::RegistryUtil::FindDataItem("pldrive", &script->registry[kGroup])->set_sint(-10);
  stream({readings(kEnough, {250})});
  EXPECT_EQ(run({"prox", "pldrive", "500"}).result, 0);
  EXPECT_EQ(stored("pldrive").sint(), 2);
}

TEST_F(UdProxTest, NothingIsWrittenWithoutLight) {
  stream({readings(kEnough, {0})});
  for (const char* const task : {"ppulse", "pldrive"}) {
    const Captured captured = run({"prox", task, "500"});
    EXPECT_EQ(captured.result, ssc::kInvalid);
    EXPECT_THAT(captured.err, HasSubstr("The average raw reading is 0: there is nothing to scale\n"));
    EXPECT_THAT(captured.out, HasSubstr("calibration failed.\n"));
  }
  EXPECT_EQ(writes(), 0);
}

TEST_F(UdProxTest, CurrentNeedsAWholeCountOfLight) {
  std::vector<ProximityReading> all(kEnough, {0});
  all.back() = {1};
  stream({readings(all)});
  EXPECT_EQ(run({"prox", "pldrive", "500"}).result, ssc::kInvalid);
  EXPECT_EQ(writes(), 0);
  const Captured pulses = run({"prox", "ppulse", "500"});
  EXPECT_EQ(pulses.result, 0) << pulses.err;
  EXPECT_EQ(stored("ppulse").flt(), 63.0F);
}

TEST_F(UdProxTest, NothingIsWrittenThatIsNotFinite) {
  stream({readings(kEnough, {1})});
  const Captured pulses = run({"prox", "ppulse", "1e38"});
  EXPECT_EQ(pulses.result, ssc::kInvalid);
  EXPECT_THAT(pulses.err, HasSubstr("The number of pulses is not a finite number: inf\n"));
  const Captured current = run({"prox", "pldrive", "1e38"});
  EXPECT_EQ(current.result, ssc::kInvalid);
  EXPECT_THAT(current.err, HasSubstr("The pulse current is not a finite number: inf\n"));
  EXPECT_EQ(writes(), 0);
}

TEST_F(UdProxTest, HugeTargetsStopAtTheLimits) {
  stream({readings(kEnough, {1})});
  EXPECT_EQ(run({"prox", "ppulse", "1e30"}).result, 0);
  EXPECT_EQ(stored("ppulse").flt(), 63.0F);
  EXPECT_EQ(run({"prox", "pldrive", "1e30"}).result, 0);
  EXPECT_EQ(stored("pldrive").sint(), 25);
}

// ---- A collection that fails otherwise than by its time ----

TEST_F(UdProxTest, FailedCollectionStoresNoPulsesAndIsASuccess) {
  stream({{{kReadingId, "\xff"}}});
  const Captured captured = run({"prox", "ppulse", "500"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_EQ(captured.out,
            "Searching for proximity sensor...\n"
            "Enabling pulse number calibration...\n"
            "Proximity pulse number calibration begins.\n"
            "Collecting samples...\n"
            "Writing registry...\n"
            "Proximity pulse number calibration succeeded.\n");
  EXPECT_EQ(stored("ppulse").flt(), 0.0F);
  EXPECT_EQ(stored("ppulse").version(), 8);
  EXPECT_EQ(notifications(), 1);
}

TEST_F(UdProxTest, FailedCollectionStoresTheCurrentAsItIsAndIsASuccess) {
  ssc::RegistryUtil::FindDataItem("pldrive", &script->registry[kGroup])->set_sint(1000);
  stream({{{kReadingId, "\xff"}}});
  const Captured captured = run({"prox", "pldrive", "500"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_EQ(captured.out,
            "Searching for proximity sensor...\n"
            "Enabling pulse current calibration...\n"
            "Proximity pulse current calibration begins.\n"
            "Collecting samples...\n"
            "NEW PLDRIVE:      1000.000000\n"
            "Writing registry...\n"
            "Proximity pulse current calibration succeeded.\n");
  EXPECT_EQ(stored("pldrive").sint(), 1000);
  EXPECT_EQ(stored("pldrive").version(), 2);
}

TEST_F(UdProxTest, FailedCollectionFailsADryRun) {
  stream({{{kReadingId, "\xff"}}});
  arguments.dryRun = true;
  const Captured pulses = run({"prox", "ppulse", "500"});
  EXPECT_EQ(pulses.result, ssc::kMalformed);
  EXPECT_THAT(pulses.out, HasSubstr("Collecting samples...\nSkipping registry write due to dry run.\n"
                                    "Proximity pulse number calibration failed.\n"));
  const Captured current = run({"prox", "pldrive", "500"});
  EXPECT_EQ(current.result, ssc::kMalformed);
  EXPECT_THAT(current.out, HasSubstr("Collecting samples...\nNEW PLDRIVE:        10.000000\n"
                                     "Skipping registry write due to dry run.\n"
                                     "Proximity pulse current calibration failed.\n"));
  EXPECT_EQ(writes(), 0);
  EXPECT_EQ(notifications(), 0);
}

TEST_F(UdProxTest, RefusedStreamIsSuchAFailureToo) {
  // The registry's write request has the same number.
  script->refuses = [this](const sns_client_request_msg& request) {
    return request.msg_id() == 513 && ssc::SensorUid(request.suid()) == sensor;
  };
  EXPECT_EQ(run({"prox", "ppulse", "500"}).result, 0);
  EXPECT_EQ(stored("ppulse").flt(), 0.0F);
}

TEST_F(UdProxTest, FailedCollectionWhoseWriteFailsIsAFailure) {
  stream({{{kReadingId, "\xff"}}});
  script->registryWritesFail = true;
  const Captured captured = run({"prox", "ppulse", "500"});
  EXPECT_EQ(captured.result, ssc::kIoError);
  EXPECT_THAT(captured.out, HasSubstr("Proximity pulse number calibration failed.\n"));
}

TEST_F(UdProxTest, TimeOutStoresNothing) {
  stream({readings(kEnough / 2, {250})});
  for (const char* const task : {"ppulse", "pldrive"}) {
    const Captured captured = run({"prox", task, "500"});
    EXPECT_EQ(captured.result, ssc::kTimedOut);
    EXPECT_THAT(captured.err, HasSubstr("Timed out waiting for proximity sensor samples\n"));
    EXPECT_THAT(captured.out, HasSubstr("calibration failed.\n"));
    EXPECT_THAT(captured.out, Not(HasSubstr("ADC_AVG")));
  }
  EXPECT_EQ(writes(), 0);
}

TEST_F(UdProxTest, CollectionThatEndsWithoutAReadingStoresNothing) {
  stream({{{773, encodeAnswer<sns_oem_ore_resp>(true, true)}}});
  for (const char* const task : {"ppulse", "pldrive"}) {
    const Captured captured = run({"prox", task, "500"});
    EXPECT_EQ(captured.result, ssc::kNoData);
    EXPECT_THAT(captured.err, HasSubstr("No Proximity Raw samples were received\n"));
    EXPECT_THAT(captured.out, HasSubstr("calibration failed.\n"));
  }
  EXPECT_EQ(writes(), 0);
}

TEST_F(UdProxTest, UnconfirmedNotificationIsOnlyAWarning) {
  script->sensors[0].confirms = false;
  stream({readings(kEnough, {250})});
  const Captured captured = run({"prox", "ppulse", "500"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_THAT(captured.out, HasSubstr("WARN: Unable to notify sensor of completed calibration\n"
                                      "WARN: A reboot may be required for the calibration to take effect\n"
                                      "Proximity pulse number calibration succeeded.\n"));
}

// ---- The offset ----

TEST_F(UdProxTest, StoresTheAveragesWithoutTheirFractions) {
  std::vector<ProximityReading> all(kEnough, {250, {60, 2}});
  all.back() = {250, {69, 11}};
  stream({readings(all)});
  answerPoffset(true, false);
  const Captured captured = run({"prox", "poffset", "disable", "-w"});
  EXPECT_EQ(captured.result, 0) << captured.err;
  EXPECT_THAT(captured.out, HasSubstr("\nADC_AVG:     250.000000\n"
                                      "ADC_ORE:       2.900000\n"
                                      "ADC_POFFSET:      60.900002\n"
                                      "\n"
                                      "NEW ORE:             2.900000\n"
                                      "NEW POFFSET:        60.900002\n"
                                      "\n"
                                      "Writing registry...\n"
                                      "Proximity poffset calibration succeeded.\n"));
  EXPECT_EQ(stored("ore").sint(), 2);
  EXPECT_EQ(stored("poffset").sint(), 60);
  EXPECT_EQ(stored("ore").version(), 2);
  EXPECT_EQ(stored("poffset").version(), 2);
  EXPECT_EQ(notifications(), 1);
}

TEST_F(UdProxTest, WritesOnlyWhenItDisablesAndIsToldTo) {
  stream({readings(kEnough, {250})});
  answerPoffset(true, true);
  EXPECT_EQ(run({"prox", "poffset", "enable", "-w"}).result, 0);
  EXPECT_EQ(run({"prox", "poffset", "disable"}).result, 0);
  EXPECT_EQ(run({"prox", "-w", "sample"}).result, 0);
  EXPECT_EQ(writes(), 0);
  EXPECT_EQ(run({"prox", "-w", "poffset"}).result, 0);
  EXPECT_EQ(writes(), 1);
}

TEST_F(UdProxTest, FailedCollectionNeverStoresAnOffset) {
  stream({readings(3, {250})});
  stream({{{kReadingId, "\xff"}}});
  answerPoffset(true, false);
  EXPECT_EQ(run({"prox", "poffset", "disable", "-w"}).result, ssc::kTimedOut);
  const Captured captured = run({"prox", "poffset", "disable", "-w"});
  EXPECT_EQ(captured.result, ssc::kMalformed);
  EXPECT_THAT(captured.out, Not(HasSubstr("ADC_AVG")));
  EXPECT_EQ(writes(), 0);
}

TEST_F(UdProxTest, RejectedOffsetCalibrationIsSampledAllTheSame) {
  stream({readings(kEnough, {250})});
  answerPoffset(false, true);
  const Captured captured = run({"prox", "poffset"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_THAT(captured.err, HasSubstr("Failed to enable POFFSET\n"));
  EXPECT_THAT(captured.out, HasSubstr("ADC_POFFSET:      60.000000\n"));
}

TEST_F(UdProxTest, OffsetsThatAreNoIntegersAreNotStored) {
  constexpr float kNan = std::numeric_limits<float>::quiet_NaN();
  stream({readings(kEnough, {250, {kNan, 2}})});
  stream({readings(kEnough, {250, {60, 1e30F}})});
  answerPoffset(true, false);
  const Captured offset = run({"prox", "poffset", "-w"});
  EXPECT_EQ(offset.result, ssc::kInvalid);
  EXPECT_THAT(offset.err, HasSubstr("The average cannot be stored in \"poffset\": nan\n"));
  EXPECT_THAT(offset.out, HasSubstr("Proximity poffset calibration failed.\n"));
  const Captured extension = run({"prox", "poffset", "-w"});
  EXPECT_EQ(extension.result, ssc::kInvalid);
  EXPECT_THAT(extension.err, HasSubstr("The average cannot be stored in \"ore\": "));
  EXPECT_EQ(writes(), 0);
}

TEST_F(UdProxTest, ValuesThatAnEventLacksCountAs0AndAreMissedOnce) {
  std::vector<ProximityReading> all(kEnough, {250, {60}});
  all[4] = {250, {}};
  stream({readings(all)});
  answerPoffset(true, false);
  const Captured captured = run({"prox", "poffset"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_THAT(captured.out, HasSubstr("ADC_ORE:       0.000000\nADC_POFFSET:      54.000000\n"));
  const std::string warning = "WARN: Proximity events without both POFFSET and ORE";
  ASSERT_THAT(captured.out, HasSubstr(warning));
  EXPECT_EQ(captured.out.find(warning), captured.out.rfind(warning));
}

// ---- The extension ----

TEST_F(UdProxTest, ExtensionRequestCarriesPulsesWithoutTheirFractions) {
  answerOre(true, true);
  const Captured captured = run({"prox", "ore", "enable", "16.9", "4294967040"});
  EXPECT_EQ(captured.result, 0) << captured.err;
  EXPECT_EQ(captured.out, "Searching for proximity sensor...\nEnabling ORE...\nORE enabled.\n");
  const auto request = requestOf<sns_oem_ore_req>(772);
  EXPECT_EQ(request.enable(), SNS_OEM_PROXIMITY_MODE_ENABLE);
  EXPECT_EQ(request.pulse_number(), 16U);
  EXPECT_EQ(request.pulse_length(), 4294967040U);
  EXPECT_EQ(script->countRequests(sensor, 513), 0);
}

TEST_F(UdProxTest, ExtensionIsDisabledWithPulsesToo) {
  answerOre(true, false);
  const Captured captured = run({"prox", "ore", "disable", "0", "0"});
  EXPECT_EQ(captured.result, 0) << captured.err;
  EXPECT_THAT(captured.out, HasSubstr("Disabling ORE...\nORE disabled.\n"));
  const auto request = requestOf<sns_oem_ore_req>(772);
  EXPECT_EQ(request.enable(), SNS_OEM_PROXIMITY_MODE_DISABLE);
  EXPECT_TRUE(request.has_pulse_number());
  EXPECT_TRUE(request.has_pulse_length());
}

TEST_F(UdProxTest, RejectedExtensionIsOnlyReported) {
  answerOre(false, true);
  const Captured captured = run({"prox", "ore", "disable", "1", "1"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_THAT(captured.err, HasSubstr("Failed to enable ORE\n"));
}

TEST_F(UdProxTest, MalformedExtensionAnswerFails) {
  reply(772, {{{773, "\xff"}}});
  const Captured captured = run({"prox", "ore", "enable", "1", "1"});
  EXPECT_EQ(captured.result, ssc::kMalformed);
  EXPECT_THAT(captured.err, HasSubstr("Received malformed ore response\n"));
  EXPECT_THAT(captured.err, HasSubstr("ORE request failed\n"));
}

TEST_F(UdProxTest, MissingOrRefusedExtensionFails) {
  const Captured missing = run({"prox", "ore", "enable", "1", "1"});
  EXPECT_EQ(missing.result, ssc::kTimedOut);
  EXPECT_THAT(missing.err, HasSubstr("ORE request failed\n"));
  script->refuses = [](const sns_client_request_msg& request) { return request.msg_id() == 772; };
  const Captured refused = run({"prox", "ore", "enable", "1", "1"});
  EXPECT_EQ(refused.result, ssc::kIoError);
  EXPECT_THAT(refused.err, HasSubstr("ORE request failed\n"));
}

TEST_F(UdProxTest, HubThatComesBackDuringTheExtensionRequestHasForgottenIt) {
  script->onRequest = [&](ScriptedHub& hub, const sns_client_request_msg& request) {
    if (request.msg_id() == 772) {
      hub.GoAwayAndReturn(std::chrono::milliseconds(10), std::chrono::milliseconds(10));
    }
    if (request.msg_id() == 513) {
      hub.SendMessage(std::chrono::milliseconds(1), messageOf(sensor, readings(20, {10})));
    }
    return false;
  };
  const Captured captured = run({"prox", "ore", "enable", "1", "1"});
  EXPECT_EQ(captured.result, ssc::kTimedOut);
  EXPECT_THAT(captured.err, HasSubstr("ORE request failed\n"));
  EXPECT_EQ(script->countRequests(sensor, 513), 1);
}

}  // namespace
