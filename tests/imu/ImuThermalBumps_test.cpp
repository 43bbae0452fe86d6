#include "imu/ImuThermalBumps.h"

#include <cmath>
#include <limits>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace {

using Outcome = BumpSearch::Outcome;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::SizeIs;

constexpr float kRange = 0.1F;
constexpr float kThreshold = 0.01F;
constexpr float kNan = std::numeric_limits<float>::quiet_NaN();

Sample reading(float x, float y = 0, float z = 0) {
  Sample sample;
  sample.values = {x, y, z};
  return sample;
}

std::vector<Sample> still(std::size_t count) {
  return std::vector<Sample>(count, reading(0.1F, -0.2F, 9.8F));
}

/// Samples that lie still, then a step of one axis.
std::vector<Sample> step(std::size_t before, std::size_t after, float size) {
  std::vector<Sample> samples(before, reading(0));
  samples.insert(samples.end(), after, reading(size));
  return samples;
}

std::vector<std::uint64_t> binsOf(const BumpSearch& search) {
  std::vector<std::uint64_t> indices;
  for (const TemperatureBin& bin : search.bins) indices.push_back(bin.index);
  return indices;
}

TEST(FindBumpByTemperature, ASpanOfOneRangeMakesTwoGroups) {
  const BumpSearch search = findBumpByTemperature(still(2), {30.0F, 30.1F}, kRange, kThreshold);
  EXPECT_EQ(search.outcome, Outcome::kNone);
  EXPECT_THAT(binsOf(search), ElementsAre(0U, 1U));
  // Of numbers whose quotient is exactly one.
  EXPECT_EQ(findBumpByTemperature(step(1, 1, 5), {30.0F, 30.5F}, 0.5F, kThreshold).outcome, Outcome::kBump);
}

TEST(FindBumpByTemperature, ASpanOfLessThanOneRangeIsTooLittle) {
  EXPECT_EQ(findBumpByTemperature(step(1, 1, 5), {30.0F, 30.09F}, kRange, kThreshold).outcome,
            Outcome::kTooFewGroups);
}

TEST(FindBumpByTemperature, OneTemperatureOrNoneIsTooLittle) {
  EXPECT_EQ(findBumpByTemperature(still(1), {30.0F}, kRange, kThreshold).outcome, Outcome::kTooFewGroups);
  EXPECT_EQ(findBumpByTemperature({}, {}, kRange, kThreshold).outcome, Outcome::kTooFewGroups);
}

TEST(FindBumpByTemperature, TheHighestTemperatureFallsIntoTheLastGroup) {
  const BumpSearch search = findBumpByTemperature(still(3), {30.0F, 30.5F, 31.0F}, 0.25F, kThreshold);
  EXPECT_THAT(binsOf(search), ElementsAre(0U, 2U, 4U));
}

TEST(FindBumpByTemperature, AChangeUpToTheThresholdPasses) {
  EXPECT_EQ(findBumpByTemperature(step(1, 1, 0.0099F), {30, 31}, kRange, kThreshold).outcome, Outcome::kNone);
  EXPECT_EQ(findBumpByTemperature(step(1, 1, 0.01F), {30, 31}, kRange, kThreshold).outcome, Outcome::kNone);
  const BumpSearch bump = findBumpByTemperature(step(1, 1, 0.011F), {30, 31}, kRange, kThreshold);
  EXPECT_EQ(bump.outcome, Outcome::kBump);
  EXPECT_EQ(bump.jump, 0.011F);
}

TEST(FindBumpByTemperature, AFallCountsLikeARise) {
  const BumpSearch bump = findBumpByTemperature(step(1, 1, -0.011F), {30, 31}, kRange, kThreshold);
  EXPECT_EQ(bump.outcome, Outcome::kBump);
  EXPECT_EQ(bump.jump, -0.011F);
}

TEST(FindBumpByTemperature, TheFirstAxisThatJumpsIsReported) {
  const std::vector<Sample> samples{reading(0, 0, 0), reading(0.005F, 0.5F, 0.75F)};
  EXPECT_EQ(findBumpByTemperature(samples, {30, 31}, kRange, kThreshold).jump, 0.5F);
}

TEST(FindBumpByTemperature, ComparesMeans) {
  // Group 0: 0 and 0.02, group 1: 0.02: their means are 0.01 apart.
  const std::vector<Sample> samples{reading(0), reading(0.02F), reading(0.02F)};
  const BumpSearch search = findBumpByTemperature(samples, {30.0F, 30.05F, 30.15F}, kRange, kThreshold);
  EXPECT_EQ(search.outcome, Outcome::kNone);
  EXPECT_THAT(search.bins[0].mean, ElementsAre(0.01F, 0.0F, 0.0F));
}

TEST(FindBumpByTemperature, ComparesWithTheNearestGroupThatHasSamples) {
  // Slowly up over empty groups: no two neighbours are far apart, the first and the last are.
  const std::vector<Sample> samples{reading(0), reading(0.009F), reading(0.018F)};
  EXPECT_EQ(findBumpByTemperature(samples, {30, 35, 40}, kRange, kThreshold).outcome, Outcome::kNone);
}

TEST(FindBumpByTemperature, GroupsByTemperatureAndNotByTime) {
  // The same temperatures come again when the handset cools.
  const std::vector<Sample> samples{reading(0), reading(1), reading(1), reading(0)};
  EXPECT_EQ(findBumpByTemperature(samples, {30, 31, 31, 30}, 0.5F, 0.9F).outcome, Outcome::kBump);
  EXPECT_EQ(findBumpByTemperature(samples, {30, 31, 30, 31}, 0.5F, 0.9F).outcome, Outcome::kNone);
}

