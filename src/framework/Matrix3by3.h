#pragma once

#include <array>
#include <cmath>
#include <concepts>
#include <cstddef>
#include <cstdio>
#include <limits>
#include <sstream>
#include <string>
#include <vector>

/// What is printed, without a newline, when a matrix that has no inverse is to be inverted. The article is an
/// old slip that scripts look for.
inline constexpr const char* kNoInverseMessage = "Matrix does not have a Inverse";

/// A 3×3 matrix of float or double in row order; all zeros at first.
template <std::floating_point T>
class Matrix3by3 {
 public:
  static constexpr std::size_t kElements = 9;

  constexpr Matrix3by3() = default;
  /// Row 0 first.
  constexpr explicit Matrix3by3(const std::array<T, kElements>& elements) : elements_(elements) {}

  [[nodiscard]] constexpr T operator()(std::size_t row, std::size_t column) const {
    return elements_[row * 3 + column];
  }
  constexpr T& operator()(std::size_t row, std::size_t column) { return elements_[row * 3 + column]; }
  [[nodiscard]] constexpr std::array<T, kElements> elements() const { return elements_; }

  friend constexpr bool operator==(const Matrix3by3&, const Matrix3by3&) = default;

  /// Three lines "<prefix>[ a, b, c ]", one a row, with six significant digits.
  [[nodiscard]] std::string ToString(const std::string& prefix) const {
    // What is not a number has no sign: which one it got depends on the processor.
    const auto plain = [](T value) {
      return std::isnan(value) ? std::numeric_limits<T>::quiet_NaN() : value;
    };
    std::ostringstream text;
    for (std::size_t row = 0; row < 3; ++row) {
      text << prefix << "[ " << plain((*this)(row, 0)) << ", " << plain((*this)(row, 1)) << ", "
           << plain((*this)(row, 2)) << " ]\n";
    }
    return text.str();
  }

  /// The adjugate divided by the determinant, in T. All zeros, after a message on standard output, when the
  /// determinant is exactly 0.
  [[nodiscard]] Matrix3by3 Inverse() const {
    const auto& [a00, a01, a02, a10, a11, a12, a20, a21, a22] = elements_;
    const T k0 = a11 * a22 - a12 * a21;
    const T k1 = a12 * a20 - a10 * a22;
    const T k2 = a10 * a21 - a11 * a20;
    const T det = a00 * k0 + a01 * k1 + a02 * k2;
    if (det == 0) {
      std::printf("%s", kNoInverseMessage);
      return {};
    }
    return Matrix3by3({k0 / det, (a21 * a02 - a22 * a01) / det, (a12 * a01 - a11 * a02) / det,  //
                       k1 / det, (a22 * a00 - a20 * a02) / det, (a10 * a02 - a12 * a00) / det,  //
                       k2 / det, (a20 * a01 - a21 * a00) / det, (a11 * a00 - a10 * a01) / det});
  }

  /// The matrix times the first three elements of `v`. Empty, after a message on standard output, when it has
  /// fewer.
  [[nodiscard]] std::vector<float> operator*(
      const std::vector<float>& v) const requires std::same_as<T, float> {
    if (v.size() < 3) {
      std::printf("[ERROR] Matrix3by3 multiplied vector has only %zu elements\n", v.size());
      return {};
    }
    std::vector<float> product(3);
    for (std::size_t row = 0; row < 3; ++row) {
      // The sum starts from 0, as it always has: it turns a first term of −0 into 0.
      product[row] = (((*this)(row, 0) * v[0] + 0.0F) + (*this)(row, 1) * v[1]) + (*this)(row, 2) * v[2];
    }
    return product;
  }

 private:
  std::array<T, kElements> elements_{};
};
