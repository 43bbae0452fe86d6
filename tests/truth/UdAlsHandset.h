// Simulated handsets with the light sensor under the display, each with errors of its own, for tests that
// know them.
#pragma once

#include <array>
#include <cmath>
#include <cstddef>
#include <random>
#include <string>
#include <utility>
#include <vector>

#include <gtest/gtest.h>

#include "truth/StatisticalBound.h"
#include "truth/TruthHandset.h"

namespace udals {

inline constexpr double kNoise = 0.2;            // counts, of one reading of a channel
inline constexpr double kQuantisation = 0.0625;  // counts
inline constexpr std::size_t kSamples = 40;
/// What the sensor makes of its channels C, R, G and B, until it is told otherwise.
inline constexpr std::array<double, 4> kCoefficients{1.0, -0.711, 1.729, -1.999};
/// A printed number, and one that went through a few 32-bit floats on its way.
inline constexpr double kPrinted = 1e-6;
inline constexpr double kFloats = 1e-6;  // of the value

struct Family {
  const char* name;
  const char* package;
};
/// The one whose turn it is.
inline Family familyOf(unsigned seed) {
  constexpr std::array<Family, 3> kFamilies{
      {{"t5h5", "lightchip5"}, {"rufael", "lightchipr"}, {"whiskel", "lightchipw"}}};
  return kFamilies[seed % kFamilies.size()];
}

inline std::string number(double value) {
  std::array<char, 32> digits{};
  std::snprintf(digits.data(), digits.size(), "%.9g", value);
  // A registry item without a point would be an integer.
  const std::string text = digits.data();
  return text.find_first_of(".e") == std::string::npos ? text + ".0" : text;
}

/// "sensor.ambient_light_raw.KEY=VALUE".
inline std::string sensor(const std::string& key, double value) {
  return "sensor.ambient_light_raw." + key + "=" + number(value);
}
template <std::size_t count>
std::string sensor(const std::string& key, const std::array<double, count>& values) {
  std::string list;
  for (const double value : values) list += (list.empty() ? "" : ",") + number(value);
  return "sensor.ambient_light_raw." + key + "=[" + list + "]";
}
inline std::string world(const std::string& key, double value) {
  return "world." + key + "=" + number(value);
}
/// An item of the family's calibration that is there before anything was written.
inline std::string item(const Family& family, const std::string& name, double value) {
  return std::string("registry.\"") + family.package + "_0_platform.als.fac_cal\"." + name + "=" +
         number(value);
}

/// By how much the mean of kSamples readings with `noiseFactor` times a channel's noise may be off, when so
/// many means are looked at.
inline double meanBound(std::size_t trials, double level, double noiseFactor = 1) {
  const truth::MeanError error =
      truth::meanError(kNoise * noiseFactor, kQuantisation * noiseFactor, kSamples, level);
  return truth::deviationsFor(trials) * error.deviation + error.rounding + kPrinted;
}

/// A lux reading's noise over that of a channel.
inline double luxNoise() {
  double sum = 0;
  for (const double coefficient : kCoefficients) sum += coefficient * coefficient;
  return std::sqrt(sum);
}

class Handset {
 public:
  /// With its display off, in light without infrared, unless the overrides say otherwise.
  explicit Handset(unsigned seed, std::vector<std::string> overrides = {})
      : family_(familyOf(seed)),
        handset_(family_.name, with(std::move(overrides))),
        noiseSeed_(seed * 1000) {}

  /// Runs "als" with its words, after the program's own options: quietly, with noise of its own, and
  /// successfully.
  Captured Run(const std::vector<std::string>& words, std::vector<std::string> overrides = {},
               const std::vector<std::string>& options = {"-q"}) {
    std::vector<std::string> all = options;
    all.emplace_back("als");
    all.insert(all.end(), words.begin(), words.end());
    overrides.push_back("hub.seed=" + std::to_string(++noiseSeed_));
    Captured run = handset_.Run(all, overrides);
    EXPECT_EQ(run.result, 0) << run.out << run.err;
    return run;
  }
  /// The same with -s kSamples.
  Captured Measure(std::vector<std::string> words, std::vector<std::string> overrides = {}) {
    words.insert(words.begin(), {"-s", std::to_string(kSamples)});
    return Run(words, std::move(overrides));
  }
  /// An item of its calibration, as written.
  [[nodiscard]] double Stored(const std::string& name) const {
    return handset_.Stored(std::string(family_.package) + "_0_platform.als.fac_cal", name);
  }

 private:
  static std::vector<std::string> with(std::vector<std::string> overrides) {
    const std::vector<std::string> common{world("display_brightness", 0), world("ir_share", 0),
                                          sensor("noise", kNoise), sensor("quantisation", kQuantisation)};
    overrides.insert(overrides.begin(), common.begin(), common.end());
    return overrides;
  }

  const Family family_;
  TruthHandset handset_;
  unsigned noiseSeed_;
};

/// The number behind a label that stands in the output once.
inline double numberAfter(const std::string& label, const Captured& run) {
  const std::vector<double> numbers = numbersAfter(label, run.out);
  EXPECT_EQ(numbers.size(), 1U) << label << "\n" << run.out;
  return numbers.empty() ? std::nan("") : numbers.front();
}

/// The means of C, R, G and B that a step printed.
inline std::array<double, 4> channelMeans(const Captured& run) {
  return {numberAfter("C_MEAN:", run), numberAfter("R_MEAN:", run), numberAfter("G_MEAN:", run),
          numberAfter("B_MEAN:", run)};
}

}  // namespace udals
