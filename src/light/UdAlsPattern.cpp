#include "light/UdAlsPattern.h"

#include "framework/Fits.h"
#include "framework/Statistics.h"
#include "light/UdAlsFiles.h"

bool fitPattern(const std::vector<SampleData>& records, std::size_t index, SampleData* coefficients) {
  std::vector<std::pair<float, float>> points;
  points.reserve(records.size());
  for (const SampleData& record : records) points.emplace_back(record[kUdAlsBrightness], record[index]);
  if (!linearFit(points, coefficients)) return false;
  for (float& coefficient : *coefficients) coefficient = withPlainNan(coefficient);
  return true;
}
