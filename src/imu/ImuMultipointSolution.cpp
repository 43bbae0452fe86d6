#include "imu/ImuMultipointSolution.h"

#include <algorithm>
#include <sstream>

#include "imu/ImuMultipointSamples.h"

namespace {

using Matrix = Matrix3by3<double>;
using Vector = std::array<double, 3>;
constexpr std::size_t kAxes = 3;

Matrix operator*(const Matrix& a, const Matrix& b) {
  Matrix product;
  for (std::size_t row = 0; row < kAxes; ++row) {
    for (std::size_t column = 0; column < kAxes; ++column) {
      product(row, column) = a(row, 0) * b(0, column) + a(row, 1) * b(1, column) + a(row, 2) * b(2, column);
    }
  }
  return product;
}

Vector operator*(const Matrix& a, const Vector& v) {
  Vector product;
  for (std::size_t row = 0; row < kAxes; ++row) {
    product[row] = a(row, 0) * v[0] + a(row, 1) * v[1] + a(row, 2) * v[2];
  }
  return product;
}

Matrix operator-(const Matrix& a, const Matrix& b) {
  Matrix difference;
  for (std::size_t row = 0; row < kAxes; ++row) {
    for (std::size_t column = 0; column < kAxes; ++column) {
      difference(row, column) = a(row, column) - b(row, column);
    }
  }
  return difference;
}

void setColumn(Matrix* matrix, std::size_t column, const Vector& values) {
  for (std::size_t row = 0; row < kAxes; ++row) (*matrix)(row, column) = values[row];
}

std::string inBrackets(const Vector& values) { return ArrayToString(values, ""); }

bool isStationary(const ImuCalibrationInfo& record) {
  return record.phase.size() == 3 && record.phase[0] == 'a';
}

template <class Map, class Phases>
bool hasAll(const Map& contexts, const Phases& phases) {
  return std::all_of(phases.begin(), phases.end(),
                     [&contexts](const char* phase) { return contexts.count(phase) != 0; });
}

std::string outputText(const char* title, const Matrix& scale, const Vector& bias) {
  return title + std::string(":\n scale =\n") + scale.ToString("  ") + " bias =\n" +
         ArrayToString(bias, "  ") + "\n";
}

}  // namespace

std::string AccelCalibrationInput::ToString() const {
  std::ostringstream text;
  text << "AccelCalibrationInput:\n";
  for (const auto& [phase, context] : stationaryContexts) {
    text << " <" << phase << "> temp: " << context.temperature << " mean: " << inBrackets(context.mean)
         << '\n';
  }
  text << " accel ref input: \n" << accelReference.ToString("");
  return text.str();
}

std::string AccelCalibrationOutput::ToString() const {
  return outputText("AccelCalibrationOutput", scale, bias);
}

std::string GyroCalibrationInput::ToString() const {
  std::ostringstream text;
  text << "GyroCalibrationInput:\n";
  for (const auto& [phase, mean] : stationaryContexts) {
    text << " <" << phase << "> mean: " << inBrackets(mean) << '\n';
  }
  for (const auto& [phase, context] : motionContexts) {
    text << " <" << phase << "> temp: " << context.temperature
         << " bias_before: " << inBrackets(context.biasBefore)
         << " bias_after: " << inBrackets(context.biasAfter) << " rotation_time: " << context.rotationTime
         << " rotation: " << inBrackets(context.rotation) << '\n';
  }
  text << " gyro ref input: \n" << gyroReference.ToString("");
  return text.str();
}

std::string GyroCalibrationOutput::ToString() const {
  return outputText("GyroCalibrationOutput", scale, bias);
}

AccelCalibrationInput makeAccelInput(const std::vector<ImuCalibrationInfo>& records,
                                     const Matrix3by3<double>& reference) {
  AccelCalibrationInput input;
  input.accelReference = reference;
  for (const ImuCalibrationInfo& record : records) {
    if (isStationary(record)) input.stationaryContexts[record.phase] = {record.temp_mean, record.accel_mean};
  }
  input.valid = hasAll(input.stationaryContexts, kStationaryPhases);
  return input;
}

GyroCalibrationInput makeGyroInput(const std::vector<ImuCalibrationInfo>& records,
                                   const Matrix3by3<double>& reference) {
  GyroCalibrationInput input;
  input.gyroReference = reference;
  for (std::size_t i = 0; i < records.size(); ++i) {
    const ImuCalibrationInfo& record = records[i];
    if (isStationary(record)) {
      input.stationaryContexts[record.phase] = record.gyro_mean;
      continue;
    }
    if (i == 0 || !isStationary(records[i - 1])) {
      input.fault = "No stationary capture before phase: " + record.phase;
      return input;
    }
    if (i + 1 == records.size() || !isStationary(records[i + 1])) {
      input.fault = "No stationary capture after phase: " + record.phase;
      return input;
    }
    input.motionContexts[record.phase] = {records[i - 1].gyro_mean, records[i + 1].gyro_mean,
                                          record.temp_mean, record.rotation_integration_time,
                                          record.rotation_integration};
  }
  input.valid =
      hasAll(input.stationaryContexts, kStationaryPhases) && hasAll(input.motionContexts, kRotationPhases);
  return input;
}

