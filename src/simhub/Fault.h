// What can be made to go wrong. Every kind is one row of faultKinds(); scenarios, overrides and the
// documentation go by that table.
#pragma once

#include <cstdint>
#include <limits>
#include <optional>
#include <span>
#include <string>
#include <string_view>

#include "simhub/HubTime.h"

namespace simhub {

enum class FaultKind {
  kAbsent,
  kSilent,
  kLowAccuracy,
  kShortEvent,
  kExtraValues,
  kNan,
  kMalformed,
  kWrongId,
  kDuplicate,
  kReorder,
  kQmiError,
  kNoResponse,
  kErrorAnswer,
  kLateResponse,
  kNoNotification,
  kOemFailure,
  kOemSilence,
  kOemMalformed,
  kGroupMissing,
  kItemMissing,
  kItemKind,
  kReadFails,
  kWriteFails,
  kTornFile,
  kFullDisk,
  kHubAway,
};

/// Takes the place of a payload that must not decode, whatever the message: a tag that never ends.
inline constexpr const char* kUndecodablePayload = "\xff\xff\xff\xff";

/// What a fault acts on: it says which keys it has besides kind, from, until, after and count.
enum class FaultScope { kEvents, kRequests, kRegistry, kHub };

struct FaultKindRow {
  FaultKind kind;
  const char* name;
  FaultScope scope;
  const char* keys;     ///< its own keys, separated by blanks
  const char* meaning;  ///< one sentence
};

[[nodiscard]] std::span<const FaultKindRow> faultKinds();
[[nodiscard]] const FaultKindRow* findFaultKind(std::string_view name);
[[nodiscard]] const FaultKindRow& faultKindRow(FaultKind kind);

/// One [fault.NAME] of a scenario. It acts while from ≤ time < until, on the `count` occasions (events of its
/// sensor, or requests to it) that come after the first `after` ones.
struct Fault {
  static constexpr std::uint64_t kUnlimited = std::numeric_limits<std::uint64_t>::max();

  std::string name;
  FaultKind kind = FaultKind::kSilent;
  std::string sensor;  ///< a sensor's section name or data type; empty: every sensor
  std::string group;   ///< a registry group; empty: every group
  std::string item;
  Time from{0};
  Time until = kNever;
  std::uint64_t after = 0;
  std::uint64_t count = kUnlimited;

  std::optional<std::uint32_t> message;  ///< only requests of this message id
  std::uint32_t values = 0;              ///< values that remain or are added
  std::uint32_t error = 0;               ///< the error code sent
  std::uint32_t id = 0;                  ///< the message id sent
  Time delay{0};                         ///< how late
  std::optional<Time> downFor;           ///< how long away; nothing: for good
  std::uint32_t times = 1;               ///< how often away
  std::uint64_t freeBytes = 0;           ///< what still fits on the disk
};

}  // namespace simhub
