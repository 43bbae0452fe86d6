// Whether a handset moved while it warmed up. Its accelerometer's samples are put into groups, and the mean
// of each group is compared with that of the group before it: a bump is a jump by more than a threshold on
// any axis. 32-bit float throughout; the first three values of a sample count.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <vector>

#include "framework/Sample.h"

/// The samples of one temperature range.
struct TemperatureBin {
  std::uint64_t index = 0;  ///< counted from the lowest temperature
  SampleData mean;
};

struct BumpSearch {
  enum class Outcome {
    kNone,
    kBump,
    kTooFewGroups,   ///< nothing to compare
    kTooManyGroups,  ///< more than a 64-bit integer counts
  };
  Outcome outcome = Outcome::kNone;
  float jump = 0;                    ///< of a bump: the first axis that jumps, with its sign
  std::vector<TemperatureBin> bins;  ///< by temperature only: those looked at, empty ones left out
};

/// Groups by temperature, `range` (°C, above 0) to a group. `temperatures[i]` belongs to `samples[i]`; what
/// one list has more than the other is left out, as are samples without a finite temperature. Temperatures
/// that the handset passed too quickly leave empty groups, which are skipped and take no memory.
[[nodiscard]] BumpSearch findBumpByTemperature(const std::vector<Sample>& samples,
                                               const std::vector<float>& temperatures, float range,
                                               float threshold);

/// Groups in the order of the samples, `size` (above 0) to a group; those after the last whole group are left
/// out. Compares sums, and divides their difference.
[[nodiscard]] BumpSearch findBumpByTime(const std::vector<Sample>& samples, std::int32_t size,
                                        float threshold);
