// docs/simulator.md shows the tables that the simulated hub goes by.
#include <fstream>
#include <iterator>
#include <sstream>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "simhub/Fault.h"
#include "simhub/Scenario.h"
#include "simhub/SensorModels.h"
#include "simhub/World.h"

namespace {

using testing::HasSubstr;

std::string documentation() {
  std::ifstream file(VANTLE_SOURCE_DIR "/docs/simulator.md");
  return {std::istreambuf_iterator<char>(file), {}};
}

TEST(Documentation, HasEveryFaultWithItsKeysAndItsSentence) {
  const std::string text = documentation();
  for (const simhub::FaultKindRow& row : simhub::faultKinds()) {
    std::string keys;
    std::istringstream words(row.keys);
    for (std::string key; words >> key;) keys += (keys.empty() ? "`" : ", `") + key + "`";
    EXPECT_THAT(text, HasSubstr("| `" + std::string(row.name) + "` | " + keys + " | " + row.meaning + " |"));
  }
}

TEST(Documentation, HasEverySignalOfTheWorld) {
  const std::string text = documentation();
  for (const simhub::WorldSignalRow& row : simhub::worldSignals()) {
    EXPECT_THAT(text, HasSubstr("| `" + std::string(row.name) + "` | " + std::to_string(row.dimension) +
                                " | " + row.unit + " | "));
    EXPECT_THAT(text, HasSubstr(std::string("| ") + row.meaning + " |"));
  }
}

TEST(Documentation, HasEverySensorModel) {
  const std::string text = documentation();
  for (const simhub::SensorModel& model : simhub::sensorModels()) {
    EXPECT_THAT(text, HasSubstr("| `" + std::string(model.name) + "` | " + model.meaning));
  }
}

TEST(Documentation, NamesEveryBuiltInScenario) {
  const std::string text = documentation();
  for (const std::string& name : simhub::builtInScenarios()) EXPECT_THAT(text, HasSubstr("`" + name + "`"));
}

}  // namespace
