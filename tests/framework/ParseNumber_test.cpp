#include "framework/ParseNumber.h"

#include <cmath>

#include <gtest/gtest.h>

namespace {

constexpr int kInvalid = -22;
constexpr int kLeftOver = -2147483647;

struct IntCase {
  const char* text;
  int result;
  int value;  ///< 99: unchanged
};

class ParseInt : public testing::TestWithParam<IntCase> {};

TEST_P(ParseInt, GivesResultAndValue) {
  int value = 99;
  EXPECT_EQ(parseInt(GetParam().text, &value), GetParam().result);
  EXPECT_EQ(value, GetParam().value);
}

INSTANTIATE_TEST_SUITE_P(Texts, ParseInt,
                         testing::Values(IntCase{"12", 0, 12}, IntCase{"-7", 0, -7}, IntCase{"0x10", 0, 16},
                                         IntCase{"010", 0, 8}, IntCase{"  5", 0, 5}, IntCase{"", 0, 0},
                                         IntCase{"12abc", kLeftOver, 99}, IntCase{"abc", kLeftOver, 99},
                                         IntCase{"5 ", kLeftOver, 99}, IntCase{" ", kLeftOver, 99},
                                         IntCase{"12345678901234567890", kInvalid, 99},
                                         IntCase{"12345678901234567890x", kInvalid, 99},
                                         IntCase{"4294967297", 0, 1},
                                         IntCase{"2147483648", 0, -2147483647 - 1}));

TEST(ParseFloat, ReadsDecimalAndHexadecimal) {
  float value = 0;
  EXPECT_EQ(parseFloat("1013.25", &value), 0);
  EXPECT_EQ(value, 1013.25F);
  EXPECT_EQ(parseFloat("0x1p-1", &value), 0);
  EXPECT_EQ(value, 0.5F);
}

TEST(ParseFloat, RefusesWhatIsOutOfRange) {
  float value = 7;
  EXPECT_EQ(parseFloat("1e40", &value), kInvalid);
  EXPECT_EQ(parseFloat("1e-60", &value), kInvalid);
  EXPECT_EQ(value, 7.0F);
}

TEST(ParseFloat, RefusesATrailingBlank) { EXPECT_EQ(parseFloat("2.5 ", nullptr), kLeftOver); }

TEST(ParseFloat, TakesTheEmptyTextAsZero) {
  float value = 7;
  EXPECT_EQ(parseFloat("", &value), 0);
  EXPECT_EQ(value, 0.0F);
}

TEST(ParseFloat, LeavesNanAndInfToItsCallers) {
  float value = 0;
  EXPECT_EQ(parseFloat("nan", &value), 0);
  EXPECT_TRUE(std::isnan(value));
  EXPECT_EQ(parseFloat("-inf", &value), 0);
  EXPECT_EQ(value, -INFINITY);
}

TEST(ParseDouble, KeepsItsPrecisionAndRange) {
  double value = 0;
  EXPECT_EQ(parseDouble("0.1", &value), 0);
  EXPECT_EQ(value, 0.1);
  EXPECT_EQ(parseDouble("1e40", &value), 0);
  EXPECT_EQ(value, 1e40);
  EXPECT_EQ(parseDouble("1e400", &value), kInvalid);
  EXPECT_EQ(parseDouble("1,5", &value), kLeftOver);
  EXPECT_EQ(value, 1e40);
}

TEST(ParseNumber, WithoutATargetIsASyntaxCheck) {
  EXPECT_EQ(parseInt("5", nullptr), 0);
  EXPECT_EQ(parseInt("5x", nullptr), kLeftOver);
  EXPECT_EQ(parseDouble("1.5", nullptr), 0);
}

TEST(ParseNumber, RefusesNoTextAtAll) { EXPECT_EQ(parseInt(nullptr, nullptr), kInvalid); }

TEST(ParseNumber, AnEarlierErrnoDoesNotCount) {
  errno = ERANGE;
  EXPECT_EQ(parseInt("5", nullptr), 0);
}

}  // namespace
