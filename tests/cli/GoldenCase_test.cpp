#include "cli/GoldenCase.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace {

using golden::Case;
using golden::parseCase;
using golden::splitWords;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::Pair;

constexpr const char* kTwoRuns = R"(# What the case is about.

--- run
# why this run
hub: sim:o1v1?world.pressure=1000
args: -n baro '10 13' "a\"b"
env: XDG_STATE_HOME=$ROOT/state
env: VANTLE_ROOT
without: data/app-ephemeral
--- given file persist/sensors/in
given
--- status
-22
--- stdout
MEAN:      1.000000
trailing \
--- stderr
--- requests
look-up
--- changes
new a
--- file a/b
text
\ no newline at the end
--- hex file a/c
00000000: 00 ff
--- no file a/d
--- run
--- status
0
--- stdout
--- stderr
)";

Case parsed(const std::string& text) {
  std::string error;
  const auto golden = parseCase(text, &error);
  EXPECT_TRUE(golden.has_value()) << error;
  return golden.value_or(Case{});
}

std::string errorOf(const std::string& text) {
  std::string error;
  EXPECT_FALSE(parseCase(text, &error).has_value());
  return error;
}

TEST(GoldenCase, KeepsHowEachRunIsMade) {
  const Case golden = parsed(kTwoRuns);
  ASSERT_EQ(golden.runs.size(), 2U);
  const auto& run = golden.runs[0];
  EXPECT_EQ(run.line, 3);
  EXPECT_EQ(run.hub, "sim:o1v1?world.pressure=1000");
  EXPECT_THAT(run.arguments, ElementsAre("-n", "baro", "10 13", "a\"b"));
  EXPECT_THAT(run.environment, ElementsAre(Pair("XDG_STATE_HOME", std::optional<std::string>("$ROOT/state")),
                                           Pair("VANTLE_ROOT", std::nullopt)));
  EXPECT_THAT(run.without, ElementsAre("data/app-ephemeral"));
  EXPECT_THAT(run.given, ElementsAre(Pair("persist/sensors/in", "given\n")));
  EXPECT_EQ(golden.runs[1].hub, std::nullopt);
  EXPECT_TRUE(golden.runs[1].arguments.empty());
}

TEST(GoldenCase, KeepsWhatEachRunMustLeaveBehind) {
  const auto run = parsed(kTwoRuns).runs[0];
  EXPECT_EQ(run.expected.status, "-22");
  EXPECT_EQ(run.expected.output, "MEAN:      1.000000\ntrailing \n");
  EXPECT_EQ(run.expected.errors, "");
  EXPECT_EQ(run.expected.requests, "look-up\n");
  EXPECT_EQ(run.expected.changes, "new a\n");
  ASSERT_EQ(run.expected.files.size(), 3U);
  EXPECT_EQ(run.expected.files.at("a/b"), "text");
  EXPECT_EQ(run.expected.files.at("a/c"), std::string("\0\xff", 2));
  EXPECT_EQ(run.expected.files.at("a/d"), std::nullopt);
}

TEST(GoldenCase, IsWrittenAsItWasRead) { EXPECT_EQ(golden::formatCase(parsed(kTwoRuns)), kTwoRuns); }

TEST(GoldenCase, SaysWhichLineIsWrong) {
  EXPECT_THAT(errorOf(""), HasSubstr("at least one"));
  EXPECT_EQ(errorOf("--- stdout\n"), "line 1: the first section must be \"--- run\"");
  EXPECT_EQ(errorOf("--- run\n--- stdout\n--- stdout\n"), "line 3: a run has one section \"stdout\"");
  EXPECT_EQ(errorOf("--- run\n--- stduot\n"), "line 2: no such section: \"stduot\"");
  EXPECT_EQ(errorOf("--- run\nargs: 'open\n"), "line 2: a quote does not end");
  EXPECT_THAT(errorOf("--- run\n\nargz: x\n"), HasSubstr("line 3: not a setting"));
  EXPECT_THAT(errorOf("--- run\n--- hex file a\nxyz\n"), HasSubstr("line 2: not a hex dump"));
  EXPECT_THAT(errorOf("--- run\n--- no file a\ncontent\n"), HasSubstr("has no content"));
  EXPECT_THAT(errorOf("--- run\n--- file a\n--- no file a\n"), HasSubstr("one section for the file a"));
}

