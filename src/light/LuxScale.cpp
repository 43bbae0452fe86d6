#include "light/LuxScale.h"

#include <cmath>

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

float differencePercent(float mean, float reference) {
  return withPlainNan((mean - reference) * 100.0F / reference);
}

bool isWithinTolerance(float percent, float tolerancePercent) {
  return !(std::fabs(percent) > tolerancePercent);
}
