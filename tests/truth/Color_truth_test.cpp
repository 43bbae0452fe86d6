// Whether "color" finds the errors that a simulated color chip was given, over many handsets: a light that it
// was not calibrated under reads true afterwards.
#include <algorithm>
#include <cmath>
#include <random>

#include <gtest/gtest.h>

#include "truth/TruthHandset.h"

namespace {

constexpr unsigned kHandsets = 20;
constexpr int kSamples = 20;
const std::string kCount = std::to_string(kSamples);
constexpr double kNoise = 6;            // counts
constexpr double kLuxNoise = 0.4;       // lx, of the uncalibrated sensor
constexpr double kQuantisation = 0.01;  // lx
constexpr double kDeviations = 5;       // that a mean may be off
constexpr double kFloatRounding = 1e-5;
/// The chip's gain keeps the clear channel above this many counts.
constexpr double kLeastClear = 0.4 * 65535;
constexpr double kCrosstalk = 0.08;

struct Source {
  double lux = 0;
  double kelvin = 0;
};

/// What is different between handsets.
struct Truth {
  explicit Truth(unsigned seed) {
    std::mt19937 generator(seed);
    const auto between = [&](double low, double high) {
      return std::uniform_real_distribution<double>(low, high)(generator);
    };
    red = between(0.8, 1.2);
    blue = between(0.8, 1.2);
    light = between(0.5, 1.6);
    sources = {{between(200, 2000), between(2200, 3000)},
               {between(200, 2000), between(3500, 5000)},
               {between(200, 2000), between(6000, 9000)}};
    other = {between(200, 2000), between(sources.front().kelvin, sources.back().kelvin)};
    overrides = {"sensor.color_raw.scale=[" + std::to_string(red) + ",1," + std::to_string(blue) + "]",
                 "sensor.color_raw.noise=" + std::to_string(kNoise),
                 "sensor.ambient_light_raw.scale=" + std::to_string(light),
                 "sensor.ambient_light_raw.noise=" + std::to_string(kLuxNoise),
                 "sensor.ambient_light_raw.quantisation=" + std::to_string(kQuantisation)};
  }

  /// By how much noise may move the color temperature that the mean of a source's ratios stands for, in K.
  [[nodiscard]] double kelvinBound(const Source& source) const {
    const double blueOverRed = (source.kelvin - 1000) / 4500;
    const double redCounts = 1.6 / (0.4 + blueOverRed);
    const double clearCounts = 1 + redCounts * (1 + blueOverRed);
    const double leastRed = kLeastClear * redCounts / clearCounts * red;
    const double leastBlue = kLeastClear * redCounts * blueOverRed / clearCounts * blue;
    // And half a count that each reading was rounded by, at most.
    const double noise = kDeviations * kNoise / std::sqrt(kSamples) + 0.5;
    return (source.kelvin - 1000) * noise * std::hypot(1 / leastRed, 1 / leastBlue) +
           source.kelvin * kFloatRounding;
  }
  /// The same for the light sensor's mean, as a share of it.
  [[nodiscard]] double luxBound(const Source& source) const {
    return (kDeviations * kLuxNoise / std::sqrt(kSamples) + kQuantisation) / (light * source.lux) +
           kFloatRounding;
  }

