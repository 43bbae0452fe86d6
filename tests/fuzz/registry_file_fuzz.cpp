// Any text in the place of a registry group's file. What is taken for a group must be a group again when it
// is written and read back: the file that a hub writes next must hold what it read.
#include <string>

#include "fuzz/FuzzCheck.h"
#include "proto/sns_registry.pb.h"
#include "simhub/RegistryJson.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  using fuzz::check;
  sns_registry_data items;
  std::string error;
  const std::string text(data, data + size);
  if (!simhub::parseRegistryGroup(text, &items, &error)) {
    check(!error.empty(), "a file that is refused is refused with a reason");
    return 0;
  }
  check(items.IsInitialized(), "a group that was read is complete");
  const std::string written = simhub::formatRegistryGroup(items);
  sns_registry_data again;
  check(simhub::parseRegistryGroup(written, &again, &error), "a written group reads back");
  check(again.SerializeAsString() == items.SerializeAsString(), "a group keeps every bit");
  check(simhub::formatRegistryGroup(again) == written, "a group is always written alike");
  return 0;
}
