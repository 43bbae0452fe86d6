// Where a color calibration keeps what its steps measured: device paths.
#pragma once

#include <cstddef>

/// Records of nine 32-bit floats in the machine's byte order (see color_record), one a step.
inline constexpr const char* kColorDataFile = "/data/app-ephemeral/vantle_color";
/// A hundred times as many steps as any calibration has.
inline constexpr std::size_t kMaxColorDataBytes = 1024 * 1024;

/// Text for those who look into a unit that fails; never read back.
inline constexpr const char* kColorLogFile = "/mnt/vendor/persist/sensors/color.csv";
