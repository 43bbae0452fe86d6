#include "imu/ImuMultipointSolution.h"

#include <array>
#include <numbers>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace {

using testing::ElementsAre;
using testing::HasSubstr;

constexpr double kG = 9.80665;
using Vector = std::array<double, 3>;
using Matrix = Matrix3by3<double>;

const ImuTrace kNoTrace = [](const std::string&) {};

Matrix diagonal(double value) { return Matrix({value, 0, 0, 0, value, 0, 0, 0, value}); }

Vector times(const Matrix& m, const Vector& v) {
  return {m(0, 0) * v[0] + m(0, 1) * v[1] + m(0, 2) * v[2], m(1, 0) * v[0] + m(1, 1) * v[1] + m(1, 2) * v[2],
          m(2, 0) * v[0] + m(2, 1) * v[1] + m(2, 2) * v[2]};
}

Vector plus(const Vector& a, const Vector& b) { return {a[0] + b[0], a[1] + b[1], a[2] + b[2]}; }

Vector unit(std::size_t axis, double length) {
  Vector vector{};
  vector[axis] = length;
  return vector;
}

/// A sensor pair: reading = scale · truth + bias.
struct Truth {
  Matrix accelScale = diagonal(1);
  Vector accelBias{};
  Matrix gyroScale = diagonal(1);
  Vector gyroBias{};
};

constexpr double kTurnSeconds = 2;

/// The nine records of a whole procedure: pose, rotation, opposite pose for each axis.
std::vector<ImuCalibrationInfo> records(const Truth& truth, bool asRates = false) {
  std::vector<ImuCalibrationInfo> all;
  for (std::size_t axis = 0; axis < 3; ++axis) {
    const char letter = static_cast<char>('x' + axis);
    for (const char* sign : {"+", "turn", "-"}) {
      ImuCalibrationInfo info;
      const bool turns = std::string(sign) == "turn";
      info.phase = std::string(turns ? "g+" : std::string("a") + sign) + letter;
      info.accel_mean =
          plus(times(truth.accelScale, unit(axis, std::string(sign) == "-" ? -kG : kG)), truth.accelBias);
      info.gyro_mean = truth.gyroBias;
      info.temp_mean = 20 + static_cast<double>(all.size());
      info.rotation_integration_time = asRates ? 0 : kTurnSeconds;
      const double rate = turns ? std::numbers::pi / kTurnSeconds : 0;
      Vector rates = plus(times(truth.gyroScale, unit(axis, rate)), truth.gyroBias);
      if (!asRates) {
        for (double& value : rates) value *= kTurnSeconds;
      }
      info.rotation_integration = rates;
      all.push_back(info);
    }
  }
  return all;
}

void expectNear(const Matrix& found, const Matrix& expected, double tolerance) {
  for (std::size_t i = 0; i < Matrix::kElements; ++i) {
    EXPECT_NEAR(found.elements()[i], expected.elements()[i], tolerance) << i;
  }
}

void expectNear(const Vector& found, const Vector& expected, double tolerance) {
  for (std::size_t i = 0; i < 3; ++i) EXPECT_NEAR(found[i], expected[i], tolerance) << i;
}

const Truth kErring{Matrix({1.01, 0.02, -0.01, 0.003, 0.98, 0.005, -0.007, 0.004, 1.03}),
                    {0.3, -0.2, 0.1},
                    Matrix({0.97, 0.01, 0.004, -0.02, 1.02, 0.006, 0.001, -0.003, 0.99}),
                    {0.01, -0.02, 0.03}};

TEST(AccelSolution, PerfectReadingsNeedNoCorrection) {
  const auto output = solveAccel(makeAccelInput(records({}), diagonal(kG)), kNoTrace);
  EXPECT_TRUE(output.valid);
  expectNear(output.scale, diagonal(1), 1e-15);
  expectNear(output.bias, {0, 0, 0}, 1e-15);
}

