// What the parts of faultRows() share: how a fault is written down, when it begins, and what comes of a
// collection that it spoils.
#pragma once

#include <array>
#include <string>
#include <vector>

#include "fault/FaultRows.h"

namespace fault {

using Overrides = std::vector<std::string>;
using Made = std::optional<Overrides>;

/// The keys of one fault.
[[nodiscard]] Overrides faultOf(const std::string& kind, const std::vector<std::string>& keys);

struct Moment {
  const char* name;
  /// When the fault begins; the readings of a run without it have these times.
  double (*from)(const std::vector<double>& readings);
};
enum MomentIndex : std::size_t { kFirst, kMiddle, kAfter, kMomentCount };
[[nodiscard]] const std::array<Moment, kMomentCount>& moments();
[[nodiscard]] std::string fromKey(double seconds);

/// Whether a collection ends with the last sample wanted.
[[nodiscard]] bool counts(const CommandMode& mode);
[[nodiscard]] bool computesPulses(const CommandMode& mode);
/// Whether it measures a rotation.
[[nodiscard]] bool turns(const CommandMode& mode);
/// Whether the sensor that is struck is a thermometer.
[[nodiscard]] bool isThermometer(const CommandMode& mode);

/// What comes of readings that do not come, or do not count.
[[nodiscard]] Expected lost(const CommandMode& mode, std::size_t moment);
/// Nothing came from the first moment on, and not of the measured sensor only.
[[nodiscard]] Expected nothingCame(const CommandMode& mode);
/// Whether a collection that fails otherwise than by its time ends without a message: the classic ambient
/// light.
[[nodiscard]] bool saysNoMore(const CommandMode& mode);
/// What comes of a collection that ends otherwise than by its time.
[[nodiscard]] Expected collectionFails(const CommandMode& mode, int result, const std::string& says);
/// What comes of a group that cannot be read, or written.
[[nodiscard]] Expected groupUnreadable(const CommandMode& mode);
[[nodiscard]] Expected groupUnwritable(const CommandMode& mode);

void addReadingRows(std::vector<FaultRow>* rows);
void addRequestRows(std::vector<FaultRow>* rows);
void addAnswerRows(std::vector<FaultRow>* rows);
void addRegistryRows(std::vector<FaultRow>* rows);
void addHubRows(std::vector<FaultRow>* rows);

}  // namespace fault
