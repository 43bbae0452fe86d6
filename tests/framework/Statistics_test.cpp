#include "framework/Statistics.h"

#include <cmath>

#include <gtest/gtest.h>

namespace {

std::vector<Sample> samplesOf(const std::vector<SampleData>& values) {
  std::vector<Sample> samples;
  for (const SampleData& each : values) samples.emplace_back(0.0, each.begin(), each.end());
  return samples;
}

TEST(SampleFloatMean, TakesTheFirstValueOfEachSample) {
  EXPECT_EQ(sampleFloatMean(samplesOf({{1, 100}, {2, 100}, {6, 100}})), 3.0F);
}

TEST(SampleFloatMean, OfNothingIsNotANumber) { EXPECT_TRUE(std::isnan(sampleFloatMean({}))); }

TEST(SampleFloatMean, OfASampleWithoutValuesIsNotANumber) {
  EXPECT_TRUE(std::isnan(sampleFloatMean(samplesOf({{1}, {}}))));
}

TEST(SampleFloatMean, AddsIn32BitFloatInTheSamplesOrder) {
  // 2^24 + 1 is 2^24 in float, twice; in another order, or in double, the two ones would count.
  EXPECT_EQ(sampleFloatMean(samplesOf({{16777216}, {1}, {1}})), 16777216.0F / 3.0F);
  EXPECT_EQ(sampleFloatMean(samplesOf({{1}, {1}, {16777216}})), 16777218.0F / 3.0F);
}

TEST(SampleDataMean, IsElementWise) {
  EXPECT_EQ(sampleDataMean(samplesOf({{1, 10}, {3, 30}})), SampleData({2, 20}));
}

TEST(SampleDataMean, OfNothingIsEmpty) { EXPECT_TRUE(sampleDataMean({}).empty()); }

TEST(SampleDataMean, TheFirstSampleFixesTheDimension) {
  EXPECT_EQ(sampleDataMean(samplesOf({{2, 4}, {4, 8, 100}, {3}})), SampleData({3, 4}));
}

TEST(SampleDataMean, AddsIn32BitFloatInTheSamplesOrder) {
  EXPECT_EQ(sampleDataMean(samplesOf({{16777216}, {1}, {1}}))[0], 16777216.0F / 3.0F);
}

TEST(SampleStdev, OfTwoSamplesDividesByOne) {
  EXPECT_EQ(sampleStdev(samplesOf({{1}, {3}}), 2.0F), std::sqrt(2.0F));
}

TEST(SampleStdev, OfOneSampleIsNotANumber) {
  EXPECT_TRUE(std::isnan(sampleStdev(samplesOf({{5}}), 5.0F)));
  EXPECT_TRUE(std::isnan(sampleStdev(samplesOf({{5}}), SampleData({5}))[0]));
}

TEST(SampleStatistics, PrintNoSignOfWhatIsNotANumber) {
  EXPECT_FALSE(std::signbit(sampleFloatMean({})));
  const auto opposite = samplesOf({{INFINITY}, {-INFINITY}});
  EXPECT_TRUE(std::isnan(sampleDataMean(opposite)[0]));
  EXPECT_FALSE(std::signbit(sampleDataMean(opposite)[0]));
  EXPECT_FALSE(std::signbit(sampleStdev(samplesOf({{5}}), 5.0F)));
  EXPECT_FALSE(std::signbit(sampleStdev(samplesOf({{5}}), SampleData({5}))[0]));
}

TEST(SampleStdev, OfNothingIsZero) {
  EXPECT_EQ(sampleStdev(std::vector<Sample>{}, 1.0F), 0.0F);
  EXPECT_TRUE(sampleStdev(std::vector<Sample>{}, SampleData({1})).empty());
}

TEST(SampleStdev, OfVectorsIsElementWise) {
  const auto samples = samplesOf({{1, 10}, {3, 30}});
  EXPECT_EQ(sampleStdev(samples, SampleData({2, 20})), SampleData({std::sqrt(2.0F), std::sqrt(200.0F)}));
}

TEST(SampleStdev, OfVectorsTakesValuesBeyondTheMeanAsTheyAre) {
  const auto samples = samplesOf({{1, 3}, {3, 4}, {2}});
  EXPECT_EQ(sampleStdev(samples, SampleData({2})), SampleData({1, std::sqrt(25.0F / 2)}));
}

TEST(SampleStdev, OfVectorsTheFirstSampleFixesTheDimension) {
  EXPECT_EQ(sampleStdev(samplesOf({{1}, {3, 9}}), SampleData({2, 5})), SampleData({std::sqrt(2.0F)}));
}

TEST(SampleStdev, SumsSquaresIn32BitFloatInTheSamplesOrder) {
  EXPECT_EQ(sampleStdev(samplesOf({{4096}, {1}, {1}}), 0.0F), std::sqrt(16777216.0F / 2.0F));
  EXPECT_EQ(sampleStdev(samplesOf({{1}, {1}, {4096}}), 0.0F), std::sqrt(16777218.0F / 2.0F));
}

}  // namespace
