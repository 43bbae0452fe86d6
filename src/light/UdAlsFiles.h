// What the calibrations of the light sensor under the display write down: the working file, whose records
// carry a calibration from step to step, and the logs of every sample, for people and spreadsheets.
#pragma once

#include <cstddef>
#include <string>
#include <vector>

#include "framework/DataFile.h"
#include "light/UdAlsArguments.h"

// Where they lie on the handset.
inline constexpr const char* kUdAlsDataFile = "/data/app-ephemeral/vantle_als";
inline constexpr const char* kUdAlsLuxLog = "/persist/sensors/als.csv";
inline constexpr const char* kUdAlsGainLog = "/persist/sensors/als_gain_cal.csv";
inline constexpr const char* kUdAlsPwmLog = "/persist/sensors/als_pwm_cal.csv";
inline constexpr const char* kUdAlsPatternLog = "/persist/sensors/als_pattern_cal.csv";
inline constexpr const char* kUdAlsDelayLog = "/persist/sensors/als_delay_cal.csv";
inline constexpr const char* kUdAlsTe2DelayLog = "/persist/sensors/als_te2_delay_cal.csv";

inline constexpr const char* kUdAlsLogHeader = "lux_ref,cct_ref,c,r,g,b,ir,gain,int_t,disp_c,disp_b\n";
inline constexpr const char* kUdAlsDelayLogHeader = "lux,c,r,g,b,ir,gain,int_t,delay\n";

/// A sample: lux, clear, red, green, blue, infrared, gain setting, integration time (µs).
inline constexpr std::size_t kUdAlsSampleValues = 8;

/// Where the values stand in a record of the working file.
enum UdAlsRecordIndex : std::size_t {
  kUdAlsReferenceLux,
  kUdAlsReferenceCct,
  kUdAlsDelay,  ///< ms, or lines of the display in a scan of its TE2 signal
  kUdAlsBrightness,
  kUdAlsMeanLux,  ///< from here on the means of the step's samples
  kUdAlsMeanClear,
  kUdAlsMeanRed,
  kUdAlsMeanGreen,
  kUdAlsMeanBlue,
  kUdAlsMeanInfrared,
  kUdAlsMeanGain,
  kUdAlsMeanIntegrationTime,
  kUdAlsRecordValues,
};

/// A scan of thousands of delays stays far below.
inline constexpr std::size_t kMaxUdAlsDataFileBytes = std::size_t{16} * 1024 * 1024;

/// One line of the log: references, the sample without its lux, the display's colour and brightness.
/// `sample` has at least kUdAlsSampleValues values.
[[nodiscard]] std::string udAlsLogLine(const UdAlsArguments& arguments, const SampleData& sample);
/// One line of a delay scan's log: the whole sample and the delay.
[[nodiscard]] std::string udAlsDelayLogLine(const SampleData& sample, float delay);

/// The record of a step: 48 bytes in the machine's byte order.
[[nodiscard]] std::string udAlsRecord(const UdAlsArguments& arguments, float delay, const SampleData& means);
/// All records that are whole: kOk, or what keeps the file from being read to its end. Of a file that cannot
/// be opened nothing is known: `records` is then left alone.
[[nodiscard]] FileResult readUdAlsRecords(const std::string& path, std::vector<SampleData>* records);
