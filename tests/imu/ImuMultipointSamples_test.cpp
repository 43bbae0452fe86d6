#include "imu/ImuMultipointSamples.h"

#include <array>
#include <cmath>
#include <limits>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace {

using testing::ElementsAre;
using testing::SizeIs;

constexpr float kNan = std::numeric_limits<float>::quiet_NaN();

Sample sampleAt(double time, std::initializer_list<float> values) {
  return {time, values.begin(), values.end()};
}

// Phases.

TEST(ImuPhase, IsSensorSignAndAxis) {
  const auto phase = parseImuPhase("a-y");
  ASSERT_TRUE(phase);
  EXPECT_TRUE(phase->stationary);
  EXPECT_FALSE(phase->positive);
  EXPECT_EQ(phase->axis, 1U);
  EXPECT_FALSE(parseImuPhase("g+z")->stationary);
}

TEST(ImuPhase, TakesANegativeRotation) { EXPECT_TRUE(parseImuPhase("g-x")); }

TEST(ImuPhase, TakesNothingElse) {
  for (const char* text : {"", "a", "a+", "a+xx", "b+x", "a*x", "a+w", "A+x", " a+x"}) {
    EXPECT_FALSE(parseImuPhase(text)) << text;
  }
}

// The pose.

TEST(Pose, LyingOnItsFaceLoadsNegativeZ) {
  const ImuPhase faceDown = *parseImuPhase("a-z");
  EXPECT_FALSE(axisOutOfPose(faceDown, {0.1F, -0.2F, -9.8F}));
  EXPECT_EQ(axisOutOfPose(faceDown, {0.1F, -0.2F, 9.8F}), 2U);
}

TEST(Pose, AxesAreExaminedInTheirOrder) {
  EXPECT_EQ(axisOutOfPose(*parseImuPhase("a+y"), {3.3F, 99.0F, 0.0F}), 0U);
  EXPECT_EQ(axisOutOfPose(*parseImuPhase("a+y"), {3.1F, 99.0F, 99.0F}), 1U);
}

// A float that is not below, or not above, a double.
float atOrAbove(double limit) {
  const auto rounded = static_cast<float>(limit);
  return static_cast<double>(rounded) >= limit ? rounded : std::nextafter(rounded, 1e9F);
}
float below(double limit) { return std::nextafter(atOrAbove(limit), -1e9F); }

TEST(Pose, TheLoadedAxisHasABandThatHoldsItsBounds) {
  const ImuPhase up = *parseImuPhase("a+x");
  const ImuPhase down = *parseImuPhase("a-x");
  EXPECT_FALSE(axisOutOfPose(up, {atOrAbove(7.52), 0, 0}));
  EXPECT_EQ(axisOutOfPose(up, {below(7.52), 0, 0}), 0U);
  EXPECT_FALSE(axisOutOfPose(up, {std::nextafter(12.75F, 0.0F), 0, 0}));
  EXPECT_EQ(axisOutOfPose(up, {12.75F, 0, 0}), 0U);
  EXPECT_FALSE(axisOutOfPose(down, {-atOrAbove(7.52), 0, 0}));
  EXPECT_EQ(axisOutOfPose(down, {-12.75F, 0, 0}), 0U);
  EXPECT_EQ(kLoadedAxisMax, std::nextafter(12.75, 0.0));
}

TEST(Pose, TheOtherAxesMayReachTheirLimit) {
  const ImuPhase up = *parseImuPhase("a+z");
  EXPECT_FALSE(axisOutOfPose(up, {below(3.2), -below(3.2), 9.8F}));
  EXPECT_EQ(axisOutOfPose(up, {3.2001F, 0, 9.8F}), 0U);
  EXPECT_EQ(axisOutOfPose(up, {0, -3.2001F, 9.8F}), 1U);
}

TEST(Pose, NotANumberIsInNoPose) {
  EXPECT_EQ(axisOutOfPose(*parseImuPhase("a+z"), {kNan, 0, 9.8F}), 0U);
  EXPECT_EQ(axisOutOfPose(*parseImuPhase("a+z"), {0, 0, kNan}), 2U);
}