TEST(AccelSolution, UndoesScaleMisalignmentAndBias) {
  const auto output = solveAccel(makeAccelInput(records(kErring), diagonal(kG)), kNoTrace);
  expectNear(output.scale, kErring.accelScale.Inverse(), 1e-14);
  expectNear(output.bias, times(kErring.accelScale.Inverse(), kErring.accelBias), 1e-14);
  const Vector reading = plus(times(kErring.accelScale, {1, 2, 3}), kErring.accelBias);
  const Vector corrected = times(output.scale, reading);
  expectNear(corrected, plus({1, 2, 3}, output.bias), 1e-13);
}

TEST(AccelSolution, TemperatureIsTheMeanOfTheSixPoses) {
  const auto output = solveAccel(makeAccelInput(records({}), diagonal(kG)), kNoTrace);
  EXPECT_DOUBLE_EQ(output.temperature, (20 + 22 + 23 + 25 + 26 + 28) / 6.0);
}

TEST(AccelSolution, AReferenceThatIsTiltedIsTakenIntoAccount) {
  // The table stands askew: what the perfect sensor measures is what the reference says.
  Matrix reference({9.7, 0.1, -0.3, 0.2, 9.8, 0.1, 0.4, -0.2, 9.75});
  AccelCalibrationInput input;
  input.accelReference = reference;
  for (std::size_t axis = 0; axis < 3; ++axis) {
    const Vector up{reference(0, axis), reference(1, axis), reference(2, axis)};
    input.stationaryContexts[kStationaryPhases[2 * axis]] = {25, up};
    input.stationaryContexts[kStationaryPhases[2 * axis + 1]] = {25, {-up[0], -up[1], -up[2]}};
  }
  expectNear(solveAccel(input, kNoTrace).scale, diagonal(1), 1e-14);
}

TEST(AccelSolution, AReferenceOfZerosGivesZeros) {
  testing::internal::CaptureStdout();
  const auto output = solveAccel(makeAccelInput(records(kErring), Matrix()), kNoTrace);
  EXPECT_EQ(testing::internal::GetCapturedStdout(),
            std::string(kNoInverseMessage) + std::string(kNoInverseMessage));
  EXPECT_TRUE(output.valid);
  EXPECT_EQ(output.scale, Matrix());
  EXPECT_THAT(output.bias, ElementsAre(0, 0, 0));
}

TEST(AccelSolution, TracesItsStepsInOrder) {
  std::string steps;
  (void)solveAccel(makeAccelInput(records({}), diagonal(kG)),
                   [&steps](const std::string& text) { steps += text + "|"; });
  EXPECT_EQ(steps,
            "bias = \n[ 0, 0, 0 ]\n|"
            "dut_accel = \n[ 9.80665, 0, 0 ]\n[ 0, 9.80665, 0 ]\n[ 0, 0, 9.80665 ]\n|"
            "scale = dut_accel / ref = \n[ 1, 0, 0 ]\n[ 0, 1, 0 ]\n[ 0, 0, 1 ]\n|"
            "scale = 1 / scale = \n[ 1, 0, 0 ]\n[ 0, 1, 0 ]\n[ 0, 0, 1 ]\n|"
            "bias = bias / scale = \n[ 0, 0, 0 ]\n|");
}

TEST(AccelInput, NeedsAllSixPoses) {
  for (const char* missing : kStationaryPhases) {
    auto some = records({});
    std::erase_if(some, [missing](const auto& record) { return record.phase == missing; });
    EXPECT_FALSE(makeAccelInput(some, diagonal(kG)).valid) << missing;
  }
  EXPECT_TRUE(makeAccelInput(records({}), diagonal(kG)).valid);
}

TEST(AccelInput, ALaterRecordOfAPhaseReplacesAnEarlierOne) {
  auto all = records({});
  all.push_back(all.front());
  all.back().accel_mean = {1, 2, 3};
  EXPECT_THAT(makeAccelInput(all, diagonal(kG)).stationaryContexts.at("a+x").mean, ElementsAre(1, 2, 3));
}

