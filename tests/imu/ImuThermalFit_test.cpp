#include "imu/ImuThermalFit.h"

#include <cmath>
#include <limits>
#include <random>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "framework/Statistics.h"

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

constexpr float kNan = std::numeric_limits<float>::quiet_NaN();

std::vector<Sample> samplesOf(const std::vector<SampleData>& readings) {
  std::vector<Sample> samples(readings.size());
  for (std::size_t i = 0; i < readings.size(); ++i) samples[i].values = readings[i];
  return samples;
}

/// One-axis readings of a line.
std::vector<Sample> onLine(float scale, float bias, const std::vector<float>& temperatures) {
  std::vector<Sample> samples(temperatures.size());
  for (std::size_t i = 0; i < samples.size(); ++i) samples[i].values = {bias + scale * temperatures[i]};
  return samples;
}

/// The accelerometer of a handset that warms up by three degrees.
const std::vector<float> kWarmUp{30.11F, 30.52F, 30.98F, 31.47F, 31.93F, 32.36F, 32.81F, 33.42F};
const std::vector<SampleData> kReadings{{0.0213F, -0.1507F, 9.8121F}, {0.0229F, -0.1521F, 9.8133F},
                                        {0.0240F, -0.1519F, 9.8151F}, {0.0262F, -0.1540F, 9.8172F},
                                        {0.0281F, -0.1552F, 9.8180F}, {0.0290F, -0.1549F, 9.8202F},
                                        {0.0308F, -0.1571F, 9.8214F}, {0.0331F, -0.1588F, 9.8240F}};

TEST(FitThermal, FindsALineExactly) {
  const std::vector<float> temperatures{20, 24, 28, 32};
  const ThermalFit fit = fitThermal(onLine(0.5F, 2, temperatures), temperatures, 1);
  EXPECT_THAT(fit.scale, ElementsAre(0.5F));
  EXPECT_THAT(fit.bias, ElementsAre(2.0F));
  EXPECT_THAT(fit.residualStdev, ElementsAre(0.0F));
  EXPECT_THAT(uncorrelatedAxes(fit), IsEmpty());
}

TEST(FitThermal, IsTheSameToTheLastBit) {
  // Worked out apart from the program, each operation rounded to single precision in the samples' order.
  const ThermalFit fit = fitThermal(samplesOf(kReadings), kWarmUp, 3);
  EXPECT_THAT(fit.scale, ElementsAre(0x1.d0e698p-9F, -0x1.3441d4p-9F, 0x1.d3ff58p-9F));
  EXPECT_THAT(fit.bias, ElementsAre(-0x1.5e41ecp-4F, -0x1.46cc94p-4F, 0x1.368b12p+3F));
  EXPECT_THAT(fit.stdev, ElementsAre(0x1.0a8092p-8F, 0x1.685104p-9F, 0x1.0c6e5cp-8F));
  EXPECT_THAT(fit.residualStdev, ElementsAre(0x1.e95680p-13F, 0x1.243d46p-11F, 0x1.1de76ap-12F));
}

TEST(FitThermal, TakesTheFirstAxesOnly) {
  std::vector<SampleData> longer = kReadings;
  for (SampleData& reading : longer) {
    for (const float surplus : {1.0F, kNan, 3.0F}) reading.push_back(surplus);
  }
  EXPECT_EQ(fitThermal(samplesOf(longer), kWarmUp, 3).scale,
            fitThermal(samplesOf(kReadings), kWarmUp, 3).scale);
  const ThermalFit first = fitThermal(samplesOf(longer), kWarmUp, 1);
  EXPECT_THAT(first.scale, ElementsAre(0x1.d0e698p-9F));
  EXPECT_THAT(fitThermal(samplesOf(kReadings), kWarmUp, 2).bias,
              ElementsAre(-0x1.5e41ecp-4F, -0x1.46cc94p-4F));
}

TEST(FitThermal, TheSpreadIsThatOfTheFrameworksStatistics) {
  std::mt19937 generator(7);
  std::normal_distribution<float> noise(9.8F, 0.01F);
  std::vector<SampleData> readings(1000);
  std::vector<float> temperatures;
  for (std::size_t i = 0; i < readings.size(); ++i) {
    readings[i] = {noise(generator), noise(generator), noise(generator)};
    temperatures.push_back(25 + 0.01F * static_cast<float>(i));
  }
  const std::vector<Sample> samples = samplesOf(readings);
  EXPECT_EQ(fitThermal(samples, temperatures, 3).stdev, sampleStdev(samples, sampleDataMean(samples)));
}

TEST(FitThermal, TwoSamplesGiveTheLineThroughBoth) {
  const ThermalFit fit = fitThermal(samplesOf({{1.0F}, {3.0F}}), {10, 14}, 1);
  EXPECT_THAT(fit.scale, ElementsAre(0.5F));
  EXPECT_THAT(fit.bias, ElementsAre(-4.0F));
}

