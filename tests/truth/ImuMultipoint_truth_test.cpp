// Whole procedures of simulated handsets with errors drawn at random: what the last step stores has to be
// those errors' inverse, and has to make the calibrated stream true.
#include <array>
#include <cmath>
#include <numbers>
#include <random>
#include <sstream>

#include <gtest/gtest.h>

#include "framework/Matrix3by3.h"
#include "truth/TruthHandset.h"

namespace {

using Vector = std::array<double, 3>;
using Matrix = Matrix3by3<double>;

constexpr double kGravity = 9.80665;
constexpr double kAccelNoise = 0.02;  // m/s²
constexpr double kGyroNoise = 0.002;  // rad/s
// Beyond so many standard deviations it is no chance: with some thousand comparisons, one in a billion each.
constexpr double kSigmas = 6;

struct Pose {
  const char* phase;
  const char* angles;
  std::size_t axis;
  double sign;
};
constexpr std::array<Pose, 6> kPoses{{{"a+x", "[0,-90,0]", 0, 1},
                                      {"a-x", "[0,90,0]", 0, -1},
                                      {"a+y", "[90,0,0]", 1, 1},
                                      {"a-y", "[-90,0,0]", 1, -1},
                                      {"a+z", "[0,0,0]", 2, 1},
                                      {"a-z", "[180,0,0]", 2, -1}}};

template <class Numbers>
std::string tomlList(const Numbers& numbers) {
  std::ostringstream text;
  text.precision(17);
  for (const double number : numbers) text << (text.tellp() == 0 ? "[" : ",") << std::fixed << number;
  return text.str() + "]";
}

/// reading = scale · truth + bias
struct SensorTruth {
  Matrix scale;
  Vector bias{};

  [[nodiscard]] std::vector<std::string> Overrides(const std::string& sensor, double noise) const {
    return {"sensor." + sensor + ".scale=" + tomlList(scale.elements()),
            "sensor." + sensor + ".bias=" + tomlList(bias),
            "sensor." + sensor + ".noise=" + std::to_string(noise)};
  }
};

SensorTruth drawTruth(std::mt19937_64& random, double biasSize, double misalignment) {
  std::uniform_real_distribution<double> unit(-1, 1);
  SensorTruth truth;
  for (std::size_t row = 0; row < 3; ++row) {
    truth.bias[row] = biasSize * unit(random);
    for (std::size_t column = 0; column < 3; ++column) {
      truth.scale(row, column) = row == column ? 1 + 0.03 * unit(random) : misalignment * unit(random);
    }
  }
  return truth;
}

class ImuTruth : public testing::TestWithParam<int> {
 protected:
  void makeHandset(const std::string& scenario, double misalignment) {
    accel = drawTruth(random, 0.3, misalignment);
    gyro = drawTruth(random, 0.03, misalignment);
    std::vector<std::string> overrides = accel.Overrides("accel", kAccelNoise);
    for (const std::string& text : gyro.Overrides("gyro", kGyroNoise)) overrides.push_back(text);
    handset = std::make_unique<TruthHandset>(scenario, overrides);
  }

  /// Each command has noise of its own.
  std::string newSeed() { return "hub.seed=" + std::to_string(random() >> 2U); }

  Captured step(std::vector<std::string> words, std::vector<std::string> world) {
    world.push_back(newSeed());
    words.insert(words.begin(), {"-q", "imu-multipoint"});
    Captured captured = handset->Run(words, world);
    EXPECT_EQ(captured.result, 0) << captured.out << captured.err;
    return captured;
  }

  /// Means of the calibrated stream at 20 Hz, whose values come first in readings with both: the positional
  /// procedure's step prints them on any handset.
  Captured measureCalibrated(const std::vector<std::string>& world) {
    std::vector<std::string> withSeed = world;
    withSeed.push_back(newSeed());
    return handset->Run({"--device", "o1v1", "-q", "imu-multipoint", "first"}, withSeed);
  }

  void expectTrueStreams(double accelTolerance, double gyroTolerance) {
    for (const Pose& pose : kPoses) {
      const Captured captured = measureCalibrated({std::string("world.pose=") + pose.angles});
      const auto accelMean = numbersAfter("ACCEL_MEAN:", captured.out);
      const auto gyroMean = numbersAfter(" GYRO_MEAN:", captured.out);
      ASSERT_GE(accelMean.size(), 3U) << captured.out << captured.err;
      ASSERT_GE(gyroMean.size(), 3U);
      for (std::size_t axis = 0; axis < 3; ++axis) {
        EXPECT_NEAR(accelMean[axis], axis == pose.axis ? pose.sign * kGravity : 0, accelTolerance)
            << pose.phase << " axis " << axis;
        EXPECT_NEAR(gyroMean[axis], 0, gyroTolerance) << pose.phase << " axis " << axis;
      }
    }
  }

