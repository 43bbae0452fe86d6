#include "light/ColorFit.h"

#include <cmath>
#include <limits>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "light/ColorRecord.h"

namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using testing::Pair;

constexpr float kInfinity = std::numeric_limits<float>::infinity();
constexpr float kNan = std::numeric_limits<float>::quiet_NaN();

/// A record of the channels that ratios are made of.
SampleData record(float clear, float red, float blue) { return {1000, 4000, 500, 0, clear, red, blue, 0, 4}; }

SampleData irOnly(float ir, float gain, float red = 300, float blue = 500) {
  return {0, 0, 0, 0, 0, red, blue, ir, gain};
}

SampleData withGain(float clear, float gain) {
  SampleData made = record(clear, 1, 1);
  made[color_record::kGain] = gain;
  return made;
}

TEST(IrCrosstalk, IsTheMeanOfRedAndBlueInProportionToTheInfrared) {
  EXPECT_EQ(irCrosstalk(irOnly(5000, 4)), 0.08F);
  EXPECT_EQ(irCrosstalk(irOnly(3, 4, 1, 1)), 1.0F / 3.0F);
}

TEST(IrRatio, CountsTheInfraredAtTheOthersGain) {
  EXPECT_EQ(irRatio(irOnly(100, 4), withGain(50, 4)), 2.0F);
  EXPECT_EQ(irRatio(irOnly(100, 4), withGain(50, 7)), 16.0F);
  EXPECT_EQ(irRatio(irOnly(100, 7), withGain(50, 4)), 0.25F);
}

TEST(IrRatio, OnlyWholeStepsOfTheGainCount) {
  EXPECT_EQ(irRatio(irOnly(100, 4), withGain(50, 5.9F)), 4.0F);
  EXPECT_EQ(irRatio(irOnly(100, 4), withGain(50, 2.1F)), 1.0F);
}

TEST(IrRatio, NeedsClearLight) {
  EXPECT_EQ(irRatio(irOnly(100, 4), withGain(0, 4)), std::nullopt);
  EXPECT_EQ(irRatio(irOnly(100, 4), withGain(-1, 4)), std::nullopt);
  EXPECT_EQ(irRatio(irOnly(100, 4), withGain(kNan, 4)), std::nullopt);
}

TEST(IrRatio, OfAGainThatNoSensorHasIsNoUsableNumberButNoHarm) {
  EXPECT_EQ(irRatio(irOnly(100, 0), withGain(50, 3e38F)), kInfinity);
  EXPECT_EQ(irRatio(irOnly(100, 3e38F), withGain(50, 0)), 0.0F);
  EXPECT_TRUE(std::isnan(*irRatio(irOnly(100, kNan), withGain(50, 0))));
}

TEST(LuxScale, OfRecordsIsTheMeanOfTheirScales) {
  SampleData second = record(1, 0, 0);
  second[color_record::kReferenceLux] = 1500;
  EXPECT_EQ(meanLuxScale({record(1, 0, 0), second}), 2.5F);
  SampleData dark = record(1, 0, 0);
  dark[color_record::kLux] = 0;
  EXPECT_EQ(meanLuxScale({dark}), kInfinity);
}

TEST(BmScale, WeighsTheLuxByTheClearLightWithoutRed) {
  EXPECT_EQ(meanBmScale({record(1000, 500, 0)}), 4.0F);                      // half of it
  EXPECT_EQ(meanBmScale({record(1000, 500, 0), record(1000, 0, 0)}), 3.0F);  // and all of it
  EXPECT_EQ(meanBmScale({record(1000, 1000, 0)}), kInfinity);                // nothing but red
  EXPECT_TRUE(std::isnan(meanBmScale({record(0, 0, 0)})));
  EXPECT_FALSE(std::signbit(meanBmScale({record(0, 0, 0)})));
}

