// A fuzz input, taken from its front piece by piece. Past its end everything is zero, so that every input
// means something and the empty one means "nothing odd happens".
#pragma once

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <span>
#include <string>

namespace fuzz {

class FuzzInput {
 public:
  FuzzInput(const std::uint8_t* data, std::size_t size) : rest_(data, size) {}

  [[nodiscard]] bool empty() const { return rest_.empty(); }

  std::uint8_t byte() {
    if (rest_.empty()) return 0;
    const std::uint8_t value = rest_.front();
    rest_ = rest_.subspan(1);
    return value;
  }

  /// Any bit pattern: not-a-number and the infinities among them.
  float anyFloat() {
    std::uint32_t bits = 0;
    for (int i = 0; i < 4; ++i) bits = bits << 8 | byte();
    float value = 0;
    std::memcpy(&value, &bits, sizeof(value));
    return value;
  }

  /// A length of up to 255, and so many bytes as far as they are there.
  std::string text() {
    const std::size_t asked = byte();
    const std::size_t length = std::min(asked, rest_.size());
    const std::string value(rest_.begin(), rest_.begin() + static_cast<std::ptrdiff_t>(length));
    rest_ = rest_.subspan(length);
    return value;
  }

 private:
  std::span<const std::uint8_t> rest_;
};

}  // namespace fuzz
