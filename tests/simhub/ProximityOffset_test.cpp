#include "simhub/sensors/ProximityOffset.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "proto/sns_oem_proximity.pb.h"
#include "simhub/HubHarness.h"

namespace {

constexpr const char* kGroup = "proxchip5_0_platform.prox.fac_cal";
constexpr auto kEnable = SNS_OEM_PROXIMITY_MODE_ENABLE;
constexpr auto kDisable = SNS_OEM_PROXIMITY_MODE_DISABLE;

/// A hub whose raw proximity sensor neither errs nor makes noise; nothing stands before it, and its window
/// throws 100 counts back.
class ProximityOffset : public testing::Test {
 protected:
  struct Reading {
    std::uint32_t counts = 0;
    double poffset = 0;
    double steps = 0;
    bool isNear = false;
    bool operator==(const Reading&) const = default;
  };

  void start(const std::vector<std::string>& more = {}) {
    std::vector<std::string> overrides{"sensor.proximity_raw.noise=0", "sensor.proximity_raw.scale=1",
                                       "world.target_distance=100000", "world.window_crosstalk=100"};
    overrides.insert(overrides.end(), more.begin(), more.end());
    hub = std::make_unique<HubHarness>(overrides, "t5h5");
    suid = hub->Find("proximity_raw");
  }

  /// The last of a quarter of a second's readings.
  Reading read() {
    hub->events.clear();
    hub->Configure(suid, 50);
    hub->Run(0.25);
    hub->Send(suid, simhub::kDisableRequest);
    const auto events = hub->EventsOf(suid, simhub::kProximityEvent);
    sns_proximity_event event;
    if (events.empty() || !event.ParseFromString(events.back().payload) || event.data_size() != 2) {
      ADD_FAILURE() << "no reading of three values";
      return {};
    }
    return {event.raw_adc(), event.data(0), event.data(1),
            event.proximity_event_type() == SNS_PROXIMITY_EVENT_TYPE_NEAR};
  }

  sns_oem_poffset_resp switchOffset(sns_oem_proximity_mode mode) {
    sns_oem_poffset_req request;
    request.set_enable(mode);
    return ask<sns_oem_poffset_resp>(770, 771, request.SerializeAsString());
  }

  sns_oem_ore_resp switchExtension(sns_oem_proximity_mode mode, std::uint32_t number, std::uint32_t length) {
    sns_oem_ore_req request;
    request.set_enable(mode);
    request.set_pulse_number(number);
    request.set_pulse_length(length);
    return ask<sns_oem_ore_resp>(772, 773, request.SerializeAsString());
  }

  template <class Answer>
  Answer ask(std::uint32_t messageId, std::uint32_t answerId, const std::string& payload) {
    const auto event = hub->Ask(suid, messageId, payload);
    Answer answer;
    if (!event || event->messageId != answerId || !answer.ParseFromString(event->payload)) {
      ADD_FAILURE() << "no answer to " << messageId;
    }
    return answer;
  }

  void store(const std::string& item, double number, bool isFloat) {
    sns_registry_data data;
    sns_registry_data_item* const added = data.add_items();
    added->set_name(item);
    if (isFloat) {
      added->set_flt(static_cast<float>(number));
    } else {
      added->set_sint(static_cast<std::int64_t>(number));
    }
    EXPECT_EQ(hub->WriteRegistry(kGroup, data), 0);
    EXPECT_TRUE(hub->Ask(suid, simhub::kCalibrationChangedRequest).has_value());
  }

