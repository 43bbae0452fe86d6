#include "simhub/Te2Table.h"

#include <fstream>

#include <gtest/gtest.h>
#include <sys/stat.h>

#include "simhub/TemporaryFolder.h"

namespace {

constexpr auto edgeOf = simhub::parseTe2FallingEdge;

TEST(Te2Table, IsTheFourthNumberInTheScansLine) {
  EXPECT_EQ(edgeOf("0998 1000 0998 1000 0998 1000 0998 1000"), 1000);
  EXPECT_EQ(edgeOf("0000 0009 0000 0009 0000 0009 0000 0009"), 9) << "leading zeros are no octal numbers";
}

TEST(Te2Table, IsTheFourthNumberInTheCalibrationsLine) {
  EXPECT_EQ(edgeOf("2055 317 3240 1500 2354 13 2354 13"), 1500);
  EXPECT_EQ(edgeOf("2055 -183 3240 1000 2354 13 2354 13"), 1000);
}

TEST(Te2Table, EndOfALongerLineBehindAShorterOneMakesNoDifference) {
  EXPECT_EQ(edgeOf("2055 317 3240 1500 2354 13 2354 1398 1000"), 1500);
}

TEST(Te2Table, NothingWithoutFourNumbers) {
  EXPECT_EQ(edgeOf(""), std::nullopt);
  EXPECT_EQ(edgeOf("1 2 3"), std::nullopt);
  EXPECT_EQ(edgeOf("1 2 3 x"), std::nullopt);
}

TEST(Te2Table, NothingForAnEdgeOutOfRange) {
  EXPECT_EQ(edgeOf("1 2 3 -1"), std::nullopt);
  EXPECT_EQ(edgeOf("1 2 3 4096"), std::nullopt);
  EXPECT_EQ(edgeOf("1 2 3 99999999999999999999"), std::nullopt);
  EXPECT_EQ(edgeOf("1 2 3 4095"), 4095);
  EXPECT_EQ(edgeOf("1 2 3 0"), 0);
}

TEST(Te2Table, IsReadFromAFile) {
  const TemporaryFolder folder;
  folder.WriteFile("te2_table", "2055 317 3240 1500 2354 13 2354 13");
  EXPECT_EQ(simhub::readTe2FallingEdge(folder.Path("te2_table")), 1500);
}

TEST(Te2Table, EndOfALargeFileIsNotRead) {
  const TemporaryFolder folder;
  folder.WriteFile("te2_table", "1 2 3 4" + std::string(100000, ' '));
  EXPECT_EQ(simhub::readTe2FallingEdge(folder.Path("te2_table")), 4);
  folder.WriteFile("te2_table", "1 2 3" + std::string(100000, ' ') + "4");
  EXPECT_EQ(simhub::readTe2FallingEdge(folder.Path("te2_table")), std::nullopt);
}

TEST(Te2Table, NothingWithoutAFileOrFromOneThatNobodyWrites) {
  const TemporaryFolder folder;
  EXPECT_EQ(simhub::readTe2FallingEdge(""), std::nullopt);
  EXPECT_EQ(simhub::readTe2FallingEdge(folder.Path("missing")), std::nullopt);
  ASSERT_EQ(::mkfifo(folder.Path("pipe").c_str(), 0600), 0);
  EXPECT_EQ(simhub::readTe2FallingEdge(folder.Path("pipe")), std::nullopt);
}

}  // namespace
