#pragma once

#include <string>
#include <vector>

#include <getopt.h>

#include "framework/Calibrator.h"

/// The options and words behind a command's name.
///
///   CommandOptions options(arguments, "hl:t:");
///   for (int option; (option = options.Next()) != CommandOptions::kEnd;) { switch (option) …
///   options.argument() … } … options.words() …
///
/// One at a time: underneath is the C library's one parser, which is started afresh here.
class CommandOptions {
 public:
  static constexpr int kEnd = -1;

  /// Where options may stand. "--" ends them in either case; what follows are words, negative numbers too.
  enum class Order {
    kAnywhere,     ///< also behind and between words
    kBeforeWords,  ///< up to the first word: for commands whose words may be negative numbers
  };

  /// `shortOptions` and `longOptions` (may be null) as for getopt_long, without an order mark in front.
  CommandOptions(const Calibrator::Arguments& arguments, const char* shortOptions,
                 const option* longOptions = nullptr, Order order = Order::kAnywhere);

  /// The next option's character (or a long option's value); '?' for an unknown one or a missing argument
  /// (':' for the latter when `shortOptions` starts with a colon); kEnd when there are no more.
  int Next();
  /// The argument of the option just returned.
  [[nodiscard]] const char* argument() const { return optarg; }
  /// After kEnd: the words that are not options, in their order.
  [[nodiscard]] const std::vector<const char*>& words() const { return words_; }

 private:
  const int argc_;
  char* const* const argv_;
  const std::string shortOptions_;
  const option* const longOptions_;
  std::vector<const char*> words_;
};
