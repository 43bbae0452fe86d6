#include "simhub/World.h"

#include <iterator>

namespace simhub {
namespace {

constexpr double kStandardPressure = 1013.25;  // hPa

constexpr WorldSignalRow kRows[] = {
    {WorldSignal::kPressure, "pressure", 1, "hPa", 0, 2000, {kStandardPressure}, "Air pressure."},
    {WorldSignal::kTemperature,
     "temperature",
     1,
     "°C",
     -100,
     200,
     {25},
     "Temperature of the handset's inside."},
    {WorldSignal::kIlluminance, "illuminance", 1, "lx", 0, 500000, {0}, "Illuminance on the light sensor."},
    {WorldSignal::kColorTemperature,
     "color_temperature",
     1,
     "K",
     500,
     50000,
     {5000},
     "Correlated colour temperature of the light source."},
    {WorldSignal::kIrShare, "ir_share", 1, "", 0, 1, {0}, "Share of infrared in the light source's power."},
    {WorldSignal::kInfrared,
     "infrared",
     1,
     "W/m²",
     0,
     10000,
     {0},
     "Irradiance by an infrared lamp, which adds nothing to the illuminance."},
    {WorldSignal::kMagneticField,
     "magnetic_field",
     3,
     "µT",
     -10000,
     10000,
     {0, 22, -42},
     "Magnetic field in the frame of the room (x east, y north, z up)."},
    {WorldSignal::kPose,
     "pose",
     3,
     "°",
     -360,
     360,
     {0, 0, 0},
     "The handset's attitude: roll about x, then pitch about y, then yaw about z; 0 lies face up, top to the "
     "north."},
    {WorldSignal::kRotationRate,
     "rotation_rate",
     3,
     "°/s",
     -4000,
     4000,
     {0, 0, 0},
     "Rotation about the handset's axes."},
    {WorldSignal::kAcceleration,
     "acceleration",
     3,
     "m/s²",
     -1000,
     1000,
     {0, 0, 0},
     "Acceleration in the handset's frame besides gravity: a bump."},
    {WorldSignal::kTargetDistance,
     "target_distance",
     1,
     "mm",
     0,
     100000,
     {100000},
     "Distance from the proximity window to what stands before it."},
    {WorldSignal::kWindowCrosstalk,
     "window_crosstalk",
     1,
     "counts",
     0,
     65535,
     {0},
     "Light that the window's cover throws back into the proximity sensor."},
    {WorldSignal::kDisplayBrightness,
     "display_brightness",
     1,
     "levels",
     0,
     255,
     {0},
     "Brightness of the display; 0: it is off."},
    {WorldSignal::kDisplayColor,
     "display_color",
     3,
     "",
     0,
     1,
     {1, 1, 1},
     "Red, green and blue share of the picture."},
    {WorldSignal::kDisplayRefreshRate,
     "display_refresh_rate",
     1,
     "Hz",
     1,
     1000,
     {60},
     "Refresh rate of the display."},
    {WorldSignal::kCapacitance,
     "capacitance",
     2,
     "counts",
     -65536,
     65536,
     {0, 0},
     "What the top and bottom SAR electrodes see of a hand."},
    {WorldSignal::kGravity, "gravity", 1, "m/s²", 0, 100, {9.80665}, "Local gravity."},
};
static_assert(std::size(kRows) == kWorldSignalCount);

}  // namespace

std::span<const WorldSignalRow> worldSignals() { return kRows; }

const WorldSignalRow* findWorldSignal(std::string_view name) {
  for (const WorldSignalRow& row : kRows) {
    if (name == row.name) return &row;
  }
  return nullptr;
}

World::World() {
  for (const WorldSignalRow& row : kRows) Set(row.signal, Signal(row.initial));
}

}  // namespace simhub
