#pragma once

#include <chrono>
#include <cstdint>
#include <memory>
#include <vector>

#include "qmi/Qrtr.h"
#include "ssc/Clock.h"

namespace ssc {

using qmi::QrtrAddress;

/// A socket of the handset's router family: packets to and from node and port. Tests put a stand-in here.
class QrtrSocket {
 public:
  virtual ~QrtrSocket() = default;

  /// The socket of this machine. Null when it has no QRTR or lets this program have none, with the reason in
  /// errno.
  static std::unique_ptr<QrtrSocket> Open();

  [[nodiscard]] virtual std::uint32_t LocalNode() const = 0;

  /// How long a packet may wait to be sent. Another processor that has stopped, or died without a word, stops
  /// confirming packets; from the eleventh on a sender would wait for it for ever.
  static constexpr std::chrono::milliseconds kSendLimit{1000};

  /// 0 or a negated errno: -ETIMEDOUT after kSendLimit. Meanwhile the socket can receive nothing either.
  [[nodiscard]] virtual int Send(const QrtrAddress& to, qmi::Bytes packet) = 0;

  enum class Outcome { kPacket, kDeadline, kInterrupted, kFailed };
  /// Takes the next packet, waiting until `deadline`. A packet that was cut short is skipped.
  [[nodiscard]] virtual Outcome Receive(Clock::TimePoint deadline, QrtrAddress* from,
                                        std::vector<std::uint8_t>* packet) = 0;

  /// Makes the running Receive, or else the next one, return kInterrupted. Any thread.
  virtual void Interrupt() = 0;
};

/// Sends one packet over the socket `fd` as QrtrSocket::Send does, whatever family the socket is of; `limit`
/// in place of kSendLimit.
[[nodiscard]] int sendWithin(std::chrono::milliseconds limit, int fd, const void* address,
                             std::uint32_t addressSize, qmi::Bytes packet);

}  // namespace ssc
