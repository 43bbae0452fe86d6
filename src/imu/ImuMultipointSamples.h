// What one step of the multi-point calibration makes of its samples: the check of the pose, the removal of
// outliers, and the rotation that the gyroscope saw. Pure functions over values.
//
// Accelerations in m/s², rotation rates in the gyroscope's own unit, times in s. Samples and their means are
// 32-bit floats, and so are the sums over them.
#pragma once

#include <cstddef>
#include <functional>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "framework/Sample.h"

/// Where the handset is held, or what it is turned about: sensor ('a' stationary, 'g' rotating), sign and
/// axis.
struct ImuPhase {
  bool stationary = true;
  bool positive = true;
  std::size_t axis = 0;  ///< 0 to 2
};

/// "a+x", "a-x" … "a-z" and "g+x" … "g-z"; nothing for any other text.
[[nodiscard]] std::optional<ImuPhase> parseImuPhase(std::string_view text);

/// 'x', 'y' or 'z' of axis 0 to 2.
[[nodiscard]] constexpr char axisLetter(std::size_t axis) { return static_cast<char>('x' + axis); }

// The pose.

/// Limits of a stationary pose: fixed, whatever the local gravity.
inline constexpr double kLoadedAxisMin = 7.52;  ///< m/s²
/// The double just below 12.75, so that 12.75 itself is out.
inline constexpr double kLoadedAxisMax = 0x1.97fffffffffffp+3;  // m/s²
inline constexpr double kOtherAxisMax = 3.2;                    ///< m/s²

/// The first axis, in the order x, y, z, whose mean acceleration does not belong to the pose: the loaded one
/// has to be within [kLoadedAxisMin, kLoadedAxisMax] with the pose's sign, the others within ±kOtherAxisMax;
/// compared in double. Not-a-number belongs to no pose. Nothing when all fit. `accelMean` has three values.
[[nodiscard]] std::optional<std::size_t> axisOutOfPose(const ImuPhase& phase, const SampleData& accelMean);

// Outliers.

struct OutlierRemoval {
  int factor = 6;      ///< standard deviations from the mean that are still accepted
  int maxRounds = 10;  ///< mean and deviation are computed afresh in each
};
inline constexpr std::size_t kMaxOutliers =
    10;  ///< more than that, however many samples there are, is a fault

/// What is told of a sample that goes.
struct Outlier {
  const Sample& sample;
  std::size_t expectedSize;  ///< differs from the sample's: it goes because of that
};

/// Takes out, in rounds until nothing changes, every sample that has one value further than `factor` standard
/// deviations from the mean (32-bit float, strictly greater), or another number of values than the first.
/// Keeps the order. Each sample is reported before it goes. Returns how many went.
std::size_t removeOutliers(std::vector<Sample>* samples, const OutlierRemoval& removal,
                           const std::function<void(const Outlier&)>& report);

// The rotation.

struct MeasuredRotation {
  SampleData rotation;         ///< empty: none could be obtained
  double integrationTime = 0;  ///< s; 0 for a rate
};

/// The gyroscope's values integrated over the samples by the trapezoid rule: each term is
/// (previous + current) · 0.5 · Δt, with Δt rounded to float, summed in float. The time is the last sample's
/// minus the first's. Fewer than two samples give no rotation.
[[nodiscard]] MeasuredRotation integrateRotation(const std::vector<Sample>& gyro);

/// The part of a rotation in which it was steady.
struct SteadyRate {
  enum class Fault {
    kNone,
    kTooFewValues,  ///< a sample has fewer than three
    kNoSamples,     ///< none at all, or none within the window
    kFluctuation,   ///< the rates differ by more than a quarter of their mean
  };
  Fault fault = Fault::kNone;
  bool windowFound = false;  ///< start, end and rate are meaningful
  std::size_t axis = 0;      ///< the rotating one
  float meanRate = 0;        ///< rad/s about that, of all samples
  double start = 0;          ///< s, bounds of the window
  double end = 0;
  SampleData rate;
  float fluctuation = 0;         ///< rad/s, between the slowest and the fastest sample of the window
  float allowedFluctuation = 0;  ///< rad/s
};

/// The mean rate over the steady part. The rotating axis is that with the largest absolute mean (the first on
/// a tie). Of the samples that turn faster than that mean (strictly), those within the window count: with
/// `windowSeconds` 0 the middle half of their time, otherwise so many seconds about its middle, bounds
/// included. Rates in float, times in double.
[[nodiscard]] SteadyRate findSteadyRate(const std::vector<Sample>& gyro, float windowSeconds);

/// "<prefix>[ a, b, c ]" with six significant digits; "[empty]" without the prefix for no values.
template <class T>
[[nodiscard]] std::string ArrayToString(const T& values, const std::string& prefix);
