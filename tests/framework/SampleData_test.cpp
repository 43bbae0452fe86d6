#include "framework/SampleData.h"

#include <cmath>
#include <limits>
#include <numeric>
#include <type_traits>

#include <gtest/gtest.h>

#include "framework/Sample.h"

namespace {

TEST(SampleDataSum, AnEmptyLeftOperandBecomesACopyOfTheRight) {
  EXPECT_EQ(SampleData() + SampleData({1, 2, 3}), SampleData({1, 2, 3}));
}

TEST(SampleDataSum, TheShorterLengthRulesAndTheLeftLengthIsKept) {
  EXPECT_EQ(SampleData({1, 2, 3}) + SampleData({10}), SampleData({11, 2, 3}));
  EXPECT_EQ(SampleData({1}) + SampleData({10, 20}), SampleData({11}));
  EXPECT_EQ(SampleData({1, 2}) + SampleData(), SampleData({1, 2}));
}

TEST(SampleDataSum, InPlaceFollowsTheSameRule) {
  SampleData sum;
  sum += {4, 5};
  EXPECT_EQ(sum, SampleData({4, 5}));
  sum += {1};
  EXPECT_EQ(sum, SampleData({5, 5}));
}

TEST(SampleDataSum, ASampleCountsByItsValues) {
  const SampleData one{1, 1};
  const SampleData ten{10, 20};
  EXPECT_EQ(one + Sample(3.5, ten.begin(), ten.end()), SampleData({11, 21}));
}

TEST(SampleDataSum, AListIsAccumulatedFromTheEmptyVector) {
  const std::vector<SampleData> list{{1, 2}, {10, 20}, {100, 200}};
  EXPECT_EQ(std::accumulate(list.begin(), list.end(), SampleData()), SampleData({111, 222}));
}

TEST(SampleDataSum, RunsIn32BitFloat) {
  const SampleData sum = SampleData{16777216.0F} + SampleData{1.0F};
  EXPECT_EQ(sum[0], 16777216.0F);
}

TEST(SampleDataDifference, AnEmptyLeftOperandStaysEmpty) {
  EXPECT_EQ(SampleData() - SampleData({1, 2}), SampleData());
}

TEST(SampleDataDifference, TheShorterLengthRulesAndTheLeftLengthIsKept) {
  EXPECT_EQ(SampleData({5, 6, 7}) - SampleData({1, 2}), SampleData({4, 4, 7}));
  EXPECT_EQ(SampleData({5}) - SampleData({1, 2}), SampleData({4}));
}

TEST(SampleDataProduct, AnEmptyLeftOperandBecomesZeros) {
  SampleData product;
  product *= {4, 5};
  EXPECT_EQ(product, SampleData({0, 0}));
}

TEST(SampleDataProduct, TheShorterLengthRulesAndTheRestIsUnchanged) {
  SampleData product{2, 3, 4};
  product *= {10, 10};
  EXPECT_EQ(product, SampleData({20, 30, 4}));
  SampleData squared{-3, 4};
  squared *= squared;
  EXPECT_EQ(squared, SampleData({9, 16}));
}

TEST(SampleDataFormat, RightAlignsEachElementBehindABlank) {
  EXPECT_EQ(SampleData({1, -0.5F}).format(9, 4), "    1.0000   -0.5000");
}

TEST(SampleDataFormat, UsesSixDigitsWhenNoPrecisionIsGiven) {
  EXPECT_EQ(SampleData({0.5F}).format(0, 0), " 0.500000");
  EXPECT_EQ(SampleData({0.5F}).format(0, -3), " 0.500000");
}

TEST(SampleDataFormat, OfNothingIsTheEmptyString) { EXPECT_EQ(SampleData().format(14, 6), ""); }

TEST(SampleDataFormat, ANumberWiderThanItsFieldIsNotCut) {
  EXPECT_EQ(SampleData({123456.75F}).format(3, 2), " 123456.75");
  const std::string longest = SampleData({-std::numeric_limits<float>::max()}).format(0, 60);
  EXPECT_EQ(longest.size(), 1U + 1U + 39U + 1U + 60U);
  EXPECT_EQ(longest.substr(0, 12), " -3402823466");
}

TEST(SampleDataFormat, SaysWhatIsNoNumber) {
  EXPECT_EQ(SampleData({std::nanf(""), INFINITY}).format(5, 1), "   nan   inf");
}

TEST(SampleDataStorage, KeepsItsValuesWhenItOutgrowsTheObject) {
  SampleData data;
  for (int i = 0; i < 9; ++i) data.push_back(static_cast<float>(i));
  ASSERT_EQ(data.size(), 9U);
  for (std::size_t i = 0; i < 9; ++i) EXPECT_EQ(data[i], static_cast<float>(i));
}

TEST(SampleDataStorage, CopiesAreIndependent) {
  for (const std::size_t length : {3U, 8U}) {
    SampleData original;
    original.resize(length);
    SampleData copy = original;
    copy[0] = 7;
    EXPECT_EQ(original[0], 0.0F);
    EXPECT_EQ(copy[0], 7.0F);
    original = copy;
    EXPECT_EQ(original, copy);
  }
}

TEST(SampleDataStorage, MovingEmptiesTheSource) {
  for (const std::size_t length : {3U, 8U}) {
    SampleData source;
    source.resize(length);
    SampleData target = std::move(source);
    EXPECT_EQ(target.size(), length);
    EXPECT_TRUE(source.empty());  // NOLINT: what moving leaves is part of the interface
    source = std::move(target);
    EXPECT_EQ(source.size(), length);
  }
}

TEST(SampleDataStorage, AssignmentReplacesLongByShortAndBack) {
  SampleData data{1, 2, 3, 4, 5, 6};
  data = SampleData{9};
  EXPECT_EQ(data, SampleData({9}));
  const SampleData longer{1, 2, 3, 4, 5, 6, 7};
  data = longer;
  EXPECT_EQ(data, longer);
}

TEST(SampleDataStorage, ResizingFillsWithZerosAndErasingClosesTheGap) {
  SampleData data{1, 2};
  data.resize(4);
  EXPECT_EQ(data, SampleData({1, 2, 0, 0}));
  data.erase(1);
  EXPECT_EQ(data, SampleData({1, 0, 0}));
  data.clear();
  EXPECT_TRUE(data.empty());
}

TEST(SampleDataStorage, TurnsIntoAVectorAndBack) {
  const std::vector<float> values{1, 2, 3, 4, 5};
  EXPECT_EQ(SampleData(values).toVector(), values);
}

TEST(SampleDataStorage, AStoredSampleOfFourValuesIsSmallAndMovesWithoutCopying) {
  // A growing vector holds the old and the new block for a moment: 80 bytes a sample at the peak allow 40 at
  // rest.
  EXPECT_LE(sizeof(Sample), 40U);
  EXPECT_TRUE(std::is_nothrow_move_constructible_v<Sample>);
}

}  // namespace
