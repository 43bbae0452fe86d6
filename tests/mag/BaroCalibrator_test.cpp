#include "mag/BaroCalibrator.h"

#include <cmath>
#include <limits>

#include <gtest/gtest.h>

#include "support/ArgumentWords.h"
#include "support/Capture.h"
#include "support/ScriptedHub.h"

namespace {

constexpr const char* kGroup = "chipa_0_platform.pressure.fac_cal";
constexpr const char* kUsage = "Usage: vantle baro [-h] [-l LIMIT] [-t SECONDS] PRESSURE\n";
constexpr int kInvalid = -22;

class BaroTest : public testing::Test {
 protected:
  BaroTest() {
    script->sensors = {{pressure, "pressure", "ChipA barometer"},
                       {temperature, "sensor_temperature", "ChipA thermometer"},
                       {raw, "pressure_raw", "ChipA barometer"}};
    script->sensors[0].reading = [](int index) {
      return std::vector<float>{index % 2 == 0 ? 1013.0F : 1013.125F};
    };
    script->sensors[1].reading = [](int) { return std::vector<float>{25.5F}; };
    script->sensors[2].reading = [](int index) {
      return std::vector<float>{index % 2 == 0 ? 1015.0F : 1015.125F};
    };
    setPreviousBias(0);
  }

  void withoutRaw() { script->sensors.pop_back(); }

  void setPreviousBias(float bias) {
    sns_registry_data data;
    addVectorItem(&data, "bias", {bias}, 3);
    addFloatItem(&data, "mean_temp", 20, 5);
    addFloatItem(&data, "other", 1, 9);
    script->registry[kGroup] = data;
  }

  void readPressure(const std::function<float(int)>& pressureAt) {
    for (ScriptedSensor& sensor : script->sensors) {
      if (sensor.suid == temperature) continue;
      sensor.reading = [pressureAt](int index) { return std::vector<float>{pressureAt(index)}; };
    }
  }

  Captured run(std::initializer_list<const char*> words) {
    ArgumentWords argumentWords(words);
    options.command = "baro";
    options.argc = argumentWords.argc();
    options.argv = argumentWords.argv();
    connection = connectTo(script);
    BaroCalibrator calibrator(connection.get());
    return capture([&] { return calibrator.Run(options); });
  }

  [[nodiscard]] const sns_registry_data& group() const { return script->registry.at(kGroup); }
  [[nodiscard]] float storedBias() const { return group().items(0).subgrp().items(0).flt(); }
  [[nodiscard]] int writes() const { return script->countRequests(HubScript::registrySuid(), 513); }

