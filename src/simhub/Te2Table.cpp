#include "simhub/Te2Table.h"

#include <array>
#include <cstdlib>

#include <fcntl.h>
#include <unistd.h>

namespace simhub {
namespace {

constexpr std::size_t kMaxBytes = 256;  // of a table; eight numbers need far less
constexpr int kNumbersBefore = 3;       // the first pair, and the second one's rising edge

}  // namespace

std::optional<int> parseTe2FallingEdge(const std::string& table) {
  const char* at = table.c_str();
  long number = -1;
  for (int i = 0; i <= kNumbersBefore; ++i) {
    char* end = nullptr;
    number = std::strtol(at, &end, 10);
    if (end == at) return std::nullopt;
    at = end;
  }
  if (number < 0 || number > kMaxTe2Delay) return std::nullopt;
  return static_cast<int>(number);
}

std::optional<int> readTe2FallingEdge(const std::string& path) {
  // Not blocking: the file may be something that nobody ever writes to.
  const int fd = ::open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK);
  if (fd < 0) return std::nullopt;
  std::array<char, kMaxBytes> text{};
  const ssize_t count = ::read(fd, text.data(), text.size());
  (void)::close(fd);
  if (count <= 0) return std::nullopt;
  return parseTe2FallingEdge({text.data(), static_cast<std::size_t>(count)});
}

}  // namespace simhub
