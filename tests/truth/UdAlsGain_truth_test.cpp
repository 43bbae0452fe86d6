// Whether "als calgain" finds how far the upper gains of a simulated light sensor are from powers of two,
// over many handsets.
#include "truth/UdAlsHandset.h"

namespace {

using namespace udals;

constexpr unsigned kHandsets = 12;
constexpr std::size_t kTrials = kHandsets * 40;  // means that the tests look at
constexpr double kLux = 2000;
constexpr double kIrShare = 0.3;
constexpr std::array<int, 3> kGains{8, 9, 10};
constexpr std::array<const char*, 4> kChannels{"c", "r", "g", "b"};
const std::string kIntegrationUs = "1000";

using Errors = std::array<double, kGains.size()>;

/// A few per cent, and never next to nothing.
Errors someErrors(std::mt19937& generator) {
  std::uniform_real_distribution<double> size(0.02, 0.06);
  Errors errors{};
  for (double& error : errors) error = (generator() % 2 == 0 ? 1 : -1) * size(generator);
  return errors;
}

struct Truth {
  explicit Truth(unsigned seed) {
    std::mt19937 generator(seed);
    overrides = {world("illuminance", kLux), world("ir_share", kIrShare), sensor("sensitivity", 1),
                 sensor("infrared_leak", 0)};
    for (std::size_t i = 0; i < kChannels.size(); ++i) {
      errors[i] = someErrors(generator);
      overrides.push_back(sensor(std::string("gain_error_") + kChannels[i], errors[i]));
    }
    infrared = someErrors(generator);
    overrides.push_back(sensor("gain_error_ir", infrared));
  }

  std::array<Errors, 4> errors;
  Errors infrared{};
  std::vector<std::string> overrides;
};

double nominal(std::size_t gain) { return std::ldexp(1.0, 11 - kGains[gain]); }

/// The share by which a ratio may be off that was made of means of these levels.
double ratioBound(double atHighest, double atGain) {
  return 1.01 * (meanBound(kTrials, atHighest) / atHighest + meanBound(kTrials, atGain) / atGain) + kFloats;
}

class UdAlsGainTruth : public testing::TestWithParam<unsigned> {
 protected:
  const Truth truth{GetParam()};
  Handset handset{GetParam(), truth.overrides};

  /// A step at each gain; the last calibrates. Their outputs, by gain from 8 on.
  std::vector<Captured> calibrate(const std::vector<std::string>& command) {
    std::vector<Captured> steps;
    for (const char* const gain : {"8", "9", "10", "11"}) {
      std::vector<std::string> words;
      if (steps.empty()) words.emplace_back("-r");
      if (std::string(gain) == "11") words.emplace_back("-w");
      words.insert(words.end(), command.begin(), command.end());
      words.insert(words.end(), {kIntegrationUs, gain});
      steps.push_back(handset.Measure(words));
    }
    return steps;
  }
  double luxAt(std::size_t gain) {
    return numberAfter("LUX_MEAN:",
                       handset.Measure({"-r", "calgain", kIntegrationUs, std::to_string(kGains[gain])}));
  }
};

TEST_P(UdAlsGainTruth, RatiosAreThoseOfTheAmplifier) {
  const std::vector<Captured> steps = calibrate({"calgain"});
  const auto highest = channelMeans(steps.back());
  for (std::size_t gain = 0; gain < kGains.size(); ++gain) {
    const auto means = channelMeans(steps[gain]);
    for (std::size_t i = 0; i < kChannels.size(); ++i) {
      const std::string item = std::string(kChannels[i]) + "_gain_ratio_" + std::to_string(kGains[gain]);
      const double expected = nominal(gain) / (1 + truth.errors[i][gain]);
      EXPECT_NEAR(handset.Stored(item), expected, expected * ratioBound(highest[i], means[i])) << item;
    }
  }
}

TEST_P(UdAlsGainTruth, LuxIsTheSameAtEveryGainAfterwards) {
  Errors before{};
  for (std::size_t gain = 0; gain < kGains.size(); ++gain) before[gain] = luxAt(gain);
  const std::vector<Captured> steps = calibrate({"calgain"});
  const auto highest = channelMeans(steps.back());
  double largestBefore = 0;
  double largestAfter = 0;
  for (std::size_t gain = 0; gain < kGains.size(); ++gain) {
    const auto means = channelMeans(steps[gain]);
    double bound = meanBound(kTrials, kLux, luxNoise() * nominal(gain)) * 1.1;
    for (std::size_t i = 0; i < kChannels.size(); ++i) {
      bound += std::fabs(kCoefficients[i]) * highest[i] * ratioBound(highest[i], means[i]);
    }
    const double after = luxAt(gain);
    EXPECT_NEAR(after, kLux, bound) << "gain " << kGains[gain];
    largestBefore = std::max(largestBefore, std::fabs(before[gain] - kLux));
    largestAfter = std::max(largestAfter, std::fabs(after - kLux));
  }
  EXPECT_GT(largestBefore, 4 * largestAfter);
}

TEST_P(UdAlsGainTruth, InfraredRatiosAreThoseOfItsAmplifier) {
  const std::vector<Captured> steps = calibrate({"calgain", "ir"});
  const double highest = numberAfter("IR_MEAN:", steps.back());
  for (std::size_t gain = 0; gain < kGains.size(); ++gain) {
    const std::string item = "ir_gain_ratio_" + std::to_string(kGains[gain]);
    const double expected = nominal(gain) / (1 + truth.infrared[gain]);
    EXPECT_NEAR(handset.Stored(item), expected,
                expected * ratioBound(highest, numberAfter("IR_MEAN:", steps[gain])))
        << item;
  }
}

INSTANTIATE_TEST_SUITE_P(Handsets, UdAlsGainTruth, testing::Range(1U, kHandsets + 1));

}  // namespace
