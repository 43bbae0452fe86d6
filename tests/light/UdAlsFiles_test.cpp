#include "light/UdAlsFiles.h"

#include <cstring>
#include <limits>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "support/TemporaryFolder.h"

namespace {

using testing::SizeIs;

const SampleData kSample{457.5F, 562, 312, 350, 242.5F, 60, 11, 1000};

UdAlsArguments luxStep() {
  UdAlsArguments arguments;
  arguments.referenceLux = 100;
  arguments.referenceCct = 4000;
  arguments.displayColor = "d65";
  arguments.brightness = 128;
  return arguments;
}

TEST(UdAlsLogLine, HasTheReferencesTheChannelsAndTheDisplay) {
  EXPECT_EQ(udAlsLogLine(luxStep(), kSample),
            "100.000000,4000.000000,562.000000,312.000000,350.000000,242.500000,60.000000,11.000000,"
            "1000.000000,d65,128.000000\n");
}

TEST(UdAlsLogLine, HoldsTheLargestNumbers) {
  const float most = std::numeric_limits<float>::max();
  const std::string line = udAlsLogLine(luxStep(), {0, -most, most, 0, 0, 0, 0, 0});
  EXPECT_THAT(line, testing::HasSubstr(",-340282346638528859811704183484516925440.000000,"
                                       "340282346638528859811704183484516925440.000000,"));
}

TEST(UdAlsDelayLogLine, HasTheWholeSampleAndTheDelay) {
  EXPECT_EQ(udAlsDelayLogLine(kSample, 5.25F),
            "457.500000,562.000000,312.000000,350.000000,242.500000,60.000000,11.000000,1000.000000,"
            "5.250000\n");
}

TEST(UdAlsRecord, IsTwelveFloats) {
  const std::string record = udAlsRecord(luxStep(), 5.25F, kSample);
  ASSERT_THAT(record, SizeIs(48));
  float values[12];
  std::memcpy(values, record.data(), sizeof(values));
  EXPECT_THAT(values,
              testing::ElementsAre(100, 4000, 5.25F, 128, 457.5F, 562, 312, 350, 242.5F, 60, 11, 1000));
}

TEST(UdAlsRecord, TakesTheFirstEightMeansOnly) {
  EXPECT_THAT(udAlsRecord(luxStep(), 5.25F, {1, 2, 3, 4, 5, 6, 7, 8, 9, 10}), SizeIs(48));
}

class UdAlsRecords : public testing::Test {
 protected:
  support::TemporaryFolder folder;
  const std::string path = folder.path() / "vantle_als";
  std::vector<SampleData> records{{7}};
};

TEST_F(UdAlsRecords, AreReadInTheirOrder) {
  ASSERT_TRUE(
      support::writeFile(path, udAlsRecord(luxStep(), 1, kSample) + udAlsRecord(luxStep(), 2, kSample)));
  EXPECT_EQ(readUdAlsRecords(path, &records), FileResult::kOk);
  ASSERT_THAT(records, SizeIs(2));
  EXPECT_EQ(records[0][kUdAlsDelay], 1.0F);
  EXPECT_EQ(records[1][kUdAlsDelay], 2.0F);
  EXPECT_EQ(records[1][kUdAlsReferenceLux], 100.0F);
  EXPECT_EQ(records[1][kUdAlsBrightness], 128.0F);
  EXPECT_EQ(records[1][kUdAlsMeanLux], 457.5F);
  EXPECT_EQ(records[1][kUdAlsMeanIntegrationTime], 1000.0F);
}

TEST_F(UdAlsRecords, BeforeATornOneAreKept) {
  std::string content = udAlsRecord(luxStep(), 1, kSample) + udAlsRecord(luxStep(), 2, kSample);
  ASSERT_TRUE(support::writeFile(path, content + "torn"));  // 100 bytes
  EXPECT_EQ(readUdAlsRecords(path, &records), FileResult::kIncomplete);
  EXPECT_THAT(records, SizeIs(2));
}

TEST_F(UdAlsRecords, OfAnEmptyFileAreNone) {
  ASSERT_TRUE(support::writeFile(path, ""));
  EXPECT_EQ(readUdAlsRecords(path, &records), FileResult::kOk);
  EXPECT_THAT(records, SizeIs(0));
}

TEST_F(UdAlsRecords, ReadBeforeStayWhenTheFileCannotBeOpened) {
  EXPECT_EQ(readUdAlsRecords(path, &records), FileResult::kCannotOpen);
  EXPECT_THAT(records, SizeIs(1));
}

TEST_F(UdAlsRecords, OfAFolderAreNone) {
  EXPECT_EQ(readUdAlsRecords(folder.path(), &records), FileResult::kFailed);
  EXPECT_THAT(records, SizeIs(0));
}

TEST_F(UdAlsRecords, OfAHugeFileAreNotTakenIn) {
  ASSERT_TRUE(support::writeFile(path, std::string(kMaxUdAlsDataFileBytes + 48, 'x')));
  EXPECT_EQ(readUdAlsRecords(path, &records), FileResult::kTooLarge);
}

}  // namespace