TEST(AccelInput, IgnoresWhatIsNoPose) {
  auto all = records({});
  all.emplace_back("");
  all.emplace_back("axx 1 2 3");
  all.emplace_back("a+xx 1 2 3");
  const auto input = makeAccelInput(all, diagonal(kG));
  EXPECT_TRUE(input.valid);
  EXPECT_EQ(input.stationaryContexts.count(""), 0U);
  EXPECT_EQ(input.stationaryContexts.count("a+xx"), 0U);
}

TEST(AccelInput, TextNamesEveryPhaseAndTheReference) {
  AccelCalibrationInput input;
  input.accelReference = diagonal(2);
  input.stationaryContexts["a+x"] = {25.5, {1, 2, 3}};
  EXPECT_EQ(input.ToString(),
            "AccelCalibrationInput:\n <a+x> temp: 25.5 mean: [ 1, 2, 3 ]\n accel ref input: \n"
            "[ 2, 0, 0 ]\n[ 0, 2, 0 ]\n[ 0, 0, 2 ]\n");
}

TEST(Outputs, TextHasScaleAndBias) {
  AccelCalibrationOutput accel;
  accel.scale = diagonal(1);
  accel.bias = {1, 2, 3};
  EXPECT_EQ(accel.ToString(),
            "AccelCalibrationOutput:\n scale =\n  [ 1, 0, 0 ]\n  [ 0, 1, 0 ]\n  [ 0, 0, 1 ]\n bias =\n"
            "  [ 1, 2, 3 ]\n");
  EXPECT_THAT(GyroCalibrationOutput().ToString(), testing::StartsWith("GyroCalibrationOutput:\n scale =\n"));
}

TEST(GyroSolution, APerfectGyroscopeOnlyHasItsBias) {
  Truth truth;
  truth.gyroBias = {0.01, 0.02, -0.03};
  const auto output = solveGyro(makeGyroInput(records(truth), diagonal(std::numbers::pi)), kNoTrace);
  EXPECT_TRUE(output.valid);
  expectNear(output.scale, diagonal(1), 1e-14);
  expectNear(output.bias, truth.gyroBias, 1e-15);
}

TEST(GyroSolution, UndoesScaleMisalignmentAndBiasFromAngles) {
  const auto output = solveGyro(makeGyroInput(records(kErring), diagonal(std::numbers::pi)), kNoTrace);
  expectNear(output.scale, kErring.gyroScale.Inverse(), 1e-14);
  expectNear(output.bias, times(kErring.gyroScale.Inverse(), kErring.gyroBias), 1e-14);
  EXPECT_DOUBLE_EQ(output.temperature, (21 + 24 + 27) / 3.0);
}

TEST(GyroSolution, UndoesScaleMisalignmentAndBiasFromRates) {
  const auto input = makeGyroInput(records(kErring, true), diagonal(std::numbers::pi / kTurnSeconds));
  const auto output = solveGyro(input, kNoTrace);
  EXPECT_TRUE(output.valid);
  expectNear(output.scale, kErring.gyroScale.Inverse(), 1e-14);
}

TEST(GyroSolution, TheBiasOfARotationIsThatBeforeAndAfterIt) {
  auto all = records({});
  all[0].gyro_mean = {0.2, 0, 0};  // before g+x
  all[2].gyro_mean = {0.4, 0, 0};  // after it
  all[1].rotation_integration = {std::numbers::pi + 0.3 * kTurnSeconds, 0, 0};
  expectNear(solveGyro(makeGyroInput(all, diagonal(std::numbers::pi)), kNoTrace).scale, diagonal(1), 1e-14);
}

TEST(GyroSolution, AnglesAndRatesDoNotMix) {
  for (const std::size_t odd : {1U, 4U, 7U}) {
    for (const bool asRates : {false, true}) {
      auto all = records({}, asRates);
      all[odd].rotation_integration_time = asRates ? kTurnSeconds : 0;
      EXPECT_FALSE(solveGyro(makeGyroInput(all, diagonal(1)), kNoTrace).valid) << odd;
    }
  }
}

