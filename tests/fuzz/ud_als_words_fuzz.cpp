// Any words behind "als" on a handset whose light sensor is under the display: they are refused with a
// message, or every number lies in its range and a scan of delays comes to its end.
#include <algorithm>
#include <cmath>
#include <string>
#include <vector>

#include "fuzz/FuzzCheck.h"
#include "light/UdAlsArguments.h"
#include "light/UdAlsRequests.h"

namespace {

using fuzz::check;

/// The input's lines.
std::vector<std::string> splitLines(const std::string& text) {
  std::vector<std::string> lines;
  for (std::size_t at = 0; at < text.size();) {
    const std::size_t end = std::min(text.find('\n', at), text.size());
    lines.push_back(text.substr(at, end - at));
    at = end + 1;
  }
  return lines;
}

bool isUnset(float value) { return value == UdAlsArguments::kNotGiven; }
bool isWithin(float value, double least, double most) {
  // A number that was typed at its limit may be rounded across it.
  return isUnset(value) || (value >= std::nextafter(static_cast<float>(least), -1.0F) &&
                            value <= std::nextafter(static_cast<float>(most), 1e9F));
}

void scan(float start, float end, float step) {
  check(std::isfinite(start) && std::isfinite(end) && std::isfinite(step), "a scan has finite ends");
  // Some steps of it: all of a long one would take an hour.
  float delay = start;
  for (int i = 0; i < 100 && delay <= end; ++i) {
    const float next = delay + step;
    check(next > delay, "each step of a scan is felt");
    delay = next;
  }
  if (start <= end) check(end + step > end, "the last step of a scan is felt");
}

void accept(const UdAlsArguments& arguments) {
  check(arguments.gain >= -1 && arguments.gain <= 11, "the gain is in its range");
  check(isWithin(arguments.integrationTime, 0, 182000), "the integration time is in its range");
  check(isWithin(arguments.alsDelay, 0, 16.7), "the delay is in its range");
  check(isWithin(arguments.brightness, 0, 255), "the brightness is in its range");
  check(std::isfinite(arguments.referenceLux) && std::isfinite(arguments.referenceCct),
        "references are finite");
  check(arguments.risingEdgeDelay <= 4095 && arguments.fallingEdgeDelay <= 4095, "edges are in their range");
  if (arguments.mode == UdAlsMode::kDelayCalibration) {
    scan(arguments.delayStart, arguments.delayEnd, arguments.delayStep);
  }
  if (arguments.mode == UdAlsMode::kTe2DelayCalibration) {
    scan(arguments.te2DelayStart, arguments.te2DelayEnd, arguments.te2DelayStep);
  }
  const auto request = udAlsRequestOf(arguments);
  check(!request || !request->payload.empty(), "a request says something");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const std::vector<std::string> lines = splitLines(std::string(data, data + size));
  std::vector<const char*> words;
  for (const std::string& line : lines) words.push_back(line.c_str());
  UdAlsArguments arguments;
  std::size_t firstIgnored = 0;
  const std::string error = parseUdAlsWords(words, &arguments, &firstIgnored);
  check(firstIgnored <= words.size(), "what is ignored is among the words");
  if (error.empty()) accept(arguments);
  return 0;
}
