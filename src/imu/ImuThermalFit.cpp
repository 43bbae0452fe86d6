#include "imu/ImuThermalFit.h"

#include <algorithm>
#include <array>
#include <cmath>

#include "framework/Statistics.h"

namespace {

template <std::size_t kAxes>
using Axes = std::array<float, kAxes>;

/// Where a sum starts: negative zero is what leaves every first term as it is, zeros of either sign included.
template <std::size_t kAxes>
Axes<kAxes> emptySum() {
  Axes<kAxes> sum;
  sum.fill(-0.0F);
  return sum;
}

template <std::size_t kAxes>
SampleData divided(const Axes<kAxes>& sum, float divisor) {
  SampleData result(sum.begin(), sum.end());
  result /= divisor;
  return result;
}

SampleData squareRoots(SampleData values) {
  for (float& value : values) value = std::sqrt(value);
  return values;
}

template <std::size_t kAxes>
struct Means {
  float temperature;
  Axes<kAxes> reading;
};

template <std::size_t kAxes>
Means<kAxes> means(const std::vector<Sample>& samples, const std::vector<float>& temperatures) {
  float temperatureSum = 0;
  Axes<kAxes> sum = emptySum<kAxes>();
  for (std::size_t i = 0; i < temperatures.size(); ++i) {
    temperatureSum += temperatures[i];
    const float* const x = samples[i].values.data();
    for (std::size_t k = 0; k < kAxes; ++k) sum[k] += x[k];
  }
  const auto count = static_cast<float>(temperatures.size());
  for (float& element : sum) element /= count;
  return {temperatureSum / count, sum};
}

/// The variance of the residuals x − scale · T − bias, formed anew in each of the two passes: they would
/// take as much memory as the samples.
template <std::size_t kAxes>
SampleData residualVariance(const std::vector<Sample>& samples, const std::vector<float>& temperatures,
                            const ThermalFit& fit) {
  Axes<kAxes> scale;
  Axes<kAxes> bias;
  std::copy(fit.scale.begin(), fit.scale.end(), scale.begin());
  std::copy(fit.bias.begin(), fit.bias.end(), bias.begin());
  const auto residual = [&](std::size_t i, std::size_t k) {
    return samples[i].values.data()[k] - scale[k] * temperatures[i] - bias[k];
  };
  Axes<kAxes> mean = emptySum<kAxes>();
  for (std::size_t i = 0; i < temperatures.size(); ++i) {
    for (std::size_t k = 0; k < kAxes; ++k) mean[k] += residual(i, k);
  }
  for (float& element : mean) element /= static_cast<float>(temperatures.size());
  Axes<kAxes> squares = emptySum<kAxes>();
  for (std::size_t i = 0; i < temperatures.size(); ++i) {
    for (std::size_t k = 0; k < kAxes; ++k) {
      const float difference = residual(i, k) - mean[k];
      squares[k] += difference * difference;
    }
  }
  return divided<kAxes>(squares, static_cast<float>(temperatures.size() - 1));
}

template <std::size_t kAxes>
ThermalFit fit(const std::vector<Sample>& samples, const std::vector<float>& temperatures) {
  const Means<kAxes> mean = means<kAxes>(samples, temperatures);
  Axes<kAxes> sxx = emptySum<kAxes>();
  Axes<kAxes> sxt = emptySum<kAxes>();
  float stt = 0;
  for (std::size_t i = 0; i < temperatures.size(); ++i) {
    const float dT = temperatures[i] - mean.temperature;
    const float* const x = samples[i].values.data();
    for (std::size_t k = 0; k < kAxes; ++k) {
      const float d = x[k] - mean.reading[k];
      sxx[k] += d * d;
      sxt[k] += d * dT;
    }
    stt += dT * dT;
  }
  ThermalFit result;
  result.stdev = squareRoots(divided<kAxes>(sxx, static_cast<float>(temperatures.size() - 1)));
  result.scale = divided<kAxes>(sxt, stt);
  for (float& element : result.scale) element = withPlainNan(element);
  for (std::size_t k = 0; k < kAxes; ++k) {
    result.bias.push_back(mean.reading[k] - result.scale[k] * mean.temperature);
  }
  result.residualStdev = squareRoots(residualVariance<kAxes>(samples, temperatures, result));
  return result;
}

}  // namespace

ThermalFit fitThermal(const std::vector<Sample>& samples, const std::vector<float>& temperatures,
                      std::size_t axes) {
  switch (axes) {
    case 1:
      return fit<1>(samples, temperatures);
    case 2:
      return fit<2>(samples, temperatures);
    default:
      return fit<kMaxThermalAxes>(samples, temperatures);
  }
}

std::vector<std::size_t> uncorrelatedAxes(const ThermalFit& fit) {
  std::vector<std::size_t> axes;
  for (std::size_t k = 0; k < std::min(fit.stdev.size(), fit.residualStdev.size()); ++k) {
    if (fit.stdev[k] < fit.residualStdev[k]) axes.push_back(k);
  }
  return axes;
}

bool isConstantTemperature(const std::vector<float>& temperatures) {
  return std::all_of(temperatures.begin(), temperatures.end(),
                     [&](float temperature) { return temperature == temperatures.front(); });
}

void mergeWithPrevious(const SampleData& previousScale, SampleData* scale, SampleData* bias) {
  *scale += previousScale;
  SampleData factor;
  factor.resize(bias->size());
  std::fill(factor.begin(), factor.end(), 1.0F);
  *bias *= factor - previousScale;
}
