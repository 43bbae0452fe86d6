#include "simhub/sensors/UnderDisplayAmbientLight.h"

#include <algorithm>
#include <cmath>

#include "simhub/Te2Table.h"
#include "simhub/sensors/DisplayLight.h"

namespace simhub {
namespace {

constexpr double kReferenceKelvin = 5000;
/// How each filter sees light of that colour temperature, against the others. Weighted with the design's
/// coefficients the sum is kDesignSum.
constexpr std::array<double, kFilteredChannels> kFilter{1.0, 0.40, 0.45, 0.25};
constexpr double kDesignSum = kDesignCoefficients[0] * kFilter[0] + kDesignCoefficients[1] * kFilter[1] +
                              kDesignCoefficients[2] * kFilter[2] + kDesignCoefficients[3] * kFilter[3];
/// Colder light has less red and more blue, per 1000 K. So much more that what the design's coefficients make
/// of it stays the same: they are there to take the colour out.
constexpr double kLessRed = 0.1;
constexpr double kMoreBlue =
    kLessRed * (kDesignCoefficients[1] * kFilter[1]) / (kDesignCoefficients[3] * kFilter[3]);
constexpr std::size_t kRed = 1;
constexpr std::size_t kBlue = 3;
constexpr std::size_t kInfrared = 4;

/// Automatic gain leaves room below full scale, so that a flicker does not run into it.
constexpr double kAutoGainHeadroom = 0.8;

constexpr std::array<const char*, kFilteredChannels + 1> kGainErrors{
    "gain_error_c", "gain_error_r", "gain_error_g", "gain_error_b", "gain_error_ir"};

}  // namespace

UnderDisplayAmbientLight::UnderDisplayAmbientLight(const SensorConfig& config,
                                                   const SensorSurroundings& surroundings)
    : Sensor(config, surroundings), te2Table_(surroundings.te2Table) {
  UnderDisplayAmbientLight::Restart();
}

void UnderDisplayAmbientLight::Restart() {
  control_ = {};
  control_.ownIntegrationUs = control_.integrationUs = Config().Parameter("integration_time");
}

void UnderDisplayAmbientLight::ApplyCalibration(const sns_registry_data& group) {
  calibration_ = Config().calibrated ? readLuxCalibration(group) : LuxCalibration{};
}

bool UnderDisplayAmbientLight::HandleRequest(const SensorRequest& request,
                                             std::vector<SensorAnswer>* answers) {
  return controlLight(request, &control_, answers);
}

void UnderDisplayAmbientLight::Read(Time time, std::vector<float>* values) {
  const DisplayPicture display = picture(time);
  const Channels truth = trueCounts(time, display);
  if (control_.autoGain) control_.gain = highestGainFor(truth);
  Channels counts{};
  for (std::size_t i = 0; i < kChannels; ++i) counts[i] = truth[i] * amplification(i);
  Err(time, counts);
  const double fullScale = Config().Parameter("full_scale");
  for (double& count : counts) count = std::clamp(count, 0.0, fullScale);

  std::array<double, kFilteredChannels> standard{};
  for (std::size_t i = 0; i < kFilteredChannels; ++i) {
    standard[i] = counts[i] * gainRatio(calibration_.gainRatios[i], control_.gain) *
                  control_.ownIntegrationUs / control_.integrationUs;
  }
  values->push_back(static_cast<float>(estimateLux(standard, display, calibration_)));
  for (const double count : counts) values->push_back(static_cast<float>(count));
  values->push_back(static_cast<float>(control_.gain));
  values->push_back(static_cast<float>(control_.integrationUs));
}

DisplayPicture UnderDisplayAmbientLight::picture(Time time) const {
  const SignalValue color = TheWorld().At(WorldSignal::kDisplayColor, time);
  DisplayPicture display;
  display.brightness = TheWorld().ScalarAt(WorldSignal::kDisplayBrightness, time);
  display.share = {(color[0] + color[1] + color[2]) / 3, color[0], color[1], color[2]};
  display.pulses = Config().Parameter("pwm_ripple");
  return display;
}

/// How much of the display's light the integration at `time` catches.
double UnderDisplayAmbientLight::leakShare(Time time) const {
  constexpr double kMillisecondsPerSecond = 1000;
  const double floor = Config().Parameter("leak_floor");
  if (!control_.triggered) return untriggeredShare(floor);
  const double ownEdge = Config().Parameter("te2_falling_edge");
  const double lines = readTe2FallingEdge(te2Table_).value_or(static_cast<int>(ownEdge)) - ownEdge;
  const double delay = control_.delayMs >= 0 ? control_.delayMs : calibration_.delayMs;
  const double offset = delay + lines * Config().Parameter("te2_line") / kMillisecondsPerSecond -
                        Config().Parameter("best_delay");
  const double period = kMillisecondsPerSecond / TheWorld().ScalarAt(WorldSignal::kDisplayRefreshRate, time);
  return triggeredShare(offset, period, floor);
}

/// The light in counts at the highest gain and in the sensor's own integration time, without its errors.
UnderDisplayAmbientLight::Channels UnderDisplayAmbientLight::trueCounts(Time time,
                                                                        const DisplayPicture& display) const {
  const double light =
      Config().Parameter("sensitivity") * TheWorld().ScalarAt(WorldSignal::kIlluminance, time);
  const double infrared = light * TheWorld().ScalarAt(WorldSignal::kIrShare, time);
  const double colder = (TheWorld().ScalarAt(WorldSignal::kColorTemperature, time) - kReferenceKelvin) / 1000;
  std::array<double, kFilteredChannels> filter = kFilter;
  filter[kRed] *= std::max(0.0, 1 - kLessRed * colder);
  filter[kBlue] *= std::max(0.0, 1 + kMoreBlue * colder);
  const double leak = display.brightness * leakShare(time);
  const double pulses = display.pulses * pulseShare(display.brightness, Config().Parameter("pwm_boundary"));
  const std::vector<double>& displayLeak = Config().parameters.at("display_leak");

  Channels counts{};
  for (std::size_t i = 0; i < kFilteredChannels; ++i) {
    counts[i] = light * filter[i] / kDesignSum + Config().Parameter("infrared_leak") * infrared +
                leak * displayLeak[i] * display.share[i] + pulses;
  }
  counts[kInfrared] = infrared;
  return counts;
}

int UnderDisplayAmbientLight::highestGainFor(const Channels& counts) const {
  const double highest = *std::max_element(counts.begin(), counts.end());
  const double atHighestGain = highest * control_.integrationUs / control_.ownIntegrationUs;
  const double room = kAutoGainHeadroom * Config().Parameter("full_scale");
  int gain = kHighestGain;
  while (gain > 0 && std::ldexp(atHighestGain, gain - kHighestGain) > room) --gain;
  return gain;
}

/// Counts by the settings in force over those at the highest gain and in the sensor's own integration time.
double UnderDisplayAmbientLight::amplification(std::size_t channel) const {
  const std::vector<double>& errors = Config().parameters.at(kGainErrors[channel]);
  const auto calibrated = static_cast<std::size_t>(control_.gain - kLowestCalibratedGain);
  const bool errs = control_.gain >= kLowestCalibratedGain && calibrated < errors.size();
  return std::ldexp(errs ? 1 + errors[calibrated] : 1, control_.gain - kHighestGain) *
         control_.integrationUs / control_.ownIntegrationUs;
}

}  // namespace simhub
