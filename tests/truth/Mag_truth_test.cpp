// Whether "mag" and "mag-softiron" find the hard and soft iron that a simulated handset was given, over many
// handsets.
#include <array>
#include <cmath>
#include <cstdio>
#include <random>

#include <gtest/gtest.h>

#include "framework/Matrix3by3.h"
#include "truth/TruthHandset.h"

namespace {

using Vector = std::array<double, 3>;
using Matrix = std::array<double, 9>;

constexpr unsigned kHandsets = 12;
constexpr double kNoise = 0.5;       // µT
constexpr double kUsedSamples = 90;  // 2 s at 50 Hz without the first 0.2 s
constexpr double kDeviations = 5;    // that a mean may be off
constexpr double kRounding = 0.005;  // µT: quantisation, 32-bit floats, printed digits
constexpr double kMeanBound = kDeviations * kNoise / 9.486833 + kRounding;  // √90

std::string list(const std::vector<double>& numbers, const char* separator) {
  std::string text;
  for (const double number : numbers) {
    std::array<char, 32> digits{};
    std::snprintf(digits.data(), digits.size(), "%.9f", number);
    text += (text.empty() ? "" : separator) + std::string(digits.data());
  }
  return text;
}

template <class Numbers>
std::string override(const char* key, const Numbers& numbers) {
  return std::string(key) + "=[" + list({numbers.begin(), numbers.end()}, ", ") + "]";
}

std::vector<std::string> words(std::vector<std::string> first, const std::vector<double>& numbers) {
  for (const double number : numbers) first.push_back(list({number}, ""));
  return first;
}

/// What is different between handsets.
struct Truth {
  explicit Truth(unsigned seed) {
    std::mt19937 generator(seed);
    std::uniform_real_distribution<double> iron(-60, 60);
    std::uniform_real_distribution<double> skew(-0.1, 0.1);
    for (double& axis : hardIron) axis = iron(generator);
    for (double& axis : field) axis = iron(generator);
    for (double& axis : otherField) axis = iron(generator);
    for (std::size_t i = 0; i < softIron.size(); ++i)
      softIron[i] = (i % 4 == 0 ? 1.0 : 0.0) + skew(generator);
    correction = Matrix3by3<double>(softIron).Inverse().elements();
    overrides = {"hub.seed=" + std::to_string(seed), override("sensor.mag.bias", hardIron),
                 override("sensor.mag.soft_iron", softIron),
                 override("sensor.mag.noise", Vector{kNoise, kNoise, kNoise})};
  }

  Vector hardIron{};    // µT
  Vector field{};       // µT, of the calibration
  Vector otherField{};  // µT
  Matrix softIron{};
  Matrix correction{};  // the inverse of softIron
  std::vector<std::string> overrides;
};

std::string inField(const Vector& field) { return override("world.magnetic_field", field); }

std::vector<std::string> mag(const Vector& reference, bool dryRun = false) {
  return words({"-q", dryRun ? "-n" : "-q", "mag", "--"}, {reference.begin(), reference.end()});
}

void expectNear(const std::vector<double>& values, const Vector& expected, double bound) {
  ASSERT_EQ(values.size(), expected.size());
  for (std::size_t axis = 0; axis < expected.size(); ++axis) EXPECT_NEAR(values[axis], expected[axis], bound);
}

/// The largest sum of magnitudes in a row: how much a matrix can make of an error at most.
double gain(const Matrix& matrix) {
  double largest = 0;
  for (std::size_t row = 0; row < 3; ++row) {
    largest = std::max(largest, std::fabs(matrix[3 * row]) + std::fabs(matrix[3 * row + 1]) +
                                    std::fabs(matrix[3 * row + 2]));
  }
  return largest;
}

class MagTruth : public testing::TestWithParam<unsigned> {
 protected:
  MagTruth() : truth(GetParam()), handset("o1v1", truth.overrides) {}

  /// The reading of the calibrated stream under other noise, shown by a calibration that stores nothing.
  std::vector<double> calibratedMean(const Vector& field) {
    const Captured shown = handset.Run(mag(field, true), {"sensor.mag_raw.present=false", inField(field),
                                                          "hub.seed=" + std::to_string(GetParam() + 1000)});
    EXPECT_EQ(shown.result, 0) << shown.out << shown.err;
    return numbersAfter("MEAN:", shown.out);
  }

