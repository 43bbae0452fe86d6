#include "qmi/Qrtr.h"

#include <cstring>

#include <endian.h>
#include <sys/socket.h>

namespace qmi {

sockaddr_qrtr toSocketAddress(const QrtrAddress& address) {
  sockaddr_qrtr result{};
  result.sq_family = AF_QIPCRTR;
  result.sq_node = address.node;
  result.sq_port = address.port;
  return result;
}

QrtrAddress fromSocketAddress(const sockaddr_qrtr& address) { return {address.sq_node, address.sq_port}; }

bool QrtrControl::EndsList() const {
  return command == QRTR_TYPE_NEW_SERVER && service == 0 && instance == 0 && server == QrtrAddress{};
}

std::vector<std::uint8_t> encodeQrtrControl(const QrtrControl& control) {
  qrtr_ctrl_pkt packet{};
  packet.cmd = htole32(control.command);
  packet.server.service = htole32(control.service);
  packet.server.instance = htole32(control.instance);
  packet.server.node = htole32(control.server.node);
  packet.server.port = htole32(control.server.port);
  const auto* bytes = reinterpret_cast<const std::uint8_t*>(&packet);
  return {bytes, bytes + sizeof packet};
}

std::optional<QrtrControl> decodeQrtrControl(Bytes bytes) {
  qrtr_ctrl_pkt packet{};
  if (bytes.size() < sizeof packet) return std::nullopt;
  std::memcpy(&packet, bytes.data(), sizeof packet);
  return QrtrControl{le32toh(packet.cmd),
                     le32toh(packet.server.service),
                     le32toh(packet.server.instance),
                     {le32toh(packet.server.node), le32toh(packet.server.port)}};
}

}  // namespace qmi
