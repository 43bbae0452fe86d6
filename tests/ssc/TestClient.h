// A client that keeps what its handlers are given and ends its wait when a test's condition holds.
#pragma once

#include <functional>
#include <string>
#include <utility>
#include <vector>

#include "ssc/Client.h"
#include "ssc/Wire.h"

namespace ssctest {

/// Sensors of these tests.
inline const ssc::SensorUid kSensor{1, 10};
inline const ssc::SensorUid kOtherSensor{2, 20};

class TestClient : public ssc::Client {
 public:
  explicit TestClient(ssc::Connection* hubConnection) : Client(hubConnection) {}
  ~TestClient() override { connection->UnregisterClient(this); }

  void OnEvent(const sns_client_event_msg& message) override {
    const std::lock_guard<std::mutex> guard(mutex);
    messages_.push_back(message);
    for (const auto& one : message.events()) values_.push_back(sampleValue(one));
    if (onEvent) onEvent(message);
    endWhenReached();
  }
  void OnDisconnect() override {
    const std::lock_guard<std::mutex> guard(mutex);
    changes_ += 'd';
    endWhenReached();
  }
  void OnReconnect() override {
    const std::lock_guard<std::mutex> guard(mutex);
    changes_ += 'r';
    if (onReconnect) onReconnect();
    endWhenReached();
  }

  void Register() { connection->RegisterClient(this); }
  void Unregister() { connection->UnregisterClient(this); }

  /// While registered: waits until `reached` holds, checked under the mutex. False when `patience` ran out.
  bool WaitUntil(const std::function<bool()>& reached, ssc::Clock::Duration patience) {
    std::unique_lock<std::mutex> lock(mutex);
    const auto deadline = ssc::saturatingAdd(connection->clock().now(), patience);
    while (!reached()) {
      const auto left = deadline - connection->clock().now();
      if (left <= ssc::Clock::Duration::zero()) return false;
      connection->clock().wait(condition, lock, left);
    }
    return true;
  }
  bool WaitForValues(std::size_t count, ssc::Clock::Duration patience) {
    return WaitUntil([&] { return values_.size() >= count; }, patience);
  }
  bool WaitForChanges(const std::string& changes, ssc::Clock::Duration patience) {
    return WaitUntil([&] { return changes_ == changes; }, patience);
  }

  [[nodiscard]] std::vector<float> values() {
    const std::lock_guard<std::mutex> guard(mutex);
    return values_;
  }
  [[nodiscard]] std::vector<sns_client_event_msg> messages() {
    const std::lock_guard<std::mutex> guard(mutex);
    return messages_;
  }
  /// One letter for each: 'd' disconnected, 'r' reconnected.
  [[nodiscard]] std::string changes() {
    const std::lock_guard<std::mutex> guard(mutex);
    return changes_;
  }

  // Called on the event thread with the mutex held. To be set while the client is not registered.
  std::function<void(const sns_client_event_msg&)> onEvent;
  std::function<void()> onReconnect;
  bool wakeAlways = true;  ///< false: only End() wakes a waiter

  // For those functions and for WaitUntil's, with the mutex held.
  [[nodiscard]] const std::vector<float>& heldValues() const { return values_; }
  void End(int result) {
    status = result;
    condition.notify_all();
  }
  void SetStatus(int result) { status = result; }
  std::mutex& clientMutex() { return mutex; }
  ssc::Condition& clientCondition() { return condition; }

 private:
  /// Wakes WaitUntil, which looks for itself; an episode of SendRequestsAndWait must not be ended by it.
  void endWhenReached() {
    if (wakeAlways) condition.notify_all();
  }

  std::vector<sns_client_event_msg> messages_;
  std::vector<float> values_;
  std::string changes_;
};

/// `count` values 0, 1, 2, … as stream() makes them.
inline std::vector<float> countUp(int count) {
  std::vector<float> values;
  for (int i = 0; i < count; ++i) values.push_back(static_cast<float>(i));
  return values;
}

}  // namespace ssctest
