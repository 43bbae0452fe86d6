// The simulated surroundings of the handset. Every quantity is one row of worldSignals(): scenarios,
// overrides, sensors and the documentation all go by that table.
#pragma once

#include <array>
#include <cstddef>
#include <optional>
#include <span>
#include <string_view>
#include <utility>

#include "simhub/HubTime.h"
#include "simhub/Signal.h"

namespace simhub {

enum class WorldSignal : std::size_t {
  kPressure,
  kTemperature,
  kIlluminance,
  kColorTemperature,
  kIrShare,
  kInfrared,
  kMagneticField,
  kPose,
  kRotationRate,
  kAcceleration,
  kTargetDistance,
  kWindowCrosstalk,
  kDisplayBrightness,
  kDisplayColor,
  kDisplayRefreshRate,
  kCapacitance,
  kGravity,
  kCount
};

inline constexpr std::size_t kWorldSignalCount = static_cast<std::size_t>(WorldSignal::kCount);

struct WorldSignalRow {
  WorldSignal signal;
  const char* name;       ///< its key in [world]
  std::size_t dimension;  ///< numbers in one value
  const char* unit;
  double low;  ///< each number's range
  double high;
  SignalValue initial;  ///< where a scenario says nothing
  const char* meaning;
};

/// In the order of WorldSignal.
[[nodiscard]] std::span<const WorldSignalRow> worldSignals();
/// The row of that name, or null.
[[nodiscard]] const WorldSignalRow* findWorldSignal(std::string_view name);

class World {
 public:
  /// Every signal at its initial value.
  World();

  void Set(WorldSignal signal, Signal value) {
    signals_[static_cast<std::size_t>(signal)] = std::move(value);
  }

  [[nodiscard]] SignalValue At(WorldSignal signal, Time time) const {
    return signals_[static_cast<std::size_t>(signal)].At(toSeconds(time));
  }
  /// The first (for most signals the only) number.
  [[nodiscard]] double ScalarAt(WorldSignal signal, Time time) const { return At(signal, time)[0]; }

 private:
  std::array<Signal, kWorldSignalCount> signals_;
};

}  // namespace simhub
