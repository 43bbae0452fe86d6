#include "light/LuxScale.h"

#include <cmath>
#include <limits>

#include "framework/Statistics.h"

LuxMeasurement measureLux(const std::vector<Sample>& samples) {
  LuxMeasurement measurement;
  measurement.mean = sampleFloatMean(samples);
  measurement.stdev = sampleStdev(samples, measurement.mean);
  return measurement;
}

void correctLux(float factor, std::vector<Sample>* samples) {
  for (Sample& sample : *samples) {
    if (!sample.values.empty()) sample.values[0] *= factor;
  }
}

float luxScale(float previousScale, float referenceLux, float meanLux) {
  return previousScale * referenceLux / meanLux;
}

float luxDifferencePercent(float meanLux, float referenceLux) {
  const float difference = (meanLux - referenceLux) * 100.0F / referenceLux;
  // 0/0 is a negative not-a-number on x86 and a positive one on the handset: printed, they would differ.
  return std::isnan(difference) ? std::numeric_limits<float>::quiet_NaN() : difference;
}

bool isWithinTolerance(float differencePercent, float tolerancePercent) {
  return !(std::fabs(differencePercent) > tolerancePercent);
}
