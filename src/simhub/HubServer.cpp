#include "simhub/HubServer.h"

#include <algorithm>
#include <cerrno>
#include <ctime>
#include <optional>
#include <utility>

namespace simhub {
namespace {

constexpr int kMaxStepsPerRound = 100'000;  // of a hub that cannot keep up, so that requests still come in

}  // namespace

HubServer::HubServer(double speed, Diagnostics diagnostics)
    : speed_(speed), diagnostics_(std::move(diagnostics)), start_(Clock::now()) {}

bool HubServer::startHub(Scenario scenario, const HubFiles& files, std::string* error) {
  hub_ = Hub::Create(std::move(scenario), files, *this, error);
  start_ = Clock::now();
  return hub_ != nullptr;
}

Time HubServer::hubTime() const {
  const double seconds = std::chrono::duration<double>(Clock::now() - start_).count();
  return fromSeconds(seconds * speed_);
}

void HubServer::advance() {
  const Time target = hubTime();
  for (int i = 0; i < kMaxStepsPerRound; ++i) {
    const std::optional<Time> next = hub_->NextEventTime();
    if (!next || *next > target) {
      hub_->AdvanceTo(target);
      return;
    }
    hub_->Step();
    if (!hub_->IsUp()) dropLost();  // before the hub can be back and take them for its own
  }
}

std::chrono::nanoseconds HubServer::untilNextEvent() const {
  const std::optional<Time> next = hub_->NextEventTime();
  if (!next) return std::chrono::nanoseconds::max();
  const double seconds = toSeconds(*next - hubTime()) / speed_;
  return seconds > 0 ? fromSeconds(seconds) : std::chrono::nanoseconds::zero();
}

int HubServer::Round(std::chrono::nanoseconds maxWait, int stop, bool* stopped) {
  std::vector<pollfd> polled{{stop, POLLIN, 0}};
  addPolled(&polled);
  const auto wait = std::min({maxWait, untilNextEvent(), patience()});
  constexpr std::chrono::nanoseconds kSecond{1'000'000'000};
  const timespec timeout{static_cast<time_t>(wait / kSecond), static_cast<long>((wait % kSecond).count())};
  const bool isBounded = wait != std::chrono::nanoseconds::max();
  if (::ppoll(polled.data(), polled.size(), isBounded ? &timeout : nullptr, nullptr) < 0) {
    return errno == EINTR ? 0 : errno;
  }
  advance();
  *stopped = (polled[0].revents & POLLIN) != 0;
  takeIncoming(std::span<const pollfd>(polled).subspan(1));
  dropLost();
  return 0;
}

int HubServer::Run(int stop) {
  bool stopped = false;
  while (!stopped) {
    if (const int error = Round(std::chrono::nanoseconds::max(), stop, &stopped); error != 0) return error;
  }
  return 0;
}

}  // namespace simhub
