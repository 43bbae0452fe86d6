#include "simhub/sensors/Magnetometer.h"

#include <algorithm>

#include "simhub/Pose.h"
#include "simhub/RegistryValues.h"

namespace simhub {
namespace {

/// What the registry has when it has all of it, else the neutral values.
template <std::size_t Count>
void takeNumbers(const sns_registry_data& group, std::string_view name,
                 const std::array<double, Count>& neutral, std::array<double, Count>* numbers) {
  const std::vector<float> stored = registryFloats(group, name);
  *numbers = neutral;
  if (stored.size() == Count) std::copy(stored.begin(), stored.end(), numbers->begin());
}

}  // namespace

void Magnetometer::Read(Time time, std::vector<float>* values) {
  const SignalValue field = TheWorld().At(WorldSignal::kMagneticField, time);
  Vector3 reading = toHandsetFrame(TheWorld().At(WorldSignal::kPose, time), {field[0], field[1], field[2]});
  Err(time, reading);
  for (std::size_t axis = 0; axis < reading.size(); ++axis) reading[axis] -= bias_[axis];
  for (std::size_t row = 0; row < reading.size(); ++row) {
    const double* const element = &correction_[3 * row];
    values->push_back(
        static_cast<float>(element[0] * reading[0] + element[1] * reading[1] + element[2] * reading[2]));
  }
}

void Magnetometer::ApplyCalibration(const sns_registry_data& group) {
  if (!Config().calibrated) return;
  takeNumbers(group, "bias", {}, &bias_);
  takeNumbers(group, "corr_mat", ErrorModel::kIdentity, &correction_);
}

}  // namespace simhub
