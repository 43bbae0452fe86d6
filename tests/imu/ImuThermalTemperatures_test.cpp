#include "imu/ImuThermalTemperatures.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

Sample at(double time, float value = 0) {
  Sample sample;
  sample.time = time;
  sample.values = {value};
  return sample;
}

TemperatureVerdict judge(const std::vector<float>& temperatures) {
  std::vector<Sample> samples;
  for (const float temperature : temperatures) samples.push_back(at(0, temperature));
  return judgeTemperatures(temperatureSpan(samples));
}

TEST(JudgeTemperatures, ARiseOfSevenDegreesIsEnough) {
  EXPECT_EQ(judge({30.0F, 36.99F}), TemperatureVerdict::kRiseTooLow);
  EXPECT_EQ(judge({30.0F, 37.0F}), TemperatureVerdict::kGood);
}

TEST(JudgeTemperatures, SixtyDegreesAreNotTooHot) {
  EXPECT_EQ(judge({30.0F, 60.0F}), TemperatureVerdict::kGood);
  EXPECT_EQ(judge({30.0F, 60.01F}), TemperatureVerdict::kTooHot);
}

TEST(JudgeTemperatures, TheHottestMomentMayLieInBetween) {
  EXPECT_EQ(judge({30.0F, 61.0F, 45.0F}), TemperatureVerdict::kTooHot);
}

TEST(JudgeTemperatures, WarmingUpAndCoolingAgainIsNoRise) {
  EXPECT_EQ(judge({30.0F, 40.0F, 31.0F}), TemperatureVerdict::kRiseTooLow);
}

TEST(JudgeTemperatures, ARiseTooLowIsSaidBeforeAMaximumTooHigh) {
  EXPECT_EQ(judge({60.5F, 61.0F}), TemperatureVerdict::kRiseTooLow);
}

TEST(JudgeTemperatures, ASingleSampleIsNoRise) { EXPECT_EQ(judge({30.0F}), TemperatureVerdict::kRiseTooLow); }

TEST(InterpolateTemperatures, LieOnTheLineBetweenTheNeighbours) {
  const auto found =
      interpolateTemperatures({at(1), at(1.25), at(1.5), at(2.75)}, {at(1, 20), at(2, 24), at(3, 20)});
  EXPECT_EQ(found.first, 0U);
  EXPECT_THAT(found.values, ElementsAre(20.0F, 21.0F, 22.0F, 21.0F));
}

TEST(InterpolateTemperatures, SamplesBeforeTheFirstAndAfterTheLastTemperatureHaveNone) {
  const auto found =
      interpolateTemperatures({at(0), at(0.5), at(1), at(1.5), at(2.5), at(3)}, {at(1, 20), at(2, 24)});
  EXPECT_EQ(found.first, 2U);
  EXPECT_THAT(found.values, ElementsAre(20.0F, 22.0F));
}

TEST(InterpolateTemperatures, ASampleAtTheTimeOfAnEarlierTemperatureGetsExactlyThat) {
  const auto found =
      interpolateTemperatures({at(1), at(2), at(3)}, {at(1, 0.1F), at(2, 0.3F), at(3, 30.7F), at(4, 1)});
  EXPECT_THAT(found.values, ElementsAre(0.1F, 0.3F, 30.7F));
}

TEST(InterpolateTemperatures, ASampleAtTheTimeOfTheLastTemperatureHasNone) {
  EXPECT_THAT(interpolateTemperatures({at(1), at(2)}, {at(1, 20), at(2, 24)}).values, ElementsAre(20.0F));
}

TEST(InterpolateTemperatures, TheFirstSampleMayComeBetweenLaterTemperatures) {
  const auto found =
      interpolateTemperatures({at(2.5), at(2.75)}, {at(1, 20), at(2, 24), at(3, 28), at(4, 0)});
  EXPECT_EQ(found.first, 0U);
  EXPECT_THAT(found.values, ElementsAre(26.0F, 27.0F));
}

TEST(InterpolateTemperatures, SamplesOfTheSameTimeHaveTheSameTemperature) {
  const auto found = interpolateTemperatures({at(1.5), at(1.5), at(1.5)}, {at(1, 20), at(2, 24)});
  EXPECT_THAT(found.values, ElementsAre(22.0F, 22.0F, 22.0F));
}

TEST(InterpolateTemperatures, OfTemperaturesOfTheSameTimeTheLastCountsFromThenOn) {
  const auto found =
      interpolateTemperatures({at(1), at(1.5), at(2), at(2.5)}, {at(1, 20), at(2, 24), at(2, 30), at(3, 32)});
  EXPECT_THAT(found.values, ElementsAre(20.0F, 22.0F, 30.0F, 31.0F));
}

TEST(InterpolateTemperatures, OfTwoFirstTemperaturesOfTheSameTimeTheFirstSampleGetsTheFirst) {
  EXPECT_THAT(interpolateTemperatures({at(1), at(1)}, {at(1, 20), at(1, 21), at(2, 22)}).values,
              ElementsAre(20.0F, 21.0F));
}

TEST(InterpolateTemperatures, ASingleTemperatureServesOnlyItsOwnTime) {
  EXPECT_THAT(interpolateTemperatures({at(1), at(2)}, {at(1, 20)}).values, ElementsAre(20.0F));
  const auto none = interpolateTemperatures({at(0), at(2)}, {at(1, 20)});
  EXPECT_EQ(none.first, 1U);
  EXPECT_THAT(none.values, IsEmpty());
}

TEST(InterpolateTemperatures, WithoutTemperaturesOrSamplesThereAreNone) {
  EXPECT_THAT(interpolateTemperatures({at(1), at(2)}, {}).values, IsEmpty());
  EXPECT_EQ(interpolateTemperatures({at(1), at(2)}, {}).first, 2U);
  EXPECT_THAT(interpolateTemperatures({}, {at(1, 20)}).values, IsEmpty());
  const auto early = interpolateTemperatures({at(0), at(0.5)}, {at(1, 20), at(2, 24)});
  EXPECT_EQ(early.first, 2U);
  EXPECT_THAT(early.values, IsEmpty());
}

TEST(InterpolateTemperatures, TimesOutOfOrderStayWithinTheSamples) {
  const auto found = interpolateTemperatures({at(2.5), at(1.5), at(0.5), at(3.5)},
                                             {at(1, 20), at(3, 24), at(2, 30), at(4, 40)});
  EXPECT_EQ(found.first, 0U);
  EXPECT_THAT(found.values, ElementsAre(23.0F, 21.0F, 19.0F, 37.5F));
}

TEST(InterpolateTemperatures, AreRoundedToSinglePrecisionAtEachStep) {
  // Worked out apart from the program, each step rounded by hand; double precision gives other last bits.
  const auto found = interpolateTemperatures({at(86400.05), at(86400.1), at(86400.15)},
                                             {at(86400.0, 31.27F), at(86401.0, 31.36F)});
  EXPECT_THAT(found.values, ElementsAre(0x1.f4645ap+4F, 0x1.f476cap+4F, 0x1.f48938p+4F));
}

}  // namespace
