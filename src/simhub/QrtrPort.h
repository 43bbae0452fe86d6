#pragma once

#include <chrono>
#include <cstdint>
#include <memory>
#include <vector>

#include "qmi/Qrtr.h"

namespace simhub {

/// A server's port on the router of the handset's processors. Tests put a stand-in here.
class QrtrPort {
 public:
  virtual ~QrtrPort() = default;

  /// That of this machine, closed.
  [[nodiscard]] static std::unique_ptr<QrtrPort> OfThisMachine();

  /// Takes a port and registers the hub's service at it with the name service. 0 or a negated errno.
  [[nodiscard]] virtual int Open() = 0;
  /// Gives the port up; the name service tells everybody.
  virtual void Close() = 0;
  /// To be polled for what comes in; -1 while closed.
  [[nodiscard]] virtual int descriptor() const = 0;
  [[nodiscard]] virtual std::uint32_t LocalNode() const = 0;

  /// Never waits. 0 or a negated errno: ENOSPC where the receiver's queue is full.
  [[nodiscard]] virtual int Send(const qmi::QrtrAddress& to, qmi::Bytes packet) = 0;
  /// The next packet, if there is one. 0 or a negated errno: EAGAIN where there is none.
  [[nodiscard]] virtual int Receive(qmi::QrtrAddress* from, std::vector<std::uint8_t>* packet) = 0;
};

}  // namespace simhub
