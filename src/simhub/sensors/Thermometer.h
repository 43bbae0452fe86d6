#pragma once

#include "simhub/Sensor.h"

namespace simhub {

/// One value: the temperature of a chip in °C. Every chip has its own, found by the chip's package name.
class Thermometer final : public Sensor {
 public:
  using Sensor::Sensor;
  void Read(Time time, std::vector<float>* values) override;
};

}  // namespace simhub
