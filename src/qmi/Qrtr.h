// What travels over the handset's router between its processors: addresses, and the packets with which its
// name service is asked and tells which servers there are.
#pragma once

#include <cstdint>
#include <optional>
#include <vector>

#include <linux/qrtr.h>

#include "qmi/Qmi.h"

namespace qmi {

/// Where a packet comes from or goes to.
struct QrtrAddress {
  std::uint32_t node = 0;
  std::uint32_t port = 0;
  friend auto operator<=>(const QrtrAddress&, const QrtrAddress&) = default;
};

[[nodiscard]] sockaddr_qrtr toSocketAddress(const QrtrAddress& address);
[[nodiscard]] QrtrAddress fromSocketAddress(const sockaddr_qrtr& address);

/// A packet to or from the name service: five little-endian numbers. About a client (QRTR_TYPE_DEL_CLIENT,
/// QRTR_TYPE_BYE) there are only three, which then stand in place of service and instance.
struct QrtrControl {
  std::uint32_t command = 0;  ///< QRTR_TYPE_…
  std::uint32_t service = 0;
  std::uint32_t instance = 0;  ///< 0 in a look-up: any
  QrtrAddress server;

  [[nodiscard]] QrtrAddress client() const { return {service, instance}; }
  /// What ends the list of servers after a look-up.
  [[nodiscard]] bool EndsList() const;
};

[[nodiscard]] std::vector<std::uint8_t> encodeQrtrControl(const QrtrControl& control);
/// Nothing when the bytes are too few. What is longer has been extended since, and is taken for what it was.
[[nodiscard]] std::optional<QrtrControl> decodeQrtrControl(Bytes packet);

}  // namespace qmi
