#include "simhub/SensorModels.h"

#include "simhub/Te2Table.h"
#include "simhub/sensors/AmbientLight.h"
#include "simhub/sensors/Barometer.h"
#include "simhub/sensors/Color.h"
#include "simhub/sensors/ImuSensors.h"
#include "simhub/sensors/Magnetometer.h"
#include "simhub/sensors/Proximity.h"
#include "simhub/sensors/ProximityOffset.h"
#include "simhub/sensors/Sar.h"
#include "simhub/sensors/Thermometer.h"
#include "simhub/sensors/UnderDisplayAmbientLight.h"

namespace simhub {
namespace {

template <class Model>
std::unique_ptr<Sensor> make(const SensorConfig& config, const SensorSurroundings& surroundings) {
  return std::make_unique<Model>(config, surroundings);
}

constexpr SensorParameter kAmbientLightParameters[] = {
    {"color_temperature_slope", 1, 1, -1, 1, 0,
     "Share by which light is seen brighter per 1000 K above 5000 K."},
    {"infrared_leak", 1, 1, 0, 10, 0, "Share by which light of nothing but infrared is seen brighter."},
    {"corrects", 1, 1, 0, 1, 0,
     "1: the calibrated stream is also multiplied by the registry's \"corr_factor\"."},
};

constexpr SensorParameter kColorParameters[] = {
    {"infrared_crosstalk", 1, 1, 0, 1, 0.08,
     "Share of the infrared counts that the red, green and blue filters let through."},
};

constexpr SensorParameter kReferenceDistance{
    "reference_distance", 1, 1, 1, 10000, 50, "Distance of a target, in mm, at which it throws back"};
constexpr SensorParameter kReferenceCounts{"reference_counts",           1, 1, 0, 65535, 140,
                                           "this much light, in counts."};

constexpr SensorParameter kProximityParameters[] = {kReferenceDistance, kReferenceCounts};

constexpr SensorParameter kProximityOffsetParameters[] = {
    kReferenceDistance,
    kReferenceCounts,
    {"reference_ppulse", 1, 1, 0, 63, 31, "The registry's \"ppulse\" for which this holds,"},
    {"reference_pldrive", 1, 1, 1, 31, 18, "and its \"pldrive\"."},
    {"offset_range", 1, 1, 0, 65535, 255, "The most that the offset takes off without extension, in counts."},
    {"extension_step", 1, 1, 0, 65535, 64,
     "What one step of the extension takes off, in counts, until a request says otherwise."},
    {"automatic", 1, 1, 0, 1, 1, "1: calibrates its offset by itself until a request says otherwise."},
};

constexpr SensorParameter kImuParameters[] = {
    {"with_raw", 1, 1, 0, 1, 0,
     "1: a reading has six values, the calibrated ones and then the uncalibrated."},
    {"bias_first", 1, 1, 0, 1, 0, "1: the bias is subtracted before the matrix is applied; 0: after."},
    {"outliers", 1, 1, 0, 1e9, 0, "How many readings are outliers, from the first on that can be one."},
    {"outlier_every", 1, 1, 1, 1e9, 50, "One of so many readings can be an outlier."},
    {"outlier_size", 1, 1, -1e6, 1e6, 5, "What an outlier's first value has too much, in the sensor's unit."},
};

constexpr SensorParameter kUnderDisplayAmbientLightParameters[] = {
    {"sensitivity", 1, 1, 0, 1000, 1, "Lux that it makes of one lux outside without a calibration."},
    {"infrared_leak", 1, 1, 0, 10, 0.3, "Share of the infrared that C, R, G and B see as well."},
    {"integration_time", 1, 1, 2.78, 182000, 1000, "Its own integration time, in µs."},
    {"full_scale", 1, 1, 1, 1e9, 65535, "Counts at which a channel is saturated."},
    {"gain_error_c", 3, 3, -0.9, 10, 0, "Share by which C is amplified too much at gain 8, 9 and 10."},
    {"gain_error_r", 3, 3, -0.9, 10, 0, "The same of R."},
    {"gain_error_g", 3, 3, -0.9, 10, 0, "The same of G."},
    {"gain_error_b", 3, 3, -0.9, 10, 0, "The same of B."},
    {"gain_error_ir", 3, 3, -0.9, 10, 0, "The same of IR."},
    {"display_leak", 4, 4, 0, 1e6, 2,
     "Counts that C, R, G, B catch of white per level, at the worst moment."},
    {"leak_floor", 1, 1, 0, 1, 0.25, "Share of that at the best moment of the refresh."},
    {"best_delay", 1, 1, 0, 1000, 6, "That moment, in ms after the trigger by the display's own TE2 edge."},
    {"te2_falling_edge", 1, 1, 0, kMaxTe2Delay, 1180, "That edge, in display lines, where no table is set."},
    {"te2_line", 1, 1, 0, 1000, 5, "Length of a display line, in µs."},
    {"pwm_boundary", 1, 1, 0, 255, 60, "Brightness level below which the display is dimmed by pulses."},
    {"pwm_ripple", 1, 1, 0, 1e6, 300, "Counts that these add to C, R, G and B at the lowest brightness."},
};

constexpr SensorModel kModels[] = {
    {"ambient_light", "_0_platform.als.fac_cal", kAmbientLightParameters, make<AmbientLight>,
     "One value, the illuminance in lux. Calibration: multiplied by \"scale\" / 1000."},
    {"under_display_ambient_light", "_0_platform.als.fac_cal", kUnderDisplayAmbientLightParameters,
     make<UnderDisplayAmbientLight>,
     "Eight values: lux, the counts of C, R, G, B and IR, the gain setting and the integration time in µs. "
     "Calibration, of lux alone: \"scale\", gain ratios, coefficients, \"pwm_boundary\" and pattern lines; "
     "\"delay\" of the trigger."},
    {"barometer",
     "_0_platform.pressure.fac_cal",
     {},
     make<Barometer>,
     "One value, the air pressure in hPa. Calibration: the first number of \"bias\" is subtracted."},
    {"proximity", "_0_platform.prox.fac_cal", kProximityParameters, make<Proximity>,
     "Proximity events of raw counts, 0 to 255, and the reading before it is cut to counts. Calibration: "
     "near from "
     "\"near_threshold\" on, far from \"far_threshold\" down."},
    {"proximity_offset", "_0_platform.prox.fac_cal", kProximityOffsetParameters, make<ProximityOffsetSensor>,
     "Proximity events of raw counts, 0 to 65535, the offset taken off them, and the steps of its extension. "
     "Calibration: \"poffset\" and \"ore\" are taken off, what is left is in proportion to \"ppulse\" + 1 "
     "and "
     "\"pldrive\"."},
    {"magnetometer",
     "_0_platform.mag.fac_cal",
     {},
     make<Magnetometer>,
     "Three values, the magnetic field in µT along the handset's axes. Calibration: \"bias\" is subtracted, "
     "the "
     "rest multiplied by \"corr_mat\"."},
    {"accelerometer", "_0_platform.accel.fac_cal", kImuParameters, make<Accelerometer>,
     "Three values, m/s² by axis: gravity in the handset's pose and other acceleration. Calibration: "
     "\"corr_mat\", \"bias\" and the thermal scale."},
    {"gyroscope", "_0_platform.gyro.fac_cal", kImuParameters, make<Gyroscope>,
     "Three values, rad/s by axis. Calibration: \"corr_mat\", \"bias\" and the thermal scale."},
    {"color", "_platform.color.fac_cal", kColorParameters, make<Color>,
     "Seven values: color temperature in K, counts of clear, red, green, blue and infrared, gain step. "
     "Calibration: the line \"ratio_coef0\" + \"ratio_coef1\" · blue / red gives the color temperature."},
    {"color_light", "_platform.als.fac_cal", kColorParameters, make<ColorLight>,
     "Seven values, those of `color` but for the first, which is the illuminance in lux. Calibration: "
     "multiplied by \"scale\"."},
    {"sar",
     "",
     {},
     make<Sar>,
     "Two values, counts of the top and the bottom electrode beyond what was compensated. Calibration: "
     "\"max_offset_top\" and \"max_offset_bottom\" are the most that it compensates."},
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
