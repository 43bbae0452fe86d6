#include "simhub/sensors/UnderDisplayAmbientLight.h"

#include <algorithm>
#include <cmath>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "proto/sns_oem_als.pb.h"
#include "simhub/HubHarness.h"

namespace {

using testing::FloatNear;

constexpr const char* kGroup = "lightchip5_0_platform.als.fac_cal";

// The order of a reading's values.
enum Value { kLux, kC, kR, kG, kB, kIr, kGain, kIntegration, kValues };

/// A handset in 400 lx, its display off and its sensor without errors, unless `more` says otherwise.
std::vector<std::string> quiet(const std::vector<std::string>& more = {}) {
  std::vector<std::string> all{"world.illuminance=400", "world.ir_share=0", "world.display_brightness=0"};
  const std::string sensor = "sensor.ambient_light_raw.";
  for (const char* const setting : {"noise=0", "quantisation=0", "sensitivity=1"}) {
    all.push_back(sensor + setting);
  }
  for (const char* const channel : {"c", "r", "g", "b", "ir"}) {
    all.push_back(sensor + "gain_error_" + channel + "=[0,0,0]");
  }
  all.insert(all.end(), more.begin(), more.end());
  return all;
}

class Handset : public HubHarness {
 public:
  explicit Handset(const std::vector<std::string>& more = {})
      : HubHarness(quiet(more), "t5h5"), suid_(Find("ambient_light_raw")) {}

  /// A reading after it has settled, of kValues values.
  std::vector<float> reading() {
    events.clear();
    Configure(suid_, 5);
    Run(1);
    EXPECT_TRUE(Send(suid_, simhub::kDisableRequest));
    Run(1);
    const auto readings = Readings(suid_);
    if (readings.empty() || readings.back().data_size() != kValues) {
      ADD_FAILURE() << "no reading of " << kValues << " values";
      return std::vector<float>(kValues);
    }
    return {readings.back().data().begin(), readings.back().data().end()};
  }

  void ask(std::uint32_t messageId, const google::protobuf::MessageLite& request) {
    const auto answer = Ask(suid_, messageId, request.SerializeAsString());
    ASSERT_TRUE(answer && answer->messageId == messageId + 1);
  }
  void setGain(int gain) {
    sns_oem_set_gain_req request;
    request.set_gain(gain);
    ask(simhub::kAlsSetGainRequest, request);
  }
  void setTrigger(bool enable, float delay) {
    sns_oem_als_trigger_req request;
    request.set_mode(enable ? SNS_OEM_ALS_MODE_ENABLE : SNS_OEM_ALS_MODE_DISABLE);
    request.set_delay_ms(delay);
    ask(simhub::kAlsTriggerRequest, request);
  }
  void setIntegrationTime(float microseconds) {
    sns_oem_set_itime_req request;
    request.set_integration_time_us(microseconds);
    ask(simhub::kAlsSetIntegrationTimeRequest, request);
  }

  void store(const std::string& item, float value) {
    sns_registry_data data;
    addFloat(&data, item, value);
    EXPECT_EQ(WriteRegistry(kGroup, data), 0);
  }
  void notify() { EXPECT_TRUE(Ask(suid_, simhub::kCalibrationChangedRequest).has_value()); }
  void factoryTest() {
    sns_physical_sensor_test_config config;
    config.set_test_type(SNS_PHYSICAL_SENSOR_TEST_TYPE_FACTORY);
    EXPECT_TRUE(Ask(suid_, simhub::kTestRequest, config.SerializeAsString()).has_value());
  }

