#include "simhub/Toml.h"

#include <algorithm>
#include <charconv>
#include <cmath>
#include <utility>

namespace simhub {
namespace {

constexpr std::size_t kMaxProblems = 20;
constexpr const char* kOverride = "override ";
/// Each part of a dotted key is one table in another, and a tree of tables is walked and taken down by
/// recursion. The registry's deepest subgroup needs half of this.
constexpr int kMaxKeyParts = 40;

/// "FILE:LINE", or just what it is called where there are no lines.
std::string place(const toml::node* node, const std::string& fallback) {
  if (node == nullptr || !node->source().path) return fallback;
  const std::string& path = *node->source().path;
  if (path.rfind(kOverride, 0) == 0) return path;
  return path + ":" + std::to_string(node->source().begin.line);
}

bool isBareKey(std::string_view key) {
  return !key.empty() && std::all_of(key.begin(), key.end(), [](char c) {
    return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9') || c == '_' || c == '-';
  });
}

/// Finds keys of too many parts in a text before a parser builds tables of them.
class KeyScanner {
 public:
  explicit KeyScanner(std::string_view text) : text_(text) {}

  /// The line of the first key that has more than kMaxKeyParts parts; 0: there is none.
  [[nodiscard]] std::size_t FindOverlong() {
    int parts = 1;
    while (at_ < text_.size()) {
      const char c = text_[at_];
      if (c == '"' || c == '\'') {
        skipString(c);
      } else if (c == '#') {
        at_ = std::min(text_.find('\n', at_), text_.size());
      } else {
        if (c == '.' && ++parts > kMaxKeyParts) return line();
        if (endsKey(c)) parts = 1;
        ++at_;
      }
    }
    return 0;
  }

 private:
  void skipString(char quote) {
    const std::string ofLines(3, quote);
    const bool hasLines = text_.substr(at_, ofLines.size()) == ofLines;
    const std::string_view end = hasLines ? std::string_view(ofLines) : std::string_view(ofLines).substr(2);
    at_ += end.size();
    while (at_ < text_.size() && text_.substr(at_, end.size()) != end) {
      if (!hasLines && text_[at_] == '\n') return;  // left open, which the parser reports
      at_ += quote == '"' && text_[at_] == '\\' ? 2 : 1;
    }
    at_ += end.size();
    // A string of lines may itself end in one or two of its quotes.
    for (int i = 0; hasLines && i < 2 && at_ < text_.size() && text_[at_] == quote; ++i) ++at_;
  }
  /// Everything but what a key's parts, and the blanks around its dots, are made of.
  static bool endsKey(char c) {
    const bool isAscii = static_cast<unsigned char>(c) < 0x80;
    return isAscii && c != '.' && c != ' ' && c != '\t' && !isBareKey({&c, 1});
  }
  [[nodiscard]] std::size_t line() const {
    const auto here = text_.begin() + static_cast<std::ptrdiff_t>(at_);
    return 1 + static_cast<std::size_t>(std::count(text_.begin(), here, '\n'));
  }

