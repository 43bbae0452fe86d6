// Reads [world.rotation]: one turn on a rotation table, which comes up to its rate, holds it, and stops.
#include <cmath>

#include "simhub/ScenarioReader.h"

namespace simhub {
namespace {

constexpr double kMaxRate = 4000;    // °/s
constexpr double kMaxAngle = 1e6;    // °
constexpr double kMaxSeconds = 1e9;  // s

struct Rotation {
  double at = 0;      ///< s since the hub's start
  double rate = 90;   ///< °/s; negative turns the other way
  double angle = 90;  ///< °, without sign: ramps included
  double ramp = 0.1;  ///< s from standing still to the rate, and back
  std::size_t axis = 0;
};

bool readAxis(TableReader& reader, std::size_t* axis) {
  std::string name;
  if (!reader.Text("axis", &name)) {
    reader.Problem("axis", "has to be \"x\", \"y\" or \"z\"");
    return false;
  }
  const bool isAxis = name.size() == 1 && name[0] >= 'x' && name[0] <= 'z';
  if (isAxis) {
    *axis = static_cast<std::size_t>(name[0] - 'x');
  } else {
    reader.Problem("axis", "\"" + name + "\" is not x, y or z");
  }
  return isAxis;
}

/// The moves of the rotation rate. Each ramp turns half of what the rate would in its time.
std::vector<SignalMove> movesOf(const Rotation& rotation, double steadySeconds) {
  SignalMove start;
  start.at = rotation.at;
  start.shape = SignalMove::Shape::kRamp;
  start.duration = rotation.ramp;
  start.target[rotation.axis] = rotation.rate;
  SignalMove stop = start;
  stop.at = rotation.at + rotation.ramp + steadySeconds;
  stop.target[rotation.axis] = 0;
  return {start, stop};
}

}  // namespace

void readRotation(TableReader& world, World* result, Problems& problems) {
  const toml::table* const table = world.Table("rotation");
  if (table == nullptr) return;
  TableReader reader(*table, world.PathOf("rotation"), problems);
  Rotation rotation;
  const bool hasAxis = readAxis(reader, &rotation.axis);
  (void)reader.Number("at", 0, kMaxSeconds, &rotation.at);
  (void)reader.Number("rate", -kMaxRate, kMaxRate, &rotation.rate);
  (void)reader.Number("angle", 0, kMaxAngle, &rotation.angle);
  (void)reader.Number("ramp", 0, kMaxSeconds, &rotation.ramp);
  reader.RejectOthers();
  if (world.Node("rotation_rate") != nullptr) {
    world.Problem("rotation", "is another way to say rotation_rate: give one of them");
    return;
  }
  const double steadySeconds = std::fabs(rotation.angle / rotation.rate) - rotation.ramp;
  if (!(steadySeconds > 0) || std::isinf(steadySeconds)) {
    reader.Problem("angle", "is not reached at this rate with these ramps");
    return;
  }
  if (hasAxis) result->Set(WorldSignal::kRotationRate, Signal({}, movesOf(rotation, steadySeconds)));
}

}  // namespace simhub
