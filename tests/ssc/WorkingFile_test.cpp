#include "ssc/WorkingFile.h"

#include <cerrno>
#include <filesystem>

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include "support/TemporaryFolder.h"

namespace {

namespace fs = std::filesystem;
using ssc::openWorkingFile;
using ssc::removeWorkingFile;
using ssc::WorkingFileUse;

constexpr WorkingFileUse kUses[] = {WorkingFileUse::kRead, WorkingFileUse::kAppend, WorkingFileUse::kReplace};

class WorkingFileTest : public testing::Test {
 protected:
  /// 0, or what errno says after opening `path`.
  static int openError(const std::string& path, WorkingFileUse use) {
    errno = 0;
    return openWorkingFile(path, use).valid() ? 0 : errno;
  }
  static void writeTo(const ssc::Descriptor& file, const std::string& text) {
    ASSERT_EQ(::write(file.get(), text.data(), text.size()), static_cast<ssize_t>(text.size()));
  }
  [[nodiscard]] std::string content(const std::string& name) const {
    return support::readFile(folder.path() / name).value_or("(none)");
  }
  [[nodiscard]] std::string in(const std::string& name) const { return folder.path() / name; }

  support::TemporaryFolder folder;
};

TEST_F(WorkingFileTest, AppendsToWhatIsThereOrMakesTheFile) {
  writeTo(openWorkingFile(in("file"), WorkingFileUse::kAppend), "one ");
  writeTo(openWorkingFile(in("file"), WorkingFileUse::kAppend), "two");
  EXPECT_EQ(content("file"), "one two");
  EXPECT_EQ(fs::status(in("file")).permissions() & fs::perms::others_write, fs::perms::none);
}

TEST_F(WorkingFileTest, ReplacesTheContent) {
  ASSERT_TRUE(support::writeFile(in("file"), "of a calibration before"));
  writeTo(openWorkingFile(in("file"), WorkingFileUse::kReplace), "new");
  EXPECT_EQ(content("file"), "new");
}

TEST_F(WorkingFileTest, ReadsFromTheStartAndMakesNothing) {
  ASSERT_TRUE(support::writeFile(in("file"), "text"));
  std::string text(8, '\0');
  EXPECT_EQ(::read(openWorkingFile(in("file"), WorkingFileUse::kRead).get(), text.data(), text.size()), 4);
  EXPECT_EQ(openError(in("none"), WorkingFileUse::kRead), ENOENT);
  EXPECT_FALSE(fs::exists(in("none")));
}

TEST_F(WorkingFileTest, ClosesWithExec) {
  for (const WorkingFileUse use :
       {WorkingFileUse::kReplace, WorkingFileUse::kAppend, WorkingFileUse::kRead}) {
    const ssc::Descriptor file = openWorkingFile(in("file"), use);
    EXPECT_EQ(::fcntl(file.get(), F_GETFD), FD_CLOEXEC);
  }
}

TEST_F(WorkingFileTest, ALinkInItsPlaceIsNotFollowed) {
  ASSERT_TRUE(support::writeFile(in("victim"), "precious"));
  fs::create_symlink(in("victim"), in("file"));
  for (const WorkingFileUse use : kUses) EXPECT_EQ(openError(in("file"), use), ELOOP);
  EXPECT_EQ(content("victim"), "precious");
}

TEST_F(WorkingFileTest, ALinkToNothingMakesNoFileElsewhere) {
  fs::create_symlink(in("elsewhere"), in("file"));
  EXPECT_EQ(openError(in("file"), WorkingFileUse::kAppend), ELOOP);
  EXPECT_EQ(openError(in("file"), WorkingFileUse::kReplace), ELOOP);
  EXPECT_FALSE(fs::exists(in("elsewhere")));
}

TEST_F(WorkingFileTest, ASecondNameOfAnotherFileIsNotTouched) {
  ASSERT_TRUE(support::writeFile(in("victim"), "precious"));
  fs::create_hard_link(in("victim"), in("file"));
  for (const WorkingFileUse use : kUses) EXPECT_EQ(openError(in("file"), use), EMLINK);
  EXPECT_EQ(content("victim"), "precious");
}

TEST_F(WorkingFileTest, APipeInItsPlaceIsNotWaitedFor) {
  ASSERT_EQ(::mkfifo(in("file").c_str(), 0600), 0);
  EXPECT_EQ(openError(in("file"), WorkingFileUse::kAppend), ENXIO);
  EXPECT_EQ(openError(in("file"), WorkingFileUse::kReplace), ENXIO);
  EXPECT_EQ(openError(in("file"), WorkingFileUse::kRead), 0);
}

TEST_F(WorkingFileTest, RemovesTheFileAndIsContentWhereThereIsNone) {
  ASSERT_TRUE(support::writeFile(in("file"), "text"));
  EXPECT_EQ(removeWorkingFile(in("file")), 0);
  EXPECT_FALSE(fs::exists(in("file")));
  EXPECT_EQ(removeWorkingFile(in("file")), 0);
}

TEST_F(WorkingFileTest, OfALinkTheLinkIsRemoved) {
  ASSERT_TRUE(support::writeFile(in("victim"), "precious"));
  fs::create_symlink(in("victim"), in("file"));
  EXPECT_EQ(removeWorkingFile(in("file")), 0);
  EXPECT_FALSE(fs::is_symlink(in("file")));
  EXPECT_EQ(content("victim"), "precious");
}

TEST_F(WorkingFileTest, WhatCannotBeRemovedIsSaid) {
  fs::create_directory(in("file"));
  EXPECT_EQ(removeWorkingFile(in("file")), -EISDIR);
  ASSERT_TRUE(support::writeFile(in("plain"), ""));
  EXPECT_EQ(removeWorkingFile(in("plain/file")), -ENOTDIR);
}

}  // namespace
