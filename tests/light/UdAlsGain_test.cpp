#include "light/UdAlsGain.h"

#include <limits>

#include <gtest/gtest.h>

#include "light/UdAlsRecords.h"

namespace {

SampleData step(float gain, float clear) {
  return makeUdAlsRecord({{kUdAlsMeanGain, gain}, {kUdAlsMeanClear, clear}});
}

GainMeans clearByGain(const std::vector<SampleData>& records) {
  return meansByGain(records, kUdAlsMeanClear);
}

TEST(MeansByGain, AreZeroWithoutARecord) {
  EXPECT_EQ(clearByGain({step(8, 100), step(11, 800)}), (GainMeans{100, 0, 0, 800}));
}

TEST(MeansByGain, AHalfRoundsUp) {
  EXPECT_EQ(clearByGain({step(9.4F, 1), step(9.5F, 2)}), (GainMeans{0, 1, 2, 0}));
  EXPECT_EQ(clearByGain({step(7.5F, 1), step(11.49F, 2)}), (GainMeans{1, 0, 0, 2}));
}

TEST(MeansByGain, TheLaterRecordOfAGainCounts) {
  EXPECT_EQ(clearByGain({step(10, 3), step(10, 4)}), (GainMeans{0, 0, 4, 0}));
}

TEST(MeansByGain, OtherGainsAreIgnored) {
  EXPECT_EQ(clearByGain({step(7.49F, 1), step(11.5F, 1), step(0, 1), step(-8, 1), step(1e30F, 1),
                         step(-1e30F, 1), step(std::numeric_limits<float>::quiet_NaN(), 1)}),
            GainMeans{});
}

TEST(MeansByGain, AreOfTheChannelThatIsAskedFor) {
  const SampleData record = makeUdAlsRecord({{kUdAlsMeanGain, 9},
                                             {kUdAlsMeanClear, 1},
                                             {kUdAlsMeanRed, 2},
                                             {kUdAlsMeanGreen, 3},
                                             {kUdAlsMeanBlue, 4},
                                             {kUdAlsMeanInfrared, 5}});
  EXPECT_EQ(meansByGain({record}, kUdAlsMeanRed)[1], 2.0F);
  EXPECT_EQ(meansByGain({record}, kUdAlsMeanGreen)[1], 3.0F);
  EXPECT_EQ(meansByGain({record}, kUdAlsMeanBlue)[1], 4.0F);
  EXPECT_EQ(meansByGain({record}, kUdAlsMeanInfrared)[1], 5.0F);
}

TEST(GainRatios, CompareWithTheHighestGain) {
  EXPECT_EQ(gainRatios({100, 210, 390, 800}), (GainRatios{8.0F, 800.0F / 210.0F, 800.0F / 390.0F}));
}

TEST(GainRatios, AreNominalWhereNothingWasRead) {
  EXPECT_EQ(gainRatios({100, 0, 0, 800}), (GainRatios{8, 4, 2}));
  EXPECT_EQ(gainRatios({0, -1, 400, 800}), (GainRatios{8, 4, 2}));
}

TEST(GainRatios, AreZeroInTheDarkAtTheHighestGain) {
  EXPECT_EQ(gainRatios({100, 200, 0, 0}), (GainRatios{0, 0, 2}));
}

}  // namespace
