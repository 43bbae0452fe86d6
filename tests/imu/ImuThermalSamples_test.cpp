#include "imu/ImuThermalTest.h"

namespace {

using testing::EndsWith;
using testing::FloatNear;
using testing::HasSubstr;
using testing::Not;
using testing::StartsWith;

TEST_F(ImuThermalTest, ARiseOfLessThanSevenDegreesFails) {
  setTemperatures({30.0F, 31.0F, 32.0F, 33.0F, 34.0F, 35.0F, 36.0F, 36.5F, 36.99F});
  const Captured captured = run();
  EXPECT_EQ(captured.result, kInvalid);
  EXPECT_EQ(captured.err, "ERROR: Temperature delta is too low (36.99-30.00 < 7.00)\n");
  EXPECT_EQ(captured.out,
            std::string("Looking up sensors...\nIMU thermal calibration begins.\nCollecting samples...\n"
                        "Validating temperatures...\n") +
                kFailed);
  setTemperatures({30.0F, 31.0F, 32.0F, 33.0F, 34.0F, 35.0F, 36.0F, 36.5F, 37.0F});
  EXPECT_EQ(run().result, 0);
}

TEST_F(ImuThermalTest, MoreThanSixtyDegreesFail) {
  setTemperatures({30, 31, 32, 33, 34, 35, 36, 37, 60.01F, 40});
  const Captured captured = run();
  EXPECT_EQ(captured.result, kInvalid);
  EXPECT_EQ(captured.err, "ERROR: Maximum temperature was too high (60.01 > 60.00)\n");
  setTemperatures({30, 31, 32, 33, 34, 35, 36, 37, 60, 40});
  EXPECT_EQ(run().result, 0);
}

TEST_F(ImuThermalTest, WithoutValidationAnyTemperatureServes) {
  setTemperatures({70, 69, 68, 67, 66, 65});
  for (const char* const option : {"-i", "--no-validate-temp"}) {
    const Captured captured = run({"imu-thermal", option, "10"});
    EXPECT_EQ(captured.result, 0);
    EXPECT_THAT(captured.out, HasSubstr("Collecting samples...\nChecking for bumps...\n"));
  }
}

TEST_F(ImuThermalTest, NoTemperatureAtAllFails) {
  at(imuTemp).reading = nullptr;
  const Captured captured = run();
  EXPECT_EQ(captured.result, kNoData);
  EXPECT_EQ(captured.err, "ERROR: No IMU Temperature samples were received\n");
  EXPECT_THAT(captured.out, EndsWith(std::string("Collecting samples...\n") + kFailed));
}

TEST_F(ImuThermalTest, WithoutValidationItIsTheFitThatNeedsTemperatures) {
  at(imuTemp).reading = nullptr;
  for (const char* const detector : {"--bump-tbrng=0.1", "--use-old-bump"}) {
    const Captured captured = run({"imu-thermal", "-i", detector, "10"});
    EXPECT_EQ(captured.result, kNoData);
    EXPECT_EQ(captured.err, "ERROR: Insufficient data to perform linear regression\n");
    EXPECT_THAT(captured.out, HasSubstr("Collecting samples...\nChecking for bumps...\n"));
    EXPECT_THAT(captured.out,
                EndsWith(std::string("Correlating Accelerometer with IMU Temperature...\n") + kFailed));
  }
}

TEST_F(ImuThermalTest, WhichSamplesAFitLacksIsInTheDetails) {
  at(imuTemp).reading = nullptr;
  ssc::setLogLevel(ssc::kLogDebug);
  const Captured captured = run({"imu-thermal", "-i", "10"});
  ssc::setLogLevel(ssc::kLogInfo);
  EXPECT_THAT(captured.out,
              HasSubstr("DEBUG: Only 0 of at least 2 Accelerometer samples lie within the time of "
                        "0 IMU Temperature samples\n"));
}

TEST_F(ImuThermalTest, ASilentThermometerIsNotAmongThePrintedSensors) {
  at(imuTemp).reading = nullptr;
  options.quiet = false;
  const Captured captured = run();
  EXPECT_THAT(captured.out, HasSubstr("\nAccelerometer Samples:\n"));
  EXPECT_THAT(captured.out, Not(HasSubstr("IMU Temperature Samples:\n")));
}

TEST_F(ImuThermalTest, OneTemperatureIsTooLittle) {
  at(imuTemp).reading = [](int index) { return index == 0 ? std::vector<float>{30} : std::vector<float>{}; };
  EXPECT_EQ(run().err, "ERROR: Temperature delta is too low (30.00-30.00 < 7.00)\n");
  const Captured captured = run({"imu-thermal", "-i", "10"});
  EXPECT_EQ(captured.result, kNoData);
  EXPECT_THAT(captured.out, HasSubstr("WARN: Not enough buckets to perform bump detection\n"));
  EXPECT_EQ(captured.err, "ERROR: Insufficient data to perform linear regression\n");
}

TEST_F(ImuThermalTest, TemperaturesThatAreNoNumberAreDropped) {
  const auto reading = at(imuTemp).reading;
  at(imuTemp).reading = [reading](int index) {
    if (index == 3) return std::vector<float>{std::numeric_limits<float>::quiet_NaN()};
    if (index == 4) return std::vector<float>{std::numeric_limits<float>::infinity()};
    return reading(index);
  };
  const Captured captured = run();
  EXPECT_EQ(captured.result, 0);
  EXPECT_THAT(captured.out,
              HasSubstr("Collecting samples...\nWARN: Dropping IMU Temperature samples that are no "
                        "temperature (this is said once)\nValidating"));
  EXPECT_THAT(captured.out, HasSubstr("ACCEL_SCALE:       0.001000      -0.002000       0.000000\n"));
}

TEST_F(ImuThermalTest, AConstantTemperatureLeavesAModelThatIsNoNumber) {
  setTemperatures({32});
  const Captured captured = run({"imu-thermal", "-i", "10"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_THAT(captured.out, Not(HasSubstr("does not correlate")));
  ASSERT_EQ(stored(kAccelScale).size(), 3U);
  for (const float value : stored(kAccelScale)) EXPECT_TRUE(std::isnan(value));
}

TEST_F(ImuThermalTest, SamplesOfLowAccuracyAreDropped) {
  at(accel).status = SNS_STD_SENSOR_SAMPLE_STATUS_ACCURACY_MEDIUM;
  ssc::setLogLevel(ssc::kLogDebug);
  const Captured captured = run();
  ssc::setLogLevel(ssc::kLogInfo);
  EXPECT_EQ(captured.result, kNoData);
  EXPECT_THAT(captured.out, HasSubstr("DEBUG: sample status (2) below accuracy level (3), dropping\n"));
  EXPECT_EQ(captured.err, "ERROR: Insufficient data to perform linear regression\n");
}

TEST_F(ImuThermalTest, OtherSensorsMayBeOfLowAccuracy) {
  for (const auto& suid : {imuTemp, mag, magTemp, baro, baroTemp}) {
    at(suid).status = SNS_STD_SENSOR_SAMPLE_STATUS_UNRELIABLE;
  }
  EXPECT_THAT(run().out, HasSubstr("  MAG_SCALE:       0.250000"));
}

TEST_F(ImuThermalTest, EventsWithTooFewAxesAreDropped) {
  at(gyro).reading = [](int) { return std::vector<float>{1, 2}; };
  const Captured captured = run();
  EXPECT_EQ(captured.result, kNoData);
  EXPECT_THAT(captured.out,
              HasSubstr("WARN: Dropping Gyroscope events with fewer than 3 values (this is said once)\n"));
  EXPECT_THAT(captured.out,
              EndsWith(std::string("Correlating Gyroscope with IMU Temperature...\n") + kFailed));
  // The accelerometer's model was stored before, and stays.
  EXPECT_EQ(stored(kAccelScale).size(), 3U);
  EXPECT_TRUE(stored(kGyroScale).empty());
}

TEST_F(ImuThermalTest, SurplusValuesAreIgnored) {
  at(accel).reading = [this](int index) {
    std::vector<float> values = drift(index, {0.001F, -0.002F, 0.0F}, {0.5F, 0.25F, 9.75F});
    values.insert(values.end(), {std::numeric_limits<float>::quiet_NaN(), 5.0F * static_cast<float>(index)});
    return values;
  };
  at(baro).reading = [](int index) { return std::vector<float>{1000.0F + 0.5F * temperatureAt(index), 3}; };
  const Captured captured = run();
  EXPECT_EQ(captured.result, 0);
  EXPECT_THAT(captured.out, HasSubstr("ACCEL_SCALE:       0.001000      -0.002000       0.000000\n"));
  EXPECT_THAT(captured.out, HasSubstr(" BARO_SCALE:       0.500000\n BARO_BIAS:      999.999939\n"));
}

TEST_F(ImuThermalTest, SamplesWhoseTimeRunsBackwardsAreDropped) {
  script->onRequest = [this](ScriptedHub& hub, const sns_client_request_msg& request) {
    if (request.msg_id() != 513 || ssc::SensorUid(request.suid()) != imuTemp) return false;
    sns_client_event_msg message;
    imuTemp.CopyTo(message.mutable_suid());
    auto* const event = message.add_events();
    event->set_msg_id(1025);
    event->set_timestamp(1);
    event->set_payload(encodeReading({500}));
    hub.SendMessage(std::chrono::milliseconds(4500), message);
    return false;
  };
  const Captured captured = run();
  EXPECT_EQ(captured.result, 0);
  EXPECT_THAT(captured.out,
              HasSubstr("WARN: Dropping IMU Temperature samples whose time runs backwards (this is said "
                        "once)\n"));
}

TEST_F(ImuThermalTest, AReadingThatIsNoNumberIsNotStored) {
  const auto reading = at(accel).reading;
  at(accel).reading = [reading](int index) {
    std::vector<float> values = reading(index);
    if (index == 77) values[1] = std::numeric_limits<float>::quiet_NaN();
    return values;
  };
  const Captured captured = run();
  EXPECT_EQ(captured.result, kInvalid);
  EXPECT_EQ(captured.err, "ERROR: Accelerometer scale is not a finite number: nan\n");
  EXPECT_EQ(writes(), 0);
  setTemperatures({32});
  EXPECT_EQ(run({"imu-thermal", "-i", "10"}).err,
            "ERROR: Accelerometer reading is not a finite number: nan\n");
  EXPECT_EQ(writes(), 0);
}

TEST_F(ImuThermalTest, AMalformedEventEndsIt) {
  script->onRequest = [this](ScriptedHub& hub, const sns_client_request_msg& request) {
    if (request.msg_id() != 513 || ssc::SensorUid(request.suid()) != accel) return false;
    hub.SendEvent(std::chrono::seconds(2), accel, 1025, "\xff");
    return false;
  };
  const Captured captured = run();
  EXPECT_EQ(captured.result, -2147483647);
  EXPECT_EQ(captured.err, "ERROR: Received malformed sensor event\n");
  EXPECT_THAT(captured.out, EndsWith(std::string("Collecting samples...\n") + kFailed));
}

TEST_F(ImuThermalTest, TheFourthTimeTheHubGoesAwayEndsIt) {
  script->onRequest = [this](ScriptedHub& hub, const sns_client_request_msg& request) {
    if (request.msg_id() == 513 && ssc::SensorUid(request.suid()) == accel) {
      hub.GoAwayAndReturn(std::chrono::seconds(1), std::chrono::seconds(1));
    }
    return false;
  };
  const Captured captured = run({"imu-thermal", "60"});
  EXPECT_EQ(captured.result, -11);
  EXPECT_THAT(captured.out, EndsWith(kFailed));
}

TEST_F(ImuThermalTest, HandsetsThatSendRawValuesAreFittedByThem) {
  raw = true;
  for (const DeviceType type : {DeviceType::p2m2, DeviceType::t5h5, DeviceType::rufael}) {
    options.deviceType = type;
    at(mag).reading = [](int) { return std::vector<float>{1, 2, 3}; };
    options.quiet = false;
    const Captured captured = run();
    EXPECT_EQ(captured.result, 0);
    EXPECT_THAT(captured.out, HasSubstr("ACCEL_SCALE:       0.001000      -0.002000       0.000000\n"));
    EXPECT_THAT(captured.out,
                HasSubstr("\nAccelerometer Samples:\n0.050000       0.530050       0.189900       "
                          "9.750000\n"));
  }
}

TEST_F(ImuThermalTest, RawHandsetsReadTheStoredModelAndNeitherShowNorMergeIt) {
  raw = true;
  options.deviceType = DeviceType::t5h5;
  store(kAccelScale, {1, 2, 3}, 1);
  const Captured captured = run();
  EXPECT_EQ(captured.result, 0);
  EXPECT_THAT(captured.out, Not(HasSubstr("existing")));
  EXPECT_THAT(stored(kAccelScale)[1], FloatNear(-0.002F, 1e-6F));
  script->registry.erase(kGyroBias);
  EXPECT_EQ(run().result, -2);
}

TEST_F(ImuThermalTest, RawHandsetsWithoutRawValuesEndTheCollection) {
  options.deviceType = DeviceType::p2m2;
  at(gyro).reading = nullptr;
  at(accel).reading = [](int index) {
    return index < 30 ? std::vector<float>{1, 2, 3, 4, 5, 6} : std::vector<float>{1, 2, 3, 4, 5};
  };
  const Captured captured = run();
  EXPECT_EQ(captured.result, kInvalid);
  EXPECT_EQ(captured.err,
            "ERROR: raw data not available on IMU sensors\n"
            "ERROR: Temperature delta is too low (31.00-31.00 < 7.00)\n");
  EXPECT_EQ(connection->clock().now().time_since_epoch(), std::chrono::milliseconds(1550));
}

TEST_F(ImuThermalTest, RawHandsetsTellAnEventWithTooFewValuesFromARawOneHoweverShortItIs) {
  options.deviceType = DeviceType::p2m2;
  at(accel).reading = [](int) { return std::vector<float>{1}; };
  EXPECT_THAT(run().err, StartsWith("ERROR: raw data not available on IMU sensors\n"));
}

TEST_F(ImuThermalTest, ABumpFailsAndStoresNothing) {
  const auto reading = at(accel).reading;
  at(accel).reading = [reading](int index) {
    std::vector<float> values = reading(index);
    if (index >= 100) values[2] += 0.05F;
    return values;
  };
  ssc::setLogLevel(ssc::kLogDebug);
  const Captured captured = run();
  ssc::setLogLevel(ssc::kLogInfo);
  EXPECT_EQ(captured.result, kInvalid);
  EXPECT_EQ(captured.err, "ERROR: Detected bump during sample collection\n");
  EXPECT_THAT(captured.out, HasSubstr("DEBUG: bin 0 mean = 0.531, 0.188, 9.750\n"));
  EXPECT_THAT(captured.out, EndsWith(std::string("DEBUG: bump diff = 0.033333\n") + kFailed));
  EXPECT_EQ(writes(), 0);

  const Captured byTime = run({"imu-thermal", "--use-old-bump", "10"});
  EXPECT_EQ(byTime.result, kInvalid);
  EXPECT_EQ(byTime.err, "ERROR: Detected bump during sample collection\n");
}

TEST_F(ImuThermalTest, TheThresholdOptionLetsABumpPass) {
  const auto reading = at(accel).reading;
  at(accel).reading = [reading](int index) {
    std::vector<float> values = reading(index);
    if (index >= 100) values[2] += 0.05F;
    return values;
  };
  EXPECT_EQ(run({"imu-thermal", "--bump-thold", "0.06", "10"}).result, 0);
  EXPECT_EQ(run({"imu-thermal", "--bump-thold", "0.06", "--use-old-bump", "10"}).result, 0);
}

TEST_F(ImuThermalTest, ABumpOfTheGyroscopeAloneIsNotDetected) {
  const auto reading = at(gyro).reading;
  at(gyro).reading = [reading](int index) {
    std::vector<float> values = reading(index);
    if (index >= 100) values[0] += 5;
    return values;
  };
  EXPECT_EQ(run().result, 0);
}

TEST_F(ImuThermalTest, TooFewBucketsAreAWarning) {
  const Captured captured = run({"imu-thermal", "--bump-tbrng", "20", "10"});
  EXPECT_EQ(captured.result, 0);
  EXPECT_THAT(captured.out,
              HasSubstr("Checking for bumps...\nWARN: Not enough buckets to perform bump detection\n"
                        "WARN: Consider reducing the temperature bucket range (--bump-tbrng)\nCorrelating"));
}

TEST_F(ImuThermalTest, TooManyBucketsAreRefused) {
  const Captured captured = run({"imu-thermal", "--bump-tbrng", "1e-30", "10"});
  EXPECT_EQ(captured.result, kInvalid);
  EXPECT_EQ(captured.err,
            "ERROR: A temperature bucket range of 1e-30 makes too many buckets (--bump-tbrng)\n");
  EXPECT_THAT(captured.out, EndsWith(std::string("Checking for bumps...\n") + kFailed));
}

TEST_F(ImuThermalTest, TheOldDetectorGoesByCount) {
  const Captured few = run({"imu-thermal", "--use-old-bump", "--bump-bsize", "101", "10"});
  EXPECT_EQ(few.result, 0);
  EXPECT_THAT(few.out, HasSubstr("WARN: Not enough samples to perform bump detection\n"
                                 "WARN: Consider reducing the bucket size (--bump-bsize)\n"));
  EXPECT_THAT(run({"imu-thermal", "--use-old-bump", "--bump-bsize", "100", "10"}).out,
              Not(HasSubstr("Not enough")));
  // Without it the bucket size is taken and has no effect.
  EXPECT_THAT(run({"imu-thermal", "--bump-bsize", "101", "10"}).out, Not(HasSubstr("Not enough")));
}

TEST_F(ImuThermalTest, SamplesOutsideTheTemperaturesAreGoneFromTheFit) {
  // Wild readings before the first temperature and from the last one on leave the fit alone.
  const auto reading = at(accel).reading;
  at(accel).reading = [reading](int index) {
    return index < 19 || index >= 199 ? std::vector<float>{1000, 1000, 1000} : reading(index);
  };
  const Captured captured = run();
  EXPECT_EQ(captured.result, 0);
  EXPECT_THAT(captured.out, HasSubstr("ACCEL_SCALE:       0.001000      -0.002000       0.000000\n"));
  // The old bump detector looks at them: it runs before they are gone.
  EXPECT_EQ(run({"imu-thermal", "--use-old-bump", "10"}).err,
            "ERROR: Detected bump during sample collection\n");
}

TEST_F(ImuThermalTest, TwoSamplesWithATemperatureAreEnough) {
  const auto reading = at(accel).reading;
  std::vector<int> sent{60, 100};
  at(accel).reading = [&](int index) {
    return std::count(sent.begin(), sent.end(), index) > 0 ? reading(index) : std::vector<float>{};
  };
  const Captured two = run();
  EXPECT_EQ(two.result, 0) << two.err;
  EXPECT_THAT(two.out, HasSubstr("ACCEL_SCALE:       0.001000      -0.002000       0.000000\n"));
  sent = {60};
  const Captured one = run();
  EXPECT_EQ(one.result, kNoData);
  EXPECT_THAT(one.err, StartsWith("ERROR: Insufficient data to perform linear regression\n"));
  EXPECT_THAT(one.out, Not(HasSubstr("ACCEL_SCALE")));
}

TEST_F(ImuThermalTest, TheSamplesOfASensorGetTheirTemperaturesOnce) {
  ArgumentWords words({"imu-thermal", "10"});
  options.command = "imu-thermal";
  options.argc = words.argc();
  options.argv = words.argv();
  connection = connectTo(script);
  ImuThermalCalibrator calibrator(connection.get());
  ASSERT_EQ(capture([&] { return calibrator.Run(options); }).result, 0);

  // Neither the same thermometer again nor what is none at all changes anything.
  for (const ssc::SensorUid& thermometer : {imuTemp, accel}) {
    SampleData scale;
    SampleData bias;
    const Captured again = capture([&] {
      calibrator.InterpolateTemperature(accel, thermometer);
      return calibrator.CorrelateTemperature(accel, thermometer, nullptr, &scale, &bias);
    });
    EXPECT_EQ(again.result, 0);
    EXPECT_EQ(scale.toVector(), stored(kAccelScale));
    EXPECT_EQ(bias.toVector(), stored(kAccelBias));
  }
}

TEST_F(ImuThermalTest, AnAxisThatDoesNotCorrelateGetsNoSlope) {
  // A jitter without slope, of which rounding makes the test strike: the line leaves one bit more of it.
  at(accel).reading = [](int index) {
    return std::vector<float>{0.125F + 0.001F * static_cast<float>(index % 5 - 2), 0, 9.75F};
  };
  ssc::setLogLevel(ssc::kLogDebug);
  const Captured captured = run();
  ssc::setLogLevel(ssc::kLogInfo);
  EXPECT_EQ(captured.result, 0);
  EXPECT_THAT(captured.out, HasSubstr("Correlating Accelerometer with IMU Temperature...\n"
                                      "WARN: X-axis data does not correlate with temperature\n"
                                      "DEBUG: stdev[0] 0.0014181597 > 0.0014181596\n"
                                      "ACCEL_SCALE:       0.000000       0.000000       0.000000\n"));
  EXPECT_EQ(stored(kAccelScale)[0], 0.0F);
}

}  // namespace
