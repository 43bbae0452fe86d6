#include "simhub/SensorModels.h"

#include "simhub/sensors/Barometer.h"
#include "simhub/sensors/Magnetometer.h"
#include "simhub/sensors/Thermometer.h"

namespace simhub {
namespace {

template <class Model>
std::unique_ptr<Sensor> make(const SensorConfig& config, const SensorSurroundings& surroundings) {
  return std::make_unique<Model>(config, surroundings);
}

constexpr SensorModel kModels[] = {
    {"barometer",
     "_0_platform.pressure.fac_cal",
     {},
     make<Barometer>,
     "One value, the air pressure in hPa. Calibration: the first number of \"bias\" is subtracted."},
    {"magnetometer",
     "_0_platform.mag.fac_cal",
     {},
     make<Magnetometer>,
     "Three values, the magnetic field in µT along the handset's axes. Calibration: \"bias\" is subtracted, "
     "the "
     "rest multiplied by \"corr_mat\"."},
    {"temperature", "", {}, make<Thermometer>, "One value, the chip's temperature in °C."},
};

}  // namespace

std::span<const SensorModel> sensorModels() { return kModels; }

const SensorModel* findSensorModel(std::string_view name) {
  for (const SensorModel& model : kModels) {
    if (name == model.name) return &model;
  }
  return nullptr;
}

std::unique_ptr<Sensor> makeSensor(const SensorConfig& config, const SensorSurroundings& surroundings) {
  return findSensorModel(config.model)->make(config, surroundings);
}

}  // namespace simhub
