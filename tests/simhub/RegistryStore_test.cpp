#include "simhub/RegistryStore.h"

#include <cerrno>
#include <chrono>
#include <filesystem>
#include <memory>
#include <thread>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "simhub/HubHarness.h"
#include "simhub/RegistryJson.h"
#include "support/DescriptorLimit.h"

namespace {

using simhub::RegistryStore;
using testing::AnyOf;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

constexpr const char* kGroup = "chip_0_platform.pressure.fac_cal";
constexpr const char* kSubgroup = "chip_0_platform.pressure.fac_cal.bias";

/// Files that fail, or stop for good as in a crash, at the n-th change. A write that stops leaves half of its
/// bytes.
class FailingFiles final : public simhub::RegistryFiles {
 public:
  using RegistryFiles::RegistryFiles;
  enum class Way { kFails, kCrashes };

  void FailAt(int step, Way way) {
    failAt = step;
    way_ = way;
    steps = 0;
  }

  int Write(const std::string& name, const std::string& content) override {
    if (!mayGoOn()) {
      if (!crashed || steps == failAt)
        (void)RegistryFiles::Write(name, content.substr(0, content.size() / 2));
      return ENOSPC;
    }
    return RegistryFiles::Write(name, content);
  }
  int Rename(const std::string& from, const std::string& to) override {
    return mayGoOn() ? RegistryFiles::Rename(from, to) : EIO;
  }
  int Remove(const std::string& name) override { return mayGoOn() ? RegistryFiles::Remove(name) : EIO; }
  int SyncFolder() override { return mayGoOn() ? RegistryFiles::SyncFolder() : EIO; }

  int steps = 0;
  int failAt = -1;
  bool crashed = false;

 private:
  bool mayGoOn() {
    ++steps;
    if (steps == failAt && way_ == Way::kCrashes) crashed = true;
    return !crashed && steps != failAt;
  }
  Way way_ = Way::kFails;
};

std::vector<std::string> namesIn(const simhub::RegistryFiles& files) {
  std::vector<std::string> names;
  EXPECT_EQ(files.List(&names), 0);
  return names;
}

class RegistryStoreTest : public testing::Test {
 protected:
  RegistryStoreTest() {
    sns_registry_data& group = defaults[kGroup];
    addFloat(addGroup(&group, "bias")->mutable_subgrp(), "x", 0);
    addFloat(&group, "mean_temp", 0);
  }

  std::unique_ptr<RegistryStore> open(const std::vector<std::string>& torn = {}) {
    auto store = std::make_unique<RegistryStore>(
        files, defaults, [this](const std::string& text) { diagnostics.push_back(text); });
    store->Load(torn);
    return store;
  }

  static std::string read(const RegistryStore& store, const std::string& group = kGroup) {
    sns_registry_data items;
    switch (store.Read(group, &items)) {
      case RegistryStore::Result::kOk:
        return show(items);
      case RegistryStore::Result::kMissing:
        return "missing";
      case RegistryStore::Result::kInvalid:
        break;
    }
    return "invalid";
  }

  static sns_registry_data calibration(float bias, float temperature) {
    sns_registry_data items;
    sns_registry_data_item* const group = addGroup(&items, "bias");
    group->set_version(1);
    addFloat(group->mutable_subgrp(), "x", bias)->set_version(1);
    addFloat(&items, "mean_temp", temperature)->set_version(1);
    return items;
  }

