// The defaults of the light sensor under the display.
#include <algorithm>

#include "framework/RegistryItems.h"
#include "light/UdAlsCalibrator.h"
#include "ssc/RegistryUtil.h"

namespace {

enum class Kind { kInteger, kFloat };

/// Device types as bits; the last bit stands for all that are none.
constexpr unsigned only(DeviceType type) { return 1U << std::min(static_cast<unsigned>(type), 31U); }
constexpr unsigned kAll = ~0U;
constexpr unsigned kUnderDisplay =
    only(DeviceType::t5h5) | only(DeviceType::rufael) | only(DeviceType::whiskel);
constexpr unsigned kWithPattern = only(DeviceType::t5h5) | only(DeviceType::whiskel);

struct Default {
  const char* item;
  Kind kind;
  float value;
  unsigned devices;  ///< which get the value
  /// Which have their version advanced all the same.
  unsigned touchedDevices = 0;
};

// In the order in which they are looked for.
constexpr Default kDefaults[] = {
    {"version", Kind::kInteger, 1, kAll},
    // An integer, although calibrations store a float: the driver reads both.
    {"scale", Kind::kInteger, 1, kAll},
    {"c_gain_ratio_8", Kind::kFloat, 8, kAll},
    {"c_gain_ratio_9", Kind::kFloat, 4, kAll},
    {"c_gain_ratio_10", Kind::kFloat, 2, kAll},
    {"r_gain_ratio_8", Kind::kFloat, 8, kAll},
    {"r_gain_ratio_9", Kind::kFloat, 4, kAll},
    {"r_gain_ratio_10", Kind::kFloat, 2, kAll},
    {"g_gain_ratio_8", Kind::kFloat, 8, kAll},
    {"g_gain_ratio_9", Kind::kFloat, 4, kAll},
    {"g_gain_ratio_10", Kind::kFloat, 2, kAll},
    {"b_gain_ratio_8", Kind::kFloat, 8, kAll},
    {"b_gain_ratio_9", Kind::kFloat, 4, kAll},
    {"b_gain_ratio_10", Kind::kFloat, 2, kAll},
    {"delay", Kind::kFloat, 0, kAll},
    {"c_coeff", Kind::kFloat, 1, kUnderDisplay, kAll},
    {"r_coeff", Kind::kFloat, -0.711F, kUnderDisplay},
    {"g_coeff", Kind::kFloat, 1.729F, kUnderDisplay},
    {"b_coeff", Kind::kFloat, -1.999F, kUnderDisplay},
    {"pwm_boundary", Kind::kFloat, 60, only(DeviceType::t5h5) | only(DeviceType::whiskel)},
    {"pwm_boundary", Kind::kFloat, 0, only(DeviceType::rufael)},
    {"pattern_w_c_coef0", Kind::kFloat, 0, kWithPattern},
    {"pattern_w_r_coef0", Kind::kFloat, 0, kWithPattern},
    {"pattern_w_g_coef0", Kind::kFloat, 0, kWithPattern},
    {"pattern_w_b_coef0", Kind::kFloat, 0, kWithPattern},
    {"pattern_w_c_coef1", Kind::kFloat, 1, kWithPattern},
    {"pattern_w_r_coef1", Kind::kFloat, 1, kWithPattern},
    {"pattern_w_g_coef1", Kind::kFloat, 1, kWithPattern},
    {"pattern_w_b_coef1", Kind::kFloat, 1, kWithPattern},
};

/// 0, or ssc::kInvalid after a level-0 message when the group lacks the item.
int restore(const Default& row, unsigned device, sns_registry_data* data) {
  const bool isSet = (row.devices & device) != 0;
  if (!isSet && (row.touchedDevices & device) == 0) return ssc::kOk;
  const int result = requireItem(row.item, *data);
  if (result != ssc::kOk) return result;
  if (!isSet) {
    ssc::RegistryUtil::GetIncrementedDataItem(row.item, data);
  } else if (row.kind == Kind::kInteger) {
    setIntItem(row.item, static_cast<std::int64_t>(row.value), data);
  } else {
    setFloatItem(row.item, row.value, data);
  }
  return ssc::kOk;
}

}  // namespace

int UdAlsCalibrator::Reset(const Arguments& arguments) {
  const unsigned device = only(arguments.deviceType);
  return RestoreDefaults([device](sns_registry_data* data) {
    for (const Default& row : kDefaults) {
      const int result = restore(row, device, data);
      if (result != ssc::kOk) return result;
    }
    return static_cast<int>(ssc::kOk);
  });
}
