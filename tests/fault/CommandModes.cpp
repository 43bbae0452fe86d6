#include <cctype>
#include <utility>

#include "fault/ModeTables.h"

namespace fault {
namespace {

using Words = std::vector<std::string>;

void addAls(std::vector<CommandMode>* modes) {
  CommandMode mode;
  mode.family = "als";
  mode.device = "o1v1";
  mode.lookedUp = mode.streamed = "ambient_light";
  mode.group = "lightchip_0_platform.als.fac_cal";
  mode.item = "scale";
  mode.ending = Ending::kSampleCount;
  mode.begins = "ALS calibration begins";
  mode.closes = "ALS calibration";

  mode.name = "calibrate";
  mode.words = {"als", "300"};
  mode.notice = Notice::kFailure;
  mode.storesInRegistry = true;
  modes->push_back(mode);

  mode.name = "dry run";
  mode.words = {"-n", "als", "300"};
  mode.notice = Notice::kNone;
  mode.storesInRegistry = false;
  modes->push_back(mode);

  mode.name = "verify";
  mode.words = {"als", "-v", "20", "300"};
  mode.begins = "Verifying ALS calibration";
  mode.closes = "ALS verification";
  mode.item = "";  // without a factor the readings count as they are
  modes->push_back(mode);

  mode.name = "verify as it is";
  mode.words = {"als", "-c", "-v", "20", "300"};
  modes->push_back(mode);

  mode.name = "reset";
  mode.words = {"-r", "als"};
  mode.streamed = mode.begins = mode.closes = "";
  mode.item = "scale";
  mode.ending = Ending::kNoSamples;
  mode.notice = Notice::kFailure;
  mode.storesInRegistry = true;
  modes->push_back(mode);
}

void addProx(std::vector<CommandMode>* modes) {
  CommandMode mode;
  mode.family = "prox";
  mode.device = "o1v1";
  mode.lookedUp = mode.streamed = "proximity";
  mode.group = "proxchip_0_platform.prox.fac_cal";
  mode.ending = Ending::kSampleCount;
  mode.notice = Notice::kFailure;
  mode.storesInRegistry = true;
  mode.begins = "Proximity calibration begins";
  mode.closes = "Proximity sensor calibration";

  mode.name = "near";
  mode.words = {"prox", "near"};
  mode.item = "far_threshold";
  modes->push_back(mode);

  // The target is so close that the near threshold has to be moved and written first.
  mode.name = "far, moving near";
  mode.words = {"prox", "far"};
  mode.world = {"world.target_distance=45"};
  mode.item = "near_threshold";
  modes->push_back(mode);

  mode.name = "dry run";
  mode.words = {"-n", "prox", "near"};
  mode.world = {};
  mode.group = mode.item = "";  // not even read
  mode.notice = Notice::kNone;
  mode.storesInRegistry = false;
  modes->push_back(mode);

  mode.name = "reset";
  mode.words = {"-r", "prox"};
  mode.group = "proxchip_0_platform.prox.fac_cal";
  mode.item = "near_threshold";
  mode.streamed = mode.begins = mode.closes = "";
  mode.ending = Ending::kNoSamples;
  mode.notice = Notice::kFailure;
  mode.storesInRegistry = true;
  modes->push_back(mode);
}

void addBaro(std::vector<CommandMode>* modes) {
  CommandMode mode;
  mode.family = "baro";
  mode.device = "o1v1";
  mode.lookedUp = "pressure";
  mode.streamed = "pressure_raw";
  mode.group = "barochip_0_platform.pressure.fac_cal";
  mode.item = "bias";
  mode.ending = Ending::kTime;
  mode.notice = Notice::kWarning;
  mode.storesInRegistry = true;
  mode.begins = "Barometer calibration begins";
  mode.closes = "Barometer calibration";

  mode.name = "raw";
  mode.words = {"baro", "1013.25"};
  modes->push_back(mode);

  const CommandMode raw = mode;

  CommandMode calibrated = mode;
  calibrated.name = "calibrated";
  calibrated.device = "e4d4";
  calibrated.streamed = "pressure";
  calibrated.group = "barochip4_0_platform.pressure.fac_cal";
  modes->push_back(calibrated);

  mode.name = "dry run";
  mode.words = {"-n", "baro", "1013.25"};
  mode.notice = Notice::kNone;
  mode.storesInRegistry = false;
  modes->push_back(mode);

  mode.name = "reset";
  mode.words = {"-r", "baro"};
  mode.notice = Notice::kNone;
  mode.streamed = mode.begins = mode.closes = "";
  mode.ending = Ending::kNoSamples;
  mode.storesInRegistry = true;
  modes->push_back(mode);
  addOthersStruck(raw, {{"pressure_temperature", "thermometer"}}, modes);
}

void addMag(std::vector<CommandMode>* modes) {
  CommandMode mode;
  mode.family = "mag";
  mode.device = "o1v1";
  mode.lookedUp = "mag";
  mode.streamed = "mag_raw";
  mode.group = "magchip_0_platform.mag.fac_cal";
  mode.item = "bias";
  mode.ending = Ending::kTime;
  mode.notice = Notice::kWarning;
  mode.storesInRegistry = true;
  mode.begins = "Magnetometer calibration (";
  mode.closes = "Magnetometer calibration";

  mode.name = "raw";
  mode.words = {"mag", "--", "0", "22", "-42"};
  modes->push_back(mode);

  const CommandMode raw = mode;

  CommandMode calibrated = mode;
  calibrated.name = "calibrated";
  calibrated.device = "e4d4";
  calibrated.streamed = "mag";
  calibrated.group = "magchip4_0_platform.mag.fac_cal";
  modes->push_back(calibrated);

  mode.name = "dry run";
  mode.words = {"-n", "mag", "--", "0", "22", "-42"};
  mode.notice = Notice::kNone;
  mode.storesInRegistry = false;
  modes->push_back(mode);

  mode.name = "reset";
  mode.words = {"-r", "mag"};
  mode.notice = Notice::kNone;
  mode.streamed = mode.begins = mode.closes = "";
  mode.ending = Ending::kNoSamples;
  mode.storesInRegistry = true;
  modes->push_back(mode);
  addOthersStruck(raw, {{"temperature_mag", "thermometer"}}, modes);
}

void addMagConfiguration(std::vector<CommandMode>* modes) {
  CommandMode mode;
  mode.device = "o1v1";
  mode.lookedUp = "mag";
  mode.storesInRegistry = true;

  struct Row {
    const char* family;
    Words words;
    const char* group;
    const char* begins;
    const char* closes;
  };
  const Row rows[] = {
      {"mag-orient",
       {"-x", "+z", "+y"},
       "magchip_0_platform.orient",
       "Reading current orientation",
       "Magnetometer orientation configuration"},
      {"mag-softiron",
       {"1", "0.1", "0", "0.1", "1", "0", "0", "0", "1"},
       "magchip_0_platform.mag.fac_cal.corr_mat",
       "Reading current soft-iron matrix",
       "Magnetometer soft-iron configuration"},
      {"mag-sensitivity",
       {"-s", "fast", "0.5", "-0.5", "2"},
       "magchip_0_platform.sensitivity_fast",
       "Reading current sensitivity",
       "Magnetometer current sensitivity configuration"},
  };
  for (const Row& row : rows) {
    mode.family = row.family;
    mode.name = "store";
    mode.words = {row.family};
    mode.words.insert(mode.words.end(), row.words.begin(), row.words.end());
    mode.group = row.group;
    mode.begins = row.begins;
    mode.closes = row.closes;
    mode.before = {};
    modes->push_back(mode);

    // Deletes what was stored; the hub is asked for the sensor's name alone.
    CommandMode reset = mode;
    reset.name = "reset";
    reset.before = {{mode.words, {}}};
    reset.words = {"-r", row.family};
    reset.group = reset.begins = reset.closes = "";
    reset.deletesOnce = mode.family != "mag-sensitivity";
    modes->push_back(reset);
    if (mode.family != "mag-sensitivity") continue;

    reset.name = "clear one speed";
    reset.words = {row.family, "-c", "fast"};
    reset.closes = row.closes;
    modes->push_back(reset);
  }
}

}  // namespace

void addOthersStruck(const CommandMode& mode, std::initializer_list<OtherSensor> others,
                     std::vector<CommandMode>* modes) {
  for (const OtherSensor& other : others) {
    CommandMode struck = mode;
    struck.struck = other.name;
    struck.lookedUp = struck.streamed = other.key;
    struck.notice = other.notice;
    if (other.loss == OtherSensor::Loss::kShown) struck.ending = Ending::kShown;
    struck.storesOnTheWay = other.loss == OtherSensor::Loss::kLate;
    modes->push_back(struck);
  }
}

const std::vector<CommandMode>& commandModes() {
  static const std::vector<CommandMode> modes = [] {
    std::vector<CommandMode> all;
    addAls(&all);
    addUnderDisplayLightModes(&all);
    addColorModes(&all);
    addProx(&all);
    addProximityOffsetModes(&all);
    addUnderDisplayProximityModes(&all);
    addSarModes(&all);
    addBaro(&all);
    addMag(&all);
    addMagConfiguration(&all);
    addImuMultipointModes(&all);
    addImuThermalModes(&all);
    return all;
  }();
  return modes;
}

std::string testNameOf(const std::string& title) {
  std::string name;
  bool begins = true;
  for (const char c : title) {
    const auto byte = static_cast<unsigned char>(c);
    if (std::isalnum(byte) != 0) name += begins ? static_cast<char>(std::toupper(byte)) : c;
    begins = std::isalnum(byte) == 0;
  }
  return name;
}

}  // namespace fault
