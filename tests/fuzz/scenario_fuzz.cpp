// Any text as a scenario, and as overrides of one: up to the first zero byte the scenario, then one override
// between zero bytes each. It is refused with a reason, or is a scenario that a hub can be made of.
#include <string>
#include <vector>

#include "fuzz/FuzzCheck.h"
#include "simhub/Scenario.h"

namespace {

/// No folder: a scenario that extends a file finds none.
constexpr const char* kSource = "/nonexistent/fuzz.toml";

std::vector<std::string> pieces(const std::uint8_t* data, std::size_t size) {
  std::vector<std::string> texts(1);
  for (std::size_t i = 0; i < size; ++i) {
    if (data[i] == 0) {
      texts.emplace_back();
    } else {
      texts.back() += static_cast<char>(data[i]);
    }
  }
  return texts;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  using fuzz::check;
  std::vector<std::string> overrides = pieces(data, size);
  const std::string text = overrides.front();
  overrides.erase(overrides.begin());
  simhub::Scenario scenario;
  std::string error;
  if (!simhub::parseScenario(text, kSource, overrides, &scenario, &error)) {
    check(!error.empty(), "a scenario that is refused is refused with a reason");
    return 0;
  }
  check(error.empty(), "a scenario that is taken has no faults found");
  for (const simhub::SensorConfig& sensor : scenario.sensors) {
    check(!sensor.key.empty(), "every sensor has a name");
    check(sensor.ranges.empty() || sensor.selectedRange < sensor.ranges.size(),
          "a selected range is one of them");
    for (const double rate : sensor.rates) check(rate > 0, "a sensor's rates are above zero");
  }
  return 0;
}
