// A process that is killed in the middle of what it does.
#pragma once

#include <csignal>

#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

namespace support {

/// How often a body runs at most. Few enough for what it writes to stay within a page: the kernel ends a
/// write at the border of one when it has been killed, and no program can do anything about that.
constexpr int kMostRounds = 16;

/// Runs `body` in a process of its own, up to kMostRounds times, and kills that at some moment after its
/// first `progress` rounds.
template <class Body>
void runAndKill(int progress, Body body) {
  int pipe[2];
  ASSERT_EQ(::pipe(pipe), 0);
  const pid_t child = ::fork();
  ASSERT_GE(child, 0);
  if (child == 0) {
    for (int round = 0; round < kMostRounds; ++round) {
      body();
      if (::write(pipe[1], "", 1) != 1) ::_exit(1);
    }
    for (;;) ::pause();
  }
  ::close(pipe[1]);
  char round;
  for (int i = 0; i < progress; ++i) {
    if (::read(pipe[0], &round, 1) != 1) break;
  }
  ASSERT_EQ(::kill(child, SIGKILL), 0);
  int status = 0;
  ASSERT_EQ(::waitpid(child, &status, 0), child);
  ::close(pipe[0]);
  EXPECT_TRUE(WIFSIGNALED(status));
}

}  // namespace support
