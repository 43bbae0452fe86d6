#include "framework/Notifier.h"

#include <string>
#include <vector>

#include "ssc/Log.h"

namespace {

std::string makeNotification(const ssc::SensorUid& suid) {
  sns_client_request_msg request = ssc::Client::MakeRequest(suid);
  request.set_msg_id(ssc::kCalibrationChangedRequest);
  request.mutable_request();
  return request.SerializeAsString();
}

}  // namespace

int Notifier::NotifyCalibrationCompleted(const ssc::SensorUid& suid) {
  return NotifyCalibrationCompleted(std::set<ssc::SensorUid>{suid});
}

int Notifier::NotifyCalibrationCompleted(const std::set<ssc::SensorUid>& suids) {
  if (suids.empty()) return ssc::kOk;
  std::vector<std::string> requests;
  requests.reserve(suids.size());
  for (const ssc::SensorUid& suid : suids) requests.push_back(makeNotification(suid));
  {
    const std::lock_guard<std::mutex> guard(mutex);
    pending_ = suids;
  }
  return SendRequestsAndWait(requests, kConfirmationTimeout, nullptr);
}

void Notifier::OnEvent(const sns_client_event_msg& message) {
  constexpr const char* kFunction = "virtual void Notifier::OnEvent(const sns_client_event_msg &)";
  ssc::logFunc(kFunction, "-->");
  const std::lock_guard<std::mutex> guard(mutex);
  for (const auto& event : message.events()) {
    if (event.msg_id() != ssc::kCalibrationChangedReply) continue;
    pending_.erase(ssc::SensorUid(message.suid()));
    if (!pending_.empty()) continue;
    status = ssc::kOk;
    condition.notify_all();
    break;
  }
  ssc::logFunc(kFunction, "<--");
}
