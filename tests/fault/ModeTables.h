// What commandModes() is put together from.
#pragma once

#include <vector>

#include "fault/CommandModes.h"

namespace fault {

void addColorModes(std::vector<CommandMode>* modes);
void addSarModes(std::vector<CommandMode>* modes);
void addProximityOffsetModes(std::vector<CommandMode>* modes);
void addUnderDisplayProximityModes(std::vector<CommandMode>* modes);
void addUnderDisplayLightModes(std::vector<CommandMode>* modes);

}  // namespace fault
