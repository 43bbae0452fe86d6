// The inertial commands: each step of both multi-point procedures, and the thermal calibration.
#include <array>

#include "fault/ModeTables.h"

namespace fault {
namespace {

using Words = std::vector<std::string>;

/// From 30 to 45 °C within half a minute, as no handset warms up: a quick thermal sweep.
const std::string kSweep = "world.temperature=[{at=0,value=30},{at=0.5,value=45,ramp=30}]";

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

Words turning(const Pose& pose, const std::string& axis, std::size_t seed, const char* angle = "angle=180") {
  Words world = inPose(pose, seed);
  for (const char* turn : {"rate=180", angle, "at=0.3", "ramp=0.2"}) {
    world.push_back(std::string("world.rotation.") + turn);
  }
  world.push_back("world.rotation.axis=" + axis);
  return world;
}

constexpr const char* kStepDone = "Completed data collection for current position.";

void addPositional(CommandMode mode, std::vector<CommandMode>* modes) {
  mode.device = "o1v1";
  CommandMode first = mode;
  first.name = "first position";
  first.words = {"imu-multipoint", "first"};
  first.world = inPose(kPoses[0], 1);
  first.before = {{first.words, inPose(kPoses[1], 3)}};  // somebody else's, which it clears
  first.begins = "Beginning IMU multi-point calibration";
  first.succeeds = kStepDone;
  first.dropsRecords = true;
  modes->push_back(first);

  mode.name = "position";
  mode.succeeds = kStepDone;
  mode.words = {"imu-multipoint"};
  mode.world = inPose(kPoses[1], 2);
  mode.before = {{{"imu-multipoint", "first"}, inPose(kPoses[0], 1)}};
  modes->push_back(mode);

  mode.name = "last position";
  mode.succeeds = "";
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

  CommandMode dryRun = mode;
  dryRun.name = "last position, dry run";
  dryRun.words.insert(dryRun.words.begin(), "-n");
  dryRun.notice = Notice::kNone;
  dryRun.storesInRegistry = false;
  dryRun.asksAfterwards = true;  // it shows what is stored
  modes->push_back(dryRun);

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

Words phaseWords(const std::string& phase) { return {"-q", "imu-multipoint", "-p", phase}; }

void addPerPhase(CommandMode mode, std::vector<CommandMode>* modes) {
  mode.device = "p2m2";
  CommandMode first = mode;
  first.name = "first phase";
  first.words = {"-q", "imu-multipoint", "-p", "a+x", "first"};
  first.world = inPose(kPoses[0], 1);
  first.before = {{first.words, inPose(kPoses[0], 3)}};  // somebody else's, which it clears
  first.begins = "Beginning IMU multi-point calibration";
  first.succeeds = kStepDone;
  first.dropsRecords = first.bearsUndeleted = true;
  modes->push_back(first);

  CommandMode clear = first;
  clear.name = "clear";
  clear.words = {"imu-multipoint", "first"};
  clear.streamed = "";
  clear.ending = Ending::kNoSamples;
  clear.keepsRecords = false;
  modes->push_back(clear);

  mode.name = "phase";
  mode.succeeds = kStepDone;
  mode.words = {"-q", "imu-multipoint", "-p", "a-x"};
  mode.world = inPose(kPoses[1], 2);
  mode.before = {{{"-q", "imu-multipoint", "-p", "a+x", "first"}, inPose(kPoses[0], 1)}};
  modes->push_back(mode);

  mode.name = "turn";
  mode.streamed = "gyro";
  mode.words = {"-q", "imu-multipoint", "-p", "g+x"};
  mode.world = turning(kPoses[0], "x", 2);
  modes->push_back(mode);

  CommandMode rate = mode;
  rate.name = "turn at a rate";
  rate.words.emplace_back("--use-gyro-rate");
  // Turns on and on: a look-up that takes seconds must not miss it.
  rate.world = turning(kPoses[0], "x", 2, "angle=3600");
  modes->push_back(rate);

  mode.name = "last phase";
  mode.succeeds = "";
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
    mode.before.push_back({phaseWords("a+" + name), inPose(kPoses[2 * axis], 3 * axis)});
    mode.before.push_back({phaseWords("g+" + name), turning(kPoses[2 * axis], name, 3 * axis + 1)});
    if (axis < 2) {
      mode.before.push_back({phaseWords("a-" + name), inPose(kPoses[2 * axis + 1], 3 * axis + 2)});
    }
  }
  mode.group = "imuchip2_0_platform.accel.fac_cal";
  mode.item = "corr_mat";
  mode.notice = Notice::kWarning;
  mode.storesInRegistry = true;
  modes->push_back(mode);

  // Its sensors read their calibration again all the same.
  CommandMode dryRun = mode;
  dryRun.name = "last phase, dry run";
  dryRun.words.insert(dryRun.words.begin(), "-n");
  dryRun.storesInRegistry = false;
  modes->push_back(dryRun);

  CommandMode solve = mode;
  solve.name = "solve";
  solve.before.push_back({phaseWords("a-z"), mode.world});
  std::erase(solve.words, "-p");
  std::erase(solve.words, "a-z");
  solve.streamed = "";
  solve.ending = Ending::kNoSamples;
  solve.keepsRecords = false;
  modes->push_back(solve);
}

/// What each step measures beside the sensor that it is named after.
void addOtherInertialSensors(std::vector<CommandMode>* modes) {
  const OtherSensor accelerometer{"accel", "accelerometer"};
  const OtherSensor gyroscope{"gyro", "gyroscope"};
  const OtherSensor toldGyroscope{"gyro", "gyroscope", Notice::kWarning};
  const OtherSensor thermometer{"imu_temperature", "thermometer"};
  const std::vector<CommandMode> own = *modes;
  for (const CommandMode& mode : own) {
    if (mode.Is("imu-multipoint position") || mode.Is("imu-multipoint phase")) {
      addOthersStruck(mode, {gyroscope, thermometer}, modes);
    } else if (mode.Is("imu-multipoint turn")) {
      addOthersStruck(mode, {accelerometer, thermometer}, modes);
    } else if (mode.Is("imu-multipoint last position") || mode.Is("imu-multipoint last phase")) {
      addOthersStruck(mode, {toldGyroscope}, modes);
    }
  }
}

}  // namespace

void addImuMultipointModes(std::vector<CommandMode>* modes) {
  CommandMode mode;
  mode.family = "imu-multipoint";
  mode.lookedUp = mode.streamed = "accel";
  mode.ending = Ending::kTime;
  mode.keepsRecords = true;
  mode.begins = "Continuing IMU multi-point calibration";
  mode.closes = "IMU multi-point calibration";
  std::vector<CommandMode> all;
  addPositional(mode, &all);
  addPerPhase(mode, &all);
  addOtherInertialSensors(&all);
  modes->insert(modes->end(), all.begin(), all.end());
}

void addImuThermalModes(std::vector<CommandMode>* modes) {
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
  const CommandMode merging = mode;

  mode.name = "raw";
  mode.device = "t5h5";
  mode.before = {};
  modes->push_back(mode);
  const CommandMode raw = mode;

  mode.name = "old bumps";
  mode.device = "o1v1";
  mode.words = {"-q", "imu-thermal", "--use-old-bump", "40"};
  modes->push_back(mode);

  mode.name = "dry run";
  mode.words = {"-n", "-q", "imu-thermal", "40"};
  mode.storesInRegistry = false;
  mode.asksAfterwards = true;  // it shows what is stored
  modes->push_back(mode);

  CommandMode reset;
  reset.family = mode.family;
  reset.name = "reset";
  reset.device = "o1v1";
  reset.words = {"-r", "imu-thermal"};
  reset.before = merging.before;
  reset.storesInRegistry = reset.bearsUndeleted = true;
  modes->push_back(reset);

  constexpr auto kLate = OtherSensor::Loss::kLate;
  constexpr auto kShown = OtherSensor::Loss::kShown;
  // The accelerometer's result is stored before the gyroscope's samples are looked at. The last four are only
  // looked at: whatever becomes of them, the calibration stands.
  addOthersStruck(merging,
                  {{"gyro", "gyroscope", Notice::kNone, kLate},
                   {"imu_temperature", "thermometer"},
                   {"mag", "magnetometer", Notice::kNone, kShown},
                   {"temperature_mag", "magnetometer's thermometer", Notice::kNone, kShown},
                   {"pressure", "barometer", Notice::kNone, kShown},
                   {"pressure_temperature", "barometer's thermometer", Notice::kNone, kShown}},
                  modes);
  addOthersStruck(raw, {{"gyro", "gyroscope", Notice::kNone, kLate}}, modes);
}

}  // namespace fault
