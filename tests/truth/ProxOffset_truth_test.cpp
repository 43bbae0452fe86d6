// Whether the offset variants of "prox" take the window's cross-talk off and make a target read what it
// should, over many handsets.
#include <cmath>
#include <random>

#include <gtest/gtest.h>

#include "prox/ProxPoffset.h"
#include "prox/UdProxCalibrator.h"
#include "support/ArgumentWords.h"
#include "truth/EmbeddedHandset.h"
#include "truth/StatisticalBound.h"
#include "truth/TruthHandset.h"

namespace {

constexpr unsigned kHandsets = 20;
constexpr double kNoise = 2.0;  // counts
constexpr int kSamples = 64;
// What the scenarios' sensors take as their reference.
constexpr double kReferencePulses = 32;
constexpr double kReferenceCurrent = 18;
constexpr double kReferenceCounts = 140;  // at 50 mm

/// How far an average near `counts` may be from the truth.
double averageBound(double counts) {
  const truth::MeanError error = truth::meanError(kNoise, 1, kSamples, counts);
  return truth::deviationsFor(kHandsets * 8) * error.deviation + error.rounding;
}

double numberBehind(const std::string& label, const Captured& run) {
  const std::vector<double> numbers = numbersAfter(label, run.out);
  EXPECT_EQ(numbers.size(), 1U) << label << "\n" << run.out << run.err;
  return numbers.empty() ? 0 : numbers.front();
}

/// What is different between handsets.
struct Truth {
  Truth(unsigned handset, const std::string& sensor) : seed(handset) {
    std::mt19937 generator(handset);
    gain = std::uniform_real_distribution<double>(0.7, 1.3)(generator);
    crosstalk = std::uniform_real_distribution<double>(5, 250)(generator);
    targetMm = std::uniform_real_distribution<double>(25, 40)(generator);
    wanted = std::uniform_real_distribution<double>(0.3, 1.3)(generator);
    overrides = {"hub.seed=" + std::to_string(handset), "sensor." + sensor + ".scale=" + std::to_string(gain),
                 "sensor." + sensor + ".noise=" + std::to_string(kNoise),
                 "world.window_crosstalk=" + std::to_string(crosstalk)};
  }

  [[nodiscard]] double TargetLight() const { return kReferenceCounts * (50 / targetMm) * (50 / targetMm); }
  /// At the reference setting, without an offset.
  [[nodiscard]] double Counts() const { return gain * (TargetLight() + crosstalk); }
  [[nodiscard]] std::string TargetOverride() const {
    return "world.target_distance=" + std::to_string(targetMm);
  }
  /// The target before the window from `second` on, and nothing until then.
  [[nodiscard]] std::string TargetFrom(double second) const {
    return "world.target_distance=[{at=0.0,value=100000.0},{at=" + std::to_string(second) +
           ",value=" + std::to_string(targetMm) + "}]";
  }

