// Any bytes in the place of the file between the steps of a color calibration, and what the last step would
// make of them.
#include <cmath>
#include <string>
#include <vector>

#include "framework/DataFile.h"
#include "framework/Fits.h"
#include "fuzz/FuzzCheck.h"
#include "light/ColorFit.h"
#include "light/ColorRecord.h"

namespace {

using fuzz::check;

void fit(const ColorPoints& points) {
  SampleData line;
  const bool fitted = linearFit(points, &line);
  check(line.size() == (fitted ? 2U : 0U), "a line has two coefficients, none has none");
  check(!points.empty() || !fitted, "nothing makes no line");
}

void isPlain(float value) { check(!std::isnan(value) || !std::signbit(value), "not-a-numbers are plain"); }

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  constexpr std::size_t kRecord = 36;
  const std::string content(data, data + size);
  std::vector<SampleData> records;
  const FileResult result = splitFloatRecords(content, color_record::kCount, &records);
  check(records.size() == size / kRecord, "every whole record is one");
  check((result == FileResult::kOk) == (size % kRecord == 0), "a torn record is noticed");
  std::string again;
  for (const SampleData& record : records) appendFloats(record, &again);
  check(again == content.substr(0, again.size()), "records keep every bit");
  if (records.empty()) return 0;

  isPlain(irCrosstalk(records.front()));
  for (const SampleData& record : records) {
    const auto ratio = irRatio(records.front(), record);
    check(ratio.has_value() == (record[color_record::kClear] > 0), "the ratio needs clear light");
    isPlain(ratio.value_or(0));
  }
  isPlain(meanLuxScale(records));
  isPlain(meanBmScale(records));
  for (const ColorPoints& points :
       {blueRedPoints(records), minusBlueRedPoints(records), blueClearPoints(records)}) {
    check(points.size() <= records.size(), "a record makes a point at most");
    fit(points);
  }
  return 0;
}
