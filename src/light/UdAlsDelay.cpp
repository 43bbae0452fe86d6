#include "light/UdAlsDelay.h"

#include <array>
#include <cmath>
#include <cstdio>

#include "framework/Fits.h"
#include "framework/Statistics.h"
#include "light/TruncateToInt.h"
#include "light/UdAlsFiles.h"

namespace {

/// From the first edge to the second, in lines of the display.
constexpr float kEdgeDistance = 1183;
/// Eight numbers of at most eleven characters and the blanks between them.
constexpr std::size_t kLongestTable = 96;

}  // namespace

bool fitDelay(const std::vector<SampleData>& records, SampleData* coefficients) {
  std::vector<std::pair<float, float>> points;
  points.reserve(records.size());
  for (const SampleData& record : records) points.emplace_back(record[kUdAlsDelay], record[kUdAlsMeanClear]);
  return quadraticFit(points, coefficients);
}

float vertexOf(const SampleData& coefficients) {
  const auto linear = static_cast<double>(coefficients[1]);
  const auto quadratic = static_cast<double>(coefficients[2]);
  return withPlainNan(static_cast<float>(-0.5 * linear / quadratic));
}

float roundedToThreeDecimals(float delay) {
  constexpr float kPerMillisecond = 1000;
  return std::round(delay * kPerMillisecond) / kPerMillisecond;
}

std::string calibratedTe2Table(float delay) {
  std::array<char, kLongestTable> text;
  std::snprintf(text.data(), text.size(), "2055 %d 3240 %d 2354 13 2354 13",
                truncateToInt(delay - kEdgeDistance), truncateToInt(delay));
  return text.data();
}

std::string te2Table(unsigned risingEdge, unsigned fallingEdge) {
  std::array<char, kLongestTable> text;
  std::snprintf(text.data(), text.size(), "%04u %04u %04u %04u %04u %04u %04u %04u", risingEdge, fallingEdge,
                risingEdge, fallingEdge, risingEdge, fallingEdge, risingEdge, fallingEdge);
  return text.data();
}
