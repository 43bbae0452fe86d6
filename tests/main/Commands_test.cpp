#include "main/Commands.h"

#include <typeinfo>

#include <gtest/gtest.h>

#include "imu/ImuMultipointCalibrator.h"
#include "imu/ImuThermalCalibrator.h"
#include "light/AlsCalibrator.h"
#include "light/ColorCalibrator.h"
#include "light/UdAlsCalibrator.h"
#include "mag/BaroCalibrator.h"
#include "mag/MagCalibrator.h"
#include "mag/MagCurrentSensitivity.h"
#include "mag/MagOrientation.h"
#include "mag/MagSoftIron.h"
#include "prox/ProxCalibrator.h"
#include "prox/ProxPoffset.h"
#include "prox/SarCalibrator.h"
#include "prox/UdProxCalibrator.h"
#include "support/ScriptedHub.h"

namespace {

constexpr int kDeviceTypes = 6;

class CommandsTest : public testing::Test {
 protected:
  /// The class of a command's calibrator on a device type; that of nothing for no command.
  const std::type_info& classOf(const std::string& command, int deviceType) {
    calibrator = makeCalibrator(command, static_cast<DeviceType>(deviceType), connection.get());
    if (calibrator == nullptr) return typeid(void);
    const Calibrator& made = *calibrator;
    return typeid(made);
  }

  std::unique_ptr<ssc::Connection> connection = connectTo(std::make_shared<HubScript>());
  std::unique_ptr<Calibrator> calibrator;
};

TEST_F(CommandsTest, MostAreTheSameOnEveryDevice) {
  const std::vector<std::pair<std::string, const std::type_info*>> classes{
      {"baro", &typeid(BaroCalibrator)},
      {"color", &typeid(ColorCalibrator)},
      {"imu-multipoint", &typeid(ImuMultipointCalibrator)},
      {"imu-thermal", &typeid(ImuThermalCalibrator)},
      {"mag", &typeid(MagCalibrator)},
      {"mag-orient", &typeid(MagOrientation)},
      {"mag-softiron", &typeid(MagSoftIron)},
      {"mag-sensitivity", &typeid(MagCurrentSensitivity)},
      {"sar", &typeid(SarCalibrator)}};
  for (const auto& [command, wanted] : classes) {
    for (int type = 0; type < kDeviceTypes; ++type) EXPECT_EQ(classOf(command, type), *wanted) << command;
  }
}

TEST_F(CommandsTest, TheLightSensorMayBeUnderTheDisplay) {
  for (const int type : {0, 1, 2}) EXPECT_EQ(classOf("als", type), typeid(AlsCalibrator)) << type;
  for (const int type : {3, 4, 5}) EXPECT_EQ(classOf("als", type), typeid(UdAlsCalibrator)) << type;
}

TEST_F(CommandsTest, TheProximitySensorIsOneOfThree) {
  EXPECT_EQ(classOf("prox", 0), typeid(ProxCalibrator));
  for (const int type : {1, 2}) EXPECT_EQ(classOf("prox", type), typeid(ProxPoffset)) << type;
  for (const int type : {3, 4, 5}) EXPECT_EQ(classOf("prox", type), typeid(UdProxCalibrator)) << type;
}

TEST_F(CommandsTest, AreMatchedWholeAndInTheirOwnCase) {
  for (const char* word : {"", "SAR", "Baro", "bar", "baro ", " baro", "mag-", "imu", "mag_orient"}) {
    EXPECT_EQ(classOf(word, 0), typeid(void)) << word;
  }
}

}  // namespace
