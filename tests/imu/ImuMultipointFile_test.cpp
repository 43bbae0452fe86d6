#include "imu/ImuMultipointFile.h"

#include <filesystem>
#include <limits>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "support/TemporaryFolder.h"

namespace {

using testing::ElementsAre;
using testing::SizeIs;

class ImuFileTest : public testing::Test {
 protected:
  [[nodiscard]] std::string content() const { return support::readFile(path).value_or("(none)"); }
  void write(const std::string& bytes) const { ASSERT_TRUE(support::writeFile(path, bytes)); }

  support::TemporaryFolder folder;
  const std::string path = folder.path() / "vantle_imu";
};

ImuCalibrationInfo info(const std::string& phase) {
  ImuCalibrationInfo made;
  made.phase = phase;
  made.accel_mean = {9.80665, -0.25, 1e-7};
  made.gyro_mean = {0.1, 1.0 / 3, -2};
  made.temp_mean = 27.5;
  made.rotation_integration_time = 2.2;
  made.rotation_integration = {1, 2, 1e22};
  return made;
}

// Lines.

TEST(ImuRecord, HasSixteenSignificantDigits) {
  EXPECT_EQ(info("a+x").ToString(),
            "a+x 9.806649999999999 -0.25 1e-07 0.1 0.3333333333333333 -2 27.5 2.2 1 2 1e+22");
  EXPECT_EQ(ImuCalibrationInfo().ToString(), " 0 0 0 0 0 0 0 0 0 0 0");
}

TEST(ImuRecord, ReadBackIsWhatWasWrittenToTheLastDigit) {
  const ImuCalibrationInfo back(info("g+z").ToString());
  EXPECT_EQ(back.phase, "g+z");
  EXPECT_EQ(back.status, 0);
  EXPECT_NEAR(back.accel_mean[0], 9.80665, 1e-15);
  EXPECT_NEAR(back.gyro_mean[1], 1.0 / 3, 1e-16);
  EXPECT_EQ(back.rotation_integration, info("g+z").rotation_integration);
  // Floats, which is what records are made of, come back as the same floats.
  ImuCalibrationInfo floats;
  floats.phase = "a+x";
  floats.temp_mean = static_cast<double>(27.73242F);
  EXPECT_EQ(static_cast<float>(ImuCalibrationInfo(floats.ToString()).temp_mean), 27.73242F);
}

TEST(ImuRecord, APhaseAloneHasAllNumbersZero) {
  const ImuCalibrationInfo record("a+x");
  EXPECT_EQ(record.phase, "a+x");
  EXPECT_EQ(record.ToString(), "a+x 0 0 0 0 0 0 0 0 0 0 0");
}

TEST(ImuRecord, MissingWordsStayZero) {
  EXPECT_EQ(ImuCalibrationInfo("a+x 1 2 3 4").ToString(), "a+x 1 2 3 4 0 0 0 0 0 0 0");
}

TEST(ImuRecord, WhatDoesNotParseIsZeroFromThereOn) {
  for (const char* odd : {"nan", "inf", "-inf", "two", "1e999", "-1e999"}) {
    EXPECT_EQ(ImuCalibrationInfo(std::string("a+x 1 ") + odd + " 3 4 5 6 7 8 9 10 11").ToString(),
              "a+x 1 0 0 0 0 0 0 0 0 0 0")
        << odd;
  }
}

TEST(ImuRecord, ExtraTextIsIgnored) {
  EXPECT_EQ(ImuCalibrationInfo("  a+x\t1 2 3 4 5 6 7 8 9 10 11 12 thirteen").ToString(),
            "a+x 1 2 3 4 5 6 7 8 9 10 11");
}

TEST(ImuRecord, KnowsWhetherItIsFinite) {
  EXPECT_TRUE(info("a+x").IsFinite());
  ImuCalibrationInfo odd = info("a+x");
  odd.rotation_integration[1] = std::numeric_limits<double>::quiet_NaN();
  EXPECT_FALSE(odd.IsFinite());
  odd = info("a+x");
  odd.temp_mean = std::numeric_limits<double>::infinity();
  EXPECT_FALSE(odd.IsFinite());
}

// The file of lines.

TEST_F(ImuFileTest, EachRecordIsALine) {
  EXPECT_EQ(appendCalibrationInfo(info("a+x"), path), FileResult::kOk);
  EXPECT_EQ(appendCalibrationInfo(info("g+x"), path), FileResult::kOk);
  EXPECT_EQ(content(), info("a+x").ToString() + "\n" + info("g+x").ToString() + "\n");
  std::vector<ImuCalibrationInfo> records;
  EXPECT_EQ(readCalibrationInfos(path, &records), FileResult::kOk);
  ASSERT_THAT(records, SizeIs(2));
  EXPECT_EQ(records[1].ToString(), info("g+x").ToString());
}

TEST_F(ImuFileTest, EmptyLinesAreRecordsToo) {
  write("a+x 1\n\ng+x 2");
  std::vector<ImuCalibrationInfo> records;
  EXPECT_EQ(readCalibrationInfos(path, &records), FileResult::kOk);
  ASSERT_THAT(records, SizeIs(3));
  EXPECT_EQ(records[1].phase, "");
  EXPECT_EQ(records[2].accel_mean[0], 2);
}

TEST_F(ImuFileTest, AnUnfinishedLineIsDroppedBeforeTheNextRecord) {
  write("a+x 1 2 3\na-x 9.8 0.");
  bool dropped = false;
  EXPECT_EQ(appendCalibrationInfo(info("a-x"), path, &dropped), FileResult::kOk);
  EXPECT_TRUE(dropped);
  EXPECT_EQ(content(), "a+x 1 2 3\n" + info("a-x").ToString() + "\n");
  EXPECT_EQ(appendCalibrationInfo(info("g+x"), path, &dropped), FileResult::kOk);
  EXPECT_FALSE(dropped);
}

TEST_F(ImuFileTest, AFileThatIsNotThereCannotBeRead) {
  std::vector<ImuCalibrationInfo> records{info("a+x")};
  EXPECT_EQ(readCalibrationInfos(path, &records), FileResult::kCannotOpen);
  EXPECT_THAT(records, SizeIs(0));
  std::vector<ImuPosition> positions(1);
  EXPECT_EQ(readPositions(path, &positions), FileResult::kCannotOpen);
  EXPECT_THAT(positions, SizeIs(0));
}

TEST_F(ImuFileTest, AFolderThatIsNotThereCannotBeWrittenTo) {
  EXPECT_EQ(appendCalibrationInfo(info("a+x"), folder.path() / "none/file"), FileResult::kCannotOpen);
  EXPECT_EQ(appendPosition({}, folder.path() / "none/file", FileStart::kKeep), FileResult::kCannotOpen);
}

TEST_F(ImuFileTest, AFolderInThePlaceOfTheFileIsAFault) {
  std::filesystem::create_directory(path);
  std::vector<ImuCalibrationInfo> records;
  std::vector<ImuPosition> positions;
  EXPECT_EQ(readCalibrationInfos(path, &records), FileResult::kFailed);
  EXPECT_EQ(readPositions(path, &positions), FileResult::kFailed);
  EXPECT_EQ(appendCalibrationInfo(info("a+x"), path), FileResult::kCannotOpen);
}

TEST_F(ImuFileTest, ALinkInThePlaceOfTheFileIsNeitherReadNorWritten) {
  const std::string victim = folder.path() / "victim";
  ASSERT_TRUE(support::writeFile(victim, "precious\n"));
  std::filesystem::create_symlink(victim, path);
  std::vector<ImuCalibrationInfo> records;
  EXPECT_EQ(readCalibrationInfos(path, &records), FileResult::kCannotOpen);
  EXPECT_EQ(appendCalibrationInfo(info("a+x"), path), FileResult::kCannotOpen);
  EXPECT_EQ(appendPosition({}, path, FileStart::kTruncate), FileResult::kCannotOpen);
  EXPECT_EQ(support::readFile(victim), "precious\n");
}

TEST_F(ImuFileTest, AFullDiskIsReported) {
  if (!std::filesystem::exists("/dev/full")) GTEST_SKIP() << "no /dev/full here";
  EXPECT_EQ(appendCalibrationInfo(info("a+x"), "/dev/full"), FileResult::kFailed);
  EXPECT_EQ(appendPosition({{1, 2, 3}, {1, 2, 3}, {1}}, "/dev/full", FileStart::kKeep), FileResult::kFailed);
}

TEST_F(ImuFileTest, AHugeFileIsRefusedInsteadOfFillingTheMemory) {
  write(std::string(kMaxImuFileBytes, '\n'));
  std::vector<ImuCalibrationInfo> records;
  EXPECT_EQ(readCalibrationInfos(path, &records), FileResult::kOk);
  EXPECT_THAT(records, SizeIs(kMaxImuFileBytes));
  // Sparse: nobody has to write 100 MB.
  std::filesystem::resize_file(path, 100'000'000);
  EXPECT_EQ(readCalibrationInfos(path, &records), FileResult::kTooLarge);
  EXPECT_THAT(records, SizeIs(0));
  std::vector<ImuPosition> positions;
  EXPECT_EQ(readPositions(path, &positions), FileResult::kTooLarge);
  EXPECT_THAT(positions, SizeIs(0));
}

TEST_F(ImuFileTest, BytesOfAnyKindAreReadWithoutHarm) {
  std::string bytes;
  for (int i = 0; i < 4096; ++i) bytes.push_back(static_cast<char>(i * 37));
  write(bytes);
  std::vector<ImuCalibrationInfo> records;
  EXPECT_EQ(readCalibrationInfos(path, &records), FileResult::kOk);
  EXPECT_THAT(records, SizeIs(17));  // the byte of a newline comes round every 256 bytes
}

// The file of positions.

TEST_F(ImuFileTest, APositionIsSevenFloats) {
  EXPECT_EQ(appendPosition({{1, 2, 3}, {4, 5, 6}, {7}}, path, FileStart::kTruncate), FileResult::kOk);
  EXPECT_EQ(appendPosition({{-1, -2, -3}, {-4, -5, -6}, {-7}}, path, FileStart::kKeep), FileResult::kOk);
  const std::string bytes = content();
  ASSERT_THAT(bytes, SizeIs(56));
  const float first = 1;
  EXPECT_EQ(bytes.substr(0, 4), std::string(reinterpret_cast<const char*>(&first), 4));
  std::vector<ImuPosition> positions;
  EXPECT_EQ(readPositions(path, &positions), FileResult::kOk);
  ASSERT_THAT(positions, SizeIs(2));
  EXPECT_THAT(positions[0].accel.toVector(), ElementsAre(1, 2, 3));
  EXPECT_THAT(positions[1].gyro.toVector(), ElementsAre(-4, -5, -6));
  EXPECT_THAT(positions[1].temp.toVector(), ElementsAre(-7));
}

TEST_F(ImuFileTest, TheFirstStepTruncatesWhatIsThere) {
  write("left over");
  EXPECT_EQ(appendPosition({{1, 2, 3}, {4, 5, 6}, {7}}, path, FileStart::kTruncate), FileResult::kOk);
  EXPECT_THAT(content(), SizeIs(28));
}

TEST_F(ImuFileTest, PositionsCutAnywhereAreIncomplete) {
  for (int i = 0; i < 2; ++i) {
    ASSERT_EQ(appendPosition({{1, 2, 3}, {4, 5, 6}, {7}}, path, FileStart::kKeep), FileResult::kOk);
  }
  const std::string whole = content();
  for (std::size_t length = 0; length <= whole.size(); ++length) {
    write(whole.substr(0, length));
    std::vector<ImuPosition> positions;
    const FileResult expected = length % 28 == 0 ? FileResult::kOk : FileResult::kIncomplete;
    EXPECT_EQ(readPositions(path, &positions), expected) << length;
    EXPECT_THAT(positions, SizeIs(length / 28)) << length;
  }
}

}  // namespace
