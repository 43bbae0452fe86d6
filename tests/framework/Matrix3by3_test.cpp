#include "framework/Matrix3by3.h"

#include <cmath>
#include <limits>
#include <random>

#include <gtest/gtest.h>

#include "support/Capture.h"

namespace {

template <class T>
Matrix3by3<T> identity() {
  return Matrix3by3<T>({1, 0, 0, 0, 1, 0, 0, 0, 1});
}

template <class T>
class Matrix3by3Of : public testing::Test {};
using Elements = testing::Types<float, double>;
TYPED_TEST_SUITE(Matrix3by3Of, Elements);

TYPED_TEST(Matrix3by3Of, StartsAsZeros) {
  for (const TypeParam element : Matrix3by3<TypeParam>().elements()) EXPECT_EQ(element, TypeParam(0));
}

TYPED_TEST(Matrix3by3Of, TheInverseOfTheIdentityIsTheIdentity) {
  EXPECT_EQ(identity<TypeParam>().Inverse(), identity<TypeParam>());
}

TYPED_TEST(Matrix3by3Of, AnExactInverseIsExact) {
  const Matrix3by3<TypeParam> matrix({2, 0, 0, 0, 4, 0, 1, 0, 8});
  EXPECT_EQ(matrix.Inverse(), Matrix3by3<TypeParam>({TypeParam(0.5), 0, 0, 0, TypeParam(0.25), 0,
                                                     TypeParam(-0.0625), 0, TypeParam(0.125)}));
}

TYPED_TEST(Matrix3by3Of, ASingularMatrixGivesZerosAndSaysSo) {
  Matrix3by3<TypeParam> inverse = identity<TypeParam>();
  const Captured captured = capture([&] {
    inverse = Matrix3by3<TypeParam>({1, 2, 3, 0, 0, 0, 7, 8, 9}).Inverse();
  });
  EXPECT_EQ(inverse, Matrix3by3<TypeParam>());
  EXPECT_EQ(captured.out, "Matrix does not have a Inverse");
}

TYPED_TEST(Matrix3by3Of, ADeterminantThatIsNoNumberIsNotZero) {
  Matrix3by3<TypeParam> matrix = identity<TypeParam>();
  matrix(0, 0) = std::numeric_limits<TypeParam>::quiet_NaN();
  Matrix3by3<TypeParam> inverse;
  EXPECT_EQ(capture([&] { inverse = matrix.Inverse(); }).out, "");
  EXPECT_TRUE(std::isnan(inverse(0, 0)));
}

TYPED_TEST(Matrix3by3Of, InverseTimesMatrixIsTheIdentity) {
  std::mt19937 random(20);
  std::uniform_real_distribution<double> element(-1, 1);
  const double tolerance = std::is_same_v<TypeParam, float> ? 1e-5 : 1e-13;
  for (int round = 0; round < 200; ++round) {
    Matrix3by3<TypeParam> matrix;
    for (std::size_t i = 0; i < 9; ++i) {
      // A strong diagonal keeps the matrix well conditioned.
      matrix(i / 3, i % 3) = static_cast<TypeParam>(element(random) + (i % 4 == 0 ? 4 : 0));
    }
    const Matrix3by3<TypeParam> inverse = matrix.Inverse();
    for (std::size_t row = 0; row < 3; ++row) {
      for (std::size_t column = 0; column < 3; ++column) {
        double product = 0;
        for (std::size_t k = 0; k < 3; ++k) {
          product += static_cast<double>(inverse(row, k)) * static_cast<double>(matrix(k, column));
        }
        EXPECT_NEAR(product, row == column ? 1.0 : 0.0, tolerance);
      }
    }
  }
}

TYPED_TEST(Matrix3by3Of, PrintsOneLineARowBehindThePrefix) {
  EXPECT_EQ(identity<TypeParam>().ToString("M: "), "M: [ 1, 0, 0 ]\nM: [ 0, 1, 0 ]\nM: [ 0, 0, 1 ]\n");
}

TYPED_TEST(Matrix3by3Of, PrintsSixSignificantDigits) {
  const Matrix3by3<TypeParam> matrix(
      {TypeParam(1.0 / 3), TypeParam(1234567), TypeParam(1e-7), 0, TypeParam(-2.5), 0, 0, 0, 100000});
  EXPECT_EQ(matrix.ToString(""), "[ 0.333333, 1.23457e+06, 1e-07 ]\n[ 0, -2.5, 0 ]\n[ 0, 0, 100000 ]\n");
}

TYPED_TEST(Matrix3by3Of, PrintsNoSignOfWhatIsNotANumber) {
  const TypeParam none = std::numeric_limits<TypeParam>::quiet_NaN();
  const TypeParam infinity = std::numeric_limits<TypeParam>::infinity();
  EXPECT_EQ(Matrix3by3<TypeParam>({-none, none, -infinity, 0, 0, 0, 0, 0, 0}).ToString(""),
            "[ nan, nan, -inf ]\n[ 0, 0, 0 ]\n[ 0, 0, 0 ]\n");
}

TEST(Matrix3by3Product, IsMatrixTimesColumn) {
  const Matrix3by3<float> matrix({1, 2, 3, 4, 5, 6, 7, 8, 9});
  EXPECT_EQ(matrix * std::vector<float>({1, 10, 100}), std::vector<float>({321, 654, 987}));
}

TEST(Matrix3by3Product, IgnoresElementsBeyondTheThird) {
  EXPECT_EQ(identity<float>() * std::vector<float>({1, 2, 3, 4}), std::vector<float>({1, 2, 3}));
}

TEST(Matrix3by3Product, OfAShortVectorIsEmptyAndSaysSo) {
  std::vector<float> product{9};
  const Captured captured = capture([&] { product = identity<float>() * std::vector<float>({1, 2}); });
  EXPECT_TRUE(product.empty());
  EXPECT_EQ(captured.out, "[ERROR] Matrix3by3 multiplied vector has only 2 elements\n");
}

TEST(Matrix3by3Product, AddsFromLeftToRightIn32BitFloat) {
  const Matrix3by3<float> matrix({16777216, 1, 1, 1, 1, 16777216, 0, 0, 0});
  const std::vector<float> product = matrix * std::vector<float>({1, 1, 1});
  EXPECT_EQ(product[0], 16777216.0F);
  EXPECT_EQ(product[1], 16777218.0F);
}

TEST(Matrix3by3Product, ANegativeZeroBecomesZero) {
  const std::vector<float> product = Matrix3by3<float>() * std::vector<float>({-1, -1, -1});
  EXPECT_FALSE(std::signbit(product[0]));
}

}  // namespace
