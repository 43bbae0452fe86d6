#pragma once

#include <span>
#include <string_view>

namespace simhub {

struct EmbeddedScenario {
  std::string_view name;
  std::string_view text;
};

/// The scenario files compiled in, in the order of their names. "common" is what the others extend.
[[nodiscard]] std::span<const EmbeddedScenario> embeddedScenarios();

}  // namespace simhub