  void storeCorrection() {
    const Captured stored =
        handset.Run(words({"mag-softiron"}, {truth.correction.begin(), truth.correction.end()}));
    ASSERT_EQ(stored.result, 0) << stored.out << stored.err;
  }

  const Truth truth;
  TruthHandset handset;
};

TEST_P(MagTruth, RawStreamGivesTheHardIronThroughTheSoftIron) {
  storeCorrection();
  const Captured measured = handset.Run(mag(truth.field), {inField(truth.field)});
  ASSERT_EQ(measured.result, 0) << measured.out << measured.err;
  expectNear(numbersAfter("BIAS:", measured.out), truth.hardIron, kMeanBound);
}

TEST_P(MagTruth, CalibratedStreamGivesTheSameFromAWrongStoredBias) {
  storeCorrection();
  const std::string noRaw = "sensor.mag_raw.present=false";
  // Given a bias that was stored against the wrong reference
  ASSERT_EQ(handset.Run(mag(truth.otherField), {inField(truth.field), noRaw}).result, 0);
  const Captured measured = handset.Run(mag(truth.field), {inField(truth.field), noRaw});
  ASSERT_EQ(measured.result, 0) << measured.out << measured.err;
  expectNear(numbersAfter("BIAS:", measured.out), truth.hardIron, kMeanBound);
}

TEST_P(MagTruth, CalibratedReadingsAreRightInAnyField) {
  storeCorrection();
  ASSERT_EQ(handset.Run(mag(truth.field), {inField(truth.field)}).result, 0);
  // Two means, one in the stored bias and one now, both seen through the correction
  const double bound = 2 * gain(truth.correction) * kMeanBound;
  expectNear(calibratedMean(truth.field), truth.field, bound);
  expectNear(calibratedMean(truth.otherField), truth.otherField, bound);
}

TEST_P(MagTruth, WithoutACorrectionTheReferenceFieldAtLeastIsRight) {
  ASSERT_EQ(handset.Run(mag(truth.field), {inField(truth.field)}).result, 0);
  expectNear(calibratedMean(truth.field), truth.field, 2 * kMeanBound);
}

TEST_P(MagTruth, ResetBringsTheErrorBack) {
  storeCorrection();
  ASSERT_EQ(handset.Run(mag(truth.field), {inField(truth.field)}).result, 0);
  ASSERT_EQ(handset.Run({"-r", "mag"}).result, 0);
  ASSERT_EQ(handset.Run({"-r", "mag-softiron"}).result, 0);
  Vector uncorrected{};
  for (std::size_t row = 0; row < 3; ++row) {
    uncorrected[row] = truth.hardIron[row];
    for (std::size_t column = 0; column < 3; ++column) {
      uncorrected[row] += truth.softIron[3 * row + column] * truth.field[column];
    }
  }
  expectNear(calibratedMean(truth.field), uncorrected, kMeanBound);
}

TEST_P(MagTruth, TemperatureAndNoiseAreThoseOfTheHandset) {
  const double temperature = 10 + GetParam();
  const Captured measured =
      handset.Run(mag(truth.field), {"world.temperature=" + list({temperature}, ""),
                                     "sensor.temperature_mag.bias=0", inField(truth.field)});
  const std::vector<double> shown = numbersAfter("TEMP:", measured.out);
  ASSERT_EQ(shown.size(), 1U);
  EXPECT_NEAR(shown[0], temperature, 0.0625 + 0.02);  // half a step of the chip's thermometer, and its noise
  // The deviation of n samples is itself uncertain by about σ/√(2n).
  const double bound = kDeviations * kNoise / std::sqrt(2 * kUsedSamples) + kRounding;
  expectNear(numbersAfter("STDEV:", measured.out), {kNoise, kNoise, kNoise}, bound);
}

INSTANTIATE_TEST_SUITE_P(Handsets, MagTruth, testing::Range(1U, kHandsets + 1));

}  // namespace
