// The file that carries a multi-point calibration from one step to the next, in either of its two formats.
#pragma once

#include <array>
#include <cstddef>
#include <string>
#include <string_view>
#include <vector>

#include "framework/DataFile.h"
#include "framework/SampleData.h"

/// The step's result of one phase: one line of the file.
struct ImuCalibrationInfo {
  ImuCalibrationInfo() = default;
  /// A line of the file. What does not parse stays 0, what is left over is ignored.
  explicit ImuCalibrationInfo(const std::string& line);

  /// Phase and eleven numbers, separated by single blanks, with 16 significant digits.
  [[nodiscard]] std::string ToString() const;
  /// Whether all numbers are finite.
  [[nodiscard]] bool IsFinite() const;

  int status = 0;                                ///< ssc::kInvalid: could not be made. Not in the file
  std::string phase;                             ///< "a+x" … "g+z"
  std::array<double, 3> accel_mean{};            ///< m/s²
  std::array<double, 3> gyro_mean{};             ///< the gyroscope's unit
  double temp_mean = 0;                          ///< °C
  double rotation_integration_time = 0;          ///< s; 0: the rotation is a rate
  std::array<double, 3> rotation_integration{};  ///< the gyroscope's unit · s, or its unit for a rate
};

/// What a position of the positional procedure leaves.
struct ImuPosition {
  SampleData accel;  ///< three values
  SampleData gyro;   ///< three values
  SampleData temp;   ///< one value
};

/// Where it lies on the handset, whichever the procedure: no device serves both.
inline constexpr const char* kImuDataFile = "/data/app-ephemeral/vantle_imu";

/// A calibration has some 15 records of about 200 bytes.
inline constexpr std::size_t kMaxImuFileBytes = 1024 * 1024;

/// Appends the line, after dropping an unfinished last line that a crash may have left (`*dropped`, may be
/// null, tells).
[[nodiscard]] FileResult appendCalibrationInfo(const ImuCalibrationInfo& info, const std::string& path,
                                               bool* dropped = nullptr);
/// Every line, empty ones too, in its order.
[[nodiscard]] std::vector<ImuCalibrationInfo> parseCalibrationInfos(const std::string& content);
[[nodiscard]] FileResult readCalibrationInfos(const std::string& path,
                                              std::vector<ImuCalibrationInfo>* infos);

/// Appends 28 bytes: seven floats in the machine's byte order. Unlike a line, a torn record is left for the
/// reader to report: nothing in the bytes tells where a record begins.
[[nodiscard]] FileResult appendPosition(const ImuPosition& position, const std::string& path,
                                        FileStart start);
/// kOk or kIncomplete; `positions` are those that are whole in either case.
[[nodiscard]] FileResult parsePositions(const std::string& content, std::vector<ImuPosition>* positions);
[[nodiscard]] FileResult readPositions(const std::string& path, std::vector<ImuPosition>* positions);
