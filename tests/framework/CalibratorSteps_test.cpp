// The steps that all commands share.
#include <cmath>
#include <limits>

#include <gtest/gtest.h>

#include "framework/PlainCalibrator.h"
#include "support/Capture.h"
#include "support/ScriptedHub.h"

namespace {

constexpr const char* kGroup = "chipa_0_platform.pressure.fac_cal";

class CalibratorSteps : public testing::Test {
 protected:
  CalibratorSteps() {
    script->sensors = {{a, "pressure", "chipa"}};
    connection = connectTo(script);
    calibrator = std::make_unique<PlainCalibrator>(connection.get());
  }

  const ssc::SensorUid a{1, 1};
  std::shared_ptr<HubScript> script = std::make_shared<HubScript>();
  std::unique_ptr<ssc::Connection> connection;
  std::unique_ptr<PlainCalibrator> calibrator;
};

TEST_F(CalibratorSteps, CopyTheGlobalOptionsButTheReset) {
  Calibrator::Arguments arguments;
  arguments.dryRun = true;
  arguments.quiet = true;
  arguments.deviceType = DeviceType::rufael;
  calibrator->CopyGlobalOptions(arguments);
  EXPECT_TRUE(calibrator->dryRun);
  EXPECT_TRUE(calibrator->quiet);
  EXPECT_EQ(calibrator->deviceType, DeviceType::rufael);
  calibrator->CopyGlobalOptions(Calibrator::Arguments());
  EXPECT_FALSE(calibrator->dryRun);
}

TEST_F(CalibratorSteps, KnowWhichDevicesHaveAMagnetometerTemperature) {
  const std::map<DeviceType, bool> expected{{DeviceType::o1v1, true},   {DeviceType::p2m2, true},
                                            {DeviceType::e4d4, false},  {DeviceType::t5h5, true},
                                            {DeviceType::rufael, true}, {DeviceType::whiskel, false}};
  for (const auto& [type, has] : expected) {
    calibrator->deviceType = type;
    EXPECT_EQ(calibrator->DeviceHasMagTemp(), has) << static_cast<int>(type);
  }
}

TEST_F(CalibratorSteps, PrintTheUsageLineAloneOnAnError) {
  const Captured captured = capture([&] { calibrator->PrintUsage(true); });
  EXPECT_EQ(captured.err, "Usage: vantle plain [-h]\n");
  EXPECT_EQ(captured.out, "");
}

TEST_F(CalibratorSteps, PrintUsageAndOptionsAsHelp) {
  const Captured captured = capture([&] { calibrator->PrintUsage(false); });
  EXPECT_EQ(captured.out, "Usage: vantle plain [-h]\nOptions:\n  -h\n\n");
  EXPECT_EQ(captured.err, "");
}

TEST_F(CalibratorSteps, AUsageErrorIsAMessageTheUsageAndInvalid) {
  const Captured captured = capture([&] { return calibrator->UsageError("Failed to parse '%s'", "x%d"); });
  EXPECT_EQ(captured.result, -22);
  EXPECT_EQ(captured.err, "ERROR: Failed to parse 'x%d'\nUsage: vantle plain [-h]\n");
}

TEST_F(CalibratorSteps, AnInvalidOptionNamesTheCommandAndTheCharacter) {
  Calibrator::Arguments arguments;
  arguments.command = "baro";
  const Captured captured = capture([&] { return calibrator->InvalidOption(arguments, '?'); });
  EXPECT_EQ(captured.result, -22);
  EXPECT_EQ(captured.err, "ERROR: Invalid 'baro' command option '?'\nUsage: vantle plain [-h]\n");
}

TEST_F(CalibratorSteps, AnUnsupportedDeviceIsAMessageWithoutUsage) {
  Calibrator::Arguments arguments;
  arguments.command = "als";
  const Captured captured = capture([&] { return PlainCalibrator::UnsupportedDevice(arguments); });
  EXPECT_EQ(captured.result, -38);
  EXPECT_EQ(captured.err, "ERROR: 'als' command is not supported for the specified device type\n");
}

TEST_F(CalibratorSteps, ExtraArgumentsAreEachWarnedAbout) {
  const Captured captured = capture([&] { PlainCalibrator::IgnoreExtraArguments({"1", "2", "3"}, 1); });
  EXPECT_EQ(captured.out, "WARN: Ignoring extra argument '2'\nWARN: Ignoring extra argument '3'\n");
}

TEST_F(CalibratorSteps, ACollectionIsCompleteAfterSuccessOrItsPeriod) {
  EXPECT_TRUE(PlainCalibrator::IsCollected(0));
  EXPECT_TRUE(PlainCalibrator::IsCollected(-110));
  EXPECT_FALSE(PlainCalibrator::IsCollected(-11));
  EXPECT_FALSE(PlainCalibrator::IsCollected(-2147483647));
}

TEST_F(CalibratorSteps, ACollectionThatEndsEarlySaysWhy) {
  for (const int complete : {0, -110}) {
    const Captured captured = capture([&] { return PlainCalibrator::RequireCollected(complete); });
    EXPECT_EQ(captured.result, 0);
    EXPECT_EQ(captured.err, "");
  }
  const Captured lost = capture([&] { return PlainCalibrator::RequireCollected(-11); });
  EXPECT_EQ(lost.result, -11);
  EXPECT_EQ(lost.err, "ERROR: Unable to collect samples. Error = -11\n");
  // The malformed event was reported by the handler that got it.
  const Captured malformed = capture([&] { return PlainCalibrator::RequireCollected(-2147483647); });
  EXPECT_EQ(malformed.result, -2147483647);
  EXPECT_EQ(malformed.err, "");
}

TEST_F(CalibratorSteps, ASensorWithoutSamplesIsNamed) {
  calibrator->SetSensorInfo(a, "Barometer Raw", 20);
  const Captured captured = capture([&] { return calibrator->RequireSamples(a); });
  EXPECT_EQ(captured.result, -61);
  EXPECT_EQ(captured.err, "ERROR: No Barometer Raw samples were received\n");
  calibrator->samples[a].emplace_back();
  EXPECT_EQ(calibrator->RequireSamples(a), 0);
}

TEST_F(CalibratorSteps, AResultThatIsNoFiniteNumberIsInvalid) {
  EXPECT_EQ(PlainCalibrator::RequireFinite("The bias", {0, -1e38F}), 0);
  for (const float odd : {std::nanf(""), INFINITY, -INFINITY}) {
    const Captured captured = capture([&] { return PlainCalibrator::RequireFinite("The bias", {1, odd}); });
    EXPECT_EQ(captured.result, -22);
    EXPECT_EQ(captured.err.rfind("ERROR: The bias is not a finite number: ", 0), 0U);
  }
}

TEST_F(CalibratorSteps, ADryRunSaysThatItSkipsTheWrite) {
  EXPECT_EQ(capture([&] { EXPECT_FALSE(calibrator->SkipsWrite()); }).out, "");
  calibrator->dryRun = true;
  EXPECT_EQ(capture([&] { EXPECT_TRUE(calibrator->SkipsWrite()); }).out,
            "Skipping registry write due to dry run.\n");
}

TEST_F(CalibratorSteps, WritingTheRegistryIsAnnounced) {
  sns_registry_data data;
  addFloatItem(&data, "scale", 3, 1);
  const Captured captured = capture([&] { return calibrator->WriteRegistry(kGroup, data); });
  EXPECT_EQ(captured.result, 0);
  EXPECT_EQ(captured.out, "Writing registry...\n");
  ASSERT_EQ(script->registry.count(kGroup), 1U);
  EXPECT_EQ(script->registry[kGroup].items(0).flt(), 3.0F);
}

TEST_F(CalibratorSteps, AFailedWriteIsWarnedAboutUnlessLeftToTheCaller) {
  script->registryWritesFail = true;
  const Captured logged = capture([&] { return calibrator->WriteRegistry(kGroup, sns_registry_data()); });
  EXPECT_EQ(logged.result, -5);
  EXPECT_EQ(logged.out, "Writing registry...\nWARN: Failed to write registry. Error = -5\n");
  const Captured left = capture([&] {
    return calibrator->WriteRegistry(kGroup, sns_registry_data(),
                                     PlainCalibrator::WriteFailure::kLeftToCaller);
  });
  EXPECT_EQ(left.result, -5);
  EXPECT_EQ(left.out, "Writing registry...\n");
}

TEST_F(CalibratorSteps, AGroupIsStoredWithoutAnnouncement) {
  sns_registry_data data;
  addFloatItem(&data, "scale", 3, 1);
  ssc::RegistryUtil registry(connection.get());
  Captured captured = capture([&] { return PlainCalibrator::StoreGroup(registry, kGroup, data); });
  EXPECT_EQ(captured.result, 0);
  EXPECT_EQ(captured.out, "");
  EXPECT_EQ(script->registry[kGroup].items(0).flt(), 3.0F);
  script->registryWritesFail = true;
  captured = capture([&] { return PlainCalibrator::StoreGroup(registry, kGroup, data); });
  EXPECT_EQ(captured.result, -5);
  EXPECT_EQ(captured.out, "WARN: Failed to write registry. Error = -5\n");
}

TEST_F(CalibratorSteps, GroupsThatBelongTogetherAreAnnouncedOnce) {
  sns_registry_data scale;
  addFloatItem(&scale, "x", 3, 1);
  sns_registry_data bias;
  addFloatItem(&bias, "x", 4, 1);
  const Captured captured = capture([&] {
    return calibrator->WriteRegistry({{"group.scale", &scale}, {"group.bias", &bias}});
  });
  EXPECT_EQ(captured.result, 0);
  EXPECT_EQ(captured.out, "Writing registry...\n");
  EXPECT_EQ(script->registry["group.scale"].items(0).flt(), 3.0F);
  EXPECT_EQ(script->registry["group.bias"].items(0).flt(), 4.0F);
}

TEST_F(CalibratorSteps, GroupsAreWrittenWithoutAWordForThoseWhoSaidItBefore) {
  sns_registry_data data;
  addFloatItem(&data, "scale", 3, 1);
  const Captured captured = capture([&] { return calibrator->WriteRegistryGroups({{kGroup, &data}}); });
  EXPECT_EQ(captured.result, 0);
  EXPECT_EQ(captured.out, "");
  EXPECT_EQ(script->registry[kGroup].items(0).flt(), 3.0F);
}

TEST_F(CalibratorSteps, AGroupThatCannotBeWrittenKeepsTheFollowingOnesFromBeingWritten) {
  script->registryWritesFail = true;
  const sns_registry_data data;
  const Captured captured = capture([&] {
    return calibrator->WriteRegistry({{"group.scale", &data}, {"group.bias", &data}});
  });
  EXPECT_EQ(captured.result, -5);
  EXPECT_EQ(captured.out, "Writing registry...\nWARN: Failed to write registry. Error = -5\n");
  EXPECT_EQ(script->countRequests(HubScript::registrySuid(), 513), 1);
}

TEST_F(CalibratorSteps, AConfirmedNotificationIsSilent) {
  EXPECT_EQ(capture([&] { calibrator->NotifyOrWarn({a}); }).out, "");
  EXPECT_EQ(script->countRequests(a, 610), 1);
}

TEST_F(CalibratorSteps, AFailedNotificationIsTwoWarnings) {
  script->sensors[0].confirms = false;
  EXPECT_EQ(capture([&] { calibrator->NotifyOrWarn({a}); }).out,
            "WARN: Unable to notify sensor of completed calibration\n"
            "WARN: A reboot may be required for the calibration to take effect\n");
  EXPECT_EQ(capture([&] {
              calibrator->NotifyOrWarn({a}, "Unable to notify sensor that calibration was reset",
                                       "A reboot may be required");
            }).out,
            "WARN: Unable to notify sensor that calibration was reset\nWARN: A reboot may be required\n");
}

TEST_F(CalibratorSteps, TheClosingLineSaysHowItEnded) {
  const Captured good = capture([&] { return PlainCalibrator::Conclude("Barometer calibration", 0); });
  EXPECT_EQ(good.out, "Barometer calibration succeeded.\n");
  EXPECT_EQ(good.result, 0);
  const Captured bad = capture([&] { return PlainCalibrator::Conclude("ALS verification", -22); });
  EXPECT_EQ(bad.out, "ALS verification failed.\n");
  EXPECT_EQ(bad.result, -22);
}

}  // namespace
