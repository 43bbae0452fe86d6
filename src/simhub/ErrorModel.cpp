#include "simhub/ErrorModel.h"

#include <cmath>

namespace simhub {
namespace {

void multiply(const ErrorModel::Matrix& matrix, std::span<double> values) {
  if (values.size() < 3) {
    for (std::size_t i = 0; i < values.size(); ++i) values[i] *= matrix[4 * i];
    return;
  }
  const std::array<double, 3> vector{values[0], values[1], values[2]};
  for (std::size_t row = 0; row < 3; ++row) {
    const double* const element = &matrix[3 * row];
    values[row] = element[0] * vector[0] + element[1] * vector[1] + element[2] * vector[2];
  }
}

}  // namespace

void ErrorModel::Apply(std::span<double> values, double temperature, NoiseGenerator& generator) const {
  multiply(softIron, values);
  multiply(scale, values);
  for (std::size_t i = 0; i < values.size(); ++i) {
    values[i] +=
        bias[i] + temperatureSlope[i] * (temperature - referenceTemperature) + noise[i] * generator.Next();
    if (quantisation > 0) values[i] = std::round(values[i] / quantisation) * quantisation;
  }
}

}  // namespace simhub
