// Time as the hub client library sees it: every steady time, timed wait and sleep of a run comes from the
// one Clock that belongs to its connection. Real time for a real hub (RealClock), simulated time for a hub
// in this process (transport/EmbeddedHub.h).
#pragma once

#include <chrono>
#include <condition_variable>
#include <mutex>

namespace ssc {

class Clock;

/// A condition variable whose waits take their time from a Clock. Used with a std::mutex, like the standard
/// one.
class Condition {
 public:
  /// When a waiter that is woken in simulated time goes on: after the event thread has come to rest, which
  /// makes a run repeatable, or at once, for a waiter that a handler may be waiting for.
  enum class Resume { kAfterEvents, kAtOnce };

  explicit Condition(Clock& clock, Resume resume = Resume::kAfterEvents) : clock_(clock), resume_(resume) {}
  Condition(const Condition&) = delete;
  Condition& operator=(const Condition&) = delete;

  /// Wakes every thread that waits now.
  void notify_all();

 private:
  friend class RealClock;
  friend class SimulatedClock;
  Clock& clock_;
  const Resume resume_;
  std::condition_variable native_;
};

class Clock {
 public:
  using Duration = std::chrono::nanoseconds;
  /// Steady time since an arbitrary start.
  using TimePoint = std::chrono::time_point<Clock, Duration>;

  virtual ~Clock() = default;

  [[nodiscard]] virtual TimePoint now() const = 0;

  /// Releases `lock`, waits until `condition` is notified or `timeout` has passed, and takes it again.
  /// One wait: it may also return early for no reason.
  virtual void wait(Condition& condition, std::unique_lock<std::mutex>& lock, Duration timeout) = 0;

  /// The same with a deadline on the system's clock, so that setting that clock moves the deadline.
  virtual void waitBySystemTime(Condition& condition, std::unique_lock<std::mutex>& lock, Duration timeout) {
    wait(condition, lock, timeout);
  }

  virtual void notifyAll(Condition& condition) = 0;

  virtual void sleepFor(Duration duration) = 0;

  // What the connection's event thread asks. In real time events happen by themselves; in simulated time they
  // happen while a thread waits, and the event thread is what makes them happen.

  /// Event thread: returns when events may happen (real time: at once), or after stopWaiting().
  virtual void awaitIdle() {}
  /// Event thread: the time up to which events may happen now.
  [[nodiscard]] virtual TimePoint horizon() { return TimePoint::max(); }
  /// Event thread: nothing more happens up to the horizon, as it was when it was last asked.
  virtual void horizonReached() {}
  /// Any thread: the hub was asked for something, so that more may happen up to the horizon after all.
  virtual void hubAsked() {}
  /// Any thread: ends awaitIdle() for good.
  virtual void stopWaiting() {}
};

class RealClock final : public Clock {
 public:
  [[nodiscard]] TimePoint now() const override;
  void wait(Condition& condition, std::unique_lock<std::mutex>& lock, Duration timeout) override;
  void waitBySystemTime(Condition& condition, std::unique_lock<std::mutex>& lock, Duration timeout) override;
  void notifyAll(Condition& condition) override;
  void sleepFor(Duration duration) override;

 private:
  template <class TimeSource>
  static void waitOn(Condition& condition, std::unique_lock<std::mutex>& lock, Duration timeout);
};

/// `time` + `duration`, or the largest time when that would overflow. `duration` >= 0.
template <class TimePoint>
constexpr TimePoint saturatingAdd(TimePoint time, typename TimePoint::duration duration) {
  if (time > TimePoint::max() - duration) return TimePoint::max();
  return time + duration;
}

/// Any duration in nanoseconds; what does not fit becomes the nearest end of the range, a
/// not-a-number duration 0.
template <class Rep, class Period>
constexpr Clock::Duration saturatingNanoseconds(const std::chrono::duration<Rep, Period>& duration) {
  // A long double holds every 64-bit count exactly, and its range keeps the conversion from overflowing.
  using LongNanoseconds = std::chrono::duration<long double, std::nano>;
  const long double count = std::chrono::duration_cast<LongNanoseconds>(duration).count();
  if (!(count == count)) return Clock::Duration::zero();
  if (count >= LongNanoseconds(Clock::Duration::max()).count()) return Clock::Duration::max();
  if (count <= LongNanoseconds(Clock::Duration::min()).count()) return Clock::Duration::min();
  return Clock::Duration(static_cast<Clock::Duration::rep>(count));
}

}  // namespace ssc