  std::unique_ptr<HubHarness> hub;
  simhub::Suid suid;
};

TEST_F(ProximityOffset, ReadsTargetAndCrosstalkUpToSixteenBits) {
  start();
  EXPECT_EQ(read(), (Reading{100, 0, 0, false}));
  start({"world.target_distance=50"});
  EXPECT_EQ(read(), (Reading{240, 0, 0, true}));
  start({"world.target_distance=0"});
  EXPECT_EQ(read(), (Reading{65535, 0, 0, true}));
}

TEST_F(ProximityOffset, EmitterSettingMultipliesTheReading) {
  start();
  store("ppulse", 63, true);
  EXPECT_EQ(read().counts, 200U);
  store("ppulse", 15, true);
  EXPECT_EQ(read().counts, 50U);
  store("pldrive", 9, false);
  EXPECT_EQ(read().counts, 25U);
}

TEST_F(ProximityOffset, EmitterSettingStaysWithinTheChipsRegisters) {
  start();
  store("ppulse", 1000, true);
  EXPECT_EQ(read().counts, 200U);
  store("ppulse", -5, true);
  EXPECT_EQ(read().counts, 3U);
  store("pldrive", -1, false);
  EXPECT_EQ(read().counts, 0U);
}

TEST_F(ProximityOffset, EmitterSettingOfAnotherKindCountsAsTheReference) {
  start();
  store("ppulse", 63, false);
  store("pldrive", 9, true);
  EXPECT_EQ(read().counts, 100U);
}

TEST_F(ProximityOffset, RequestTakesTheLightOfTheMomentOff) {
  start();
  for (const auto mode : {kDisable, kEnable}) {
    const sns_oem_poffset_resp answer = switchOffset(mode);
    EXPECT_TRUE(answer.success());
    EXPECT_EQ(answer.enabled(), mode == kEnable);
    EXPECT_EQ(read(), (Reading{0, 100, 0, false}));
  }
}

TEST_F(ProximityOffset, OffsetIsTakenOffBeforeTheEmittersSettingMultiplies) {
  start({"world.target_distance=[{at=0.0, value=100000.0}, {at=0.5, value=50.0}]"});
  switchOffset(kDisable);
  hub->Run(1);
  EXPECT_EQ(read(), (Reading{140, 100, 0, true}));
  store("poffset", 100, false);
  store("ppulse", 63, true);
  EXPECT_EQ(read(), (Reading{280, 100, 0, true}));
}

TEST_F(ProximityOffset, OffsetReachesAsFarAsItsRange) {
  start({"world.window_crosstalk=300"});
  switchOffset(kDisable);
  EXPECT_EQ(read(), (Reading{45, 255, 0, false}));
}

TEST_F(ProximityOffset, ExtensionTakesStepsOfThePulsesGivenOffFirst) {
  start({"world.window_crosstalk=300"});
  const sns_oem_ore_resp answer = switchExtension(kEnable, 16, 5);
  EXPECT_TRUE(answer.success());
  EXPECT_TRUE(answer.enabled());
  switchOffset(kDisable);
  EXPECT_EQ(read(), (Reading{0, 60, 3, false}));  // 300 = 3 · 80 + 60

  const sns_oem_ore_resp off = switchExtension(kDisable, 0, 0);
  EXPECT_TRUE(off.success());
  EXPECT_FALSE(off.enabled());
  EXPECT_EQ(read(), (Reading{240, 60, 0, true}));
  switchOffset(kDisable);
  EXPECT_EQ(read(), (Reading{45, 255, 0, false}));
}

TEST_F(ProximityOffset, ExtensionHasFifteenStepsAndNoneOfNoPulses) {
  start({"world.window_crosstalk=60000"});
  switchExtension(kEnable, 1000, 1);
  switchOffset(kDisable);
  EXPECT_EQ(read(), (Reading{44745, 255, 15, true}));
  switchExtension(kEnable, 0, 4294967295);
  switchOffset(kDisable);
  EXPECT_EQ(read(), (Reading{59745, 255, 0, true}));
}

TEST_F(ProximityOffset, CalibratesDownwardsByItselfUntilToldNotTo) {
  const std::string crosstalk = "world.window_crosstalk=[{at=0.0,value=100.0},{at=2.0,value=40.0}]";
  start({crosstalk});
  switchOffset(kEnable);
  hub->Run(3);
  EXPECT_EQ(read(), (Reading{0, 40, 0, false}));

  start({crosstalk});
  switchOffset(kDisable);
  hub->Run(3);
  EXPECT_EQ(read(), (Reading{0, 100, 0, false}));

  // It cannot tell a dirty window from a target.
  start({"world.window_crosstalk=[{at=0.0,value=40.0},{at=2.0,value=100.0}]"});
  switchOffset(kEnable);
  hub->Run(3);
  EXPECT_EQ(read(), (Reading{60, 40, 0, false}));
}

TEST_F(ProximityOffset, StoredOffsetIsTakenOffOnceTheSensorReadsIt) {
  start({"world.window_crosstalk=300"});
  store("poffset", 44, false);
  store("ore", 4, false);
  EXPECT_EQ(read(), (Reading{0, 44, 4, false}));  // 300 = 4 · 64 + 44
  hub->Restart();
  suid = hub->Find("proximity_raw");
  EXPECT_EQ(read(), (Reading{0, 44, 4, false}));
}

TEST_F(ProximityOffset, RefusedRequestsChangeNothingAndSayWhatIsInForce) {
  start({"fault.f.kind=oem_failure", "fault.f.sensor=proximity_raw"});
  const sns_oem_poffset_resp offset = switchOffset(kDisable);
  EXPECT_FALSE(offset.success());
  EXPECT_TRUE(offset.enabled());
  const sns_oem_ore_resp extension = switchExtension(kEnable, 16, 5);
  EXPECT_FALSE(extension.success());
  EXPECT_FALSE(extension.enabled());
  EXPECT_EQ(read(), (Reading{100, 0, 0, false}));
}

TEST_F(ProximityOffset, RequestsThatMakeNoSenseAreRefused) {
  start();
  for (const std::string& payload : {std::string(), std::string("\xff\xff"), std::string("\x08\x07")}) {
    EXPECT_FALSE(ask<sns_oem_poffset_resp>(770, 771, payload).success());
    EXPECT_FALSE(ask<sns_oem_ore_resp>(772, 773, payload).success());
  }
  const auto unknown = hub->Ask(suid, 774, "");
  ASSERT_TRUE(unknown.has_value());
  EXPECT_EQ(unknown->messageId, simhub::kErrorEvent);
  EXPECT_EQ(read(), (Reading{100, 0, 0, false}));
}

}  // namespace
