#include "ssc/Clock.h"

#include <atomic>
#include <chrono>
#include <cstdint>
#include <limits>
#include <ratio>
#include <thread>

#include <gtest/gtest.h>

namespace {

using ssc::Clock;
using ssc::saturatingAdd;
using ssc::saturatingNanoseconds;
using namespace std::chrono_literals;

constexpr auto kMax = Clock::Duration::max();
constexpr auto kMin = Clock::Duration::min();

TEST(SaturatingNanoseconds, KeepsWhatFitsExactly) {
  EXPECT_EQ(saturatingNanoseconds(3s), 3'000'000'000ns);
  EXPECT_EQ(saturatingNanoseconds(1ms), 1'000'000ns);
  EXPECT_EQ(saturatingNanoseconds(-7us), -7'000ns);
  EXPECT_EQ(saturatingNanoseconds(0h), 0ns);
  EXPECT_EQ(saturatingNanoseconds(kMax), kMax);
  EXPECT_EQ(saturatingNanoseconds(kMin), kMin);
  EXPECT_EQ(saturatingNanoseconds(kMax - 1ns), kMax - 1ns);
  EXPECT_EQ(saturatingNanoseconds(9'223'372'036s), 9'223'372'036'000'000'000ns);
  EXPECT_EQ(saturatingNanoseconds(std::chrono::duration<std::uint8_t>(2)), 2s);
}

TEST(SaturatingNanoseconds, CutsFractionsOfANanosecond) {
  EXPECT_EQ(saturatingNanoseconds(std::chrono::duration<std::int64_t, std::pico>(1999)), 1ns);
  EXPECT_EQ(saturatingNanoseconds(std::chrono::duration<std::int64_t, std::pico>(-1999)), -1ns);
  EXPECT_EQ(saturatingNanoseconds(std::chrono::duration<std::int64_t, std::ratio<1, 3>>(1)), 333'333'333ns);
}

TEST(SaturatingNanoseconds, IntegersThatDoNotFitBecomeTheNearestEnd) {
  EXPECT_EQ(saturatingNanoseconds(std::chrono::hours::max()), kMax);
  EXPECT_EQ(saturatingNanoseconds(std::chrono::hours::min()), kMin);
  EXPECT_EQ(saturatingNanoseconds(std::chrono::milliseconds::max()), kMax);
  EXPECT_EQ(saturatingNanoseconds(9'223'372'037s), kMax);
  EXPECT_EQ(saturatingNanoseconds(-9'223'372'037s), kMin);
  EXPECT_EQ(saturatingNanoseconds(std::chrono::duration<std::uint64_t>::max()), kMax);
}

TEST(SaturatingNanoseconds, PeriodsThatAreNoWholeNanosecondsDoNotOverflowOnTheWay) {
  // 9,000,000,000 s fit; the ticks times 10⁹ do not.
  using Thirds = std::chrono::duration<std::int64_t, std::ratio<1, 3>>;
  EXPECT_EQ(saturatingNanoseconds(Thirds(27'000'000'000)), 9'000'000'000s);
}

TEST(SaturatingNanoseconds, TakesFloatingPointDurations) {
  EXPECT_EQ(saturatingNanoseconds(std::chrono::duration<double>(2.5)), 2'500'000'000ns);
  EXPECT_EQ(saturatingNanoseconds(std::chrono::duration<float>(0.25F)), 250'000'000ns);
  EXPECT_EQ(saturatingNanoseconds(std::chrono::duration<double, std::milli>(-1.5)), -1'500'000ns);
  EXPECT_EQ(saturatingNanoseconds(std::chrono::duration<double>(1e-12)), 0ns);
}

TEST(SaturatingNanoseconds, FloatingPointDurationsThatDoNotFitBecomeTheNearestEnd) {
  using Seconds = std::chrono::duration<double>;
  EXPECT_EQ(saturatingNanoseconds(Seconds(1e300)), kMax);
  EXPECT_EQ(saturatingNanoseconds(Seconds(-1e300)), kMin);
  EXPECT_EQ(saturatingNanoseconds(Seconds(std::numeric_limits<double>::infinity())), kMax);
  EXPECT_EQ(saturatingNanoseconds(Seconds(-std::numeric_limits<double>::infinity())), kMin);
  EXPECT_EQ(saturatingNanoseconds(Seconds(std::numeric_limits<double>::quiet_NaN())), 0ns);
}

TEST(SaturatingNanoseconds, FloatsJustBelowTheEndStayPositive) {
  // The largest float of seconds that fits: times 10⁹ in single precision it would round to 2⁶³.
  EXPECT_EQ(saturatingNanoseconds(std::chrono::duration<float>(9'223'371'776.0F)),
            9'223'371'776'000'000'000ns);
  // The largest double below 2⁶³ ns.
  EXPECT_EQ(saturatingNanoseconds(std::chrono::duration<double, std::nano>(9'223'372'036'854'774'784.0)),
            9'223'372'036'854'774'784ns);
  EXPECT_EQ(saturatingNanoseconds(std::chrono::duration<double, std::nano>(9'223'372'036'854'775'808.0)),
            kMax);
}

TEST(SaturatingAdd, AddsUpToTheLargestTimeAndNoFurther) {
  using Time = Clock::TimePoint;
  EXPECT_EQ(saturatingAdd(Time(5ns), 7ns), Time(12ns));
  EXPECT_EQ(saturatingAdd(Time(5ns), 0ns), Time(5ns));
  EXPECT_EQ(saturatingAdd(Time(5ns), kMax - 5ns), Time::max());
  EXPECT_EQ(saturatingAdd(Time(5ns), kMax - 4ns), Time::max());
  EXPECT_EQ(saturatingAdd(Time(5ns), kMax), Time::max());
  EXPECT_EQ(saturatingAdd(Time::max(), 1ns), Time::max());
}

TEST(SaturatingAdd, TimesBeforeTheEpochDoNotOverflow) {
  using Time = Clock::TimePoint;
  EXPECT_EQ(saturatingAdd(Time(-5ns), 7ns), Time(2ns));
  EXPECT_EQ(saturatingAdd(Time(-5ns), kMax), Time(kMax - 5ns));
}

TEST(RealClock, NeverGoesBack) {
  const ssc::RealClock clock;
  const auto first = clock.now();
  EXPECT_GE(clock.now(), first);
}

TEST(RealClock, SleepsAtLeastAsLongAsAsked) {
  ssc::RealClock clock;
  const auto start = clock.now();
  clock.sleepFor(2ms);
  EXPECT_GE(clock.now() - start, 2ms);
  clock.sleepFor(0ms);
  clock.sleepFor(-1h);
  EXPECT_LT(clock.now() - start, 20s);
}

/// The two waits of a clock.
using Wait = void (Clock::*)(ssc::Condition&, std::unique_lock<std::mutex>&, Clock::Duration);
class RealClockWait : public testing::TestWithParam<Wait> {
 protected:
  void wait(Clock::Duration timeout) { (clock_.*GetParam())(condition_, lock_, timeout); }

  ssc::RealClock clock_;
  ssc::Condition condition_{clock_};
  std::mutex mutex_;
  std::unique_lock<std::mutex> lock_{mutex_};
};

TEST_P(RealClockWait, TimesOutWithTheLockHeld) {
  const auto start = clock_.now();
  // The standard lets a wait end early for no reason: what is asserted is that it ends.
  while (clock_.now() - start < 2ms) wait(2ms);
  EXPECT_TRUE(lock_.owns_lock());
  EXPECT_LT(clock_.now() - start, 20s);
}

TEST_P(RealClockWait, OfNoOrNegativeTimeEndsAtOnce) {
  const auto start = clock_.now();
  wait(0ns);
  wait(-1ns);
  wait(Clock::Duration::min());
  EXPECT_TRUE(lock_.owns_lock());
  EXPECT_LT(clock_.now() - start, 20s);
}

TEST_P(RealClockWait, WithoutEndIsEndedByANotification) {
  bool told = false;
  std::thread notifier([&] {
    const std::lock_guard<std::mutex> guard(mutex_);  // free only once the wait below has begun
    told = true;
    condition_.notify_all();
  });
  while (!told) wait(Clock::Duration::max());
  EXPECT_TRUE(lock_.owns_lock());
  lock_.unlock();
  notifier.join();
}

INSTANTIATE_TEST_SUITE_P(Both, RealClockWait, testing::Values(&Clock::wait, &Clock::waitBySystemTime));

}  // namespace
