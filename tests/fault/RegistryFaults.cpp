// What goes wrong with the registry.
#include "fault/FaultRowTables.h"
#include "ssc/MessageIds.h"
#include "ssc/Results.h"

namespace fault {
namespace {

void addRegistryRow(const char* name, const char* fault, std::vector<std::string> (*keys)(const CommandMode&),
                    Expected (*expected)(const CommandMode&), std::vector<FaultRow>* rows,
                    Stored stored = Stored::kNothing) {
  rows->push_back({"Registry", name,
                   [fault, keys](const CommandMode& mode, const Traffic& good) -> Made {
                     if (good.CountRequests("registry", ssc::kRegistryReadRequest) == 0) return std::nullopt;
                     const std::vector<std::string> made = keys(mode);
                     return made.empty() ? Made() : faultOf(fault, made);
                   },
                   expected, stored});
}

std::vector<std::string> groupKey(const CommandMode& mode) { return {"group=\"" + mode.group + "\""}; }

std::vector<std::string> itemKeys(const CommandMode& mode) {
  if (mode.item.empty()) return {};
  return {"group=\"" + mode.group + "\"", "item=" + mode.item};
}

std::vector<std::string> whenStoring(const CommandMode& mode, const std::string& key) {
  return mode.storesInRegistry ? std::vector<std::string>{key} : std::vector<std::string>{};
}

/// Only some need to know what was stored before.
Expected itemOfAnotherKind(const CommandMode& mode) {
  // Light and proximity take it for 0, the phases' result and a reset replace it: that is how it is repaired.
  const bool isReplaced =
      counts(mode) || mode.family == "sar" || mode.name == "reset" || mode.device == "p2m2";
  return isReplaced ? Expected{} : Expected{ssc::kInvalid, "Invalid registry"};
}

}  // namespace

void addRegistryRows(std::vector<FaultRow>* rows) {
  addRegistryRow("no such group", "group_missing", groupKey, groupUnreadable, rows);
  addRegistryRow("reading fails", "read_fails", groupKey, groupUnreadable, rows);
  addRegistryRow("torn file", "torn_file", groupKey, groupUnreadable, rows);
  rows->back().onCalibrated = true;  // what is not stored yet has no file that could be torn
  addRegistryRow(
      "an item is missing", "item_missing", itemKeys,
      [](const CommandMode&) {
        return Expected{ssc::kInvalid, "Invalid registry; missing"};
      },
      rows);
  addRegistryRow("an item is of another kind", "item_kind", itemKeys, itemOfAnotherKind, rows);
  addRegistryRow(
      "writing fails", "write_fails", [](const CommandMode& mode) { return whenStoring(mode, "count=1"); },
      groupUnwritable, rows);
  addRegistryRow(
      "disk full", "full_disk", [](const CommandMode& mode) { return whenStoring(mode, "free_bytes=0"); },
      groupUnwritable, rows);
  addRegistryRow(
      "disk full in the middle of a file", "full_disk",
      [](const CommandMode& mode) { return whenStoring(mode, "free_bytes=40"); }, groupUnwritable, rows);
}

}  // namespace fault
