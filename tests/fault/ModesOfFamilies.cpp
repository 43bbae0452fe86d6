// The commands that only some handset families have: color, proximity offsets, SAR.
#include "fault/ModeTables.h"

namespace fault {
namespace {

using Words = std::vector<std::string>;

/// A step of a light calibration closes from here on when it fails.
constexpr const char* kCollects = "Collecting samples...";
constexpr const char* kNextStep = "Please proceed to the next step.";

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
  mode.begins = kCollects;
  mode.closes = "Calibration";
  mode.keepsRecords = true;
  const OtherSensor light{"ambient_light_raw", "light sensor"};
  const OtherSensor toldLight{"ambient_light_raw", "light sensor", Notice::kWarning};

  CommandMode first = mode;
  first.name = "first record";
  first.words = infrared.words;
  first.world = infrared.world;
  first.before = {infrared, lamp};
  first.dropsRecords = true;
  first.succeeds = kNextStep;
  modes->push_back(first);

  mode.name = "record";
  mode.words = daylight.words;
  mode.world = daylight.world;
  mode.before = {infrared, lamp};
  mode.succeeds = kNextStep;
  modes->push_back(mode);
  const CommandMode record = mode;

  mode.name = "record and solve";
  mode.words = {"-q", "color", "-w", "200", "4000"};
  mode.world = underLamp("200", "4000");
  mode.before = {infrared, lamp, daylight};
  mode.group = "lightchip2_platform.als.fac_cal";
  mode.notice = Notice::kWarning;
  mode.storesInRegistry = true;
  mode.succeeds = "";
  modes->push_back(mode);
  const CommandMode solving = mode;

  CommandMode dryRun = mode;
  dryRun.name = "dry run";
  dryRun.words.insert(dryRun.words.begin(), "-n");
  dryRun.group = "";  // not even read
  dryRun.notice = Notice::kNone;
  dryRun.storesInRegistry = false;
  modes->push_back(dryRun);

  CommandMode solve = mode;
  solve.name = "solve";
  solve.words = {"color", "-W"};
  solve.world = {};
  solve.streamed = "";
  solve.ending = Ending::kNoSamples;
  solve.begins = "Reading data file";
  solve.keepsRecords = false;
  modes->push_back(solve);

  mode.name = "verify";
  mode.before.push_back({mode.words, mode.world});
  mode.words = {"-q", "color", "-v", "5", "700", "5200"};
  mode.world = underLamp("700", "5200");
  mode.closes = "Verification";
  mode.storesInRegistry = false;
  mode.asksAfterwards = true;
  mode.notice = Notice::kNone;
  modes->push_back(mode);
  const CommandMode verify = mode;

  CommandMode clear;
  clear.family = mode.family;
  clear.name = "clear";
  clear.device = mode.device;
  clear.words = {"color", "-C"};
  clear.before = {infrared};
  clear.dropsRecords = clear.deletesOnce = true;
  modes->push_back(clear);

  mode.name = "reset";
  mode.words = {"-r", "color"};
  mode.world = {};
  mode.before = {};
  mode.streamed = mode.begins = mode.closes = "";
  mode.ending = Ending::kNoSamples;
  mode.notice = Notice::kWarning;
  mode.keepsRecords = mode.asksAfterwards = false;
  mode.storesInRegistry = true;
  modes->push_back(mode);

  addOthersStruck(record, {light}, modes);
  addOthersStruck(solving, {toldLight}, modes);
  addOthersStruck(verify, {light}, modes);
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

  CommandMode other = mode;
  other.name = "the other one";
  other.words = {"sar", "-i", "1"};
  other.lookedUp = "sar_1";
  other.group = "sarchip_1_platform.fac_cal";
  modes->push_back(other);

  CommandMode dryRun = mode;
  dryRun.name = "dry run";
  dryRun.words = {"-n", "sar"};
  dryRun.group = dryRun.item = "";  // not even read
  dryRun.storesInRegistry = false;
  modes->push_back(dryRun);

  mode.name = "reset";
  mode.before = {{mode.words, {}}};
  mode.words = {"-r", "sar"};
  mode.begins = mode.closes = mode.group = mode.item = "";
  mode.ownRequest = 0;
  mode.deletesOnce = true;
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

  mode.name = "enable";
  mode.words = {"prox", "poffset", "enable"};
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

  mode.name = "sample";
  mode.words = {"-q", "prox"};
  CommandMode sample = mode;
  sample.group = "";
  sample.storesInRegistry = false;
  modes->push_back(sample);

  sample.name = "offset, automatic";
  sample.words = {"-q", "prox", "poffset", "enable"};
  sample.ownRequest = 770;
  modes->push_back(sample);

  mode.name = "offset";
  mode.words = {"-q", "prox", "-w", "poffset", "disable"};
  mode.item = "poffset";
  mode.notice = Notice::kWarning;
  mode.ownRequest = 770;
  mode.closes = "Proximity poffset calibration";
  modes->push_back(mode);

  mode.name = "pulse number";
  mode.words = {"-q", "prox", "ppulse", "500"};
  mode.item = "ppulse";
  mode.ownRequest = 0;
  mode.begins = "Proximity pulse number calibration begins";
  mode.closes = "Proximity pulse number calibration";
  modes->push_back(mode);

  CommandMode dryRun = mode;
  dryRun.name = "pulse number, dry run";
  dryRun.words.insert(dryRun.words.begin(), "-n");
  dryRun.notice = Notice::kNone;
  dryRun.storesInRegistry = false;
  modes->push_back(dryRun);

  CommandMode current = mode;
  current.name = "pulse current";
  current.device = "rufael";
  current.words = {"-q", "prox", "pldrive", "500"};
  current.group = "proxchipr_0_platform.prox.fac_cal";
  current.item = "pldrive";
  current.begins = "Proximity pulse current calibration begins";
  current.closes = "Proximity pulse current calibration";
  modes->push_back(current);

  CommandMode reset = mode;
  reset.name = "reset";
  reset.words = {"-r", "prox"};
  reset.item = "version";
  reset.streamed = reset.begins = reset.closes = "";
  reset.ending = Ending::kNoSamples;
  reset.notice = Notice::kFailure;
  modes->push_back(reset);

  mode.name = "range extension";
  mode.words = {"prox", "ore", "enable", "1", "1"};
  mode.streamed = mode.group = mode.item = mode.begins = mode.closes = "";
  mode.ending = Ending::kNoSamples;
  mode.notice = Notice::kNone;
  mode.ownRequest = 772;
  mode.storesInRegistry = false;
  mode.succeeds = "ORE enabled.";
  modes->push_back(mode);

  mode.name = "no range extension";
  mode.words = {"prox", "ore", "disable", "1", "1"};
  mode.succeeds = "ORE disabled.";
  modes->push_back(mode);
}

}  // namespace fault
