#include "framework/SampleData.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <cstdio>
#include <limits>

namespace {

// "%*.*f" of the largest float is 39 digits, a point and the fraction.
constexpr std::size_t kUsualFieldLength = 64;
constexpr int kDefaultPrecision = 6;

void appendFixed(std::string* text, int width, int precision, float value) {
  // 0/0 is a negative not-a-number on x86 and a positive one on the handset: both are printed as the latter.
  if (std::isnan(value)) value = std::numeric_limits<float>::quiet_NaN();
  std::array<char, kUsualFieldLength> field;
  const int length =
      std::snprintf(field.data(), field.size(), " %*.*f", width, precision, static_cast<double>(value));
  if (length < 0) return;
  if (static_cast<std::size_t>(length) < field.size()) {
    text->append(field.data(), static_cast<std::size_t>(length));
    return;
  }
  const std::size_t start = text->size();
  text->resize(start + static_cast<std::size_t>(length) + 1);
  std::snprintf(text->data() + start, static_cast<std::size_t>(length) + 1, " %*.*f", width, precision,
                static_cast<double>(value));
  text->pop_back();
}

}  // namespace

SampleData::SampleData(SampleData&& other) noexcept : inline_{} { takeFrom(other); }

SampleData& SampleData::operator=(const SampleData& other) {
  if (this != &other) {
    size_ = 0;
    resizeUninitialised(other.size_);
    std::copy(other.begin(), other.end(), begin());
  }
  return *this;
}

SampleData& SampleData::operator=(SampleData&& other) noexcept {
  if (this != &other) {
    release();
    takeFrom(other);
  }
  return *this;
}

void SampleData::takeFrom(SampleData& other) noexcept {
  if (other.isInline()) {
    std::copy(other.inline_, other.inline_ + kInlineValues, inline_);
  } else {
    heap_ = other.heap_;
  }
  size_ = other.size_;
  capacity_ = other.capacity_;
  other.size_ = 0;
  other.capacity_ = kInlineValues;
}

void SampleData::grow(std::uint32_t capacity) {
  float* const larger = new float[capacity];
  std::copy(begin(), end(), larger);
  release();
  heap_ = larger;
  capacity_ = capacity;
}

void SampleData::resizeUninitialised(std::uint32_t size) {
  if (size > capacity_) grow(size);
  size_ = size;
}

void SampleData::push_back(float value) {
  if (size_ == capacity_) grow(2 * capacity_);
  data()[size_++] = value;
}

void SampleData::resize(std::size_t size) {
  const std::size_t before = size_;
  resizeUninitialised(static_cast<std::uint32_t>(size));
  if (size > before) std::fill(begin() + before, end(), 0.0F);
}

void SampleData::erase(std::size_t index) {
  std::copy(begin() + index + 1, end(), begin() + index);
  --size_;
}

std::string SampleData::format(int width, int precision) const {
  std::string text;
  for (const float value : *this) {
    appendFixed(&text, std::max(width, 0), precision >= 1 ? precision : kDefaultPrecision, value);
  }
  return text;
}

SampleData& SampleData::operator+=(const SampleData& other) {
  if (empty()) return *this = other;
  const std::size_t common = std::min(size(), other.size());
  for (std::size_t i = 0; i < common; ++i) (*this)[i] += other[i];
  return *this;
}

SampleData& SampleData::operator*=(const SampleData& other) {
  if (empty()) {
    resize(other.size());
    return *this;
  }
  const std::size_t common = std::min(size(), other.size());
  for (std::size_t i = 0; i < common; ++i) (*this)[i] *= other[i];
  return *this;
}

SampleData& SampleData::operator/=(float divisor) {
  for (float& value : *this) value /= divisor;
  return *this;
}

bool operator==(const SampleData& a, const SampleData& b) noexcept {
  return std::equal(a.begin(), a.end(), b.begin(), b.end());
}

SampleData operator+(SampleData a, const SampleData& b) {
  a += b;
  return a;
}

SampleData operator-(SampleData a, const SampleData& b) {
  const std::size_t common = std::min(a.size(), b.size());
  for (std::size_t i = 0; i < common; ++i) a[i] -= b[i];
  return a;
}