// Outliers.

std::vector<Sample> quiet(int count) {
  std::vector<Sample> samples;
  for (int i = 0; i < count; ++i) {
    const float noise = i % 2 == 0 ? 0.01F : -0.01F;
    samples.push_back(sampleAt(i, {noise, 1 + noise, 9.8F + noise}));
  }
  return samples;
}

std::size_t removeCounting(std::vector<Sample>* samples, std::vector<float>* reported,
                           const OutlierRemoval& removal = OutlierRemoval()) {
  return removeOutliers(samples, removal, [reported](const Outlier& outlier) {
    reported->push_back(outlier.sample.values[0]);
  });
}

TEST(Outliers, QuietSamplesStay) {
  auto samples = quiet(200);
  std::vector<float> reported;
  EXPECT_EQ(removeCounting(&samples, &reported), 0U);
  EXPECT_THAT(samples, SizeIs(200));
  EXPECT_TRUE(reported.empty());
}

TEST(Outliers, OneOnAnyAxisGoesAndTheOrderStays) {
  auto samples = quiet(200);
  samples[50].values[2] = 99;
  std::vector<float> reported;
  EXPECT_EQ(removeCounting(&samples, &reported), 1U);
  ASSERT_THAT(samples, SizeIs(199));
  EXPECT_EQ(samples[49].time, 49);
  EXPECT_EQ(samples[50].time, 51);
}

TEST(Outliers, SmallOnesShowOnceTheLargeOnesAreGone) {
  auto samples = quiet(400);
  samples[10].values[0] = 100;
  samples[20].values[0] = 1;
  std::vector<float> reported;
  EXPECT_EQ(removeCounting(&samples, &reported), 2U);
  EXPECT_THAT(reported, ElementsAre(100, 1));
}

TEST(Outliers, RoundsAreLimited) {
  auto samples = quiet(400);
  samples[10].values[0] = 100;
  samples[20].values[0] = 1;
  std::vector<float> reported;
  EXPECT_EQ(removeCounting(&samples, &reported, {6, 1}), 1U);
  EXPECT_THAT(reported, ElementsAre(100));
}

TEST(Outliers, SixDeviationsAreStillAccepted) {
  // 36 zeros and one 37: mean 1, deviation sqrt((36 + 36²) / 36) = sqrt(37), and 36 / sqrt(37) is 5.918.
  std::vector<Sample> samples(36, sampleAt(0, {0}));
  samples.push_back(sampleAt(0, {37}));
  std::vector<float> reported;
  EXPECT_EQ(removeCounting(&samples, &reported), 0U);
  // With one zero more it is 6.0 less the last digits: (38 − 1) / sqrt(38) = 6.002.
  samples = std::vector<Sample>(37, sampleAt(0, {0}));
  samples.push_back(sampleAt(0, {38}));
  EXPECT_EQ(removeCounting(&samples, &reported), 1U);
}

TEST(Outliers, ExactlySixDeviationsAreStillAccepted) {
  // Of 73 samples with a sum of squares of 72 the deviation is 1.
  std::vector<Sample> samples(71, sampleAt(0, {0}));
  samples.push_back(sampleAt(0, {6}));
  samples.push_back(sampleAt(0, {-6}));
  std::vector<float> reported;
  EXPECT_EQ(removeCounting(&samples, &reported), 0U);
  samples.push_back(sampleAt(0, {0}));
  EXPECT_EQ(removeCounting(&samples, &reported), 2U);
  EXPECT_THAT(reported, ElementsAre(6, -6));
}

TEST(Outliers, AnotherNumberOfValuesGoes) {
  auto samples = quiet(20);
  samples[3].values = {0.01F, 1.0F};
  std::size_t expectedSize = 0;
  const std::size_t removed = removeOutliers(&samples, OutlierRemoval(), [&](const Outlier& outlier) {
    expectedSize = outlier.expectedSize;
    EXPECT_THAT(outlier.sample.values.toVector(), SizeIs(2));
  });
  EXPECT_EQ(removed, 1U);
  EXPECT_EQ(expectedSize, 3U);
}