  const ssc::SensorUid pressure{1, 1};
  const ssc::SensorUid temperature{2, 2};
  const ssc::SensorUid raw{3, 3};
  Calibrator::Arguments options;
  std::shared_ptr<HubScript> script = std::make_shared<HubScript>();
  std::unique_ptr<ssc::Connection> connection;
};

TEST_F(BaroTest, CalibratesWithRawSamples) {
  options.quiet = true;
  const Captured captured = run({"baro", "1013.25"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_EQ(captured.err, "");
  EXPECT_EQ(captured.out,
            "Searching for barometer...\n"
            "Barometer calibration begins with Raw samples.\n"
            "Collecting samples...\n"
            "MEAN:     1015.062500\n"
            "STDEV:       0.063296\n"
            "BIAS:        1.812500\n"
            "TEMP:       25.500000\n"
            "Writing registry...\n"
            "Barometer calibration succeeded.\n");
  EXPECT_EQ(storedBias(), 1.8125F);
}

TEST_F(BaroTest, PrintsTheSamplesOfBothSensorsWithTheirRates) {
  const Captured captured = run({"baro", "1013.25"});
  EXPECT_NE(captured.out.find("\nBarometer Raw Samples:\n0.050000    1015.000000\n0.100000    1015.125000\n"),
            std::string::npos);
  EXPECT_NE(captured.out.find("(count 40 @ ~20.000 Hz)\n\nMEAN:"), std::string::npos);
  EXPECT_NE(captured.out.find("\n\nBarometer Temperature Samples:\n0.200000      25.500000\n"),
            std::string::npos);
  EXPECT_NE(captured.out.find("(count 10 @ ~5.000 Hz)\n\n"), std::string::npos);
}

TEST_F(BaroTest, RaisesTheVersionsOfWhatItStoresAndKeepsTheRest) {
  run({"baro", "1013.25"});
  ASSERT_EQ(group().items_size(), 3);
  EXPECT_EQ(group().items(0).version(), 4);
  EXPECT_EQ(group().items(0).subgrp().items(0).version(), 4);
  EXPECT_EQ(group().items(1).flt(), 25.5F);
  EXPECT_EQ(group().items(1).version(), 6);
  EXPECT_EQ(group().items(2).version(), 9);
}

TEST_F(BaroTest, AsksForTwentyAndFiveHertz) {
  run({"baro", "1013.25"});
  std::map<ssc::SensorUid, float> rates;
  for (const auto& request : script->requests) {
    if (request.msg_id() != 513 || ssc::SensorUid(request.suid()) == HubScript::registrySuid()) continue;
    sns_std_sensor_config config;
    ASSERT_TRUE(config.ParseFromString(request.request().payload()));
    rates[ssc::SensorUid(request.suid())] = config.sample_rate();
  }
  EXPECT_EQ(rates, (std::map<ssc::SensorUid, float>{{raw, 20.0F}, {temperature, 5.0F}}));
}

TEST_F(BaroTest, CollectsForTwoSecondsOrAsLongAsAsked) {
  run({"baro", "1013.25"});
  EXPECT_EQ(connection->clock().now().time_since_epoch(), std::chrono::seconds(2));
  run({"baro", "1013.25", "-t", "7"});
  EXPECT_EQ(connection->clock().now().time_since_epoch(), std::chrono::seconds(7));
}

TEST_F(BaroTest, WithoutTheRawStreamTheStoredBiasIsAdded) {
  withoutRaw();
  setPreviousBias(2);
  const Captured captured = run({"baro", "1013.25"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_NE(captured.out.find("begins with Calibrated samples.\n"), std::string::npos);
  EXPECT_NE(captured.out.find("Barometer Samples:\n"), std::string::npos);
  EXPECT_EQ(storedBias(), 1.8125F);
}

TEST_F(BaroTest, ARawStreamOfAnotherChipIsNotTaken) {
  script->sensors[2].name = "ChipB barometer";
  EXPECT_NE(run({"baro", "1013.25"}).out.find("begins with Calibrated samples.\n"), std::string::npos);
}

TEST_F(BaroTest, ReportsACalibrationThatItOverwrites) {
  setPreviousBias(-1.5F);
  const Captured captured = run({"baro", "1013.25"});
  EXPECT_NE(captured.out.find("WARN: The barometer has an existing calibration which will be overwritten\n"
                              "WARN: PREV_BIAS:      -1.500000\nMEAN:"),
            std::string::npos);
}

TEST_F(BaroTest, ADryRunReportsButNeitherWritesNorNotifies) {
  setPreviousBias(-1.5F);
  options.dryRun = true;
  const Captured captured = run({"baro", "1013.25"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_NE(captured.out.find("WARN: The barometer has an existing calibration\n"), std::string::npos);
  EXPECT_NE(captured.out.find("TEMP:       25.500000\nSkipping registry write due to dry run.\n"
                              "Barometer calibration succeeded.\n"),
            std::string::npos);
  EXPECT_EQ(writes(), 0);
  EXPECT_EQ(script->countRequests(raw, 610), 0);
}

TEST_F(BaroTest, NotifiesTheSensorThatItStreamed) {
  run({"baro", "1013.25"});
  EXPECT_EQ(script->countRequests(raw, 610), 1);
  EXPECT_EQ(script->countRequests(pressure, 610), 0);
}

TEST_F(BaroTest, AFailedNotificationIsAWarning) {
  script->sensors[2].confirms = false;
  const Captured captured = run({"baro", "1013.25"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_NE(captured.out.find("WARN: Unable to notify sensor of completed calibration\n"
                              "WARN: A reboot may be required for the calibration to take effect\n"
                              "Barometer calibration succeeded.\n"),
            std::string::npos);
  EXPECT_EQ(storedBias(), 1.8125F);
}

TEST_F(BaroTest, AFailedWriteEndsItWithoutNotification) {
  script->registryWritesFail = true;
  const Captured captured = run({"baro", "1013.25"});
  EXPECT_EQ(captured.result, -5);
  EXPECT_NE(captured.out.find("Writing registry...\nWARN: Failed to write registry. Error = -5\n"
                              "Barometer calibration failed.\n"),
            std::string::npos);
  EXPECT_EQ(script->countRequests(raw, 610), 0);
}

TEST_F(BaroTest, NoiseOfExactlyTheLimitFails) {
  // Two samples a second apart from each other by 0.2·√2 have a deviation of 0.2 in float.
  script->sensors[2].reading = [](int index) {
    const float apart = 0.2F * std::sqrt(2.0F);
    return index < 2 ? std::vector<float>{index == 0 ? 0.0F : apart} : std::vector<float>{};
  };
  const Captured captured = run({"baro", "0"});
  EXPECT_EQ(captured.result, kInvalid);
  EXPECT_NE(captured.err.find("ERROR: Sample noise is too high: 0.200 >= 0.200\n"), std::string::npos);
  EXPECT_EQ(captured.out.find("BIAS:"), std::string::npos);
  EXPECT_EQ(captured.out.substr(captured.out.size() - 30), "Barometer calibration failed.\n");
  EXPECT_EQ(writes(), 0);
}

TEST_F(BaroTest, NoiseJustBelowTheLimitPasses) {
  script->sensors[2].reading = [](int index) {
    const float apart = 0.19999F * std::sqrt(2.0F);
    return index < 2 ? std::vector<float>{index == 0 ? 0.0F : apart} : std::vector<float>{};
  };
  EXPECT_EQ(run({"baro", "0"}).result, 0);
}

TEST_F(BaroTest, ASingleSampleHasNoNoiseThatCouldFail) {
  script->sensors[2].reading = [](int index) {
    return index == 0 ? std::vector<float>{1015} : std::vector<float>{};
  };
  const Captured captured = run({"baro", "1013.25"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_NE(captured.out.find("STDEV:            nan\n"), std::string::npos);
  EXPECT_EQ(storedBias(), 1.75F);
}

TEST_F(BaroTest, ABiasBeyondTheLimitFails) {
  readPressure([](int) { return 1010.0F; });
  const Captured captured = run({"baro", "-l", "3", "1013.25"});
  EXPECT_EQ(captured.result, kInvalid);
  EXPECT_EQ(captured.err, "ERROR: Bias is too large: |-3.250| > 3.000\n");
  EXPECT_NE(captured.out.find("TEMP:       25.500000\nBarometer calibration failed.\n"), std::string::npos);
  EXPECT_EQ(writes(), 0);
}

TEST_F(BaroTest, ABiasOfExactlyTheLimitPassesAndWithoutALimitAnyBiasDoes) {
  readPressure([](int) { return 1010.0F; });
  EXPECT_EQ(run({"baro", "-l", "3.25", "1013.25"}).result, 0);
  EXPECT_EQ(run({"baro", "2000"}).result, 0);
  EXPECT_EQ(storedBias(), -990.0F);
}

TEST_F(BaroTest, AReadingThatIsNoNumberIsNeverStored) {
  for (const float odd : {std::nanf(""), std::numeric_limits<float>::infinity()}) {
    readPressure([odd](int index) { return index == 3 ? odd : 1013.0F; });
    const Captured captured = run({"baro", "1013.25"});
    EXPECT_EQ(captured.result, kInvalid);
    EXPECT_NE(captured.err.find("ERROR: The barometer's bias is not a finite number"), std::string::npos);
    EXPECT_EQ(writes(), 0);
  }
}

TEST_F(BaroTest, ATemperatureThatIsNoNumberIsNeverStored) {
  script->sensors[1].reading = [](int) { return std::vector<float>{std::nanf("")}; };
  const Captured captured = run({"baro", "1013.25"});
  EXPECT_EQ(captured.result, kInvalid);
  EXPECT_NE(captured.err.find("ERROR: The barometer's temperature is not a finite number"),
            std::string::npos);
  EXPECT_EQ(writes(), 0);
}

TEST_F(BaroTest, ASilentSensorIsNamed) {
  options.quiet = true;
  script->sensors[1].reading = nullptr;
  Captured captured = run({"baro", "1013.25"});
  EXPECT_EQ(captured.result, -61);
  EXPECT_EQ(captured.err, "ERROR: No Barometer Temperature samples were received\n");
  EXPECT_EQ(captured.out,
            "Searching for barometer...\nBarometer calibration begins with Raw samples.\n"
            "Collecting samples...\nBarometer calibration failed.\n");
  script->sensors[2].reading = nullptr;
  captured = run({"baro", "1013.25"});
  EXPECT_EQ(captured.result, -61);
  EXPECT_EQ(captured.err, "ERROR: No Barometer Raw samples were received\n");
}

TEST_F(BaroTest, ACollectionThatFailsEndsIt) {
  script->refuses = [this](const sns_client_request_msg& request) {
    return ssc::SensorUid(request.suid()) == raw && request.msg_id() == 513;
  };
  const Captured captured = run({"baro", "1013.25"});
  EXPECT_EQ(captured.result, -5);
  EXPECT_NE(captured.out.find("Barometer calibration failed.\n"), std::string::npos);
  EXPECT_EQ(writes(), 0);
}

TEST_F(BaroTest, AGroupWithoutBiasIsNeverWritten) {
  script->registry[kGroup].mutable_items()->DeleteSubrange(0, 1);
  const Captured captured = run({"baro", "1013.25"});
  EXPECT_EQ(captured.result, kInvalid);
  EXPECT_EQ(captured.err, "ERROR: Invalid registry; missing \"bias\"\n");
  EXPECT_NE(captured.out.find("begins with Raw samples.\nBarometer calibration failed.\n"),
            std::string::npos);
  EXPECT_EQ(writes(), 0);
}

TEST_F(BaroTest, ABiasOfAnotherKindOrWithoutANumberFailsUntilItIsReset) {
  for (const bool emptyVector : {false, true}) {
    setPreviousBias(0);
    sns_registry_data_item* bias = script->registry[kGroup].mutable_items(0);
    if (emptyVector) {
      bias->mutable_subgrp()->clear_items();
    } else {
      bias->set_str("zero");
    }
    options.reset = false;
    const Captured captured = run({"baro", "1013.25"});
    EXPECT_EQ(captured.result, kInvalid);
    EXPECT_EQ(captured.err, "ERROR: Invalid registry; \"bias\" does not hold a vector of 1\n");
    EXPECT_EQ(group().items(0).version(), 3);
    options.reset = true;
    EXPECT_EQ(run({"baro"}).result, 0);
    EXPECT_EQ(storedBias(), 0.0F);
  }
}

TEST_F(BaroTest, AMissingGroupIsTheLibrarysResult) {
  script->registry.clear();
  const Captured captured = run({"baro", "1013.25"});
  EXPECT_EQ(captured.result, -2);
  EXPECT_NE(captured.out.find("Barometer calibration failed.\n"), std::string::npos);
}

TEST_F(BaroTest, AHandsetWithoutABarometerSaysSo) {
  script->sensors.clear();
  const Captured captured = run({"baro", "1013.25"});
  EXPECT_EQ(captured.result, -2);
  EXPECT_EQ(captured.out, "Searching for barometer...\n");
  EXPECT_EQ(captured.err, "ERROR: Unable to look up the barometer and its temperature sensor. Error = -2\n");
}

TEST_F(BaroTest, AResetStoresTheNeutralCalibrationEvenInADryRun) {
  setPreviousBias(2);
  options.reset = true;
  options.dryRun = true;
  const Captured captured = run({"baro", "-t", "nonsense"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_EQ(captured.out,
            "Searching for barometer...\nResetting barometer calibration...\n"
            "Reboot device for default calibration to take effect.\n");
  EXPECT_EQ(storedBias(), 0.0F);
  EXPECT_EQ(group().items(0).version(), 4);
  EXPECT_EQ(group().items(1).flt(), 0.0F);
  EXPECT_EQ(group().items(1).version(), 6);
  EXPECT_EQ(script->countRequests(raw, 610), 0);
}

TEST_F(BaroTest, AResetOfAGroupWithoutBiasWritesNothing) {
  script->registry[kGroup].mutable_items()->DeleteSubrange(0, 1);
  options.reset = true;
  const Captured captured = run({"baro"});
  EXPECT_EQ(captured.result, kInvalid);
  EXPECT_EQ(captured.err, "ERROR: Invalid registry; missing \"bias\"\n");
  EXPECT_EQ(writes(), 0);
}

TEST_F(BaroTest, AFailedResetIsTheWritesResult) {
  options.reset = true;
  script->registryWritesFail = true;
  const Captured captured = run({"baro"});
  EXPECT_EQ(captured.result, -5);
  EXPECT_EQ(captured.out,
            "Searching for barometer...\nResetting barometer calibration...\n"
            "WARN: Failed to write registry. Error = -5\n");
}

struct BadWords {
  std::vector<const char*> words;
  const char* message;
};

class BaroArguments : public BaroTest, public testing::WithParamInterface<BadWords> {};

TEST_P(BaroArguments, AreRefusedWithAMessageAndTheUsageLine) {
  const auto& words = GetParam().words;
  ArgumentWords argumentWords{"baro"};
  Captured captured;
  switch (words.size()) {
    case 0:
      captured = run({"baro"});
      break;
    case 1:
      captured = run({"baro", words[0]});
      break;
    case 2:
      captured = run({"baro", words[0], words[1]});
      break;
    default:
      captured = run({"baro", words[0], words[1], words[2]});
      break;
  }
  EXPECT_EQ(captured.result, kInvalid);
  EXPECT_EQ(captured.err, "ERROR: " + std::string(GetParam().message) + "\n" + kUsage);
  EXPECT_EQ(captured.out, "");
  EXPECT_TRUE(script->requests.empty());
}

INSTANTIATE_TEST_SUITE_P(All, BaroArguments,
                         testing::Values(BadWords{{}, "No reference pressure was specified"},
                                         BadWords{{"-t", "5"}, "No reference pressure was specified"},
                                         BadWords{{"-t", "0", "1000"}, "SECONDS must be a positive integer"},
                                         BadWords{{"-t", "-3", "1000"}, "SECONDS must be a positive integer"},
                                         BadWords{{"-t", "2.5", "1000"},
                                                  "SECONDS must be a positive integer"},
                                         BadWords{{"-l", "0", "1000"}, "LIMIT must be a positive number"},
                                         BadWords{{"-l", "nan", "1000"}, "LIMIT must be a positive number"},
                                         BadWords{{"-l", "inf", "1000"}, "LIMIT must be a positive number"},
                                         BadWords{{"-l", "3x", "1000"}, "LIMIT must be a positive number"},
                                         BadWords{{"--", "-5"}, "PRESSURE must be a positive number"},
                                         BadWords{{"high"}, "PRESSURE must be a positive number"},
                                         BadWords{{"nan"}, "PRESSURE must be a positive number"},
                                         BadWords{{"inf"}, "PRESSURE must be a positive number"},
                                         BadWords{{"-5"}, "Invalid 'baro' command option '?'"},
                                         BadWords{{"1000", "-z"}, "Invalid 'baro' command option '?'"},
                                         BadWords{{"1000", "-t"}, "Invalid 'baro' command option '?'"}));

TEST_F(BaroTest, AReferenceOfZeroIsAccepted) {
  EXPECT_EQ(run({"baro", "0"}).result, 0);
  EXPECT_EQ(storedBias(), 1015.0625F);
}

TEST_F(BaroTest, ExtraArgumentsAreWarnedAbout) {
  const Captured captured = run({"baro", "1013.25", "more", "words"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_EQ(captured.out.rfind("WARN: Ignoring extra argument 'more'\nWARN: Ignoring extra argument 'words'\n"
                               "Searching for barometer...\n",
                               0),
            0U);
}

TEST_F(BaroTest, HelpIsPrintedAndIsSuccess) {
  const Captured captured = run({"baro", "1013.25", "-h"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_EQ(captured.err, "");
  EXPECT_EQ(captured.out, std::string(kUsage) +
                              "Options:\n"
                              "  -h           Print this help and exit.\n"
                              "  -l LIMIT     Verify that the calculated biase is not greater than LIMIT.\n"
                              "  -t SECONDS   Specify the number of seconds to spend collecting samples.\n"
                              "                 Default is 2 seconds.\n"
                              "Arguments:\n"
                              "  PRESSURE     Reference pressure in hecto-Pascals (hPa).\n\n");
  EXPECT_TRUE(script->requests.empty());
}

TEST_F(BaroTest, MayBeRunAgainWithoutOptionsOfTheRunBefore) {
  connection = connectTo(script);
  BaroCalibrator calibrator(connection.get());
  ArgumentWords limited{"baro", "-l", "0.1", "-t", "1", "1013.25"};
  ArgumentWords unlimited{"baro", "1013.25"};
  options.command = "baro";
  options.argc = limited.argc();
  options.argv = limited.argv();
  EXPECT_EQ(capture([&] { return calibrator.Run(options); }).result, kInvalid);
  options.argc = unlimited.argc();
  options.argv = unlimited.argv();
  EXPECT_EQ(capture([&] { return calibrator.Run(options); }).result, 0);
}

}  // namespace