TEST(FitThermal, AtConstantTemperatureNothingIsANumberAndNoAxisIsUncorrelated) {
  const ThermalFit fit = fitThermal(samplesOf({{1.0F, 2.0F, 3.0F}, {1.5F, 2.0F, 2.0F}}), {30, 30}, 3);
  for (std::size_t axis = 0; axis < 3; ++axis) {
    EXPECT_TRUE(std::isnan(fit.scale[axis]));
    EXPECT_TRUE(std::isnan(fit.bias[axis]));
  }
  EXPECT_THAT(uncorrelatedAxes(fit), IsEmpty());
}

TEST(FitThermal, AnAxisThatIsNotANumberLeavesTheOthersAlone) {
  std::vector<SampleData> readings = kReadings;
  readings[3][1] = kNan;
  const ThermalFit fit = fitThermal(samplesOf(readings), kWarmUp, 3);
  EXPECT_EQ(fit.scale[0], 0x1.d0e698p-9F);
  EXPECT_TRUE(std::isnan(fit.scale[1]));
  EXPECT_EQ(fit.scale[2], 0x1.d3ff58p-9F);
}

TEST(UncorrelatedAxes, AreThoseThatTheLineLeavesMoreScattered) {
  ThermalFit fit;
  fit.stdev = {1.0F, 1.0F, 0.5F};
  fit.residualStdev = {1.0F, 0.5F, std::nextafter(0.5F, 1.0F)};
  EXPECT_THAT(uncorrelatedAxes(fit), ElementsAre(2U));
}

TEST(UncorrelatedAxes, ComeOfRoundingAlone) {
  // Readings that jitter without any slope: in exact arithmetic a line through them leaves no more scatter
  // than there was. The last bits say otherwise for the second axis.
  std::vector<SampleData> readings;
  std::vector<float> temperatures;
  for (int i = 0; i < 1000; ++i) {
    temperatures.push_back(30 + 0.0173F * static_cast<float>(i));
    const int jitter = i * 29;
    readings.push_back({9.8F + 0.001F * static_cast<float>(jitter % 13 - 6),
                        0.125F + 0.001F * static_cast<float>(jitter % 17 - 8),
                        0.02F + 0.001F * static_cast<float>(jitter % 11 - 5)});
  }
  const ThermalFit fit = fitThermal(samplesOf(readings), temperatures, 3);
  EXPECT_THAT(uncorrelatedAxes(fit), ElementsAre(1U));
  EXPECT_NEAR(fit.residualStdev[1], fit.stdev[1], 1e-8F);
}

TEST(IsConstantTemperature, OnlyWhenAllAreTheSame) {
  EXPECT_TRUE(isConstantTemperature({30, 30, 30}));
  EXPECT_TRUE(isConstantTemperature({}));
  EXPECT_FALSE(isConstantTemperature({30, 30, std::nextafter(30.0F, 31.0F)}));
  EXPECT_FALSE(isConstantTemperature({kNan, kNan}));
}

TEST(MergeWithPrevious, AddsTheScalesAndShrinksTheBias) {
  SampleData scale{0.25F, 0.5F, -0.25F};
  SampleData bias{2, 4, 8};
  mergeWithPrevious({0.5F, 0.25F, -1.0F}, &scale, &bias);
  EXPECT_THAT(scale, ElementsAre(0.75F, 0.75F, -1.25F));
  EXPECT_THAT(bias, ElementsAre(1.0F, 3.0F, 16.0F));
}

TEST(MergeWithPrevious, ChangesNothingWithoutAPreviousScale) {
  SampleData scale{0.25F, 0.5F, -0.25F};
  SampleData bias{2, 4, 8};
  mergeWithPrevious({}, &scale, &bias);
  EXPECT_THAT(scale, ElementsAre(0.25F, 0.5F, -0.25F));
  EXPECT_THAT(bias, ElementsAre(2.0F, 4.0F, 8.0F));
}

TEST(MergeWithPrevious, LeavesAxesThatThePreviousScaleDoesNotHave) {
  SampleData scale{0.25F, 0.5F, -0.25F};
  SampleData bias{2, 4, 8};
  mergeWithPrevious({0.5F}, &scale, &bias);
  EXPECT_THAT(scale, ElementsAre(0.75F, 0.5F, -0.25F));
  EXPECT_THAT(bias, ElementsAre(1.0F, 4.0F, 8.0F));
}

TEST(MergeWithPrevious, AnEmptyScaleBecomesThePreviousOne) {
  SampleData scale;
  SampleData bias;
  mergeWithPrevious({0.5F, 0.25F}, &scale, &bias);
  EXPECT_THAT(scale, ElementsAre(0.5F, 0.25F));
  EXPECT_THAT(bias, IsEmpty());
}

}  // namespace
