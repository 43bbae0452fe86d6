// The words of imu-multipoint.
#include <array>
#include <cmath>
#include <cstring>

#include "framework/CommandOptions.h"
#include "framework/ParseNumber.h"
#include "imu/ImuMultipointCalibrator.h"
#include "imu/ImuMultipointSamples.h"
#include "ssc/Log.h"

namespace {

constexpr const char* kUsage = "Usage: vantle imu-multipoint [OPTIONS] [first | last]\n";
constexpr const char* kOptions = R"(Options:

  --clear, -c        Clear temporary calibration files.

  --gravity GRAVITY  Local gravity magnitude. Defaults to 9.80665.
  -g GRAVITY

  --help, -h         Print this help and exit.

  --phase PHASE      Specify the phase of the calibration. PHASE value can be
  -p PHASE           one of { "a+x", "a-x", "a+y", "a-y", "a+z",
                     "a-z", "g+x", "g+y", "g+z" }.

  --time SECONDS     Specify the number of seconds to spend collecting samples
  -t SECONDS         Default is 2 seconds.

  --accel-bias  X    These options specify validation limits for various
  --accel-scale X    measurements. When a limit is not specified, it is
  --accel-stdev X    ignored.
  --gyro-bias   X
  --gyro-stdev  X

  --a+x-refx  X      These options specify the reference environmental
  --a+x-refy  X      measurement, with the first three characters denoting the
  --a+x-refz  X      phase in which the measurement is obtained (similar to
  --a+y-refx  X      the --phase parameter, with "a+x" indicating the
  --a+y-refy  X      stationary phase on the +x axis and "g+z" indicating
  --a+y-refz  X      the phase rotating around the +z axis). The "ref[xyz]"
  --a+z-refx  X      indicates the measurement value on the respective axis.
  --a+z-refy  X
  --a+z-refz  X
  --g+x-refx  X
  --g+x-refy  X
  --g+x-refz  X
  --g+y-refx  X
  --g+y-refy  X
  --g+y-refz  X
  --g+z-refx  X
  --g+z-refy  X
  --g+z-refz  X

  --use-gyro-rate    If this argument is provided, the program will assume
                     gyro input reference matrix is representing the steady
                     rotation rates rather than integrated rotation angles.

  --gyro-const-rate-window
                     Effective when --use-gyro-rate option is present.
                     Floating point number specifying the steady window size
                     in seconds to select gyro samples.
                     Lack of this input argument while --use-gyro-rate is
                     specified will cause vantle to just select the middle
                     half of the gyro samples with absolute gyro reading
                     larger than average on the rotation axis.

Arguments:

  first              Perform the first step of a multi-point calibration.

  last               Perform the last step of a multi-point calibration.

When executed with no arguments, this command performs an intermediate step of
a multi-point calibration.
)";

constexpr float kStandardGravity = 9.80665F;  // m/s²
constexpr int kDefaultSeconds = 2;

// Options without a letter. A reference is kReference + 9 · (1 for the gyroscope) + 3 · column + row: the
// phase is the column, the measured axis the row.
enum LongOption : int {
  kAccelBias = 0x100,
  kAccelScale,
  kAccelStdev,
  kGyroBias,
  kGyroStdev,
  kUseGyroRate,
  kGyroConstRateWindow,
  kReference = 0x200,
};
constexpr int kReferenceCount = 18;

constexpr std::array<option, 31> kLongOptions{{
    {"clear", no_argument, nullptr, 'c'},
    {"gravity", required_argument, nullptr, 'g'},
    {"help", no_argument, nullptr, 'h'},
    {"phase", required_argument, nullptr, 'p'},
    {"time", required_argument, nullptr, 't'},
    {"accel-bias", required_argument, nullptr, kAccelBias},
    {"accel-scale", required_argument, nullptr, kAccelScale},
    {"accel-stdev", required_argument, nullptr, kAccelStdev},
    {"gyro-bias", required_argument, nullptr, kGyroBias},
    {"gyro-stdev", required_argument, nullptr, kGyroStdev},
    {"a+x-refx", required_argument, nullptr, kReference},
    {"a+x-refy", required_argument, nullptr, kReference + 1},
    {"a+x-refz", required_argument, nullptr, kReference + 2},
    {"a+y-refx", required_argument, nullptr, kReference + 3},
    {"a+y-refy", required_argument, nullptr, kReference + 4},
    {"a+y-refz", required_argument, nullptr, kReference + 5},
    {"a+z-refx", required_argument, nullptr, kReference + 6},
    {"a+z-refy", required_argument, nullptr, kReference + 7},
    {"a+z-refz", required_argument, nullptr, kReference + 8},
    {"g+x-refx", required_argument, nullptr, kReference + 9},
    {"g+x-refy", required_argument, nullptr, kReference + 10},
    {"g+x-refz", required_argument, nullptr, kReference + 11},
    {"g+y-refx", required_argument, nullptr, kReference + 12},
    {"g+y-refy", required_argument, nullptr, kReference + 13},
    {"g+y-refz", required_argument, nullptr, kReference + 14},
    {"g+z-refx", required_argument, nullptr, kReference + 15},
    {"g+z-refy", required_argument, nullptr, kReference + 16},
    {"g+z-refz", required_argument, nullptr, kReference + 17},
    {"use-gyro-rate", no_argument, nullptr, kUseGyroRate},
    {"gyro-const-rate-window", required_argument, nullptr, kGyroConstRateWindow},
    {nullptr, 0, nullptr, 0},
}};

