#include "ssc/Clock.h"

#include <algorithm>
#include <thread>

namespace ssc {

void Condition::notify_all() { clock_.notifyAll(*this); }

Clock::TimePoint RealClock::now() const {
  return TimePoint{std::chrono::duration_cast<Duration>(std::chrono::steady_clock::now().time_since_epoch())};
}

template <class TimeSource>
void RealClock::waitOn(Condition& condition, std::unique_lock<std::mutex>& lock, Duration timeout) {
  const auto deadline = saturatingAdd(TimeSource::now(), std::max(timeout, Duration::zero()));
  condition.native_.wait_until(lock, deadline);
}

void RealClock::wait(Condition& condition, std::unique_lock<std::mutex>& lock, Duration timeout) {
  waitOn<std::chrono::steady_clock>(condition, lock, timeout);
}

void RealClock::waitBySystemTime(Condition& condition, std::unique_lock<std::mutex>& lock, Duration timeout) {
  waitOn<std::chrono::system_clock>(condition, lock, timeout);
}

void RealClock::notifyAll(Condition& condition) { condition.native_.notify_all(); }

void RealClock::sleepFor(Duration duration) { std::this_thread::sleep_for(duration); }

}  // namespace ssc
