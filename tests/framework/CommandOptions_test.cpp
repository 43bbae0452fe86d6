#include "framework/CommandOptions.h"

#include <cstdlib>

#include <gtest/gtest.h>

#include "support/ArgumentWords.h"

namespace {

struct Parsed {
  std::string options;  ///< the characters in order, each with its argument behind it
  std::vector<std::string> words;
};

Parsed parse(ArgumentWords& words, const char* shortOptions, const option* longOptions = nullptr,
             CommandOptions::Order order = CommandOptions::Order::kAnywhere) {
  Calibrator::Arguments arguments;
  arguments.argc = words.argc();
  arguments.argv = words.argv();
  Parsed parsed;
  CommandOptions options(arguments, shortOptions, longOptions, order);
  for (int found; (found = options.Next()) != CommandOptions::kEnd;) {
    parsed.options += static_cast<char>(found);
    if (found == 'l' || found == 't') parsed.options += options.argument();
  }
  parsed.words.assign(options.words().begin(), options.words().end());
  return parsed;
}

using Words = std::vector<std::string>;

TEST(CommandOptions, TakesOptionsInFrontOfTheWords) {
  ArgumentWords words{"baro", "-t", "5", "-l3", "1013.25", "extra"};
  const Parsed parsed = parse(words, "hl:t:");
  EXPECT_EQ(parsed.options, "t5l3");
  EXPECT_EQ(parsed.words, Words({"1013.25", "extra"}));
}

TEST(CommandOptions, TakesOptionsBehindAndBetweenTheWords) {
  ArgumentWords words{"prox", "poffset", "-w", "disable", "-h"};
  const Parsed parsed = parse(words, "hw");
  EXPECT_EQ(parsed.options, "wh");
  EXPECT_EQ(parsed.words, Words({"poffset", "disable"}));
}

TEST(CommandOptions, LeavesTheArgumentVectorInItsOrder) {
  ArgumentWords words{"prox", "poffset", "-w", "disable"};
  parse(words, "hw");
  EXPECT_STREQ(words.argv()[1], "poffset");
  EXPECT_STREQ(words.argv()[2], "-w");
}

TEST(CommandOptions, ATwoDashWordEndsTheOptions) {
  ArgumentWords words{"mag", "1", "--", "-20", "-t"};
  const Parsed parsed = parse(words, "hl:t:u");
  EXPECT_EQ(parsed.options, "");
  EXPECT_EQ(parsed.words, Words({"1", "-20", "-t"}));
}

TEST(CommandOptions, ANegativeNumberIsAnUnknownOption) {
  ArgumentWords words{"mag", "-20"};
  EXPECT_EQ(parse(words, "hl:t:u").options.substr(0, 1), "?");
}

TEST(CommandOptions, OfACommandWithNegativeWordsEndAtTheFirstWord) {
  ArgumentWords words{"mag-sensitivity", "-h", "1", "-20", "-h"};
  const Parsed parsed = parse(words, "hc:s:", nullptr, CommandOptions::Order::kBeforeWords);
  EXPECT_EQ(parsed.options, "h");
  EXPECT_EQ(parsed.words, Words({"1", "-20", "-h"}));
}

TEST(CommandOptions, AMissingArgumentIsAQuestionMark) {
  ArgumentWords words{"baro", "-t"};
  EXPECT_EQ(parse(words, "hl:t:").options, "?");
}

TEST(CommandOptions, AMissingArgumentIsAColonWhenTheCommandAsksForThat) {
  ArgumentWords words{"color", "-s"};
  EXPECT_EQ(parse(words, ":hs:").options, ":");
  ArgumentWords unknown{"color", "-z"};
  EXPECT_EQ(parse(unknown, ":hs:").options, "?");
}

TEST(CommandOptions, ALoneDashIsAWord) {
  ArgumentWords words{"baro", "-"};
  EXPECT_EQ(parse(words, "h").words, Words({"-"}));
}

TEST(CommandOptions, TakesLongOptionsAnywhereToo) {
  const option longOptions[] = {{"help", no_argument, nullptr, 'h'},
                                {"time", required_argument, nullptr, 't'},
                                {nullptr, 0, nullptr, 0}};
  ArgumentWords words{"imu-thermal", "word", "--time", "9", "--help"};
  const Parsed parsed = parse(words, "h", longOptions);
  EXPECT_EQ(parsed.options, "t9h");
  EXPECT_EQ(parsed.words, Words({"word"}));
}

TEST(CommandOptions, EachCommandStartsAfresh) {
  ArgumentWords first{"baro", "-hh", "1"};
  Calibrator::Arguments arguments;
  arguments.argc = first.argc();
  arguments.argv = first.argv();
  CommandOptions abandoned(arguments, "h");
  EXPECT_EQ(abandoned.Next(), 'h');  // in the middle of "-hh"
  ArgumentWords second{"mag", "-t7", "2"};
  const Parsed parsed = parse(second, "t:");
  EXPECT_EQ(parsed.options, "t7");
  EXPECT_EQ(parsed.words, Words({"2"}));
}

TEST(CommandOptions, TheEnvironmentDoesNotChangeTheOrder) {
  setenv("POSIXLY_CORRECT", "1", 1);
  ArgumentWords words{"prox", "near", "-h"};
  const Parsed parsed = parse(words, "h");
  unsetenv("POSIXLY_CORRECT");
  EXPECT_EQ(parsed.options, "h");
  EXPECT_EQ(parsed.words, Words({"near"}));
}

TEST(CommandOptions, OfACommandWithoutWordsAreNone) {
  ArgumentWords words{"baro"};
  const Parsed parsed = parse(words, "h");
  EXPECT_EQ(parsed.options, "");
  EXPECT_TRUE(parsed.words.empty());
}

}  // namespace
