// Whether "als" finds the error that a simulated light sensor was given, over many handsets.
#include <cmath>
#include <random>

#include <gtest/gtest.h>

#include "truth/TruthHandset.h"

namespace {

constexpr unsigned kHandsets = 20;
constexpr double kNoise = 0.8;          // lx, of one uncalibrated reading
constexpr double kQuantisation = 0.01;  // lx
constexpr int kSamples = 40;
const std::string kCount = std::to_string(kSamples);
constexpr double kDeviations = 5;  // that a mean may be off
const double kMeanBound = kDeviations * kNoise / std::sqrt(kSamples) + kQuantisation;  // lx
constexpr double kFloatRounding = 1e-5;                                                // of the value

/// What is different between handsets.
struct Truth {
  explicit Truth(unsigned seed) {
    std::mt19937 generator(seed);
    error = std::uniform_real_distribution<double>(0.5, 1.6)(generator);
    correction = std::uniform_real_distribution<double>(0.8, 1.25)(generator);
    lux = std::uniform_real_distribution<double>(100, 1500)(generator);
    otherLux = std::uniform_real_distribution<double>(50, 3000)(generator);
    overrides = {"sensor.ambient_light.scale=" + std::to_string(error),
                 "sensor.ambient_light.noise=" + std::to_string(kNoise),
                 "sensor.ambient_light.quantisation=" + std::to_string(kQuantisation),
                 "registry.\"lightchip_0_platform.als.fac_cal\".corr_factor=" + std::to_string(correction)};
  }

  double error = 1;
  double correction = 1;
  double lux = 0;  // of the calibration
  double otherLux = 0;
  std::vector<std::string> overrides;
};

std::vector<std::string> under(double lux, unsigned noiseSeed) {
  return {"world.illuminance=" + std::to_string(lux), "hub.seed=" + std::to_string(noiseSeed)};
}

double numberAfter(const std::string& label, const Captured& run) {
  const std::vector<double> numbers = numbersAfter(label, run.out);
  EXPECT_EQ(numbers.size(), 1U) << label << "\n" << run.out;
  return numbers.empty() ? 0 : numbers.front();
}

class AlsTruth : public testing::TestWithParam<unsigned> {};

TEST_P(AlsTruth, ScaleUndoesTheSensorsErrorUnderAnyLight) {
  const Truth truth(GetParam());
  TruthHandset handset("o1v1", truth.overrides);

  const Captured calibration =
      handset.Run({"-q", "als", "-s", kCount, std::to_string(truth.lux)}, under(truth.lux, GetParam()));
  ASSERT_EQ(calibration.result, 0) << calibration.err;
  const double expected = 1000 / (truth.error * truth.correction);
  const double relativeBound = kMeanBound / (truth.error * truth.lux) + kFloatRounding;
  EXPECT_NEAR(numberAfter("SCALE:", calibration), expected, expected * relativeBound * 1.01);

  // The calibrated sensor's noise is the raw one's divided by its error.
  const double bound = truth.otherLux * relativeBound + kMeanBound / truth.error;
  const Captured second =
      handset.Run({"-q", "als", "-s", kCount, "-v", "100", std::to_string(truth.otherLux)},
                  under(truth.otherLux, GetParam() + 1000));
  ASSERT_EQ(second.result, 0) << second.err;
  EXPECT_NEAR(numberAfter("MEAN:", second), truth.otherLux, bound * 1.01);
}

TEST_P(AlsTruth, ResetBringsTheErrorBack) {
  const Truth truth(GetParam());
  TruthHandset handset("o1v1", truth.overrides);
  ASSERT_EQ(handset.Run({"-q", "als", std::to_string(truth.lux)}, under(truth.lux, GetParam())).result, 0);
  ASSERT_EQ(handset.Run({"-r", "als"}).result, 0);
  const Captured after =
      handset.Run({"-q", "-n", "als", "-s", kCount, std::to_string(truth.lux)}, under(truth.lux, GetParam()));
  ASSERT_EQ(after.result, 0) << after.err;
  EXPECT_NEAR(numberAfter("MEAN:", after), truth.lux * truth.error * truth.correction,
              (kMeanBound + truth.lux * truth.error * kFloatRounding) * truth.correction);
}

INSTANTIATE_TEST_SUITE_P(Handsets, AlsTruth, testing::Range(1U, kHandsets + 1));

}  // namespace
