// The thermal calibration: its computation for each sample against the additions that its sums need, a
// simulated hour of it from start to end, and what a sample takes in memory.
#include <chrono>
#include <cstdlib>
#include <memory>
#include <string>
#include <vector>

#include <benchmark/benchmark.h>

#include "framework/Calibrator.h"
#include "imu/ImuThermalFit.h"
#include "imu/ImuThermalTemperatures.h"
#include "main/SimulatedHandset.h"
#include "ssc/Connection.h"
#include "support/Process.h"
#include "support/TemporaryFolder.h"

namespace {

using namespace std::chrono_literals;

constexpr double kRateHz = 20;
constexpr int kHourSeconds = 3600;
// Accelerometer, gyroscope, magnetometer and barometer, and three thermometers at 1 Hz.
constexpr double kSamplesPerSecond = 4 * kRateHz + 3;
constexpr auto kDeadline = 120s;

/// Runs "vantle imu-thermal" in a process of its own; its peak memory in bytes, or less than 0.
double runCommand(benchmark::State& state, const support::TemporaryFolder& root, int seconds) {
  support::Command command;
  command.program = VANTLE_PROGRAM;
  command.arguments = {"-q", "-n", "imu-thermal", "-i", std::to_string(seconds)};
  command.environment = {{"VANTLE_HUB", "sim"}, {"VANTLE_ROOT", root.path().string()}};
  const support::Outcome outcome = support::run(command, kDeadline);
  if (!outcome.exitedWith(0)) state.SkipWithError(("the command failed: " + outcome.errors).c_str());
  state.SetIterationTime(std::chrono::duration<double>(outcome.wall).count());
  return static_cast<double>(outcome.peakMemoryKiB) * 1024;
}

/// First of all: a process that is started while this one is large counts this one's size as its own peak.
/// 298,800 samples, collected and fitted. bytes_per_sample is the peak memory beyond that of a run of 3 s.
void BM_ThermalEmbeddedSimulatedHour(benchmark::State& state) {
  const support::TemporaryFolder root;
  support::makeDeviceFolders(root.path());
  const double empty = runCommand(state, root, 3);
  double peak = 0;
  for (auto _ : state) peak = runCommand(state, root, kHourSeconds);
  state.counters["peak_MiB"] = peak / (1024 * 1024);
  state.counters["bytes_per_sample"] = (peak - empty) / (kSamplesPerSecond * kHourSeconds);
}
BENCHMARK(BM_ThermalEmbeddedSimulatedHour)->UseManualTime()->Unit(benchmark::kMillisecond);

std::vector<Sample> temperaturesOver(double seconds) {
  std::vector<Sample> temperatures;
  for (int i = 0; i <= static_cast<int>(seconds) + 1; ++i) {
    const float temperature = 30.0F + 0.005F * static_cast<float>(i % 4000);
    temperatures.emplace_back(i, &temperature, &temperature + 1);
  }
  return temperatures;
}

std::vector<Sample> readings(std::size_t count) {
  std::vector<Sample> samples;
  samples.reserve(count);
  for (std::size_t i = 0; i < count; ++i) {
    const float jitter = 0.001F * static_cast<float>(i * 29 % 17);
    const float values[] = {0.1F + jitter, -0.2F - jitter, 9.8F + jitter};
    samples.emplace_back(static_cast<double>(i) / kRateHz, values, values + 3);
  }
  return samples;
}

void perSample(benchmark::State& state) {
  state.SetComplexityN(state.range(0));
  state.counters["per_sample"] =
      benchmark::Counter(static_cast<double>(state.range(0)),
                         benchmark::Counter::kIsIterationInvariantRate | benchmark::Counter::kInvert);
}

void BM_InterpolateAndFit(benchmark::State& state) {
  const std::vector<Sample> samples = readings(static_cast<std::size_t>(state.range(0)));
  const std::vector<Sample> temperatures = temperaturesOver(samples.back().time);
  for (auto _ : state) {
    const InterpolatedTemperatures found = interpolateTemperatures(samples, temperatures);
    benchmark::DoNotOptimize(fitThermal(samples, found.values, 3));
  }
  perSample(state);
}
BENCHMARK(BM_InterpolateAndFit)->RangeMultiplier(10)->Range(10'000, 1'000'000)->Complexity(benchmark::oN);

/// `chains` sums side by side, each addition waiting for the one before it.
template <std::size_t chains>
void addUp(std::size_t count, float term) {
  float sums[chains] = {};
  for (std::size_t i = 0; i < count; ++i) {
    for (float& sum : sums) {
      sum += term;
      benchmark::DoNotOptimize(sum);
    }
  }
}

/// The yardstick: nothing but the additions of the fit's four passes, of 4 (means), 7 (squares and products),
/// 3 (residuals' means) and 3 (residuals' squares) sums. Their order is part of the result, so that none can
/// be taken before its turn.
void BM_BareAdditions(benchmark::State& state) {
  const auto count = static_cast<std::size_t>(state.range(0));
  for (auto _ : state) {
    addUp<4>(count, 0.5F);
    addUp<7>(count, 0.5F);
    addUp<3>(count, 0.5F);
    addUp<3>(count, 0.5F);
  }
  perSample(state);
}
BENCHMARK(BM_BareAdditions)->RangeMultiplier(10)->Range(10'000, 1'000'000)->Complexity(benchmark::oN);

/// The command's collection and fits at another rate than the command asks for.
class FastThermal final : public Calibrator {
 public:
  explicit FastThermal(ssc::Connection* hubConnection) : Calibrator(hubConnection, "", "") {}

  int Run(const Arguments&) override {
    std::map<std::string, ssc::SensorUid> suids;
    for (const char* const dataType : {"accel", "gyro", "mag", "pressure"}) {
      const int result = LookupSuidsByName({dataType, "sensor_temperature"}, &suids, nullptr,
                                           SNS_STD_SENSOR_STREAM_TYPE_STREAMING);
      if (result != ssc::kOk) return result;
      SetSensorInfo(suids[dataType], dataType, 400.0F);
      SetSensorInfo(suids["sensor_temperature"], "temperature", 1.0F);
      pairs_.emplace_back(suids[dataType], suids["sensor_temperature"]);
    }
    const int result = CollectSamples(std::chrono::seconds(kHourSeconds), false);
    if (!IsCollected(result)) return result;
    for (const auto& [sensor, thermometer] : pairs_) {
      const std::vector<Sample>& itsSamples = samples[sensor];
      count += itsSamples.size();
      const InterpolatedTemperatures found = interpolateTemperatures(itsSamples, samples[thermometer]);
      benchmark::DoNotOptimize(fitThermal(itsSamples, found.values, sensor == suids["pressure"] ? 1 : 3));
    }
    return ssc::kOk;
  }

  std::size_t count = 0;

 private:
  std::vector<std::pair<ssc::SensorUid, ssc::SensorUid>> pairs_;
};

/// The same at 400 Hz: 5.76 million samples.
void BM_ThermalEmbeddedSimulatedHourAt400Hz(benchmark::State& state) {
  const support::TemporaryFolder root;
  support::makeDeviceFolders(root.path());
  (void)::setenv("VANTLE_ROOT", root.path().c_str(), 1);
  (void)::setenv("VANTLE_HUB", "sim:o1v1?sensor.mag.rates=[400.0]&sensor.pressure.rates=[400.0]", 1);
  std::size_t count = 0;
  for (auto _ : state) {
    ssc::Connection* created = nullptr;
    if (ssc::Connection::Create(&created, makeEmbeddedHub) != ssc::kOk) {
      state.SkipWithError("no embedded hub");
      return;
    }
    const std::unique_ptr<ssc::Connection> connection(created);
    FastThermal calibrator(created);
    if (calibrator.Run({}) != ssc::kOk) state.SkipWithError("the collection failed");
    count = calibrator.count;
  }
  state.counters["samples"] = static_cast<double>(count);
}
BENCHMARK(BM_ThermalEmbeddedSimulatedHourAt400Hz)
    ->Unit(benchmark::kMillisecond)
    ->Iterations(1)
    ->UseRealTime();

}  // namespace