AccelCalibrationOutput solveAccel(const AccelCalibrationInput& input, const ImuTrace& trace) {
  AccelCalibrationOutput output;
  double temperatureSum = 0;
  for (const char* phase : kStationaryPhases)
    temperatureSum += input.stationaryContexts.at(phase).temperature;
  output.temperature = temperatureSum / static_cast<double>(kStationaryPhases.size());

  Vector bias;
  for (std::size_t axis = 0; axis < kAxes; ++axis) {
    const Vector& positive = input.stationaryContexts.at(kStationaryPhases[2 * axis]).mean;
    const Vector& negative = input.stationaryContexts.at(kStationaryPhases[2 * axis + 1]).mean;
    bias[axis] = (positive[axis] + negative[axis]) * 0.5;
  }
  trace("bias = \n" + inBrackets(bias) + "\n");

  Matrix measured;
  for (std::size_t column = 0; column < kAxes; ++column) {
    const Vector& mean = input.stationaryContexts.at(kStationaryPhases[2 * column]).mean;
    for (std::size_t row = 0; row < kAxes; ++row) measured(row, column) = mean[row] - bias[row];
  }
  trace("dut_accel = \n" + measured.ToString(""));

  const Matrix scale = measured * input.accelReference.Inverse();
  trace("scale = dut_accel / ref = \n" + scale.ToString(""));
  output.scale = scale.Inverse();
  trace("scale = 1 / scale = \n" + output.scale.ToString(""));
  output.bias = output.scale * bias;
  trace("bias = bias / scale = \n" + inBrackets(output.bias) + "\n");
  output.valid = true;
  return output;
}

namespace {

/// The matrices that a gyroscope's solution starts from; column c is from the rotation about axis c.
struct MeasuredRotations {
  Matrix angle;
  Matrix bias;
  Matrix time;  ///< diagonal
};

MeasuredRotations collectRotations(const GyroCalibrationInput& input) {
  MeasuredRotations measured;
  for (std::size_t axis = 0; axis < kAxes; ++axis) {
    const auto& context = input.motionContexts.at(kRotationPhases[axis]);
    setColumn(&measured.angle, axis, context.rotation);
    for (std::size_t row = 0; row < kAxes; ++row) {
      measured.bias(row, axis) = (context.biasBefore[row] + context.biasAfter[row]) * 0.5;
    }
    measured.time(axis, axis) = context.rotationTime;
  }
  return measured;
}

Vector meanStationaryRate(const GyroCalibrationInput& input) {
  Vector mean{};
  for (std::size_t axis = 0; axis < kAxes; ++axis) {
    for (const char* phase : kStationaryPhases) mean[axis] += input.stationaryContexts.at(phase)[axis];
    mean[axis] /= static_cast<double>(kStationaryPhases.size());
  }
  return mean;
}

}  // namespace

GyroCalibrationOutput solveGyro(const GyroCalibrationInput& input, const ImuTrace& trace) {
  GyroCalibrationOutput output;
  double temperatureSum = 0;
  for (const char* phase : kRotationPhases) temperatureSum += input.motionContexts.at(phase).temperature;
  output.temperature = temperatureSum / static_cast<double>(kRotationPhases.size());

  const Vector bias = meanStationaryRate(input);
  trace("bias = \n" + inBrackets(bias) + "\n");
  const MeasuredRotations measured = collectRotations(input);
  trace("dut_angle = \n" + measured.angle.ToString(""));
  trace("dut_bias = \n" + measured.bias.ToString(""));
  trace("rotation_time= \n" + measured.time.ToString(""));

  const bool isRate = measured.time(0, 0) == 0;
  for (std::size_t axis = 1; axis < kAxes; ++axis) {
    if ((measured.time(axis, axis) == 0) != isRate) return output;
  }
  Matrix angle;
  if (isRate) {
    angle = measured.angle - measured.bias;
    trace("dut_angle = dut_angle - dut_bias = \n" + angle.ToString(""));
  } else {
    angle = measured.angle - measured.bias * measured.time;
    trace("dut_angle = dut_angle - dut_bias * rotation_time = \n" + angle.ToString(""));
  }

  const Matrix scale = angle * input.gyroReference.Inverse();
  trace("scale = dut_angle / ref = \n" + scale.ToString(""));
  output.scale = scale.Inverse();
  trace("scale = 1 / scale = \n" + output.scale.ToString(""));
  output.bias = output.scale * bias;
  trace("bias = bias / scale = \n" + inBrackets(output.bias) + "\n");
  output.valid = true;
  return output;
}
