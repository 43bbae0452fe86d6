// A hub in this process, in simulated time. The same QMI bytes as over a socket are handed over by function
// call, and the clock moves only while somebody waits:
//
//   command's thread   runs ......... waits ------------------------> runs
//   event thread       idle           delivers events, in time order   idle
//   simulated time     stands still   moves from event to event        stands still
//
// A thread that waits is woken by a handler's notification or, when the next event lies past its deadline, at
// once, with the time moved to the deadline. It goes on only after the event thread has come to rest, so that
// one scenario and seed always give the same run.
#pragma once

#include <atomic>
#include <condition_variable>
#include <cstdint>
#include <list>
#include <memory>
#include <mutex>
#include <thread>

#include "ssc/Clock.h"
#include "ssc/transport/Transport.h"

namespace ssc {

/// What the library needs of a hub in the same process. Calls never overlap.
class EmbeddedHub {
 public:
  virtual ~EmbeddedHub() = default;

  /// A client's datagram arrives now. 0, or kNotConnected while the hub is away.
  [[nodiscard]] virtual int Submit(qmi::Bytes datagram) = 0;

  /// Runs the hub up to and including its next outgoing datagram or change, but no further than `limit`.
  /// True: `incoming` holds it. False: nothing comes up to `limit`, and the hub's time is `limit` (when
  /// `limit` is the largest time: nothing will ever come, and time stays).
  [[nodiscard]] virtual bool RunUntil(Clock::TimePoint limit, Incoming* incoming) = 0;

  /// The hub's time: nanoseconds since its start.
  [[nodiscard]] virtual Clock::TimePoint Now() const = 0;
};

/// The embedded hub behind one lock, shared by its clock and its transport.
class SharedEmbeddedHub {
 public:
  explicit SharedEmbeddedHub(std::unique_ptr<EmbeddedHub> hub);
  ~SharedEmbeddedHub();
  int Submit(qmi::Bytes datagram);
  bool RunUntil(Clock::TimePoint limit, Incoming* incoming);
  [[nodiscard]] Clock::TimePoint Now() const { return Clock::TimePoint{Clock::Duration{now_.load()}}; }

 private:
  std::mutex mutex_;
  std::unique_ptr<EmbeddedHub> hub_;
  std::atomic<Clock::Duration::rep> now_{0};
};

/// Simulated time: the hub's.
class SimulatedClock final : public Clock {
 public:
  explicit SimulatedClock(std::shared_ptr<SharedEmbeddedHub> hub) : hub_(std::move(hub)) {}

  [[nodiscard]] TimePoint now() const override { return hub_->Now(); }
  void wait(Condition& condition, std::unique_lock<std::mutex>& lock, Duration timeout) override;
  void notifyAll(Condition& condition) override;
  void sleepFor(Duration duration) override;

  void awaitIdle() override;
  [[nodiscard]] TimePoint horizon() override;
  void horizonReached() override;
  void hubAsked() override;
  void stopWaiting() override;

 private:
  struct Waiter {
    const Condition* condition;  ///< null: a sleeper, which nobody notifies
    TimePoint deadline;
    bool resumesAtOnce;
    bool woken = false;
  };

  /// Blocks the calling thread until it is woken and may go on. `alongside` is released first, if given.
  void block(const Condition* condition, Duration timeout, std::unique_lock<std::mutex>* alongside);
  [[nodiscard]] bool mayRunEvents() const;

  std::shared_ptr<SharedEmbeddedHub> hub_;
  mutable std::mutex mutex_;
  std::condition_variable changed_;
  std::list<Waiter> waiters_;
  std::uint64_t changes_ = 0;           ///< counts whatever may let events happen again
  std::uint64_t changesAtHorizon_ = 0;  ///< when the horizon was last asked
  std::thread::id eventThread_;
  bool eventThreadAtRest_ = false;
  bool stopped_ = false;
};

class EmbeddedTransport final : public Transport {
 public:
  explicit EmbeddedTransport(std::shared_ptr<SharedEmbeddedHub> hub) : hub_(std::move(hub)) {}

  [[nodiscard]] int Send(qmi::Bytes datagram) override { return hub_->Submit(datagram); }
  [[nodiscard]] Outcome Receive(Clock::TimePoint deadline, Incoming* incoming) override;
  void Interrupt() override {}  // Receive never blocks: it runs the hub

 private:
  std::shared_ptr<SharedEmbeddedHub> hub_;
};

/// The clock and transport of a hub in this process.
[[nodiscard]] HubLink makeEmbeddedLink(std::unique_ptr<EmbeddedHub> hub);

}  // namespace ssc
