#include "ssc/Clock.h"

#include <thread>

namespace ssc {

void Condition::notify_all() { clock_.notifyAll(*this); }

Clock::TimePoint RealClock::now() const {
  return TimePoint{std::chrono::duration_cast<Duration>(std::chrono::steady_clock::now().time_since_epoch())};
}

void RealClock::wait(Condition& condition, std::unique_lock<std::mutex>& lock, Duration timeout) {
  if (timeout <= Duration::zero()) {
    // Still a wait: whoever needs the mutex gets its turn.
    lock.unlock();
    lock.lock();
    return;
  }
  // The deadline is the system clock's: what a wait measures is left to the caller and the steady clock.
  condition.native_.wait_until(lock, saturatingAdd(std::chrono::system_clock::now(), timeout));
}

void RealClock::notifyAll(Condition& condition) { condition.native_.notify_all(); }

void RealClock::sleepFor(Duration duration) { std::this_thread::sleep_for(duration); }

}  // namespace ssc
