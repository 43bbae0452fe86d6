// A magnetometer with all groups of its configuration on a scripted hub.
#pragma once

#include <initializer_list>
#include <memory>
#include <string>

#include <gtest/gtest.h>

#include "mag/MagScript.h"

inline constexpr const char* kOrientGroup = "magchip_0_platform.orient";
inline constexpr const char* kNormalGroup = "magchip_0_platform.sensitivity";
inline constexpr const char* kFastGroup = "magchip_0_platform.sensitivity_fast";

class MagConfigurationTest : public testing::Test {
 protected:
  MagConfigurationTest() {
    script->sensors = {magnetometer()};
    ssc::RegistryUtil::CreateRegistryMatrix({1, 0, 0, 0, 1, 0, 0, 0, 1}, &script->registry[kMagMatrixGroup]);
    addMatrixItem(&script->registry[kMagGroup], "corr_mat", {1, 0, 0, 0, 1, 0, 0, 0, 1});
    for (const char* axis : {"x", "y", "z"}) {
      sns_registry_data_item* const item = script->registry[kOrientGroup].add_items();
      item->set_name(axis);
      item->set_version(2);
      item->set_str(std::string("+") + axis + std::string(1, '\0'));
    }
    ssc::RegistryUtil::CreateRegistryVector({0, 0, 0}, &script->registry[kNormalGroup]);
    ssc::RegistryUtil::CreateRegistryVector({0, 0, 0}, &script->registry[kFastGroup]);
  }

  template <class Command>
  void expectRefused(std::initializer_list<const char*> words, const std::string& message,
                     const std::string& usage) {
    const Captured captured = runCommand<Command>(script, words);
    EXPECT_EQ(captured.result, -22);
    EXPECT_EQ(captured.out, "");
    EXPECT_EQ(captured.err, "ERROR: " + message + "\n" + usage);
    EXPECT_TRUE(script->requests.empty());
  }

  std::shared_ptr<HubScript> script = std::make_shared<HubScript>();
};
