// Whether "als" finds what a simulated light sensor under the display makes of a lux, over many handsets.
#include "truth/UdAlsHandset.h"

namespace {

using namespace udals;

constexpr unsigned kHandsets = 21;
constexpr std::size_t kTrials = kHandsets * 6;  // means that the tests look at

/// What is different between handsets.
struct Truth {
  explicit Truth(unsigned seed) {
    std::mt19937 generator(seed);
    sensitivity = std::uniform_real_distribution<double>(0.4, 1.8)(generator);
    kelvin = std::uniform_real_distribution<double>(2700, 6500)(generator);
    lux = std::uniform_real_distribution<double>(200, 1500)(generator);
    otherLux = std::uniform_real_distribution<double>(100, 5000)(generator);
  }
  [[nodiscard]] std::vector<std::string> under(double illuminance) const {
    return {world("illuminance", illuminance), world("color_temperature", kelvin)};
  }
  /// How far the scale may be off, as a share of it.
  [[nodiscard]] double scaleBound() const {
    const double reading = sensitivity * lux;
    return 1.01 * meanBound(kTrials, reading, luxNoise()) / reading + kFloats;
  }
  [[nodiscard]] double meanOf(double illuminance) const {
    return meanBound(kTrials, sensitivity * illuminance, luxNoise());
  }

  double sensitivity = 1;
  double kelvin = 0;
  double lux = 0;
  double otherLux = 0;
};

class UdAlsLuxTruth : public testing::TestWithParam<unsigned> {
 protected:
  const Truth truth{GetParam()};
  Handset handset{GetParam(), {sensor("sensitivity", truth.sensitivity)}};

  Captured calibrate() {
    return handset.Measure({"-w", number(truth.lux), number(truth.kelvin)}, truth.under(truth.lux));
  }
};

TEST_P(UdAlsLuxTruth, ScaleUndoesTheSensitivityUnderAnyLight) {
  const double expected = 1 / truth.sensitivity;
  EXPECT_NEAR(numberAfter("LUX_SCALE:", calibrate()), expected, expected * truth.scaleBound());

  const Captured second = handset.Measure({"sample"}, truth.under(truth.otherLux));
  EXPECT_NEAR(numberAfter("LUX_MEAN:", second), truth.otherLux,
              truth.otherLux * truth.scaleBound() + 1.01 * truth.meanOf(truth.otherLux) / truth.sensitivity);
}

TEST_P(UdAlsLuxTruth, VerificationAgreesAfterTheCalibrationAndNotBefore) {
  const std::vector<std::string> verify{"-q", "als", "-v", "5", number(truth.lux)};
  TruthHandset fresh(familyOf(GetParam()).name,
                     {sensor("sensitivity", 0.9), world("display_brightness", 0), world("ir_share", 0)});
  EXPECT_EQ(fresh.Run(verify, truth.under(truth.lux)).result, -22) << "a tenth too little";
  calibrate();
  const Captured second = handset.Measure({"-v", "5", number(truth.lux)}, truth.under(truth.lux));
  EXPECT_NEAR(numberAfter("MEAN:", second), truth.lux,
              truth.lux * truth.scaleBound() + 1.01 * truth.meanOf(truth.lux) / truth.sensitivity);
}

TEST_P(UdAlsLuxTruth, CalibratedHandsetIsFoundTheSameAgain) {
  calibrate();
  const double expected = 1 / truth.sensitivity;
  EXPECT_NEAR(numberAfter("LUX_SCALE:", calibrate()), expected, expected * truth.scaleBound())
      << "the samples of the second calibration do not carry the first one's scale";
}

TEST_P(UdAlsLuxTruth, ResetBringsTheSensitivityBack) {
  calibrate();
  handset.Run({}, {}, {"-q", "-r"});
  const Captured after = handset.Measure({"sample"}, truth.under(truth.lux));
  EXPECT_NEAR(numberAfter("LUX_MEAN:", after), truth.sensitivity * truth.lux, truth.meanOf(truth.lux));
}

INSTANTIATE_TEST_SUITE_P(Handsets, UdAlsLuxTruth, testing::Range(1U, kHandsets + 1));

}  // namespace
