#include "simhub/Directory.h"

#include "simhub/Protocol.h"

namespace simhub {
namespace {

/// The hub's own sensors have no section in the scenario.
SensorConfig serviceConfig(const char* dataType) {
  SensorConfig config;
  config.key = config.dataType = config.name = dataType;
  config.streamType = SNS_STD_SENSOR_STREAM_TYPE_ON_CHANGE;
  config.physical = false;
  return config;
}

}  // namespace

Directory::Directory(const Scenario& scenario, const std::string& te2Table, const SensorMaker& makeSensor)
    : registryConfig_(serviceConfig(kRegistryDataType)),
      lookupConfig_(serviceConfig(kSuidDataType)),
      registrySuid_(suidForName(kRegistryDataType)) {
  const SensorSurroundings surroundings{scenario.world, scenario.hub.seed, te2Table};
  for (const SensorConfig& config : scenario.sensors) sensors_.push_back(makeSensor(config, surroundings));
  for (std::uint32_t i = 0; i < Count(); ++i) bySuid_[SuidOf(i)] = i;
}

std::optional<std::uint32_t> Directory::Find(const Suid& suid) const {
  const auto entry = bySuid_.find(suid);
  if (entry == bySuid_.end()) return std::nullopt;
  return entry->second;
}

AddresseeKind Directory::KindOf(std::uint32_t addressee) const {
  if (addressee < sensors_.size()) return AddresseeKind::kSensor;
  return addressee == sensors_.size() ? AddresseeKind::kRegistry : AddresseeKind::kLookup;
}

const Suid& Directory::SuidOf(std::uint32_t addressee) const {
  if (addressee < sensors_.size()) return sensors_[addressee]->Suid();
  return addressee == sensors_.size() ? registrySuid_ : kLookupSuid;
}

const SensorConfig& Directory::ConfigOf(std::uint32_t addressee) const {
  if (addressee < sensors_.size()) return sensors_[addressee]->Config();
  return addressee == sensors_.size() ? registryConfig_ : lookupConfig_;
}

std::vector<Addressee> Directory::Names() const {
  std::vector<Addressee> names;
  for (std::uint32_t i = 0; i < Count(); ++i) names.push_back({ConfigOf(i).key, ConfigOf(i).dataType});
  return names;
}

}  // namespace simhub
