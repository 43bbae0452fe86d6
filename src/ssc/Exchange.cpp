#include "ssc/Exchange.h"

namespace ssc {

int Exchange::Run(const SensorUid& suid, const sns_client_request_msg& request, Matcher matcher) {
  const std::lock_guard<std::mutex> turn(connection->exchangeTurn());
  connection->RegisterClient(this);
  std::unique_lock<std::mutex> lock(mutex);
  suid_ = suid;
  matcher_ = std::move(matcher);
  done_ = false;
  int result = SendRequest(request.SerializeAsString());
  if (result == kOk) {
    Clock& clock = connection->clock();
    const auto deadline = saturatingAdd(clock.now(), Clock::Duration(kAnswerTimeout));
    while (!done_ && clock.now() < deadline) clock.wait(condition, lock, deadline - clock.now());
    result = done_ ? status : kTimedOut;
  }
  matcher_ = nullptr;
  lock.unlock();
  connection->UnregisterClient(this);
  return result;
}

void Exchange::OnEvent(const sns_client_event_msg& message) {
  const std::lock_guard<std::mutex> guard(mutex);
  if (done_ || !matcher_ || SensorUid(message.suid()) != suid_) return;
  for (const Event& event : message.events()) {
    const std::optional<int> result = matcher_(event);
    if (!result) continue;
    finish(*result);
    return;
  }
}

void Exchange::OnDisconnect() {
  const std::lock_guard<std::mutex> guard(mutex);
  if (!done_) finish(kNotConnected);
}

void Exchange::finish(int result) {
  status = result;
  done_ = true;
  condition.notify_all();
}

}  // namespace ssc