  TemporaryFolder folder;
  FailingFiles files{folder.Path("registry/")};
  RegistryStore::Defaults defaults;
  std::vector<std::string> diagnostics;
};

TEST_F(RegistryStoreTest, MissingFileIsTheDefault) {
  const auto store = open();
  EXPECT_EQ(read(*store), "bias={x=0}, mean_temp=0");
  EXPECT_EQ(read(*store, kSubgroup), "x=0");
  EXPECT_EQ(read(*store, "nothing"), "missing");
  EXPECT_FALSE(folder.Exists(std::string("registry/") + kGroup));
  EXPECT_THAT(diagnostics, IsEmpty());
}

TEST_F(RegistryStoreTest, WriteSurvivesARestart) {
  ASSERT_TRUE(open()->Write(kGroup, calibration(2.75F, 27.5F)));
  EXPECT_EQ(read(*open()), "bias#1={x#1=2.75}, mean_temp#1=27.5");
  EXPECT_EQ(folder.ReadFile(std::string("registry/") + kSubgroup),
            "{\n  \"items\": [\n    {\"name\": \"x\", \"version\": 1, \"float\": 2.75}\n  ]\n}\n");
}

TEST_F(RegistryStoreTest, WriteMerges) {
  const auto store = open();
  sns_registry_data items;
  addFloat(&items, "mean_temp", 30)->set_version(7);
  addFloat(&items, "extra", 1);
  ASSERT_TRUE(store->Write(kGroup, items));
  EXPECT_EQ(read(*store), "bias={x=0}, mean_temp#7=30, extra=1");
}

TEST_F(RegistryStoreTest, WriteOfASubgroupShowsInItsGroup) {
  const auto store = open();
  sns_registry_data items;
  addFloat(&items, "x", 5);
  addFloat(&items, "y", 6);
  ASSERT_TRUE(store->Write(kSubgroup, items));
  EXPECT_EQ(read(*store), "bias={x=5, y=6}, mean_temp=0");
  EXPECT_FALSE(folder.Exists(std::string("registry/") + kGroup));
  EXPECT_TRUE(folder.Exists(std::string("registry/") + kSubgroup));
}

TEST_F(RegistryStoreTest, WriteChangesAnItemsKind) {
  const auto store = open();
  sns_registry_data items;
  addFloat(&items, "bias", 5);
  ASSERT_TRUE(store->Write(kGroup, items));
  EXPECT_EQ(read(*store), "bias=5, mean_temp=0");
}

TEST_F(RegistryStoreTest, GroupsNestDeeply) {
  sns_registry_data items;
  addFloat(addGroup(addGroup(&items, "a")->mutable_subgrp(), "b")->mutable_subgrp(), "c", 1);
  ASSERT_TRUE(open()->Write("top", items));
  const auto store = open();
  EXPECT_EQ(read(*store, "top"), "a={b={c=1}}");
  EXPECT_EQ(read(*store, "top.a"), "b={c=1}");
  EXPECT_EQ(read(*store, "top.a.b"), "c=1");
}

TEST_F(RegistryStoreTest, DeletedFileIsReadUntilTheRestart) {
  const auto store = open();
  ASSERT_TRUE(store->Write(kGroup, calibration(2.75F, 27.5F)));
  std::filesystem::remove(files.Path(kSubgroup));
  EXPECT_EQ(read(*store), "bias#1={x#1=2.75}, mean_temp#1=27.5");
  EXPECT_EQ(read(*open()), "bias#1={x=0}, mean_temp#1=27.5");
}

TEST_F(RegistryStoreTest, FileThatIsNoGroupCanBeNeitherReadNorWritten) {
  folder.WriteFile(std::string("registry/") + kGroup, "{\"items\": [{\"name\"");
  const auto store = open();
  ASSERT_THAT(diagnostics, ElementsAre(AllOf(HasSubstr(kGroup), HasSubstr("parse error"))));
  EXPECT_EQ(read(*store), "invalid");
  EXPECT_EQ(read(*store, kSubgroup), "x=0");
  EXPECT_FALSE(store->Write(kGroup, calibration(1, 1)));
  EXPECT_EQ(folder.ReadFile(std::string("registry/") + kGroup), "{\"items\": [{\"name\"");
  EXPECT_EQ(read(*store, kSubgroup), "x=0") << "the other half of the refused write";
}

TEST_F(RegistryStoreTest, BadSubgroupMakesItsGroupUnreadable) {
  folder.WriteFile(std::string("registry/") + kSubgroup, "[]");
  const auto store = open();
  EXPECT_EQ(read(*store), "invalid");
  EXPECT_FALSE(store->Write(kGroup, calibration(1, 1)));
}

TEST_F(RegistryStoreTest, FolderInTheFilesPlaceIsReported) {
  std::filesystem::create_directories(files.Path(kGroup));
  EXPECT_EQ(read(*open()), "invalid");
  EXPECT_THAT(diagnostics, ElementsAre(HasSubstr(kGroup)));
}

TEST_F(RegistryStoreTest, TornFileIsTakenAsHalf) {
  ASSERT_TRUE(open()->Write(kGroup, calibration(2.75F, 27.5F)));
  EXPECT_EQ(read(*open({kGroup})), "invalid");
  EXPECT_EQ(read(*open({kSubgroup}), kSubgroup), "invalid");
  EXPECT_EQ(read(*open({"other"})), "bias#1={x#1=2.75}, mean_temp#1=27.5");
}

TEST_F(RegistryStoreTest, NamesThatCannotBeFilesAreRefused) {
  const auto store = open();
  sns_registry_data items;
  addFloat(&items, "x", 1);
  for (const std::string& name : {std::string("../evil"), std::string("a/b"), std::string(".hidden"),
                                  std::string(), std::string("a\0b", 3), std::string(300, 'a')}) {
    EXPECT_FALSE(store->Write(name, items)) << name;
  }
  for (const std::string& name :
       {std::string("a/b"), std::string("a.b"), std::string(), std::string("\0", 1)}) {
    sns_registry_data nested;
    addFloat(addGroup(&nested, name)->mutable_subgrp(), "x", 1);
    EXPECT_FALSE(store->Write("group", nested)) << name;
  }
  EXPECT_THAT(namesIn(files), IsEmpty());
}

TEST_F(RegistryStoreTest, TooDeepNestingIsRefused) {
  sns_registry_data items;
  sns_registry_data* level = &items;
  for (int i = 0; i < 40; ++i) level = addGroup(level, "s")->mutable_subgrp();
  EXPECT_FALSE(open()->Write("g", items));
  EXPECT_THAT(namesIn(files), IsEmpty());
}

TEST_F(RegistryStoreTest, FullDiskIsReportedAndChangesNothing) {
  const auto store = open();
  files.LimitFreeBytes(40);
  EXPECT_FALSE(store->Write(kGroup, calibration(1, 2)));
  EXPECT_THAT(diagnostics, ElementsAre(HasSubstr("No space left")));
  EXPECT_EQ(read(*store), "bias={x=0}, mean_temp=0");
  EXPECT_THAT(namesIn(files), IsEmpty());
  files.LimitFreeBytes(std::nullopt);
  EXPECT_TRUE(store->Write(kGroup, calibration(1, 2)));
}

TEST_F(RegistryStoreTest, CrashAtEveryStepLeavesAllOrNothing) {
  const std::string before = "bias#1={x#1=1}, mean_temp#1=10";
  const std::string after = "bias#1={x#1=2}, mean_temp#1=20";
  int completed = 0;
  int step = 1;
  for (;; ++step) {
    ASSERT_LT(step, 100);
    ASSERT_TRUE(open()->Write(kGroup, calibration(1, 10)));
    const auto store = open();
    files.FailAt(step, FailingFiles::Way::kCrashes);
    const bool reported = store->Write(kGroup, calibration(2, 20));
    const bool crashed = files.crashed;
    files.crashed = false;
    files.failAt = -1;
    const std::string found = read(*open());
    EXPECT_THAT(found, AnyOf(before, after)) << "step " << step;
    if (reported) {
      EXPECT_EQ(found, after) << "step " << step;
    }
    completed += found == after ? 1 : 0;
    EXPECT_THAT(namesIn(files), ElementsAre(kGroup, kSubgroup)) << "step " << step;
    if (!crashed) break;
  }
  EXPECT_GT(step, 8);       // two files, the journal, three renames, two syncs, a removal
  EXPECT_GT(completed, 2);  // crashes after the commit complete
}

TEST_F(RegistryStoreTest, FailureAtEveryStepIsAllOrNothingAndReportedTruly) {
  for (int step = 1;; ++step) {
    ASSERT_LT(step, 100);
    ASSERT_TRUE(open()->Write(kGroup, calibration(1, 10)));
    const auto store = open();
    files.FailAt(step, FailingFiles::Way::kFails);
    const bool reported = store->Write(kGroup, calibration(2, 20));
    const bool failed = files.steps >= step;
    files.failAt = -1;
    const std::string wanted = reported ? "bias#1={x#1=2}, mean_temp#1=20" : "bias#1={x#1=1}, mean_temp#1=10";
    EXPECT_EQ(read(*store), wanted) << "step " << step;
    EXPECT_EQ(read(*open()), wanted) << "step " << step;
    if (!failed) break;
  }
}

TEST_F(RegistryStoreTest, WriteAfterAnUncompletedOneCompletesItFirst) {
  const auto store = open();
  files.FailAt(7, FailingFiles::Way::kFails);  // a rename after the commit
  ASSERT_TRUE(store->Write(kGroup, calibration(1, 10)));
  files.failAt = -1;
  ASSERT_THAT(namesIn(files), testing::Contains(".journal"));
  sns_registry_data items;
  addFloat(&items, "mean_temp", 30);
  ASSERT_TRUE(store->Write(kGroup, items));
  EXPECT_EQ(read(*store), "bias#1={x#1=1}, mean_temp=30");
  EXPECT_EQ(read(*open()), "bias#1={x#1=1}, mean_temp=30");
  EXPECT_THAT(namesIn(files), ElementsAre(kGroup, kSubgroup));
}

TEST_F(RegistryStoreTest, JournalCutAnywhereIsDroppedWhole) {
  ASSERT_TRUE(open()->Write(kGroup, calibration(1, 10)));
  const auto store = open();
  files.FailAt(6, FailingFiles::Way::kCrashes);  // right after the commit
  ASSERT_TRUE(store->Write(kGroup, calibration(2, 20)));
  files.crashed = false;
  files.failAt = -1;
  const std::string journal = folder.ReadFile("registry/.journal");
  ASSERT_FALSE(journal.empty());
  for (std::size_t size = 0; size < journal.size(); size += 7) {
    TemporaryFolder copy;
    std::filesystem::copy(folder.Path("registry"), copy.Path("registry"));
    copy.WriteFile("registry/.journal", journal.substr(0, size));
    simhub::RegistryFiles cut(copy.Path("registry"));
    RegistryStore reopened(cut, defaults, [](const std::string&) {});
    reopened.Load();
    EXPECT_EQ(read(reopened), "bias#1={x#1=1}, mean_temp#1=10") << size;
    EXPECT_THAT(namesIn(cut), ElementsAre(kGroup, kSubgroup)) << size;
  }
}

// ---- Two hubs on one folder ----

TEST_F(RegistryStoreTest, WriteDuringAnotherHubsTurnWaitsForItsEnd) {
  const auto store = open();
  auto turn = std::make_unique<simhub::Descriptor>();
  ASSERT_EQ(simhub::RegistryFiles(folder.Path("registry")).Lock(turn.get()), 0);
  bool reported = false;
  std::thread writer([&] { reported = store->Write(kGroup, calibration(1, 10)); });
  turn.reset();
  writer.join();
  EXPECT_TRUE(reported);
  EXPECT_EQ(read(*open()), "bias#1={x#1=1}, mean_temp#1=10");
}

TEST_F(RegistryStoreTest, TurnThatDoesNotEndMakesAWriteFailAndChangesNothing) {
  simhub::RegistryFiles impatient(folder.Path("registry"), std::chrono::milliseconds(0));
  RegistryStore store(impatient, defaults, [this](const std::string& text) { diagnostics.push_back(text); });
  store.Load();
  {
    simhub::Descriptor turn;
    ASSERT_EQ(files.Lock(&turn), 0);
    EXPECT_FALSE(store.Write(kGroup, calibration(1, 10)));
    EXPECT_THAT(diagnostics, ElementsAre(HasSubstr("another hub")));
    EXPECT_EQ(read(store), "bias={x=0}, mean_temp=0");
    EXPECT_THAT(namesIn(files), IsEmpty());
  }
  EXPECT_TRUE(store.Write(kGroup, calibration(1, 10)));
}

TEST_F(RegistryStoreTest, LoadingLeavesWhatAnotherHubHasUnderWay) {
  simhub::RegistryFiles impatient(folder.Path("registry"), std::chrono::milliseconds(0));
  folder.WriteFile("registry/.group.new", "half of");
  folder.WriteFile("registry/.journal", "half of");
  RegistryStore store(impatient, defaults, [this](const std::string& text) { diagnostics.push_back(text); });
  {
    simhub::Descriptor turn;
    ASSERT_EQ(files.Lock(&turn), 0);
    store.Load();
    EXPECT_THAT(diagnostics, ElementsAre(HasSubstr("another hub")));
    EXPECT_EQ(read(store), "bias={x=0}, mean_temp=0");
    EXPECT_THAT(namesIn(files), ElementsAre(".group.new", ".journal"));
  }
  store.Load();
  EXPECT_THAT(namesIn(files), IsEmpty());
}

TEST_F(RegistryStoreTest, FolderThatCannotBeListedIsNoRegistryOfDefaults) {
  ASSERT_TRUE(open()->Write(kGroup, calibration(2.75F, 27.5F)));
  std::unique_ptr<RegistryStore> store;
  {
    const support::DescriptorLimit none(0);
    store = open();
  }
  EXPECT_THAT(diagnostics, testing::Contains(HasSubstr("the folder cannot be read: Too many open files")));
  EXPECT_EQ(read(*store), "invalid");
  EXPECT_FALSE(store->Write(kGroup, calibration(1, 1)));
  EXPECT_EQ(read(*open()), "bias#1={x#1=2.75}, mean_temp#1=27.5");
}

}  // namespace
