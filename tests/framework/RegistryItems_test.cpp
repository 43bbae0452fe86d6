#include "framework/RegistryItems.h"

#include <cstdlib>

#include <gtest/gtest.h>

#include "support/Capture.h"
#include "support/ScriptedHub.h"

namespace {

constexpr int kInvalid = -22;

const sns_registry_data_item& itemAt(const sns_registry_data& data, int index) { return data.items(index); }

TEST(RequireItem, PassesWhenTheItemIsThereOfWhateverKind) {
  sns_registry_data data;
  data.add_items()->set_name("bias");
  EXPECT_EQ(requireItem("bias", data), 0);
}

TEST(RequireItem, NamesWhatIsMissing) {
  const Captured captured = capture([] { return requireItem("bias", sns_registry_data()); });
  EXPECT_EQ(captured.result, kInvalid);
  EXPECT_EQ(captured.err, "ERROR: Invalid registry; missing \"bias\"\n");
}

TEST(RequireItem, NamesWhoseItemIsMissing) {
  const Captured captured = capture([] { return requireItem("corr_mat", sns_registry_data(), "accel"); });
  EXPECT_EQ(captured.err, "ERROR: Invalid registry; missing accel \"corr_mat\"\n");
}

TEST(NumberItems, ReadTheirOwnKindOnly) {
  sns_registry_data data;
  addFloatItem(&data, "scale", 2.5F, 1);
  setIntItem("version", 4, &data);
  EXPECT_EQ(floatItem("scale", data), 2.5F);
  EXPECT_EQ(intItem("version", data), 4);
  EXPECT_EQ(floatItem("version", data), 0.0F);
  EXPECT_EQ(intItem("scale", data), 0);
  EXPECT_EQ(floatItem("absent", data), 0.0F);
  EXPECT_EQ(intItem("absent", data), 0);
}

TEST(VectorItem, GivesItsFirstNumbers) {
  sns_registry_data data;
  addVectorItem(&data, "bias", {1, 2, 3}, 1);
  std::vector<float> values{9, 9};
  EXPECT_EQ(readVectorItem("bias", 1, data, &values), 0);
  EXPECT_EQ(values, std::vector<float>({1}));
  EXPECT_EQ(readVectorItem("bias", 3, data, &values), 0);
  EXPECT_EQ(values, std::vector<float>({1, 2, 3}));
}

TEST(VectorItem, OfAnotherKindOrWithTooFewNumbersIsInvalid) {
  sns_registry_data data;
  addFloatItem(&data, "scalar", 1, 1);
  addVectorItem(&data, "short", {1, 2}, 1);
  addVectorItem(&data, "words", {1}, 1);
  data.mutable_items(2)->mutable_subgrp()->mutable_items(0)->set_str("one");
  data.add_items()->set_name("empty");
  std::vector<float> values;
  for (const char* name : {"scalar", "short", "words", "empty"}) {
    const Captured captured = capture([&] { return readVectorItem(name, 3, data, &values); });
    EXPECT_EQ(captured.result, kInvalid) << name;
    EXPECT_EQ(captured.err,
              "ERROR: Invalid registry; \"" + std::string(name) + "\" does not hold a vector of 3\n");
  }
}

TEST(VectorItem, ThatIsMissingIsNamed) {
  std::vector<float> values;
  const Captured captured = capture([&] { return readVectorItem("bias", 1, sns_registry_data(), &values); });
  EXPECT_EQ(captured.result, kInvalid);
  EXPECT_EQ(captured.err, "ERROR: Invalid registry; missing \"bias\"\n");
}

TEST(MatrixItem, IsWrittenAndReadInRowOrder) {
  sns_registry_data data;
  setMatrixItem("corr_mat", {1, 2, 3, 4, 5, 6, 7, 8, 9}, &data);
  std::vector<float> values;
  EXPECT_EQ(readMatrixItem("corr_mat", data, &values), 0);
  EXPECT_EQ(values, std::vector<float>({1, 2, 3, 4, 5, 6, 7, 8, 9}));
}

TEST(MatrixItem, WithSevenEntriesIsInvalid) {
  sns_registry_data data;
  setMatrixItem("corr_mat", {1, 2, 3, 4, 5, 6, 7, 8, 9}, &data);
  data.mutable_items(0)->mutable_subgrp()->mutable_items()->DeleteSubrange(7, 2);
  std::vector<float> values;
  const Captured captured = capture([&] { return readMatrixItem("corr_mat", data, &values); });
  EXPECT_EQ(captured.result, kInvalid);
  EXPECT_EQ(captured.err, "ERROR: Invalid registry; \"corr_mat\" does not hold a 3x3 matrix\n");
}

TEST(MatrixItem, GivesItsDiagonal) {
  sns_registry_data data;
  setMatrixItem("corr_mat", {1, 2, 3, 4, 5, 6, 7, 8, 9}, &data);
  std::vector<float> values;
  EXPECT_EQ(readDiagonalItem("corr_mat", data, &values), 0);
  EXPECT_EQ(values, std::vector<float>({1, 5, 9}));
  data.mutable_items(0)->mutable_subgrp()->mutable_items()->DeleteSubrange(4, 1);
  const Captured captured = capture([&] { return readDiagonalItem("corr_mat", data, &values); });
  EXPECT_EQ(captured.result, kInvalid);
  EXPECT_EQ(captured.err, "ERROR: Invalid registry; \"corr_mat\" does not hold a 3x3 matrix\n");
}

TEST(WritingAnItem, RaisesItsVersion) {
  sns_registry_data data;
  addFloatItem(&data, "scale", 1, 6);
  addFloatItem(&data, "unversioned", 1, std::nullopt);
  setFloatItem("scale", 2, &data);
  setFloatItem("unversioned", 2, &data);
  EXPECT_EQ(itemAt(data, 0).version(), 7);
  EXPECT_EQ(itemAt(data, 0).flt(), 2.0F);
  EXPECT_EQ(itemAt(data, 1).version(), 1);
}

TEST(WritingAnItem, MakesOneThatIsMissing) {
  sns_registry_data data;
  setStringItem("orient", std::string_view("+x\0", 3), &data);
  ASSERT_EQ(data.items_size(), 1);
  EXPECT_EQ(itemAt(data, 0).name(), "orient");
  EXPECT_EQ(itemAt(data, 0).str(), std::string("+x\0", 3));
  EXPECT_EQ(itemAt(data, 0).version(), 1);
}

TEST(WritingAnItem, ClearsAnotherKind) {
  sns_registry_data data;
  addVectorItem(&data, "mean_temp", {1, 2, 3}, 2);
  setFloatItem("mean_temp", 25, &data);
  EXPECT_TRUE(itemAt(data, 0).has_flt());
  EXPECT_FALSE(itemAt(data, 0).has_subgrp());
  setIntItem("mean_temp", 3, &data);
  EXPECT_FALSE(itemAt(data, 0).has_flt());
  EXPECT_EQ(itemAt(data, 0).sint(), 3);
  setVectorItem("mean_temp", {5}, &data);
  EXPECT_FALSE(itemAt(data, 0).has_sint());
  EXPECT_EQ(itemAt(data, 0).subgrp().items_size(), 1);
  EXPECT_EQ(itemAt(data, 0).version(), 5);
}

TEST(WritingAVector, RaisesTheVersionsOfTheItemAndOfItsNumbers) {
  sns_registry_data data;
  addVectorItem(&data, "bias", {1, 2, 3}, 4);
  data.mutable_items(0)->mutable_subgrp()->mutable_items(1)->set_version(9);
  setVectorItem("bias", {10, 20, 30}, &data);
  const sns_registry_data_item& bias = itemAt(data, 0);
  EXPECT_EQ(bias.version(), 5);
  ASSERT_EQ(bias.subgrp().items_size(), 3);
  EXPECT_EQ(bias.subgrp().items(0).version(), 5);
  EXPECT_EQ(bias.subgrp().items(1).version(), 10);
  EXPECT_EQ(bias.subgrp().items(2).flt(), 30.0F);
}

class RegistryFilePath : public testing::Test {
 protected:
  void SetUp() override { setenv("VANTLE_ROOT", "/somewhere", 1); }
  void TearDown() override { unsetenv("VANTLE_ROOT"); }
};

TEST_F(RegistryFilePath, IsInTheRegistrysFolder) {
  std::string path;
  EXPECT_EQ(registryFilePath("chipa_0_platform.orient", &path), 0);
  EXPECT_EQ(path, "/somewhere/mnt/vendor/persist/sensors/registry/registry/chipa_0_platform.orient");
}

TEST_F(RegistryFilePath, NeverLeadsOutOfIt) {
  for (const std::string& group : {std::string("../x"), std::string("a/b"), std::string(".hidden"),
                                   std::string(), std::string("a\0b", 3)}) {
    std::string path = "untouched";
    const Captured captured = capture([&] { return registryFilePath(group, &path); });
    EXPECT_EQ(captured.result, kInvalid);
    EXPECT_EQ(path, "untouched");
    EXPECT_NE(captured.err.find("Invalid registry group name"), std::string::npos);
  }
}

}  // namespace