TEST(GyroSolution, TracesItsStepsInOrder) {
  std::string steps;
  const ImuTrace trace = [&steps](const std::string& text) {
    steps += text.substr(0, text.find('\n')) + "|";
  };
  (void)solveGyro(makeGyroInput(records({}), diagonal(1)), trace);
  EXPECT_EQ(
      steps,
      "bias = |dut_angle = |dut_bias = |rotation_time= |dut_angle = dut_angle - dut_bias * rotation_time = |"
      "scale = dut_angle / ref = |scale = 1 / scale = |bias = bias / scale = |");
  steps.clear();
  (void)solveGyro(makeGyroInput(records({}, true), diagonal(1)), trace);
  EXPECT_THAT(steps, HasSubstr("|dut_angle = dut_angle - dut_bias = |"));
}

std::string faultOf(std::initializer_list<const char*> phases) {
  std::vector<ImuCalibrationInfo> some;
  for (const char* phase : phases) some.emplace_back(std::string(phase));
  const auto input = makeGyroInput(some, Matrix());
  EXPECT_FALSE(input.valid);
  return input.fault;
}

TEST(GyroInput, ARotationNeedsAPoseRightBeforeIt) {
  EXPECT_EQ(faultOf({"g+x", "a+x"}), "No stationary capture before phase: g+x");
  EXPECT_EQ(faultOf({"a+x", "g+x", "a-x", "g+y", "a+y", "", "g+z", "a+z"}),
            "No stationary capture after phase: ");
}

TEST(GyroInput, ARotationNeedsAPoseRightAfterIt) {
  EXPECT_EQ(faultOf({"a+x", "g+x", "g+y", "a+y"}), "No stationary capture after phase: g+x");
  EXPECT_EQ(faultOf({"a+x", "g+x"}), "No stationary capture after phase: g+x");
  EXPECT_EQ(faultOf({"a+x", "g+x", "g+x", "a-x"}), "No stationary capture after phase: g+x");
}

TEST(GyroInput, APoseMayStandBetweenTwoRotations) {
  std::vector<ImuCalibrationInfo> some;
  for (const char* phase : {"a+x", "g+x", "a-x", "g+y", "a+y", "g+z", "a-y", "a+z", "a-z"}) {
    some.emplace_back(std::string(phase));
  }
  EXPECT_TRUE(makeGyroInput(some, Matrix()).valid);
}

TEST(GyroInput, NeedsAllNinePhases) {
  for (const char* missing : {"a+x", "g+x", "a-z", "g+z"}) {
    auto some = records({});
    some.insert(some.begin(), ImuCalibrationInfo("a+y 0"));
    some.push_back(ImuCalibrationInfo("a+y 0"));
    for (auto& record : some) {
      if (record.phase == missing) record.phase = "a+y";
    }
    const auto input = makeGyroInput(some, diagonal(1));
    EXPECT_FALSE(input.valid) << missing;
    EXPECT_EQ(input.fault, "");
  }
}

TEST(GyroInput, ANegativeRotationIsKeptButNotUsed) {
  auto all = records({});
  all.insert(all.begin() + 1, {ImuCalibrationInfo("g-x 1"), ImuCalibrationInfo("a+x 0")});
  const auto input = makeGyroInput(all, diagonal(1));
  EXPECT_TRUE(input.valid);
  EXPECT_EQ(input.motionContexts.size(), 4U);
}

TEST(GyroInput, TextNamesPosesRotationsAndReference) {
  GyroCalibrationInput input;
  input.gyroReference = diagonal(2);
  input.stationaryContexts["a+x"] = {1, 2, 3};
  input.motionContexts["g+x"] = {{1, 0, 0}, {2, 0, 0}, 25.5, 2.2, {3, 0, 0}};
  EXPECT_EQ(input.ToString(),
            "GyroCalibrationInput:\n <a+x> mean: [ 1, 2, 3 ]\n"
            " <g+x> temp: 25.5 bias_before: [ 1, 0, 0 ] bias_after: [ 2, 0, 0 ] rotation_time: 2.2 "
            "rotation: [ 3, 0, 0 ]\n gyro ref input: \n[ 2, 0, 0 ]\n[ 0, 2, 0 ]\n[ 0, 0, 2 ]\n");
}

}  // namespace
