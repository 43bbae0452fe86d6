#include "simhub/RequestLog.h"

#include <gtest/gtest.h>

#include "simhub/HubHarness.h"

namespace {

constexpr const char* kGroup = "barochip_0_platform.pressure.fac_cal";

TEST(RequestLog, HasOneReadableLineForEachRequest) {
  TemporaryFolder folder;
  HubHarness hub({"hub.request_log=" + folder.Path("log")});
  const simhub::Suid suid = hub.Find("pressure");
  sns_std_attr_req updates;
  updates.set_register_updates(true);
  EXPECT_TRUE(hub.Send(suid, simhub::kAttributesRequest));
  EXPECT_TRUE(hub.Send(suid, simhub::kAttributesRequest, updates.SerializeAsString()));
  hub.Configure(suid, 20);
  hub.Configure(suid, 0.1F, 500'000);
  EXPECT_TRUE(hub.Send(suid, simhub::kOnChangeConfigRequest));
  EXPECT_TRUE(hub.Send(suid, simhub::kDisableRequest));
  EXPECT_TRUE(hub.Send(suid, simhub::kTestRequest, std::string("\x08\x02", 2)));
  EXPECT_TRUE(hub.Send(suid, 7800, "\x01\xff"));
  EXPECT_TRUE(hub.Send({1, 2}, 1));
  EXPECT_EQ(folder.ReadFile("log"),
            "0.000000 suid 512 data_type=\"pressure\"\n"
            "0.000500 pressure 1 attributes\n"
            "0.000500 pressure 1 register_updates=1\n"
            "0.000500 pressure 513 rate=20 batch_us=0\n"
            "0.000500 pressure 513 rate=0.100000001 batch_us=500000\n"
            "0.000500 pressure 514 -\n"
            "0.000500 pressure 10 -\n"
            "0.000500 pressure 515 test_type=2\n"
            "0.000500 pressure 7800 0x01ff\n"
            "0.000500 unknown 1 attributes\n");
}

TEST(RequestLog, ShowsRegistryItemsWithVersionsAndKinds) {
  TemporaryFolder folder;
  HubHarness hub({"hub.request_log=" + folder.Path("log")});
  sns_registry_data items;
  sns_registry_data_item* const group = addGroup(&items, "bias");
  group->set_version(2);
  addFloat(group->mutable_subgrp(), "x", 2.75F)->set_version(2);
  sns_registry_data_item* item = items.add_items();
  item->set_name("n");
  item->set_sint(-3);
  item = items.add_items();
  item->set_name("s");
  item->set_str(std::string("a\"\0", 3));
  (void)hub.WriteRegistry(kGroup, items);
  (void)hub.ReadRegistry(kGroup);
  const std::string log = folder.ReadFile("log");
  EXPECT_EQ(log,
            "0.000000 suid 512 data_type=\"registry\"\n"
            "0.000500 registry 513 name=\"barochip_0_platform.pressure.fac_cal\" "
            "{bias#2={x#2=2.75}, n=-3i, s=\"a\\x22\\x00\"}\n"
            "0.001000 suid 512 data_type=\"registry\"\n"
            "0.001500 registry 512 name=\"barochip_0_platform.pressure.fac_cal\"\n");
}

TEST(RequestLog, NamesOfItemsMakeNoLinesOfTheirOwn) {
  TemporaryFolder folder;
  HubHarness hub({"hub.request_log=" + folder.Path("log")});
  const simhub::Suid registry = hub.Find("registry");
  sns_registry_write_req request;
  request.set_name("g\nh");
  for (const std::string& name : {std::string("a.b-c_0"), std::string("x\n9.9 suid 1"), std::string("a=1, b"),
                                  std::string("a\0b", 3), std::string()}) {
    addFloat(request.mutable_data(), name, 1);
  }
  (void)hub.Ask(registry, simhub::kRegistryWriteRequest, request.SerializeAsString());
  EXPECT_EQ(folder.ReadFile("log"),
            "0.000000 suid 512 data_type=\"registry\"\n"
            "0.000500 registry 513 name=\"g\\x0ah\" {a.b-c_0=1, \"x\\x0a9.9 suid 1\"=1, \"a=1, b\"=1, "
            "\"a\\x00b\"=1, \"\"=1}\n");
}

TEST(RequestLog, FileThatCannotBeOpenedIsAnError) {
  HubHarness fine;
  fine.scenario.hub.requestLog = "/nonexistent/log";
  std::string error;
  EXPECT_EQ(simhub::Hub::Create(fine.scenario, {fine.folder.Path("registry")}, fine, &error), nullptr);
  EXPECT_EQ(error, "hub.request_log: /nonexistent/log: No such file or directory");
}

}  // namespace
