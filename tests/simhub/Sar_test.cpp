#include "simhub/sensors/Sar.h"

#include <gtest/gtest.h>

#include "proto/sns_oem_sar.pb.h"
#include "simhub/HubHarness.h"

namespace {

constexpr std::uint32_t kRequest = 778;
constexpr std::uint32_t kResponse = 779;
constexpr const char* kGroup = "sarchip_0_platform.fac_cal";

std::vector<std::string> exact(std::vector<std::string> overrides = {}) {
  overrides.insert(overrides.begin(), {"sensor.sar.noise=0", "sensor.sar_1.noise=0"});
  return overrides;
}

std::optional<sns_sar_comp_resp> compensate(HubHarness* hub, const simhub::Suid& suid) {
  const auto answer = hub->Ask(suid, kRequest);
  sns_sar_comp_resp response;
  if (!answer || answer->messageId != kResponse || !response.ParseFromString(answer->payload)) return {};
  return response;
}

/// The latest reading, top and bottom.
std::pair<float, float> reading(HubHarness* hub, const simhub::Suid& suid) {
  EXPECT_TRUE(hub->Send(suid, simhub::kOnChangeConfigRequest));
  hub->Run(0.5);
  EXPECT_TRUE(hub->Send(suid, simhub::kDisableRequest));
  hub->Run(0.5);
  const auto readings = hub->Readings(suid);
  EXPECT_FALSE(readings.empty());
  if (readings.empty()) return {};
  return {readings.back().data(0), readings.back().data(1)};
}

TEST(Sar, TwoSensorsOfOneNameAreToldApartByTheirHardwareIds) {
  HubHarness hub(exact());
  const auto suids = hub.LookUp("sar");
  ASSERT_EQ(suids.size(), 2U);
  EXPECT_EQ(compensate(&hub, suids[0])->top_offset(), 8123);
  EXPECT_EQ(compensate(&hub, suids[0])->bottom_offset(), 7911);
  EXPECT_EQ(compensate(&hub, suids[1])->top_offset(), 6480);
  EXPECT_EQ(compensate(&hub, suids[1])->bottom_offset(), 9027);
}

TEST(Sar, CompensatesWhatItSeesUntilTheHubRestarts) {
  HubHarness hub(exact({"fault.f.kind=hub_away", "fault.f.from=20", "fault.f.down_for=1"}));
  const simhub::Suid suid = hub.Find("sar");
  EXPECT_EQ(reading(&hub, suid), std::make_pair(8123.0F, 7911.0F));
  ASSERT_TRUE(compensate(&hub, suid));
  EXPECT_EQ(reading(&hub, suid), std::make_pair(0.0F, 0.0F));
  hub.Run(25);
  EXPECT_EQ(reading(&hub, suid), std::make_pair(8123.0F, 7911.0F));
}

TEST(Sar, NeverCompensatesMoreThanTheRegistryAllows) {
  HubHarness hub(exact({"world.capacitance=[700,900]"}));
  const simhub::Suid suid = hub.Find("sar");
  sns_registry_data data;
  addFloat(&data, "max_offset_top", 8153);
  addFloat(&data, "max_offset_bottom", 7941);
  EXPECT_EQ(hub.WriteRegistry(kGroup, data), 0);
  // A hand that is there already: without the limit it would be compensated away.
  EXPECT_EQ(compensate(&hub, suid)->top_offset(), 8823);
  EXPECT_EQ(reading(&hub, suid), std::make_pair(0.0F, 0.0F));
  EXPECT_TRUE(hub.Ask(suid, simhub::kCalibrationChangedRequest));
  EXPECT_EQ(reading(&hub, suid), std::make_pair(670.0F, 870.0F));
}

TEST(Sar, ACompensationThatFailsHasNoOffsets) {
  HubHarness hub(exact({"fault.f.kind=oem_failure"}));
  const simhub::Suid suid = hub.Find("sar");
  const auto response = compensate(&hub, suid);
  ASSERT_TRUE(response);
  EXPECT_FALSE(response->has_top_offset());
  EXPECT_FALSE(response->has_bottom_offset());
  EXPECT_EQ(reading(&hub, suid), std::make_pair(8123.0F, 7911.0F));
}

TEST(Sar, KnowsNoOtherRequest) {
  HubHarness hub(exact());
  const auto answer = hub.Ask(hub.Find("sar"), kRequest + 2);
  EXPECT_TRUE(answer && answer->messageId == simhub::kErrorEvent);
}

}  // namespace
