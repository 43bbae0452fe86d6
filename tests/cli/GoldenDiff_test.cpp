#include "cli/GoldenDiff.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace {

using golden::compareRun;
using golden::differenceOf;
using golden::Result;
using golden::sameStatus;
using testing::HasSubstr;

/// A run that states everything, and a result that is just as stated.
struct Fulfilled {
  golden::Run run;
  Result actual;

  Fulfilled() {
    run.hasStatus = run.hasOutput = run.hasErrors = run.hasRequests = run.hasChanges = true;
    actual.status = "0";
    actual.output = "out\n";
    actual.errors = "err\n";
    actual.requests = "req\n";
    actual.changes = "new f\n";
    actual.files = {{"f", "content\n"}, {"absent", std::nullopt}};
    run.expected = actual;
  }
};

TEST(GoldenDiff, EqualContentsHaveNoDifference) {
  EXPECT_EQ(differenceOf("a\nb\n", "a\nb\n"), "");
  EXPECT_EQ(differenceOf("", ""), "");
}

TEST(GoldenDiff, ShowsAChangedLineWithItsNeighbours) {
  EXPECT_EQ(differenceOf("1\n2\n3\n4\n5\n6\n7\n8\n9\n", "1\n2\n3\n4\nfive\n6\n7\n8\n9\n"),
            "  ...\n   2\n   3\n   4\n  -5\n  +five\n   6\n   7\n   8\n  ...\n");
}

TEST(GoldenDiff, ShowsMissingAndAddedLines) {
  EXPECT_EQ(differenceOf("a\nb\n", "a\n"), "   a\n  -b\n");
  EXPECT_EQ(differenceOf("", "new\n"), "  +new\n");
}

TEST(GoldenDiff, ShowsBlanksAtTheEndAndAMissingNewline) {
  EXPECT_EQ(differenceOf("a \n", "a\n"), "  -a \\\n  +a\n");
  EXPECT_EQ(differenceOf("a\n", "a"), "   a\n  +\\ no newline at the end\n");
}

TEST(GoldenDiff, ComparesLargeContentsWithoutATable) {
  std::string big;
  for (int i = 0; i < 3000; ++i) big += std::to_string(i) + "\n";
  EXPECT_THAT(differenceOf(big, "x" + big), HasSubstr("+x0\n"));
}

TEST(GoldenDiff, StatusesAreComparedAsAShellSeesThem) {
  EXPECT_TRUE(sameStatus("-22", "234"));
  EXPECT_TRUE(sameStatus("-2147483647", "1"));
  EXPECT_FALSE(sameStatus("0", "1"));
  EXPECT_FALSE(sameStatus("-22", "signal 11"));
  EXPECT_FALSE(sameStatus("", "0"));
  EXPECT_TRUE(sameStatus("timed out", "timed out"));
}

TEST(GoldenDiff, ARunAsStatedDoesNotDiffer) {
  const Fulfilled f;
  EXPECT_EQ(compareRun(f.run, f.actual), "");
}

TEST(GoldenDiff, NamesTheSectionThatDiffers) {
  Fulfilled f;
  f.actual.status = "-22";
  EXPECT_EQ(compareRun(f.run, f.actual), "in status (- expected, + actual):\n  -0\n  +-22\n");
  f = Fulfilled();
  f.actual.output = "other\n";
  EXPECT_EQ(compareRun(f.run, f.actual), "in stdout (- expected, + actual):\n  -out\n  +other\n");
  f = Fulfilled();
  f.actual.errors = "";
  EXPECT_EQ(compareRun(f.run, f.actual), "in stderr (- expected, + actual):\n  -err\n");
  f = Fulfilled();
  f.actual.requests += "more\n";
  EXPECT_THAT(compareRun(f.run, f.actual), HasSubstr("in requests"));
  f = Fulfilled();
  f.actual.changes = "";
  EXPECT_THAT(compareRun(f.run, f.actual), HasSubstr("in changes"));
  f = Fulfilled();
  f.actual.files["f"] = "other\n";
  EXPECT_THAT(compareRun(f.run, f.actual),
              HasSubstr("in file f (- expected, + actual):\n  -content\n  +other\n"));
}

TEST(GoldenDiff, SeesFilesThatAreMissingAndFilesThatAreThere) {
  Fulfilled f;
  f.actual.files["f"] = std::nullopt;
  f.actual.files["absent"] = "x";
  const std::string difference = compareRun(f.run, f.actual);
  EXPECT_THAT(difference, HasSubstr("in file f:\n  there is no such file\n"));
  EXPECT_THAT(difference, HasSubstr("in no file absent:\n  the file is there\n"));
}

TEST(GoldenDiff, ShowsBinaryFilesInHex) {
  Fulfilled f;
  f.run.expected.files["f"] = std::string("\x00\x01", 2);
  f.actual.files["f"] = std::string("\x00\x02", 2);
  EXPECT_THAT(compareRun(f.run, f.actual), HasSubstr("  -00000000: 00 01\n  +00000000: 00 02\n"));
}

TEST(GoldenDiff, DoesNotCompareWhatTheCaseDoesNotState) {
  Fulfilled f;
  f.run.hasRequests = f.run.hasChanges = false;
  f.run.expected.files.clear();
  f.actual.requests = f.actual.changes = "other\n";
  EXPECT_EQ(compareRun(f.run, f.actual), "");
}

TEST(GoldenUpdate, MakesTheRunAsItCameAndAddsTheMandatorySections) {
  Fulfilled f;
  golden::Run bare;
  bare.hasRequests = true;
  bare.expected.files = {{"f", std::nullopt}};
  golden::updateRun(f.actual, &bare);
  EXPECT_TRUE(bare.hasStatus && bare.hasOutput && bare.hasErrors);
  EXPECT_FALSE(bare.hasChanges);
  EXPECT_EQ(bare.expected.requests, "req\n");
  EXPECT_EQ(bare.expected.files.at("f"), "content\n");
  EXPECT_EQ(compareRun(bare, f.actual), "");
}

TEST(GoldenUpdate, KeepsAStatusThatMeansTheSame) {
  Fulfilled f;
  f.run.expected.status = "-2147483647";
  f.actual.status = "1";
  golden::updateRun(f.actual, &f.run);
  EXPECT_EQ(f.run.expected.status, "-2147483647");
}

}  // namespace
