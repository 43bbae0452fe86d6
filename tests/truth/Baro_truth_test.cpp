// "baro" against the truth that the scenario injects, over 200 seeds of noise, each with another pressure,
// offset and temperature: the offset is found within what the noise allows, on both kinds of stream, and
// after the notification the same hub's calibrated readings are right.
#include <chrono>
#include <cmath>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <map>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "framework/Calibrator.h"
#include "framework/Statistics.h"
#include "main/Driver.h"
#include "main/SimulatedHandset.h"
#include "support/ArgumentWords.h"
#include "truth/EmbeddedHandset.h"
#include "truth/StatisticalBound.h"
#include "truth/TruthHandset.h"

namespace truth {
namespace {

constexpr std::uint64_t kSeeds = 200;
constexpr double kNoise = 0.02;             // hPa
constexpr double kStep = 0.000244140625;    // hPa
constexpr double kTemperatureNoise = 0.01;  // °C
constexpr double kTemperatureStep = 0.01;   // °C
constexpr double kMiddlePressure = 1010;    // hPa
constexpr int kSeconds = 2;
// 2 s at 20 Hz and 5 Hz; the last reading is on its way when the time is over.
constexpr std::size_t kReadings = 39;
constexpr std::size_t kTemperatures = 9;
// Looked at for every seed: two offsets, two temperatures, two noises, the error left over, on two streams.
// Twenty leaves room for those about all seeds together.
constexpr std::size_t kTrials = 20 * kSeeds;

/// The number behind a label at the front of a line; not a number unless there is one.
double numberBehind(const std::string& label, const std::string& output) {
  const std::vector<double> numbers = numbersAfter(label, output);
  return numbers.size() == 1 ? numbers.front() : std::nan("");
}

/// What a seed's handset is really like. The numbers repeat after different numbers of seeds.
struct Truth {
  explicit Truth(std::uint64_t seed)
      : pressure(950 + 7.25 * static_cast<double>(seed % 17)),
        offset(-6.5 + 0.8125 * static_cast<double>(seed % 19)),
        temperature(20 + 1.5 * static_cast<double>(seed % 13)) {}

  /// The chip's offset at this temperature.
  [[nodiscard]] double offsetNow() const { return offset + kSlope * (temperature - kReferenceTemperature); }
  [[nodiscard]] double chipTemperature() const { return temperature + kTemperatureOffset; }

  static constexpr double kSlope = 0.015;  // hPa per °C
  static constexpr double kReferenceTemperature = 25;
  static constexpr double kTemperatureOffset = 0.4;

  double pressure;     // hPa
  double offset;       // hPa
  double temperature;  // °C
};

std::string describe(const char* scenario, std::uint64_t seed, const Truth& truth) {
  char text[512];
  (void)std::snprintf(
      text, sizeof text,
      ":%s?hub.seed=%llu&world.pressure=%.9g&world.temperature=%.9g&sensor.pressure.bias=%.9g"
      "&sensor.pressure.temperature_slope=%.9g&sensor.pressure.noise=%.9g&sensor.pressure.quantisation=%.15g"
      "&sensor.pressure_temperature.bias=%.9g&sensor.pressure_temperature.noise=%.9g"
      "&sensor.pressure_temperature.quantisation=%.9g",
      scenario, static_cast<unsigned long long>(seed), truth.pressure, truth.temperature, truth.offset,
      Truth::kSlope, kNoise, kStep, Truth::kTemperatureOffset, kTemperatureNoise, kTemperatureStep);
  return text;
}

/// Listens to one stream, as a command would.
class Listener : public Calibrator {
 public:
  explicit Listener(ssc::Connection* hubConnection) : Calibrator(hubConnection, "", "") {}
  [[nodiscard]] int Run(const Arguments&) override { return 0; }

