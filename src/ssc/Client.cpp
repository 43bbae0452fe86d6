#include "ssc/Client.h"

namespace ssc {
namespace {

std::string encode(sns_client_request_msg request, std::uint32_t messageId) {
  request.set_msg_id(messageId);
  return request.SerializeAsString();
}

}  // namespace

Client::Client(Connection* hubConnection) : connection(hubConnection), condition(hubConnection->clock()) {}

Client::~Client() { connection->RemoveClient(this); }

sns_client_request_msg Client::MakeRequest(const SensorUid& suid) {
  sns_client_request_msg request;
  suid.CopyTo(request.mutable_suid());
  request.mutable_susp_config()->set_client_proc_type(SNS_STD_CLIENT_PROCESSOR_APSS);
  // Wake-up delivery: a handset whose application processor dozes on the rig still sends its samples.
  request.mutable_susp_config()->set_delivery_type(SNS_CLIENT_DELIVERY_WAKEUP);
  request.mutable_request();
  return request;
}

std::string Client::MakeConfigRequest(const SensorUid& suid, float rateHz, std::uint32_t batchPeriodUs) {
  sns_client_request_msg request = MakeRequest(suid);
  if (batchPeriodUs > 0) request.mutable_request()->mutable_batching()->set_batch_period(batchPeriodUs);
  if (!(rateHz > 0)) return encode(std::move(request), kOnChangeConfigRequest);
  sns_std_sensor_config config;
  config.set_sample_rate(rateHz);
  request.mutable_request()->set_payload(config.SerializeAsString());
  return encode(std::move(request), kStreamConfigRequest);
}

std::string Client::MakeDisableRequest(const SensorUid& suid) {
  return encode(MakeRequest(suid), kDisableRequest);
}

std::string Client::MakeFactoryTestRequest(const SensorUid& suid) {
  sns_client_request_msg request = MakeRequest(suid);
  sns_physical_sensor_test_config config;
  config.set_test_type(SNS_PHYSICAL_SENSOR_TEST_TYPE_FACTORY);
  request.mutable_request()->set_payload(config.SerializeAsString());
  return encode(std::move(request), kTestRequest);
}

int Client::SendRequest(const std::string& request, Response* response) {
  return connection->SendRequest(this, request, response);
}

int Client::SendRequests(const std::vector<std::string>& requests, std::vector<Response>* responses) {
  for (const std::string& request : requests) {
    Response response;
    const int result = SendRequest(request, &response);
    if (result != kOk) return result;
    if (responses != nullptr) responses->push_back(response);
  }
  return kOk;
}

int Client::sendRequestsAndWaitFor(const std::vector<std::string>& requests, Clock::Duration timeout,
                                   std::vector<Response>* responses) {
  if (responses != nullptr) {
    responses->clear();
    responses->reserve(requests.size());
  }
  connection->RegisterClient(this);
  std::unique_lock<std::mutex> lock(mutex);
  int result = SendRequests(requests, responses);
  waited_ = result == kOk;
  if (waited_) {
    result = kTimedOut;
    if (timeout > Clock::Duration::zero()) {
      Clock& clock = connection->clock();
      const auto start = clock.now();
      clock.waitBySystemTime(condition, lock, timeout);
      if (clock.now() - start < timeout) result = status;
    }
  }
  lock.unlock();
  connection->UnregisterClient(this);
  return result;
}

}  // namespace ssc
