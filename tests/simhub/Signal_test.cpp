#include "simhub/Signal.h"

#include <cmath>

#include <gtest/gtest.h>

#include "simhub/World.h"

namespace {

using simhub::Signal;
using simhub::SignalValue;
using Shape = simhub::SignalMove::Shape;

double at(const Signal& signal, double seconds) { return signal.At(seconds)[0]; }

TEST(Signal, HoldsItsStartValueWithoutMoves) {
  const Signal signal(SignalValue{7});
  EXPECT_EQ(at(signal, 0), 7);
  EXPECT_EQ(at(signal, 1e9), 7);
}

TEST(Signal, StepsAtTheMoment) {
  const Signal signal(SignalValue{1}, {{2, {5}, Shape::kStep, 0}});
  EXPECT_EQ(at(signal, std::nextafter(2.0, 0.0)), 1);
  EXPECT_EQ(at(signal, 2), 5);
}

TEST(Signal, RampsLinearlyAndThenHolds) {
  const Signal signal(SignalValue{10}, {{1, {20}, Shape::kRamp, 4}});
  EXPECT_EQ(at(signal, 1), 10);
  EXPECT_EQ(at(signal, 2), 12.5);
  EXPECT_EQ(at(signal, 5), 20);
  EXPECT_EQ(at(signal, 50), 20);
}

TEST(Signal, ApproachesExponentially) {
  const Signal signal(SignalValue{0}, {{0, {100}, Shape::kApproach, 10}});
  EXPECT_NEAR(at(signal, 10), 100 * (1 - std::exp(-1)), 1e-9);
  EXPECT_NEAR(at(signal, 1000), 100, 1e-9);
}

TEST(Signal, MoveThatIsCutShortHandsOnWhereItWas) {
  const Signal signal(SignalValue{0}, {{0, {100}, Shape::kRamp, 10}, {5, {0}, Shape::kRamp, 10}});
  EXPECT_EQ(at(signal, 5), 50);
  EXPECT_EQ(at(signal, 10), 25);
  EXPECT_EQ(at(signal, 15), 0);
}

TEST(Signal, MovesWithoutDurationAreSteps) {
  EXPECT_EQ(at(Signal(SignalValue{0}, {{1, {3}, Shape::kRamp, 0}}), 1), 3);
  EXPECT_EQ(at(Signal(SignalValue{0}, {{1, {3}, Shape::kApproach, 0}}), 1), 3);
}

TEST(Signal, MovesAllComponentsTogether) {
  const Signal signal(SignalValue{0, 10, -10}, {{0, {10, 0, -20}, Shape::kRamp, 2}});
  EXPECT_EQ(signal.At(1), (SignalValue{5, 5, -15, 0}));
}

TEST(World, StartsWithEverySignalAtItsInitialValue) {
  const simhub::World world;
  for (const simhub::WorldSignalRow& row : simhub::worldSignals()) {
    EXPECT_EQ(world.At(row.signal, simhub::Time{0}), row.initial) << row.name;
    EXPECT_EQ(simhub::findWorldSignal(row.name), &row);
  }
}

TEST(World, TableIsInTheOrderOfItsSignalsAndInRange) {
  std::size_t index = 0;
  for (const simhub::WorldSignalRow& row : simhub::worldSignals()) {
    EXPECT_EQ(static_cast<std::size_t>(row.signal), index++) << row.name;
    ASSERT_LE(row.dimension, simhub::kMaxSignalDimension) << row.name;
    for (std::size_t i = 0; i < row.dimension; ++i) {
      EXPECT_GE(row.initial[i], row.low) << row.name;
      EXPECT_LE(row.initial[i], row.high) << row.name;
    }
  }
}

TEST(HubTime, TicksAreExactOverAYear) {
  EXPECT_EQ(simhub::toTicks(simhub::Time{625}), 12U);
  EXPECT_EQ(simhub::toTicks(simhub::Time{624}), 11U);
  EXPECT_EQ(simhub::toTicks(simhub::fromSeconds(365.0 * 86400)), 365ULL * 86400 * 19'200'000);
}

TEST(HubTime, SecondsThatDoNotFitNeverCome) {
  EXPECT_EQ(simhub::fromSeconds(1e300), simhub::kNever);
  EXPECT_EQ(simhub::fromSeconds(0.0000000014), simhub::Time{1});
}

}  // namespace
