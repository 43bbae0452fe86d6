#include <cmath>

#include <gtest/gtest.h>

#include "mag/BaroCalibrator.h"

namespace {

std::vector<Sample> samplesOf(std::initializer_list<float> pressures) {
  std::vector<Sample> samples;
  for (const float pressure : pressures) samples.emplace_back(0.0, &pressure, &pressure + 1);
  return samples;
}

TEST(BaroMeasurement, OfUncalibratedSamplesIsTheirOffsetFromTheReference) {
  const BaroMeasurement measurement = measureBaro(samplesOf({1013, 1014}), 1013.25F, 0);
  EXPECT_EQ(measurement.mean, 1013.5F);
  EXPECT_EQ(measurement.stdev, std::sqrt(0.5F));
  EXPECT_EQ(measurement.bias, 0.25F);
}

TEST(BaroMeasurement, OfCalibratedSamplesAddsTheBiasTheyAlreadyLack) {
  EXPECT_EQ(measureBaro(samplesOf({1013.5F}), 1013.25F, 2.5F).bias, 2.75F);
}

TEST(BaroMeasurement, SubtractsBeforeItAddsIn32BitFloat) {
  // 2^24 + 1 has no float: with the addition first, the bias would be lost.
  EXPECT_EQ(measureBaro(samplesOf({16777216}), 16777216.0F, 1).bias, 1.0F);
}

TEST(BaroMeasurement, OfASingleSampleHasNoDeviation) {
  EXPECT_TRUE(std::isnan(measureBaro(samplesOf({1013}), 1013, 0).stdev));
}

TEST(BaroMeasurement, OfAReadingThatIsNoNumberIsNoNumber) {
  EXPECT_TRUE(std::isnan(measureBaro(samplesOf({1013, std::nanf("")}), 1013, 0).bias));
}

}  // namespace
