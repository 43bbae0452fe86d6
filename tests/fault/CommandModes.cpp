#include <array>
#include <cctype>
#include <utility>

#include "fault/ModeTables.h"

namespace fault {
namespace {

using Words = std::vector<std::string>;

/// From 30 to 45 °C within half a minute, as no handset warms up: a quick thermal sweep.
const std::string kSweep = "world.temperature=[{at=0,value=30},{at=0.5,value=45,ramp=30}]";

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
  mode.streamed = mode.begins = mode.closes = "";
  mode.ending = Ending::kNoSamples;
  mode.storesInRegistry = true;
  modes->push_back(mode);
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
  mode.streamed = mode.begins = mode.closes = "";
  mode.ending = Ending::kNoSamples;
  mode.storesInRegistry = true;
  modes->push_back(mode);
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

    // Deletes what was stored, without asking the hub.
    mode.name = "reset";
    mode.before = {{mode.words, {}}};
    mode.words = {"-r", row.family};
    mode.group = "";
    modes->push_back(mode);
  }
}

struct Pose {
  const char* phase;
  const char* angles;
};
constexpr std::array<Pose, 6> kPoses{{{"a+x", "[0,-90,0]"},
                                      {"a-x", "[0,90,0]"},
                                      {"a+y", "[90,0,0]"},
                                      {"a-y", "[-90,0,0]"},
                                      {"a+z", "[0,0,0]"},
                                      {"a-z", "[180,0,0]"}}};

Words inPose(const Pose& pose, std::size_t seed) {
  return {std::string("world.pose=") + pose.angles, "hub.seed=" + std::to_string(seed)};
}

Words turning(const Pose& pose, const std::string& axis, std::size_t seed) {
  Words world = inPose(pose, seed);
  for (const char* turn : {"rate=180", "angle=180", "at=0.3", "ramp=0.2"}) {
    world.push_back(std::string("world.rotation.") + turn);
  }
  world.push_back("world.rotation.axis=" + axis);
  return world;
}

void addPositional(CommandMode mode, std::vector<CommandMode>* modes) {
  mode.device = "o1v1";
  mode.name = "position";
  mode.words = {"imu-multipoint"};
  mode.world = inPose(kPoses[1], 2);
  mode.before = {{{"imu-multipoint", "first"}, inPose(kPoses[0], 1)}};
  modes->push_back(mode);

  mode.name = "last position";
  mode.words = {"imu-multipoint", "last"};
  mode.world = inPose(kPoses[5], 6);
  mode.before = {};
  for (std::size_t i = 0; i < 5; ++i) {
    mode.before.push_back(
        {i == 0 ? Words{"imu-multipoint", "first"} : Words{"imu-multipoint"}, inPose(kPoses[i], i + 1)});
  }
  mode.group = "imuchip_0_platform.accel.fac_cal";
  mode.item = "corr_mat";
  mode.notice = Notice::kWarning;
  mode.storesInRegistry = true;
  modes->push_back(mode);

  mode.name = "reset";
  mode.keepsRecords = false;
  mode.words = {"-r", "imu-multipoint"};
  mode.world = {};
  mode.before = {};
  mode.streamed = mode.begins = mode.closes = "";
  mode.ending = Ending::kNoSamples;
  mode.notice = Notice::kNone;
  modes->push_back(mode);
}

void addPerPhase(CommandMode mode, std::vector<CommandMode>* modes) {
  mode.device = "p2m2";
  mode.name = "phase";
  mode.words = {"-q", "imu-multipoint", "-p", "a-x"};
  mode.world = inPose(kPoses[1], 2);
  mode.before = {{{"-q", "imu-multipoint", "-p", "a+x", "first"}, inPose(kPoses[0], 1)}};
  modes->push_back(mode);

  mode.name = "turn";
  mode.streamed = "gyro";
  mode.words = {"-q", "imu-multipoint", "-p", "g+x"};
  mode.world = turning(kPoses[0], "x", 2);
  modes->push_back(mode);

  mode.name = "last phase";
  mode.streamed = "accel";
  mode.words = {"-q", "imu-multipoint", "-p", "a-z"};
  for (const char* axis : {"x", "y", "z"}) {
    mode.words.push_back(std::string("--a+") + axis + "-ref" + axis);
    mode.words.emplace_back("9.80665");
    mode.words.push_back(std::string("--g+") + axis + "-ref" + axis);
    mode.words.emplace_back("3.14159265");
  }
  mode.words.emplace_back("last");
  mode.world = inPose(kPoses[5], 9);
  mode.before = {{{"imu-multipoint", "first"}, {}}};
  for (std::size_t axis = 0; axis < 3; ++axis) {
    const std::string name(1, "xyz"[axis]);
    const auto phase = [](const std::string& text) { return Words{"-q", "imu-multipoint", "-p", text}; };
    mode.before.push_back({phase("a+" + name), inPose(kPoses[2 * axis], 3 * axis)});
    mode.before.push_back({phase("g+" + name), turning(kPoses[2 * axis], name, 3 * axis + 1)});
    if (axis < 2) mode.before.push_back({phase("a-" + name), inPose(kPoses[2 * axis + 1], 3 * axis + 2)});
  }
  mode.group = "imuchip2_0_platform.accel.fac_cal";
  mode.item = "corr_mat";
  mode.notice = Notice::kWarning;
  mode.storesInRegistry = true;
  modes->push_back(mode);
}

void addImuMultipoint(std::vector<CommandMode>* modes) {
  CommandMode mode;
  mode.family = "imu-multipoint";
  mode.lookedUp = mode.streamed = "accel";
  mode.ending = Ending::kTime;
  mode.keepsRecords = true;
  mode.begins = "uing IMU multi-point calibration";
  mode.closes = "IMU multi-point calibration";
  addPositional(mode, modes);
  addPerPhase(mode, modes);
}

void addImuThermal(std::vector<CommandMode>* modes) {
  CommandMode mode;
  mode.family = "imu-thermal";
  mode.device = "o1v1";
  mode.words = {"-q", "imu-thermal", "40"};
  mode.world = {kSweep};
  mode.lookedUp = mode.streamed = "accel";
  mode.group = "dynamic.fac_cal.accel.thermal.scale";
  mode.ending = Ending::kTime;
  mode.storesInRegistry = true;
  mode.begins = "IMU thermal calibration begins";
  mode.closes = "IMU thermal calibration";

  mode.name = "merging";
  mode.before = {{mode.words, mode.world}};
  modes->push_back(mode);

  mode.name = "raw";
  mode.device = "t5h5";
  mode.before = {};
  modes->push_back(mode);

  mode.name = "dry run";
  mode.device = "o1v1";
  mode.words = {"-n", "-q", "imu-thermal", "40"};
  mode.storesInRegistry = false;
  modes->push_back(mode);
}

}  // namespace

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
    addImuMultipoint(&all);
    addImuThermal(&all);
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
