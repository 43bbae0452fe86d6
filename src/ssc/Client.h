// A client of the sensor hub: whatever sends requests to sensors and handles their events.
#pragma once

#include <chrono>
#include <cstdint>
#include <mutex>
#include <string>
#include <vector>

#include "proto/sns_client.pb.h"
#include "ssc/Clock.h"
#include "ssc/Connection.h"
#include "ssc/MessageIds.h"
#include "ssc/Response.h"
#include "ssc/Results.h"
#include "ssc/SensorUid.h"

namespace ssc {

class Client {
 public:
  explicit Client(Connection* connection);
  Client(const Client&) = delete;
  Client& operator=(const Client&) = delete;

  // Called on the connection's event thread while the client is registered, one at a time.
  virtual void OnEvent(const sns_client_event_msg& message) = 0;
  virtual void OnReconnect() {}   ///< the hub is back; it has forgotten every request
  virtual void OnDisconnect() {}  ///< the hub went away
  /// A client that is still registered here is taken off, but its own handlers are gone by then: unregister
  /// before.
  virtual ~Client();

  /// A request to a sensor, complete but for msg_id and payload.
  [[nodiscard]] static sns_client_request_msg MakeRequest(const SensorUid& suid);
  /// An encoded request to stream at `rateHz`, or, when that is not above 0, to report on change. A batch
  /// period of 0 µs asks for no batching.
  [[nodiscard]] static std::string MakeConfigRequest(const SensorUid& suid, float rateHz,
                                                     std::uint32_t batchPeriodUs);
  [[nodiscard]] static std::string MakeDisableRequest(const SensorUid& suid);
  /// An encoded factory test, which also makes a sensor read its calibration again.
  [[nodiscard]] static std::string MakeFactoryTestRequest(const SensorUid& suid);

  /// Sends one encoded request and waits for its response, not for what it brings. `response` may be null.
  /// Results: see Connection::SendRequest.
  int SendRequest(const std::string& request, Response* response = nullptr);
  /// Sends each request after the response to the one before it, up to the first that fails, whose result
  /// is returned. `responses` may be null.
  int SendRequests(const std::vector<std::string>& requests, std::vector<Response>* responses);

  /// One episode: registers this client, sends the requests with its mutex held, waits once for a handler to
  /// notify `condition` or for `timeout` to pass, unregisters. A failed send is the result; kTimedOut when at
  /// least `timeout` has passed (at once for one that is not above 0); else `status`. There is one wait and
  /// no predicate: a spurious wake-up ends the episode early with the status.
  template <class Rep, class Period>
  int SendRequestsAndWait(const std::vector<std::string>& requests,
                          const std::chrono::duration<Rep, Period>& timeout,
                          std::vector<Response>* responses) {
    return sendRequestsAndWaitFor(requests, saturatingNanoseconds(timeout), responses);
  }

 protected:
  Connection* const connection;
  std::mutex mutex;     ///< held by handlers, and by the command's thread except while it waits
  Condition condition;  ///< notified by a handler that ends the wait
  int status = 0;       ///< guarded by mutex: result of a wait that was ended by a handler

  /// Whether the last episode came to its wait. kTimedOut may also be a request that nobody responded to;
  /// what events of the other requests left behind then is worth nothing.
  [[nodiscard]] bool waited() const { return waited_; }

 private:
  int sendRequestsAndWaitFor(const std::vector<std::string>& requests, Clock::Duration timeout,
                             std::vector<Response>* responses);

  bool waited_ = false;  ///< the command's thread only
};

}  // namespace ssc
