// The commands that only some handset families have: color, proximity offsets, SAR, light under the display.
#include "fault/ModeTables.h"

namespace fault {
namespace {

using Words = std::vector<std::string>;

Words underLamp(const char* lux, const char* kelvin) {
  return {std::string("world.illuminance=") + lux, std::string("world.color_temperature=") + kelvin};
}

}  // namespace

void addColorModes(std::vector<CommandMode>* modes) {
  const CommandMode::Step infrared{{"-q", "color", "-c"}, {"world.illuminance=0", "world.infrared=5"}};
  const CommandMode::Step lamp{{"-q", "color", "500", "2800"}, underLamp("500", "2800")};
  const CommandMode::Step daylight{{"-q", "color", "1000", "6500"}, underLamp("1000", "6500")};

  CommandMode mode;
  mode.family = "color";
  mode.device = "p2m2";
  mode.lookedUp = mode.streamed = "color_raw";
  mode.ending = Ending::kSampleCount;
  mode.closes = "Calibration";

  mode.name = "record";
  mode.words = daylight.words;
  mode.world = daylight.world;
  mode.before = {infrared, lamp};
  mode.keepsRecords = true;
  modes->push_back(mode);

  mode.name = "record and solve";
  mode.words = {"-q", "color", "-w", "200", "4000"};
  mode.world = underLamp("200", "4000");
  mode.before = {infrared, lamp, daylight};
  mode.group = "lightchip2_platform.als.fac_cal";
  mode.notice = Notice::kWarning;
  mode.storesInRegistry = true;
  modes->push_back(mode);

  mode.name = "verify";
  mode.before.push_back({mode.words, mode.world});
  mode.words = {"-q", "color", "-v", "5", "700", "5200"};
  mode.world = underLamp("700", "5200");
  mode.keepsRecords = mode.storesInRegistry = false;
  mode.notice = Notice::kNone;
  modes->push_back(mode);

  mode.name = "reset";
  mode.words = {"-r", "color"};
  mode.world = {};
  mode.before = {};
  mode.streamed = "";
  mode.ending = Ending::kNoSamples;
  mode.storesInRegistry = true;
  modes->push_back(mode);
}

void addSarModes(std::vector<CommandMode>* modes) {
  CommandMode mode;
  mode.family = "sar";
  mode.device = "o1v1";
  mode.lookedUp = "sar";
  mode.group = "sarchip_0_platform.fac_cal";
  mode.item = "max_offset_top";
  mode.ownRequest = 778;
  mode.storesInRegistry = true;
  mode.begins = "SAR calibration begins";
  mode.closes = "SAR calibration";

  mode.name = "calibrate";
  mode.words = {"sar"};
  modes->push_back(mode);

  mode.name = "reset";
  mode.before = {{mode.words, {}}};
  mode.words = {"-r", "sar"};
  mode.begins = mode.closes = mode.group = mode.item = "";
  mode.ownRequest = 0;
  modes->push_back(mode);
}

void addProximityOffsetModes(std::vector<CommandMode>* modes) {
  CommandMode mode;
  mode.family = "prox with offset";
  mode.device = "p2m2";
  mode.lookedUp = mode.streamed = "proximity";
  mode.ending = Ending::kSampleCount;

  mode.name = "sample";
  mode.words = {"prox"};
  modes->push_back(mode);

  mode.name = "disable";
  mode.words = {"prox", "poffset", "disable"};
  mode.ownRequest = 770;
  modes->push_back(mode);
}

void addUnderDisplayProximityModes(std::vector<CommandMode>* modes) {
  CommandMode mode;
  mode.family = "prox under the display";
  mode.device = "t5h5";
  mode.lookedUp = mode.streamed = "proximity_raw";
  mode.group = "proxchip5_0_platform.prox.fac_cal";
  mode.ending = Ending::kSampleCount;
  mode.storesInRegistry = true;

  mode.name = "offset";
  mode.words = {"-q", "prox", "-w", "poffset", "disable"};
  mode.item = "poffset";
  mode.notice = Notice::kWarning;
  mode.ownRequest = 770;
  modes->push_back(mode);

  mode.name = "pulse number";
  mode.words = {"-q", "prox", "ppulse", "500"};
  mode.item = "ppulse";
  mode.ownRequest = 0;
  modes->push_back(mode);

  CommandMode current = mode;
  current.name = "pulse current";
  current.device = "rufael";
  current.words = {"-q", "prox", "pldrive", "500"};
  current.group = "proxchipr_0_platform.prox.fac_cal";
  current.item = "pldrive";
  modes->push_back(current);

  CommandMode reset = mode;
  reset.name = "reset";
  reset.words = {"-r", "prox"};
  reset.item = "version";
  reset.streamed = "";
  reset.ending = Ending::kNoSamples;
  modes->push_back(reset);

  mode.name = "range extension";
  mode.words = {"prox", "ore", "enable", "1", "1"};
  mode.streamed = mode.group = mode.item = "";
  mode.ending = Ending::kNoSamples;
  mode.ownRequest = 772;
  mode.storesInRegistry = false;
  modes->push_back(mode);
}

void addUnderDisplayLightModes(std::vector<CommandMode>* modes) {
  CommandMode mode;
  mode.family = "als under the display";
  mode.device = "t5h5";
  mode.lookedUp = mode.streamed = "ambient_light_raw";
  mode.ending = Ending::kSampleCount;
  mode.closes = "Calibration";
  mode.keepsRecords = true;

  mode.name = "record";
  mode.words = {"-q", "als", "500", "5000"};
  modes->push_back(mode);

  mode.name = "record and solve";
  mode.words = {"-q", "als", "-w", "500", "5000"};
  mode.dropsRecords = true;
  mode.group = "lightchip5_0_platform.als.fac_cal";
  mode.notice = Notice::kWarning;
  mode.storesInRegistry = true;
  modes->push_back(mode);

  CommandMode scan = mode;
  scan.name = "delay scan";
  scan.words = {"-q", "als", "-s", "2", "caldelay", "1000", "11", "4", "8", "2"};
  scan.ownRequest = 7804;
  modes->push_back(scan);

  CommandMode step = mode;
  step.dropsRecords = false;
  step.notice = Notice::kNone;
  step.storesInRegistry = false;
  step.group = "";
  step.name = "gain step";
  step.words = {"-q", "als", "-s", "2", "calgain", "1000", "11"};
  step.ownRequest = 7806;
  modes->push_back(step);
  step.name = "pwm step";
  step.words = {"-q", "als", "-s", "2", "pwm", "1000", "11", "40"};
  step.ownRequest = 7808;
  modes->push_back(step);
  step.name = "sample";
  step.words = {"-q", "als", "-s", "2", "sample"};
  step.ownRequest = 0;
  step.keepsRecords = false;
  modes->push_back(step);

  CommandMode reset = mode;
  reset.name = "reset";
  reset.words = {"-r", "als"};
  reset.streamed = "";
  reset.ending = Ending::kNoSamples;
  reset.keepsRecords = false;
  modes->push_back(reset);

  mode.name = "gain";
  mode.words = {"als", "gain", "8"};
  mode.streamed = mode.group = mode.closes = "";
  mode.ending = Ending::kNoSamples;
  mode.notice = Notice::kNone;
  mode.ownRequest = 7810;
  mode.keepsRecords = mode.storesInRegistry = false;
  modes->push_back(mode);
}

}  // namespace fault
