#include "simhub/sensors/Proximity.h"

#include <algorithm>
#include <cmath>

#include "simhub/RegistryValues.h"

namespace simhub {
namespace {

constexpr double kTopCount = 255;
constexpr float kDefaultNearThreshold = 140;
constexpr float kDefaultFarThreshold = 100;
/// A target on the window: far more than the top count, and finite.
constexpr double kMinDistanceMm = 0.1;

/// What is no count at all (a fault's not-a-number) is sent as 0.
std::uint32_t toCounts(float value, double top) {
  return value > 0 ? static_cast<std::uint32_t>(std::min(static_cast<double>(value), top)) : 0;
}

}  // namespace

double ProximitySensor::LightAt(Time time) const {
  const double distance = std::max(kMinDistanceMm, TheWorld().ScalarAt(WorldSignal::kTargetDistance, time));
  const double ratio = Config().Parameter("reference_distance") / distance;
  return Config().Parameter("reference_counts") * ratio * ratio +
         TheWorld().ScalarAt(WorldSignal::kWindowCrosstalk, time);
}

float ProximitySensor::Count(double light) {
  const auto counts = static_cast<float>(std::clamp(std::round(light), 0.0, topCount_));
  if (counts >= nearThreshold_) {
    isNear_ = true;
  } else if (counts <= farThreshold_) {
    isNear_ = false;
  }
  return counts;
}

void ProximitySensor::Encode(std::span<const float> values, sns_std_sensor_sample_status status,
                             std::string* payload) {
  event_.Clear();
  event_.set_proximity_event_type(isNear_ ? SNS_PROXIMITY_EVENT_TYPE_NEAR : SNS_PROXIMITY_EVENT_TYPE_FAR);
  event_.set_status(status);
  // An event cut to no values lacks even its counts: it does not parse.
  if (!values.empty()) event_.set_raw_adc(toCounts(values[0], topCount_));
  for (std::size_t i = 1; i < values.size(); ++i) event_.add_data(values[i]);
  (void)event_.SerializePartialToString(payload);
}

void ProximitySensor::ApplyCalibration(const sns_registry_data& group) {
  nearThreshold_ = registryFloat(group, "near_threshold").value_or(kDefaultNearThreshold);
  farThreshold_ = registryFloat(group, "far_threshold").value_or(kDefaultFarThreshold);
}

Proximity::Proximity(const SensorConfig& config, const SensorSurroundings& surroundings)
    : ProximitySensor(config, surroundings, kTopCount) {}

void Proximity::Read(Time time, std::vector<float>* values) {
  double light = LightAt(time);
  Err(time, {&light, 1});
  values->push_back(Count(light));
  values->push_back(static_cast<float>(light));
}

}  // namespace simhub
