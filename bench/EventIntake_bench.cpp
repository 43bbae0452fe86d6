// How fast events are taken in from a hub that floods its socket: received, decoded and stored as samples by
// a calibrator; and the bare loop that only receives the same packets, as the yardstick.
#include <array>
#include <chrono>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <memory>
#include <string>
#include <vector>

#include <benchmark/benchmark.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include "Flood.h"
#include "framework/Calibrator.h"
#include "ssc/Connection.h"
#include "ssc/transport/UnixTransport.h"

namespace {

constexpr std::size_t kValuesPerEvent = 3;
constexpr std::size_t kEventsPerRun = 1'000'000;

std::string socketPath() { return "/tmp/vantle-bench-" + std::to_string(::getpid()) + ".sock"; }

/// Collects until it has enough samples.
class Collector final : public Calibrator {
 public:
  explicit Collector(ssc::Connection* hubConnection) : Calibrator(hubConnection, "", "") {}

  int Run(const Arguments&) override {
    samples[Flood::sensor()].reserve(kEventsPerRun);
    const std::vector<std::string> requests{MakeConfigRequest(Flood::sensor(), 400.0F, 0)};
    return SendRequestsAndWait(requests, std::chrono::seconds(60), nullptr);
  }

  bool OnSensorEvent(const ssc::SensorUid& suid, std::uint64_t timestamp,
                     const sns_std_sensor_event& event) override {
    Calibrator::OnSensorEvent(suid, timestamp, event);
    return ++count_ >= kEventsPerRun;
  }

  [[nodiscard]] std::size_t count() const { return count_; }

 private:
  std::size_t count_ = 0;
};

void BM_EventsStoredAsSamples(benchmark::State& state) {
  Flood flood(socketPath(), static_cast<std::size_t>(state.range(0)), kValuesPerEvent);
  for (auto _ : state) {
    ssc::HubLink link;
    if (ssc::UnixTransport::Connect(flood.path(), &link.transport) != ssc::kOk) {
      state.SkipWithError("the flooding hub cannot be reached");
      return;
    }
    link.clock = std::make_unique<ssc::RealClock>();
    const auto connection = ssc::Connection::Over(std::move(link));
    Collector collector(connection.get());
    const int result = collector.Run({});
    if (result != ssc::kOk || collector.count() < kEventsPerRun) state.SkipWithError("events were lost");
  }
  state.SetItemsProcessed(static_cast<std::int64_t>(state.iterations() * kEventsPerRun));
}

ssc::Descriptor connectTo(const std::string& path) {
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  std::snprintf(address.sun_path, sizeof address.sun_path, "%s", path.c_str());
  ssc::Descriptor socket(::socket(AF_UNIX, SOCK_SEQPACKET | SOCK_CLOEXEC, 0));
  if (::connect(socket.get(), reinterpret_cast<const sockaddr*>(&address), sizeof address) != 0) std::abort();
  return socket;
}

void BM_BareReceiveLoop(benchmark::State& state) {
  const auto eventsPerReport = static_cast<std::size_t>(state.range(0));
  Flood flood(socketPath(), eventsPerReport, kValuesPerEvent);
  std::vector<std::uint8_t> request;
  const std::string encoded = ssc::Client::MakeConfigRequest(Flood::sensor(), 400.0F, 0);
  if (!qmi::encodeRequest(1, {reinterpret_cast<const std::uint8_t*>(encoded.data()), encoded.size()},
                          &request)) {
    std::abort();
  }
  std::array<std::uint8_t, 65536> buffer{};
  for (auto _ : state) {
    const ssc::Descriptor socket = connectTo(flood.path());
    if (::send(socket.get(), request.data(), request.size(), MSG_NOSIGNAL) < 0) std::abort();
    for (std::size_t events = 0; events < kEventsPerRun; events += eventsPerReport) {
      benchmark::DoNotOptimize(::recv(socket.get(), buffer.data(), buffer.size(), 0));
    }
  }
  state.SetItemsProcessed(static_cast<std::int64_t>(state.iterations() * kEventsPerRun));
}

BENCHMARK(BM_EventsStoredAsSamples)->Arg(1)->Arg(4)->Arg(16)->Unit(benchmark::kMillisecond)->UseRealTime();
BENCHMARK(BM_BareReceiveLoop)->Arg(1)->Arg(4)->Arg(16)->Unit(benchmark::kMillisecond)->UseRealTime();

}  // namespace
