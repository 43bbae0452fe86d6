#include "ssc/transport/CallLimit.h"

#include <array>
#include <cerrno>
#include <chrono>
#include <cstdint>
#include <thread>
#include <vector>

#include <gtest/gtest.h>
#include <sys/socket.h>
#include <unistd.h>

#include "ssc/transport/Descriptor.h"
#include "ssc/transport/QrtrSocket.h"

namespace {

using namespace std::chrono_literals;
using SteadyClock = std::chrono::steady_clock;

/// Two ends of a connection of whole packets; a packet waits for room however long that takes.
class CallLimitTest : public testing::Test {
 protected:
  CallLimitTest() {
    std::array<int, 2> ends{};
    EXPECT_EQ(::socketpair(AF_UNIX, SOCK_SEQPACKET | SOCK_CLOEXEC, 0, ends.data()), 0);
    near = ssc::Descriptor(ends[0]);
    far = ssc::Descriptor(ends[1]);
  }
  /// Until the far end takes no more.
  void fill() const {
    const std::vector<std::uint8_t> packet(4096);
    while (::send(near.get(), packet.data(), packet.size(), MSG_DONTWAIT | MSG_NOSIGNAL) > 0) continue;
    ASSERT_EQ(errno, EAGAIN);
  }
  [[nodiscard]] int send(std::chrono::milliseconds limit) const {
    const std::vector<std::uint8_t> packet(4096, 7);
    return ssc::sendWithin(limit, near.get(), nullptr, 0, packet);
  }

  ssc::Descriptor near;
  ssc::Descriptor far;
};

TEST_F(CallLimitTest, SendWithRoomIsDoneAtOnce) { EXPECT_EQ(send(60s), 0); }

TEST_F(CallLimitTest, SendThatWouldBlockForEverEndsAtItsLimit) {
  fill();
  const auto begin = SteadyClock::now();
  EXPECT_EQ(send(50ms), -ETIMEDOUT);
  EXPECT_GE(SteadyClock::now() - begin, 50ms);
}

TEST_F(CallLimitTest, SendThatBlocksForAWhileIsDone) {
  fill();
  std::thread reader([this] {
    std::vector<std::uint8_t> packet(4096);
    while (::recv(far.get(), packet.data(), packet.size(), 0) > 0 && packet[0] != 7) continue;
  });
  EXPECT_EQ(send(60s), 0);
  reader.join();
}

TEST_F(CallLimitTest, OtherErrorsAreToldAtOnce) {
  far.reset();
  EXPECT_EQ(ssc::sendWithin(60s, -1, nullptr, 0, {}), -EBADF);
}

TEST_F(CallLimitTest, EachThreadHasALimitOfItsOwn) {
  fill();
  std::array<int, 4> results{};
  std::vector<std::thread> threads;
  for (int& result : results) threads.emplace_back([this, &result] { result = send(30ms); });
  for (std::thread& thread : threads) thread.join();
  for (const int result : results) EXPECT_EQ(result, -ETIMEDOUT);
}

TEST_F(CallLimitTest, WorksThoughTheThreadHasBlockedAllSignals) {
  fill();
  sigset_t all;
  sigset_t before;
  sigfillset(&all);
  ASSERT_EQ(::pthread_sigmask(SIG_SETMASK, &all, &before), 0);
  EXPECT_EQ(send(30ms), -ETIMEDOUT);
  sigset_t after;
  ASSERT_EQ(::pthread_sigmask(SIG_SETMASK, &before, &after), 0);
  EXPECT_EQ(sigismember(&after, SIGRTMIN), 1);
}

}  // namespace
