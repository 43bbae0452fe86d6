#include "simhub/sensors/ProximityOffset.h"

#include <algorithm>
#include <cmath>

#include "proto/sns_oem_proximity.pb.h"
#include "simhub/RegistryValues.h"

namespace simhub {
namespace {

constexpr double kTopCount = 65535;
// What the chip's registers take.
constexpr double kMaxPpulse = 63;
constexpr double kMaxPldrive = 31;

constexpr std::uint32_t kPoffsetRequest = 770;
constexpr std::uint32_t kPoffsetAnswer = 771;
constexpr std::uint32_t kExtensionRequest = 772;
constexpr std::uint32_t kExtensionAnswer = 773;
constexpr Time kCalibrationTime{100'000'000};  // 100 ms
/// So much less light than it takes off makes the sensor learn its offset again; less is rounding.
constexpr double kTolerance = 1;

/// An integer item, in what the chip's register takes.
double registerValue(const sns_registry_data& group, const char* item, double initial, double top) {
  const auto stored = registryInteger(group, item);
  return std::clamp(stored ? static_cast<double>(*stored) : initial, 0.0, top);
}

template <class Answer>
SensorAnswer answerOf(std::uint32_t messageId, bool success, bool isEnabled, Time delay) {
  Answer answer;
  answer.set_success(success);
  answer.set_enabled(isEnabled);
  return {messageId, answer.SerializeAsString(), delay};
}

}  // namespace

void ProximityOffset::Learn(double light, double range, bool isExtended) {
  steps = isExtended && stepCounts > 0 ? std::clamp(std::floor(light / stepCounts), 0.0, kMaxSteps) : 0;
  counts = std::clamp(std::round(light - steps * stepCounts), 0.0, range);
}

ProximityOffsetSensor::ProximityOffsetSensor(const SensorConfig& config,
                                             const SensorSurroundings& surroundings)
    : ProximitySensor(config, surroundings, kTopCount) {}

void ProximityOffsetSensor::Read(Time time, std::vector<float>* values) {
  if (isAutomatic_ && LightAt(time) - offset_.Light() < -kTolerance) learn(time);
  double light = emitter_ * (LightAt(time) - offset_.Light());
  Err(time, {&light, 1});
  values->push_back(Count(light));
  values->push_back(static_cast<float>(offset_.counts));
  values->push_back(static_cast<float>(offset_.steps));
}

void ProximityOffsetSensor::learn(Time time) {
  offset_.Learn(LightAt(time), Config().Parameter("offset_range"), isExtended_);
}

void ProximityOffsetSensor::ApplyCalibration(const sns_registry_data& group) {
  ProximitySensor::ApplyCalibration(group);
  const double ppulse0 = Config().Parameter("reference_ppulse");
  const double pldrive0 = Config().Parameter("reference_pldrive");
  const double ppulse =
      std::clamp<double>(registryFloat(group, "ppulse").value_or(static_cast<float>(ppulse0)), 0, kMaxPpulse);
  emitter_ = (ppulse + 1) / (ppulse0 + 1) * registerValue(group, "pldrive", pldrive0, kMaxPldrive) / pldrive0;
  offset_.counts = registerValue(group, "poffset", 0, Config().Parameter("offset_range"));
  offset_.steps = registerValue(group, "ore", 0, ProximityOffset::kMaxSteps);
  isExtended_ = isExtended_ || offset_.steps > 0;
}

bool ProximityOffsetSensor::HandleRequest(const SensorRequest& request, std::vector<SensorAnswer>* answers) {
  if (request.messageId == kPoffsetRequest) {
    const bool success = switchOffset(request);
    answers->push_back(
        answerOf<sns_oem_poffset_resp>(kPoffsetAnswer, success, isAutomatic_, kCalibrationTime));
    return true;
  }
  if (request.messageId == kExtensionRequest) {
    const bool success = switchExtension(request);
    answers->push_back(answerOf<sns_oem_ore_resp>(kExtensionAnswer, success, isExtended_, Time{0}));
    return true;
  }
  return false;
}

bool ProximityOffsetSensor::switchOffset(const SensorRequest& request) {
  sns_oem_poffset_req asked;
  if (request.refuse || !asked.ParseFromString(request.payload) || !asked.has_enable()) return false;
  isAutomatic_ = asked.enable() == SNS_OEM_PROXIMITY_MODE_ENABLE;
  learn(request.time);
  return true;
}

bool ProximityOffsetSensor::switchExtension(const SensorRequest& request) {
  sns_oem_ore_req asked;
  if (request.refuse || !asked.ParseFromString(request.payload) || !asked.has_enable()) return false;
  isExtended_ = asked.enable() == SNS_OEM_PROXIMITY_MODE_ENABLE;
  if (isExtended_) {
    offset_.stepCounts = static_cast<double>(asked.pulse_number()) * asked.pulse_length();
  }
  // The steps that the offset has now were of another size, or are no longer to be had.
  offset_.steps = 0;
  return true;
}

void ProximityOffsetSensor::Restart() {
  ProximitySensor::Restart();
  isAutomatic_ = Config().Parameter("automatic") != 0;
  isExtended_ = false;
  offset_.stepCounts = Config().Parameter("extension_step");
}

}  // namespace simhub
