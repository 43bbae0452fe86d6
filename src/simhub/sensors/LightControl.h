// How the light sensor under the display is set, and the requests that set it.
#pragma once

#include <vector>

#include "simhub/Sensor.h"

namespace simhub {

inline constexpr int kHighestGain = 11;  // settings are 0 to this, each about twice the one below

struct LightControl {
  double ownIntegrationUs = 0;  ///< what stands for an integration time of 0
  double integrationUs = 0;
  bool autoGain = true;     ///< the sensor takes the highest gain that the light allows
  int gain = kHighestGain;  ///< the setting in force
  bool triggered = true;    ///< integrations are tied to the display's refresh
  double delayMs = -1;      ///< from the trigger to the integration; negative: the registry's
};

/// Carries out one of the sensor's own requests (7800 to 7814) and adds its answer. A request that asks for
/// what cannot be set, that cannot be decoded or that is to be refused is answered with failure and changes
/// nothing. A negative gain or integration time leaves the one in force. Setting a gain ends automatic gain;
/// a delay calibration triggers as well. False: no request of this sensor.
[[nodiscard]] bool controlLight(const SensorRequest& request, LightControl* control,
                                std::vector<SensorAnswer>* answers);

}  // namespace simhub