  /// The mean of what the sensor of a data type says in kSeconds; not a number when it says nothing.
  [[nodiscard]] double Mean(const std::string& dataType) {
    std::map<std::string, ssc::SensorUid> suids;
    if (LookupSuidsByName({dataType}, &suids, nullptr, SNS_STD_SENSOR_STREAM_TYPE_STREAMING) != 0)
      return std::nan("");
    SetSensorInfo(suids[dataType], dataType, 20);
    double mean = std::nan("");
    (void)capture([&] {
      if (!IsCollected(CollectSamples(std::chrono::seconds(kSeconds), false))) return;
      mean = static_cast<double>(sampleFloatMean(samples[suids[dataType]]));
    });
    return mean;
  }
};

struct Stream {
  const char* scenario;
  const char* group;
  const char* begins;
  bool isRaw;
};

class BaroTruth : public testing::TestWithParam<Stream> {
 protected:
  [[nodiscard]] static double MeasureSeed(std::uint64_t seed);
  static void ExpectScatter(const std::vector<double>& errors);

  /// Both numbers that a run prints about its readings are what the noise allows.
  static void ExpectNoise(const Captured& run, const Truth& truth) {
    const Range ratio = varianceRatioRange(kReadings - 1, kTrials);
    const double rounding = meanError(kNoise, kStep, kReadings, truth.pressure).rounding;
    const double stdev = numberBehind("STDEV:", run.out);
    const double variance = kNoise * kNoise + kStep * kStep / 12;
    EXPECT_GT(stdev, std::sqrt(variance * ratio.low) - rounding);
    EXPECT_LT(stdev, std::sqrt(variance * ratio.high) + rounding);
    const MeanError error =
        meanError(kTemperatureNoise, kTemperatureStep, kTemperatures, truth.chipTemperature());
    EXPECT_NEAR(numberBehind("TEMP:", run.out), truth.chipTemperature(),
                deviationsFor(kTrials) * error.deviation + error.rounding + kPrinted);
  }

