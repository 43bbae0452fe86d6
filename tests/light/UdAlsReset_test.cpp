// What a reset requires, writes and leaves alone, by device type.
#include <algorithm>

#include <gmock/gmock.h>

#include "light/UdAlsCommand.h"

namespace {

using testing::HasSubstr;

constexpr float kAbsent = -999;

struct Expected {
  const char* item;
  bool isInteger;
  float t5h5;  ///< kAbsent: not touched
  float rufael;
  float whiskel;
};

// In the order in which they are missed.
constexpr Expected kItems[] = {
    {"version", true, 1, 1, 1},
    {"scale", true, 1, 1, 1},
    {"c_gain_ratio_8", false, 8, 8, 8},
    {"c_gain_ratio_9", false, 4, 4, 4},
    {"c_gain_ratio_10", false, 2, 2, 2},
    {"r_gain_ratio_8", false, 8, 8, 8},
    {"r_gain_ratio_9", false, 4, 4, 4},
    {"r_gain_ratio_10", false, 2, 2, 2},
    {"g_gain_ratio_8", false, 8, 8, 8},
    {"g_gain_ratio_9", false, 4, 4, 4},
    {"g_gain_ratio_10", false, 2, 2, 2},
    {"b_gain_ratio_8", false, 8, 8, 8},
    {"b_gain_ratio_9", false, 4, 4, 4},
    {"b_gain_ratio_10", false, 2, 2, 2},
    {"delay", false, 0, 0, 0},
    {"c_coeff", false, 1, 1, 1},
    {"r_coeff", false, -0.711F, -0.711F, -0.711F},
    {"g_coeff", false, 1.729F, 1.729F, 1.729F},
    {"b_coeff", false, -1.999F, -1.999F, -1.999F},
    {"pwm_boundary", false, 60, 0, 60},
    {"pattern_w_c_coef0", false, 0, kAbsent, 0},
    {"pattern_w_r_coef0", false, 0, kAbsent, 0},
    {"pattern_w_g_coef0", false, 0, kAbsent, 0},
    {"pattern_w_b_coef0", false, 0, kAbsent, 0},
    {"pattern_w_c_coef1", false, 1, kAbsent, 1},
    {"pattern_w_r_coef1", false, 1, kAbsent, 1},
    {"pattern_w_g_coef1", false, 1, kAbsent, 1},
    {"pattern_w_b_coef1", false, 1, kAbsent, 1},
};

class UdAlsReset : public UdAlsCommand {
 protected:
  UdAlsReset() { globals.reset = true; }

