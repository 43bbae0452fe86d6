#include "simhub/Hub.h"

#include <algorithm>
#include <cmath>
#include <cstring>
#include <utility>

#include "proto/sns_client.pb.h"
#include "proto/sns_suid.pb.h"
#include "simhub/Directory.h"
#include "simhub/EventQueue.h"
#include "simhub/FaultPlan.h"
#include "simhub/Outbox.h"
#include "simhub/RegistryFiles.h"
#include "simhub/RegistrySensor.h"
#include "simhub/RegistryStore.h"
#include "simhub/RequestLog.h"
#include "simhub/Streams.h"

namespace simhub {
namespace {

constexpr const char* kRegistryFolder = "/mnt/vendor/persist/sensors/registry/registry";
constexpr const char* kTe2Table = "/sys/devices/platform/soc/soc:qcom,dsi-display-primary/te2_table";

Time later(Time time, Time by) { return time + std::min(by, kNever - std::min(time, kNever)); }

}  // namespace

class Hub::Impl {
 public:
  Impl(Scenario scenario, const HubFiles& files, HubOutput& output, const SensorMaker& makeSensor);

  [[nodiscard]] int OpenLog() { return log_.Open(scenario_.hub.requestLog); }
  [[nodiscard]] const std::string& LogPath() const { return scenario_.hub.requestLog; }

  ClientId AddClient() {
    outbox_.AddClient(++lastClient_);
    return lastClient_;
  }
  void RemoveClient(ClientId client) {
    outbox_.RemoveClient(client);
    streams_.StopClient(client, now_);
  }
  bool HandleDatagram(ClientId client, qmi::Bytes datagram);

  [[nodiscard]] Time Now() const { return now_; }
  [[nodiscard]] bool IsUp() const { return isUp_; }
  [[nodiscard]] const EventQueue& Queue() const { return queue_; }
  void Step();
  void MoveTo(Time time) { now_ = std::max(now_, time); }
  [[nodiscard]] const HubStatistics& Statistics() const { return statistics_; }

 private:
  /// A request on its way through the hub.
  struct Call {
    ClientId client;
    std::uint32_t addressee;  ///< as in the directory
    std::uint32_t messageId;
    const sns_std_request& request;
    Suid suid;
    RequestFaults faults;
  };

  [[nodiscard]] Time answerTime() const {
    return later(later(now_, scenario_.hub.responseLatency), scenario_.hub.answerLatency);
  }

  void malformed(ClientId client, const char* what);
  void carryOut(const Call& call);
  void answer(const Call& call, std::uint32_t messageId, const std::string& payload, Time delay = Time{0});
  void answerError(const Call& call, std::uint32_t error);
  void answerAttributes(const Call& call);
  void lookUp(const Call& call);
  void handleSensor(const Call& call);
  void startStream(const Call& call);
  void test(const Call& call);
  void handleOwn(const Call& call);
  void loadCalibration(Sensor& sensor);
  void reloadCalibration(const Sensor& told);
  void start();
  void goDown(Time back);
  void comeUp();

