// A scripted hub for the offset variants of "prox": readings that a test writes down, and answers to their
// requests.
#pragma once

#include <functional>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "framework/Calibrator.h"
#include "proto/sns_oem_proximity.pb.h"
#include "proto/sns_proximity.pb.h"
#include "support/ArgumentWords.h"
#include "support/Capture.h"
#include "support/ScriptedHub.h"

constexpr std::uint32_t kReadingId = 769;

struct ProximityReading {
  std::uint32_t counts = 0;
  std::vector<float> values = {60, 2};  ///< offset and extension
  bool isNear = true;
  sns_std_sensor_sample_status status = SNS_STD_SENSOR_SAMPLE_STATUS_ACCURACY_HIGH;

  [[nodiscard]] std::string Encode() const {
    sns_proximity_event event;
    event.set_proximity_event_type(isNear ? SNS_PROXIMITY_EVENT_TYPE_NEAR : SNS_PROXIMITY_EVENT_TYPE_FAR);
    event.set_raw_adc(counts);
    event.set_status(status);
    for (const float value : values) event.add_data(value);
    return event.SerializeAsString();
  }
};

template <class Answer>
std::string encodeAnswer(bool success, bool isEnabled) {
  Answer answer;
  answer.set_success(success);
  answer.set_enabled(isEnabled);
  return answer.SerializeAsString();
}

/// The message ids and payloads of a message's events.
using Events = std::vector<std::pair<std::uint32_t, std::string>>;

inline Events readings(const std::vector<ProximityReading>& all) {
  Events events;
  for (const ProximityReading& reading : all) events.emplace_back(kReadingId, reading.Encode());
  return events;
}

inline Events readings(std::size_t count, const ProximityReading& reading) {
  return readings(std::vector<ProximityReading>(count, reading));
}

template <class Command>
class OffsetCommandTest : public testing::Test {
 protected:
  explicit OffsetCommandTest(const std::string& dataType) {
    script->sensors = {{sensor, dataType, "ChipA proximity sensor"}};
    script->onRequest = [this](ScriptedHub& hub, const sns_client_request_msg& request) {
      if (ssc::SensorUid(request.suid()) != sensor) return false;
      const auto found = replies.find(request.msg_id());
      if (found == replies.end() || found->second.empty()) return false;
      const std::vector<Events> messages = found->second.front();
      // The last of several stays for every further request.
      if (found->second.size() > 1) found->second.erase(found->second.begin());
      std::chrono::milliseconds delay{0};
      for (const Events& events : messages) {
        hub.SendMessage(delay += std::chrono::milliseconds(1), messageOf(sensor, events));
      }
      return false;
    };
  }

  static sns_client_event_msg messageOf(const ssc::SensorUid& suid, const Events& events) {
    sns_client_event_msg message;
    suid.CopyTo(message.mutable_suid());
    for (const auto& [id, payload] : events) {
      auto* const event = message.add_events();
      event->set_msg_id(id);
      event->set_timestamp(0);
      event->set_payload(payload);
    }
    return message;
  }

  /// The messages that come, one after the other, when the sensor gets a request of that id.
  void reply(std::uint32_t requestId, const std::vector<Events>& messages) {
    replies[requestId].push_back(messages);
  }
  void stream(const std::vector<Events>& messages) { reply(513, messages); }
  void answerPoffset(bool success, bool isEnabled) {
    reply(770, {{{771, encodeAnswer<sns_oem_poffset_resp>(success, isEnabled)}}});
  }
  void answerOre(bool success, bool isEnabled) {
    reply(772, {{{773, encodeAnswer<sns_oem_ore_resp>(success, isEnabled)}}});
  }

  Captured run(std::initializer_list<const char*> words) {
    if (command == nullptr) {
      connection = connectTo(script);
      command = std::make_unique<Command>(connection.get());
    }
    ArgumentWords argumentWords(words);
    arguments.command = "prox";
    arguments.argc = argumentWords.argc();
    arguments.argv = argumentWords.argv();
    return capture([&] { return command->Run(arguments); });
  }

  /// The payload of the only request of that id.
  template <class Request>
  Request requestOf(std::uint32_t id) {
    Request parsed;
    EXPECT_EQ(script->countRequests(sensor, id), 1);
    for (const sns_client_request_msg& request : script->requests) {
      if (request.msg_id() == id && ssc::SensorUid(request.suid()) == sensor) {
        EXPECT_TRUE(parsed.ParseFromString(request.request().payload()));
      }
    }
    return parsed;
  }

  const ssc::SensorUid sensor{1, 1};
  std::map<std::uint32_t, std::vector<std::vector<Events>>> replies;
  std::shared_ptr<HubScript> script = std::make_shared<HubScript>();
  std::unique_ptr<ssc::Connection> connection;
  std::unique_ptr<Command> command;
  Calibrator::Arguments arguments;
};
