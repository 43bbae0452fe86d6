// A small vector of 32-bit floats: one reading of a sensor, or what was computed from many.
#pragma once

#include <cstddef>
#include <cstdint>
#include <initializer_list>
#include <iterator>
#include <string>
#include <vector>

/// Value semantics; its length is its dimension. Empty stands for "not set yet" and is neutral in sums.
///
/// Up to kInlineValues values (three axes and a temperature) are kept in the object, without an allocation of
/// their own: a collection stores hundreds of thousands of readings a second, and an hour of them has to fit.
///
/// The arithmetic never reports a mismatch of dimensions: the shorter length rules, and the left
/// operand's length is kept.
class SampleData {
 public:
  static constexpr std::uint32_t kInlineValues = 4;

  using value_type = float;
  using iterator = float*;
  using const_iterator = const float*;

  SampleData() noexcept : inline_{} {}
  SampleData(std::initializer_list<float> values) : SampleData(values.begin(), values.end()) {}
  explicit SampleData(const std::vector<float>& values) : SampleData(values.begin(), values.end()) {}
  template <std::forward_iterator Iterator>
  SampleData(Iterator first, Iterator last) : inline_{} {
    resizeUninitialised(static_cast<std::uint32_t>(std::distance(first, last)));
    for (float* out = data(); first != last; ++first) *out++ = *first;
  }
  SampleData(const SampleData& other) : SampleData(other.begin(), other.end()) {}
  SampleData(SampleData&& other) noexcept;
  SampleData& operator=(const SampleData& other);
  SampleData& operator=(SampleData&& other) noexcept;
  ~SampleData() { release(); }

  [[nodiscard]] std::size_t size() const noexcept { return size_; }
  [[nodiscard]] bool empty() const noexcept { return size_ == 0; }
  [[nodiscard]] float* data() noexcept { return isInline() ? inline_ : heap_; }
  [[nodiscard]] const float* data() const noexcept { return isInline() ? inline_ : heap_; }
  [[nodiscard]] iterator begin() noexcept { return data(); }
  [[nodiscard]] iterator end() noexcept { return data() + size_; }
  [[nodiscard]] const_iterator begin() const noexcept { return data(); }
  [[nodiscard]] const_iterator end() const noexcept { return data() + size_; }
  /// `index` < size().
  float& operator[](std::size_t index) noexcept { return data()[index]; }
  float operator[](std::size_t index) const noexcept { return data()[index]; }

  void push_back(float value);
  void clear() noexcept { size_ = 0; }
  /// New elements are 0.
  void resize(std::size_t size);
  /// Takes out one element; `index` < size().
  void erase(std::size_t index);

  [[nodiscard]] std::vector<float> toVector() const { return {begin(), end()}; }

  /// Each element: one blank, then the element in fixed-point notation, right-aligned in `width` characters,
  /// with `precision` digits after the point (6 when `precision` is below 1). Empty: the empty string.
  [[nodiscard]] std::string format(int width, int precision) const;

  /// Element by element; an empty left operand becomes a copy of the right one.
  SampleData& operator+=(const SampleData& other);
  /// Element by element; an empty left operand becomes zeros of the right one's length.
  SampleData& operator*=(const SampleData& other);
  /// Every element divided by `divisor`.
  SampleData& operator/=(float divisor);

  friend bool operator==(const SampleData& a, const SampleData& b) noexcept;

 private:
  [[nodiscard]] bool isInline() const noexcept { return capacity_ == kInlineValues; }
  void release() noexcept {
    if (!isInline()) delete[] heap_;
  }
  void grow(std::uint32_t capacity);
  void resizeUninitialised(std::uint32_t size);
  void takeFrom(SampleData& other) noexcept;

  union {
    float inline_[kInlineValues];
    float* heap_;
  };
  std::uint32_t size_ = 0;
  std::uint32_t capacity_ = kInlineValues;
};

[[nodiscard]] SampleData operator+(SampleData a, const SampleData& b);
/// An empty `a` stays empty: unlike in a sum, "not set" minus something is still "not set".
[[nodiscard]] SampleData operator-(SampleData a, const SampleData& b);
