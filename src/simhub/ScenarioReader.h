#pragma once

#include "simhub/Scenario.h"
#include "simhub/Toml.h"

namespace simhub {

/// Reads a scenario's table, bases and overrides already laid over each other. What is wrong goes to
/// `problems`.
void readScenario(toml::table& table, Scenario* scenario, Problems& problems);

// The parts of it, each in a file of its own or beside readScenario.
void readWorldSignal(const WorldSignalRow& row, TableReader& reader, World* world, Problems& problems);
/// The "rotation" of `world`'s table, if it has one: {axis, at, rate, angle, ramp}.
void readRotation(TableReader& world, World* result, Problems& problems);
void readSensors(toml::table& table, std::vector<SensorConfig>* sensors, Problems& problems);
void readFaults(const toml::table& table, const std::vector<SensorConfig>& sensors,
                std::vector<Fault>* faults, Problems& problems);

}  // namespace simhub
