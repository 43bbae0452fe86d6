#include "prox/ProximitySums.h"

#include <cmath>

#include <gtest/gtest.h>

namespace {

sns_proximity_event reading(std::uint32_t counts, bool isNear, const std::vector<float>& values) {
  sns_proximity_event event;
  event.set_proximity_event_type(isNear ? SNS_PROXIMITY_EVENT_TYPE_NEAR : SNS_PROXIMITY_EVENT_TYPE_FAR);
  event.set_raw_adc(counts);
  event.set_status(SNS_STD_SENSOR_SAMPLE_STATUS_ACCURACY_HIGH);
  for (const float value : values) event.add_data(value);
  return event;
}

TEST(ProximitySums, AddCountsOffsetAndExtension) {
  ProximitySums sums;
  sums.Add(reading(100, true, {60, 2}));
  sums.Add(reading(103, true, {61, 4, 1000}));
  EXPECT_EQ(sums.count, 2);
  EXPECT_EQ(sums.MeanRaw(), 101.5F);
  EXPECT_EQ(sums.MeanPoffset(), 60.5F);
  EXPECT_EQ(sums.MeanOre(), 3.0F);
}

TEST(ProximitySums, CountWhatAnEventLacksAs0) {
  ProximitySums sums;
  sums.Add(reading(100, true, {60, 2}));
  sums.Add(reading(100, true, {60}));
  sums.Add(reading(100, true, {}));
  EXPECT_EQ(sums.count, 3);
  EXPECT_EQ(sums.raw, 300.0F);
  EXPECT_EQ(sums.poffset, 120.0F);
  EXPECT_EQ(sums.ore, 2.0F);
}

TEST(ProximitySums, AreKeptIn32BitFloat) {
  ProximitySums sums;
  sums.Add(reading(16777216, true, {}));
  sums.Add(reading(1, true, {}));
  EXPECT_EQ(sums.raw, 16777216.0F);
}

TEST(ProximitySums, OfNothingHaveNoMean) { EXPECT_TRUE(std::isnan(ProximitySums().MeanRaw())); }

TEST(ProximitySums, MeanThatIsNoNumberHasNoSign) {
  // Opposite infinities add up to a negative one on x86 and a positive one on the handset.
  ProximitySums sums;
  sums.Add(reading(100, true, {INFINITY, -std::nanf("")}));
  sums.Add(reading(100, true, {-INFINITY, 2}));
  EXPECT_TRUE(std::isnan(sums.MeanPoffset()) && !std::signbit(sums.MeanPoffset()));
  EXPECT_TRUE(std::isnan(sums.MeanOre()) && !std::signbit(sums.MeanOre()));
}

TEST(ReadingLine, HasTimeCountsDistanceAndFurtherValues) {
  EXPECT_EQ(readingLine(reading(437, true, {60, 2}), 19'200'000 / 8, 5),
            "0.125000     437.000000       0.000000      60.000000       2.000000\n");
}

TEST(ReadingLine, OfAFarTargetHasTheRangesEnd) {
  EXPECT_EQ(readingLine(reading(3, false, {}), 19'200'000ULL * 100, 12.5F),
            "100.000000       3.000000      12.500000\n");
}

TEST(ReadingLine, HoldsTheLargestNumbers) {
  const std::string line = readingLine(reading(4294967295, false, {3.4e38F}), ~0ULL, -3.4e38F);
  EXPECT_EQ(line.find("4294967295.000000 -33999999"), line.find(' ') + 1);
  EXPECT_EQ(line.substr(0, line.find(' ')), "960767920505.705811");
  EXPECT_EQ(line.back(), '\n');
}

}  // namespace
