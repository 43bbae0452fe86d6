// A stand-in for a socket of the router family: what comes in is queued by the test, what goes out is kept.
// Nothing waits: an empty queue is a deadline that has passed.
#pragma once

#include <chrono>
#include <deque>
#include <functional>
#include <memory>
#include <utility>
#include <vector>

#include "ssc/Wire.h"
#include "ssc/transport/QrtrSocket.h"

namespace ssctest {

using Address = ssc::QrtrAddress;
inline constexpr std::uint32_t kLocalNode = 1;
inline constexpr Address kNameService{kLocalNode, QRTR_PORT_CTRL};

struct ControlPacket {
  std::uint32_t command = 0;
  std::uint32_t service = 0;
  std::uint32_t instance = 0;
  Address address;

  [[nodiscard]] Datagram bytes() const {
    Datagram packed;
    for (const std::uint32_t field : {command, service, instance, address.node, address.port}) {
      for (int shift = 0; shift < 32; shift += 8) packed.push_back(static_cast<std::uint8_t>(field >> shift));
    }
    return packed;
  }
};

inline Datagram newServer(const Address& address, std::uint32_t instance = 1) {
  return ControlPacket{QRTR_TYPE_NEW_SERVER, 400, instance, address}.bytes();
}
inline Datagram delServer(const Address& address, std::uint32_t instance = 1) {
  return ControlPacket{QRTR_TYPE_DEL_SERVER, 400, instance, address}.bytes();
}
inline Datagram endOfList() { return ControlPacket{QRTR_TYPE_NEW_SERVER, 0, 0, {}}.bytes(); }
inline Datagram bye(std::uint32_t node) {
  return ControlPacket{QRTR_TYPE_BYE, node, 0, {}}.bytes();  // a client record: node, port
}

/// What the test and the socket, which the transport owns, share.
struct QrtrTraffic {
  struct Packet {
    Address address;
    Datagram bytes;
  };
  std::deque<Packet> incoming;
  std::vector<Packet> sent;
  int sendResult = 0;
  int lookupResult = 0;  ///< of packets to the name service
  int interrupts = 0;
  std::chrono::milliseconds timePerPacket{0};
  std::function<void()> packetTaken = [] {};
  int failures = 0;  ///< receives that fail before anything else comes in

  void control(Datagram bytes) { incoming.push_back({kNameService, std::move(bytes)}); }
  void from(const Address& sender, Datagram bytes) { incoming.push_back({sender, std::move(bytes)}); }
};

class FakeQrtrSocket final : public ssc::QrtrSocket {
 public:
  explicit FakeQrtrSocket(std::shared_ptr<QrtrTraffic> traffic) : traffic_(std::move(traffic)) {}

  [[nodiscard]] std::uint32_t LocalNode() const override { return kLocalNode; }

  [[nodiscard]] int Send(const Address& to, qmi::Bytes packet) override {
    const int result = to == kNameService ? traffic_->lookupResult : traffic_->sendResult;
    if (result == 0) traffic_->sent.push_back({to, Datagram(packet.begin(), packet.end())});
    return result;
  }

  [[nodiscard]] Outcome Receive(ssc::Clock::TimePoint, Address* from,
                                std::vector<std::uint8_t>* packet) override {
    if (traffic_->interrupts > 0) {
      traffic_->interrupts = 0;
      return Outcome::kInterrupted;
    }
    if (traffic_->failures > 0) {
      --traffic_->failures;
      return Outcome::kFailed;
    }
    if (traffic_->incoming.empty()) return Outcome::kDeadline;
    traffic_->packetTaken();
    *from = traffic_->incoming.front().address;
    *packet = std::move(traffic_->incoming.front().bytes);
    traffic_->incoming.pop_front();
    return Outcome::kPacket;
  }

  void Interrupt() override { ++traffic_->interrupts; }

 private:
  std::shared_ptr<QrtrTraffic> traffic_;
};

}  // namespace ssctest
