// A simulated hub and a client that speaks to it in datagrams, as over a socket.
#pragma once

#include <memory>
#include <optional>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "proto/sns_client.pb.h"
#include "proto/sns_registry.pb.h"
#include "proto/sns_suid.pb.h"
#include "simhub/Hub.h"
#include "simhub/Protocol.h"
#include "simhub/Suid.h"
#include "simhub/TemporaryFolder.h"

/// One event as a client sees it, with the hub time at which it came.
struct SeenEvent {
  simhub::ClientId client = 0;
  simhub::Time at{0};
  simhub::Suid suid;
  std::uint32_t messageId = 0;
  std::uint64_t ticks = 0;
  std::string payload;
  std::size_t report = 0;  ///< the number of the report that brought it
};

struct SeenResponse {
  simhub::ClientId client = 0;
  simhub::Time at{0};
  qmi::Response response;
};

/// A request as a client sends it.
[[nodiscard]] std::vector<std::uint8_t> requestDatagram(std::uint16_t transaction, const simhub::Suid& suid,
                                                        std::uint32_t messageId,
                                                        const std::string& payload = {},
                                                        std::uint32_t batchMicroseconds = 0);

class HubHarness : public simhub::HubOutput {
 public:
  /// A hub of the scenario (a built-in name) with overrides. Fails the test when there is none.
  explicit HubHarness(const std::vector<std::string>& overrides = {}, const std::string& scenario = "o1v1",
                      simhub::SensorMaker makeSensor = simhub::makeSensor);

  /// A new hub, as after a restart, over the same files.
  void Restart();

  void Deliver(simhub::ClientId client, qmi::Bytes datagram) override;
  void HubDown() override { downs.push_back(hub->Now()); }
  void HubUp() override { ups.push_back(hub->Now()); }
  void Diagnostic(const std::string& text) override { diagnostics.push_back(text); }

  /// Sends a request; false when the hub is away.
  bool Send(const simhub::Suid& suid, std::uint32_t messageId, const std::string& payload = {},
            std::uint32_t batchMicroseconds = 0);
  bool SendAs(simhub::ClientId from, const simhub::Suid& suid, std::uint32_t messageId,
              const std::string& payload = {}, std::uint32_t batchMicroseconds = 0);
  /// Sends a request and runs the hub until its answering event came, or for 10 s: nothing.
  std::optional<SeenEvent> Ask(const simhub::Suid& suid, std::uint32_t messageId,
                               const std::string& payload = {});

  void Run(double seconds) { hub->AdvanceTo(hub->Now() + simhub::fromSeconds(seconds)); }
  void Configure(const simhub::Suid& suid, float rate, std::uint32_t batchMicroseconds = 0);

  [[nodiscard]] std::vector<simhub::Suid> LookUp(const std::string& dataType);
  /// The first sensor of the data type.
  [[nodiscard]] simhub::Suid Find(const std::string& dataType);
  /// Nothing when an error event came.
  [[nodiscard]] std::optional<sns_registry_data> ReadRegistry(const std::string& group);
  /// The write event's status; nothing when another event came.
  [[nodiscard]] std::optional<int> WriteRegistry(const std::string& group, const sns_registry_data& items);

  /// Decoded readings of a sensor; readings that do not decode are left out.
  [[nodiscard]] std::vector<sns_std_sensor_event> Readings(const simhub::Suid& suid) const;
  [[nodiscard]] std::vector<SeenEvent> EventsOf(const simhub::Suid& suid, std::uint32_t messageId) const;
  [[nodiscard]] double MeanReading(const simhub::Suid& suid) const;

  TemporaryFolder folder;
  simhub::Scenario scenario;
  std::unique_ptr<simhub::Hub> hub;
  simhub::ClientId client = 0;
  std::uint16_t transaction = 0;
  std::vector<SeenEvent> events;
  std::vector<SeenResponse> responses;
  std::vector<std::vector<std::uint8_t>> datagrams;
  std::vector<std::string> diagnostics;
  std::vector<simhub::Time> downs;
  std::vector<simhub::Time> ups;

 private:
  simhub::SensorMaker makeSensor_;
  std::size_t reports_ = 0;
};

/// A registry item of each kind.
sns_registry_data_item* addFloat(sns_registry_data* data, const std::string& name, float value);
sns_registry_data_item* addGroup(sns_registry_data* data, const std::string& name);
std::string ratePayload(float rate);
/// "name#version=value, …", subgroups in braces.
std::string show(const sns_registry_data& data);
