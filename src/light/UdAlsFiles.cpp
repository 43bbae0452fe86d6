#include "light/UdAlsFiles.h"

#include <array>
#include <cstdio>

namespace {

// "%f" of the largest float is 39 digits, a point and six more.
constexpr std::size_t kLongestNumber = 64;

std::string number(float value) {
  std::array<char, kLongestNumber> text;
  std::snprintf(text.data(), text.size(), "%f", static_cast<double>(value));
  return text.data();
}

}  // namespace

std::string udAlsLogLine(const UdAlsArguments& arguments, const SampleData& sample) {
  std::string line = number(arguments.referenceLux) + ',' + number(arguments.referenceCct);
  for (std::size_t i = 1; i < kUdAlsSampleValues; ++i) line += ',' + number(sample[i]);
  return line + ',' + arguments.displayColor + ',' + number(arguments.brightness) + '\n';
}

std::string udAlsDelayLogLine(const SampleData& sample, float delay) {
  std::string line;
  for (std::size_t i = 0; i < kUdAlsSampleValues; ++i) line += number(sample[i]) + ',';
  return line + number(delay) + '\n';
}

std::string udAlsRecord(const UdAlsArguments& arguments, float delay, const SampleData& means) {
  std::string record;
  appendFloats({arguments.referenceLux, arguments.referenceCct, delay, arguments.brightness}, &record);
  appendFloats(SampleData(means.begin(), means.begin() + kUdAlsSampleValues), &record);
  return record;
}

FileResult readUdAlsRecords(const std::string& path, std::vector<SampleData>* records) {
  std::string content;
  const FileResult read = readWholeFile(path, kMaxUdAlsDataFileBytes, &content);
  if (read == FileResult::kCannotOpen) return read;
  // What came before an error is kept, and so are the records before one that is torn.
  const FileResult split = splitFloatRecords(content, kUdAlsRecordValues, records);
  return read == FileResult::kOk ? split : read;
}
