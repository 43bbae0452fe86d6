// Whether "als caldelay" and "als caldelay_te2" find the moment of the display's refresh at which a simulated
// light sensor catches least of its light, over many handsets.
#include "truth/UdAlsHandset.h"

namespace {

using namespace udals;

constexpr unsigned kHandsets = 12;
constexpr std::size_t kTrials = kHandsets * 6;  // numbers that the tests look at
constexpr double kRefreshMs = 1000.0 / 60;
constexpr double kLineMs = 0.005;
constexpr double kClearPerLux = 1 / 0.9939;              // at 5000 K
const std::vector<std::string> kSettings{"1000", "11"};  // µs, gain

struct Truth {
  explicit Truth(unsigned seed) {
    std::mt19937 generator(seed);
    const auto between = [&](double low, double high) {
      return std::uniform_real_distribution<double>(low, high)(generator);
    };
    bestMs = between(4.5, 8);
    lux = between(50, 800);
    brightness = between(100, 255);
    leak = between(1, 2);
    floor = between(0.1, 0.4);
    ownEdge = std::floor(between(1000, 1300));
    alsDelayMs = between(0.5, 3);
    overrides = {world("illuminance", lux),
                 world("display_brightness", brightness),
                 world("display_refresh_rate", 60),
                 sensor("sensitivity", 1),
                 sensor("display_leak", std::array<double, 4>{leak, 1, 1, 1}),
                 sensor("leak_floor", floor),
                 sensor("best_delay", bestMs),
                 sensor("te2_falling_edge", ownEdge),
                 sensor("te2_line", kLineMs * 1000),
                 sensor("pwm_boundary", 0)};
  }
  /// The parabola's curvature per ms².
  [[nodiscard]] double curvature() const {
    return brightness * leak * (1 - floor) * 4 / (kRefreshMs * kRefreshMs);
  }
  [[nodiscard]] double leastClear() const { return lux * kClearPerLux + brightness * leak * floor; }

  double bestMs = 0;
  double lux = 0;
  double brightness = 0;
  double leak = 0;
  double floor = 0;
  double ownEdge = 0;
  double alsDelayMs = 0;
  std::vector<std::string> overrides;
};

/// Equally spaced steps of a scan.
struct Scan {
  double first;
  double step;
  int count;

  [[nodiscard]] double last() const { return first + step * (count - 1); }
  [[nodiscard]] std::vector<std::string> words() const {
    // Half a step more, so that the last one is not lost to rounding.
    return {number(first), number(last() + step / 2), number(step)};
  }
  /// How far the vertex of a parabola through means that may be off by `bound` may be off: the slope at x has
  /// the variance σ² · (1 / Σd² + 4 d² / (Σd⁴ − (Σd²)² / n)), d counted from the middle.
  [[nodiscard]] double vertexBound(double vertex, double curvature, double bound) const {
    double squares = 0;
    double fourths = 0;
    const double middle = (first + last()) / 2;
    for (int i = 0; i < count; ++i) {
      const double d = first + step * i - middle;
      squares += d * d;
      fourths += d * d * d * d;
    }
    const double d = vertex - middle;
    const double slope = std::sqrt(1 / squares + 4 * d * d / (fourths - squares * squares / count));
    return 1.1 * bound * slope / (2 * curvature);
  }
};

std::vector<std::string> join(std::vector<std::string> first, const std::vector<std::string>& second) {
  first.insert(first.end(), second.begin(), second.end());
  return first;
}

class UdAlsDelayTruth : public testing::TestWithParam<unsigned> {};

TEST_P(UdAlsDelayTruth, DelayIsTheOneOfTheLeastDisplayLight) {
  const Truth truth(GetParam());
  Handset handset(GetParam(), truth.overrides);
  const double before = numberAfter("C_MEAN:", handset.Measure({"sample"}));
  const Scan scan{0, 1, 13};
  const Captured run = handset.Measure(join(join({"caldelay"}, kSettings), scan.words()));
  const double printed = numberAfter("Delay of minimum clear value:", run);
  const double mean = meanBound(kTrials, before);
  const double bound = 0.0005 + scan.vertexBound(truth.bestMs, truth.curvature(), mean);
  EXPECT_NEAR(printed, truth.bestMs, bound);
  EXPECT_LT(bound, 0.05) << "a bound that says something";
  EXPECT_NEAR(handset.Stored("delay"), printed, kPrinted);

  // The sensor is triggered after the registry's delay from now on.
  const double after = numberAfter("C_MEAN:", handset.Measure({"sample"}));
  EXPECT_NEAR(after, truth.leastClear(), mean + truth.curvature() * bound * bound);
  EXPECT_NEAR(before - after, truth.curvature() * truth.bestMs * truth.bestMs, 3 * mean);
}

TEST_P(UdAlsDelayTruth, Te2EdgeIsTheOneOfTheLeastDisplayLightAfterTheDelay) {
  Truth truth(GetParam());
  truth.overrides.push_back(item(familyOf(GetParam()), "delay", truth.alsDelayMs));
  Handset handset(GetParam(), truth.overrides);
  const double best = truth.ownEdge + (truth.bestMs - truth.alsDelayMs) / kLineMs;
  const Scan scan{std::floor(best) - 1150, 200, 12};
  const Captured run = handset.Measure(
      join(join(join({"caldelay_te2"}, kSettings), {number(truth.alsDelayMs)}), scan.words()));
  const double printed = numberAfter("Delay of minimum clear value:", run);
  const double mean = meanBound(kTrials, truth.leastClear() + truth.brightness * truth.leak);
  const double bound = 0.5 + scan.vertexBound(best, truth.curvature() * kLineMs * kLineMs, mean);
  EXPECT_NEAR(printed, best, bound);
  EXPECT_LT(bound, 15) << "a bound that says something";
  EXPECT_NEAR(handset.Stored("delay_te2"), printed, kPrinted);

  // The table that the calibration wrote moves the trigger.
  const double after = numberAfter("C_MEAN:", handset.Measure({"sample"}));
  EXPECT_NEAR(after, truth.leastClear(), mean + truth.curvature() * bound * bound * kLineMs * kLineMs);
}

INSTANTIATE_TEST_SUITE_P(Handsets, UdAlsDelayTruth, testing::Range(1U, kHandsets + 1));

}  // namespace