  const std::string_view text_;
  std::size_t at_ = 0;
};

std::string tooManyParts() { return "a key of more than " + std::to_string(kMaxKeyParts) + " parts"; }

std::string quoted(std::string_view text) {
  std::string out = "\"";
  for (const char c : text) {
    if (c == '"' || c == '\\') out += '\\';
    out += c;
  }
  return out + "\"";
}

std::string typeName(const toml::node& node) {
  switch (node.type()) {
    case toml::node_type::table:
      return "a table";
    case toml::node_type::array:
      return "a list";
    case toml::node_type::string:
      return "text";
    case toml::node_type::integer:
      return "an integer";
    case toml::node_type::floating_point:
      return "a number";
    case toml::node_type::boolean:
      return "true or false";
    default:
      return "a date or time";
  }
}

}  // namespace

void Problems::Add(const toml::node* node, const std::string& key, const std::string& what) {
  // A setting taken over from another section has no place; where it stands it is reported as well.
  if (node != nullptr && !node->source().path && !node->is_table()) return;
  AddText(place(node, source_) + ": " + (key.empty() ? "" : key + ": ") + what);
}

void Problems::AddText(const std::string& line) {
  if (lines_.size() < kMaxProblems) lines_.push_back(line);
}

std::string Problems::Text() const {
  std::string text;
  for (const std::string& line : lines_) text += (text.empty() ? "" : "\n") + line;
  return text;
}

TableReader::TableReader(const toml::table& table, std::string path, Problems& problems)
    : table_(table), path_(std::move(path)), problems_(problems) {}

std::string TableReader::PathOf(std::string_view key) const {
  if (key.empty()) return path_;
  return path_.empty() ? showKey(key) : path_ + "." + showKey(key);
}

void TableReader::Problem(std::string_view key, const std::string& what) {
  const toml::node* const node = key.empty() ? nullptr : table_.get(key);
  problems_.Add(node != nullptr ? node : &table_, PathOf(key), what);
}

const toml::node* TableReader::Node(std::string_view key) {
  known_.emplace_back(key);
  return table_.get(key);
}

bool TableReader::inRange(const toml::node& node, std::string_view key, double number, double low,
                          double high) {
  if (number >= low && number <= high) return true;
  problems_.Add(&node, PathOf(key),
                showNumber(number) + " is not in the range " + showNumber(low) + " to " + showNumber(high));
  return false;
}

bool TableReader::Number(std::string_view key, double low, double high, double* value) {
  const toml::node* const node = Node(key);
  if (node == nullptr) return false;
  if (!node->is_number()) {
    Problem(key, "has to be a number, is " + typeName(*node));
    return false;
  }
  const double number = *node->value<double>();
  if (!inRange(*node, key, number, low, high)) return false;
  *value = number;
  return true;
}

bool TableReader::Integer(std::string_view key, std::int64_t low, std::int64_t high, std::int64_t* value) {
  const toml::node* const node = Node(key);
  if (node == nullptr) return false;
  const auto* const integer = node->as_integer();
  if (integer == nullptr) {
    Problem(key, "has to be an integer, is " + typeName(*node));
    return false;
  }
  if (integer->get() < low || integer->get() > high) {
    Problem(key, std::to_string(integer->get()) + " is not in the range " + std::to_string(low) + " to " +
                     std::to_string(high));
    return false;
  }
  *value = integer->get();
  return true;
}

bool TableReader::Text(std::string_view key, std::string* value) {
  const toml::node* const node = Node(key);
  if (node == nullptr) return false;
  if (const auto* const number = node->as_floating_point(); number != nullptr && std::isnan(number->get())) {
    *value = "nan";  // an override's kind=nan: without quotes that is a number in TOML
    return true;
  }
  if (!node->is_string()) {
    Problem(key, "has to be text, is " + typeName(*node));
    return false;
  }
  *value = node->as_string()->get();
  return true;
}

bool TableReader::Flag(std::string_view key, bool* value) {
  const toml::node* const node = Node(key);
  if (node == nullptr) return false;
  if (!node->is_boolean()) {
    Problem(key, "has to be true or false, is " + typeName(*node));
    return false;
  }
  *value = node->as_boolean()->get();
  return true;
}

bool TableReader::Numbers(std::string_view key, std::size_t minCount, std::size_t maxCount, double low,
                          double high, std::vector<double>* values) {
  const toml::node* const node = Node(key);
  if (node == nullptr) return false;
  std::vector<double> numbers;
  const auto take = [&](const toml::node& element) {
    if (!element.is_number()) {
      problems_.Add(&element, PathOf(key), "has to be a number, is " + typeName(element));
      return false;
    }
    numbers.push_back(*element.value<double>());
    return inRange(element, key, numbers.back(), low, high);
  };
  if (const toml::array* const list = node->as_array()) {
    for (const toml::node& element : *list) {
      if (!take(element)) return false;
    }
  } else if (!take(*node)) {
    return false;
  }
  if (numbers.size() < minCount || numbers.size() > maxCount) {
    Problem(key, std::to_string(numbers.size()) + " numbers where " + std::to_string(minCount) +
                     (minCount == maxCount ? "" : " to " + std::to_string(maxCount)) + " belong");
    return false;
  }
  *values = std::move(numbers);
  return true;
}

const toml::table* TableReader::Table(std::string_view key) {
  const toml::node* const node = Node(key);
  if (node == nullptr) return nullptr;
  if (!node->is_table()) Problem(key, "has to be a table, is " + typeName(*node));
  return node->as_table();
}

void TableReader::RejectOthers() {
  for (const auto& [key, node] : table_) {
    if (std::find(known_.begin(), known_.end(), key.str()) == known_.end()) {
      problems_.Add(&node, PathOf(key.str()), "unknown key");
    }
  }
}

std::string showKey(std::string_view key) { return isBareKey(key) ? std::string(key) : quoted(key); }

std::string showNumber(double number) {
  char text[32];
  return {text, std::to_chars(text, text + sizeof text, number).ptr};
}

void mergeTables(toml::table& into, toml::table&& from) {
  for (auto&& [key, node] : from) {
    toml::node* const there = into.get(key.str());
    if (there != nullptr && there->is_table() && node.is_table()) {
      mergeTables(*there->as_table(), std::move(*node.as_table()));
      continue;
    }
    node.visit([&, name = key](auto& concrete) { into.insert_or_assign(name, std::move(concrete)); });
  }
}

bool parseToml(std::string_view text, const std::string& source, toml::table* table, Problems* problems) {
  if (const std::size_t line = KeyScanner(text).FindOverlong(); line != 0) {
    problems->AddText(source + ":" + std::to_string(line) + ": " + tooManyParts());
    return false;
  }
  toml::parse_result result = toml::parse(text, source);
  if (!result) {
    const toml::parse_error& error = result.error();
    problems->AddText(source + ":" + std::to_string(error.source().begin.line) + ": " +
                      std::string(error.description()));
    return false;
  }
  *table = std::move(result).table();
  return true;
}

bool parseOverride(const std::string& text, toml::table* table, Problems* problems) {
  const std::string source = kOverride + quoted(text);
  const std::size_t equals = text.find('=');
  const std::string key = text.substr(0, equals);
  if (equals == std::string::npos || key.empty() || text.find('\n') != std::string::npos) {
    problems->AddText(source + ": has to be KEY=VALUE");
    return false;
  }
  if (KeyScanner(key).FindOverlong() != 0) {
    problems->AddText(source + ": " + tooManyParts());
    return false;
  }
  const std::string value = text.substr(equals + 1);
  // What is no TOML value by itself is text that nobody wanted to quote.
  const bool isValue =
      KeyScanner(value).FindOverlong() == 0 && static_cast<bool>(toml::parse("value = " + value));
  toml::parse_result result = toml::parse(key + " = " + (isValue ? value : quoted(value)), source);
  if (!result) {
    problems->AddText(source + ": " + std::string(result.error().description()));
    return false;
  }
  *table = std::move(result).table();
  return true;
}

}  // namespace simhub
