#include "simhub/sensors/DisplayLight.h"

#include <cmath>

namespace simhub {

double triggeredShare(double offset, double period, double floor) {
  const double distance = 2 * std::remainder(offset, period) / period;
  return floor + (1 - floor) * distance * distance;
}

double untriggeredShare(double floor) { return floor + (1 - floor) / 3; }

double pulseShare(double brightness, double boundary) {
  if (!(brightness > 0) || !(brightness < boundary)) return 0;
  return (boundary - brightness) / boundary;
}

}  // namespace simhub
