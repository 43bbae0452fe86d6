#include "simhub/sensors/Sar.h"

#include <algorithm>

#include "proto/sns_oem_sar.pb.h"
#include "simhub/RegistryValues.h"

namespace simhub {
namespace {

constexpr std::uint32_t kCompensationRequest = 778;
constexpr std::uint32_t kCompensationResponse = 779;
/// The most that the sensor's 14 bits can compensate, where the registry does not say less.
constexpr float kFullScale = 16383;
constexpr Time kCompensationTime{20'000'000};

}  // namespace

std::array<double, 2> Sar::see(Time time) {
  const SignalValue hand = TheWorld().At(WorldSignal::kCapacitance, time);
  std::array<double, 2> counts{hand[0], hand[1]};
  Err(time, counts);
  return counts;
}

void Sar::Read(Time time, std::vector<float>* values) {
  const std::array<double, 2> counts = see(time);
  for (std::size_t i = 0; i < counts.size(); ++i) {
    values->push_back(static_cast<float>(counts[i] - std::min(compensated_[i], most_[i])));
  }
}

void Sar::ApplyCalibration(const sns_registry_data& group) {
  most_ = {registryFloat(group, "max_offset_top").value_or(kFullScale),
           registryFloat(group, "max_offset_bottom").value_or(kFullScale)};
}

bool Sar::HandleRequest(const SensorRequest& request, std::vector<SensorAnswer>* answers) {
  if (request.messageId != kCompensationRequest) return false;
  sns_sar_comp_resp response;
  // A compensation that failed has no offsets.
  if (!request.refuse) {
    compensated_ = see(request.time);
    response.set_top_offset(static_cast<float>(compensated_[0]));
    response.set_bottom_offset(static_cast<float>(compensated_[1]));
  }
  answers->push_back({kCompensationResponse, response.SerializeAsString(), kCompensationTime});
  return true;
}

}  // namespace simhub