  double red = 1;
  double blue = 1;
  double light = 1;
  std::vector<Source> sources;
  Source other;
  std::vector<std::string> overrides;
};

std::vector<std::string> under(const Source& source, unsigned noiseSeed) {
  return {"world.illuminance=" + std::to_string(source.lux),
          "world.color_temperature=" + std::to_string(source.kelvin),
          "hub.seed=" + std::to_string(noiseSeed)};
}

double numberAfter(const std::string& label, const Captured& run) {
  const std::vector<double> numbers = numbersAfter(label, run.out);
  EXPECT_EQ(numbers.size(), 1U) << label << "\n" << run.out;
  return numbers.empty() ? 0 : numbers.front();
}

class ColorTruth : public testing::TestWithParam<unsigned> {
 protected:
  /// The whole procedure; returns its last step.
  Captured calibrate() {
    const std::vector<std::string> lamp{"world.illuminance=0", "world.infrared=5",
                                        "hub.seed=" + std::to_string(1000 * GetParam())};
    EXPECT_EQ(handset.Run({"-q", "color", "-c", "-s", kCount}, lamp).result, 0);
    Captured last;
    for (std::size_t i = 0; i < truth.sources.size(); ++i) {
      const Source& source = truth.sources[i];
      std::vector<std::string> words{
          "-q", "color", "-s", kCount, std::to_string(source.lux), std::to_string(source.kelvin)};
      if (i + 1 == truth.sources.size()) words.emplace_back("-w");
      last = handset.Run(words, under(source, 1000 * GetParam() + static_cast<unsigned>(i) + 1));
      EXPECT_EQ(last.result, 0) << last.err;
    }
    return last;
  }

  /// Measures a light by the stored calibration.
  Captured measure(const Source& source) {
    return handset.Run(
        {"-q", "color", "-s", kCount, "-v", "100", std::to_string(source.lux), std::to_string(source.kelvin)},
        under(source, 1000 * GetParam() + 500));
  }

  const Truth truth{GetParam()};
  TruthHandset handset{"p2m2", truth.overrides};
};

TEST_P(ColorTruth, AnotherLightReadsTrueAfterwards) {
  (void)calibrate();
  const Captured run = measure(truth.other);
  ASSERT_EQ(run.result, 0) << run.err;
  double fitBound = 0;  // between the sources a line is as good as the worst of them
  double scaleBound = 0;
  for (const Source& source : truth.sources) {
    fitBound = std::max(fitBound, truth.kelvinBound(source));
    scaleBound = std::max(scaleBound, truth.luxBound(source));
  }
  const double kelvinBound = fitBound + truth.kelvinBound(truth.other);
  EXPECT_LT(kelvinBound, 60) << "a bound that says something";
  EXPECT_NEAR(numberAfter("CCT_MEAN:", run), truth.other.kelvin, kelvinBound);
  EXPECT_NEAR(numberAfter("LUX_MEAN:", run), truth.other.lux,
              truth.other.lux * (scaleBound + truth.luxBound(truth.other)) * 1.01);
}

TEST_P(ColorTruth, ScaleCrosstalkAndRatioAreTheChips) {
  const Captured last = calibrate();
  double scaleBound = 0;
  for (const Source& source : truth.sources) scaleBound = std::max(scaleBound, truth.luxBound(source));
  EXPECT_NEAR(numberAfter("LUX_SCALE:", last), 1 / truth.light, scaleBound / truth.light * 1.01);
  // Of an infrared of 51200 counts.
  const double noise = (kDeviations * kNoise / std::sqrt(kSamples) + 0.5) / 51200;
  EXPECT_NEAR(numberAfter("CROSSTALK:", last), kCrosstalk * (truth.red + truth.blue) / 2, 2 * noise);
  // 100 counts of infrared at gain step 0, in proportion to the first source's clear light there.
  const double blueOverRed = (truth.sources[0].kelvin - 1000) / 4500;
  const double clear = 0.1 * truth.sources[0].lux * (1 + 1.6 / (0.4 + blueOverRed) * (1 + blueOverRed));
  EXPECT_NEAR(numberAfter("IR_RATIO:", last), 100 / clear, 100 / clear * 1e-3);
}

TEST_P(ColorTruth, ResetBringsTheErrorBack) {
  (void)calibrate();
  ASSERT_EQ(handset.Run({"-r", "color"}).result, 0);
  const Captured run = measure(truth.other);
  EXPECT_NEAR(numberAfter("LUX_MEAN:", run), truth.other.lux * truth.light,
              truth.other.lux * truth.light * truth.luxBound(truth.other) * 1.01);
  EXPECT_LT(numberAfter("CCT_MEAN:", run), 10) << "a line of 0 and 1 gives the ratio itself";
}

INSTANTIATE_TEST_SUITE_P(Handsets, ColorTruth, testing::Range(1U, kHandsets + 1));

}  // namespace
