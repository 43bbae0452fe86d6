#include "ssc/transport/EmbeddedHub.h"

#include <algorithm>
#include <utility>

namespace ssc {

SharedEmbeddedHub::SharedEmbeddedHub(std::unique_ptr<EmbeddedHub> hub)
    : hub_(std::move(hub)), now_(hub_->Now().time_since_epoch().count()) {}

SharedEmbeddedHub::~SharedEmbeddedHub() = default;

int SharedEmbeddedHub::Submit(qmi::Bytes datagram) {
  const std::lock_guard<std::mutex> guard(mutex_);
  return hub_->Submit(datagram);
}

bool SharedEmbeddedHub::RunUntil(Clock::TimePoint limit, Incoming* incoming) {
  const std::lock_guard<std::mutex> guard(mutex_);
  const bool came = hub_->RunUntil(std::max(limit, hub_->Now()), incoming);
  now_ = hub_->Now().time_since_epoch().count();
  return came;
}

void SimulatedClock::wait(Condition& condition, std::unique_lock<std::mutex>& lock, Duration timeout) {
  block(&condition, timeout, &lock);
  lock.lock();
}

void SimulatedClock::sleepFor(Duration duration) { block(nullptr, duration, nullptr); }

void SimulatedClock::block(const Condition* condition, Duration timeout,
                           std::unique_lock<std::mutex>* alongside) {
  std::unique_lock<std::mutex> clockLock(mutex_);
  const bool resumesAtOnce = std::this_thread::get_id() == eventThread_ ||
                             (condition != nullptr && condition->resume_ == Condition::Resume::kAtOnce);
  const auto waiter = waiters_.insert(
      waiters_.end(),
      Waiter{condition, saturatingAdd(now(), std::max(timeout, Duration::zero())), resumesAtOnce});
  if (alongside != nullptr) alongside->unlock();  // now that no notification can be lost any more
  ++changes_;
  changed_.notify_all();
  changed_.wait(clockLock,
                [&] { return (waiter->woken && (eventThreadAtRest_ || waiter->resumesAtOnce)) || stopped_; });
  waiters_.erase(waiter);
  changed_.notify_all();
}

void SimulatedClock::notifyAll(Condition& condition) {
  const std::lock_guard<std::mutex> guard(mutex_);
  for (Waiter& waiter : waiters_) {
    if (waiter.condition == &condition) waiter.woken = true;
  }
  ++changes_;
  changed_.notify_all();
}

void SimulatedClock::hubAsked() {
  const std::lock_guard<std::mutex> guard(mutex_);
  ++changes_;
  changed_.notify_all();
}

bool SimulatedClock::mayRunEvents() const {
  return !waiters_.empty() &&
         std::none_of(waiters_.begin(), waiters_.end(), [](const Waiter& waiter) { return waiter.woken; });
}

void SimulatedClock::awaitIdle() {
  std::unique_lock<std::mutex> clockLock(mutex_);
  eventThread_ = std::this_thread::get_id();
  // Between two events nobody is woken: to say so each time would cost more than the events.
  if (!stopped_ && mayRunEvents()) return;
  eventThreadAtRest_ = true;
  changed_.notify_all();
  changed_.wait(clockLock, [this] { return stopped_ || mayRunEvents(); });
  eventThreadAtRest_ = stopped_;
}

Clock::TimePoint SimulatedClock::horizon() {
  const std::lock_guard<std::mutex> guard(mutex_);
  changesAtHorizon_ = changes_;
  TimePoint earliest = TimePoint::max();
  for (const Waiter& waiter : waiters_) earliest = std::min(earliest, waiter.deadline);
  return earliest;
}

void SimulatedClock::horizonReached() {
  std::unique_lock<std::mutex> clockLock(mutex_);
  const TimePoint time = now();
  bool any = false;
  for (Waiter& waiter : waiters_) {
    if (waiter.deadline <= time) waiter.woken = any = true;
  }
  if (any) {
    changed_.notify_all();
    return;
  }
  // Nobody's deadline will ever come: only another thread can change anything.
  eventThreadAtRest_ = true;
  changed_.notify_all();
  changed_.wait(clockLock, [&] { return stopped_ || changes_ != changesAtHorizon_; });
  eventThreadAtRest_ = false;
}

void SimulatedClock::stopWaiting() {
  const std::lock_guard<std::mutex> guard(mutex_);
  stopped_ = true;
  changed_.notify_all();
}

Transport::Outcome EmbeddedTransport::Receive(Clock::TimePoint deadline, Incoming* incoming) {
  return hub_->RunUntil(deadline, incoming) ? Outcome::kIncoming : Outcome::kDeadline;
}

HubLink makeEmbeddedLink(std::unique_ptr<EmbeddedHub> hub) {
  auto shared = std::make_shared<SharedEmbeddedHub>(std::move(hub));
  HubLink link;
  link.clock = std::make_unique<SimulatedClock>(shared);
  link.transport = std::make_unique<EmbeddedTransport>(std::move(shared));
  return link;
}

}  // namespace ssc
