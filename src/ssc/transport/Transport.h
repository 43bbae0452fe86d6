// The seam between the client library and whatever carries its datagrams. Above it everything is the same for
// a handset, a hub in another process and a hub in this one.
#pragma once

#include <cstdint>
#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "qmi/Qmi.h"
#include "ssc/Clock.h"

namespace ssc {

/// What comes in from a transport.
struct Incoming {
  enum class Kind { kDatagram, kDown, kUp };
  Kind kind = Kind::kDatagram;
  std::vector<std::uint8_t> datagram;  ///< of kDatagram: one whole QMI message
};

class Transport {
 public:
  virtual ~Transport() = default;

  /// Sends one datagram. Any thread, also while another receives. 0; kNotConnected while the hub is away;
  /// another negated errno when this one datagram could not be sent. Never blocks for longer than a send may
  /// take.
  [[nodiscard]] virtual int Send(qmi::Bytes datagram) = 0;

  enum class Outcome { kIncoming, kDeadline, kInterrupted };

  /// Takes the next thing that comes in, waiting for it until `deadline`. One thread at a time. After kDown
  /// nothing comes in until kUp; looking for the hub's return is done in here. `incoming` may be reused: its
  /// buffer is replaced.
  [[nodiscard]] virtual Outcome Receive(Clock::TimePoint deadline, Incoming* incoming) = 0;

  /// Makes the running Receive, or else the next one, return kInterrupted. Any thread.
  virtual void Interrupt() = 0;
};

/// A way to the hub together with the time that goes with it. The clock outlives the transport.
struct HubLink {
  std::unique_ptr<Clock> clock;
  std::unique_ptr<Transport> transport;
};

class EmbeddedHub;
/// Makes a hub in this process from what stands behind "sim" in VANTLE_HUB ("", ":o1v1?seed=3", …). 0 or a
/// negative result, with the reason in `error`.
using EmbeddedHubFactory =
    std::function<int(const std::string& description, std::unique_ptr<EmbeddedHub>* hub, std::string* error)>;

/// Opens the link that the environment variable VANTLE_HUB names (a handset build: always QRTR).
/// On failure a level-0 message says what was looked for. 0, kNoHub when no hub is there, kInvalid when the
/// variable makes no sense.
[[nodiscard]] int openHubLink(const EmbeddedHubFactory& embeddedHub, HubLink* link);

}  // namespace ssc
