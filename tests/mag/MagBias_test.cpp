#include "mag/MagBias.h"

#include <array>
#include <random>

#include <gtest/gtest.h>

namespace {

const Matrix3by3<float> kIdentity({1, 0, 0, 0, 1, 0, 0, 0, 1});
const Matrix3by3<float> kSingular({1, 2, 3, 2, 4, 6, 0, 0, 1});

/// What the driver makes of a raw reading: correction · (raw − bias).
SampleData driverOutput(const Matrix3by3<float>& correction, const SampleData& raw, const SampleData& bias) {
  return SampleData(correction * (raw - bias).toVector());
}

TEST(MagBias, OfARawMeanIsItsExcessOverTheReferenceWhereThereIsNoSoftIron) {
  EXPECT_EQ(biasOfRawMean({30, 5, -50}, kIdentity, {20, 0, -40}), (SampleData{10, 5, -10}));
}

TEST(MagBias, OfARawMeanTakesTheReferenceThroughTheInverseCorrection) {
  const Matrix3by3<float> correction({2, 0, 0, 0, 4, 0, 0, 0, 0.5});
  EXPECT_EQ(biasOfRawMean({30, 5, -50}, correction.Inverse(), {20, 8, -40}), (SampleData{20, 3, 30}));
}

TEST(MagBias, OfACalibratedMeanAddsThePreviousBias) {
  EXPECT_EQ(biasOfCalibratedMean({21, 0, -42}, kIdentity, {20, 0, -40}, {10, 5, -10}),
            (SampleData{11, 5, -12}));
}

TEST(MagBias, OfACalibratedMeanTakesTheExcessThroughTheInverseCorrection) {
  const Matrix3by3<float> correction({2, 0, 0, 0, 4, 0, 0, 0, 0.5});
  EXPECT_EQ(biasOfCalibratedMean({22, 4, -39}, correction.Inverse(), {20, 0, -40}, {10, 5, -10}),
            (SampleData{11, 6, -8}));
}

TEST(MagBias, IgnoresWhatASensorSendsBesidesItsAxes) {
  EXPECT_EQ(biasOfRawMean({30, 5, -50, 27, 1}, kIdentity, {20, 0, -40}), (SampleData{10, 5, -10}));
  EXPECT_EQ(biasOfCalibratedMean({30, 5, -50, 27, 1}, kIdentity, {20, 0, -40}, {1, 1, 1}),
            (SampleData{11, 6, -9}));
}

// The inverse is the zero matrix then, so that the field has no part in the bias.
TEST(MagBias, OfASingularCorrectionIsTheMeanOrThePreviousBias) {
  testing::internal::CaptureStdout();
  const Matrix3by3<float> inverse = kSingular.Inverse();
  EXPECT_EQ(testing::internal::GetCapturedStdout(), kNoInverseMessage);
  EXPECT_EQ(biasOfRawMean({30, 5, -50}, inverse, {20, 0, -40}), (SampleData{30, 5, -50}));
  EXPECT_EQ(biasOfCalibratedMean({30, 5, -50}, inverse, {20, 0, -40}, {1, 2, 3}), (SampleData{1, 2, 3}));
}

TEST(MagBias, IsTheSameFromBothStreamsAndMakesTheDriverShowTheReference) {
  std::mt19937 generator(20);
  std::uniform_real_distribution<float> field(-60, 60);
  std::uniform_real_distribution<float> skew(-0.2F, 0.2F);
  for (int round = 0; round < 200; ++round) {
    std::array<float, 9> elements{};
    for (std::size_t i = 0; i < elements.size(); ++i) {
      elements[i] = (i % 4 == 0 ? 1.0F : 0.0F) + skew(generator);
    }
    const Matrix3by3<float> correction(elements);
    const SampleData raw{field(generator), field(generator), field(generator)};
    const SampleData reference{field(generator), field(generator), field(generator)};
    const SampleData previous{field(generator), field(generator), field(generator)};

    const SampleData fromRaw = biasOfRawMean(raw, correction.Inverse(), reference);
    const SampleData fromCalibrated = biasOfCalibratedMean(driverOutput(correction, raw, previous),
                                                           correction.Inverse(), reference, previous);
    const SampleData shown = driverOutput(correction, raw, fromRaw);
    for (std::size_t axis = 0; axis < 3; ++axis) {
      EXPECT_NEAR(fromRaw[axis], fromCalibrated[axis], 2e-4) << "round " << round;
      EXPECT_NEAR(shown[axis], reference[axis], 2e-4) << "round " << round;
    }
  }
}

}  // namespace