  unsigned seed = 0;
  double gain = 1;
  double crosstalk = 0;  // counts
  double targetMm = 0;
  double wanted = 1;  // share of what the target reads now
  std::vector<std::string> overrides;
};

class ProxOffsetTruth : public testing::TestWithParam<unsigned> {};

const std::string kHowMany = std::to_string(kSamples);

TEST_P(ProxOffsetTruth, PulseNumberMakesTheTargetReadWhatItShould) {
  const Truth truth(GetParam(), "proximity_raw");
  TruthHandset handset("t5h5", truth.overrides);
  const double now = truth.Counts();
  const double wanted = std::round(now * truth.wanted);
  const std::vector<std::string> calibrate{"-q", "prox", "-s", kHowMany, "ppulse", std::to_string(wanted)};

  const Captured run = handset.Run(calibrate, {truth.TargetOverride()});
  ASSERT_EQ(run.result, 0) << run.err;
  EXPECT_NEAR(numberBehind("ADC_AVG:", run), now, averageBound(now));
  const double pulses = numberBehind("PPULSE:", run) + 1;
  const double ideal = wanted * kReferencePulses / now;
  // Half a pulse for rounding to whole ones.
  EXPECT_NEAR(pulses, ideal, 0.5 + ideal * averageBound(now) / (now - averageBound(now)));

  const Captured again =
      handset.Run({"-q", "prox", "-s", kHowMany},
                  {truth.TargetOverride(), "hub.seed=" + std::to_string(1000 + truth.seed)});
  ASSERT_EQ(again.result, 0) << again.err;
  EXPECT_NEAR(numberBehind("ADC_AVG:", again), wanted,
              0.5 * now / kReferencePulses + (1 + ideal / kReferencePulses) * averageBound(wanted));

  // Calibrated once more from there it stays: no step is nearer.
  const Captured third = handset.Run(calibrate, {truth.TargetOverride()});
  ASSERT_EQ(third.result, 0) << third.err;
  EXPECT_NEAR(numberBehind("PPULSE:", third) + 1, ideal,
              0.5 + ideal * averageBound(wanted) / (wanted - averageBound(wanted)));
}

TEST_P(ProxOffsetTruth, CurrentMakesTheTargetReadWhatItShould) {
  const Truth truth(GetParam(), "proximity_raw");
  TruthHandset handset("rufael", truth.overrides);
  const double now = truth.Counts();
  const double wanted = std::round(now * truth.wanted);

  const Captured run = handset.Run({"-q", "prox", "-s", kHowMany, "pldrive", std::to_string(wanted)},
                                   {truth.TargetOverride()});
  ASSERT_EQ(run.result, 0) << run.err;
  const double current = numberBehind("NEW PLDRIVE:", run);
  const double ideal = wanted * kReferenceCurrent / now;
  // Half a step for rounding to whole ones, and a count of the average whose fraction is cut off.
  const double error = averageBound(now) + 1;
  EXPECT_NEAR(current, ideal, 0.5 + ideal * error / (now - error));

  const Captured again =
      handset.Run({"-q", "prox", "-s", kHowMany},
                  {truth.TargetOverride(), "hub.seed=" + std::to_string(1000 + truth.seed)});
  ASSERT_EQ(again.result, 0) << again.err;
  EXPECT_NEAR(numberBehind("ADC_AVG:", again), wanted,
              0.5 * now / kReferenceCurrent + (1 + ideal / kReferenceCurrent) * (averageBound(wanted) + 1));
}

TEST_P(ProxOffsetTruth, StoredOffsetTakesTheCrosstalkOff) {
  const Truth truth(GetParam(), "proximity_raw");
  for (const char* const scenario : {"t5h5", "rufael", "whiskel"}) {
    TruthHandset handset(scenario, truth.overrides);
    const Captured run = handset.Run({"-q", "prox", "-s", kHowMany, "poffset", "disable", "-w"},
                                     {"world.target_distance=100000"});
    ASSERT_EQ(run.result, 0) << run.err;
    EXPECT_EQ(numberBehind("NEW POFFSET:", run), std::round(truth.crosstalk));
    EXPECT_EQ(numberBehind("NEW ORE:", run), 0);
    EXPECT_LE(numberBehind("ADC_AVG:", run), 1 + kNoise);  // noise that is cut off at 0

    // The hub has started anew since: only what the registry holds is left.
    const Captured again = handset.Run({"-q", "prox", "-s", kHowMany}, {truth.TargetOverride()});
    ASSERT_EQ(again.result, 0) << again.err;
    const double emitter = std::string(scenario) == "whiskel" ? 26 / kReferencePulses : 1;
    const double left =
        emitter * truth.gain * (truth.TargetLight() + truth.crosstalk - std::round(truth.crosstalk));
    EXPECT_NEAR(numberBehind("ADC_AVG:", again), left, averageBound(left)) << scenario;
  }
}

/// Runs a command on a hub that goes on living.
template <class Command>
Captured runOn(truth::EmbeddedHandset& handset, DeviceType type, std::initializer_list<const char*> words) {
  ArgumentWords argumentWords(words);
  Calibrator::Arguments arguments;
  arguments.deviceType = type;
  arguments.quiet = true;
  arguments.command = "prox";
  arguments.argc = argumentWords.argc();
  arguments.argv = argumentWords.argv();
  Command command(handset.connection());
  return capture([&] { return command.Run(arguments); });
}

std::string described(const std::string& scenario, const Truth& truth, const std::vector<std::string>& more) {
  std::string text = ":" + scenario + "?";
  for (const std::string& setting : truth.overrides) text += setting + "&";
  for (const std::string& setting : more) text += setting + "&";
  return text;
}

TEST_P(ProxOffsetTruth, HubLearnsTheCrosstalkWhenItIsAskedTo) {
  const Truth truth(GetParam(), "proximity");
  truth::EmbeddedHandset handset(described("p2m2", truth, {truth.TargetFrom(24)}));
  const Captured before = runOn<ProxPoffset>(handset, DeviceType::p2m2, {"prox", "-s", "64"});
  ASSERT_EQ(before.result, 0) << before.err;
  const double crosstalk = truth.gain * truth.crosstalk;
  EXPECT_NEAR(numberBehind("ADC_AVG:", before), crosstalk, averageBound(crosstalk));

  const Captured learns = runOn<ProxPoffset>(handset, DeviceType::p2m2, {"prox", "poffset", "-s", "64"});
  ASSERT_EQ(learns.result, 0) << learns.err;
  EXPECT_LE(numberBehind("ADC_AVG:", learns), 1 + kNoise);
  // Until the target is there.
  EXPECT_EQ(runOn<ProxPoffset>(handset, DeviceType::p2m2, {"prox", "-s", "64"}).result, 0);
  const Captured after = runOn<ProxPoffset>(handset, DeviceType::p2m2, {"prox", "-s", "64"});
  ASSERT_EQ(after.result, 0) << after.err;
  const double left = truth.gain * (truth.TargetLight() + truth.crosstalk - std::round(truth.crosstalk));
  EXPECT_NEAR(numberBehind("ADC_AVG:", after), left, averageBound(left));
}

TEST_P(ProxOffsetTruth, ExtensionReachesCrosstalkThatTheOffsetAloneDoesNot) {
  const Truth truth(GetParam(), "proximity_raw");
  const double crosstalk = truth.crosstalk + 280;
  const std::vector<std::string> dirty{"world.window_crosstalk=" + std::to_string(crosstalk),
                                       truth.TargetFrom(25)};
  truth::EmbeddedHandset handset(described("whiskel", truth, dirty));
  const auto run = [&](std::initializer_list<const char*> words) {
    return runOn<UdProxCalibrator>(handset, DeviceType::whiskel, words);
  };
  const Captured without = run({"prox", "-s", "64", "poffset", "-w"});
  ASSERT_EQ(without.result, 0) << without.err;
  EXPECT_EQ(numberBehind("NEW POFFSET:", without), 255);
  const double left = 26 / kReferencePulses * truth.gain * (crosstalk - 255);
  EXPECT_NEAR(numberBehind("ADC_AVG:", without), left, averageBound(left));

  EXPECT_EQ(run({"prox", "ore", "enable", "16", "4"}).result, 0);
  const Captured with = run({"prox", "-s", "64", "poffset", "-w"});
  ASSERT_EQ(with.result, 0) << with.err;
  const double steps = std::floor(crosstalk / 64);
  EXPECT_EQ(numberBehind("NEW ORE:", with), steps);
  EXPECT_EQ(numberBehind("NEW POFFSET:", with), std::round(crosstalk - 64 * steps));
  EXPECT_LE(numberBehind("ADC_AVG:", with), 1 + kNoise);

  EXPECT_EQ(run({"prox", "-s", "64"}).result, 0);  // until the target is there
  const Captured target = run({"prox", "-s", "64"});
  ASSERT_EQ(target.result, 0) << target.err;
  const double light = 26 / kReferencePulses * truth.gain *
                       (truth.TargetLight() + crosstalk - 64 * steps - std::round(crosstalk - 64 * steps));
  EXPECT_NEAR(numberBehind("ADC_AVG:", target), light, averageBound(light));
}

INSTANTIATE_TEST_SUITE_P(Handsets, ProxOffsetTruth, testing::Range(1U, kHandsets + 1));

}  // namespace