TEST(Outliers, NothingOrOneOrEmptySamplesAreLeftAlone) {
  std::vector<float> reported;
  std::vector<Sample> none;
  EXPECT_EQ(removeCounting(&none, &reported), 0U);
  std::vector<Sample> one{sampleAt(0, {1, 2, 3})};
  EXPECT_EQ(removeCounting(&one, &reported), 0U);
  std::vector<Sample> withoutValues(5, sampleAt(0, {}));
  EXPECT_EQ(removeCounting(&withoutValues, &reported), 0U);
  EXPECT_THAT(withoutValues, SizeIs(5));
}

// Integration.

TEST(Integration, IsTheTrapezoidRule) {
  const MeasuredRotation measured =
      integrateRotation({sampleAt(10, {0, 1, -1}), sampleAt(10.5, {2, 1, -1}), sampleAt(11.5, {4, 1, -1})});
  EXPECT_THAT(measured.rotation.toVector(), ElementsAre(0.5F + 3.0F, 1.5F, -1.5F));
  EXPECT_EQ(measured.integrationTime, 1.5);
}

TEST(Integration, RunsInFloatInTheOrderOfTheSamples) {
  std::vector<Sample> samples;
  float expected = 0;
  float previous = 0;
  double previousTime = 0;
  for (int i = 0; i < 1000; ++i) {
    const double time = 100 + i * 0.0025;
    const float value = 0.1F * static_cast<float>(i % 7);
    if (i > 0) {
      const float halved = (previous + value) * 0.5F;
      expected = expected + halved * static_cast<float>(time - previousTime);
    }
    samples.push_back(sampleAt(time, {value, value, value}));
    previous = value;
    previousTime = time;
  }
  EXPECT_EQ(integrateRotation(samples).rotation[2], expected);
}

TEST(Integration, OneSampleIsNoRotation) {
  const MeasuredRotation measured = integrateRotation({sampleAt(5, {1, 2, 3})});
  EXPECT_TRUE(measured.rotation.empty());
  EXPECT_EQ(measured.integrationTime, 0);
  EXPECT_TRUE(integrateRotation({}).rotation.empty());
}

TEST(Integration, TimesThatRunBackwardsTurnBackwards) {
  const MeasuredRotation measured = integrateRotation({sampleAt(2, {1, 0, 0}), sampleAt(1, {1, 0, 0})});
  EXPECT_EQ(measured.rotation[0], -1);
  EXPECT_EQ(measured.integrationTime, -1);
}

// Steady rates.

/// Standing still, then a ramp up, `rate` about y from 1 s to 3 s, a ramp down.
std::vector<Sample> turn(float rate) {
  std::vector<Sample> samples;
  for (int i = 0; i <= 400; ++i) {
    const double time = i * 0.01;
    const double share = std::clamp(std::min(time - 0.5, 3.5 - time) / 0.5, 0.0, 1.0);
    samples.push_back(sampleAt(time, {0.01F, rate * static_cast<float>(share), -0.01F}));
  }
  return samples;
}

TEST(SteadyRate, IsTheMeanOverTheMiddleHalfOfTheFastSamples) {
  const SteadyRate steady = findSteadyRate(turn(-2), 0);
  EXPECT_EQ(steady.fault, SteadyRate::Fault::kNone);
  EXPECT_EQ(steady.axis, 1U);
  EXPECT_FLOAT_EQ(steady.rate[1], -2);
  EXPECT_NEAR(steady.rate[0], 0.01F, 1e-7);
  // Faster than the mean, 2 · 2.5 / 4.01, from the ramp at 0.82 s to the one at 3.18 s.
  EXPECT_NEAR(steady.start, 2 - 1.18 / 2, 0.011);
  EXPECT_NEAR(steady.end, 2 + 1.18 / 2, 0.011);
}