TEST(GoldenCase, NeverLeavesTheRoot) {
  EXPECT_THAT(errorOf("--- run\nwithout: ../x\n"), HasSubstr("not a path below the root"));
  EXPECT_THAT(errorOf("--- run\n--- given file /etc/x\n"), HasSubstr("not a path below the root"));
  EXPECT_THAT(errorOf("--- run\n--- file a/../../x\n"), HasSubstr("not a path below the root"));
  EXPECT_THAT(errorOf("--- run\n--- file \n"), HasSubstr("not a path below the root"));
}

TEST(GoldenCase, MustStateStatusAndBothOutputsOfEveryRun) {
  std::string error;
  EXPECT_TRUE(golden::isComplete(parsed(kTwoRuns), &error));
  EXPECT_FALSE(golden::isComplete(parsed("--- run\n--- status\n0\n--- stdout\n"), &error));
  EXPECT_THAT(error, HasSubstr("line 1: the run has no section \"stderr\""));
  EXPECT_FALSE(golden::isComplete(parsed("--- run\n"), &error));
  EXPECT_THAT(error, HasSubstr("\"status\""));
}

TEST(GoldenText, GivesEveryContentBack) {
  for (const std::string& content :
       {std::string(), std::string("\n"), std::string("\n\n"), std::string("a"), std::string("a\n"),
        std::string("blank \ttab\t\ncr\r\n \n"), std::string("--- run\n---\n"),
        std::string("\\\n\\\\\nx\\\n"), std::string("\\ no newline at the end\n"),
        std::string("\\ no newline at the end"), std::string("x\n ")}) {
    const std::string lines = golden::encodeText(content);
    EXPECT_EQ(golden::decodeText(lines), content) << lines;
    EXPECT_EQ(lines.find("\n--- "), std::string::npos);
    EXPECT_EQ(lines.find(" \n"), std::string::npos);
  }
}

TEST(GoldenText, MarksWhatCannotBeSeen) {
  EXPECT_EQ(golden::encodeText("a \nb"), "a \\\nb\n\\ no newline at the end\n");
}

TEST(GoldenHex, GivesEveryByteBack) {
  std::string content;
  for (int i = 0; i < 256; ++i) content += static_cast<char>(i);
  const std::string dump = golden::encodeHex(content);
  EXPECT_EQ(golden::decodeHex(dump), content);
  EXPECT_EQ(dump.substr(0, dump.find('\n')), "00000000: 00 01 02 03 04 05 06 07 08 09 0a 0b 0c 0d 0e 0f");
  EXPECT_EQ(golden::decodeHex(""), "");
  EXPECT_EQ(golden::decodeHex("00000000: 0"), std::nullopt);
  EXPECT_EQ(golden::decodeHex("00 01"), std::nullopt);
}

TEST(GoldenHex, IsForContentThatIsNoText) {
  EXPECT_FALSE(golden::isBinary("text\twith tabs\r\n"));
  EXPECT_FALSE(golden::isBinary("27.5 \xc2\xb0\x43, \xe2\x88\x92"));
  EXPECT_TRUE(golden::isBinary("\xc2"));
  EXPECT_TRUE(golden::isBinary(std::string(1, '\0')));
  EXPECT_TRUE(golden::isBinary("\x7f"));
  EXPECT_TRUE(golden::isBinary("\xe9"));
}

TEST(GoldenWords, AreSplitAsAShellSplitsThem) {
  EXPECT_EQ(splitWords(""), std::vector<std::string>{});
  EXPECT_EQ(splitWords("  a\t b "), (std::vector<std::string>{"a", "b"}));
  EXPECT_EQ(splitWords("'' \"\" 'a b'c\\ d"), (std::vector<std::string>{"", "", "a bc d"}));
  EXPECT_EQ(splitWords(R"("\"\\\n" '\')"), (std::vector<std::string>{R"("\\n)", R"(\)"}));
  EXPECT_EQ(splitWords("\"open"), std::nullopt);
  EXPECT_EQ(splitWords("open\\"), std::nullopt);
}

}  // namespace
