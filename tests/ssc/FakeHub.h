// A hub in simulated time that does what a test's script says, and keeps what it was asked.
#pragma once

#include <algorithm>
#include <map>
#include <memory>
#include <mutex>
#include <utility>
#include <vector>

#include "ssc/Connection.h"
#include "ssc/Results.h"
#include "ssc/Wire.h"
#include "ssc/transport/EmbeddedHub.h"

namespace ssctest {

/// What reached the hub; a test may look at it while the hub runs.
class Record {
 public:
  void add(const Request& request) {
    const std::lock_guard<std::mutex> guard(mutex_);
    requests_.push_back(request);
  }
  [[nodiscard]] std::vector<Request> requests() const {
    const std::lock_guard<std::mutex> guard(mutex_);
    return requests_;
  }

 private:
  mutable std::mutex mutex_;
  std::vector<Request> requests_;
};

class FakeHub final : public ssc::EmbeddedHub {
 public:
  /// `onStart`: what the hub does without being asked.
  FakeHub(Script script, std::shared_ptr<Record> record, const Outgoings& onStart = {})
      : script_(std::move(script)), record_(std::move(record)) {
    schedule(onStart);
  }

  [[nodiscard]] int Submit(qmi::Bytes datagram) override {
    if (!up_) return ssc::kNotConnected;
    const auto decoded = qmi::decodeRequest(datagram);
    if (!decoded) return ssc::kInvalid;
    Request request{decoded->transactionId, decoded->reportType, {}};
    if (!request.message.ParseFromArray(decoded->payload.data(), static_cast<int>(decoded->payload.size())))
      return ssc::kInvalid;
    record_->add(request);
    schedule(script_(request));
    return ssc::kOk;
  }

  [[nodiscard]] bool RunUntil(ssc::Clock::TimePoint limit, ssc::Incoming* incoming) override {
    if (agenda_.empty() || agenda_.begin()->first > limit) {
      if (limit != ssc::Clock::TimePoint::max()) now_ = limit;
      return false;
    }
    auto next = agenda_.extract(agenda_.begin());
    now_ = std::max(now_, next.key());
    incoming->kind = next.mapped().kind;
    incoming->datagram = std::move(next.mapped().bytes);
    if (incoming->kind != ssc::Incoming::Kind::kDatagram) up_ = incoming->kind == ssc::Incoming::Kind::kUp;
    return true;
  }

  [[nodiscard]] ssc::Clock::TimePoint Now() const override { return now_; }

 private:
  void schedule(const Outgoings& outgoings) {
    for (const Outgoing& outgoing : outgoings) agenda_.emplace(now_ + outgoing.after, outgoing);
  }

  const Script script_;
  const std::shared_ptr<Record> record_;
  ssc::Clock::TimePoint now_{};
  bool up_ = true;
  std::multimap<ssc::Clock::TimePoint, Outgoing> agenda_;  // things of one time stay in the order given
};

/// A connection to such a hub.
struct SimulatedRig {
  explicit SimulatedRig(Script script, const Outgoings& onStart = {})
      : record(std::make_shared<Record>()),
        connection(ssc::Connection::Over(
            ssc::makeEmbeddedLink(std::make_unique<FakeHub>(std::move(script), record, onStart)))) {}

  [[nodiscard]] std::vector<Request> requests() const { return record->requests(); }
  [[nodiscard]] ssc::Clock::TimePoint now() const { return connection->clock().now(); }

  std::shared_ptr<Record> record;
  std::unique_ptr<ssc::Connection> connection;
};

}  // namespace ssctest
