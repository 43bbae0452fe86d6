// One whole command on a simulated handset, in this process and in simulated time, with the hub's traffic
// watched: when requests and readings passed, and how long it all took.
#pragma once

#include <cstdint>
#include <filesystem>
#include <string>
#include <vector>

#include "support/Capture.h"

namespace fault {

/// What passed between the program and the hub. Times are the hub's, in seconds since its start.
struct Traffic {
  struct Request {
    double time = 0;
    std::uint64_t suidHigh = 0;
    std::uint64_t suidLow = 0;
    std::uint32_t message = 0;
  };
  std::vector<Request> requests;
  std::vector<double> readings;  ///< when the watched sensor's readings arrived
  double end = 0;                ///< when the command had ended
  double waited = 0;             ///< how long it waited for responses to its requests, in all

  /// Requests of that id to the addressee: a sensor's key, "registry", or "suid" for the look-up.
  [[nodiscard]] std::size_t CountRequests(const std::string& addressee, std::uint32_t message) const;
};

struct WatchedRun {
  Captured captured;
  Traffic traffic;
};

/// Runs the program with the words behind "vantle --device DEVICE" on the built-in handset of that name.
/// `root` holds the handset's files. `sensor` is the key of the sensor whose readings are noted.
[[nodiscard]] WatchedRun runWatched(const std::filesystem::path& root, const std::string& device,
                                    const std::vector<std::string>& words,
                                    const std::vector<std::string>& overrides, const std::string& sensor);

}  // namespace fault