TEST(FindBumpByTemperature, NamesTheGroupsUpToTheBump) {
  const std::vector<Sample> samples{reading(0), reading(0), reading(1), reading(1)};
  EXPECT_THAT(binsOf(findBumpByTemperature(samples, {30, 31, 32, 33}, 1, kThreshold)),
              ElementsAre(0U, 1U, 2U));
}

TEST(FindBumpByTemperature, LeavesOutSamplesWithoutATemperature) {
  EXPECT_EQ(findBumpByTemperature(step(2, 5, 1), {30, 31}, kRange, kThreshold).outcome, Outcome::kNone);
  const BumpSearch search =
      findBumpByTemperature({reading(0), reading(9), reading(0)}, {30, kNan, 31}, kRange, kThreshold);
  EXPECT_EQ(search.outcome, Outcome::kNone);
  EXPECT_THAT(search.bins, SizeIs(2));
  const float infinity = std::numeric_limits<float>::infinity();
  EXPECT_EQ(findBumpByTemperature(still(2), {infinity, kNan}, kRange, kThreshold).outcome,
            Outcome::kTooFewGroups);
}

TEST(FindBumpByTemperature, AReadingThatIsNotANumberIsNoBump) {
  EXPECT_EQ(findBumpByTemperature(step(1, 1, kNan), {30, 31}, kRange, kThreshold).outcome, Outcome::kNone);
}

TEST(FindBumpByTemperature, EmptyGroupsMayBeAsManyAsThereAreNumbers) {
  const BumpSearch narrow = findBumpByTemperature(step(2, 1, 0.011F), {30, 30.5F, 40}, 1e-12F, kThreshold);
  EXPECT_EQ(narrow.outcome, Outcome::kBump);
  EXPECT_THAT(narrow.bins, SizeIs(3));
  EXPECT_EQ(narrow.bins[1].index, static_cast<std::uint64_t>(0.5F / 1e-12F));
  EXPECT_EQ(findBumpByTemperature(still(2), {0, std::nextafter(0x1p63F, 0.0F)}, 1, kThreshold).outcome,
            Outcome::kNone);
}

TEST(FindBumpByTemperature, MoreGroupsThanCanBeCountedAreRefused) {
  EXPECT_EQ(findBumpByTemperature(still(2), {0, 0x1p63F}, 1, kThreshold).outcome, Outcome::kTooManyGroups);
  EXPECT_EQ(findBumpByTemperature(still(2), {30, 40}, 1e-30F, kThreshold).outcome, Outcome::kTooManyGroups);
  EXPECT_EQ(
      findBumpByTemperature(still(2), {30, 40}, std::numeric_limits<float>::denorm_min(), kThreshold).outcome,
      Outcome::kTooManyGroups);
  EXPECT_EQ(findBumpByTemperature(still(2), {-3e38F, 3e38F}, kRange, kThreshold).outcome,
            Outcome::kTooManyGroups);
}

TEST(FindBumpByTime, NeedsTwoWholeGroups) {
  EXPECT_EQ(findBumpByTime(step(50, 49, 1), 50, kThreshold).outcome, Outcome::kTooFewGroups);
  EXPECT_EQ(findBumpByTime(step(50, 50, 1), 50, kThreshold).outcome, Outcome::kBump);
  EXPECT_EQ(findBumpByTime(still(99), std::numeric_limits<std::int32_t>::max(), kThreshold).outcome,
            Outcome::kTooFewGroups);
}

TEST(FindBumpByTime, IgnoresTheSamplesBehindTheLastWholeGroup) {
  EXPECT_EQ(findBumpByTime(step(100, 49, 1), 50, kThreshold).outcome, Outcome::kNone);
  EXPECT_EQ(findBumpByTime(step(100, 50, 1), 50, kThreshold).outcome, Outcome::kBump);
}

TEST(FindBumpByTime, ComparesEachGroupWithTheOneBefore) {
  std::vector<Sample> samples;
  for (int i = 0; i < 500; ++i) {
    const int group = i / 50;
    samples.push_back(reading(0.009F * static_cast<float>(group)));
  }
  EXPECT_EQ(findBumpByTime(samples, 50, kThreshold).outcome, Outcome::kNone);
}

TEST(FindBumpByTime, DividesTheDifferenceOfTheSums) {
  const BumpSearch bump = findBumpByTime(step(4, 4, 0.5F), 4, kThreshold);
  EXPECT_EQ(bump.jump, 0.5F);
  EXPECT_THAT(bump.bins, IsEmpty());
  EXPECT_EQ(findBumpByTime(step(4, 4, -0.011F), 4, kThreshold).outcome, Outcome::kBump);
  EXPECT_EQ(findBumpByTime(step(4, 4, 0.0099F), 4, kThreshold).outcome, Outcome::kNone);
}

TEST(FindBumpByTime, LooksAtTheFirstThreeValues) {
  std::vector<Sample> samples = still(4);
  for (Sample& sample : samples) sample.values.push_back(0);
  samples[3].values[3] = 100;
  EXPECT_EQ(findBumpByTime(samples, 1, kThreshold).outcome, Outcome::kNone);
}

}  // namespace
