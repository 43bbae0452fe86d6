#pragma once

#include <chrono>
#include <ctime>

#include <signal.h>

namespace ssc {

/// Ends a system call of the thread that made it when the call has lasted too long: for calls that block
/// whatever flags and timeouts the socket has. From `limit` on, the call under way and every later one that
/// blocks fail with EINTR.
///
/// Takes the first real-time signal, SIGRTMIN, for itself.
class CallLimit {
 public:
  explicit CallLimit(std::chrono::milliseconds limit);
  CallLimit(const CallLimit&) = delete;
  CallLimit& operator=(const CallLimit&) = delete;
  ~CallLimit();

  /// False: there is no timer left, and nothing would end a call.
  [[nodiscard]] bool works() const { return works_; }
  /// Whether `limit` has passed, so that a call that was interrupted is not to be made again.
  [[nodiscard]] bool passed() const;

 private:
  std::chrono::steady_clock::time_point end_;
  timer_t timer_{};
  sigset_t signalsBefore_{};
  bool works_ = false;
};

}  // namespace ssc
