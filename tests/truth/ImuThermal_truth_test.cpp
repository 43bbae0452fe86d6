// Whether "imu-thermal" finds the drift that a simulated handset was given, over many handsets.
#include <cmath>
#include <random>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "truth/TruthHandset.h"

namespace {

using testing::HasSubstr;
using testing::Not;

constexpr unsigned kHandsets = 10;
constexpr int kSeconds = 400;
constexpr double kSamples = 20.0 * kSeconds;
// From 30 to 50 °C at a steady pace; the spread is that of a uniform distribution.
const std::string kWarmUp = "world.temperature=[{at=0,value=30},{at=0.5,value=50,ramp=400}]";
const double kTemperatureSpread = 20 / std::sqrt(12.0);
constexpr double kReferenceTemperature = 27.5;  // °C, of the scenarios
constexpr double kGravity = 9.80665;
constexpr double kDeviations = 5;       // that a slope may be off
constexpr double kPrinted = 0.5e-6;     // numbers are printed with six digits after the point
constexpr double kMeanRounding = 5e-3;  // of a sum of thousands of readings of 10 in single precision

/// One sensor's errors.
struct Drift {
  double bias = 0;   ///< at the reference temperature
  double slope = 0;  ///< per °C
};

/// What is different between handsets.
struct Truth {
  Truth(unsigned seed, double noiseOfAccel, double noiseOfGyro)
      : accelNoise(noiseOfAccel), gyroNoise(noiseOfGyro) {
    std::mt19937 generator(seed);
    for (Drift& drift : accel) drift = draw(generator, 0.2, 0.005);
    for (Drift& drift : gyro) drift = draw(generator, 0.02, 0.0005);
    describe("accel", accel, accelNoise);
    describe("gyro", gyro, gyroNoise);
    overrides.push_back(kWarmUp);
    overrides.push_back("sensor.imu_temperature.bias=0");
  }

  static Drift draw(std::mt19937& generator, double bias, double slope) {
    return {std::uniform_real_distribution<double>(-bias, bias)(generator),
            std::uniform_real_distribution<double>(-slope, slope)(generator)};
  }

  void describe(const std::string& sensor, const std::array<Drift, 3>& drifts, double noise) {
    std::string biases;
    std::string slopes;
    for (const Drift& drift : drifts) {
      biases += (biases.empty() ? "" : ",") + std::to_string(drift.bias);
      slopes += (slopes.empty() ? "" : ",") + std::to_string(drift.slope);
    }
    overrides.push_back("sensor." + sensor + ".bias=[" + biases + "]");
    overrides.push_back("sensor." + sensor + ".temperature_slope=[" + slopes + "]");
    overrides.push_back("sensor." + sensor + ".scale=1");
    overrides.push_back("sensor." + sensor + ".noise=" + std::to_string(noise));
  }

  std::array<Drift, 3> accel;
  std::array<Drift, 3> gyro;
  double accelNoise;
  double gyroNoise;
  std::vector<std::string> overrides;
};

double slopeBound(double noise) { return kDeviations * noise / (std::sqrt(kSamples) * kTemperatureSpread); }

/// The scales or biases behind a label; three of them.
std::vector<double> axesAfter(const std::string& label, const Captured& run) {
  std::vector<double> axes = numbersAfter(label, run.out);
  EXPECT_EQ(axes.size(), 3U) << label << "\n" << run.out;
  axes.resize(3);
  return axes;
}

void expectModel(const std::string& label, const std::array<Drift, 3>& truth, double noise, double standing,
                 const Captured& run) {
  const std::vector<double> scale = axesAfter(label + "_SCALE:", run);
  const std::vector<double> bias = axesAfter(label + "_BIAS:", run);
  const double bound = slopeBound(noise) + kPrinted;
  for (std::size_t axis = 0; axis < 3; ++axis) {
    EXPECT_NEAR(scale[axis], truth[axis].slope, bound) << label << " axis " << axis;
    const double atZero =
        (axis == 2 ? standing : 0) + truth[axis].bias - truth[axis].slope * kReferenceTemperature;
    EXPECT_NEAR(bias[axis], atZero, 50 * bound + kMeanRounding) << label << " axis " << axis;
  }
}

class ImuThermalTruth : public testing::TestWithParam<unsigned> {
 protected:
  static Captured calibrate(TruthHandset& handset, unsigned noiseSeed) {
    Captured run = handset.Run({"-q", "imu-thermal", std::to_string(kSeconds)},
                               {"hub.seed=" + std::to_string(noiseSeed)});
    EXPECT_EQ(run.result, 0) << run.out << run.err;
    return run;
  }

  const Truth truth_{GetParam(), 0.0015, 0.0005};
};

TEST_P(ImuThermalTruth, FindsTheDriftOfRawReadingsEveryTime) {
  TruthHandset handset("t5h5", truth_.overrides);
  for (const unsigned noiseSeed : {GetParam(), GetParam() + 1000}) {
    const Captured run = calibrate(handset, noiseSeed);
    expectModel("ACCEL", truth_.accel, truth_.accelNoise, kGravity, run);
    expectModel(" GYRO", truth_.gyro, truth_.gyroNoise, 0, run);
    EXPECT_THAT(run.out, Not(HasSubstr("existing")));
  }
}

TEST_P(ImuThermalTruth, FindsTheDriftOnceWhereTheStoredModelTakesItOff) {
  TruthHandset handset("o1v1", truth_.overrides);
  const Captured first = calibrate(handset, GetParam());
  expectModel("ACCEL", truth_.accel, truth_.accelNoise, kGravity, first);
  expectModel(" GYRO", truth_.gyro, truth_.gyroNoise, 0, first);

  // What a second run adds to the model is what drift is left.
  const Captured second = calibrate(handset, GetParam() + 1000);
  EXPECT_THAT(second.out, HasSubstr("existing accelerometer thermal calibration which will be overwritten"));
  for (const auto& [label, noise] :
       {std::pair{"ACCEL_SCALE:", truth_.accelNoise}, std::pair{" GYRO_SCALE:", truth_.gyroNoise}}) {
    const std::vector<double> before = axesAfter(label, first);
    const std::vector<double> after = axesAfter(label, second);
    // The second run measures the first one's error, and has its own.
    for (std::size_t axis = 0; axis < 3; ++axis) {
      EXPECT_NEAR(after[axis] - before[axis], 0, 2 * (slopeBound(noise) + kPrinted)) << label << axis;
    }
  }
}

TEST_P(ImuThermalTruth, ResetBringsTheDriftBack) {
  TruthHandset handset("o1v1", truth_.overrides);
  (void)calibrate(handset, GetParam());
  ASSERT_EQ(handset.Run({"-r", "imu-thermal"}).result, 0);
  const Captured after = calibrate(handset, GetParam() + 1000);
  EXPECT_THAT(after.out, Not(HasSubstr("existing")));
  expectModel("ACCEL", truth_.accel, truth_.accelNoise, kGravity, after);
}

INSTANTIATE_TEST_SUITE_P(Handsets, ImuThermalTruth, testing::Range(1U, kHandsets + 1));

}  // namespace
