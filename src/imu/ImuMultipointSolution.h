// What the last step of a multi-point calibration computes from the records of all steps. Pure functions over
// values; double precision unless said otherwise.
//
// Accelerometer and gyroscope are taken as r = S·t + b: reading r, truth t, scale matrix S, bias b. The
// correction that handsets apply is t = C·r − c, so that C = S⁻¹ and c = C·b.
#pragma once

#include <array>
#include <functional>
#include <string>
#include <unordered_map>
#include <vector>

#include "framework/Matrix3by3.h"
#include "imu/ImuMultipointFile.h"

/// Stationary phases, in the order in which they are summed.
inline constexpr std::array<const char*, 6> kStationaryPhases{"a+x", "a-x", "a+y", "a-y", "a+z", "a-z"};
/// Rotation phases by axis.
inline constexpr std::array<const char*, 3> kRotationPhases{"g+x", "g+y", "g+z"};

/// Told the text of each intermediate result when it is there.
using ImuTrace = std::function<void(const std::string&)>;

struct AccelCalibrationInput {
  struct StationaryContext {
    double temperature = 0;
    std::array<double, 3> mean{};
  };

  [[nodiscard]] std::string ToString() const;

  bool valid = false;
  Matrix3by3<double> accelReference;  ///< column c: what is to be measured in phase "a+" on axis c
  std::unordered_map<std::string, StationaryContext> stationaryContexts;
};

struct AccelCalibrationOutput {
  [[nodiscard]] std::string ToString() const;

  bool valid = false;
  double temperature = 0;
  Matrix3by3<double> scale;      ///< C
  std::array<double, 3> bias{};  ///< c
};

struct GyroCalibrationInput {
  struct MotionContext {
    std::array<double, 3> biasBefore{};  ///< the gyroscope's mean while it stood still before
    std::array<double, 3> biasAfter{};
    double temperature = 0;
    double rotationTime = 0;  ///< s; 0: `rotation` is a rate
    std::array<double, 3> rotation{};
  };

  [[nodiscard]] std::string ToString() const;

  bool valid = false;
  std::string fault;                 ///< what made it invalid, when there is something to say
  Matrix3by3<double> gyroReference;  ///< column c: angle or rate of phase "g+" on axis c
  std::unordered_map<std::string, std::array<double, 3>> stationaryContexts;
  std::unordered_map<std::string, MotionContext> motionContexts;
};

struct GyroCalibrationOutput {
  [[nodiscard]] std::string ToString() const;

  bool valid = false;  ///< false: angles and rates are mixed
  double temperature = 0;
  Matrix3by3<double> scale;
  std::array<double, 3> bias{};
};

/// The stationary records, a later one of a phase in place of an earlier. Valid when all six phases are
/// there.
[[nodiscard]] AccelCalibrationInput makeAccelInput(const std::vector<ImuCalibrationInfo>& records,
                                                   const Matrix3by3<double>& reference);
/// The stationary records' gyroscope means, and each other record with the stationary ones right before and
/// right after it. Valid when each other record has both, and all nine phases are there.
[[nodiscard]] GyroCalibrationInput makeGyroInput(const std::vector<ImuCalibrationInfo>& records,
                                                 const Matrix3by3<double>& reference);

/// Closed form: b is half the sum of each axis's two opposite poses; S = D·R⁻¹ with D the positive poses'
/// means less b and R the reference. A singular matrix gives what its inverse gives: all zeros. `input` is
/// valid.
[[nodiscard]] AccelCalibrationOutput solveAccel(const AccelCalibrationInput& input, const ImuTrace& trace);
/// Closed form: S = (A − B·T)·R⁻¹ with A the measured angles, B the biases about each rotation, T its time;
/// for rates S = (A − B)·R⁻¹. b is the mean over the six stationary phases. `input` is valid.
[[nodiscard]] GyroCalibrationOutput solveGyro(const GyroCalibrationInput& input, const ImuTrace& trace);
