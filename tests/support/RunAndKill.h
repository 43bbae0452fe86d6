// A process that is killed in the middle of what it does.
#pragma once

#include <csignal>

#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

namespace support {

/// Runs `body` in a process of its own, over and over, and kills that at some moment after its first
/// `progress` rounds.
template <class Body>
void runAndKill(int progress, Body body) {
  int pipe[2];
  ASSERT_EQ(::pipe(pipe), 0);
  const pid_t child = ::fork();
  ASSERT_GE(child, 0);
  if (child == 0) {
    for (;;) {
      body();
      if (::write(pipe[1], "", 1) != 1) ::_exit(1);
    }
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
