// The light sensor under the display: its calibrations step by step, its settings.
#include "fault/ModeTables.h"

namespace fault {
namespace {

using Words = std::vector<std::string>;

constexpr const char* kLightGroup = "lightchip5_0_platform.als.fac_cal";
constexpr const char* kNextStep = "Please proceed to the next step.";

/// A step of two samples.
Words stepWords(const Words& words) {
  Words all{"-q", "als", "-s", "2"};
  all.insert(all.end(), words.begin(), words.end());
  return all;
}

/// What a mode that computes and stores has beside one that only records.
CommandMode solving(CommandMode mode) {
  mode.succeeds = "";
  mode.group = kLightGroup;
  mode.notice = Notice::kWarning;
  mode.storesInRegistry = true;
  return mode;
}

CommandMode withoutSamples(CommandMode mode) {
  mode.streamed = mode.begins = "";
  mode.ending = Ending::kNoSamples;
  mode.keepsRecords = false;
  return mode;
}

void addLux(const CommandMode& step, std::vector<CommandMode>* modes) {
  CommandMode mode = step;
  mode.name = "record";
  mode.words = {"-q", "als", "500", "5000"};
  modes->push_back(mode);

  CommandMode first = mode;
  first.name = "first record";
  first.words = stepWords({"-r", "500", "5000"});
  first.before = {{{"-q", "als", "400"}, {}}};
  first.dropsRecords = true;
  modes->push_back(first);

  CommandMode solve = solving(mode);
  solve.name = "record and solve";
  solve.words = {"-q", "als", "-w", "500", "5000"};
  solve.begins = "";  // until the samples of the neutral scale it ends without a closing line
  solve.dropsRecords = true;
  modes->push_back(solve);

  // The stored scale is made neutral first, so that the sensor is measured without it.
  CommandMode again = solve;
  again.name = "record and solve again";
  again.words = stepWords({"-w", "500", "5000"});
  again.before = {{stepWords({"-w", "400"}), {}}};
  again.storesOnTheWay = true;
  modes->push_back(again);

  CommandMode dryRun = solve;
  dryRun.name = "dry run";
  dryRun.words = again.words;
  dryRun.words.insert(dryRun.words.begin(), "-n");
  dryRun.notice = Notice::kNone;
  dryRun.storesInRegistry = false;
  dryRun.asksAfterwards = true;
  modes->push_back(dryRun);

  CommandMode verify = solve;
  verify.name = "verify";
  verify.words = {"-q", "als", "-v", "50", "500"};
  verify.notice = Notice::kNone;
  verify.begins = "Verifying ALS calibration";
  verify.closes = "Verification";
  verify.dropsRecords = verify.keepsRecords = verify.storesInRegistry = false;
  modes->push_back(verify);
}

void addScans(const CommandMode& step, std::vector<CommandMode>* modes) {
  CommandMode scan = solving(step);
  scan.begins = "";  // a request that fails between two of its steps has no closing line
  scan.ownRequest = 7804;
  scan.dropsRecords = true;
  scan.before = {{{"-q", "als", "500"}, {}}};
  scan.name = "delay scan";
  scan.words = stepWords({"caldelay", "1000", "11", "4", "8", "2"});
  modes->push_back(scan);

  scan.name = "TE2 scan";
  scan.words = stepWords({"caldelay_te2", "1000", "11", "5", "1260", "1660", "200"});
  scan.setsDisplay = true;
  modes->push_back(scan);
}

/// Steps at different settings, the last of which computes and stores.
void addSteps(const CommandMode& step, std::vector<CommandMode>* modes) {
  struct Row {
    const char* name;
    Words first;
    Words last;
    std::uint32_t request;
  };
  const Row rows[] = {
      {"gain step", {"calgain", "1000", "8"}, {"calgain", "1000", "11"}, 7806},
      {"infrared gain step", {"calgain", "ir", "1000", "8"}, {"calgain", "ir", "1000", "11"}, 7806},
      {"pwm step", {"pwm", "1000", "11", "40"}, {"pwm", "1000", "11", "120"}, 7808},
      {"pattern step", {"white", "50"}, {"white", "250"}, 0},
  };
  for (const Row& row : rows) {
    CommandMode mode = step;
    mode.name = row.name;
    mode.words = stepWords(row.last);
    mode.ownRequest = row.request;
    mode.before = {{stepWords(row.first), {}}};
    if (mode.name != "infrared gain step") modes->push_back(mode);

    mode = solving(mode);
    mode.name = std::string(row.name) + " and solve";
    mode.words.insert(mode.words.begin() + 2, "-w");
    modes->push_back(mode);
  }

  CommandMode first = step;
  first.name = "first gain step";
  first.words = stepWords({"-r", "calgain", "1000", "8"});
  first.ownRequest = 7806;
  first.before = {{stepWords({"calgain", "1000", "9"}), {}}};
  first.dropsRecords = true;
  modes->push_back(first);

  CommandMode solve = withoutSamples(solving(first));
  solve.name = "gain solved";
  solve.words = {"als", "-W", "calgain", "1000", "11"};
  solve.before = {{stepWords({"calgain", "1000", "8"}), {}}, {stepWords({"calgain", "1000", "11"}), {}}};
  solve.dropsRecords = false;
  modes->push_back(solve);
}

void addSettings(CommandMode mode, std::vector<CommandMode>* modes) {
  mode.closes = "";
  struct Row {
    const char* name;
    Words words;
    std::uint32_t request;
    const char* succeeds;
  };
  const Row rows[] = {
      {"trigger", {"trigger", "enable", "5"}, 7800, "ALS trigger enabled."},
      {"autogain", {"autogain", "enable"}, 7802, "Auto gain enabled."},
      {"gain", {"gain", "8"}, 7810, "Set gain succeeded."},
      {"itime", {"itime", "1000"}, 7812, "Set integration time succeeded."},
      {"gain and itime", {"gain", "8", "itime", "1000"}, 7814, "Set gain & integration time succeeded."},
      {"set_te2", {"set_te2", "1258", "1260"}, 0, "Set TE2 succeeded."},
  };
  for (const Row& row : rows) {
    mode.name = row.name;
    mode.words = {"als"};
    mode.words.insert(mode.words.end(), row.words.begin(), row.words.end());
    mode.ownRequest = row.request;
    mode.succeeds = row.succeeds;
    mode.setsDisplay = row.request == 0;
    modes->push_back(mode);
  }
}

}  // namespace

void addUnderDisplayLightModes(std::vector<CommandMode>* modes) {
  CommandMode step;
  step.family = "als under the display";
  step.device = "t5h5";
  step.lookedUp = step.streamed = "ambient_light_raw";
  step.ending = Ending::kSampleCount;
  step.begins = "Collecting samples...";
  step.closes = "Calibration";
  step.succeeds = kNextStep;
  step.keepsRecords = true;
  addLux(step, modes);
  addScans(step, modes);
  addSteps(step, modes);

  CommandMode sample = step;
  sample.name = "sample";
  sample.words = stepWords({"sample"});
  sample.begins = sample.closes = sample.succeeds = "";
  sample.keepsRecords = false;
  modes->push_back(sample);

  CommandMode reset = withoutSamples(solving(step));
  reset.name = "reset";
  reset.words = {"-r", "als"};
  reset.closes = "";
  reset.item = "c_gain_ratio_8";
  reset.notice = Notice::kFailure;
  modes->push_back(reset);

  addSettings(withoutSamples(step), modes);

  CommandMode clear;
  clear.family = step.family;
  clear.name = "clear";
  clear.device = step.device;
  clear.words = {"als", "-R", "500"};
  clear.before = {{{"-q", "als", "500"}, {}}};
  clear.dropsRecords = clear.deletesOnce = true;
  modes->push_back(clear);
}

}  // namespace fault
