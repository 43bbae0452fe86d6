// Any datagram at all, given to every QMI decoder. What decodes is encoded again and must decode to the same
// values, and its views must lie inside the datagram.
#include <algorithm>
#include <optional>
#include <vector>

#include "fuzz/FuzzCheck.h"
#include "qmi/Qmi.h"

namespace {

using fuzz::check;

bool sameBytes(qmi::Bytes a, qmi::Bytes b) { return std::equal(a.begin(), a.end(), b.begin(), b.end()); }

bool inside(qmi::Bytes view, qmi::Bytes datagram) {
  return view.empty() ||
         (view.data() >= datagram.data() && view.data() + view.size() <= datagram.data() + datagram.size());
}

bool checkRequest(qmi::Bytes datagram) {
  const auto request = qmi::decodeRequest(datagram);
  if (!request) return false;
  check(inside(request->payload, datagram), "a request's payload lies inside its datagram");
  std::vector<std::uint8_t> encoded;
  const bool fits = qmi::encodeRequest(request->transactionId, request->payload, &encoded);
  check(fits == (request->payload.size() <= qmi::kMaxRequestPayload), "a request encodes when it fits");
  if (!fits) return true;
  const auto again = qmi::decodeRequest(encoded);
  check(again.has_value(), "an encoded request decodes");
  check(again->transactionId == request->transactionId, "a request keeps its transaction id");
  check(sameBytes(again->payload, request->payload), "a request keeps its payload");
  check(again->reportType == 1, "large reports are always accepted");
  return true;
}

bool checkResponse(qmi::Bytes datagram) {
  const auto response = qmi::decodeResponse(datagram);
  if (!response) return false;
  std::vector<std::uint8_t> encoded;
  qmi::encodeResponse(*response, &encoded);
  const auto again = qmi::decodeResponse(encoded);
  check(again.has_value(), "an encoded response decodes");
  check(again->transactionId == response->transactionId, "a response keeps its transaction id");
  check(again->result == response->result && again->error == response->error, "a response keeps its result");
  check(again->clientId == response->clientId, "a response keeps its client id");
  check(again->response == response->response, "a response keeps its value");
  return true;
}

bool checkReport(qmi::Bytes datagram) {
  const auto report = qmi::decodeReport(datagram);
  if (!report) return false;
  check(inside(report->payload, datagram), "a report's payload lies inside its datagram");
  std::vector<std::uint8_t> encoded;
  const bool fits = qmi::encodeReport(report->clientId, report->payload, &encoded);
  check(fits == (report->payload.size() <= qmi::kMaxReportPayload), "a report encodes when it fits");
  if (!fits) return true;
  const auto again = qmi::decodeReport(encoded);
  check(again.has_value(), "an encoded report decodes");
  check(again->clientId == report->clientId, "a report keeps its client id");
  check(sameBytes(again->payload, report->payload), "a report keeps its payload");
  return true;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const qmi::Bytes datagram(data, size);
  const auto kind = qmi::datagramKind(datagram);
  const bool request = checkRequest(datagram);
  const bool response = checkResponse(datagram);
  const bool report = checkReport(datagram);
  check(!request || kind == qmi::Kind::kRequest, "a request is of the request kind");
  check(!response || kind == qmi::Kind::kResponse, "a response is of the response kind");
  check(!report || kind == qmi::Kind::kIndication, "a report is of the indication kind");
  return 0;
}
