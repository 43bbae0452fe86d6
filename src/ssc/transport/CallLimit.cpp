#include "ssc/transport/CallLimit.h"

#include <unistd.h>

namespace ssc {
namespace {

/// How often a call is interrupted once it has lasted too long: the first signal may come just before the
/// call.
constexpr std::chrono::milliseconds kRepeat{20};

std::timespec toTimespec(std::chrono::milliseconds duration) {
  const auto seconds = std::chrono::duration_cast<std::chrono::seconds>(duration);
  return {seconds.count(), std::chrono::nanoseconds(duration - seconds).count()};
}

/// The signal does nothing but interrupt: without SA_RESTART.
bool takeSignal() {
  static const bool taken = [] {
    struct sigaction action {};
    action.sa_handler = [](int) {};
    return ::sigaction(SIGRTMIN, &action, nullptr) == 0;
  }();
  return taken;
}

}  // namespace

CallLimit::CallLimit(std::chrono::milliseconds limit) : end_(std::chrono::steady_clock::now() + limit) {
  sigset_t ours;
  sigemptyset(&ours);
  sigaddset(&ours, SIGRTMIN);
  ::pthread_sigmask(SIG_UNBLOCK, &ours, &signalsBefore_);
  sigevent event{};
  event.sigev_notify = SIGEV_THREAD_ID;
  event.sigev_signo = SIGRTMIN;
  event._sigev_un._tid = ::gettid();  // has no portable name
  if (!takeSignal() || ::timer_create(CLOCK_MONOTONIC, &event, &timer_) != 0) return;
  const itimerspec when{toTimespec(kRepeat), toTimespec(limit)};
  works_ = ::timer_settime(timer_, 0, &when, nullptr) == 0;
  if (!works_) ::timer_delete(timer_);
}

CallLimit::~CallLimit() {
  if (works_) ::timer_delete(timer_);
  ::pthread_sigmask(SIG_SETMASK, &signalsBefore_, nullptr);
}

bool CallLimit::passed() const { return std::chrono::steady_clock::now() >= end_; }

}  // namespace ssc