TEST(BmScale, MultipliesBeforeItDivides) {
  EXPECT_EQ(meanBmScale({record(15, 11, 0)}), 1000.0F / (4.0F * 500.0F / 15.0F));
  ASSERT_NE(1000.0F / (4.0F * 500.0F / 15.0F), 1000.0F / (4.0F / 15.0F * 500.0F));
}

TEST(ColorPoints, OfBlueAndRedNeedRed) {
  EXPECT_THAT(blueRedPoints({record(1000, 200, 100), record(1000, 0, 100), record(1000, -1, 100)}),
              ElementsAre(Pair(0.5F, 4000.0F)));
  EXPECT_THAT(blueRedPoints({record(1000, kNan, 100)}), IsEmpty());
}

TEST(ColorPoints, OfTheOthersNeedAtLeastAsMuchClearAsRedAndMoreThanBlue) {
  EXPECT_THAT(minusBlueRedPoints({record(1000, 200, 600)}), ElementsAre(Pair(2.0F, 4000.0F)));
  EXPECT_THAT(minusBlueRedPoints({record(1000, 1000, 600)}), ElementsAre(Pair(0.0F, 4000.0F)));  // C = R
  EXPECT_THAT(minusBlueRedPoints({record(1000, 1000.5F, 600)}), IsEmpty());                      // C < R
  EXPECT_THAT(minusBlueRedPoints({record(1000, 200, 1000)}), IsEmpty());                         // C = B
  EXPECT_THAT(minusBlueRedPoints({record(1000, 200, 1001)}), IsEmpty());                         // C < B
}

TEST(ColorPoints, OfBlueAndClearNeedClear) {
  EXPECT_THAT(blueClearPoints({record(1000, 0, 250), record(0, 0, 1), record(-1, 0, 1)}),
              ElementsAre(Pair(0.25F, 4000.0F)));
}

TEST(ColorPoints, KeepTheOrderOfTheRecords) {
  std::vector<SampleData> records{record(1000, 100, 100), record(1000, 200, 100)};
  records[1][color_record::kReferenceCct] = 2000;
  EXPECT_THAT(blueRedPoints(records), ElementsAre(Pair(1.0F, 4000.0F), Pair(0.5F, 2000.0F)));
}

Sample reading(float red, float blue) {
  const std::vector<float> values{7, 1000, red, 1, blue, 0, 4};
  return {0.0, values.begin(), values.end()};
}

TEST(ConvertToCct, PutsTheLineInTheFirstValue) {
  std::vector<Sample> readings{reading(200, 100), reading(100, 100)};
  EXPECT_TRUE(convertToCct(1000, 4000, &readings));
  EXPECT_EQ(readings[0].values[0], 3000);
  EXPECT_EQ(readings[1].values[0], 5000);
  EXPECT_EQ(readings[1].values[1], 1000);
}

TEST(ConvertToCct, MultipliesBeforeItDivides) {
  std::vector<Sample> readings{reading(49, 1)};
  EXPECT_TRUE(convertToCct(0, 7, &readings));
  EXPECT_EQ(readings[0].values[0], 7.0F / 49.0F);
  ASSERT_NE(7.0F / 49.0F, 7.0F * (1.0F / 49.0F));
}

TEST(ConvertToCct, StopsAtAReadingWithoutRed) {
  for (const float red : {0.0F, -5.0F}) {
    std::vector<Sample> readings{reading(200, 100), reading(red, 100), reading(200, 100)};
    EXPECT_FALSE(convertToCct(1000, 4000, &readings));
    EXPECT_EQ(readings[0].values[0], 3000);
    EXPECT_EQ(readings[1].values[0], 7);
    EXPECT_EQ(readings[2].values[0], 7);
  }
}

TEST(ConvertToCct, ARedThatIsNotANumberShowsInTheResult) {
  std::vector<Sample> readings{reading(kNan, 100), reading(200, 100)};
  EXPECT_TRUE(convertToCct(1000, 4000, &readings));
  EXPECT_TRUE(std::isnan(readings[0].values[0]));
  EXPECT_EQ(readings[1].values[0], 3000);
}

}  // namespace
