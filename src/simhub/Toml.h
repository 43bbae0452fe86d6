// TOML files as settings that are checked while they are read: every key that is read is checked for its type
// and range, and keys that nobody reads are reported as unknown.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "simhub/TomlLibrary.h"

namespace simhub {

/// What is wrong with a file: one line each, "FILE:LINE: KEY: what". Keeps the first twenty.
class Problems {
 public:
  /// `node` says where; null: `fallback` does.
  void Add(const toml::node* node, const std::string& key, const std::string& what);
  void AddText(const std::string& line);
  [[nodiscard]] bool None() const { return lines_.empty(); }
  [[nodiscard]] std::string Text() const;
  /// Where problems of nodes without a place of their own are.
  void SetSource(std::string source) { source_ = std::move(source); }

 private:
  std::string source_;
  std::vector<std::string> lines_;
};

/// Reads the keys of one table. Each function leaves its result alone when the key is missing, and reports a
/// problem when it is there but wrong. True: it was there and right.
class TableReader {
 public:
  /// `path` is the table's dotted key, empty for the file itself.
  TableReader(const toml::table& table, std::string path, Problems& problems);

  bool Number(std::string_view key, double low, double high, double* value);
  bool Integer(std::string_view key, std::int64_t low, std::int64_t high, std::int64_t* value);
  bool Text(std::string_view key, std::string* value);
  bool Flag(std::string_view key, bool* value);
  /// A list of numbers; a single number is a list of one.
  bool Numbers(std::string_view key, std::size_t minCount, std::size_t maxCount, double low, double high,
               std::vector<double>* values);
  /// The table of that key, or null.
  const toml::table* Table(std::string_view key);
  /// The node of that key, or null: for what has a form of its own.
  const toml::node* Node(std::string_view key);

  /// Reports a problem of this table's key (with an empty key: of the table).
  void Problem(std::string_view key, const std::string& what);
  /// Reports every key that was not asked for.
  void RejectOthers();

  [[nodiscard]] std::string PathOf(std::string_view key) const;

 private:
  bool inRange(const toml::node& node, std::string_view key, double number, double low, double high);

  const toml::table& table_;
  const std::string path_;
  Problems& problems_;
  std::vector<std::string> known_;
};

/// A key as it stands in a file: in quotes where it needs them.
[[nodiscard]] std::string showKey(std::string_view key);
[[nodiscard]] std::string showNumber(double number);

/// Lays `from` over `into`: tables are merged, everything else replaces what was there.
void mergeTables(toml::table& into, toml::table&& from);

/// Parses a file's text. `source` is what problems call it.
[[nodiscard]] bool parseToml(std::string_view text, const std::string& source, toml::table* table,
                             Problems* problems);
/// Parses "KEY=VALUE", KEY dotted, VALUE a TOML value or else plain text.
[[nodiscard]] bool parseOverride(const std::string& text, toml::table* table, Problems* problems);

}  // namespace simhub