bool isReference(int option) { return option >= kReference && option < kReference + kReferenceCount; }

int parseReference(int option, const char* text, Matrix3by3<double>* accel, Matrix3by3<double>* gyro) {
  const auto index = static_cast<std::size_t>(option - kReference);
  Matrix3by3<double>& matrix = index < Matrix3by3<double>::kElements ? *accel : *gyro;
  const std::size_t element = index % Matrix3by3<double>::kElements;
  return parseDouble(text, &matrix(element % 3, element / 3));
}

}  // namespace

ImuMultipointCalibrator::ImuMultipointCalibrator(ssc::Connection* hubConnection)
    : Calibrator(hubConnection, kUsage, kOptions) {}

float* ImuMultipointCalibrator::limitOf(int option) {
  switch (option) {
    case kAccelBias:
      return &limits_.accelBias;
    case kAccelScale:
      return &limits_.accelScale;
    case kAccelStdev:
      return &limits_.accelStdev;
    case kGyroBias:
      return &limits_.gyroBias;
    case kGyroStdev:
      return &limits_.gyroStdev;
    case kGyroConstRateWindow:
      return &constRateWindow_;
    default:
      return nullptr;
  }
}

int ImuMultipointCalibrator::ParseArgs(const Arguments& arguments) {
  gravity_ = kStandardGravity;
  limits_ = {};
  seconds_ = kDefaultSeconds;
  step_ = kIntermediate;
  useGyroRate_ = false;
  constRateWindow_ = 0;
  CopyGlobalOptions(arguments);

  CommandOptions options(arguments, "cg:hp:t:", kLongOptions.data());
  for (int option; (option = options.Next()) != CommandOptions::kEnd;) {
    const int result = takeOption(arguments, option, options.argument());
    if (result != ssc::kOk) return result;
  }

  const auto& words = options.words();
  if (words.empty()) return ssc::kOk;
  if (std::strcmp(words[0], "first") == 0) {
    step_ = kFirst;
  } else if (std::strcmp(words[0], "last") == 0) {
    step_ = kLast;
  } else {
    return UsageError("Invalid argument '%s'", words[0]);
  }
  IgnoreExtraArguments(words, 1);
  return ssc::kOk;
}

int ImuMultipointCalibrator::takeOption(const Arguments& arguments, int option, const char* argument) {
  // "Positive", says the message, but only the form is checked: a limit that is not above 0 is none, and
  // references have either sign.
  constexpr const char* kBadNumber = "Limits must be positive numbers";
  if (isReference(option)) {
    const int result = parseReference(option, argument, &accelReference_, &gyroReference_);
    return result == ssc::kOk ? ssc::kOk : UsageError("%s", kBadNumber);
  }
  if (float* const limit = limitOf(option)) {
    return parseFloat(argument, limit) == ssc::kOk ? ssc::kOk : UsageError("%s", kBadNumber);
  }
  switch (option) {
    case 'c':
      ClearIntermediateFiles();
      return ssc::kOk;
    case 'g':
      if (parseFloat(argument, &gravity_) == ssc::kOk && std::isfinite(gravity_)) return ssc::kOk;
      return UsageError("GRAVITY must be a number");
    case 'h':
      PrintUsage(false);
      return kHelpPrinted;
    case 'p':
      if (!parseImuPhase(argument)) return UsageError("Invalid POS argument: %s", argument);
      phase_ = argument;
      return ssc::kOk;
    case 't':
      if (parseInt(argument, &seconds_) == ssc::kOk && seconds_ >= 1) return ssc::kOk;
      return UsageError("SECONDS must be a positive integer");
    case kUseGyroRate:
      useGyroRate_ = true;
      return ssc::kOk;
    default:
      return InvalidOption(arguments, option);
  }
}
