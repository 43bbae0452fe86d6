// The command on a hub that a test scripts: one light sensor under the display, whose requests are answered
// as the test says.
#pragma once

#include <cstdlib>
#include <filesystem>
#include <map>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include <gtest/gtest.h>

#include "light/UdAlsCalibrator.h"
#include "support/Capture.h"
#include "support/ScriptedHub.h"
#include "support/TemporaryFolder.h"

class UdAlsCommand : public testing::Test {
 protected:
  using Milliseconds = std::chrono::milliseconds;

  static constexpr const char* kGroup = "chipa_0_platform.als.fac_cal";
  static constexpr const char* kDataFile = "data/app-ephemeral/vantle_als";
  static constexpr const char* kTe2Node = "sys/devices/platform/soc/soc:qcom,dsi-display-primary/te2_table";
  static constexpr std::uint32_t kStream = 513;

  UdAlsCommand() {
    script->sensors = {{light, "ambient_light_raw", "ChipA light sensor"}};
    script->sensors[0].reading = [](int) { return reading(50); };
    script->onRequest = [this](ScriptedHub& hub, const sns_client_request_msg& request) {
      const auto answer = answers.find(request.msg_id());
      if (answer == answers.end() || ssc::SensorUid(request.suid()) != light) return false;
      answer->second(hub);
      return true;
    };
    for (std::uint32_t id = 7800; id <= 7814; id += 2) answerWith(id, {{id + 1, std::string("\x08\x01", 2)}});
    std::filesystem::create_directories(folder.path() / "data/app-ephemeral");
    std::filesystem::create_directories(folder.path() / "persist/sensors");
    ::setenv("VANTLE_ROOT", folder.path().c_str(), 1);
  }
  ~UdAlsCommand() override { ::unsetenv("VANTLE_ROOT"); }

  /// A sample of this lux, with channels of its own.
  static std::vector<float> reading(float lux) { return {lux, 10, 20, 30, 40, 5, 8, 1000}; }

  using Events = std::vector<std::pair<std::uint32_t, std::string>>;

  [[nodiscard]] sns_client_event_msg messageOf(const Events& events) const {
    sns_client_event_msg message;
    light.CopyTo(message.mutable_suid());
    for (const auto& [id, payload] : events) {
      auto* event = message.add_events();
      event->set_msg_id(id);
      event->set_timestamp(19'200'000);
      event->set_payload(payload);
    }
    return message;
  }

  /// The request is answered by one message with these events, after 10 ms.
  void answerWith(std::uint32_t request, const Events& events) {
    answers[request] = [message = messageOf(events)](ScriptedHub& hub) {
      hub.SendMessage(Milliseconds(10), message);
    };
  }
  void staySilent(std::uint32_t request) {
    answers[request] = [](ScriptedHub&) {};
  }

  /// Runs the command with these words behind its own, on a connection of its own.
  Captured run(const std::vector<const char*>& words) {
    std::vector<std::string> owned{"als"};
    owned.insert(owned.end(), words.begin(), words.end());
    std::vector<char*> argv;
    for (std::string& word : owned) argv.push_back(word.data());
    argv.push_back(nullptr);
    Calibrator::Arguments arguments = globals;
    arguments.command = "als";
    arguments.argc = static_cast<std::int32_t>(owned.size());
    arguments.argv = argv.data();
    calibrator.reset();
    connection = connectTo(script);
    calibrator = std::make_unique<UdAlsCalibrator>(connection.get());
    return capture([&] { return calibrator->Run(arguments); });
  }

  [[nodiscard]] Milliseconds elapsed() const {
    return std::chrono::duration_cast<Milliseconds>(connection->clock().now().time_since_epoch());
  }
  [[nodiscard]] std::string content(const std::string& path) const {
    return support::readFile(folder.path() / path).value_or("(none)");
  }
  void give(const std::string& path, const std::string& bytes) const {
    ASSERT_TRUE(support::writeFile(folder.path() / path, bytes));
  }
  [[nodiscard]] static Calibrator::Arguments onT5h5() {
    Calibrator::Arguments arguments;
    arguments.deviceType = DeviceType::t5h5;
    arguments.quiet = true;
    return arguments;
  }

  const ssc::SensorUid light{1, 1};
  std::shared_ptr<HubScript> script = std::make_shared<HubScript>();
  std::map<std::uint32_t, std::function<void(ScriptedHub&)>> answers;
  support::TemporaryFolder folder;
  Calibrator::Arguments globals = onT5h5();
  std::unique_ptr<ssc::Connection> connection;
  std::unique_ptr<UdAlsCalibrator> calibrator;
};
