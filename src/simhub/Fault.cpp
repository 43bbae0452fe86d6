#include "simhub/Fault.h"

#include <cstddef>

namespace simhub {
namespace {

using enum FaultKind;
using enum FaultScope;

constexpr FaultKindRow kRows[] = {
    {kAbsent, "absent", kRequests, "sensor",
     "The sensor is not listed by the look-up and does not know its SUID."},
    {kSilent, "silent", kEvents, "sensor", "The sensor takes requests, but its readings never come."},
    {kLowAccuracy, "low_accuracy", kEvents, "sensor",
     "The sensor's readings never have more than low accuracy."},
    {kShortEvent, "short_event", kEvents, "sensor values", "Readings have only their first `values` values."},
    {kExtraValues, "extra_values", kEvents, "sensor values",
     "Readings have `values` more values than they should."},
    {kNan, "nan", kEvents, "sensor", "Every value of a reading is not a number."},
    {kMalformed, "malformed", kEvents, "sensor", "The payload of a reading cannot be decoded."},
    {kWrongId, "wrong_id", kEvents, "sensor id", "Readings come under the message id `id`."},
    {kDuplicate, "duplicate", kEvents, "sensor", "Every reading comes twice."},
    {kReorder, "reorder", kEvents, "sensor", "Every other reading comes after the one that follows it."},
    {kQmiError, "qmi_error", kRequests, "sensor message error",
     "A request is refused in its QMI response with error `error`, and not carried out."},
    {kNoResponse, "no_response", kRequests, "sensor message",
     "A request is carried out, but its QMI response never comes."},
    {kErrorAnswer, "error_event", kRequests, "sensor message error",
     "A request is taken but answered by an error event with error `error`, and not carried out."},
    {kLateResponse, "late_response", kRequests, "sensor message delay",
     "A request is carried out, but its QMI response comes `delay` seconds late."},
    {kNoNotification, "no_notification", kRequests, "sensor",
     "The sensor reloads its calibration when told to, but does not confirm it."},
    {kOemFailure, "oem_failure", kRequests, "sensor message",
     "The sensor answers its own requests with a failure."},
    {kOemSilence, "oem_silence", kRequests, "sensor message",
     "The sensor carries its own requests out, but does not answer them."},
    {kOemMalformed, "oem_malformed", kRequests, "sensor message",
     "The sensor carries its own requests out, but the payload of its answers cannot be decoded."},
    {kGroupMissing, "group_missing", kRegistry, "group", "A registry group does not exist when it is read."},
    {kItemMissing, "item_missing", kRegistry, "group item",
     "An item is missing from the group that is read."},
    {kItemKind, "item_kind", kRegistry, "group item",
     "An item of the group that is read has the wrong kind: a subgroup is a float, anything else a "
     "subgroup."},
    {kReadFails, "read_fails", kRegistry, "group", "Reading a registry group is answered by an error event."},
    {kWriteFails, "write_fails", kRegistry, "group",
     "Writing a registry group is answered by the status failed."},
    {kTornFile, "torn_file", kRegistry, "group",
     "The second half of a registry group's file is not there when the hub starts."},
    {kFullDisk, "full_disk", kRegistry, "free_bytes",
     "The disk has room for `free_bytes` more bytes of registry files."},
    {kHubAway, "hub_away", kHub, "sensor down_for times",
     "The hub goes away after `after` readings, and is back `down_for` seconds later (not at all where that "
     "is "
     "missing), `times` times."},
};

}  // namespace

std::span<const FaultKindRow> faultKinds() { return kRows; }

const FaultKindRow* findFaultKind(std::string_view name) {
  for (const FaultKindRow& row : kRows) {
    if (name == row.name) return &row;
  }
  return nullptr;
}

const FaultKindRow& faultKindRow(FaultKind kind) { return kRows[static_cast<std::size_t>(kind)]; }

}  // namespace simhub
