// What a color sensor and its light sensor say under one light source: their readings, and the record of
// means that a step of the calibration leaves.
#pragma once

#include <cstddef>
#include <string>
#include <vector>

#include "framework/Sample.h"

/// The values of one reading of either sensor. The light sensor's first is its raw illuminance in lux; of the
/// others only kIr matters.
///
/// The chip measures green and infrared in turn: a reading whose infrared is negative has a valid green and
/// no infrared, any other has a valid infrared and no green.
namespace color_reading {
enum Index : std::size_t {
  kCct,    ///< K
  kClear,  ///< counts, like the four colors that follow
  kRed,
  kGreen,
  kBlue,
  kIr,
  kGain,  ///< a step doubles the counts
  kCount
};
}  // namespace color_reading

/// Whether a reading, of at least kCount values, has an infrared. Not one whose infrared is not a number.
[[nodiscard]] bool hasIr(const SampleData& reading);
/// Whether it has a green.
[[nodiscard]] bool hasGreen(const SampleData& reading);

/// The means of a collection.
namespace color_means {
enum Index : std::size_t { kLux, kCct, kClear, kRed, kGreen, kBlue, kIr, kGain, kCount };
}  // namespace color_means

/// The light sensor's mean lux over all of its readings, then the means of the color sensor's readings with
/// an infrared, but for the green, whose mean is that of the readings with a green. Means without a reading
/// are left out: fewer than color_means::kCount values.
[[nodiscard]] SampleData colorMeans(const std::vector<Sample>& light, const std::vector<Sample>& color);

/// Those of the means, of which there are color_means::kCount, that a calibration computes from. Not the
/// color temperature, since light without a color has none, and not the green.
[[nodiscard]] std::vector<float> meansThatCount(const SampleData& means);

/// A record of the working file: the reference, and the means without the green, which no fit uses.
namespace color_record {
enum Index : std::size_t {
  kReferenceLux,  ///< 0: the infrared lamp
  kReferenceCct,  ///< K
  kLux,
  kCct,
  kClear,
  kRed,
  kBlue,
  kIr,
  kGain,
  kCount
};
}  // namespace color_record

/// `means` has color_means::kCount values.
[[nodiscard]] SampleData colorRecord(float referenceLux, float referenceCct, const SampleData& means);

/// The log's first line. It names more columns than the lines have: the last two stay empty.
inline constexpr const char* kColorLogHeader = "lux_ref,cct_ref,c,r,g,b,ir,gain,int_t,irc_ratio\n";
/// A line of the log: the reference, and the means from the clear channel on.
[[nodiscard]] std::string colorLogLine(float referenceLux, float referenceCct, const SampleData& means);