 private:
  const simhub::Suid suid_;
};

// ---- The light outside ----

TEST(UnderDisplayAmbientLight, MakesTheLuxOutsideOfItsChannels) {
  Handset handset;
  const auto values = handset.reading();
  EXPECT_THAT(values[kLux], FloatNear(400, 1e-3F));
  EXPECT_THAT(values[kC], FloatNear(402.455F, 1e-2F));
  EXPECT_THAT(values[kR] / values[kC], FloatNear(0.40F, 1e-5F));
  EXPECT_THAT(values[kG] / values[kC], FloatNear(0.45F, 1e-5F));
  EXPECT_THAT(values[kB] / values[kC], FloatNear(0.25F, 1e-5F));
  EXPECT_EQ(values[kIr], 0);
  EXPECT_EQ(values[kGain], 11);
  EXPECT_EQ(values[kIntegration], 1000);
}

TEST(UnderDisplayAmbientLight, SensitivityIsWhatTheScaleUndoes) {
  Handset handset({"sensor.ambient_light_raw.sensitivity=0.8"});
  EXPECT_THAT(handset.reading()[kLux], FloatNear(320, 1e-3F));
  handset.store("scale", 1.25F);
  EXPECT_THAT(handset.reading()[kLux], FloatNear(320, 1e-3F)) << "not told yet";
  handset.notify();
  EXPECT_THAT(handset.reading()[kLux], FloatNear(400, 1e-3F));
}

TEST(UnderDisplayAmbientLight, FactoryTestAndRestartReadTheCalibrationToo) {
  Handset handset;
  handset.store("scale", 2);
  handset.factoryTest();
  EXPECT_THAT(handset.reading()[kLux], FloatNear(800, 2e-3F));
  handset.store("scale", 3);
  handset.Restart();
  EXPECT_THAT(handset.reading()[kLux], FloatNear(1200, 3e-3F));
}

TEST(UnderDisplayAmbientLight, CalibrationActsOnLuxAlone) {
  Handset handset({"world.display_brightness=20", "world.illuminance=1000"});
  const auto before = handset.reading();
  for (const char* const item :
       {"scale", "c_coeff", "c_gain_ratio_10", "pwm_boundary", "pattern_w_c_coef1"}) {
    handset.store(item, 3);
  }
  handset.notify();
  const auto after = handset.reading();
  EXPECT_NE(after[kLux], before[kLux]);
  EXPECT_TRUE(std::equal(before.begin() + kC, before.end(), after.begin() + kC));
}

TEST(UnderDisplayAmbientLight, UncalibratedStreamIgnoresTheRegistry) {
  Handset handset({"sensor.ambient_light_raw.calibrated=false"});
  handset.store("scale", 2);
  handset.notify();
  EXPECT_THAT(handset.reading()[kLux], FloatNear(400, 1e-3F));
}

TEST(UnderDisplayAmbientLight, ColourMovesRedAndBlueButNotLux) {
  Handset warm({"world.color_temperature=3000"});
  Handset cold({"world.color_temperature=7000"});
  const auto red = warm.reading();
  const auto blue = cold.reading();
  EXPECT_GT(red[kR], blue[kR] * 1.4F);
  EXPECT_LT(red[kB], blue[kB] * 0.9F);
  EXPECT_THAT(red[kLux], FloatNear(400, 1e-3F));
  EXPECT_THAT(blue[kLux], FloatNear(400, 1e-3F));
}

TEST(UnderDisplayAmbientLight, InfraredIsSeenByItsChannelAndLeaksIntoTheOthersButHardlyIntoLux) {
  Handset handset({"world.ir_share=0.5", "sensor.ambient_light_raw.infrared_leak=0.3"});
  const auto values = handset.reading();
  EXPECT_THAT(values[kIr], FloatNear(200, 1e-3F));
  EXPECT_THAT(values[kC], FloatNear(402.455F + 60, 1e-2F));
  EXPECT_THAT(values[kB], FloatNear(402.455F / 4 + 60, 1e-2F));
  EXPECT_THAT(values[kLux], FloatNear(400 + 0.019F * 60, 1e-2F));
}

// ---- Gain and integration time ----

TEST(UnderDisplayAmbientLight, GainHalvesTheCountsByStepsButNotLux) {
  Handset handset;
  const float atHighest = handset.reading()[kC];
  for (const int gain : {0, 7, 8, 10}) {
    handset.setGain(gain);
    const auto values = handset.reading();
    EXPECT_EQ(values[kGain], static_cast<float>(gain));
    EXPECT_FLOAT_EQ(values[kC], std::ldexp(atHighest, gain - 11)) << gain;
    EXPECT_THAT(values[kLux], FloatNear(400, 1e-2F)) << gain;
  }
}

TEST(UnderDisplayAmbientLight, StoredGainRatiosUndoTheErrorsOfTheUpperGains) {
  Handset handset({"sensor.ambient_light_raw.gain_error_g=[0.25,-0.5,0.6]",
                   "sensor.ambient_light_raw.gain_error_ir=[1,0,0]", "world.ir_share=0.1",
                   "sensor.ambient_light_raw.infrared_leak=0"});
  const auto truth = handset.reading();
  handset.setGain(8);
  const auto before = handset.reading();
  EXPECT_FLOAT_EQ(before[kG], truth[kG] / 8 * 1.25F);
  EXPECT_FLOAT_EQ(before[kC], truth[kC] / 8);
  EXPECT_FLOAT_EQ(before[kIr], truth[kIr] / 8 * 2);
  EXPECT_GT(before[kLux], 430);
  handset.store("g_gain_ratio_8", 8 / 1.25F);
  handset.notify();
  EXPECT_THAT(handset.reading()[kLux], FloatNear(400, 1e-2F));
  handset.setGain(9);
  EXPECT_FLOAT_EQ(handset.reading()[kG], truth[kG] / 4 * 0.5F);
  handset.setGain(10);
  EXPECT_FLOAT_EQ(handset.reading()[kG], truth[kG] / 2 * 1.6F);
  handset.setGain(7);
  EXPECT_FLOAT_EQ(handset.reading()[kG], truth[kG] / 16);
}

TEST(UnderDisplayAmbientLight, AutomaticGainTakesTheHighestThatTheLightAllows) {
  Handset handset({"world.illuminance=200000"});
  const auto values = handset.reading();
  EXPECT_EQ(values[kGain], 9) << "a quarter of 200 000 lx fits below full scale, half of it does not";
  EXPECT_THAT(values[kLux], FloatNear(200000, 1));
  handset.setGain(11);
  EXPECT_EQ(handset.reading()[kC], 65535) << "saturated";
}

TEST(UnderDisplayAmbientLight, WithoutAutomaticGainTheSettingInForceStays) {
  Handset handset({"world.illuminance=[{at=0,value=200000},{at=3,value=10}]"});
  EXPECT_EQ(handset.reading()[kGain], 9);
  sns_oem_auto_gain_req request;
  request.set_mode(SNS_OEM_ALS_MODE_DISABLE);
  handset.ask(simhub::kAlsAutoGainRequest, request);
  handset.Run(2);
  EXPECT_EQ(handset.reading()[kGain], 9);
  request.set_mode(SNS_OEM_ALS_MODE_ENABLE);
  handset.ask(simhub::kAlsAutoGainRequest, request);
  EXPECT_EQ(handset.reading()[kGain], 11);
}

TEST(UnderDisplayAmbientLight, CountsFollowTheIntegrationTimeAndLuxDoesNot) {
  Handset handset;
  handset.setIntegrationTime(250);
  const auto values = handset.reading();
  EXPECT_EQ(values[kIntegration], 250);
  EXPECT_THAT(values[kC], FloatNear(402.455F / 4, 1e-2F));
  EXPECT_THAT(values[kLux], FloatNear(400, 1e-2F));
}

TEST(UnderDisplayAmbientLight, CountsAreNeverNegative) {
  Handset handset({"world.illuminance=0", "sensor.ambient_light_raw.bias=-5"});
  const auto values = handset.reading();
  for (const Value value : {kLux, kC, kR, kG, kB, kIr}) EXPECT_EQ(values[value], 0);
}

// ---- The light of the display ----

/// In the dark under white of level 100, of which 2 counts a level come in at worst; no pulses.
std::vector<std::string> lit(const std::vector<std::string>& more = {}) {
  std::vector<std::string> all{"world.illuminance=0",
                               "world.display_brightness=100",
                               "world.display_refresh_rate=62.5",
                               "sensor.ambient_light_raw.display_leak=[2,2,2,2]",
                               "sensor.ambient_light_raw.leak_floor=0.25",
                               "sensor.ambient_light_raw.best_delay=6",
                               "sensor.ambient_light_raw.te2_falling_edge=1000",
                               "sensor.ambient_light_raw.te2_line=5",
                               "sensor.ambient_light_raw.pwm_boundary=0"};
  all.insert(all.end(), more.begin(), more.end());
  return all;
}

TEST(UnderDisplayAmbientLight, CatchesLeastOfTheDisplayAtTheBestDelay) {
  Handset handset(lit());
  handset.setTrigger(true, 6);
  EXPECT_FLOAT_EQ(handset.reading()[kC], 50);
  handset.setTrigger(true, 10);
  EXPECT_FLOAT_EQ(handset.reading()[kC], 50 + 150.0F / 4);
  handset.setTrigger(true, 2);
  EXPECT_FLOAT_EQ(handset.reading()[kC], 50 + 150.0F / 4);
  handset.setTrigger(true, 14);
  EXPECT_FLOAT_EQ(handset.reading()[kC], 200);
}

TEST(UnderDisplayAmbientLight, UntriggeredItCatchesTheRefreshsMean) {
  Handset handset(lit());
  handset.setTrigger(false, 0);
  EXPECT_FLOAT_EQ(handset.reading()[kC], 100);
}

TEST(UnderDisplayAmbientLight, IsTriggeredAfterTheRegistrysDelayUntilAskedForAnother) {
  Handset handset(lit());
  EXPECT_FLOAT_EQ(handset.reading()[kC], 50 + 150 * 0.75F * 0.75F) << "no delay";
  handset.store("delay", 6);
  handset.notify();
  EXPECT_FLOAT_EQ(handset.reading()[kC], 50);
  handset.setTrigger(true, 10);
  EXPECT_FLOAT_EQ(handset.reading()[kC], 50 + 150.0F / 4);
  handset.setTrigger(true, -1);
  EXPECT_FLOAT_EQ(handset.reading()[kC], 50);
}

TEST(UnderDisplayAmbientLight, TheTe2TableMovesTheTrigger) {
  Handset handset(lit());
  handset.setTrigger(true, 4);
  handset.folder.WriteFile("te2_table", "1398 1400 1398 1400 1398 1400 1398 1400");
  EXPECT_FLOAT_EQ(handset.reading()[kC], 50) << "400 lines of 5 µs later than its own edge";
  handset.folder.WriteFile("te2_table", "2055 -383 3240 800 2354 13 2354 13");
  EXPECT_FLOAT_EQ(handset.reading()[kC], 50 + 150 * (3.0F / 8) * (3.0F / 8)) << "200 lines earlier";
  handset.folder.WriteFile("te2_table", "");
  EXPECT_FLOAT_EQ(handset.reading()[kC], 50 + 150.0F / 16) << "its own edge";
}

TEST(UnderDisplayAmbientLight, SeesTheDisplaysColours) {
  Handset handset(lit({"world.display_color=[0.5,0,1]"}));
  handset.setTrigger(true, 6);
  const auto values = handset.reading();
  EXPECT_FLOAT_EQ(values[kC], 25);
  EXPECT_FLOAT_EQ(values[kR], 25);
  EXPECT_FLOAT_EQ(values[kG], 0);
  EXPECT_FLOAT_EQ(values[kB], 50);
  EXPECT_EQ(values[kIr], 0);
}

TEST(UnderDisplayAmbientLight, PatternLinesTakeTheDisplaysLightOffLux) {
  Handset handset(lit({"world.illuminance=400", "sensor.ambient_light_raw.display_leak=[2,0,1,0]"}));
  handset.store("delay", 6);
  handset.notify();
  EXPECT_GT(handset.reading()[kLux], 450);
  for (const char* const channel : {"c", "r", "g", "b"}) {
    const std::string item = std::string("pattern_w_") + channel + "_coef1";
    handset.store(item, *channel == 'c' ? 0.5F : *channel == 'g' ? 0.25F : 0);
  }
  handset.notify();
  EXPECT_THAT(handset.reading()[kLux], FloatNear(400, 1e-3F));
}

TEST(UnderDisplayAmbientLight, ClearIsSmallestAtThePulsesBoundary) {
  std::vector<float> clear;
  for (const char* const level : {"20", "40", "60", "80", "100"}) {
    Handset handset(
        lit({std::string("world.display_brightness=") + level, "sensor.ambient_light_raw.pwm_boundary=60",
             "sensor.ambient_light_raw.pwm_ripple=300"}));
    handset.setTrigger(true, 6);
    clear.push_back(handset.reading()[kC]);
  }
  EXPECT_THAT(clear, testing::ElementsAre(FloatNear(210, 1e-3F), FloatNear(120, 1e-3F), FloatNear(30, 1e-3F),
                                          FloatNear(40, 1e-3F), FloatNear(50, 1e-3F)));
}

TEST(UnderDisplayAmbientLight, TheRegistrysBoundaryTakesThePulsesOffLux) {
  Handset handset(
      lit({"world.illuminance=400", "world.display_brightness=20",
           "sensor.ambient_light_raw.display_leak=[0,0,0,0]", "sensor.ambient_light_raw.pwm_boundary=72",
           "sensor.ambient_light_raw.pwm_ripple=3000"}));
  for (const char* const channel : {"c", "r", "g", "b"}) {
    handset.store(std::string("pattern_w_") + channel + "_coef1", 0);
  }
  handset.notify();
  // Of pulses alike in all channels the coefficients leave 0.019.
  EXPECT_THAT(handset.reading()[kLux], FloatNear(400 + 0.019F * 3000 * (52.0F / 72 - 40.0F / 60), 1e-2F))
      << "by the stored 60";
  handset.store("pwm_boundary", 72);
  handset.notify();
  EXPECT_THAT(handset.reading()[kLux], FloatNear(400, 1e-2F));
}

// ---- Requests through the hub, and the built-in handsets ----

TEST(UnderDisplayAmbientLight, RefusesAndStaysSilentOnDemand) {
  Handset handset({"fault.f.kind=oem_failure", "fault.f.message=7810", "fault.s.kind=oem_silence",
                   "fault.s.message=7812"});
  handset.setGain(5);
  EXPECT_EQ(handset.reading()[kGain], 11) << "refused";
  sns_oem_set_itime_req request;
  request.set_integration_time_us(250);
  EXPECT_EQ(handset.Ask(handset.Find("ambient_light_raw"), simhub::kAlsSetIntegrationTimeRequest,
                        request.SerializeAsString()),
            std::nullopt);
  EXPECT_EQ(handset.reading()[kIntegration], 250) << "carried out";
}

TEST(UnderDisplayAmbientLight, WhatAClientSetHoldsForTheNextOneUntilTheHubStartsAgain) {
  Handset handset;
  handset.setGain(5);
  handset.hub->RemoveClient(handset.client);
  handset.client = handset.hub->AddClient();
  EXPECT_EQ(handset.reading()[kGain], 5);
  handset.Restart();
  EXPECT_EQ(handset.reading()[kGain], 11);
}

TEST(UnderDisplayAmbientLight, ForgetsItsRequestsWhenTheHubComesBack) {
  Handset handset({"fault.f.kind=hub_away", "fault.f.from=20", "fault.f.down_for=1"});
  handset.setGain(5);
  EXPECT_EQ(handset.reading()[kGain], 5);
  handset.Run(25);
  EXPECT_EQ(handset.reading()[kGain], 11);
}

TEST(UnderDisplayAmbientLight, EveryHandsetThatHasOneHasItsCalibrationInTheRegistry) {
  for (const char* const name : {"t5h5", "rufael", "whiskel"}) {
    HubHarness hub({}, name);
    ASSERT_EQ(hub.LookUp("ambient_light_raw").size(), 1U) << name;
    const auto config = std::find_if(hub.scenario.sensors.begin(), hub.scenario.sensors.end(),
                                     [](const auto& each) { return each.dataType == "ambient_light_raw"; });
    const auto group = hub.ReadRegistry(simhub::packageName(config->name) + "_0_platform.als.fac_cal");
    ASSERT_TRUE(group.has_value()) << name;
    std::vector<std::string> items{"scale", "delay", "pwm_boundary"};
    for (const std::string channel : {"c", "r", "g", "b"}) {
      items.push_back(channel + "_coeff");
      for (const char* const gain : {"8", "9", "10"}) items.push_back(channel + "_gain_ratio_" + gain);
      if (std::string(name) == "rufael") continue;  // knows no patterns
      for (const char* const number : {"0", "1"}) items.push_back("pattern_w_" + channel + "_coef" + number);
    }
    for (const std::string& item : items) {
      const auto found = std::find_if(group->items().begin(), group->items().end(),
                                      [&](const auto& each) { return each.name() == item; });
      EXPECT_TRUE(found != group->items().end() && found->has_flt()) << name << " " << item;
    }
  }
}

}  // namespace
