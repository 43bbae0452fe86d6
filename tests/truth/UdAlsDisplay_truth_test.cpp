// Whether "als pwm" and "als white" find how a simulated display shines into the light sensor under it, over
// many handsets.
#include <algorithm>

#include "truth/UdAlsHandset.h"

namespace {

using namespace udals;

constexpr unsigned kHandsets = 12;
constexpr std::size_t kTrials = kHandsets * 10;  // numbers that the tests look at
constexpr std::array<const char*, 4> kChannels{"c", "r", "g", "b"};

std::mt19937 generatorOf(unsigned seed) { return std::mt19937(seed); }

double between(std::mt19937& generator, double low, double high) {
  return std::uniform_real_distribution<double>(low, high)(generator);
}

class UdAlsDisplayTruth : public testing::TestWithParam<unsigned> {};

TEST_P(UdAlsDisplayTruth, PwmBoundaryIsTheBrightnessBelowWhichTheDisplayPulses) {
  std::mt19937 generator = generatorOf(GetParam());
  std::vector<double> levels;
  for (double level = 20; level <= 150; level += 10)
    levels.push_back(level + std::floor(between(generator, 0, 10)));
  const double boundary = levels[2 + generator() % (levels.size() - 4)];
  const double ripple = between(generator, 400, 900);
  const double lux = between(generator, 100, 1000);
  const Family family = familyOf(GetParam());
  // Lux is made of C alone, so that the pulses show in it; and there is no pattern to take off.
  std::vector<std::string> overrides{world("illuminance", lux),
                                     sensor("sensitivity", 1),
                                     sensor("display_leak", std::array<double, 4>{1, 1, 1, 1}),
                                     sensor("leak_floor", 1),
                                     sensor("pwm_boundary", boundary),
                                     sensor("pwm_ripple", ripple),
                                     item(family, "pwm_boundary", 0)};
  for (const char* const channel : kChannels) {
    overrides.push_back(item(family, std::string(channel) + "_coeff", *channel == 'c' ? 1 : 0));
    overrides.push_back(item(family, std::string("pattern_w_") + channel + "_coef0", 0));
    overrides.push_back(item(family, std::string("pattern_w_") + channel + "_coef1", 0));
  }
  Handset handset(GetParam(), overrides);
  const auto luxAt = [&handset](double level) {
    return numberAfter("LUX_MEAN:", handset.Measure({"sample"}, {world("display_brightness", level)}));
  };
  const double pulsing = levels.front();
  const double outside = lux / 0.9939 + pulsing;  // what C counts, and what leaks in without the pulses
  const double pulses = ripple * (boundary - pulsing) / boundary;
  const double bound = meanBound(kTrials, outside + pulses);
  EXPECT_NEAR(luxAt(pulsing), outside + pulses, bound);

  std::shuffle(levels.begin(), levels.end(), generator);
  Captured last;
  for (const double level : levels) {
    std::vector<std::string> words;
    if (level == levels.front()) words.emplace_back("-r");
    if (level == levels.back()) words.emplace_back("-w");
    words.insert(words.end(), {"pwm", "1000", "11", number(level)});
    last = handset.Measure(words, {world("display_brightness", level)});
  }
  EXPECT_EQ(numberAfter("PWM boundary:", last), boundary);
  EXPECT_EQ(handset.Stored("pwm_boundary"), boundary);
  EXPECT_NEAR(luxAt(pulsing), outside, bound) << "the pulses are gone from lux";
}

TEST_P(UdAlsDisplayTruth, PatternLinesAreWhatTheDisplayAddsByBrightness) {
  std::mt19937 generator = generatorOf(GetParam());
  std::array<double, 4> leak{};
  for (double& channel : leak) channel = between(generator, 0.8, 2);
  const double floor = between(generator, 0.2, 0.6);
  const double darkCounts = between(generator, 2, 6);
  Handset handset(GetParam(),
                  {sensor("sensitivity", 1), sensor("display_leak", leak), sensor("leak_floor", floor),
                   sensor("best_delay", 0), sensor("pwm_boundary", 0), sensor("bias", darkCounts)});

  // In the dark, so that nothing but the display (and the sensor itself) is in the lines.
  const std::vector<double> levels{40, 80, 120, 160, 200, 240};
  double mean = 0;
  double squares = 0;
  for (const double level : levels) mean += level / static_cast<double>(levels.size());
  for (const double level : levels) squares += (level - mean) * (level - mean);
  for (const double level : levels) {
    std::vector<std::string> words;
    if (level == levels.front()) words.emplace_back("-r");
    if (level == levels.back()) words.emplace_back("-w");
    words.insert(words.end(), {"white", number(level)});
    handset.Measure(words, {world("illuminance", 0), world("display_brightness", level)});
  }
  const double step = meanBound(kTrials, 512) * 1.1;
  const double slopeBound = step / std::sqrt(squares);
  const double zeroBound = step * std::sqrt(1 / static_cast<double>(levels.size()) + mean * mean / squares);
  for (std::size_t i = 0; i < kChannels.size(); ++i) {
    const std::string name = std::string("pattern_w_") + kChannels[i] + "_coef";
    EXPECT_NEAR(handset.Stored(name + "0"), darkCounts, zeroBound) << kChannels[i];
    EXPECT_NEAR(handset.Stored(name + "1"), leak[i] * floor, slopeBound) << kChannels[i];
  }

  // With the lines taken off, lux under a display that shines is that outside.
  const double lux = between(generator, 100, 1000);
  const double brightness = between(generator, 50, 250);
  const Captured second =
      handset.Measure({"sample"}, {world("illuminance", lux), world("display_brightness", brightness)});
  double bound = meanBound(kTrials, lux, luxNoise());
  for (const double coefficient : kCoefficients) bound += std::fabs(coefficient) * step;
  EXPECT_NEAR(numberAfter("LUX_MEAN:", second), lux, bound);
}

INSTANTIATE_TEST_SUITE_P(Handsets, UdAlsDisplayTruth, testing::Range(1U, kHandsets + 1));

}  // namespace
