// Makes the next descriptors that this process opens the last ones.
#pragma once

#include <sys/resource.h>
#include <unistd.h>

namespace support {

/// As long as it lives, at most `count` more descriptors can be opened; then "Too many open files".
class DescriptorLimit {
 public:
  explicit DescriptorLimit(rlim_t count) {
    ::getrlimit(RLIMIT_NOFILE, &before_);
    const int next = ::dup(STDERR_FILENO);  // the lowest that is free
    ::close(next);
    rlimit limit = before_;
    limit.rlim_cur = static_cast<rlim_t>(next) + count;
    ::setrlimit(RLIMIT_NOFILE, &limit);
  }
  DescriptorLimit(const DescriptorLimit&) = delete;
  DescriptorLimit& operator=(const DescriptorLimit&) = delete;
  ~DescriptorLimit() { ::setrlimit(RLIMIT_NOFILE, &before_); }

 private:
  rlimit before_{};
};

}  // namespace support
