#pragma once

#include <string>

/// The text with its letters A to Z in lower case; every other byte, of whatever encoding, stays.
[[nodiscard]] inline std::string toLowerAscii(std::string text) {
  for (char& c : text) {
    if (c >= 'A' && c <= 'Z') c = static_cast<char>(c - 'A' + 'a');
  }
  return text;
}
