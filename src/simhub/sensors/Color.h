#pragma once

#include "simhub/Sensor.h"

namespace simhub {

/// The photodiodes behind the filters of a color chip. Seven values: one that a stream of the chip adds, then
/// clear, red, green, blue and infrared in counts, and the gain step. The chip chooses its gain by what there
/// is to see, a step doubling the counts, and measures green and infrared in turn: a reading has either a
/// green and the infrared −1, or an infrared and the green 0.
///
/// A source of color temperature T gives (T − 1000 K) / 4500 K as many counts of blue as of red; clear is the
/// sum of the colors. The filters let some infrared through.
class ColorChip : public Sensor {
 public:
  using Sensor::Sensor;
  void Restart() override { hasIr_ = false; }

 protected:
  /// Counts of red, green, blue, clear and infrared, in the order in which a scenario gives errors.
  struct Counts {
    std::array<double, 5> values{};
    int gain = 0;
  };
  /// Without the sensor's errors.
  [[nodiscard]] Counts see(Time time) const;
  /// The whole reading.
  void push(double first, const Counts& counts, std::vector<float>* values);

 private:
  bool hasIr_ = false;  ///< whether the last reading has an infrared
};

/// First value: the color temperature in K, by the chip's own line over blue / red, or, in the calibrated
/// stream, by the registry's.
class Color final : public ColorChip {
 public:
  using ColorChip::ColorChip;
  void Read(Time time, std::vector<float>* values) override;
  void ApplyCalibration(const sns_registry_data& group) override;

 private:
  double offset_ = 0;  ///< K
  double slope_ = 0;   ///< K
};

/// First value: the illuminance in lux, in the calibrated stream multiplied by the registry's "scale". Only
/// this one errs.
class ColorLight final : public ColorChip {
 public:
  using ColorChip::ColorChip;
  void Read(Time time, std::vector<float>* values) override;
  void ApplyCalibration(const sns_registry_data& group) override;

 private:
  double factor_ = 1;
};

}  // namespace simhub
