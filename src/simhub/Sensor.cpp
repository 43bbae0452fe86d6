#include "simhub/Sensor.h"

#include "simhub/SensorModels.h"

namespace simhub {
namespace {

sns_std_attr_value* addAttribute(sns_std_attr_event* attributes, int id) {
  sns_std_attr* const attribute = attributes->add_attributes();
  attribute->set_attr_id(id);
  return attribute->mutable_value();
}

void addText(sns_std_attr_event* attributes, int id, const std::string& text) {
  addAttribute(attributes, id)->add_values()->set_str(text);
}

void addInteger(sns_std_attr_event* attributes, int id, std::int64_t number) {
  addAttribute(attributes, id)->add_values()->set_sint(number);
}

void addFlag(sns_std_attr_event* attributes, int id, bool flag) {
  addAttribute(attributes, id)->add_values()->set_boolean(flag);
}

void addNumbers(std::span<const double> numbers, sns_std_attr_value* value) {
  for (const double number : numbers) value->add_values()->set_flt(static_cast<float>(number));
}

}  // namespace

Sensor::Sensor(const SensorConfig& config, const SensorSurroundings& surroundings)
    : config_(config),
      world_(surroundings.world),
      suid_(suidForName(config.key)),
      noise_(hashText(config.key, surroundings.seed)) {}

std::string Sensor::CalibrationGroup() const {
  if (!config_.registryGroup.empty()) return config_.registryGroup;
  const SensorModel* const model = findSensorModel(config_.model);
  if (model == nullptr || *model->calibrationSuffix == '\0') return {};
  return packageName(config_.name) + model->calibrationSuffix;
}

void Sensor::LoadCalibration(const RegistryReader& read) {
  const std::string group = CalibrationGroup();
  if (!group.empty()) ApplyCalibration(read(group));
}

void Sensor::Encode(std::span<const float> values, sns_std_sensor_sample_status status,
                    std::string* payload) {
  event_.clear_data();
  for (const float value : values) event_.add_data(value);
  event_.set_status(status);
  (void)event_.SerializeToString(payload);
}

void Sensor::Err(Time time, std::span<double> values) {
  config_.error.Apply(values, world_.ScalarAt(WorldSignal::kTemperature, time), noise_);
}

std::string packageName(std::string_view sensorName) {
  std::size_t end = sensorName.find(' ');
  if (end == std::string_view::npos) end = sensorName.find('_');
  std::string package(sensorName.substr(0, end));
  for (char& c : package) {
    if (c >= 'A' && c <= 'Z') c = static_cast<char>(c - 'A' + 'a');
  }
  return package;
}

void describeSensor(const SensorConfig& config, sns_std_attr_event* attributes) {
  addText(attributes, kAttributeName, config.name);
  addText(attributes, kAttributeVendor, config.vendor);
  addText(attributes, kAttributeDataType, config.dataType);
  addFlag(attributes, kAttributeAvailable, true);
  addInteger(attributes, kAttributeVersion, config.version);
  if (!config.rates.empty()) addNumbers(config.rates, addAttribute(attributes, kAttributeRates));
  if (!config.resolutions.empty()) {
    addNumbers(config.resolutions, addAttribute(attributes, kAttributeResolutions));
    addNumbers({config.resolutions.data(), 1}, addAttribute(attributes, kAttributeSelectedResolution));
  }
  if (!config.ranges.empty()) {
    sns_std_attr_value* const ranges = addAttribute(attributes, kAttributeRanges);
    for (const auto& range : config.ranges) addNumbers(range, ranges->add_values()->mutable_subtype());
    addNumbers(config.ranges[config.selectedRange], addAttribute(attributes, kAttributeSelectedRange));
  }
  addInteger(attributes, kAttributeStreamType, config.streamType);
  addInteger(attributes, kAttributeRigidBody, config.rigidBody);
  addFlag(attributes, kAttributePhysicalSensor, config.physical);
  addInteger(attributes, kAttributeHardwareId, config.hardwareId);
}

}  // namespace simhub
