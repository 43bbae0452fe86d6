#include "ssc/transport/Descriptor.h"

#include <algorithm>
#include <array>
#include <cstdint>
#include <ctime>

#include <poll.h>
#include <sys/eventfd.h>

namespace ssc {
namespace {

/// How long from now to `deadline`, for ppoll; null for ever.
std::timespec* remaining(Clock::TimePoint deadline, std::timespec* out) {
  if (deadline == Clock::TimePoint::max()) return nullptr;
  const auto left = std::max(Clock::Duration::zero(), deadline - RealClock().now());
  const auto seconds = std::chrono::duration_cast<std::chrono::seconds>(left);
  out->tv_sec = seconds.count();
  out->tv_nsec = (left - seconds).count();
  return out;
}

}  // namespace

Interrupter::Interrupter() : event_(::eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK)) {}

void Interrupter::Signal() {
  const std::uint64_t one = 1;
  [[maybe_unused]] const auto written = ::write(event_.get(), &one, sizeof one);
}

Interrupter::Woken Interrupter::WaitReadable(int fd, Clock::TimePoint deadline) {
  for (;;) {
    std::array<pollfd, 2> polled{{{event_.get(), POLLIN, 0}, {fd, POLLIN, 0}}};
    std::timespec timeout{};
    const int ready = ::ppoll(polled.data(), polled.size(), remaining(deadline, &timeout), nullptr);
    if (ready < 0) continue;  // a signal
    if (ready == 0) return Woken::kDeadline;
    if ((polled[0].revents & POLLIN) != 0) {
      std::uint64_t count = 0;
      [[maybe_unused]] const auto got = ::read(event_.get(), &count, sizeof count);
      return Woken::kInterrupted;
    }
    if (polled[1].revents != 0) return Woken::kReady;
  }
}

}  // namespace ssc
