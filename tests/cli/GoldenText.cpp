// How content stands in a case: text lines, hexadecimal lines, shell words.
#include <algorithm>
#include <array>
#include <cctype>
#include <cstdio>

#include "cli/GoldenCase.h"

namespace golden {
namespace {

constexpr const char* kNoNewline = "\\ no newline at the end";
constexpr std::size_t kBytesPerLine = 16;

std::string encodeLine(const std::string& line) {
  std::string result;
  if (line.rfind("---", 0) == 0 || line.rfind('\\', 0) == 0) result += '\\';
  result += line;
  if (!line.empty() && std::string(" \t\r\\").find(line.back()) != std::string::npos) result += '\\';
  return result;
}

std::string decodeLine(std::string line) {
  if (!line.empty() && line.front() == '\\') line.erase(0, 1);
  if (!line.empty() && line.back() == '\\') line.pop_back();
  return line;
}

/// Reads one quoted or bare stretch of a word, from `*at` on. False when a quote does not end.
bool readStretch(const std::string& line, std::size_t* at, std::string* word) {
  const char quote = line[*at];
  if (quote == '\\') {
    if (*at + 1 >= line.size()) return false;
    *word += line[*at + 1];
    *at += 2;
    return true;
  }
  if (quote != '\'' && quote != '"') {
    *word += line[(*at)++];
    return true;
  }
  for (++*at; *at < line.size() && line[*at] != quote; ++*at) {
    const bool escaped = quote == '"' && line[*at] == '\\' && *at + 1 < line.size() &&
                         (line[*at + 1] == '"' || line[*at + 1] == '\\');
    if (escaped) ++*at;
    *word += line[*at];
  }
  if (*at == line.size()) return false;
  ++*at;
  return true;
}

/// The length of the UTF-8 character at `at`; 0 when there is none.
std::size_t characterLength(const std::string& content, std::size_t at) {
  const auto byte = [&](std::size_t i) {
    return i < content.size() ? static_cast<unsigned char>(content[i]) : 0U;
  };
  const unsigned first = byte(at);
  const std::size_t length = first < 0x80                    ? 1
                             : first >= 0xc2 && first < 0xe0 ? 2
                             : first >= 0xe0 && first < 0xf0 ? 3
                             : first >= 0xf0 && first < 0xf5 ? 4
                                                             : 0;
  for (std::size_t i = 1; i < length; ++i) {
    if ((byte(at + i) & 0xc0U) != 0x80U) return 0;
  }
  return length;
}

}  // namespace

std::string encodeText(const std::string& content) {
  std::string result;
  for (std::size_t at = 0; at < content.size();) {
    const std::size_t end = content.find('\n', at);
    result += encodeLine(content.substr(at, end - at)) + "\n";
    if (end == std::string::npos) return result + kNoNewline + "\n";
    at = end + 1;
  }
  return result;
}

std::string decodeText(const std::string& lines) {
  std::string result;
  for (std::size_t at = 0; at < lines.size();) {
    const std::size_t end = std::min(lines.find('\n', at), lines.size());
    const std::string line = lines.substr(at, end - at);
    at = end + 1;
    if (line == kNoNewline) {
      if (!result.empty()) result.pop_back();
    } else {
      result += decodeLine(line) + "\n";
    }
  }
  return result;
}

std::string encodeHex(const std::string& content) {
  std::string result;
  std::array<char, 32> piece{};
  for (std::size_t at = 0; at < content.size(); at += kBytesPerLine) {
    std::snprintf(piece.data(), piece.size(), "%08zx:", at);
    result += piece.data();
    for (const char byte : content.substr(at, kBytesPerLine)) {
      std::snprintf(piece.data(), piece.size(), " %02x",
                    static_cast<unsigned>(static_cast<unsigned char>(byte)));
      result += piece.data();
    }
    result += '\n';
  }
  return result;
}

std::optional<std::string> decodeHex(const std::string& lines) {
  std::string result;
  for (std::size_t at = 0; at < lines.size();) {
    const std::size_t end = std::min(lines.find('\n', at), lines.size());
    const std::string line = lines.substr(at, end - at);
    at = end + 1;
    const std::size_t colon = line.find(':');
    if (colon == std::string::npos) return std::nullopt;
    std::string digits = line.substr(colon + 1);
    digits.erase(std::remove(digits.begin(), digits.end(), ' '), digits.end());
    const bool hex =
        std::all_of(digits.begin(), digits.end(), [](unsigned char c) { return std::isxdigit(c) != 0; });
    if (!hex || digits.size() % 2 != 0) return std::nullopt;
    for (std::size_t i = 0; i < digits.size(); i += 2) {
      result += static_cast<char>(std::stoi(digits.substr(i, 2), nullptr, 16));
    }
  }
  return result;
}

bool isBinary(const std::string& content) {
  for (std::size_t at = 0; at < content.size();) {
    const std::size_t length = characterLength(content, at);
    const auto first = static_cast<unsigned char>(content[at]);
    const bool control =
        first == 0x7f || (first < 0x20 && std::string("\n\t\r").find(content[at]) == std::string::npos);
    if (length == 0 || control) return true;
    at += length;
  }
  return false;
}

std::optional<std::vector<std::string>> splitWords(const std::string& line) {
  std::vector<std::string> words;
  std::size_t at = 0;
  for (;;) {
    while (at < line.size() && (line[at] == ' ' || line[at] == '\t')) ++at;
    if (at == line.size()) return words;
    std::string word;
    while (at < line.size() && line[at] != ' ' && line[at] != '\t') {
      if (!readStretch(line, &at, &word)) return std::nullopt;
    }
    words.push_back(word);
  }
}

}  // namespace golden
