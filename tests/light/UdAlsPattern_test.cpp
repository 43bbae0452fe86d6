#include "light/UdAlsPattern.h"

#include <gtest/gtest.h>

#include "light/UdAlsRecords.h"

namespace {

SampleData step(float brightness, float red, float green) {
  return makeUdAlsRecord({{kUdAlsBrightness, brightness}, {kUdAlsMeanRed, red}, {kUdAlsMeanGreen, green}});
}

TEST(FitPattern, IsTheLineOfTheChannelOverTheBrightness) {
  const std::vector<SampleData> records{step(0, 1, 10), step(100, 51, 8), step(200, 101, 6)};
  SampleData line;
  EXPECT_TRUE(fitPattern(records, kUdAlsMeanRed, &line));
  EXPECT_EQ(line, SampleData({1, 0.5F}));
  EXPECT_TRUE(fitPattern(records, kUdAlsMeanGreen, &line));
  EXPECT_EQ(line, SampleData({10, -0.02F}));
}

TEST(FitPattern, NeedsTwoBrightnesses) {
  SampleData line{7};
  EXPECT_FALSE(fitPattern({step(100, 1, 1), step(100, 2, 2)}, kUdAlsMeanRed, &line));
  EXPECT_FALSE(fitPattern({}, kUdAlsMeanRed, &line));
  EXPECT_EQ(line, SampleData({7}));
}

}  // namespace
