// Any bytes in the place of the file between the steps of a calibration of the light sensor under the
// display, and what the last step would make of them.
#include <cmath>
#include <string>
#include <vector>

#include "fuzz/FuzzCheck.h"
#include "light/TruncateToInt.h"
#include "light/UdAlsDelay.h"
#include "light/UdAlsFiles.h"
#include "light/UdAlsGain.h"
#include "light/UdAlsLux.h"
#include "light/UdAlsPattern.h"
#include "light/UdAlsPwm.h"

namespace {

using fuzz::check;

void isPlain(float value) { check(!std::isnan(value) || !std::signbit(value), "not-a-numbers are plain"); }

void moveDisplay(const std::vector<SampleData>& records) {
  SampleData fit;
  const bool isFitted = fitDelay(records, &fit);
  check(isFitted == (records.size() >= 3), "three records make a parabola");
  if (!isFitted) return;
  const float vertex = vertexOf(fit);
  isPlain(vertex);
  const float rounded = roundedToThreeDecimals(vertex);
  check(!std::isnan(vertex) || std::isnan(rounded), "no number comes of none");
  const std::string table = calibratedTe2Table(vertex);
  check(table.rfind("2055 ", 0) == 0 && table.find(" 2354 13 2354 13") != std::string::npos,
        "the table is whole");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  constexpr std::size_t kRecord = 48;
  const std::string content(data, data + size);
  std::vector<SampleData> records;
  const FileResult result = splitFloatRecords(content, kUdAlsRecordValues, &records);
  check(records.size() == size / kRecord, "every whole record is one");
  check((result == FileResult::kOk) == (size % kRecord == 0), "a torn record is noticed");
  if (records.empty()) return 0;

  isPlain(udAlsLuxScale(records));
  const float boundary = pwmBoundary(records);
  if (std::isfinite(boundary))
    check(std::fabs(boundary) >= 2147483648.0F || std::fabs(static_cast<double>(truncateToInt(boundary))) <=
                                                      std::fabs(static_cast<double>(boundary)),
          "cutting goes towards 0");
  for (std::size_t channel = kUdAlsMeanClear; channel <= kUdAlsMeanInfrared; ++channel) {
    for (const float ratio : gainRatios(meansByGain(records, channel))) isPlain(ratio);
    SampleData line;
    const bool isFitted = fitPattern(records, channel, &line);
    check(line.size() == (isFitted ? 2U : 0U), "a line has two coefficients, none has none");
    for (const float coefficient : line) isPlain(coefficient);
  }
  moveDisplay(records);
  return 0;
}
