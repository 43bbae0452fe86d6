#include "framework/DataFile.h"

#include <filesystem>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "support/FileSizeLimit.h"
#include "support/TemporaryFolder.h"

namespace {

using testing::ElementsAre;
using testing::SizeIs;

class DataFileTest : public testing::Test {
 protected:
  [[nodiscard]] std::string content() const { return support::readFile(path).value_or("(none)"); }

  support::TemporaryFolder folder;
  const std::string path = folder.path() / "data";
};

TEST_F(DataFileTest, AppendsToWhatIsThereOrStartsAfresh) {
  EXPECT_EQ(appendToFile(path, "one", FileStart::kKeep), FileResult::kOk);
  EXPECT_EQ(appendToFile(path, "two", FileStart::kKeep), FileResult::kOk);
  EXPECT_EQ(content(), "onetwo");
  EXPECT_EQ(appendToFile(path, "three", FileStart::kTruncate), FileResult::kOk);
  EXPECT_EQ(content(), "three");
}

TEST_F(DataFileTest, WhatDoesNotFitOnTheDiskIsTakenBack) {
  ASSERT_EQ(appendToFile(path, "sound", FileStart::kKeep), FileResult::kOk);
  const support::FileSizeLimit full(7);
  EXPECT_EQ(appendToFile(path, "torn", FileStart::kKeep), FileResult::kFailed);
  EXPECT_EQ(content(), "sound");
}

TEST_F(DataFileTest, ALogGrowsLineByLineOrStartsAfresh) {
  EXPECT_EQ(appendToLogFile(path, "a\n", FileStart::kKeep), FileResult::kOk);
  EXPECT_EQ(appendToLogFile(path, "b\n", FileStart::kKeep), FileResult::kOk);
  EXPECT_EQ(content(), "a\nb\n");
  EXPECT_EQ(appendToLogFile(path, "c\n", FileStart::kTruncate), FileResult::kOk);
  EXPECT_EQ(content(), "c\n");
  EXPECT_EQ(appendToLogFile(path + "/none", "d\n", FileStart::kKeep), FileResult::kCannotOpen);
}

TEST_F(DataFileTest, AnUnfinishedLastLineIsDroppedBeforeTheNext) {
  bool dropped = true;
  EXPECT_EQ(appendLinesToFile(path, "a\n", FileStart::kKeep, &dropped), FileResult::kOk);
  EXPECT_FALSE(dropped);
  ASSERT_TRUE(support::writeFile(path, "a\nb\nunfin"));
  EXPECT_EQ(appendLinesToFile(path, "c\n", FileStart::kKeep, &dropped), FileResult::kOk);
  EXPECT_TRUE(dropped);
  EXPECT_EQ(content(), "a\nb\nc\n");
}

TEST_F(DataFileTest, AnUnfinishedLineMayBeLongerThanAPieceOfReading) {
  ASSERT_TRUE(support::writeFile(path, "a\n" + std::string(10000, 'x')));
  EXPECT_EQ(appendLinesToFile(path, "b\n", FileStart::kKeep), FileResult::kOk);
  EXPECT_EQ(content(), "a\nb\n");
  ASSERT_TRUE(support::writeFile(path, std::string(8192, 'x')));
  EXPECT_EQ(appendLinesToFile(path, "b\n", FileStart::kKeep), FileResult::kOk);
  EXPECT_EQ(content(), "b\n");
}

TEST_F(DataFileTest, ReadsNoMoreThanAllowed) {
  ASSERT_TRUE(support::writeFile(path, "12345"));
  std::string text;
  EXPECT_EQ(readWholeFile(path, 5, &text), FileResult::kOk);
  EXPECT_EQ(text, "12345");
  EXPECT_EQ(readWholeFile(path, 4, &text), FileResult::kTooLarge);
  // A gigabyte of nothing costs neither time nor memory.
  std::filesystem::resize_file(path, std::uintmax_t{1} << 30);
  EXPECT_EQ(readWholeFile(path, 1 << 20, &text), FileResult::kTooLarge);
}

TEST_F(DataFileTest, WhatCannotBeOpenedOrReadIsSaid) {
  std::string text;
  EXPECT_EQ(readWholeFile(path, 5, &text), FileResult::kCannotOpen);
  EXPECT_EQ(readWholeFile(folder.path(), 5, &text), FileResult::kFailed);
  EXPECT_EQ(appendToFile(folder.path(), "x", FileStart::kKeep), FileResult::kCannotOpen);
  EXPECT_EQ(appendLinesToFile(folder.path() / "none" / "x", "x\n", FileStart::kKeep),
            FileResult::kCannotOpen);
}

TEST(FloatRecords, AreSplitAsTheyWereAppended) {
  std::string bytes;
  appendFloats({1, -2.5F}, &bytes);
  appendFloats({3, 1e-30F}, &bytes);
  EXPECT_THAT(bytes, SizeIs(16));
  std::vector<SampleData> records;
  EXPECT_EQ(splitFloatRecords(bytes, 2, &records), FileResult::kOk);
  EXPECT_THAT(records, ElementsAre(SampleData{1, -2.5F}, SampleData{3, 1e-30F}));
}

TEST(FloatRecords, OfATornFileTheWholeOnesAreThere) {
  std::vector<SampleData> records{{9}};
  for (std::size_t length = 0; length <= 24; ++length) {
    const FileResult expected = length % 12 == 0 ? FileResult::kOk : FileResult::kIncomplete;
    EXPECT_EQ(splitFloatRecords(std::string(length, '\0'), 3, &records), expected);
    EXPECT_THAT(records, SizeIs(length / 12));
  }
}

}  // namespace
