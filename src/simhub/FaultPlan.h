// The scenario's faults, sorted by where they strike, with the count of their occasions.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "simhub/Fault.h"

namespace simhub {

/// What is wrong with one reading.
struct ReadingFaults {
  bool silent = false;
  bool lowAccuracy = false;
  bool notANumber = false;
  bool malformed = false;
  bool duplicate = false;
  bool reorder = false;
  std::optional<std::uint32_t> keep;   ///< values that remain
  std::optional<std::uint32_t> extra;  ///< values that are added
  std::optional<std::uint32_t> messageId;
};

/// What is wrong with the handling of one request.
struct RequestFaults {
  std::optional<std::uint32_t> qmiError;
  std::optional<std::uint32_t> errorEvent;
  bool noResponse = false;
  Time responseDelay{0};
  bool noNotification = false;
  bool oemFailure = false;
  bool oemSilence = false;
  bool oemMalformed = false;
};

/// Addressees are named by their section's key and their data type; a fault names either, or nobody for all.
struct Addressee {
  std::string key;
  std::string dataType;
};

class FaultPlan {
 public:
  /// `addressees[i]` is the sensor of index i in what follows.
  FaultPlan(const std::vector<Fault>& faults, const std::vector<Addressee>& addressees);

  [[nodiscard]] bool IsAbsent(std::uint32_t addressee, Time now) const;

  /// Counts one reading.
  [[nodiscard]] ReadingFaults OnReading(std::uint32_t addressee, Time now);
  /// Counts one request.
  [[nodiscard]] RequestFaults OnRequest(std::uint32_t addressee, std::uint32_t messageId, Time now);

  /// Counts one read or write of a registry group: whether a fault of that kind strikes it. The items that
  /// the striking faults name are added to `items`, if wanted.
  [[nodiscard]] bool OnRegistry(FaultKind kind, const std::string& group, Time now,
                                std::vector<std::string>* items = nullptr);
  /// Groups whose files are torn when the hub starts, "*" for all.
  [[nodiscard]] std::vector<std::string> TornGroups() const;
  /// Counts one write: the room on the disk that a fault leaves in all, if one strikes.
  [[nodiscard]] std::optional<std::uint64_t> FreeBytes(Time now);

  /// Counts one reading towards the hub's going away. True: it goes now, to be back at `back` (kNever: not at
  /// all).
  [[nodiscard]] bool GoesAway(std::uint32_t addressee, Time now, Time* back);
  /// The times at which the hub goes away by the clock alone.
  struct Departure {
    Time at;
    Time back;
  };
  [[nodiscard]] std::vector<Departure> Departures() const;
  /// The hub is back: readings towards the next going away count anew.
  void OnReturn();

 private:
  struct Active {
    Fault fault;
    std::uint64_t occasions = 0;
    std::uint64_t struck = 0;

    [[nodiscard]] bool InWindow(Time now) const { return now >= fault.from && now < fault.until; }
    /// Counts one occasion; whether it is struck.
    [[nodiscard]] bool Strike(Time now);
  };

  std::vector<Active> faults_;
  std::vector<std::vector<std::size_t>> onReadings_;  ///< by addressee, indices into faults_
  std::vector<std::vector<std::size_t>> onRequests_;
  std::vector<std::vector<std::size_t>> onHub_;
};

}  // namespace simhub
