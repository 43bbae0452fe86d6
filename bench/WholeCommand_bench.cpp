// Whole commands as a script runs them, from the start of the process to its end.
#include <chrono>
#include <string>
#include <vector>

#include <benchmark/benchmark.h>
#include <signal.h>

#include "support/Process.h"
#include "support/TemporaryFolder.h"

namespace {

using namespace std::chrono_literals;

constexpr auto kDeadline = 60s;
constexpr double kCollectionMs = 2000;

/// Runs "vantle WORDS" against a hub and reports its time, less `collectionMs`, and its peak memory.
void runOnce(benchmark::State& state, const support::TemporaryFolder& root, const std::string& hub,
             const std::vector<std::string>& words, double collectionMs) {
  support::Command command;
  command.program = VANTLE_PROGRAM;
  command.arguments = words;
  command.environment = {{"VANTLE_HUB", hub}, {"VANTLE_ROOT", root.path().string()}};
  const support::Outcome outcome = support::run(command, kDeadline);
  if (!outcome.exitedWith(0)) state.SkipWithError(("the command failed: " + outcome.errors).c_str());
  const double wallMs = std::chrono::duration<double, std::milli>(outcome.wall).count();
  state.SetIterationTime((wallMs - collectionMs) / 1000.0);
  state.counters["peak_MiB"] = static_cast<double>(outcome.peakMemoryKiB) / 1024.0;
}

void BM_BaroEmbedded(benchmark::State& state) {
  const support::TemporaryFolder root;
  support::makeDeviceFolders(root.path());
  for (auto _ : state) runOnce(state, root, "sim", {"baro", "1013.25"}, 0);
}
BENCHMARK(BM_BaroEmbedded)->UseManualTime()->Unit(benchmark::kMillisecond);

/// 72,000 pressures and 18,000 temperatures.
void BM_BaroEmbeddedSimulatedHour(benchmark::State& state) {
  const support::TemporaryFolder root;
  support::makeDeviceFolders(root.path());
  for (auto _ : state) runOnce(state, root, "sim", {"-q", "baro", "-t", "3600", "1013.25"}, 0);
}
BENCHMARK(BM_BaroEmbeddedSimulatedHour)->UseManualTime()->Unit(benchmark::kMillisecond);

/// In real time against a hub in another process: what comes on top of the two seconds of collection.
void BM_BaroOverSocketBeyondCollection(benchmark::State& state) {
  const support::TemporaryFolder root;
  support::makeDeviceFolders(root.path());
  const std::string socket = (root.path() / "hub").string();
  support::Command command;
  command.program = VANTLE_HUB_PROGRAM;
  command.arguments = {"--socket", socket};
  command.environment = {{"VANTLE_ROOT", root.path().string()}};
  support::Process hub;
  if (!hub.start(command) || !hub.waitForText("listening", 10s)) {
    state.SkipWithError("vantle-hub does not start");
    return;
  }
  for (auto _ : state) runOnce(state, root, "unix:" + socket, {"baro", "1013.25"}, kCollectionMs);
  hub.signal(SIGTERM);
  hub.wait(10s);
}
BENCHMARK(BM_BaroOverSocketBeyondCollection)->UseManualTime()->Iterations(5)->Unit(benchmark::kMillisecond);

}  // namespace
