// Whom requests can be addressed to: the scenario's sensors, then the registry and the look-up sensor. Each
// has an index, a SUID and the attributes of a sensor.
#pragma once

#include <cstdint>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "simhub/FaultPlan.h"
#include "simhub/RequestLog.h"
#include "simhub/Scenario.h"
#include "simhub/Sensor.h"

namespace simhub {

class Directory {
 public:
  /// Makes the sensors. The scenario outlives the directory. `te2Table` is as in HubFiles.
  Directory(const Scenario& scenario, const std::string& te2Table, const SensorMaker& makeSensor);

  /// All addressees' indices are below this, the sensors' first.
  [[nodiscard]] std::uint32_t Count() const { return static_cast<std::uint32_t>(sensors_.size()) + 2; }
  [[nodiscard]] std::optional<std::uint32_t> Find(const Suid& suid) const;

  [[nodiscard]] AddresseeKind KindOf(std::uint32_t addressee) const;
  [[nodiscard]] const Suid& SuidOf(std::uint32_t addressee) const;
  [[nodiscard]] const SensorConfig& ConfigOf(std::uint32_t addressee) const;
  [[nodiscard]] const std::vector<std::unique_ptr<Sensor>>& Sensors() const { return sensors_; }
  /// As faults name them, by index.
  [[nodiscard]] std::vector<Addressee> Names() const;

 private:
  std::vector<std::unique_ptr<Sensor>> sensors_;
  const SensorConfig registryConfig_;
  const SensorConfig lookupConfig_;
  const Suid registrySuid_;
  std::map<Suid, std::uint32_t> bySuid_;
};

}  // namespace simhub
