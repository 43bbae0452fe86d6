#include <cmath>
#include <filesystem>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "simhub/Fault.h"
#include "simhub/HubHarness.h"

namespace {

using simhub::kErrorEvent;
using simhub::kSensorEvent;
using simhub::Suid;
using simhub::Time;
using testing::Contains;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::SizeIs;

constexpr const char* kGroup = "barochip_0_platform.pressure.fac_cal";

/// Overrides for one fault named f, the sensor without noise.
std::vector<std::string> fault(const std::vector<std::string>& keys) {
  std::vector<std::string> overrides{"sensor.pressure.noise=0", "sensor.pressure.settling_ms=0"};
  for (const std::string& key : keys) overrides.push_back("fault.f." + key);
  return overrides;
}

/// A hub with the fault whose barometer streams for a second at 10 Hz.
class Streaming {
 public:
  explicit Streaming(const std::vector<std::string>& keys) : hub(fault(keys)), suid(hub.Find("pressure")) {
    hub.Configure(suid, 10);
    hub.Run(1.01);
  }
  HubHarness hub;
  Suid suid;
};

sns_registry_data bias(float value) {
  sns_registry_data items;
  addFloat(addGroup(&items, "bias")->mutable_subgrp(), "x", value);
  return items;
}

int errorOf(const std::optional<SeenEvent>& event) {
  sns_std_error_event error;
  EXPECT_TRUE(event && event->messageId == kErrorEvent && error.ParseFromString(event->payload));
  return static_cast<int>(error.error());
}

TEST(Fault, TableIsInTheOrderOfItsKinds) {
  int index = 0;
  for (const simhub::FaultKindRow& row : simhub::faultKinds()) {
    EXPECT_EQ(static_cast<int>(row.kind), index++) << row.name;
    EXPECT_EQ(simhub::findFaultKind(row.name), &row);
  }
}

// ---- Readings ----

TEST(HubFaults, SilentSensorTakesRequestsAndSendsNothing) {
  Streaming run({"kind=silent", "sensor=pressure"});
  EXPECT_THAT(run.hub.Readings(run.suid), IsEmpty());
  EXPECT_EQ(run.hub.responses.back().response.result, 0);
  EXPECT_TRUE(run.hub.Ask(run.suid, simhub::kAttributesRequest));
}

TEST(HubFaults, OtherSensorsAreNotStruck) {
  HubHarness hub(fault({"kind=silent", "sensor=pressure"}));
  const Suid raw = hub.Find("pressure_raw");
  hub.Configure(raw, 10);
  hub.Run(1.01);
  EXPECT_THAT(hub.Readings(raw), SizeIs(10));
}

TEST(HubFaults, FaultWithoutASensorStrikesAll) {
  HubHarness hub(fault({"kind=silent"}));
  hub.Configure(hub.Find("pressure"), 10);
  hub.Configure(hub.Find("pressure_raw"), 10);
  hub.Run(1.01);
  EXPECT_THAT(hub.EventsOf(simhub::suidForName("pressure"), kSensorEvent), IsEmpty());
  EXPECT_THAT(hub.EventsOf(simhub::suidForName("pressure_raw"), kSensorEvent), IsEmpty());
}

TEST(HubFaults, WindowIsInHubTime) {
  HubHarness hub(fault({"kind=silent", "from=2", "until=3"}));
  const Suid suid = hub.Find("pressure");
  hub.Configure(suid, 10);
  hub.Run(5);
  const auto events = hub.EventsOf(suid, kSensorEvent);
  for (const SeenEvent& event : events) {
    EXPECT_TRUE(event.at < simhub::fromSeconds(2) || event.at >= simhub::fromSeconds(3));
  }
  EXPECT_THAT(events, SizeIs(39));
}

TEST(HubFaults, AfterAndCountAreInReadings) {
  Streaming run({"kind=nan", "sensor=pressure", "after=3", "count=2"});
  const auto readings = run.hub.Readings(run.suid);
  ASSERT_THAT(readings, SizeIs(10));
  for (std::size_t i = 0; i < readings.size(); ++i) {
    EXPECT_EQ(std::isnan(readings[i].data(0)), i == 3 || i == 4) << i;
  }
}

TEST(HubFaults, LowAccuracy) {
  Streaming run({"kind=low_accuracy", "sensor=pressure"});
  ASSERT_THAT(run.hub.Readings(run.suid), SizeIs(10));
  for (const auto& reading : run.hub.Readings(run.suid)) {
    EXPECT_EQ(reading.status(), SNS_STD_SENSOR_SAMPLE_STATUS_ACCURACY_LOW);
  }
}

TEST(HubFaults, ShortEvent) {
  Streaming run({"kind=short_event", "sensor=pressure"});
  ASSERT_THAT(run.hub.Readings(run.suid), SizeIs(10));
  for (const auto& reading : run.hub.Readings(run.suid)) EXPECT_EQ(reading.data_size(), 0);
}

TEST(HubFaults, ExtraValues) {
  Streaming run({"kind=extra_values", "sensor=pressure", "values=3"});
  ASSERT_THAT(run.hub.Readings(run.suid), SizeIs(10));
  for (const auto& reading : run.hub.Readings(run.suid)) EXPECT_EQ(reading.data_size(), 4);
}

TEST(HubFaults, MalformedPayload) {
  Streaming run({"kind=malformed", "sensor=pressure"});
  EXPECT_THAT(run.hub.EventsOf(run.suid, kSensorEvent), SizeIs(10));
  EXPECT_THAT(run.hub.Readings(run.suid), IsEmpty());
}

TEST(HubFaults, WrongMessageId) {
  Streaming run({"kind=wrong_id", "sensor=pressure", "id=4711"});
  EXPECT_THAT(run.hub.EventsOf(run.suid, kSensorEvent), IsEmpty());
  EXPECT_THAT(run.hub.EventsOf(run.suid, 4711), SizeIs(10));
}

TEST(HubFaults, DuplicatedEvents) {
  Streaming run({"kind=duplicate", "sensor=pressure"});
  const auto events = run.hub.EventsOf(run.suid, kSensorEvent);
  ASSERT_THAT(events, SizeIs(20));
  for (std::size_t i = 0; i < events.size(); i += 2) {
    EXPECT_EQ(events[i].ticks, events[i + 1].ticks);
    EXPECT_EQ(events[i].payload, events[i + 1].payload);
  }
}

TEST(HubFaults, ReorderedEvents) {
  Streaming run({"kind=reorder", "sensor=pressure"});
  const auto events = run.hub.EventsOf(run.suid, kSensorEvent);
  ASSERT_THAT(events, SizeIs(10));
  for (std::size_t i = 0; i < events.size(); i += 2) EXPECT_GT(events[i].ticks, events[i + 1].ticks);
  for (std::size_t i = 2; i < events.size(); i += 2) EXPECT_GT(events[i + 1].ticks, events[i - 2].ticks);
}

// ---- Requests ----

TEST(HubFaults, AbsentSensorIsNotListedAndUnknown) {
  HubHarness hub(fault({"kind=absent", "sensor=pressure"}));
  EXPECT_THAT(hub.LookUp("pressure"), IsEmpty());
  EXPECT_TRUE(hub.Send(simhub::suidForName("pressure"), simhub::kAttributesRequest));
  hub.Run(1);
  EXPECT_EQ(hub.responses.back().response.result, simhub::kQmiFailure);
}

TEST(HubFaults, QmiErrorRefusesTheRequest) {
  HubHarness hub(fault({"kind=qmi_error", "sensor=pressure", "message=513", "error=14"}));
  const Suid suid = hub.Find("pressure");
  hub.Configure(suid, 10);
  hub.Run(1);
  EXPECT_EQ(hub.responses.back().response.result, simhub::kQmiFailure);
  EXPECT_EQ(hub.responses.back().response.error, 14);
  EXPECT_THAT(hub.Readings(suid), IsEmpty());
  EXPECT_TRUE(hub.Ask(suid, simhub::kAttributesRequest)) << "another message id";
}

TEST(HubFaults, NoResponseButTheRequestIsCarriedOut) {
  HubHarness hub(fault({"kind=no_response", "sensor=pressure"}));
  const Suid suid = hub.Find("pressure");
  const std::size_t before = hub.responses.size();
  hub.Configure(suid, 10);
  hub.Run(1.01);
  EXPECT_EQ(hub.responses.size(), before);
  EXPECT_THAT(hub.Readings(suid), SizeIs(10));
}

TEST(HubFaults, LateResponse) {
  HubHarness hub(fault({"kind=late_response", "sensor=pressure", "delay=2.5"}));
  const Suid suid = hub.Find("pressure");
  const Time sent = hub.hub->Now();
  hub.Configure(suid, 10);
  hub.Run(5);
  EXPECT_EQ(hub.responses.back().at, sent + simhub::fromSeconds(2.5) + hub.scenario.hub.responseLatency);
}

TEST(HubFaults, ErrorEventInsteadOfAnAnswer) {
  HubHarness hub(fault({"kind=error_event", "sensor=pressure", "error=7"}));
  EXPECT_EQ(errorOf(hub.Ask(hub.Find("pressure"), simhub::kAttributesRequest)), SNS_STD_ERROR_POLICY);
  EXPECT_EQ(hub.responses.back().response.result, 0);
}

TEST(HubFaults, RequestsToTheServicesCanBeStruckToo) {
  HubHarness hub(fault({"kind=error_event", "sensor=registry", "after=1", "count=1"}));
  EXPECT_TRUE(hub.ReadRegistry(kGroup));
  EXPECT_FALSE(hub.ReadRegistry(kGroup));
  EXPECT_TRUE(hub.ReadRegistry(kGroup));
}

TEST(HubFaults, NoNotificationReplyButTheCalibrationIsReloaded) {
  HubHarness hub([] {
    auto overrides = fault({"kind=no_notification", "sensor=pressure"});
    overrides.push_back("sensor.pressure.quantisation=0");
    overrides.push_back("sensor.pressure.bias=3");
    return overrides;
  }());
  const Suid suid = hub.Find("pressure");
  ASSERT_EQ(hub.WriteRegistry(kGroup, bias(3)), SNS_REGISTRY_WRITE_STATUS_SUCCESS);
  EXPECT_EQ(hub.Ask(suid, simhub::kCalibrationChangedRequest), std::nullopt);
  hub.Configure(suid, 10);
  hub.Run(0.11);
  EXPECT_FLOAT_EQ(hub.Readings(suid).back().data(0), 1013.25F);
}

// ---- The registry ----

TEST(HubFaults, GroupMissing) {
  HubHarness hub(fault({"kind=group_missing", std::string("group=") + kGroup}));
  EXPECT_EQ(hub.ReadRegistry(kGroup), std::nullopt);
  sns_std_error_event error;
  ASSERT_TRUE(error.ParseFromString(hub.events.back().payload));
  EXPECT_EQ(error.error(), SNS_STD_ERROR_NOT_AVAILABLE);
  EXPECT_TRUE(hub.ReadRegistry(std::string(kGroup) + ".bias")) << "another group";
}

TEST(HubFaults, ItemMissing) {
  HubHarness hub(fault({"kind=item_missing", "item=bias"}));
  EXPECT_EQ(show(hub.ReadRegistry(kGroup).value()), "mean_temp=0");
}

TEST(HubFaults, ItemsOfTheWrongKind) {
  auto overrides = fault({"kind=item_kind", "item=bias"});
  overrides.push_back("fault.g.kind=item_kind");
  overrides.push_back("fault.g.item=mean_temp");
  HubHarness hub(overrides);
  EXPECT_EQ(show(hub.ReadRegistry(kGroup).value()), "bias=0, mean_temp={}");
}

TEST(HubFaults, ReadFails) {
  HubHarness hub(fault({"kind=read_fails"}));
  EXPECT_EQ(hub.ReadRegistry(kGroup), std::nullopt);
  sns_std_error_event error;
  ASSERT_TRUE(error.ParseFromString(hub.events.back().payload));
  EXPECT_EQ(error.error(), SNS_STD_ERROR_FAILED);
}

TEST(HubFaults, WriteFailsAndNothingIsStored) {
  HubHarness hub(fault({"kind=write_fails", "count=1"}));
  EXPECT_EQ(hub.WriteRegistry(kGroup, bias(1)), SNS_REGISTRY_WRITE_STATUS_FAILED);
  EXPECT_EQ(show(hub.ReadRegistry(kGroup).value()), "bias={x=0}, mean_temp=0");
  EXPECT_EQ(hub.WriteRegistry(kGroup, bias(1)), SNS_REGISTRY_WRITE_STATUS_SUCCESS);
}

TEST(HubFaults, TornFile) {
  HubHarness hub(fault({"kind=torn_file", std::string("group=") + kGroup}));
  ASSERT_EQ(hub.WriteRegistry(kGroup, bias(1)), SNS_REGISTRY_WRITE_STATUS_SUCCESS);
  hub.Restart();
  EXPECT_EQ(hub.ReadRegistry(kGroup), std::nullopt);
  EXPECT_THAT(hub.diagnostics, Contains(HasSubstr(kGroup)));
}

TEST(HubFaults, FullDiskFailsTheWriteThatDoesNotFit) {
  HubHarness hub(fault({"kind=full_disk", "free_bytes=100"}));
  sns_registry_data small;
  addFloat(&small, "x", 1);
  EXPECT_EQ(hub.WriteRegistry("one", small), SNS_REGISTRY_WRITE_STATUS_SUCCESS);
  EXPECT_EQ(hub.WriteRegistry("two", small), SNS_REGISTRY_WRITE_STATUS_FAILED);
  EXPECT_THAT(hub.diagnostics, Contains(HasSubstr("No space left")));
  EXPECT_FALSE(hub.ReadRegistry("two"));
}

TEST(HubFaults, FullDiskEndsWithItsWindow) {
  HubHarness hub(fault({"kind=full_disk", "until=5"}));
  EXPECT_EQ(hub.WriteRegistry(kGroup, bias(1)), SNS_REGISTRY_WRITE_STATUS_FAILED);
  hub.Run(5);
  EXPECT_EQ(hub.WriteRegistry(kGroup, bias(1)), SNS_REGISTRY_WRITE_STATUS_SUCCESS);
}

// ---- The hub ----

TEST(HubFaults, HubGoesAwayAfterSomeReadingsAndComesBack) {
  HubHarness hub(fault({"kind=hub_away", "after=5", "down_for=2"}));
  const Suid suid = hub.Find("pressure");
  hub.Configure(suid, 10);
  hub.Run(1.5);
  EXPECT_THAT(hub.Readings(suid), SizeIs(5));
  ASSERT_THAT(hub.downs, SizeIs(1));
  EXPECT_FALSE(hub.hub->IsUp());
  EXPECT_FALSE(hub.Send(suid, simhub::kAttributesRequest));
  hub.Run(5);
  ASSERT_THAT(hub.ups, ElementsAre(hub.downs[0] + simhub::fromSeconds(2)));
  EXPECT_THAT(hub.Readings(suid), SizeIs(5)) << "streams do not come back by themselves";
  hub.Configure(suid, 10);
  hub.Run(2.01);
  EXPECT_THAT(hub.Readings(suid), SizeIs(25)) << "it went away once only";
}

TEST(HubFaults, HubGoesAwaySeveralTimesAndThenNoMore) {
  HubHarness hub(fault({"kind=hub_away", "sensor=pressure", "after=3", "down_for=0.5", "times=2"}));
  const Suid suid = hub.Find("pressure");
  for (int i = 0; i < 4; ++i) {
    hub.Configure(suid, 10);
    hub.Run(2.0);
  }
  EXPECT_THAT(hub.downs, SizeIs(2));
  EXPECT_THAT(hub.ups, SizeIs(2));
}

TEST(HubFaults, HubThatStaysAway) {
  HubHarness hub(fault({"kind=hub_away", "from=2"}));
  hub.Run(10);
  EXPECT_THAT(hub.downs, ElementsAre(simhub::fromSeconds(2)));
  EXPECT_THAT(hub.ups, IsEmpty());
  EXPECT_EQ(hub.hub->NextEventTime(), std::nullopt);
}

TEST(HubFaults, HubThatComesBackReadsItsRegistryAgain) {
  HubHarness hub(fault({"kind=hub_away", "from=2", "down_for=1"}));
  ASSERT_EQ(hub.WriteRegistry(kGroup, bias(1)), SNS_REGISTRY_WRITE_STATUS_SUCCESS);
  hub.Run(2.5);
  std::filesystem::remove(hub.folder.Path(std::string("registry/") + kGroup + ".bias"));
  hub.Run(1);
  EXPECT_EQ(show(hub.ReadRegistry(kGroup).value()), "bias={x=0}, mean_temp=0");
}

TEST(HubFaults, WhatIsUnderWayWhenTheHubGoesIsLost) {
  HubHarness hub(fault({"kind=hub_away", "from=0.0001", "down_for=1"}));
  EXPECT_TRUE(hub.Send(simhub::kLookupSuid, simhub::kSuidRequest));
  hub.Run(5);
  EXPECT_THAT(hub.datagrams, IsEmpty());
}

}  // namespace
