#include "Flood.h"

#include <array>
#include <cstdio>
#include <cstdlib>
#include <cstring>

#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include "proto/sns_client.pb.h"
#include "proto/sns_std.pb.h"
#include "qmi/Qmi.h"
#include "ssc/MessageIds.h"

namespace {

std::vector<std::uint8_t> makeReport(std::size_t events, std::size_t values) {
  sns_std_sensor_event reading;
  reading.set_status(SNS_STD_SENSOR_SAMPLE_STATUS_ACCURACY_HIGH);
  for (std::size_t i = 0; i < values; ++i) reading.add_data(1013.25F + static_cast<float>(i));
  sns_client_event_msg message;
  Flood::sensor().CopyTo(message.mutable_suid());
  for (std::size_t i = 0; i < events; ++i) {
    auto* event = message.add_events();
    event->set_msg_id(ssc::kSensorEvent);
    event->set_timestamp(i * 960'000);
    event->set_payload(reading.SerializeAsString());
  }
  const std::string payload = message.SerializeAsString();
  std::vector<std::uint8_t> datagram;
  if (!qmi::encodeReport(1, {reinterpret_cast<const std::uint8_t*>(payload.data()), payload.size()},
                         &datagram)) {
    std::abort();
  }
  return datagram;
}

}  // namespace

Flood::Flood(std::string path, std::size_t eventsPerReport, std::size_t valuesPerEvent)
    : path_(std::move(path)), report_(makeReport(eventsPerReport, valuesPerEvent)) {
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  std::snprintf(address.sun_path, sizeof address.sun_path, "%s", path_.c_str());
  ::unlink(path_.c_str());
  listener_ = ssc::Descriptor(::socket(AF_UNIX, SOCK_SEQPACKET | SOCK_CLOEXEC, 0));
  if (::bind(listener_.get(), reinterpret_cast<const sockaddr*>(&address), sizeof address) != 0 ||
      ::listen(listener_.get(), 1) != 0) {
    std::perror("bench: listen");
    std::abort();
  }
  thread_ = std::thread([this] { serve(); });
}

Flood::~Flood() {
  ::shutdown(listener_.get(), SHUT_RDWR);
  thread_.join();
  ::unlink(path_.c_str());
}

void Flood::serve() {
  for (;;) {
    const ssc::Descriptor client(::accept4(listener_.get(), nullptr, nullptr, SOCK_CLOEXEC));
    if (!client.valid()) return;
    if (!answerRequest(client.get())) continue;
    while (::send(client.get(), report_.data(), report_.size(), MSG_NOSIGNAL) > 0) {
    }
  }
}

bool Flood::answerRequest(int client) const {
  std::array<std::uint8_t, 4096> buffer{};
  const ssize_t length = ::recv(client, buffer.data(), buffer.size(), 0);
  if (length <= 0) return false;
  const auto request = qmi::decodeRequest({buffer.data(), static_cast<std::size_t>(length)});
  if (!request) return false;
  qmi::Response response;
  response.transactionId = request->transactionId;
  std::vector<std::uint8_t> datagram;
  qmi::encodeResponse(response, &datagram);
  return ::send(client, datagram.data(), datagram.size(), MSG_NOSIGNAL) > 0;
}
