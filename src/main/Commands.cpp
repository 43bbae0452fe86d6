#include "main/Commands.h"

#include <string_view>

#include "imu/ImuMultipointCalibrator.h"
#include "imu/ImuThermalCalibrator.h"
#include "light/AlsCalibrator.h"
#include "light/ColorCalibrator.h"
#include "light/UdAlsCalibrator.h"
#include "mag/BaroCalibrator.h"
#include "mag/MagCalibrator.h"
#include "mag/MagCurrentSensitivity.h"
#include "mag/MagOrientation.h"
#include "mag/MagSoftIron.h"
#include "prox/ProxCalibrator.h"
#include "prox/ProxPoffset.h"
#include "prox/SarCalibrator.h"
#include "prox/UdProxCalibrator.h"

namespace {

bool anyDevice(DeviceType) { return true; }

/// Light and proximity sensor look through the display, not past it.
bool looksThroughDisplay(DeviceType type) {
  return type == DeviceType::t5h5 || type == DeviceType::rufael || type == DeviceType::whiskel;
}

bool hasProximityThresholds(DeviceType type) { return type == DeviceType::o1v1; }

bool hasProximityOffset(DeviceType type) { return type == DeviceType::p2m2 || type == DeviceType::e4d4; }

template <class Command>
std::unique_ptr<Calibrator> make(ssc::Connection* connection) {
  return std::make_unique<Command>(connection);
}

struct Command {
  std::string_view word;
  bool (*serves)(DeviceType);  ///< which devices have this variant of the command
  std::unique_ptr<Calibrator> (*make)(ssc::Connection*);
};

// One row for each calibrator; of a command with variants the first that serves the device counts. The word
// is compared as it stands, capitals included.
constexpr Command kCommands[] = {
    {"als", looksThroughDisplay, make<UdAlsCalibrator>},
    {"als", anyDevice, make<AlsCalibrator>},
    {"baro", anyDevice, make<BaroCalibrator>},
    {"color", anyDevice, make<ColorCalibrator>},
    {"imu-multipoint", anyDevice, make<ImuMultipointCalibrator>},
    {"imu-thermal", anyDevice, make<ImuThermalCalibrator>},
    {"mag", anyDevice, make<MagCalibrator>},
    {"mag-orient", anyDevice, make<MagOrientation>},
    {"mag-sensitivity", anyDevice, make<MagCurrentSensitivity>},
    {"mag-softiron", anyDevice, make<MagSoftIron>},
    {"prox", hasProximityThresholds, make<ProxCalibrator>},
    {"prox", hasProximityOffset, make<ProxPoffset>},
    {"prox", looksThroughDisplay, make<UdProxCalibrator>},
    {"sar", anyDevice, make<SarCalibrator>},
};

}  // namespace

std::unique_ptr<Calibrator> makeCalibrator(const std::string& command, DeviceType deviceType,
                                           ssc::Connection* connection) {
  for (const Command& row : kCommands) {
    if (row.word == command && row.serves(deviceType)) return row.make(connection);
  }
  return nullptr;
}
