// The computations of the multi-point IMU calibration: a step's, on as many samples as a collection has and
// on a hundred times that, and the last step's.
#include <array>
#include <cmath>
#include <random>
#include <vector>

#include <benchmark/benchmark.h>

#include "imu/ImuMultipointFit.h"
#include "imu/ImuMultipointSamples.h"
#include "imu/ImuMultipointSolution.h"

namespace {

constexpr double kRateHz = 400;

std::vector<Sample> noisySamples(std::int64_t count) {
  std::mt19937 random(1);
  std::normal_distribution<float> noise(0, 0.02F);
  std::vector<Sample> samples;
  samples.reserve(static_cast<std::size_t>(count));
  for (std::int64_t i = 0; i < count; ++i) {
    const std::array<float, 3> values{noise(random), noise(random), 9.8F + noise(random)};
    samples.emplace_back(static_cast<double>(i) / kRateHz, values.begin(), values.end());
  }
  for (std::size_t i = 0; i < 10; ++i) samples[samples.size() / 11 * (i + 1)].values[0] += 5;
  return samples;
}

void BM_RemoveOutliers(benchmark::State& state) {
  const std::vector<Sample> samples = noisySamples(state.range(0));
  std::size_t removed = 0;
  for (auto _ : state) {
    state.PauseTiming();
    std::vector<Sample> mine = samples;
    state.ResumeTiming();
    removed = removeOutliers(&mine, OutlierRemoval(), [](const Outlier&) {});
    benchmark::DoNotOptimize(mine.data());
  }
  if (removed != 10) state.SkipWithError("the outliers were not found");
  state.SetItemsProcessed(state.iterations() * state.range(0));
}
BENCHMARK(BM_RemoveOutliers)->Arg(1000)->Arg(100000)->Unit(benchmark::kMicrosecond);

void BM_IntegrateRotation(benchmark::State& state) {
  const std::vector<Sample> samples = noisySamples(state.range(0));
  for (auto _ : state) benchmark::DoNotOptimize(integrateRotation(samples));
  state.SetItemsProcessed(state.iterations() * state.range(0));
}
BENCHMARK(BM_IntegrateRotation)->Arg(1000)->Arg(100000)->Unit(benchmark::kMicrosecond);

void BM_FindSteadyRate(benchmark::State& state) {
  const std::vector<Sample> samples = noisySamples(state.range(0));
  for (auto _ : state) benchmark::DoNotOptimize(findSteadyRate(samples, 0));
  state.SetItemsProcessed(state.iterations() * state.range(0));
}
BENCHMARK(BM_FindSteadyRate)->Arg(1000)->Arg(100000)->Unit(benchmark::kMicrosecond);

/// Records of a whole procedure, repeated up to `count`.
std::vector<ImuCalibrationInfo> manyRecords(std::int64_t count) {
  const std::array<const char*, 9> lines{
      "a+x 9.9 0.1 0.2 0.01 0.02 0.03 25 2 0 0 0",  "g+x 9.9 0.1 0.2 1.5 0.02 0.03 25 2 3.1 0.1 0",
      "a-x -9.7 0.1 0.2 0.01 0.02 0.03 25 2 0 0 0", "a+y 0.1 9.9 0.2 0.01 0.02 0.03 25 2 0 0 0",
      "g+y 0.1 9.9 0.2 0 1.5 0.03 25 2 0.1 3.1 0",  "a-y 0.1 -9.7 0.2 0.01 0.02 0.03 25 2 0 0 0",
      "a+z 0.1 0.2 9.9 0.01 0.02 0.03 25 2 0 0 0",  "g+z 0.1 0.2 9.9 0 0.02 1.5 25 2 0 0.1 3.1",
      "a-z 0.1 0.2 -9.7 0.01 0.02 0.03 25 2 0 0 0"};
  std::vector<ImuCalibrationInfo> records;
  for (std::int64_t i = 0; i < count; ++i) {
    records.emplace_back(std::string(lines[static_cast<std::size_t>(i) % lines.size()]));
  }
  // A procedure cut in the middle of an axis has no pose after its last rotation.
  while (!records.empty() && records.back().phase[0] == 'g') records.pop_back();
  return records;
}

void BM_SolvePhases(benchmark::State& state) {
  const std::vector<ImuCalibrationInfo> records = manyRecords(state.range(0));
  const Matrix3by3<double> gravity({9.80665, 0, 0, 0, 9.80665, 0, 0, 0, 9.80665});
  const Matrix3by3<double> turn({3.14159265, 0, 0, 0, 3.14159265, 0, 0, 0, 3.14159265});
  const ImuTrace noTrace = [](const std::string& text) { benchmark::DoNotOptimize(text.data()); };
  bool valid = true;
  for (auto _ : state) {
    const AccelCalibrationInput accel = makeAccelInput(records, gravity);
    const GyroCalibrationInput gyro = makeGyroInput(records, turn);
    valid = accel.valid && gyro.valid;
    if (!valid) break;
    benchmark::DoNotOptimize(solveAccel(accel, noTrace));
    benchmark::DoNotOptimize(solveGyro(gyro, noTrace));
  }
  if (!valid) state.SkipWithError("the records make no input");
  state.SetItemsProcessed(state.iterations() * state.range(0));
}
BENCHMARK(BM_SolvePhases)->Arg(9)->Arg(1000)->Arg(100000)->Unit(benchmark::kMicrosecond);

void BM_FitPositions(benchmark::State& state) {
  std::mt19937 random(1);
  std::normal_distribution<double> normal(0, 1);
  std::vector<SampleData> means;
  for (std::int64_t i = 0; i < state.range(0); ++i) {
    std::array<double, 3> force{normal(random), normal(random), normal(random)};
    const double length = std::hypot(force[0], force[1], force[2]);
    SampleData mean;
    for (const double axis : force) {
      mean.push_back(static_cast<float>(axis / length * 9.80665 * 1.01 + 0.2 + 0.003 * normal(random)));
    }
    means.push_back(mean);
  }
  AxisCorrection fitted;
  for (auto _ : state) fitted = fitAccel(means, 9.80665F);
  if (std::fabs(fitted.scale[0] - 1 / 1.01F) > 0.01F) state.SkipWithError("the fit is wrong");
  state.SetItemsProcessed(state.iterations() * state.range(0));
}
BENCHMARK(BM_FitPositions)->Arg(6)->Arg(1000)->Arg(100000)->Unit(benchmark::kMicrosecond);

}  // namespace
