#include "imu/ImuMultipointSamples.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <sstream>

#include <google/protobuf/repeated_field.h>

#include "framework/Statistics.h"

namespace {

constexpr std::size_t kAxes = 3;

/// Whether any of the sample's values is further than `factor` deviations from the mean.
bool deviates(const SampleData& values, const SampleData& mean, const SampleData& stdev, int factor) {
  for (std::size_t i = 0; i < values.size(); ++i) {
    if (std::fabs(values[i] - mean[i]) > stdev[i] * static_cast<float>(factor)) return true;
  }
  return false;
}

std::size_t removeOutliersOnce(std::vector<Sample>* samples, int factor,
                               const std::function<void(const Outlier&)>& report) {
  const SampleData mean = sampleDataMean(*samples);
  const SampleData stdev = sampleStdev(*samples, mean);
  const auto isOutlier = [&](const Sample& sample) {
    const bool marked = sample.values.size() != stdev.size() || deviates(sample.values, mean, stdev, factor);
    if (marked) report({sample, stdev.size()});
    return marked;
  };
  return std::erase_if(*samples, isOutlier);
}

std::size_t largestAxis(const SampleData& mean) {
  std::size_t largest = 0;
  for (std::size_t axis = 1; axis < kAxes; ++axis) {
    if (std::fabs(mean[axis]) > std::fabs(mean[largest])) largest = axis;
  }
  return largest;
}

}  // namespace

std::optional<ImuPhase> parseImuPhase(std::string_view text) {
  if (text.size() != 3) return std::nullopt;
  const bool sensorIsKnown = text[0] == 'a' || text[0] == 'g';
  const bool signIsKnown = text[1] == '+' || text[1] == '-';
  const bool axisIsKnown = text[2] >= 'x' && text[2] <= 'z';
  if (!sensorIsKnown || !signIsKnown || !axisIsKnown) return std::nullopt;
  return ImuPhase{text[0] == 'a', text[1] == '+', static_cast<std::size_t>(text[2] - 'x')};
}

std::optional<std::size_t> axisOutOfPose(const ImuPhase& phase, const SampleData& accelMean) {
  for (std::size_t axis = 0; axis < kAxes; ++axis) {
    const double value = static_cast<double>(accelMean[axis]);
    const double along = phase.positive ? value : -value;
    const bool fits = axis == phase.axis ? along >= kLoadedAxisMin && along <= kLoadedAxisMax
                                         : std::fabs(value) <= kOtherAxisMax;
    if (!fits) return axis;
  }
  return std::nullopt;
}

std::size_t removeOutliers(std::vector<Sample>* samples, const OutlierRemoval& removal,
                           const std::function<void(const Outlier&)>& report) {
  const std::size_t before = samples->size();
  for (int round = 0; round < removal.maxRounds; ++round) {
    if (removeOutliersOnce(samples, removal.factor, report) == 0) break;
  }
  return before - samples->size();
}

MeasuredRotation integrateRotation(const std::vector<Sample>& gyro) {
  MeasuredRotation measured;
  if (gyro.empty()) return measured;
  for (std::size_t i = 1; i < gyro.size(); ++i) {
    const Sample& previous = gyro[i - 1];
    const Sample& current = gyro[i];
    const float timeStep = static_cast<float>(current.time - previous.time);
    SampleData term = previous.values + current.values;
    for (float& value : term) value = value * 0.5F * timeStep;
    measured.rotation += term;
  }
  measured.integrationTime = gyro.back().time - gyro.front().time;
  return measured;
}

SteadyRate findSteadyRate(const std::vector<Sample>& gyro, float windowSeconds) {
  SteadyRate steady;
  const auto isShort = [](const Sample& sample) { return sample.values.size() < kAxes; };
  if (std::any_of(gyro.begin(), gyro.end(), isShort)) {
    steady.fault = SteadyRate::Fault::kTooFewValues;
    return steady;
  }
  steady.fault = SteadyRate::Fault::kNoSamples;
  if (gyro.empty()) return steady;

  const SampleData mean = sampleDataMean(gyro);
  const std::size_t axis = steady.axis = largestAxis(mean);
  steady.meanRate = mean[axis];
  std::vector<Sample> kept;
  std::copy_if(gyro.begin(), gyro.end(), std::back_inserter(kept),
               [&](const Sample& sample) { return std::fabs(sample.values[axis]) > std::fabs(mean[axis]); });
  if (kept.empty()) return steady;

  const double first = kept.front().time;
  const double last = kept.back().time;
  const double centre = (first + last) / 2;
  const float halfWindow = windowSeconds / 2;
  steady.start = windowSeconds == 0 ? (first + centre) / 2 : centre - static_cast<double>(halfWindow);
  steady.end = windowSeconds == 0 ? (last + centre) / 2 : centre + static_cast<double>(halfWindow);
  std::erase_if(kept, [&](const Sample& sample) {
    return !(sample.time >= steady.start && sample.time <= steady.end);
  });
  if (kept.empty()) return steady;

  steady.windowFound = true;
  steady.rate = sampleDataMean(kept);
  const auto [smallest, largest] = std::minmax_element(
      kept.begin(), kept.end(),
      [axis](const Sample& a, const Sample& b) { return a.values[axis] < b.values[axis]; });
  steady.fluctuation = largest->values[axis] - smallest->values[axis];
  steady.allowedFluctuation = 0.25F * std::fabs(steady.rate[axis]);
  const bool isSteady = !(steady.allowedFluctuation < steady.fluctuation);
  steady.fault = isSteady ? SteadyRate::Fault::kNone : SteadyRate::Fault::kFluctuation;
  return steady;
}

template <class T>
std::string ArrayToString(const T& values, const std::string& prefix) {
  if (values.begin() == values.end()) return "[empty]";
  std::ostringstream text;
  const char* separator = "[ ";
  text << prefix;
  for (const auto value : values) {
    text << separator << value;
    separator = ", ";
  }
  text << " ]";
  return text.str();
}

template std::string ArrayToString(const google::protobuf::RepeatedField<float>&, const std::string&);
template std::string ArrayToString(const std::array<double, 3>&, const std::string&);
template std::string ArrayToString(const SampleData&, const std::string&);