  static constexpr double kPrinted = 0.5e-6 + 1e-12;  ///< six digits, read back in double precision
};

/// A seed's handset, calibrated twice and listened to before and between. Returns the first offset's error.
double BaroTruth::MeasureSeed(std::uint64_t seed) {
  const Stream& stream = GetParam();
  const Truth truth(seed);
  EmbeddedHandset handset(describe(stream.scenario, seed, truth));
  if (handset.connection() == nullptr) return std::nan("");
  const MeanError error = meanError(kNoise, kStep, kReadings, truth.pressure);
  const double reach = deviationsFor(kTrials);
  const double storing = floatRounding(truth.pressure);
  const double within = reach * error.deviation + error.rounding + storing;

  // Before: the calibrated stream is off by the whole offset.
  EXPECT_NEAR(Listener(handset.connection()).Mean("pressure"), truth.pressure + truth.offsetNow(), within);

  const Captured first = handset.runBaro(truth.pressure, kSeconds);
  EXPECT_EQ(first.result, 0) << first.out << first.err;
  EXPECT_NE(first.out.find(stream.begins), std::string::npos);
  const double found = handset.stored(stream.group, "bias.x");
  EXPECT_NEAR(found, truth.offsetNow(), within);
  EXPECT_NEAR(numberBehind("BIAS:", first.out), found, kPrinted);
  ExpectNoise(first, truth);

  // After, on the same hub: the errors of both measurements are left, which are independent of each other.
  EXPECT_NEAR(Listener(handset.connection()).Mean("pressure"), truth.pressure,
              reach * std::sqrt(2.0) * error.deviation + 2 * error.rounding + 2 * storing);

  // And a second calibration, which on the calibrated stream has to add what is taken off already.
  const Captured second = handset.runBaro(truth.pressure, kSeconds);
  EXPECT_EQ(second.result, 0) << second.out << second.err;
  EXPECT_NEAR(numberBehind("WARN: PREV_BIAS:", second.out), found, kPrinted);
  const double again = handset.stored(stream.group, "bias.x");
  EXPECT_NEAR(again, truth.offsetNow(), within + storing);
  EXPECT_NEAR(numberBehind("MEAN:", second.out), truth.pressure + (stream.isRaw ? again : again - found),
              4 * storing + kPrinted);
  ExpectNoise(second, truth);
  return found - truth.offsetNow();
}

/// The errors of many measurements scatter as the noise says, no less (then seeds would not matter) and no
/// more, and about nothing.
void BaroTruth::ExpectScatter(const std::vector<double>& errors) {
  const MeanError one = meanError(kNoise, kStep, kReadings, kMiddlePressure);
  const auto n = static_cast<double>(errors.size());
  double sum = 0;
  double squares = 0;
  for (const double error : errors) {
    sum += error;
    squares += error * error;
  }
  EXPECT_NEAR(sum / n, 0, deviationsFor(kTrials) * one.deviation / std::sqrt(n) + one.rounding);
  const Range ratio = varianceRatioRange(errors.size(), kTrials);
  EXPECT_GT(std::sqrt(squares / n), one.deviation * std::sqrt(ratio.low) - one.rounding);
  EXPECT_LT(std::sqrt(squares / n), one.deviation * std::sqrt(ratio.high) + one.rounding);
}

TEST_P(BaroTruth, TheInjectedOffsetIsFoundAndItsErrorGoneAfterTheNotification) {
  std::vector<double> errors;
  for (std::uint64_t seed = 1; seed <= kSeeds; ++seed) {
    SCOPED_TRACE("seed " + std::to_string(seed));
    errors.push_back(MeasureSeed(seed));
  }
  ExpectScatter(errors);
}

INSTANTIATE_TEST_SUITE_P(
    BothStreams, BaroTruth,
    testing::Values(Stream{"o1v1", "barochip_0_platform.pressure.fac_cal", "begins with Raw samples", true},
                    Stream{"e4d4", "barochip4_0_platform.pressure.fac_cal", "begins with Calibrated samples",
                           false}),
    [](const testing::TestParamInfo<Stream>& each) { return std::string(each.param.scenario); });

/// Standard output of a whole run of the program on a fresh handset.
std::string outputOf(const std::string& hub) {
  const support::TemporaryFolder folder;
  ::setenv("VANTLE_ROOT", folder.path().c_str(), 1);
  ::setenv("VANTLE_HUB", hub.c_str(), 1);
  ArgumentWords words{"vantle", "-v", "4", "baro", "1013.25"};
  const Captured run = capture([&] {
    if (!prepareSimulatedHandset(stderr)) return -1;
    return runVantle(words.argc(), words.argv(), makeEmbeddedHub);
  });
  ::unsetenv("VANTLE_ROOT");
  ::unsetenv("VANTLE_HUB");
  EXPECT_EQ(run.result, 0) << run.out << run.err;
  return run.out;
}

TEST(BaroDeterminism, OneScenarioAndSeedGiveTheSameBytes) {
  for (const std::string scenario : {"o1v1", "p2m2", "e4d4", "t5h5", "rufael", "whiskel"}) {
    const std::string hub = "sim:" + scenario + "?hub.seed=7";
    EXPECT_EQ(outputOf(hub), outputOf(hub)) << scenario;
  }
}

TEST(BaroDeterminism, FaultsStrikeInTheSamePlace) {
  const std::string hub =
      "sim:o1v1?fault.a.kind=hub_away&fault.a.after=7&fault.a.down_for=0.1&fault.a.times=3&hub.batch=2"
      "&fault.b.kind=reorder&fault.c.kind=short_event&fault.c.after=9&fault.c.count=2&fault.d.kind=duplicate"
      "&fault.d.sensor=pressure_raw";
  EXPECT_EQ(outputOf(hub), outputOf(hub));
}

TEST(BaroDeterminism, AnotherSeedGivesOtherReadings) {
  EXPECT_NE(outputOf("sim:o1v1?hub.seed=1"), outputOf("sim:o1v1?hub.seed=2"));
}

}  // namespace
}  // namespace truth
