#include "light/ColorFit.h"

#include <algorithm>
#include <cmath>

#include "framework/Statistics.h"
#include "light/ColorRecord.h"

namespace {

using namespace color_record;

/// Beyond this many steps every float has become 0 or infinite.
constexpr float kMostSteps = 512;

template <class Term>
float meanOf(const std::vector<SampleData>& records, Term term) {
  float sum = 0;
  for (const SampleData& record : records) sum += term(record);
  return withPlainNan(sum / static_cast<float>(records.size()));
}

}  // namespace

float irCrosstalk(const SampleData& irOnly) {
  return withPlainNan(((irOnly[kRed] + irOnly[kBlue]) / 2.0F) / irOnly[kIr]);
}

std::optional<float> irRatio(const SampleData& irOnly, const SampleData& visible) {
  if (!(visible[kClear] > 0)) return std::nullopt;
  const float difference = visible[kGain] - irOnly[kGain];
  // Whole steps, towards 0; a difference that is not a number makes the ratio one that is not either.
  const float steps = std::clamp(std::trunc(difference), -kMostSteps, kMostSteps);
  const float scaled = std::isnan(steps) ? steps : std::ldexp(irOnly[kIr], static_cast<int>(steps));
  return withPlainNan(scaled / visible[kClear]);
}

float meanLuxScale(const std::vector<SampleData>& records) {
  return meanOf(records, [](const SampleData& record) { return record[kReferenceLux] / record[kLux]; });
}

float meanBmScale(const std::vector<SampleData>& records) {
  return meanOf(records, [](const SampleData& record) {
    return record[kReferenceLux] / ((record[kClear] - record[kRed]) * record[kLux] / record[kClear]);
  });
}

ColorPoints blueRedPoints(const std::vector<SampleData>& records) {
  ColorPoints points;
  for (const SampleData& record : records) {
    if (record[kRed] > 0) points.emplace_back(record[kBlue] / record[kRed], record[kReferenceCct]);
  }
  return points;
}

ColorPoints minusBlueRedPoints(const std::vector<SampleData>& records) {
  ColorPoints points;
  for (const SampleData& record : records) {
    const float minusRed = record[kClear] - record[kRed];
    const float minusBlue = record[kClear] - record[kBlue];
    // Nothing but red counts, with a ratio of 0; nothing but blue would divide by 0.
    if (minusRed >= 0 && minusBlue > 0) points.emplace_back(minusRed / minusBlue, record[kReferenceCct]);
  }
  return points;
}

ColorPoints blueClearPoints(const std::vector<SampleData>& records) {
  ColorPoints points;
  for (const SampleData& record : records) {
    if (record[kClear] > 0) points.emplace_back(record[kBlue] / record[kClear], record[kReferenceCct]);
  }
  return points;
}

bool convertToCct(float q0, float q1, std::vector<Sample>* readings) {
  for (Sample& reading : *readings) {
    SampleData& values = reading.values;
    if (values[color_reading::kRed] <= 0) return false;
    values[color_reading::kCct] = q0 + q1 * values[color_reading::kBlue] / values[color_reading::kRed];
  }
  return true;
}
