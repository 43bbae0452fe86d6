#pragma once

#include <utility>

#include <unistd.h>

#include "ssc/Clock.h"

namespace ssc {

/// Owns a file descriptor.
class Descriptor {
 public:
  Descriptor() = default;
  explicit Descriptor(int fd) : fd_(fd) {}
  Descriptor(Descriptor&& other) noexcept : fd_(std::exchange(other.fd_, -1)) {}
  Descriptor& operator=(Descriptor&& other) noexcept {
    if (this != &other) {
      reset();
      fd_ = std::exchange(other.fd_, -1);
    }
    return *this;
  }
  ~Descriptor() { reset(); }

  [[nodiscard]] int get() const { return fd_; }
  [[nodiscard]] bool valid() const { return fd_ >= 0; }
  /// Gives the descriptor away.
  [[nodiscard]] int release() { return std::exchange(fd_, -1); }
  void reset() {
    if (fd_ >= 0) ::close(fd_);
    fd_ = -1;
  }

 private:
  int fd_ = -1;
};

/// Ends another thread's wait on descriptors.
class Interrupter {
 public:
  Interrupter();

  /// False: there was no descriptor left for it, with the reason in errno. Nothing would end a wait.
  [[nodiscard]] bool works() const { return event_.valid(); }

  void Signal();

  enum class Woken { kReady, kDeadline, kInterrupted };
  /// Waits until `fd` (ignored when negative) can be read, `deadline` passes on the steady clock, or Signal
  /// was called. One Signal ends one wait.
  [[nodiscard]] Woken WaitReadable(int fd, Clock::TimePoint deadline);

 private:
  Descriptor event_;
};

}  // namespace ssc
