// One connection to the hub, shared by any number of clients.
//
// Threads: the connection has one event thread, which calls the clients' handlers, one after the other, in
// the order in which things came in. Taking datagrams off the wire is a role that one thread at a time has:
// the event thread when it is idle, otherwise a thread that waits for the response to its request. So a
// response never waits for a handler (which may itself be waiting for a mutex that the requesting thread
// holds), and a handler may send requests itself. What comes in for clients meanwhile is kept in order for
// the event thread.
//
// Who gets an event: every client that was registered when the event came in, still is, and has ever sent a
// request to the event's sensor; in the order of their registrations.
#pragma once

#include <cstdint>
#include <deque>
#include <map>
#include <memory>
#include <mutex>
#include <set>
#include <string>
#include <thread>
#include <vector>

#include "proto/sns_client.pb.h"
#include "ssc/Clock.h"
#include "ssc/Response.h"
#include "ssc/SensorUid.h"
#include "ssc/transport/Transport.h"

namespace ssc {

class Client;

class Connection {
 public:
  /// How long a request waits for its QMI response.
  static constexpr std::chrono::seconds kResponseTimeout{3};

  /// Connects to the hub that the environment names; `embeddedHub` makes the hub of "sim" (a program without
  /// a simulator passes none). 0, and the caller owns `*out`; or a negative result after a level-0 message.
  static int Create(Connection** out, const EmbeddedHubFactory& embeddedHub = nullptr);

  /// A connection over a link that is open already.
  static std::unique_ptr<Connection> Over(HubLink link);

  Connection(const Connection&) = delete;
  Connection& operator=(const Connection&) = delete;
  /// No client of the connection may be left.
  virtual ~Connection();

  /// Starts delivery to the client's handlers. Registering twice changes nothing.
  void RegisterClient(Client* client);

  /// Ends delivery. On return no handler of the client is running, unless it is a handler that calls this.
  /// The caller holds no mutex that the client's handlers take.
  void UnregisterClient(Client* client);

  /// Sends an encoded sns_client_request_msg for `client` and waits for the QMI response. `response` may be
  /// null. 0; kIoError when the hub refused; kTimedOut without a response in time; kNotConnected when the
  /// connection is down or goes down meanwhile; kInvalid when the request does not parse or does not fit a
  /// datagram.
  int SendRequest(Client* client, const std::string& request, Response* response);

  /// Forgets the client. To be called when it is destroyed; ends delivery as UnregisterClient does.
  void RemoveClient(Client* client);

  [[nodiscard]] Clock& clock() { return *clock_; }

  /// Held by whoever asks the hub for something that is answered by an event, until the answer.
  [[nodiscard]] std::mutex& exchangeTurn() { return exchangeTurn_; }

  /// Datagrams that were dropped because they were malformed.
  [[nodiscard]] std::uint64_t malformedCount() const;

 private:
  struct ClientState {
    std::uint64_t registration = 0;  ///< number of its registration; 0: not registered
    std::set<SensorUid> sensors;     ///< that it has sent requests to
  };
  struct Recipient {
    Client* client;
    std::uint64_t registration;
  };
  /// Something for handlers. `event` is used by kDatagram only.
  struct Delivery {
    Incoming::Kind kind;
    std::vector<Recipient> recipients;
    sns_client_event_msg event;
  };
  struct PendingRequest {
    bool done = false;
    int result = 0;
    Response response;
  };
  using Lock = std::unique_lock<std::mutex>;

  explicit Connection(HubLink link);

  void runEventThread();
  /// Takes the reader's role, which must be free, and takes one thing off the wire, waiting until `deadline`:
  /// responses go to their requests, the rest into `queue_`. `lock` is released meanwhile.
  Transport::Outcome readOne(Lock& lock, Clock::TimePoint deadline, Incoming* incoming);
  void waitForChange(Lock& lock, Clock::Duration timeout);
  void announceChange();
  void sortIncoming(const Incoming& incoming);
  void sortResponse(const qmi::Response& response);
  void sortReport(const qmi::Report& report);
  /// The clients stand in a map by address, which differs from run to run.
  static void sortByRegistration(std::vector<Recipient>* recipients);
  void dropMalformed(const char* what);
  void connectionChanged(Incoming::Kind kind);
  [[nodiscard]] std::unique_ptr<Delivery> takeSpare();
  /// Calls the handlers of the queue's first delivery.
  void deliverNext(Lock& lock);
  [[nodiscard]] bool stillRegistered(const Recipient& recipient) const;
  [[nodiscard]] std::uint16_t nextTransaction();
  int awaitResponse(Lock& lock, const PendingRequest& pending);

  const std::unique_ptr<Clock> clock_;
  const std::unique_ptr<Transport> transport_;

  std::mutex exchangeTurn_;

  mutable std::mutex mutex_;  ///< guards all below; never held while a handler or a transport runs
  Condition changed_;
  bool stopping_ = false;
  bool up_ = true;
  bool reading_ = false;  ///< a thread has the reader's role
  int waiting_ = 0;       ///< threads that wait for `changed_`
  std::uint16_t lastTransaction_ = 0;
  std::uint64_t lastRegistration_ = 0;
  std::uint64_t malformed_ = 0;
  std::map<Client*, ClientState> clients_;
  std::map<std::uint16_t, PendingRequest*> pending_;
  std::deque<std::unique_ptr<Delivery>> queue_;
  std::vector<std::unique_ptr<Delivery>> spare_;  ///< used deliveries, kept for their buffers
  Client* handling_ = nullptr;                    ///< whose handler runs

  std::thread eventThread_;
};

}  // namespace ssc