  /// Every item, of a kind that none of them is, at version 6.
  void giveGroup() {
    sns_registry_data group;
    for (const Expected& row : kItems) {
      auto* const item = group.add_items();
      item->set_name(row.item);
      item->set_version(6);
      item->set_str("text");
    }
    addFloatItem(&group, "corr_factor", 1.25F, 6);
    script->registry[kGroup] = group;
  }
  Captured reset(DeviceType type) {
    globals.deviceType = type;
    return run({});
  }
  [[nodiscard]] const sns_registry_data_item& stored(const std::string& name) const {
    const auto& items = script->registry.at(kGroup).items();
    return *std::find_if(items.begin(), items.end(), [&](const auto& item) { return item.name() == name; });
  }
  void expectStored(DeviceType type, float Expected::*value) {
    giveGroup();
    const Captured captured = reset(type);
    EXPECT_EQ(captured.result, 0) << captured.err;
    EXPECT_EQ(captured.out, "Searching for ambient light sensor...\nResetting ALS calibration...\n");
    for (const Expected& row : kItems) {
      const sns_registry_data_item& item = stored(row.item);
      if (row.*value == kAbsent) {
        EXPECT_EQ(item.str(), "text") << row.item;
        EXPECT_EQ(item.version(), 6) << row.item;
        continue;
      }
      EXPECT_EQ(item.version(), 7) << row.item;
      EXPECT_EQ(item.has_sint(), row.isInteger) << row.item;
      EXPECT_EQ(row.isInteger ? static_cast<float>(item.sint()) : item.flt(), row.*value) << row.item;
    }
    EXPECT_EQ(stored("corr_factor").version(), 6);
  }
};

TEST_F(UdAlsReset, OfT5h5) { expectStored(DeviceType::t5h5, &Expected::t5h5); }
TEST_F(UdAlsReset, OfRufael) { expectStored(DeviceType::rufael, &Expected::rufael); }
TEST_F(UdAlsReset, OfWhiskel) { expectStored(DeviceType::whiskel, &Expected::whiskel); }

TEST_F(UdAlsReset, OfAnotherDeviceAdvancesTheClearCoefficientsVersionOnly) {
  giveGroup();
  EXPECT_EQ(reset(DeviceType::o1v1).result, 0);
  EXPECT_EQ(stored("c_coeff").version(), 7);
  EXPECT_EQ(stored("c_coeff").str(), "text");
  EXPECT_EQ(stored("delay").version(), 7);
  for (const char* item : {"r_coeff", "g_coeff", "b_coeff", "pwm_boundary", "pattern_w_c_coef0"}) {
    EXPECT_EQ(stored(item).version(), 6) << item;
  }
}

TEST_F(UdAlsReset, OfAnotherDeviceWantsTheClearCoefficientToBeThere) {
  giveGroup();
  auto* const items = script->registry[kGroup].mutable_items();
  for (int i = items->size(); i-- > 0;) {
    if (items->Get(i).name() == "c_coeff") items->DeleteSubrange(i, 1);
  }
  const Captured captured = reset(DeviceType::o1v1);
  EXPECT_EQ(captured.result, -22);
  EXPECT_EQ(captured.err, "ERROR: Invalid registry; missing \"c_coeff\"\n");
  EXPECT_EQ(stored("version").version(), 6);
}

TEST_F(UdAlsReset, NamesTheFirstItemThatIsMissingAndWritesNothing) {
  for (const Expected& row : kItems) {
    giveGroup();
    auto* const items = script->registry[kGroup].mutable_items();
    // This one, and all behind it.
    while (items->Get(items->size() - 1).name() != row.item) items->RemoveLast();
    items->RemoveLast();
    script->requests.clear();
    const Captured captured = reset(DeviceType::t5h5);
    EXPECT_EQ(captured.result, -22) << row.item;
    EXPECT_EQ(captured.err, std::string("ERROR: Invalid registry; missing \"") + row.item + "\"\n");
    EXPECT_EQ(script->countRequests(HubScript::registrySuid(), 513), 0) << row.item;
    EXPECT_EQ(script->countRequests(light, 515), 0) << row.item;
  }
}

TEST_F(UdAlsReset, WithoutPatternItemsIsForRufaelOnly) {
  giveGroup();
  auto* const items = script->registry[kGroup].mutable_items();
  for (int i = items->size(); i-- > 0;) {
    if (items->Get(i).name().rfind("pattern", 0) == 0) items->DeleteSubrange(i, 1);
  }
  EXPECT_EQ(reset(DeviceType::whiskel).result, -22);
  EXPECT_EQ(reset(DeviceType::rufael).result, 0);
}

TEST_F(UdAlsReset, MakesTheSensorReadItsCalibrationAndWritesInADryRunToo) {
  giveGroup();
  globals.dryRun = true;
  EXPECT_EQ(reset(DeviceType::t5h5).result, 0);
  EXPECT_EQ(stored("scale").sint(), 1);
  EXPECT_EQ(script->countRequests(light, 515), 1);
}

TEST_F(UdAlsReset, AsksForARebootWhenTheSensorCannotBeTold) {
  giveGroup();
  script->refuses = [](const sns_client_request_msg& request) { return request.msg_id() == 515; };
  const Captured captured = reset(DeviceType::t5h5);
  EXPECT_EQ(captured.result, -5);
  EXPECT_THAT(captured.out, HasSubstr("Reboot device for default calibration to take effect.\n"));
  EXPECT_EQ(stored("scale").sint(), 1);
}

TEST_F(UdAlsReset, WithoutAGroupIsTheRegistrysResult) {
  EXPECT_EQ(reset(DeviceType::t5h5).result, -2);
  giveGroup();
  script->registryWritesFail = true;
  EXPECT_EQ(reset(DeviceType::t5h5).result, -5);
}

}  // namespace
