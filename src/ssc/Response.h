#pragma once

#include <cstdint>
#include <optional>

namespace ssc {

/// The hub's QMI response to one request: whether it was taken. What a request brings comes as an event.
struct Response {
  std::uint16_t result = 0;  ///< 0 success, 1 failure
  std::uint16_t error = 0;
  std::optional<std::uint64_t> clientId;
  std::optional<std::uint32_t> response;
};

}  // namespace ssc
