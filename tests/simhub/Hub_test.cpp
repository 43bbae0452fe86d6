#include "simhub/Hub.h"

#include <algorithm>
#include <cmath>
#include <map>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "simhub/HubHarness.h"
#include "simhub/Sensor.h"

namespace {

using simhub::kErrorEvent;
using simhub::kSensorEvent;
using simhub::Suid;
using simhub::Time;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::SizeIs;

constexpr const char* kGroup = "barochip_0_platform.pressure.fac_cal";

std::string testPayload() {
  sns_physical_sensor_test_config config;
  config.set_test_type(SNS_PHYSICAL_SENSOR_TEST_TYPE_FACTORY);
  return config.SerializeAsString();
}

sns_std_error errorOf(const std::optional<SeenEvent>& event) {
  sns_std_error_event error;
  EXPECT_TRUE(event && event->messageId == kErrorEvent && error.ParseFromString(event->payload));
  return error.error();
}

/// The bias of the barometer's calibration.
sns_registry_data biasItems(float bias) {
  sns_registry_data items;
  addFloat(addGroup(&items, "bias")->mutable_subgrp(), "x", bias);
  return items;
}

// ---- Look-up and attributes ----

TEST(Hub, ListsTheSensorsOfADataType) {
  HubHarness hub;
  EXPECT_THAT(hub.LookUp("pressure"), ElementsAre(simhub::suidForName("pressure")));
  EXPECT_THAT(hub.LookUp("pressure_raw"), ElementsAre(simhub::suidForName("pressure_raw")));
  EXPECT_THAT(hub.LookUp("registry"), SizeIs(1));
  EXPECT_THAT(hub.LookUp("suid"), ElementsAre(simhub::kLookupSuid));
  EXPECT_THAT(hub.LookUp("flux_capacitor"), IsEmpty());
}

TEST(Hub, ListsEverySensorWithoutADataTypeAndOneWhereTheDefaultIsAsked) {
  HubHarness hub;
  EXPECT_THAT(hub.LookUp(""), SizeIs(hub.scenario.sensors.size() + 2));
  sns_suid_req request;
  request.set_default_only(true);
  const auto event = hub.Ask(simhub::kLookupSuid, simhub::kSuidRequest, request.SerializeAsString());
  sns_suid_event answer;
  ASSERT_TRUE(event && answer.ParseFromString(event->payload));
  EXPECT_EQ(answer.suid_size(), 1);
}

TEST(Hub, ListsSeveralSensorsInTheOrderOfTheirKeys) {
  HubHarness hub({"sensor.b.like=pressure", "sensor.b.data_type=pressure", "sensor.a.like=pressure",
                  "sensor.a.data_type=pressure"});
  EXPECT_THAT(hub.LookUp("pressure"), ElementsAre(simhub::suidForName("a"), simhub::suidForName("b"),
                                                  simhub::suidForName("pressure")));
}

TEST(Hub, EveryAttributeIsThere) {
  HubHarness hub({"sensor.pressure.hardware_id=3", "sensor.pressure.ranges=[[0, 1], [300, 1100]]",
                  "sensor.pressure.selected_range=1"});
  const auto event = hub.Ask(hub.Find("pressure"), simhub::kAttributesRequest);
  ASSERT_TRUE(event && event->messageId == simhub::kAttributesEvent);
  sns_std_attr_event attributes;
  ASSERT_TRUE(attributes.ParseFromString(event->payload));
  std::map<int, sns_std_attr_value> byId;
  for (const sns_std_attr& attribute : attributes.attributes()) byId[attribute.attr_id()] = attribute.value();
  std::vector<int> ids;
  for (const auto& [id, value] : byId) ids.push_back(id);
  EXPECT_THAT(ids, ElementsAre(0, 1, 2, 3, 4, 6, 7, 11, 16, 18, 20, 22, 23, 29));
  EXPECT_EQ(byId[simhub::kAttributeName].values(0).str(), "barochip_0");
  EXPECT_EQ(byId[simhub::kAttributeDataType].values(0).str(), "pressure");
  EXPECT_TRUE(byId[simhub::kAttributeAvailable].values(0).boolean());
  EXPECT_EQ(byId[simhub::kAttributeRates].values_size(), 5);
  EXPECT_EQ(byId[simhub::kAttributeRanges].values(1).subtype().values(0).flt(), 300);
  EXPECT_EQ(byId[simhub::kAttributeSelectedRange].values(1).flt(), 1100);
  EXPECT_EQ(byId[simhub::kAttributeStreamType].values(0).sint(), 0);
  EXPECT_EQ(byId[simhub::kAttributeHardwareId].values(0).sint(), 3);
}

TEST(Hub, AttributesAreAnsweredWithTheUpdateFlagToo) {
  HubHarness hub;
  sns_std_attr_req request;
  request.set_register_updates(true);
  const auto event = hub.Ask(hub.Find("pressure"), simhub::kAttributesRequest, request.SerializeAsString());
  EXPECT_TRUE(event && event->messageId == simhub::kAttributesEvent);
}

// ---- Requests that make no sense ----

TEST(Hub, RespondsBeforeItAnswers) {
  HubHarness hub({"hub.response_latency_ms=0.2", "hub.answer_latency_ms=0.3"});
  (void)hub.LookUp("pressure");
  ASSERT_THAT(hub.responses, SizeIs(1));
  EXPECT_EQ(hub.responses[0].at, Time{200'000});
  EXPECT_EQ(hub.responses[0].response.transactionId, 1);
  EXPECT_EQ(hub.responses[0].response.result, 0);
  EXPECT_EQ(hub.responses[0].response.clientId, hub.client);
  ASSERT_THAT(hub.events, SizeIs(1));
  EXPECT_EQ(hub.events[0].at, Time{500'000});
}

TEST(Hub, UnknownSuidIsRefusedInTheResponse) {
  HubHarness hub;
  EXPECT_TRUE(hub.Send({1, 2}, simhub::kAttributesRequest));
  hub.Run(1);
  ASSERT_THAT(hub.responses, SizeIs(1));
  EXPECT_EQ(hub.responses[0].response.result, simhub::kQmiFailure);
  EXPECT_THAT(hub.events, IsEmpty());
}

TEST(Hub, UnknownMessageIsTakenAndAnsweredByAnErrorEvent) {
  HubHarness hub;
  for (const char* const dataType : {"pressure", "registry", "suid"}) {
    EXPECT_EQ(errorOf(hub.Ask(hub.Find(dataType), 9999)), SNS_STD_ERROR_NOT_SUPPORTED) << dataType;
    EXPECT_EQ(hub.responses.back().response.result, 0);
  }
}

TEST(Hub, PayloadsThatDoNotDecodeAreAnsweredByAnErrorEvent) {
  HubHarness hub;
  const std::string bad = "\xff\xff";
  EXPECT_EQ(errorOf(hub.Ask(hub.Find("pressure"), simhub::kAttributesRequest, bad)),
            SNS_STD_ERROR_INVALID_TYPE);
  EXPECT_EQ(errorOf(hub.Ask(hub.Find("pressure"), simhub::kStreamConfigRequest, bad)),
            SNS_STD_ERROR_INVALID_TYPE);
  EXPECT_EQ(errorOf(hub.Ask(hub.Find("pressure"), simhub::kTestRequest, bad)), SNS_STD_ERROR_INVALID_TYPE);
  EXPECT_EQ(errorOf(hub.Ask(hub.Find("registry"), simhub::kRegistryReadRequest, bad)),
            SNS_STD_ERROR_INVALID_TYPE);
  EXPECT_EQ(errorOf(hub.Ask(hub.Find("registry"), simhub::kRegistryWriteRequest, bad)),
            SNS_STD_ERROR_INVALID_TYPE);
  EXPECT_EQ(errorOf(hub.Ask(simhub::kLookupSuid, simhub::kSuidRequest, bad)), SNS_STD_ERROR_INVALID_TYPE);
}

TEST(Hub, MalformedDatagramsAreDroppedCountedAndReported) {
  HubHarness hub;
  const std::vector<std::uint8_t> junk{1, 2, 3};
  EXPECT_TRUE(hub.hub->HandleDatagram(hub.client, junk));
  EXPECT_TRUE(hub.hub->HandleDatagram(hub.client, {}));
  hub.Run(1);
  EXPECT_EQ(hub.hub->Statistics().malformedDatagrams, 2U);
  EXPECT_THAT(hub.diagnostics, SizeIs(2));
  EXPECT_THAT(hub.datagrams, IsEmpty());
  EXPECT_THAT(hub.LookUp("pressure"), SizeIs(1)) << "the hub goes on";
}

TEST(Hub, RequestThatDoesNotDecodeIsRefused) {
  HubHarness hub;
  const std::vector<std::uint8_t> bad{0xff, 0xff};
  std::vector<std::uint8_t> datagram;
  ASSERT_TRUE(qmi::encodeRequest(77, bad, &datagram));
  EXPECT_TRUE(hub.hub->HandleDatagram(hub.client, datagram));
  hub.Run(1);
  ASSERT_THAT(hub.responses, SizeIs(1));
  EXPECT_EQ(hub.responses[0].response.transactionId, 77);
  EXPECT_EQ(hub.responses[0].response.result, simhub::kQmiFailure);
  EXPECT_EQ(hub.hub->Statistics().malformedDatagrams, 1U);
}

TEST(Hub, RatesThatMakeNoSenseAreRefused) {
  HubHarness hub;
  const Suid suid = hub.Find("pressure");
  for (const float rate : {0.0F, -5.0F, std::nanf(""), INFINITY}) {
    EXPECT_EQ(errorOf(hub.Ask(suid, simhub::kStreamConfigRequest, ratePayload(rate))),
              SNS_STD_ERROR_INVALID_VALUE);
  }
  hub.Run(10);
  EXPECT_THAT(hub.Readings(suid), IsEmpty());
}

// ---- Streams ----

TEST(Hub, StreamsAtTheAskedRate) {
  HubHarness hub({"hub.start_ticks=1000", "sensor.pressure.latency_ms=2"});
  const Suid suid = hub.Find("pressure");
  const Time start = hub.hub->Now();
  hub.Configure(suid, 20);
  hub.Run(1.0);
  const auto events = hub.EventsOf(suid, kSensorEvent);
  ASSERT_THAT(events, SizeIs(19));  // the 20th is taken at the end and still under way
  for (std::size_t i = 0; i < events.size(); ++i) {
    const Time taken = start + (i + 1) * Time{50'000'000};
    EXPECT_EQ(events[i].ticks, 1000 + simhub::toTicks(taken));
    EXPECT_EQ(events[i].at, taken + Time{2'000'000});
  }
}

TEST(Hub, PeriodsThatAreNoWholeNanosecondsDoNotAddUp) {
  HubHarness hub({"hub.start_ticks=0", "sensor.pressure.latency_ms=0"});
  const Suid suid = hub.Find("pressure");
  const Time start = hub.hub->Now();
  hub.Configure(suid, 3);
  hub.Run(30'000);
  EXPECT_EQ(hub.EventsOf(suid, kSensorEvent).size(), 90'000U);
  EXPECT_EQ(hub.events.back().at, start + simhub::fromSeconds(30'000));
}

TEST(Hub, HighestSupportedRateIsTheLimit) {
  HubHarness hub({"sensor.pressure.rates=[1, 10]"});
  const Suid suid = hub.Find("pressure");
  hub.Configure(suid, 1000);
  hub.Run(10.01);
  EXPECT_THAT(hub.Readings(suid), SizeIs(100));
}

TEST(Hub, TimePassesAtAnyRateThatASensorWithoutRatesIsAskedFor) {
  HubHarness hub({"sensor.bare.model=barometer", "sensor.bare.name=bare"});
  hub.Configure(simhub::suidForName("bare"), 3e38F);
  const Time start = hub.hub->Now();
  constexpr int kSteps = 1000;
  for (int i = 0; i < kSteps; ++i) hub.hub->Step();
  EXPECT_GT(hub.hub->Now() - start, simhub::fromSeconds(0.9 * kSteps / simhub::kMaxSensorRate));
}

TEST(Hub, EachClientGetsItsOwnRateOfOneSensor) {
  HubHarness hub;
  const Suid suid = hub.Find("pressure");
  const simhub::ClientId other = hub.hub->AddClient();
  hub.Configure(suid, 20);
  EXPECT_TRUE(hub.SendAs(other, suid, simhub::kStreamConfigRequest, ratePayload(5)));
  hub.Run(10.01);
  std::map<simhub::ClientId, std::vector<std::uint64_t>> ticks;
  for (const SeenEvent& event : hub.EventsOf(suid, kSensorEvent)) ticks[event.client].push_back(event.ticks);
  EXPECT_THAT(ticks[hub.client], SizeIs(200));
  ASSERT_THAT(ticks[other], SizeIs(50));
  for (const std::uint64_t tick : ticks[other]) EXPECT_THAT(ticks[hub.client], testing::Contains(tick));
}

TEST(Hub, FasterClientLeavingSlowsTheSensorDown) {
  HubHarness hub;
  const Suid suid = hub.Find("pressure");
  const simhub::ClientId other = hub.hub->AddClient();
  hub.Configure(suid, 20);
  EXPECT_TRUE(hub.SendAs(other, suid, simhub::kStreamConfigRequest, ratePayload(5)));
  hub.Run(1.01);
  const std::size_t before = hub.EventsOf(suid, kSensorEvent).size();
  hub.hub->RemoveClient(hub.client);
  hub.Run(10);
  const auto events = hub.EventsOf(suid, kSensorEvent);
  EXPECT_EQ(events.size() - before, 50U);
  EXPECT_EQ(events.back().ticks - events[events.size() - 2].ticks, 19'200'000U / 5);
}

TEST(Hub, ConfigurationSentAgainReplacesTheFirst) {
  HubHarness hub;
  const Suid suid = hub.Find("pressure");
  hub.Configure(suid, 20);
  hub.Configure(suid, 5);
  hub.Run(2.01);
  EXPECT_THAT(hub.Readings(suid), SizeIs(10));
}

TEST(Hub, DisableEndsTheStream) {
  HubHarness hub;
  const Suid suid = hub.Find("pressure");
  hub.Configure(suid, 20);
  hub.Run(1);
  EXPECT_TRUE(hub.Send(suid, simhub::kDisableRequest));
  const std::size_t before = hub.Readings(suid).size();
  hub.Run(10);
  EXPECT_EQ(hub.Readings(suid).size(), before);
  EXPECT_EQ(hub.hub->NextEventTime(), std::nullopt);
}

TEST(Hub, NothingIsDeliveredToAClientThatIsGone) {
  HubHarness hub;
  EXPECT_TRUE(hub.Send(simhub::kLookupSuid, simhub::kSuidRequest));
  hub.Configure(simhub::suidForName("pressure"), 20);
  hub.hub->RemoveClient(hub.client);
  hub.Run(10);
  EXPECT_THAT(hub.datagrams, IsEmpty());
  EXPECT_FALSE(hub.Send(simhub::kLookupSuid, simhub::kSuidRequest));
}

TEST(Hub, BatchesForTheAskedTime) {
  HubHarness hub;
  const Suid suid = hub.Find("pressure");
  hub.Configure(suid, 20, 500'000);
  hub.Run(2.01);
  const auto events = hub.EventsOf(suid, kSensorEvent);
  ASSERT_THAT(events, SizeIs(40));
  for (std::size_t i = 0; i < events.size(); ++i) EXPECT_EQ(events[i].report - events[0].report, i / 10);
  EXPECT_EQ(events[1].ticks - events[0].ticks, 19'200'000U / 20) << "time stamps stay those of the readings";
}

TEST(Hub, BatchesAsTheScenarioSays) {
  HubHarness hub({"hub.batch=4", "sensor.pressure_raw.batch=1"});
  const Suid suid = hub.Find("pressure");
  const Suid raw = hub.Find("pressure_raw");
  hub.Configure(suid, 20);
  hub.Configure(raw, 20);
  hub.Run(1.01);
  const auto events = hub.EventsOf(suid, kSensorEvent);
  ASSERT_THAT(events, SizeIs(20));
  EXPECT_EQ(events[0].report, events[3].report);
  EXPECT_NE(events[3].report, events[4].report);
  const auto single = hub.EventsOf(raw, kSensorEvent);
  EXPECT_NE(single[0].report, single[1].report);
}

TEST(Hub, LongBatchesStayWithinAMessage) {
  HubHarness hub({"sensor.pressure.rates=[1000]"});
  const Suid suid = hub.Find("pressure");
  hub.Configure(suid, 1000, 4'000'000'000U);
  hub.Run(100);
  EXPECT_GT(hub.EventsOf(suid, kSensorEvent).size(), 50'000U);
  for (const auto& datagram : hub.datagrams) EXPECT_LT(datagram.size(), 65'000U);
}

TEST(Hub, AccuracyIsLowUntilTheSensorHasSettled) {
  HubHarness hub({"sensor.pressure.settling_ms=200"});
  const Suid suid = hub.Find("pressure");
  hub.Configure(suid, 10);
  hub.Run(0.51);
  std::vector<int> accuracies;
  for (const auto& reading : hub.Readings(suid)) accuracies.push_back(reading.status());
  EXPECT_THAT(accuracies, ElementsAre(1, 3, 3, 3, 3));
}

TEST(Hub, WithoutARateASensorSendsItsReadingAtOnceAndThenEachChange) {
  HubHarness hub({"sensor.pressure.noise=0", "sensor.pressure.bias=0", "sensor.pressure.settling_ms=0",
                  "world.pressure=[{at=0, value=1000}, {at=5, value=1001}]"});
  const Suid suid = hub.Find("pressure");
  EXPECT_TRUE(hub.Send(suid, simhub::kOnChangeConfigRequest));
  hub.Run(1);
  EXPECT_THAT(hub.Readings(suid), SizeIs(1));
  hub.Run(9);
  ASSERT_THAT(hub.Readings(suid), SizeIs(2));
  EXPECT_EQ(hub.Readings(suid)[0].data(0), 1000);
  EXPECT_EQ(hub.Readings(suid)[1].data(0), 1001);
}

TEST(Hub, OnChangeSensorSendsChangesOnlyWhateverTheRate) {
  HubHarness hub(
      {"sensor.pressure.stream=on_change", "sensor.pressure.noise=0", "sensor.pressure.settling_ms=0"});
  const Suid suid = hub.Find("pressure");
  hub.Configure(suid, 20);
  hub.Run(10);
  EXPECT_THAT(hub.Readings(suid), SizeIs(1));
}

TEST(Hub, SingleOutputSensorSendsOneReading) {
  HubHarness hub({"sensor.pressure.stream=single_output"});
  const Suid suid = hub.Find("pressure");
  EXPECT_TRUE(hub.Send(suid, simhub::kOnChangeConfigRequest));
  hub.Run(10);
  EXPECT_THAT(hub.Readings(suid), SizeIs(1));
  EXPECT_EQ(hub.hub->NextEventTime(), std::nullopt);
}

// ---- Readings and calibration ----

TEST(Hub, ReadsTheWorldThroughTheErrorModel) {
  HubHarness hub({"world.pressure=1000", "sensor.pressure.bias=3", "sensor.pressure.noise=0.02"});
  const Suid suid = hub.Find("pressure_raw");
  hub.Configure(suid, 20);
  hub.Run(100);
  EXPECT_THAT(hub.Readings(suid), SizeIs(1999));
  EXPECT_NEAR(hub.MeanReading(suid), 1003, 5 * 0.02 / std::sqrt(1999));
}

class CalibrationLoop : public testing::TestWithParam<std::uint32_t> {};

TEST_P(CalibrationLoop, CalibratedStreamFollowsTheRegistryWhenTold) {
  HubHarness hub({"sensor.pressure.noise=0", "sensor.pressure.quantisation=0", "sensor.pressure.bias=3"});
  const Suid calibrated = hub.Find("pressure");
  const Suid raw = hub.Find("pressure_raw");
  ASSERT_EQ(hub.WriteRegistry(kGroup, biasItems(3)), SNS_REGISTRY_WRITE_STATUS_SUCCESS);
  hub.Configure(calibrated, 20);
  hub.Configure(raw, 20);
  hub.Run(0.06);
  EXPECT_FLOAT_EQ(hub.Readings(calibrated).back().data(0), 1016.25F) << "not told yet";

  const auto reply = hub.Ask(calibrated, GetParam(), GetParam() == simhub::kTestRequest ? testPayload() : "");
  ASSERT_TRUE(reply);
  hub.Run(0.06);

  EXPECT_FLOAT_EQ(hub.Readings(calibrated).back().data(0), 1013.25F);
  EXPECT_FLOAT_EQ(hub.Readings(raw).back().data(0), 1016.25F);
}

INSTANTIATE_TEST_SUITE_P(BothWays, CalibrationLoop,
                         testing::Values(simhub::kCalibrationChangedRequest, simhub::kTestRequest));

TEST(Hub, ConfirmsTheNotification) {
  HubHarness hub;
  const auto reply = hub.Ask(hub.Find("pressure"), simhub::kCalibrationChangedRequest);
  ASSERT_TRUE(reply);
  EXPECT_EQ(reply->messageId, simhub::kCalibrationChangedReply);
  EXPECT_EQ(reply->payload, "");
}

TEST(Hub, PassesTheFactoryTest) {
  HubHarness hub;
  const auto reply = hub.Ask(hub.Find("pressure"), simhub::kTestRequest, testPayload());
  sns_physical_sensor_test_event event;
  ASSERT_TRUE(reply && reply->messageId == simhub::kTestEvent && event.ParseFromString(reply->payload));
  EXPECT_TRUE(event.test_passed());
  EXPECT_EQ(event.test_type(), SNS_PHYSICAL_SENSOR_TEST_TYPE_FACTORY);
}

TEST(Hub, SensorThatIsNotPhysicalKnowsNeitherTestNorNotification) {
  HubHarness hub({"sensor.pressure.physical=false"});
  const Suid suid = hub.Find("pressure");
  EXPECT_EQ(errorOf(hub.Ask(suid, simhub::kTestRequest, testPayload())), SNS_STD_ERROR_NOT_SUPPORTED);
  EXPECT_EQ(errorOf(hub.Ask(suid, simhub::kCalibrationChangedRequest)), SNS_STD_ERROR_NOT_SUPPORTED);
}

TEST(Hub, RestartAppliesWhatTheRegistryHolds) {
  HubHarness hub({"sensor.pressure.noise=0", "sensor.pressure.quantisation=0", "sensor.pressure.bias=3"});
  ASSERT_EQ(hub.WriteRegistry(kGroup, biasItems(3)), SNS_REGISTRY_WRITE_STATUS_SUCCESS);
  hub.Restart();
  hub.Configure(hub.Find("pressure"), 20);
  hub.Run(0.06);
  EXPECT_FLOAT_EQ(hub.Readings(simhub::suidForName("pressure")).back().data(0), 1013.25F);
}

// ---- The registry over the wire ----

TEST(Hub, ReadsAndMergesRegistryGroups) {
  HubHarness hub;
  EXPECT_EQ(show(hub.ReadRegistry(kGroup).value()), "bias={x=0}, mean_temp=0");
  ASSERT_EQ(hub.WriteRegistry(kGroup, biasItems(2.5F)), SNS_REGISTRY_WRITE_STATUS_SUCCESS);
  EXPECT_EQ(show(hub.ReadRegistry(kGroup).value()), "bias={x=2.5}, mean_temp=0");
  EXPECT_EQ(show(hub.ReadRegistry(std::string(kGroup) + ".bias").value()), "x=2.5");
}

TEST(Hub, MissingGroupIsAnErrorEvent) {
  HubHarness hub;
  sns_registry_read_req request;
  request.set_name("nothing");
  EXPECT_EQ(errorOf(hub.Ask(hub.Find("registry"), simhub::kRegistryReadRequest, request.SerializeAsString())),
            SNS_STD_ERROR_NOT_AVAILABLE);
}

TEST(Hub, UnusableRegistryFileIsAnErrorEventAndIsLeftAlone) {
  HubHarness hub;
  hub.folder.WriteFile(std::string("registry/") + kGroup, "not JSON");
  hub.Restart();
  EXPECT_THAT(hub.diagnostics, ElementsAre(HasSubstr(kGroup)));
  EXPECT_EQ(hub.ReadRegistry(kGroup), std::nullopt);
  EXPECT_EQ(hub.WriteRegistry(kGroup, biasItems(1)), SNS_REGISTRY_WRITE_STATUS_FAILED);
  EXPECT_EQ(hub.folder.ReadFile(std::string("registry/") + kGroup), "not JSON");
}

TEST(Hub, GroupTooLargeForAReportIsAnErrorEvent) {
  HubHarness hub;
  for (int part = 0; part < 4; ++part) {
    sns_registry_data items;
    for (int i = 0; i < 40; ++i) {
      sns_registry_data_item* const item = items.add_items();
      item->set_name(std::to_string(part) + "_" + std::to_string(i));
      item->set_str(std::string(1000, 'x'));
    }
    ASSERT_EQ(hub.WriteRegistry("big", items), SNS_REGISTRY_WRITE_STATUS_SUCCESS);
  }
  EXPECT_EQ(hub.ReadRegistry("big"), std::nullopt);
}

// ---- Determinism ----

std::vector<std::vector<std::uint8_t>> run(const std::vector<std::string>& overrides) {
  HubHarness hub(overrides);
  hub.Configure(hub.Find("pressure"), 20);
  hub.Configure(hub.Find("sensor_temperature"), 5);
  hub.Run(5);
  return hub.datagrams;
}

TEST(Hub, SameScenarioAndSeedGiveTheSameBytes) {
  EXPECT_EQ(run({}), run({}));
  EXPECT_NE(run({}), run({"hub.seed=2"}));
}

TEST(Hub, SensorsNoiseDoesNotDependOnTheOthers) {
  HubHarness alone;
  alone.Configure(alone.Find("pressure"), 20);
  alone.Run(2);
  HubHarness together;
  together.Configure(together.Find("pressure_raw"), 20);
  together.Configure(together.Find("pressure"), 20);
  together.Run(2);
  const Suid suid = simhub::suidForName("pressure");
  const auto a = alone.Readings(suid);
  const auto b = together.Readings(suid);
  ASSERT_EQ(a.size(), b.size());
  for (std::size_t i = 0; i < a.size(); ++i) EXPECT_EQ(a[i].data(0), b[i].data(0));
}

TEST(Hub, EveryBuiltInScenarioHasItsBarometer) {
  for (const std::string& name : simhub::builtInScenarios()) {
    HubHarness hub({}, name);
    EXPECT_THAT(hub.LookUp("pressure"), SizeIs(1)) << name;
    EXPECT_THAT(hub.LookUp("pressure_raw"), SizeIs(name == "e4d4" ? 0 : 1)) << name;
    const auto& sensors = hub.scenario.sensors;
    const auto barometer = std::find_if(sensors.begin(), sensors.end(),
                                        [](const auto& each) { return each.dataType == "pressure"; });
    ASSERT_NE(barometer, sensors.end()) << name;
    const std::string package = simhub::packageName(barometer->name);
    EXPECT_TRUE(std::any_of(sensors.begin(), sensors.end(), [&](const auto& each) {
      return each.dataType == "sensor_temperature" && simhub::packageName(each.name) == package;
    })) << name;
    const std::string group = package + "_0_platform.pressure.fac_cal";
    ASSERT_TRUE(hub.ReadRegistry(group)) << name;
    EXPECT_THAT(show(*hub.ReadRegistry(group)), HasSubstr("bias={x=")) << name;
  }
}

}  // namespace
