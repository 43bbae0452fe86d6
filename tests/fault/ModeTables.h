// What commandModes() is put together from.
#pragma once

#include <initializer_list>
#include <string>
#include <vector>

#include "fault/CommandModes.h"

namespace fault {

void addColorModes(std::vector<CommandMode>* modes);
void addSarModes(std::vector<CommandMode>* modes);
void addProximityOffsetModes(std::vector<CommandMode>* modes);
void addUnderDisplayProximityModes(std::vector<CommandMode>* modes);
void addUnderDisplayLightModes(std::vector<CommandMode>* modes);
void addImuMultipointModes(std::vector<CommandMode>* modes);
void addImuThermalModes(std::vector<CommandMode>* modes);

/// A sensor that a command measures beside the one that it is named after. Its loss is that of the command's
/// own sensor; or it is only shown; or it is looked at when something of another sensor has been stored.
struct OtherSensor {
  const char* key;
  const char* name;
  Notice notice = Notice::kNone;  ///< whether it is told as well
  /// What becomes of a command without its samples.
  enum class Loss { kAsOwn, kShown, kLate } loss = Loss::kAsOwn;
};

/// Adds the mode once for each, with the faults of a sensor striking that one.
void addOthersStruck(const CommandMode& mode, std::initializer_list<OtherSensor> others,
                     std::vector<CommandMode>* modes);

}  // namespace fault
