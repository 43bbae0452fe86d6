// The framing of every datagram between a hub and its clients: one QMI message.
//
//   kind u8 | transaction u16 | message id u16 | length u16 | TLVs: type u8, length u16, value
//
// All integers are little-endian. Decoding makes views into the caller's bytes and copies nothing;
// every length is checked against the bytes that are there. Unknown TLVs are skipped; of a TLV that
// stands twice the first counts.
#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <vector>

namespace qmi {

using Bytes = std::span<const std::uint8_t>;

/// The hub's service in the name service.
inline constexpr std::uint32_t kHubServiceId = 400;
inline constexpr std::uint32_t kHubInstance = 1;

enum class Kind : std::uint8_t { kRequest = 0, kResponse = 2, kIndication = 4 };

/// Message ids. A small and a large report carry the same TLVs.
inline constexpr std::uint16_t kClientRequestId = 0x0020;
inline constexpr std::uint16_t kSmallReportId = 0x0021;
inline constexpr std::uint16_t kLargeReportId = 0x0022;

/// A client's request: an encoded sns_client_request_msg.
struct Request {
  std::uint16_t transactionId = 0;
  Bytes payload;
  std::uint8_t reportType = 0;  ///< 1: the client takes large reports; 0 when absent
};

/// The hub's answer to a request. Says that the request was taken, not that it was carried out.
struct Response {
  std::uint16_t transactionId = 0;
  std::uint16_t result = 0;  ///< 0 success, 1 failure
  std::uint16_t error = 0;
  std::optional<std::uint64_t> clientId;
  std::optional<std::uint32_t> response;
};

/// A report: an encoded sns_client_event_msg.
struct Report {
  std::uint64_t clientId = 0;
  Bytes payload;
};

/// The kind of a datagram, or nothing when it is not one well-formed QMI message.
[[nodiscard]] std::optional<Kind> datagramKind(Bytes datagram);

/// Each gives nothing when the datagram is malformed or is not of that kind and message id.
[[nodiscard]] std::optional<Request> decodeRequest(Bytes datagram);
[[nodiscard]] std::optional<Response> decodeResponse(Bytes datagram);
[[nodiscard]] std::optional<Report> decodeReport(Bytes datagram);

/// The largest payload that fits each message: every length on the wire is 16 bits wide.
inline constexpr std::size_t kMaxRequestPayload = 0xffff - 3 - 2 - 4;
inline constexpr std::size_t kMaxReportPayload = 0xffff - 3 - 2 - 11;

/// Encoders. `out` is replaced. False, with `out` empty, when the payload is too large for the frame.
[[nodiscard]] bool encodeRequest(std::uint16_t transactionId, Bytes payload, std::vector<std::uint8_t>* out);
void encodeResponse(const Response& response, std::vector<std::uint8_t>* out);
/// Reports of up to `smallLimit` payload bytes go out as small reports, longer ones as large reports.
[[nodiscard]] bool encodeReport(std::uint64_t clientId, Bytes payload, std::vector<std::uint8_t>* out,
                                std::size_t smallLimit = 1024);

}  // namespace qmi