  std::mt19937_64 random{static_cast<std::uint64_t>(GetParam())};
  SensorTruth accel;
  SensorTruth gyro;
  std::unique_ptr<TruthHandset> handset;
};

void expectInverse(const std::vector<double>& found, const Matrix& scale, double tolerance) {
  ASSERT_EQ(found.size(), 9U);
  const Matrix expected = scale.Inverse();
  for (std::size_t i = 0; i < 9; ++i) EXPECT_NEAR(found[i], expected.elements()[i], tolerance) << i;
}

void expectCorrectedBias(const std::vector<double>& found, const SensorTruth& truth, double tolerance) {
  ASSERT_EQ(found.size(), 3U);
  const Matrix inverse = truth.scale.Inverse();
  for (std::size_t row = 0; row < 3; ++row) {
    double expected = 0;
    for (std::size_t column = 0; column < 3; ++column) {
      expected += inverse(row, column) * truth.bias[column];
    }
    EXPECT_NEAR(found[row], expected, tolerance) << row;
  }
}

// Twenty Hertz for 2.2 s, less the first readings, which settle.
const double kPositionAccelSigma = kAccelNoise / std::sqrt(41.0);
const double kPositionGyroSigma = kGyroNoise / std::sqrt(41.0);

// The per-phase procedure: 400 Hz, of whose 2.2 s at least 2.1 s are of high accuracy.
constexpr double kPhaseSamples = 840;
const double kAccelMeanSigma = kAccelNoise / std::sqrt(kPhaseSamples);
const double kGyroMeanSigma = kGyroNoise / std::sqrt(kPhaseSamples);
constexpr double kTurn = std::numbers::pi;  // rad
constexpr double kTurnRate = 180;           // °/s

class ImuPhasesTruth : public ImuTruth {
 protected:
  /// All nine phases and the last step. `reference` is the gyroscope's: an angle or a rate.
  Captured runProcedure(const std::vector<std::string>& rotationOptions, double reference) {
    for (std::size_t axis = 0; axis < 3; ++axis) {
      const char letter = static_cast<char>('x' + axis);
      const Pose& up = kPoses[2 * axis];
      const Pose& down = kPoses[2 * axis + 1];
      const std::string pose = std::string("world.pose=") + up.angles;
      std::vector<std::string> words{"-p", up.phase};
      if (axis == 0) words.push_back("first");
      (void)step(words, {pose});
      words = {"-p", std::string("g+") + letter};
      words.insert(words.end(), rotationOptions.begin(), rotationOptions.end());
      (void)step(words, {pose, std::string("world.rotation.axis=") + letter,
                         "world.rotation.rate=" + std::to_string(kTurnRate), "world.rotation.angle=180",
                         "world.rotation.at=0.3", "world.rotation.ramp=0.25"});
      (void)step({"-p", down.phase}, {std::string("world.pose=") + down.angles});
    }
    std::vector<std::string> last;
    for (const char axis : {'x', 'y', 'z'}) {
      const std::string name(1, axis);
      last.push_back("--a+" + name + "-ref" + name + "=" + std::to_string(kGravity));
      std::ostringstream text;
      text.precision(12);
      text << reference;
      last.push_back("--g+" + name + "-ref" + name + "=" + text.str());
    }
    last.emplace_back("last");
    return step(last, {});
  }
};

TEST_P(ImuPhasesTruth, AnglesGiveBothMatricesAndMakeTheStreamsTrue) {
  makeHandset(GetParam() % 2 == 0 ? "t5h5" : "p2m2", 0.02);
  const Captured captured = runProcedure({}, kTurn);

  // An element of D comes from a mean less half of two: √1.5 of a mean's deviation, over gravity.
  const double accelScaleTolerance = kSigmas * std::sqrt(1.5) * kAccelMeanSigma / kGravity * 1.1 + 1e-6;
  expectInverse(numbersAfter("ACCEL_SCALE:", captured.out), accel.scale, accelScaleTolerance);
  expectCorrectedBias(numbersAfter("ACCEL_BIAS:", captured.out), accel, kSigmas * kAccelMeanSigma + 1e-5);
  // The integral of the noise over T = 2.1 s is mean · T; so is that of the bias about it, from two means.
  const double turnSeconds = 2.12;
  const double gyroScaleTolerance =
      kSigmas * std::sqrt(1.5) * kGyroMeanSigma * turnSeconds / kTurn * 1.1 + 1e-5;
  expectInverse(numbersAfter("GYRO_SCALE:", captured.out), gyro.scale, gyroScaleTolerance);
  expectCorrectedBias(numbersAfter("GYRO_BIAS:", captured.out), gyro, kSigmas * kGyroMeanSigma);

  // A calibrated mean has its own noise, and the calibration's.
  const double accelTolerance = kSigmas * std::hypot(kPositionAccelSigma, 2 * kAccelMeanSigma);
  const double gyroTolerance = kSigmas * std::hypot(kPositionGyroSigma, kGyroMeanSigma);
  expectTrueStreams(accelTolerance, gyroTolerance);
  for (std::size_t axis = 0; axis < 3; ++axis) {
    Vector rate{};
    rate[axis] = 60;
    const Captured turning = measureCalibrated({"world.rotation_rate=" + tomlList(rate)});
    const auto gyroMean = numbersAfter(" GYRO_MEAN:", turning.out);
    ASSERT_GE(gyroMean.size(), 3U);
    for (std::size_t other = 0; other < 3; ++other) {
      const double expected = other == axis ? std::numbers::pi / 3 : 0;
      EXPECT_NEAR(gyroMean[other], expected, gyroTolerance + gyroScaleTolerance * std::numbers::pi / 3);
    }
  }
}

TEST_P(ImuPhasesTruth, RatesGiveTheGyroscopesMatrix) {
  makeHandset(GetParam() % 2 == 0 ? "rufael" : "whiskel", 0.02);
  const Captured captured =
      runProcedure({"--use-gyro-rate", "--gyro-const-rate-window=0.4"}, kTurnRate * std::numbers::pi / 180);
  // 0.4 s at 400 Hz, against the bias of two whole phases.
  const double rateSigma = kGyroNoise * std::sqrt(1 / 160.0 + 0.5 / kPhaseSamples);
  expectInverse(numbersAfter("GYRO_SCALE:", captured.out), gyro.scale,
                kSigmas * rateSigma / std::numbers::pi * 1.1 + 1e-6);
}

INSTANTIATE_TEST_SUITE_P(Seeds, ImuPhasesTruth, testing::Range(1, 7));

// The positional procedure.

class ImuPositionsTruth : public ImuTruth {
 protected:
  Captured runProcedure() {
    Captured captured;
    for (std::size_t i = 0; i < kPoses.size(); ++i) {
      std::vector<std::string> words;
      if (i == 0) words.emplace_back("first");
      if (i + 1 == kPoses.size()) words.emplace_back("last");
      captured = step(words, {std::string("world.pose=") + kPoses[i].angles});
    }
    return captured;
  }
};

TEST_P(ImuPositionsTruth, EachAxisGetsItsScaleAndBiasAndTheStreamsBecomeTrue) {
  makeHandset(GetParam() % 2 == 0 ? "o1v1" : "e4d4", 0);
  const Captured captured = runProcedure();
  const auto scale = numbersAfter("ACCEL_SCALE:", captured.out);
  const auto bias = numbersAfter("ACCEL_BIAS:", captured.out);
  const auto gyroBias = numbersAfter(" GYRO_BIAS:", captured.out);
  ASSERT_EQ(scale.size(), 3U) << captured.out;
  ASSERT_EQ(bias.size(), 3U);
  ASSERT_EQ(gyroBias.size(), 3U);
  for (std::size_t axis = 0; axis < 3; ++axis) {
    // Half the sum, and half the difference, of two means.
    EXPECT_NEAR(scale[axis], 1 / accel.scale(axis, axis),
                kSigmas * kPositionAccelSigma / std::sqrt(2.0) / kGravity * 1.1 + 1e-5);
    EXPECT_NEAR(bias[axis], accel.bias[axis], kSigmas * kPositionAccelSigma / std::sqrt(2.0) * 1.1 + 1e-4);
    EXPECT_NEAR(gyroBias[axis], gyro.bias[axis], kSigmas * kPositionGyroSigma / std::sqrt(6.0) + 1e-6);
  }
  expectTrueStreams(2 * kSigmas * kPositionAccelSigma, 2 * kSigmas * kPositionGyroSigma);
}

TEST_P(ImuPositionsTruth, ASecondProcedureFindsNextToNothingLeft) {
  makeHandset("o1v1", 0);
  const Captured first = runProcedure();
  const Captured second = runProcedure();
  EXPECT_NE(second.out.find("The accelerometer has an existing calibration which may be overwritten"),
            std::string::npos);
  const auto scales = {numbersAfter("ACCEL_SCALE:", first.out), numbersAfter("ACCEL_SCALE:", second.out)};
  const auto& before = *scales.begin();
  const auto& after = *(scales.begin() + 1);
  ASSERT_EQ(before.size(), 3U);
  ASSERT_EQ(after.size(), 3U);
  for (std::size_t axis = 0; axis < 3; ++axis) {
    EXPECT_NEAR(after[axis], before[axis], kSigmas * kPositionAccelSigma / kGravity * 1.1 + 1e-5);
  }
}

INSTANTIATE_TEST_SUITE_P(Seeds, ImuPositionsTruth, testing::Range(1, 9));

}  // namespace
