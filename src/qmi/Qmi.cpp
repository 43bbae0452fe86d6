#include "qmi/Qmi.h"

#include <algorithm>

namespace qmi {
namespace {

constexpr std::size_t kHeaderSize = 7;
constexpr std::size_t kTlvHeaderSize = 3;

// TLV types. The same numbers mean different things in different messages.
constexpr std::uint8_t kTlvRequestPayload = 0x01;
constexpr std::uint8_t kTlvRequestReportType = 0x10;
constexpr std::uint8_t kTlvResponseResult = 0x02;
constexpr std::uint8_t kTlvResponseClientId = 0x10;
constexpr std::uint8_t kTlvResponseValue = 0x11;
constexpr std::uint8_t kTlvReportClientId = 0x01;
constexpr std::uint8_t kTlvReportPayload = 0x02;

constexpr std::uint8_t kLargeReportsAccepted = 1;

template <class T>
T readLittleEndian(Bytes bytes) {
  std::uint64_t value = 0;
  for (std::size_t i = 0; i < sizeof(T); ++i) value |= std::uint64_t{bytes[i]} << (8 * i);
  return static_cast<T>(value);
}

template <class T>
void appendLittleEndian(T value, std::vector<std::uint8_t>* out) {
  for (std::size_t i = 0; i < sizeof(T); ++i) {
    out->push_back(static_cast<std::uint8_t>(std::uint64_t{value} >> (8 * i)));
  }
}

struct Header {
  Kind kind;
  std::uint16_t transactionId;
  std::uint16_t messageId;
  Bytes tlvs;
};

bool isKind(std::uint8_t value) {
  return value == static_cast<std::uint8_t>(Kind::kRequest) ||
         value == static_cast<std::uint8_t>(Kind::kResponse) ||
         value == static_cast<std::uint8_t>(Kind::kIndication);
}

/// Whether the TLVs fill `tlvs` exactly.
bool wellFormed(Bytes tlvs) {
  while (!tlvs.empty()) {
    if (tlvs.size() < kTlvHeaderSize) return false;
    const std::size_t length = readLittleEndian<std::uint16_t>(tlvs.subspan(1, 2));
    if (tlvs.size() - kTlvHeaderSize < length) return false;
    tlvs = tlvs.subspan(kTlvHeaderSize + length);
  }
  return true;
}

std::optional<Header> decodeHeader(Bytes datagram) {
  if (datagram.size() < kHeaderSize || !isKind(datagram[0])) return std::nullopt;
  const std::size_t length = readLittleEndian<std::uint16_t>(datagram.subspan(5, 2));
  if (length != datagram.size() - kHeaderSize) return std::nullopt;
  const Header header{static_cast<Kind>(datagram[0]), readLittleEndian<std::uint16_t>(datagram.subspan(1, 2)),
                      readLittleEndian<std::uint16_t>(datagram.subspan(3, 2)), datagram.subspan(kHeaderSize)};
  if (!wellFormed(header.tlvs)) return std::nullopt;
  return header;
}

/// The value of the first TLV of that type. The TLVs are well-formed here.
std::optional<Bytes> findTlv(Bytes tlvs, std::uint8_t type) {
  while (!tlvs.empty()) {
    const std::size_t length = readLittleEndian<std::uint16_t>(tlvs.subspan(1, 2));
    if (tlvs[0] == type) return tlvs.subspan(kTlvHeaderSize, length);
    tlvs = tlvs.subspan(kTlvHeaderSize + length);
  }
  return std::nullopt;
}

template <class T>
std::optional<T> findInteger(Bytes tlvs, std::uint8_t type) {
  const auto value = findTlv(tlvs, type);
  if (!value || value->size() != sizeof(T)) return std::nullopt;
  return readLittleEndian<T>(*value);
}

/// A counted byte string: u16 n, then exactly n bytes.
std::optional<Bytes> findCounted(Bytes tlvs, std::uint8_t type) {
  const auto value = findTlv(tlvs, type);
  if (!value || value->size() < 2) return std::nullopt;
  if (readLittleEndian<std::uint16_t>(value->first(2)) != value->size() - 2) return std::nullopt;
  return value->subspan(2);
}

void appendHeader(Kind kind, std::uint16_t transactionId, std::uint16_t messageId, std::size_t length,
                  std::vector<std::uint8_t>* out) {
  out->clear();
  out->reserve(kHeaderSize + length);
  out->push_back(static_cast<std::uint8_t>(kind));
  appendLittleEndian(transactionId, out);
  appendLittleEndian(messageId, out);
  appendLittleEndian(static_cast<std::uint16_t>(length), out);
}

void appendTlvHeader(std::uint8_t type, std::size_t length, std::vector<std::uint8_t>* out) {
  out->push_back(type);
  appendLittleEndian(static_cast<std::uint16_t>(length), out);
}

void appendCounted(std::uint8_t type, Bytes payload, std::vector<std::uint8_t>* out) {
  appendTlvHeader(type, 2 + payload.size(), out);
  appendLittleEndian(static_cast<std::uint16_t>(payload.size()), out);
  out->insert(out->end(), payload.begin(), payload.end());
}

}  // namespace

std::optional<Kind> datagramKind(Bytes datagram) {
  const auto header = decodeHeader(datagram);
  if (!header) return std::nullopt;
  return header->kind;
}

std::optional<Request> decodeRequest(Bytes datagram) {
  const auto header = decodeHeader(datagram);
  if (!header || header->kind != Kind::kRequest || header->messageId != kClientRequestId) return std::nullopt;
  const auto payload = findCounted(header->tlvs, kTlvRequestPayload);
  if (!payload) return std::nullopt;
  const auto reportType = findInteger<std::uint8_t>(header->tlvs, kTlvRequestReportType);
  return Request{header->transactionId, *payload, reportType.value_or(0)};
}

std::optional<Response> decodeResponse(Bytes datagram) {
  const auto header = decodeHeader(datagram);
  if (!header || header->kind != Kind::kResponse || header->messageId != kClientRequestId)
    return std::nullopt;
  const auto result = findInteger<std::uint32_t>(header->tlvs, kTlvResponseResult);
  if (!result) return std::nullopt;
  return Response{header->transactionId, static_cast<std::uint16_t>(*result & 0xffff),
                  static_cast<std::uint16_t>(*result >> 16),
                  findInteger<std::uint64_t>(header->tlvs, kTlvResponseClientId),
                  findInteger<std::uint32_t>(header->tlvs, kTlvResponseValue)};
}

std::optional<Report> decodeReport(Bytes datagram) {
  const auto header = decodeHeader(datagram);
  if (!header || header->kind != Kind::kIndication) return std::nullopt;
  if (header->messageId != kSmallReportId && header->messageId != kLargeReportId) return std::nullopt;
  const auto clientId = findInteger<std::uint64_t>(header->tlvs, kTlvReportClientId);
  const auto payload = findCounted(header->tlvs, kTlvReportPayload);
  if (!clientId || !payload) return std::nullopt;
  return Report{*clientId, *payload};
}

bool encodeRequest(std::uint16_t transactionId, Bytes payload, std::vector<std::uint8_t>* out) {
  out->clear();
  if (payload.size() > kMaxRequestPayload) return false;
  const std::size_t length = kTlvHeaderSize + 2 + payload.size() + kTlvHeaderSize + 1;
  appendHeader(Kind::kRequest, transactionId, kClientRequestId, length, out);
  appendCounted(kTlvRequestPayload, payload, out);
  appendTlvHeader(kTlvRequestReportType, 1, out);
  out->push_back(kLargeReportsAccepted);
  return true;
}

void encodeResponse(const Response& response, std::vector<std::uint8_t>* out) {
  const std::size_t length = kTlvHeaderSize + 4 + (response.clientId ? kTlvHeaderSize + 8 : 0) +
                             (response.response ? kTlvHeaderSize + 4 : 0);
  appendHeader(Kind::kResponse, response.transactionId, kClientRequestId, length, out);
  appendTlvHeader(kTlvResponseResult, 4, out);
  appendLittleEndian(response.result, out);
  appendLittleEndian(response.error, out);
  if (response.clientId) {
    appendTlvHeader(kTlvResponseClientId, 8, out);
    appendLittleEndian(*response.clientId, out);
  }
  if (response.response) {
    appendTlvHeader(kTlvResponseValue, 4, out);
    appendLittleEndian(*response.response, out);
  }
}

bool encodeReport(std::uint64_t clientId, Bytes payload, std::vector<std::uint8_t>* out,
                  std::size_t smallLimit) {
  out->clear();
  if (payload.size() > kMaxReportPayload) return false;
  const std::uint16_t messageId = payload.size() <= smallLimit ? kSmallReportId : kLargeReportId;
  const std::size_t length = kTlvHeaderSize + 8 + kTlvHeaderSize + 2 + payload.size();
  appendHeader(Kind::kIndication, 0, messageId, length, out);
  appendTlvHeader(kTlvReportClientId, 8, out);
  appendLittleEndian(clientId, out);
  appendCounted(kTlvReportPayload, payload, out);
  return true;
}

}  // namespace qmi
