// Items of a registry group in memory: names, versions, vectors and matrices.
#include <cmath>
#include <cstdint>
#include <limits>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "ssc/RegistryUtil.h"

namespace {

using ssc::RegistryUtil;

/// A group: float "f" of version 4, subgroup "bias" of version 7 {float "x" of version 2, float "y" without a
/// version}, float "a.b" (a dot in its own name).
sns_registry_data group() {
  sns_registry_data data;
  sns_registry_data_item* item = data.add_items();
  item->set_name("f");
  item->set_version(4);
  item->set_flt(1.5F);
  item = data.add_items();
  item->set_name("bias");
  item->set_version(7);
  sns_registry_data_item* inner = item->mutable_subgrp()->add_items();
  inner->set_name("x");
  inner->set_version(2);
  inner->set_flt(10.0F);
  inner = item->mutable_subgrp()->add_items();
  inner->set_name("y");
  inner->set_flt(11.0F);
  item = data.add_items();
  item->set_name("a.b");
  item->set_flt(3.0F);
  return data;
}

TEST(RegistryFind, FindsItemsByNameAndByDottedName) {
  sns_registry_data data = group();
  ASSERT_NE(RegistryUtil::FindDataItem("f", &data), nullptr);
  EXPECT_EQ(RegistryUtil::FindDataItem("f", &data)->flt(), 1.5F);
  ASSERT_NE(RegistryUtil::FindDataItem("bias", &data), nullptr);
  EXPECT_TRUE(RegistryUtil::FindDataItem("bias", &data)->has_subgrp());
  ASSERT_NE(RegistryUtil::FindDataItem("bias.y", &data), nullptr);
  EXPECT_EQ(RegistryUtil::FindDataItem("bias.y", &data)->flt(), 11.0F);
  ASSERT_NE(RegistryUtil::FindDataItem("a.b", &data), nullptr);
  EXPECT_EQ(RegistryUtil::FindDataItem("a.b", &data)->flt(), 3.0F);
}

TEST(RegistryFind, FindsNothingElse) {
  sns_registry_data data = group();
  for (const char* name : {"", ".", "F", "x", "bias.", ".bias", "bias.z", "bias.x.x", "f.x", "a", "b",
                           "bias..x", "a.", "nothing.at.all"}) {
    EXPECT_EQ(RegistryUtil::FindDataItem(name, &data), nullptr) << name;
  }
  sns_registry_data empty;
  EXPECT_EQ(RegistryUtil::FindDataItem("f", &empty), nullptr);
}

TEST(RegistryFind, ChangesNothing) {
  const sns_registry_data data = group();
  const std::string before = data.SerializeAsString();
  ASSERT_NE(RegistryUtil::FindDataItem("bias.x", data), nullptr);
  EXPECT_EQ(RegistryUtil::FindDataItem("f.x", data), nullptr);
  EXPECT_EQ(data.SerializeAsString(), before);
}

TEST(RegistryFind, GivesTheFirstOfItemsOfOneName) {
  sns_registry_data data = group();
  data.add_items()->set_name("f");
  EXPECT_EQ(RegistryUtil::FindDataItem("f", &data), data.mutable_items(0));
}

TEST(RegistryIncrement, BumpsTheVersionAndKeepsTheData) {
  sns_registry_data data = group();
  sns_registry_data_item* item = RegistryUtil::GetIncrementedDataItem("f", &data);
  EXPECT_EQ(item, data.mutable_items(0));
  EXPECT_EQ(item->version(), 5);
  EXPECT_EQ(item->flt(), 1.5F);
  EXPECT_EQ(RegistryUtil::GetIncrementedDataItem("f", &data)->version(), 6);
}

TEST(RegistryIncrement, ItemWithoutAVersionGetsOne) {
  sns_registry_data data = group();
  EXPECT_EQ(RegistryUtil::GetIncrementedDataItem("a.b", &data)->version(), 1);
  EXPECT_EQ(RegistryUtil::GetIncrementedDataItem("bias.y", &data)->version(), 1);
}

TEST(RegistryIncrement, DottedNameBumpsTheInnerItemOnly) {
  sns_registry_data data = group();
  EXPECT_EQ(RegistryUtil::GetIncrementedDataItem("bias.x", &data)->version(), 3);
  EXPECT_EQ(RegistryUtil::FindDataItem("bias", &data)->version(), 7);
}

TEST(RegistryIncrement, MissingItemIsAppended) {
  sns_registry_data data = group();
  sns_registry_data_item* item = RegistryUtil::GetIncrementedDataItem("new", &data);
  EXPECT_EQ(item, data.mutable_items(3));
  EXPECT_EQ(item->name(), "new");
  EXPECT_EQ(item->version(), 1);
  EXPECT_EQ(item->data_case(), sns_registry_data_item::DATA_NOT_SET);
}

TEST(RegistryIncrement, MissingDottedItemIsAppendedToItsSubgroups) {
  sns_registry_data data = group();
  EXPECT_EQ(RegistryUtil::GetIncrementedDataItem("bias.z", &data)->version(), 1);
  EXPECT_EQ(data.items(1).subgrp().items_size(), 3);
  EXPECT_EQ(data.items(1).subgrp().items(2).name(), "z");

  EXPECT_EQ(RegistryUtil::GetIncrementedDataItem("p.q.r", &data)->name(), "r");
  ASSERT_EQ(data.items_size(), 4);
  EXPECT_EQ(data.items(3).name(), "p");
  EXPECT_EQ(data.items(3).subgrp().items(0).name(), "q");
  EXPECT_EQ(RegistryUtil::FindDataItem("p.q.r", &data)->version(), 1);
  EXPECT_EQ(RegistryUtil::GetIncrementedDataItem("p.q.r", &data)->version(), 2);
}

TEST(RegistryIncrement, VersionsBelowZeroCountUpAndTheLargestStartsAgain) {
  sns_registry_data data = group();
  data.mutable_items(0)->set_version(-1);
  EXPECT_EQ(RegistryUtil::GetIncrementedDataItem("f", &data)->version(), 0);
  data.mutable_items(0)->set_version(std::numeric_limits<std::int32_t>::min());
  EXPECT_EQ(RegistryUtil::GetIncrementedDataItem("f", &data)->version(),
            std::numeric_limits<std::int32_t>::min() + 1);
  data.mutable_items(0)->set_version(std::numeric_limits<std::int32_t>::max() - 1);
  EXPECT_EQ(RegistryUtil::GetIncrementedDataItem("f", &data)->version(),
            std::numeric_limits<std::int32_t>::max());
  EXPECT_EQ(RegistryUtil::GetIncrementedDataItem("f", &data)->version(), 1);
}

/// "name=value/version" of every item.
std::string listed(const sns_registry_data& subgroup) {
  std::string text;
  for (const auto& item : subgroup.items()) {
    text += item.name() + "=" + std::to_string(item.flt()).substr(0, 4) + "/" +
            (item.has_version() ? std::to_string(item.version()) : "-") + (item.has_flt() ? " " : "? ");
  }
  return text;
}

TEST(RegistryVector, HasOneFloatItemAValue) {
  sns_registry_data subgroup;
  RegistryUtil::CreateRegistryVector({1, 2, 3}, &subgroup);
  EXPECT_EQ(listed(subgroup), "x=1.00/1 y=2.00/1 z=3.00/1 ");
  RegistryUtil::CreateRegistryVector({1, 2}, &subgroup);
  EXPECT_EQ(listed(subgroup), "x=1.00/2 y=2.00/2 ");
  RegistryUtil::CreateRegistryVector({5}, &subgroup);
  EXPECT_EQ(listed(subgroup), "x=5.00/3 ");
  RegistryUtil::CreateRegistryVector({}, &subgroup);
  EXPECT_EQ(listed(subgroup), "");
  RegistryUtil::CreateRegistryVector({1, 2, 3, 4, 5}, &subgroup);
  EXPECT_EQ(listed(subgroup), "x=1.00/1 y=2.00/1 z=3.00/1 ");
}

TEST(RegistryVector, ReplacesWhateverTheSubgroupHeld) {
  sns_registry_data subgroup = group();
  sns_registry_data_item* old = subgroup.add_items();
  old->set_name("y");
  old->set_version(41);
  old->set_str("not a number");
  RegistryUtil::CreateRegistryVector({1, 2}, &subgroup);
  EXPECT_EQ(listed(subgroup), "x=1.00/1 y=2.00/42 ");
}

TEST(RegistryVector, IsReadInTheOrderOfTheItems) {
  sns_registry_data subgroup;
  EXPECT_TRUE(RegistryUtil::GetRegistryVector(subgroup).empty());
  RegistryUtil::CreateRegistryVector({-1.5F, 2.25F, 3e30F}, &subgroup);
  EXPECT_EQ(RegistryUtil::GetRegistryVector(subgroup), (std::vector<float>{-1.5F, 2.25F, 3e30F}));
  subgroup.mutable_items()->SwapElements(0, 2);
  EXPECT_EQ(RegistryUtil::GetRegistryVector(subgroup), (std::vector<float>{3e30F, 2.25F, -1.5F}));
}

TEST(RegistryVector, ItemOfAnotherKindReadsAsZero) {
  sns_registry_data subgroup;
  RegistryUtil::CreateRegistryVector({1, 2, 3}, &subgroup);
  subgroup.mutable_items(1)->set_sint(9);
  EXPECT_EQ(RegistryUtil::GetRegistryVector(subgroup), (std::vector<float>{1, 0, 3}));
}

TEST(RegistryVector, NotANumberSurvives) {
  sns_registry_data subgroup;
  RegistryUtil::CreateRegistryVector({std::numeric_limits<float>::quiet_NaN()}, &subgroup);
  ASSERT_EQ(RegistryUtil::GetRegistryVector(subgroup).size(), 1U);
  EXPECT_TRUE(std::isnan(RegistryUtil::GetRegistryVector(subgroup)[0]));
}

TEST(RegistryMatrix, HasNineItemsInRowOrder) {
  sns_registry_data subgroup;
  RegistryUtil::CreateRegistryMatrix({1, 2, 3, 4, 5, 6, 7, 8, 9}, &subgroup);
  EXPECT_EQ(listed(subgroup),
            "0_0=1.00/1 0_1=2.00/1 0_2=3.00/1 1_0=4.00/1 1_1=5.00/1 1_2=6.00/1 2_0=7.00/1 2_1=8.00/1 "
            "2_2=9.00/1 ");
  EXPECT_EQ(RegistryUtil::GetRegistryMatrix(subgroup, false),
            (std::vector<float>{1, 2, 3, 4, 5, 6, 7, 8, 9}));
  EXPECT_EQ(RegistryUtil::GetRegistryMatrix(subgroup, true), (std::vector<float>{1, 5, 9}));
}

TEST(RegistryMatrix, ThreeValuesAreTheDiagonal) {
  sns_registry_data subgroup;
  RegistryUtil::CreateRegistryMatrix({1, 2, 3, 4, 5, 6, 7, 8, 9}, &subgroup);
  RegistryUtil::CreateRegistryMatrix({7, 8, 9}, &subgroup);
  EXPECT_EQ(RegistryUtil::GetRegistryMatrix(subgroup, false),
            (std::vector<float>{7, 0, 0, 0, 8, 0, 0, 0, 9}));
  for (const auto& item : subgroup.items()) EXPECT_EQ(item.version(), 2);
}

TEST(RegistryMatrix, AnotherNumberOfValuesLeavesTheSubgroupAlone) {
  for (const std::size_t count : {0U, 1U, 2U, 4U, 8U, 10U}) {
    sns_registry_data subgroup = group();
    RegistryUtil::CreateRegistryMatrix(std::vector<float>(count, 1.0F), &subgroup);
    EXPECT_EQ(subgroup.SerializeAsString(), group().SerializeAsString()) << count;
  }
}

TEST(RegistryMatrix, IsReadByNameNotByPlace) {
  sns_registry_data subgroup;
  RegistryUtil::CreateRegistryMatrix({1, 2, 3, 4, 5, 6, 7, 8, 9}, &subgroup);
  subgroup.mutable_items()->SwapElements(0, 8);
  EXPECT_EQ(RegistryUtil::GetRegistryMatrix(subgroup, true), (std::vector<float>{1, 5, 9}));
}

TEST(RegistryMatrix, WithAnItemMissingOrOfAnotherKindReadsAsNothing) {
  sns_registry_data subgroup;
  EXPECT_TRUE(RegistryUtil::GetRegistryMatrix(subgroup, false).empty());
  RegistryUtil::CreateRegistryMatrix({1, 2, 3, 4, 5, 6, 7, 8, 9}, &subgroup);
  subgroup.mutable_items(1)->set_sint(2);
  EXPECT_TRUE(RegistryUtil::GetRegistryMatrix(subgroup, false).empty());
  EXPECT_EQ(RegistryUtil::GetRegistryMatrix(subgroup, true), (std::vector<float>{1, 5, 9}));
  subgroup.mutable_items()->RemoveLast();
  EXPECT_TRUE(RegistryUtil::GetRegistryMatrix(subgroup, true).empty());
}

}  // namespace
