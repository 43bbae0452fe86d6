// Where the multi-point calibration of accelerometer and gyroscope is stored: one registry group each.
#pragma once

inline constexpr const char* kAccelGroupSuffix = "_0_platform.accel.fac_cal";  ///< behind the package's name
inline constexpr const char* kGyroGroupSuffix = "_0_platform.gyro.fac_cal";

inline constexpr const char* kCorrectionMatrix = "corr_mat";  ///< 3×3: multiplies the uncalibrated reading
inline constexpr const char* kBias = "bias";                  ///< vector of three
inline constexpr const char* kMeanTemp = "mean_temp";         ///< °C during the calibration
