#include "fault/WatchedRun.h"

#include <algorithm>
#include <cstdlib>
#include <memory>
#include <optional>
#include <utility>

#include "main/Driver.h"
#include "main/SimulatedHandset.h"
#include "proto/sns_client.pb.h"
#include "qmi/Qmi.h"
#include "simhub/Suid.h"

namespace fault {
namespace {

constexpr std::uint32_t kSensorEvent = 1025;
constexpr std::uint32_t kProximityEvent = 769;
/// The client library's patience with a response.
constexpr double kLongestWait_s = 3;

simhub::Suid suidOfAddressee(const std::string& addressee) {
  return addressee == "suid" ? simhub::kLookupSuid : simhub::suidForName(addressee);
}

/// Hands everything through, and notes it.
class WatchedHub final : public ssc::EmbeddedHub {
 public:
  WatchedHub(std::unique_ptr<ssc::EmbeddedHub> hub, const std::string& sensor, Traffic* traffic)
      : hub_(std::move(hub)), sensor_(suidOfAddressee(sensor)), traffic_(*traffic) {}
  ~WatchedHub() override {
    stopWaiting();
    traffic_.end = seconds();
  }

  int Submit(qmi::Bytes datagram) override {
    sns_client_request_msg request;
    const auto frame = qmi::decodeRequest(datagram);
    if (frame && request.ParseFromArray(frame->payload.data(), static_cast<int>(frame->payload.size()))) {
      const simhub::Suid suid = simhub::suidOf(request.suid());
      traffic_.requests.push_back({seconds(), suid.high, suid.low, request.msg_id()});
    }
    stopWaiting();  // requests wait for their responses one after the other
    const int result = hub_->Submit(datagram);
    if (frame && result == 0) asked_ = {frame->transactionId, seconds()};
    return result;
  }

  bool RunUntil(ssc::Clock::TimePoint limit, ssc::Incoming* incoming) override {
    if (!hub_->RunUntil(limit, incoming)) return false;
    if (incoming->kind == ssc::Incoming::Kind::kDatagram) {
      note(incoming->datagram);
    } else {
      stopWaiting();  // nobody waits for a response while the hub is away
    }
    return true;
  }

  ssc::Clock::TimePoint Now() const override { return hub_->Now(); }

 private:
  [[nodiscard]] double seconds() const {
    return std::chrono::duration<double>(hub_->Now().time_since_epoch()).count();
  }

  /// The request that waits for its response, if there is one, waits no longer.
  void stopWaiting() {
    if (asked_) traffic_.waited += std::min(seconds() - asked_->second, kLongestWait_s);
    asked_.reset();
  }

  void note(const std::vector<std::uint8_t>& datagram) {
    const auto response = qmi::decodeResponse(datagram);
    if (response && asked_ && response->transactionId == asked_->first) stopWaiting();
    const auto report = qmi::decodeReport(datagram);
    sns_client_event_msg message;
    if (!report || !message.ParseFromArray(report->payload.data(), static_cast<int>(report->payload.size())))
      return;
    if (simhub::suidOf(message.suid()) != sensor_) return;
    const bool isReading =
        std::any_of(message.events().begin(), message.events().end(), [](const auto& event) {
          return event.msg_id() == kSensorEvent || event.msg_id() == kProximityEvent;
        });
    if (isReading) traffic_.readings.push_back(seconds());
  }

  const std::unique_ptr<ssc::EmbeddedHub> hub_;
  const simhub::Suid sensor_;
  Traffic& traffic_;
  std::optional<std::pair<std::uint16_t, double>> asked_;  ///< transaction and time of the last request
};

}  // namespace

std::size_t Traffic::CountRequests(const std::string& addressee, std::uint32_t message) const {
  const simhub::Suid suid = suidOfAddressee(addressee);
  return static_cast<std::size_t>(std::count_if(requests.begin(), requests.end(), [&](const Request& each) {
    return each.suidHigh == suid.high && each.suidLow == suid.low && each.message == message;
  }));
}

WatchedRun runWatched(const std::filesystem::path& root, const std::string& device,
                      const std::vector<std::string>& words, const std::vector<std::string>& overrides,
                      const std::string& sensor) {
  std::string hub = "sim:" + device + "?";
  for (const std::string& text : overrides) hub += text + "&";
  std::vector<std::string> all{"vantle", "--device", device};
  all.insert(all.end(), words.begin(), words.end());
  std::vector<char*> argv;
  for (std::string& word : all) argv.push_back(word.data());
  argv.push_back(nullptr);

  WatchedRun run;
  const auto makeWatchedHub = [&](const std::string& description, std::unique_ptr<ssc::EmbeddedHub>* made,
                                  std::string* error) {
    std::unique_ptr<ssc::EmbeddedHub> inner;
    const int result = makeEmbeddedHub(description, &inner, error);
    if (result == 0) *made = std::make_unique<WatchedHub>(std::move(inner), sensor, &run.traffic);
    return result;
  };
  (void)::setenv("VANTLE_HUB", hub.c_str(), 1);
  (void)::setenv("VANTLE_ROOT", root.c_str(), 1);
  run.captured = capture([&] {
    if (!prepareSimulatedHandset(stderr)) return -1;
    return runVantle(static_cast<int>(all.size()), argv.data(), makeWatchedHub);
  });
  (void)::unsetenv("VANTLE_HUB");
  (void)::unsetenv("VANTLE_ROOT");
  return run;
}

}  // namespace fault
