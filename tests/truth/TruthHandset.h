// A simulated handset whose errors a test has chosen, and whole commands run on it, in this process and in
// simulated time. Its folder stays between commands, so that what one stores the next one finds.
#pragma once

#include <cmath>
#include <cstdlib>
#include <string>
#include <vector>

#include "main/Driver.h"
#include "main/SimulatedHandset.h"
#include "simhub/Hub.h"
#include "simhub/RegistryFiles.h"
#include "simhub/RegistryStore.h"
#include "simhub/RegistryValues.h"
#include "support/Capture.h"
#include "support/TemporaryFolder.h"

class TruthHandset {
 public:
  /// `scenario` is a built-in one; the overrides hold for every run.
  explicit TruthHandset(std::string scenario, std::vector<std::string> overrides = {})
      : scenario_(std::move(scenario)), overrides_(std::move(overrides)) {}

  /// Runs the program with the words behind its name, on the device type of the scenario. Further overrides
  /// hold for this run only.
  Captured Run(const std::vector<std::string>& words, const std::vector<std::string>& overrides = {}) {
    std::string hub = "sim:" + scenario_ + "?";
    for (const std::string& text : overrides_) hub += text + "&";
    for (const std::string& text : overrides) hub += text + "&";
    std::vector<std::string> all{"vantle", "--device", scenario_};
    all.insert(all.end(), words.begin(), words.end());
    std::vector<char*> argv;
    for (std::string& word : all) argv.push_back(word.data());
    argv.push_back(nullptr);

    (void)::setenv("VANTLE_HUB", hub.c_str(), 1);
    (void)::setenv("VANTLE_ROOT", folder_.path().c_str(), 1);
    Captured captured = capture([&] {
      if (!prepareSimulatedHandset(stderr)) return -1;
      return runVantle(static_cast<int>(all.size()), argv.data(), makeEmbeddedHub);
    });
    (void)::unsetenv("VANTLE_HUB");
    (void)::unsetenv("VANTLE_ROOT");
    return captured;
  }

  /// The number that the commands left in the registry: not a number where none of them wrote the group, or
  /// there is no such item at its top.
  [[nodiscard]] double Stored(const std::string& group, const std::string& item) const {
    simhub::RegistryFiles files(simhub::hubFiles(folder_.path()).registryFolder);
    simhub::RegistryStore store(files, {}, [](const std::string&) {});
    store.Load();
    sns_registry_data data;
    if (store.Read(group, &data) != simhub::RegistryStore::Result::kOk) return std::nan("");
    return simhub::registryNumber(data, item).value_or(std::nan(""));
  }

 private:
  support::TemporaryFolder folder_;
  const std::string scenario_;
  const std::vector<std::string> overrides_;
};

/// The numbers behind `label` ("BIAS:") at the start of a line; empty when there is no such line.
[[nodiscard]] inline std::vector<double> numbersAfter(const std::string& label, const std::string& output) {
  std::vector<double> numbers;
  const std::size_t found = ("\n" + output).find("\n" + label);
  if (found == std::string::npos) return numbers;
  const char* at = output.c_str() + found + label.size();
  for (char* end = nullptr; *at != '\n' && *at != '\0'; at = end) {
    numbers.push_back(std::strtod(at, &end));
    if (end == at) return {};
  }
  return numbers;
}