TEST(SteadyRate, AWindowIsCentredAndHoldsItsBounds) {
  std::vector<Sample> samples{sampleAt(0, {0, 0, 0}),  sampleAt(1, {9, 0, 0}),  sampleAt(2, {10, 0, 0}),
                              sampleAt(3, {11, 0, 0}), sampleAt(4, {10, 0, 0}), sampleAt(5, {9, 0, 0}),
                              sampleAt(6, {0, 0, 0})};
  const SteadyRate steady = findSteadyRate(samples, 2);
  EXPECT_EQ(steady.start, 2);
  EXPECT_EQ(steady.end, 4);
  EXPECT_FLOAT_EQ(steady.rate[0], (10 + 11 + 10) / 3.0F);
}

TEST(SteadyRate, ATieGoesToTheFirstAxis) {
  std::vector<Sample> samples;
  for (int i = 0; i < 10; ++i) {
    const float rate = i < 2 ? 0.0F : 1.0F;
    samples.push_back(sampleAt(i, {0, rate, -rate}));
  }
  EXPECT_EQ(findSteadyRate(samples, 0).axis, 1U);
}

TEST(SteadyRate, AQuarterOfTheRateIsStillSteady) {
  // Three samples in the window with a mean of 8: a fluctuation of 2 is a quarter.
  const auto withFluctuation = [](float half) {
    return std::vector<Sample>{sampleAt(0, {0, 0, 0}), sampleAt(1, {8 - half, 0, 0}), sampleAt(2, {8, 0, 0}),
                               sampleAt(3, {8 + half, 0, 0}), sampleAt(4, {0, 0, 0})};
  };
  EXPECT_EQ(findSteadyRate(withFluctuation(1), 10).fault, SteadyRate::Fault::kNone);
  const SteadyRate shaky = findSteadyRate(withFluctuation(1.001F), 10);
  EXPECT_EQ(shaky.fault, SteadyRate::Fault::kFluctuation);
  EXPECT_TRUE(shaky.windowFound);
}

TEST(SteadyRate, NoiseAroundZeroIsNoRotation) {
  std::vector<Sample> samples;
  for (int i = 0; i < 100; ++i) {
    const float noise = i % 2 == 0 ? 0.0021F : -0.002F;
    samples.push_back(sampleAt(i * 0.01, {noise, 0, 0}));
  }
  EXPECT_EQ(findSteadyRate(samples, 0).fault, SteadyRate::Fault::kFluctuation);
}

TEST(SteadyRate, SamplesWithoutThreeValuesAreAFault) {
  auto samples = turn(1);
  samples[7].values.resize(2);
  EXPECT_EQ(findSteadyRate(samples, 0).fault, SteadyRate::Fault::kTooFewValues);
}

TEST(SteadyRate, NoSampleInTheWindowIsAFault) {
  EXPECT_EQ(findSteadyRate({}, 0).fault, SteadyRate::Fault::kNoSamples);
  // All alike: none is faster than the mean.
  EXPECT_EQ(findSteadyRate(std::vector<Sample>(10, sampleAt(1, {1, 0, 0})), 0).fault,
            SteadyRate::Fault::kNoSamples);
  EXPECT_EQ(findSteadyRate(turn(2), -1).fault, SteadyRate::Fault::kNoSamples);
  EXPECT_EQ(findSteadyRate(turn(2), kNan).fault, SteadyRate::Fault::kNoSamples);
}

TEST(SteadyRate, TimesThatRunBackwardsLeaveNoWindow) {
  auto samples = turn(2);
  for (Sample& sample : samples) sample.time = -sample.time;
  EXPECT_EQ(findSteadyRate(samples, 0).fault, SteadyRate::Fault::kNoSamples);
}

// Text.

TEST(ArrayToString, PutsValuesInBrackets) {
  EXPECT_EQ(ArrayToString(SampleData{1, -0.5F, 1234567}, ""), "[ 1, -0.5, 1.23457e+06 ]");
  EXPECT_EQ(ArrayToString(std::array<double, 3>{1, 2, 3}, "  "), "  [ 1, 2, 3 ]");
  EXPECT_EQ(ArrayToString(SampleData(), "> "), "[empty]");
}

}  // namespace
