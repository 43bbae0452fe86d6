#include "prox/ProximityOffsetCommand.h"

#include "proto/sns_oem_proximity.pb.h"
#include "ssc/Log.h"

namespace {

constexpr std::uint32_t kPoffsetRequest = 770;
constexpr std::uint32_t kPoffsetAnswer = 771;

}  // namespace

int ProximityOffsetCommand::RequestPoffset(OffsetTask task) {
  const bool enables = task == OffsetTask::kPoffsetEnable;
  ssc::say("%s POFFSET calibration...\n", enables ? "Enabling" : "Disabling");
  sns_oem_poffset_req request;
  request.set_enable(enables ? SNS_OEM_PROXIMITY_MODE_ENABLE : SNS_OEM_PROXIMITY_MODE_DISABLE);
  return RequestSwitch(kPoffsetRequest, request.SerializeAsString(), "POFFSET request failed");
}

int ProximityOffsetCommand::RequestSwitch(std::uint32_t messageId, const std::string& payload,
                                          const char* failure) {
  sns_client_request_msg request = MakeRequest(suid_);
  request.set_msg_id(messageId);
  request.mutable_request()->set_payload(payload);
  const int result = AskSensor(request);
  if (result != ssc::kOk) ssc::log(ssc::kLogError, "%s", failure);
  return result;
}

int ProximityOffsetCommand::RequireReadings() const {
  return RequireSamples(suid_, static_cast<std::size_t>(sums_.count));
}

void ProximityOffsetCommand::PrintRawAverage() const {
  ssc::say("\nADC_AVG: %14.6f\n", static_cast<double>(sums_.MeanRaw()));
}

void ProximityOffsetCommand::HandleEvents(const char* function, const sns_client_event_msg& message) {
  ssc::logFunc(function, "-->");
  const std::lock_guard<std::mutex> guard(mutex);
  if (takeEvents(message)) condition.notify_all();
  ssc::logFunc(function, "<--");
}

bool ProximityOffsetCommand::takeEvents(const sns_client_event_msg& message) {
  if (!IsFromSensor(message) || sums_.count >= samplesToCollect_) return false;
  for (const auto& event : message.events()) {
    LogErrorEvent(ssc::SensorUid(message.suid()), event);
    if (event.msg_id() != kProximityEvent) {
      if (OnAnswer(event.msg_id(), event.payload())) return true;
      continue;
    }
    if (awaitsAnswer) continue;
    const sns_proximity_event* const reading = ParseReading(event.payload());
    if (reading == nullptr || OnProxEvent(*reading, event.timestamp())) return true;
  }
  return false;
}

bool ProximityOffsetCommand::TakeReading(const sns_proximity_event& reading, std::uint64_t timestamp) {
  if (!quiet) ssc::say("%s", readingLine(reading, timestamp, rangeHigh_).c_str());
  sums_.Add(reading);
  return sums_.count >= samplesToCollect_;
}

bool ProximityOffsetCommand::OnAnswer(std::uint32_t messageId, const std::string& payload) {
  if (messageId != kPoffsetAnswer) return false;
  TakeAnswer<sns_oem_poffset_resp>(payload, {.message = "poffset", .shown = "POFFSET"});
  return true;
}

void ProximityOffsetCommand::reportAnswer(bool parses, bool success, bool isEnabled, const SwitchName& name) {
  ssc::log(ssc::kLogDebug, "Got a response");
  if (!parses) {
    ssc::log(ssc::kLogError, "Received malformed %s response", name.message);
    status = ssc::kMalformed;
  } else if (!success) {
    // The state that is still in force, and so the opposite of what was asked for: an old slip that stays.
    ssc::log(ssc::kLogError, "Failed to %s %s", isEnabled ? "enable" : "disable", name.shown);
  } else {
    ssc::say("%s %s.\n", name.shown, isEnabled ? "enabled" : "disabled");
  }
}
