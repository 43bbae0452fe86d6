// Whether "prox" makes a simulated proximity sensor say near and far where the target stood during its
// calibration, over many handsets.
#include <algorithm>
#include <cmath>
#include <random>
#include <sstream>

#include <gtest/gtest.h>

#include "truth/TruthHandset.h"

namespace {

constexpr unsigned kHandsets = 20;
constexpr double kNoise = 1.0;  // counts
// 5 deviations of a mean of 100, half a count for the threshold's own rounding.
constexpr double kBound = 5 * kNoise / 10 + 0.5;

/// What is different between handsets.
struct Truth {
  explicit Truth(unsigned seed) {
    std::mt19937 generator(seed);
    gain = std::uniform_real_distribution<double>(0.7, 1.2)(generator);
    crosstalk = std::uniform_real_distribution<double>(0, 20)(generator);
    nearMm = std::uniform_real_distribution<double>(45, 60)(generator);
    farMm = nearMm * std::uniform_real_distribution<double>(1.25, 1.6)(generator);
    overrides = {"sensor.proximity.scale=" + std::to_string(gain),
                 "sensor.proximity.noise=" + std::to_string(kNoise),
                 "world.window_crosstalk=" + std::to_string(crosstalk)};
  }

  /// The scenario's sensor throws back 140 counts at 50 mm.
  [[nodiscard]] double CountsAt(double distanceMm) const {
    return gain * (140 * (50 / distanceMm) * (50 / distanceMm) + crosstalk);
  }

  double gain = 1;
  double crosstalk = 0;  // counts
  double nearMm = 0;
  double farMm = 0;
  std::vector<std::string> overrides;
};

std::vector<std::string> at(double distanceMm, unsigned noiseSeed) {
  return {"world.target_distance=" + std::to_string(distanceMm), "hub.seed=" + std::to_string(noiseSeed)};
}

double numberAfter(const std::string& label, const Captured& run) {
  const std::vector<double> numbers = numbersAfter(label, run.out);
  EXPECT_EQ(numbers.size(), 1U) << label << "\n" << run.out;
  return numbers.empty() ? 0 : numbers.front();
}

/// What the sensor says of a target: the distances of its samples, 0 for near and 5 for far.
std::vector<double> distancesSaid(const Captured& run) {
  std::vector<double> distances;
  std::istringstream lines(run.out);
  for (std::string line; std::getline(lines, line);) {
    std::istringstream words(line);
    double time = 0;
    double counts = 0;
    double distance = 0;
    double light = 0;
    if (words >> time >> counts >> distance >> light) distances.push_back(distance);
  }
  return distances;
}

class ProxTruth : public testing::TestWithParam<unsigned> {};

TEST_P(ProxTruth, ThresholdsAreWhatTheSensorReadsAndDecideNearAndFar) {
  const Truth truth(GetParam());
  TruthHandset handset("o1v1", truth.overrides);

  const Captured near = handset.Run({"-q", "prox", "-s", "100", "near"}, at(truth.nearMm, GetParam()));
  ASSERT_EQ(near.result, 0) << near.err;
  EXPECT_NEAR(numberAfter("NEAR_THRESHOLD:", near), truth.CountsAt(truth.nearMm), kBound);
  const Captured far = handset.Run({"-q", "prox", "-s", "100", "far"}, at(truth.farMm, GetParam() + 1000));
  ASSERT_EQ(far.result, 0) << far.err;
  EXPECT_NEAR(numberAfter("FAR_THRESHOLD:", far), truth.CountsAt(truth.farMm), kBound);

  for (const auto& [distanceMm, said] :
       {std::pair{truth.nearMm * 0.9, 0.0}, std::pair{truth.farMm * 1.2, 5.0}}) {
    const Captured look = handset.Run({"-n", "prox", "-s", "20"}, at(distanceMm, GetParam() + 2000));
    ASSERT_EQ(look.result, 0) << look.err;
    const std::vector<double> distances = distancesSaid(look);
    ASSERT_EQ(distances.size(), 20U) << look.out;
    EXPECT_EQ(std::count(distances.begin(), distances.end(), said), 20) << look.out;
  }
}

TEST_P(ProxTruth, TargetsTooCloseTogetherStillGetTenCountsBetweenTheirThresholds) {
  const Truth truth(GetParam());
  TruthHandset handset("o1v1", truth.overrides);
  const Captured near = handset.Run({"-q", "prox", "-s", "100", "near"}, at(truth.nearMm, GetParam()));
  ASSERT_EQ(near.result, 0) << near.err;
  const Captured far = handset.Run({"-q", "prox", "-s", "100", "far"}, at(truth.nearMm, GetParam() + 1000));
  ASSERT_EQ(far.result, 0) << far.err;
  EXPECT_NE(far.out.find("Set default threshold with MIN_DIFF\n"), std::string::npos);

  // Repeating the far step finds the near threshold ten counts above: nothing is moved again.
  const Captured again = handset.Run({"-q", "prox", "-s", "100", "far"}, at(truth.nearMm, GetParam() + 1000));
  ASSERT_EQ(again.result, 0) << again.err;
  EXPECT_EQ(numberAfter("FAR_THRESHOLD:", again), numberAfter("FAR_THRESHOLD:", far));
  EXPECT_EQ(again.out.find("Set default threshold with MIN_DIFF\n"), std::string::npos);
}

INSTANTIATE_TEST_SUITE_P(Handsets, ProxTruth, testing::Range(1U, kHandsets + 1));

}  // namespace
