#include "light/LuxScale.h"

#include <cmath>
#include <limits>

#include <gtest/gtest.h>

namespace {

constexpr float kNan = std::numeric_limits<float>::quiet_NaN();
constexpr float kInfinity = std::numeric_limits<float>::infinity();

std::vector<Sample> samplesOf(std::initializer_list<float> luxes) {
  std::vector<Sample> samples;
  for (const float lux : luxes) samples.emplace_back(0.0, &lux, &lux + 1);
  return samples;
}

TEST(LuxScale, MeasuresMeanAndDeviation) {
  const LuxMeasurement measurement = measureLux(samplesOf({240, 250, 260}));
  EXPECT_EQ(measurement.mean, 250.0F);
  EXPECT_EQ(measurement.stdev, 10.0F);
}

TEST(LuxScale, OneSampleHasAMeanAndNoDeviation) {
  const LuxMeasurement measurement = measureLux(samplesOf({240}));
  EXPECT_EQ(measurement.mean, 240.0F);
  EXPECT_TRUE(std::isnan(measurement.stdev));
}

TEST(LuxScale, NoSamplesHaveNoMean) { EXPECT_TRUE(std::isnan(measureLux({}).mean)); }

TEST(LuxScale, CorrectsOnlyTheFirstValueOfEachSample) {
  const float values[] = {200.0F, 5000.0F};
  std::vector<Sample> samples{Sample(1.5, values, values + 2), Sample()};
  correctLux(1.25F, &samples);
  EXPECT_EQ(samples[0].values, (SampleData{250.0F, 5000.0F}));
  EXPECT_EQ(samples[0].time, 1.5);
  EXPECT_TRUE(samples[1].values.empty());
}

TEST(LuxScale, SensorThatReadsTooLittleGetsALargerScale) {
  EXPECT_EQ(luxScale(1000.0F, 300.0F, 240.0F), 1250.0F);
}

TEST(LuxScale, ScalesWhatIsAlreadyScaled) { EXPECT_EQ(luxScale(1250.0F, 300.0F, 375.0F), 1000.0F); }

TEST(LuxScale, MultipliesBeforeItDivides) {
  const float previous = 1250.0F;
  const float reference = 300.0F;
  const float mean = 250.2F;
  const float product = previous * reference;
  EXPECT_EQ(luxScale(previous, reference, mean), product / mean);
  // The other orders give other last bits for these numbers.
  const float ratio = reference / mean;
  EXPECT_NE(luxScale(previous, reference, mean), previous * ratio);
  const float perLux = previous / mean;
  EXPECT_NE(luxScale(previous, reference, mean), perLux * reference);
}

TEST(LuxScale, MultiplicationMayOverflowAndShows) {
  EXPECT_TRUE(std::isinf(luxScale(3e38F, 300.0F, 300.0F)));
}

TEST(LuxScale, DarkReferenceGivesScaleZero) { EXPECT_EQ(luxScale(1000.0F, 0.0F, 5.0F), 0.0F); }

TEST(LuxScale, DifferenceIsInPercentOfTheReference) {
  EXPECT_EQ(differencePercent(330.0F, 300.0F), 10.0F);
  EXPECT_EQ(differencePercent(150.0F, 300.0F), -50.0F);
}

TEST(LuxScale, DifferenceAtExactlyTheToleranceIsWithinIt) {
  EXPECT_TRUE(isWithinTolerance(differencePercent(330.0F, 300.0F), 10.0F));
  EXPECT_TRUE(isWithinTolerance(differencePercent(270.0F, 300.0F), 10.0F));
  EXPECT_FALSE(isWithinTolerance(std::nextafter(10.0F, 11.0F), 10.0F));
  EXPECT_FALSE(isWithinTolerance(std::nextafter(-10.0F, -11.0F), 10.0F));
}

TEST(LuxScale, LightUnderADarkReferenceIsOutOfTolerance) {
  EXPECT_EQ(differencePercent(5.0F, 0.0F), kInfinity);
  EXPECT_FALSE(isWithinTolerance(differencePercent(5.0F, 0.0F), 100.0F));
}

TEST(LuxScale, DarknessUnderADarkReferenceIsWithinTolerance) {
  EXPECT_TRUE(std::isnan(differencePercent(0.0F, 0.0F)));
  EXPECT_TRUE(isWithinTolerance(kNan, 1.0F));
}

}  // namespace
