// A disk on which no file can grow: what a full one looks like to the program.
#pragma once

#include <csignal>
#include <cstddef>

#include <sys/resource.h>

namespace support {

/// While it lives, this process can make no file longer than `bytes`: a write comes up short, then fails.
class FileSizeLimit {
 public:
  explicit FileSizeLimit(std::size_t bytes) : signal_(std::signal(SIGXFSZ, SIG_IGN)) {
    ::getrlimit(RLIMIT_FSIZE, &before_);
    const rlimit limit{bytes, before_.rlim_max};
    ::setrlimit(RLIMIT_FSIZE, &limit);
  }
  FileSizeLimit(const FileSizeLimit&) = delete;
  FileSizeLimit& operator=(const FileSizeLimit&) = delete;
  ~FileSizeLimit() {
    ::setrlimit(RLIMIT_FSIZE, &before_);
    std::signal(SIGXFSZ, signal_);
  }

 private:
  void (*signal_)(int);
  rlimit before_{};
};

}  // namespace support
