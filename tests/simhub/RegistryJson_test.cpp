#include "simhub/RegistryJson.h"

#include <bit>
#include <cstdint>
#include <limits>
#include <random>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "simhub/HubHarness.h"

namespace {

using simhub::formatRegistryGroup;
using simhub::parseRegistryGroup;
using testing::HasSubstr;

sns_registry_data roundTrip(const sns_registry_data& items) {
  sns_registry_data back;
  std::string error;
  EXPECT_TRUE(parseRegistryGroup(formatRegistryGroup(items), &back, &error)) << error;
  return back;
}

std::string errorOf(const std::string& text) {
  sns_registry_data items;
  std::string error;
  EXPECT_FALSE(parseRegistryGroup(text, &items, &error)) << text;
  EXPECT_FALSE(error.empty());
  return error;
}

std::string item(const std::string& members) { return "{\"items\": [{" + members + "}]}"; }

TEST(RegistryJson, FileLooksAsDocumented) {
  sns_registry_data items;
  addGroup(&items, "bias")->set_version(2);
  addFloat(&items, "mean_temp", 27.5F)->set_version(2);
  sns_registry_data_item* const text = items.add_items();
  text->set_name("axes");
  text->set_str(std::string("+x+y+z\0", 7));
  EXPECT_EQ(formatRegistryGroup(items),
            "{\n"
            "  \"items\": [\n"
            "    {\"name\": \"bias\", \"version\": 2, \"group\": true},\n"
            "    {\"name\": \"mean_temp\", \"version\": 2, \"float\": 27.5},\n"
            "    {\"name\": \"axes\", \"string\": \"+x+y+z\\u0000\"}\n"
            "  ]\n"
            "}\n");
}

TEST(RegistryJson, FloatsKeepEveryBit) {
  std::mt19937 engine(1);
  std::vector<std::uint32_t> patterns = {0x00000000, 0x80000000, 0x00000001, 0x807fffff, 0x00800000,
                                         0x7f7fffff, 0xff7fffff, 0x7f800000, 0xff800000, 0x7fc00000,
                                         0xffc00000, 0x7fc12345, 0x7f800001, 0x3dcccccd, 0x4b800000};
  for (int i = 0; i < 20'000; ++i) patterns.push_back(static_cast<std::uint32_t>(engine()));
  sns_registry_data items;
  for (std::size_t i = 0; i < patterns.size(); ++i) {
    addFloat(&items, std::to_string(i), std::bit_cast<float>(patterns[i]));
    if (items.items_size() < 1000 && i + 1 < patterns.size()) continue;
    const sns_registry_data back = roundTrip(items);
    ASSERT_EQ(back.items_size(), items.items_size());
    for (int k = 0; k < items.items_size(); ++k) {
      ASSERT_EQ(std::bit_cast<std::uint32_t>(back.items(k).flt()),
                std::bit_cast<std::uint32_t>(items.items(k).flt()))
          << formatRegistryGroup(items).substr(0, 200);
    }
    items.Clear();
  }
}

TEST(RegistryJson, IntegersKeepTheirWholeRange) {
  sns_registry_data items;
  for (const std::int64_t value : {std::numeric_limits<std::int64_t>::min(), std::int64_t{-1},
                                   std::int64_t{0}, std::numeric_limits<std::int64_t>::max()}) {
    sns_registry_data_item* const added = items.add_items();
    added->set_name(std::to_string(value));
    added->set_sint(value);
    added->set_version(std::numeric_limits<std::int32_t>::min());
  }
  EXPECT_EQ(roundTrip(items).SerializeAsString(), items.SerializeAsString());
}

TEST(RegistryJson, TextKeepsEveryByte) {
  std::string everyByte;
  for (int c = 0; c < 256; ++c) everyByte += static_cast<char>(c);
  sns_registry_data items;
  for (const std::string& text : {everyByte, std::string("a\0b\0", 4), std::string("Größe"), std::string()}) {
    sns_registry_data_item* const added = items.add_items();
    added->set_name("n" + text);
    added->set_str(text);
  }
  EXPECT_EQ(roundTrip(items).SerializeAsString(), items.SerializeAsString());
}

TEST(RegistryJson, ItemWithoutDataStaysOne) {
  sns_registry_data items;
  items.add_items()->set_name("unset");
  EXPECT_EQ(roundTrip(items).SerializeAsString(), items.SerializeAsString());
}

TEST(RegistryJson, SubgroupsAreWrittenWithoutTheirItems) {
  sns_registry_data items;
  addFloat(addGroup(&items, "bias")->mutable_subgrp(), "x", 1);
  EXPECT_EQ(roundTrip(items).items(0).data_case(), sns_registry_data_item::kSubgrp);
  EXPECT_EQ(roundTrip(items).items(0).subgrp().items_size(), 0);
}

TEST(RegistryJson, WhatIsNoGroupIsRefused) {
  for (const char* const text :
       {"", "{", "[]", "{}", "null", "{\"items\": 3}", "{\"items\": [], \"more\": 1}", "{\"items\": [1]}",
        "{\"items\": []} trailing", "\xff\xfe"}) {
    (void)errorOf(text);
  }
}

TEST(RegistryJson, ItemsThatMakeNoSenseAreRefused) {
  EXPECT_THAT(errorOf(item("\"float\": 1.0")), HasSubstr("no name"));
  EXPECT_THAT(errorOf(item("\"name\": \"a\", \"flaot\": 1.0")), HasSubstr("flaot"));
  EXPECT_THAT(errorOf(item("\"name\": \"a\", \"float\": 1.0, \"int\": 1")), HasSubstr("int"));
  EXPECT_THAT(errorOf(item("\"name\": \"a\", \"float\": 1e39")), HasSubstr("float"));
  EXPECT_THAT(errorOf(item("\"name\": \"a\", \"float\": \"nan:7f800000\"")), HasSubstr("float"));
  EXPECT_THAT(errorOf(item("\"name\": \"a\", \"int\": 1.5")), HasSubstr("int"));
  EXPECT_THAT(errorOf(item("\"name\": \"a\", \"int\": 9223372036854775808")), HasSubstr("int"));
  EXPECT_THAT(errorOf(item("\"name\": \"a\", \"version\": 2147483648")), HasSubstr("version"));
  EXPECT_THAT(errorOf(item("\"name\": \"a\", \"version\": -2147483649")), HasSubstr("version"));
  EXPECT_THAT(errorOf(item("\"name\": \"a\", \"version\": 18446744073709551615")), HasSubstr("version"));
  EXPECT_THAT(errorOf(item("\"name\": \"a\", \"version\": 18446744071562067968")), HasSubstr("version"));
  EXPECT_THAT(errorOf(item("\"name\": \"a\", \"version\": 1.0")), HasSubstr("version"));
  EXPECT_THAT(errorOf(item("\"name\": \"a\", \"string_hex\": \"0g\"")), HasSubstr("string_hex"));
  EXPECT_THAT(errorOf("{\"items\": [{\"name\": \"a\"}, {\"name\": \"a\"}]}"), HasSubstr("twice"));
}

TEST(RegistryJson, DeepNestingIsRefusedUnread) {
  EXPECT_THAT(errorOf(std::string(500'000, '[')), HasSubstr("nested"));
  EXPECT_THAT(errorOf(std::string(100'000, '{') + "\"a\":"), HasSubstr("nested"));
}

TEST(RegistryJson, BracketsInTextAreNoNesting) {
  sns_registry_data items;
  sns_registry_data_item* const added = items.add_items();
  added->set_name(std::string(50, '[') + "\"\\{");
  added->set_str(std::string(50, '{'));
  EXPECT_EQ(roundTrip(items).SerializeAsString(), items.SerializeAsString());
}

TEST(RegistryJson, HugeFileIsRefusedUnread) {
  EXPECT_THAT(errorOf(std::string(simhub::kMaxRegistryFileBytes + 1, ' ')), HasSubstr("larger"));
}

}  // namespace
