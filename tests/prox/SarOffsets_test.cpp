#include "prox/SarOffsets.h"

#include <cmath>

#include <gtest/gtest.h>

namespace {

TEST(SarOffsets, UpToTheLimitCanBeStored) {
  EXPECT_EQ(checkSarOffsets({16353, 16353}), std::nullopt);
  EXPECT_EQ(checkSarOffsets({16353.002F, 100}), SarOffsetFault::kTopTooHigh);
  EXPECT_EQ(checkSarOffsets({100, 16354}), SarOffsetFault::kBottomTooHigh);
  EXPECT_EQ(checkSarOffsets({16354, 16354}), SarOffsetFault::kTopTooHigh);
  EXPECT_EQ(checkSarOffsets({-5000, 0}), std::nullopt);
  EXPECT_EQ(checkSarOffsets({INFINITY, 0}), SarOffsetFault::kTopTooHigh);
}

TEST(SarOffsets, WithTheirMarginNeverExceedFourteenBits) {
  const SarOffsets limits = maxSarOffsets({16353, 100});
  EXPECT_EQ(limits.top, 16383);
  EXPECT_EQ(limits.bottom, 130);
}

}  // namespace
