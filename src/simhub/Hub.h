// The simulated hub: a real server of the hub's protocol, in its own time. It decodes requests, keeps every
// client's streams, runs sensors in a simulated world and stores the registry in files. It neither waits nor
// knows real time: whoever runs it moves its time on, and takes its datagrams.
#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <string>

#include "qmi/Qmi.h"
#include "simhub/HubTime.h"
#include "simhub/Scenario.h"
#include "simhub/SensorModels.h"

namespace simhub {

/// A client, as long as it is connected. Never 0, never used again.
using ClientId = std::uint64_t;

/// Where the hub's output goes. Calls come from inside the hub's own operations and must not call it back.
class HubOutput {
 public:
  virtual ~HubOutput() = default;
  /// The bytes are the hub's and hold until the call returns.
  virtual void Deliver(ClientId client, qmi::Bytes datagram) = 0;
  /// The hub goes away: streams end, nothing is delivered until HubUp. Clients stay known.
  virtual void HubDown() = 0;
  virtual void HubUp() = 0;
  /// One line: a datagram that made no sense, a registry file that cannot be used.
  virtual void Diagnostic(const std::string& text) = 0;
};

/// What of the handset's file system the hub uses.
struct HubFiles {
  std::string registryFolder;  ///< of the registry's groups; created when missing
  std::string te2Table{};      ///< node of the display's TE2 table; empty: there is none
};

struct HubStatistics {
  std::uint64_t requests = 0;
  std::uint64_t malformedDatagrams = 0;
  std::uint64_t readings = 0;  ///< sensor events sent, duplicates included
  std::uint64_t datagrams = 0;
};

class Hub {
 public:
  /// Makes and starts a hub. Null, with `error` set, when the request log cannot be opened. `output` outlives
  /// the hub. Other sensors than those of the scenario's models come from `makeSensor`.
  [[nodiscard]] static std::unique_ptr<Hub> Create(Scenario scenario, const HubFiles& files,
                                                   HubOutput& output, std::string* error,
                                                   const SensorMaker& makeSensor = simhub::makeSensor);
  ~Hub();

  [[nodiscard]] ClientId AddClient();
  /// Ends the client's streams; nothing more is delivered to it.
  void RemoveClient(ClientId client);

  /// A datagram of a client arrives now. False: the hub is away, and the datagram is lost.
  [[nodiscard]] bool HandleDatagram(ClientId client, qmi::Bytes datagram);

  [[nodiscard]] Time Now() const;
  [[nodiscard]] bool IsUp() const;
  /// When the next thing happens by itself; nothing while everything is at rest.
  [[nodiscard]] std::optional<Time> NextEventTime() const;
  /// Moves the time to the next event and carries it out. Nothing happens while everything is at rest.
  void Step();
  /// Carries out everything up to and including `time`, and moves the time there.
  void AdvanceTo(Time time);

  [[nodiscard]] const HubStatistics& Statistics() const;

 private:
  class Impl;
  explicit Hub(std::unique_ptr<Impl> impl);
  std::unique_ptr<Impl> impl_;
};

/// Those below `root` (the folder put in front of every device path; may be empty).
[[nodiscard]] HubFiles hubFiles(const std::string& root);

}  // namespace simhub
