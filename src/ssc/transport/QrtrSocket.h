#pragma once

#include <cstdint>
#include <memory>
#include <vector>

#include "qmi/Qmi.h"
#include "ssc/Clock.h"

namespace ssc {

/// Where a QRTR packet comes from or goes to.
struct QrtrAddress {
  std::uint32_t node = 0;
  std::uint32_t port = 0;
  friend bool operator==(const QrtrAddress&, const QrtrAddress&) = default;
};

/// A socket of the handset's router family: packets to and from node and port. Tests put a stand-in here.
class QrtrSocket {
 public:
  virtual ~QrtrSocket() = default;

  /// The socket of this machine; null when it has no QRTR.
  static std::unique_ptr<QrtrSocket> Open();

  [[nodiscard]] virtual std::uint32_t LocalNode() const = 0;

  /// 0 or a negated errno.
  [[nodiscard]] virtual int Send(const QrtrAddress& to, qmi::Bytes packet) = 0;

  enum class Outcome { kPacket, kDeadline, kInterrupted, kFailed };
  /// Takes the next packet, waiting until `deadline`. A packet that was cut short is skipped.
  [[nodiscard]] virtual Outcome Receive(Clock::TimePoint deadline, QrtrAddress* from,
                                        std::vector<std::uint8_t>* packet) = 0;

  /// Makes the running Receive, or else the next one, return kInterrupted. Any thread.
  virtual void Interrupt() = 0;
};

}  // namespace ssc