  const Scenario scenario_;
  HubOutput& output_;
  HubStatistics statistics_;
  Time now_{0};
  bool isUp_ = true;
  ClientId lastClient_ = 0;
  RequestLog log_;
  const Directory directory_;
  EventQueue queue_;
  Outbox outbox_;
  FaultPlan faults_;
  RegistryFiles files_;
  RegistryStore store_;
  RegistrySensor registry_;
  const std::vector<FaultPlan::Departure> departures_;
  Streams streams_;
  sns_client_request_msg message_;  // the request at hand, reused
};

Hub::Impl::Impl(Scenario scenario, const HubFiles& files, HubOutput& output, const SensorMaker& makeSensor)
    : scenario_(std::move(scenario)),
      output_(output),
      directory_(scenario_, files.te2Table, makeSensor),
      outbox_(output, queue_, statistics_, scenario_.hub.startTicks),
      faults_(scenario_.faults, directory_.Names()),
      files_(files.registryFolder),
      store_(files_, scenario_.registry, [&output](const std::string& text) { output.Diagnostic(text); }),
      registry_(store_, files_, faults_),
      departures_(faults_.Departures()),
      streams_(directory_.Sensors(), scenario_.hub, queue_, outbox_, faults_, statistics_) {
  for (std::uint32_t i = 0; i < departures_.size(); ++i) {
    queue_.Push(departures_[i].at, HubEvent::Kind::kDown, i);
  }
  start();
}

// ---- Requests ----

void Hub::Impl::malformed(ClientId client, const char* what) {
  ++statistics_.malformedDatagrams;
  output_.Diagnostic("client " + std::to_string(client) + ": " + what);
}

bool Hub::Impl::HandleDatagram(ClientId client, qmi::Bytes datagram) {
  if (!isUp_ || !outbox_.HasClient(client)) return false;
  const auto request = qmi::decodeRequest(datagram);
  if (!request) {
    malformed(client, "a datagram that is no request is dropped");
    return true;
  }
  const Time responseTime = later(now_, scenario_.hub.responseLatency);
  if (!message_.ParseFromArray(request->payload.data(), static_cast<int>(request->payload.size()))) {
    malformed(client, "a request that cannot be decoded is refused");
    outbox_.Respond(client, request->transactionId, kQmiFailure, kQmiMalformedMessage, responseTime);
    return true;
  }
  ++statistics_.requests;
  const Suid suid = suidOf(message_.suid());
  const std::uint32_t addressee = directory_.Find(suid).value_or(directory_.Count());
  const bool isKnown = addressee < directory_.Count() && !faults_.IsAbsent(addressee, now_);
  log_.Write(now_, isKnown ? directory_.ConfigOf(addressee).key : "unknown",
             isKnown ? directory_.KindOf(addressee) : AddresseeKind::kUnknown, message_);
  if (!isKnown) {
    outbox_.Respond(client, request->transactionId, kQmiFailure, kQmiInvalidId, responseTime);
    return true;
  }
  const Call call{client,
                  addressee,
                  message_.msg_id(),
                  message_.request(),
                  suid,
                  faults_.OnRequest(addressee, message_.msg_id(), now_)};
  if (call.faults.qmiError) {
    outbox_.Respond(client, request->transactionId, kQmiFailure,
                    static_cast<std::uint16_t>(*call.faults.qmiError), responseTime);
    return true;
  }
  if (!call.faults.noResponse) {
    outbox_.Respond(client, request->transactionId, kQmiSuccess, 0,
                    later(responseTime, call.faults.responseDelay));
  }
  if (call.faults.errorEvent) {
    answerError(call, *call.faults.errorEvent);
  } else {
    carryOut(call);
  }
  return true;
}

void Hub::Impl::answer(const Call& call, std::uint32_t messageId, const std::string& payload, Time delay) {
  const Time time = later(answerTime(), delay);
  if (!outbox_.Answer(call.client, call.suid, messageId, payload, time)) {
    output_.Diagnostic(directory_.ConfigOf(call.addressee).key + ": an answer is too large to send");
    answerError(call, SNS_STD_ERROR_FAILED);
  }
}

void Hub::Impl::answerError(const Call& call, std::uint32_t error) {
  sns_std_error_event event;
  event.set_error(sns_std_error_IsValid(static_cast<int>(error)) ? static_cast<sns_std_error>(error)
                                                                 : SNS_STD_ERROR_FAILED);
  (void)outbox_.Answer(call.client, call.suid, kErrorEvent, event.SerializeAsString(), answerTime());
}

void Hub::Impl::carryOut(const Call& call) {
  if (call.messageId == kAttributesRequest) {
    answerAttributes(call);
    return;
  }
  switch (directory_.KindOf(call.addressee)) {
    case AddresseeKind::kSensor:
      handleSensor(call);
      return;
    case AddresseeKind::kLookup:
      if (call.messageId != kDisableRequest) lookUp(call);
      return;
    default:
      if (call.messageId == kDisableRequest) return;
      break;
  }
  const RegistrySensor::Answer reply = registry_.Handle(call.messageId, call.request.payload(), now_);
  if (reply.error != SNS_STD_ERROR_NO_ERROR) {
    answerError(call, static_cast<std::uint32_t>(reply.error));
  } else {
    answer(call, reply.messageId, reply.payload);
  }
}

void Hub::Impl::answerAttributes(const Call& call) {
  // Whether the client wants to be told of changes makes no difference: attributes never change.
  sns_std_attr_req request;
  if (!request.ParseFromString(call.request.payload())) {
    answerError(call, SNS_STD_ERROR_INVALID_TYPE);
    return;
  }
  sns_std_attr_event event;
  describeSensor(directory_.ConfigOf(call.addressee), &event);
  answer(call, kAttributesEvent, event.SerializeAsString());
}

void Hub::Impl::lookUp(const Call& call) {
  sns_suid_req request;
  if (call.messageId != kSuidRequest || !request.ParseFromString(call.request.payload())) {
    answerError(call,
                call.messageId != kSuidRequest ? SNS_STD_ERROR_NOT_SUPPORTED : SNS_STD_ERROR_INVALID_TYPE);
    return;
  }
  sns_suid_event event;
  event.set_data_type(request.data_type());
  for (std::uint32_t i = 0; i < directory_.Count(); ++i) {
    const bool isWanted =
        request.data_type().empty() || request.data_type() == directory_.ConfigOf(i).dataType;
    const bool isEnough = request.default_only() && event.suid_size() > 0;
    if (isWanted && !isEnough && !faults_.IsAbsent(i, now_)) directory_.SuidOf(i).CopyTo(event.add_suid());
  }
  answer(call, kSuidEvent, event.SerializeAsString());
}

void Hub::Impl::handleSensor(const Call& call) {
  Sensor& sensor = *directory_.Sensors()[call.addressee];
  switch (call.messageId) {
    case kDisableRequest:
      streams_.Stop(call.client, call.addressee, now_);
      return;
    case kStreamConfigRequest:
      startStream(call);
      return;
    case kOnChangeConfigRequest:
      streams_.Start(call.client, call.addressee, {}, now_);
      return;
    case kTestRequest:
      test(call);
      return;
    case kCalibrationChangedRequest:
      if (!sensor.Config().physical) break;
      reloadCalibration(sensor);
      if (!call.faults.noNotification) answer(call, kCalibrationChangedReply, {});
      return;
    default:
      handleOwn(call);
      return;
  }
  answerError(call, SNS_STD_ERROR_NOT_SUPPORTED);
}

void Hub::Impl::startStream(const Call& call) {
  sns_std_sensor_config config;
  if (!config.ParseFromString(call.request.payload())) {
    answerError(call, SNS_STD_ERROR_INVALID_TYPE);
    return;
  }
  const float rate = config.sample_rate();
  if (!std::isfinite(rate) || rate <= 0) {
    answerError(call, SNS_STD_ERROR_INVALID_VALUE);
    return;
  }
  constexpr std::int64_t kMicrosecond = 1000;
  const Time batchPeriod{std::int64_t{call.request.batching().batch_period()} * kMicrosecond};
  streams_.Start(call.client, call.addressee, {rate, batchPeriod}, now_);
}

void Hub::Impl::test(const Call& call) {
  Sensor& sensor = *directory_.Sensors()[call.addressee];
  sns_physical_sensor_test_config config;
  if (!sensor.Config().physical || !config.ParseFromString(call.request.payload())) {
    answerError(call, sensor.Config().physical ? SNS_STD_ERROR_INVALID_TYPE : SNS_STD_ERROR_NOT_SUPPORTED);
    return;
  }
  reloadCalibration(sensor);
  if (call.faults.noNotification) return;
  sns_physical_sensor_test_event event;
  event.set_test_passed(true);
  event.set_test_type(config.test_type());
  answer(call, kTestEvent, event.SerializeAsString());
}

void Hub::Impl::handleOwn(const Call& call) {
  std::vector<SensorAnswer> answers;
  const SensorRequest request{now_, call.messageId, call.request.payload(), call.faults.oemFailure};
  if (!directory_.Sensors()[call.addressee]->HandleRequest(request, &answers)) {
    answerError(call, SNS_STD_ERROR_NOT_SUPPORTED);
    return;
  }
  if (call.faults.oemSilence) return;
  for (const SensorAnswer& reply : answers) {
    answer(call, reply.messageId, call.faults.oemMalformed ? kUndecodablePayload : reply.payload,
           reply.delay);
  }
}

// ---- Life ----

void Hub::Impl::loadCalibration(Sensor& sensor) {
  sensor.LoadCalibration([this](const std::string& group) {
    sns_registry_data items;
    if (store_.Read(group, &items) != RegistryStore::Result::kOk) items.Clear();
    return items;
  });
}

/// The streams of one chip share its calibration: to tell one of them is to tell all.
void Hub::Impl::reloadCalibration(const Sensor& told) {
  const std::string group = told.CalibrationGroup();
  for (const auto& sensor : directory_.Sensors()) {
    if (sensor->CalibrationGroup() == group) loadCalibration(*sensor);
  }
}

void Hub::Impl::start() {
  store_.Load(faults_.TornGroups());
  for (const auto& sensor : directory_.Sensors()) {
    sensor->Restart();
    loadCalibration(*sensor);
  }
}

void Hub::Impl::goDown(Time back) {
  if (!isUp_) return;
  isUp_ = false;
  streams_.Clear();
  outbox_.Clear();
  queue_.Clear();
  for (std::uint32_t i = 0; i < departures_.size(); ++i) {
    if (departures_[i].at > now_) queue_.Push(departures_[i].at, HubEvent::Kind::kDown, i);
  }
  if (back < kNever) queue_.Push(std::max(back, now_), HubEvent::Kind::kUp);
  output_.HubDown();
}

void Hub::Impl::comeUp() {
  isUp_ = true;
  faults_.OnReturn();
  start();
  output_.HubUp();
}

void Hub::Impl::Step() {
  if (queue_.Empty()) return;
  const HubEvent event = queue_.Pop();
  now_ = std::max(now_, event.time);
  switch (event.kind) {
    case HubEvent::Kind::kReading: {
      Time back{0};
      if (streams_.TakeReading(event, &back)) goDown(back);
      break;
    }
    case HubEvent::Kind::kMail:
      outbox_.Deliver(event.index);
      break;
    case HubEvent::Kind::kDown:
      goDown(departures_[event.index].back);
      break;
    case HubEvent::Kind::kUp:
      comeUp();
      break;
  }
}

// ---- The outside ----

std::unique_ptr<Hub> Hub::Create(Scenario scenario, const HubFiles& files, HubOutput& output,
                                 std::string* error, const SensorMaker& makeSensor) {
  auto impl = std::make_unique<Impl>(std::move(scenario), files, output, makeSensor);
  if (!impl->LogPath().empty()) {
    if (const int failure = impl->OpenLog(); failure != 0) {
      *error = "hub.request_log: " + impl->LogPath() + ": " + std::strerror(failure);
      return nullptr;
    }
  }
  return std::unique_ptr<Hub>(new Hub(std::move(impl)));
}

Hub::Hub(std::unique_ptr<Impl> impl) : impl_(std::move(impl)) {}
Hub::~Hub() = default;

ClientId Hub::AddClient() { return impl_->AddClient(); }
void Hub::RemoveClient(ClientId client) { impl_->RemoveClient(client); }
bool Hub::HandleDatagram(ClientId client, qmi::Bytes datagram) {
  return impl_->HandleDatagram(client, datagram);
}
Time Hub::Now() const { return impl_->Now(); }
bool Hub::IsUp() const { return impl_->IsUp(); }

std::optional<Time> Hub::NextEventTime() const {
  if (impl_->Queue().Empty()) return std::nullopt;
  return std::max(impl_->Queue().Next().time, impl_->Now());
}

void Hub::Step() { impl_->Step(); }

void Hub::AdvanceTo(Time time) {
  while (!impl_->Queue().Empty() && impl_->Queue().Next().time <= time) impl_->Step();
  impl_->MoveTo(time);
}

const HubStatistics& Hub::Statistics() const { return impl_->Statistics(); }

HubFiles hubFiles(const std::string& root) { return {root + kRegistryFolder, root + kTe2Table}; }

}  // namespace simhub
