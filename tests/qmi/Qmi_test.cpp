#include "qmi/Qmi.h"

#include <string>

#include <gtest/gtest.h>

namespace {

using Datagram = std::vector<std::uint8_t>;

Datagram bytes(const std::string& text) { return {text.begin(), text.end()}; }
std::string text(qmi::Bytes bytes) { return {bytes.begin(), bytes.end()}; }

TEST(QmiEncode, RequestHasTheDocumentedBytes) {
  Datagram datagram;
  ASSERT_TRUE(qmi::encodeRequest(0x0102, bytes("ab"), &datagram));
  EXPECT_EQ(datagram, (Datagram{0, 0x02, 0x01, 0x20, 0x00, 11, 0,  // header
                                0x01, 4, 0, 2, 0, 'a', 'b',        // payload
                                0x10, 1, 0, 1}));                  // large reports accepted
}

TEST(QmiEncode, BareResponseHasTheDocumentedBytes) {
  Datagram datagram;
  qmi::encodeResponse({0xfffe, 1, 0x0305, std::nullopt, std::nullopt}, &datagram);
  EXPECT_EQ(datagram, (Datagram{2, 0xfe, 0xff, 0x20, 0x00, 7, 0,  // header
                                0x02, 4, 0, 1, 0, 0x05, 0x03}));  // result, error
}

TEST(QmiEncode, FullResponseHasTheDocumentedBytes) {
  Datagram datagram;
  qmi::encodeResponse({1, 0, 0, 0x0807060504030201, 0x0d0c0b0a}, &datagram);
  EXPECT_EQ(datagram, (Datagram{2,    1, 0, 0x20, 0x00, 25,   0,                // header
                                0x02, 4, 0, 0,    0,    0,    0,                // result, error
                                0x10, 8, 0, 1,    2,    3,    4,   5, 6, 7, 8,  // client id
                                0x11, 4, 0, 0x0a, 0x0b, 0x0c, 0x0d}));          // response
}

TEST(QmiEncode, SmallAndLargeReportDifferInTheMessageIdOnly) {
  Datagram small;
  ASSERT_TRUE(qmi::encodeReport(0x0102030405060708, bytes("xyz"), &small, 3));
  const Datagram expected{4,    0, 0, 0x21, 0x00, 19,  0,                 // header, transaction id 0
                          0x01, 8, 0, 8,    7,    6,   5,   4,  3, 2, 1,  // client id
                          0x02, 5, 0, 3,    0,    'x', 'y', 'z'};         // payload
  EXPECT_EQ(small, expected);

  Datagram large;
  ASSERT_TRUE(qmi::encodeReport(0x0102030405060708, bytes("xyz"), &large, 2));
  EXPECT_EQ(large[3], 0x22);
  large[3] = 0x21;
  EXPECT_EQ(large, expected);
}

TEST(QmiEncode, ReplacesWhatTheBufferHeld) {
  Datagram datagram = bytes("left over from an earlier, longer datagram of another kind");
  qmi::encodeResponse({1, 0, 0, std::nullopt, std::nullopt}, &datagram);
  EXPECT_EQ(datagram.size(), 14U);
  ASSERT_TRUE(qmi::encodeRequest(1, bytes("a"), &datagram));
  EXPECT_EQ(datagram.size(), 17U);
}

TEST(QmiEncode, RequestPayloadIsLimitedByTheFrame) {
  Datagram datagram;
  ASSERT_TRUE(qmi::encodeRequest(1, Datagram(qmi::kMaxRequestPayload, 0x5a), &datagram));
  EXPECT_EQ(datagram.size(), 7U + 0xffff);
  const auto request = qmi::decodeRequest(datagram);
  ASSERT_TRUE(request.has_value());
  EXPECT_EQ(request->payload.size(), qmi::kMaxRequestPayload);

  EXPECT_FALSE(qmi::encodeRequest(1, Datagram(qmi::kMaxRequestPayload + 1), &datagram));
  EXPECT_TRUE(datagram.empty());
}

TEST(QmiEncode, ReportPayloadIsLimitedByTheFrame) {
  Datagram datagram;
  ASSERT_TRUE(qmi::encodeReport(1, Datagram(qmi::kMaxReportPayload, 0x5a), &datagram));
  EXPECT_EQ(datagram.size(), 7U + 0xffff);
  const auto report = qmi::decodeReport(datagram);
  ASSERT_TRUE(report.has_value());
  EXPECT_EQ(report->payload.size(), qmi::kMaxReportPayload);

  EXPECT_FALSE(qmi::encodeReport(1, Datagram(qmi::kMaxReportPayload + 1), &datagram));
  EXPECT_TRUE(datagram.empty());
}

TEST(QmiDecode, RequestSurvivesTheRoundTrip) {
  Datagram datagram;
  ASSERT_TRUE(qmi::encodeRequest(65535, bytes("payload"), &datagram));
  const auto request = qmi::decodeRequest(datagram);
  ASSERT_TRUE(request.has_value());
  EXPECT_EQ(request->transactionId, 65535);
  EXPECT_EQ(request->reportType, 1);
  EXPECT_EQ(text(request->payload), "payload");
}

TEST(QmiDecode, PayloadIsAViewIntoTheDatagram) {
  Datagram datagram;
  ASSERT_TRUE(qmi::encodeReport(1, bytes("payload"), &datagram));
  const auto report = qmi::decodeReport(datagram);
  ASSERT_TRUE(report.has_value());
  EXPECT_EQ(report->payload.data() + report->payload.size(), datagram.data() + datagram.size());
}

TEST(QmiDecode, ResponseSurvivesTheRoundTripWithAndWithoutItsOptionalParts) {
  for (const bool withClientId : {false, true}) {
    for (const bool withResponse : {false, true}) {
      qmi::Response response{513, 1, 0xfedc, std::nullopt, std::nullopt};
      if (withClientId) response.clientId = 0xfedcba9876543210;
      if (withResponse) response.response = 0xfedcba98;
      Datagram datagram;
      qmi::encodeResponse(response, &datagram);
      const auto decoded = qmi::decodeResponse(datagram);
      ASSERT_TRUE(decoded.has_value());
      EXPECT_EQ(decoded->transactionId, 513);
      EXPECT_EQ(decoded->result, 1);
      EXPECT_EQ(decoded->error, 0xfedc);
      EXPECT_EQ(decoded->clientId, response.clientId);
      EXPECT_EQ(decoded->response, response.response);
    }
  }
}

TEST(QmiDecode, ReportSurvivesTheRoundTrip) {
  for (const std::size_t size : {0U, 1U, 1024U, 1025U, 60000U}) {
    const Datagram payload(size, 0xa5);
    Datagram datagram;
    ASSERT_TRUE(qmi::encodeReport(0xfedcba9876543210, payload, &datagram));
    EXPECT_EQ(datagram[3], size <= 1024 ? qmi::kSmallReportId : qmi::kLargeReportId);
    const auto report = qmi::decodeReport(datagram);
    ASSERT_TRUE(report.has_value()) << size;
    EXPECT_EQ(report->clientId, 0xfedcba9876543210);
    EXPECT_EQ(Datagram(report->payload.begin(), report->payload.end()), payload);
  }
}

TEST(QmiDecode, TellsTheKindOfAWellFormedDatagram) {
  Datagram datagram;
  ASSERT_TRUE(qmi::encodeRequest(1, bytes("a"), &datagram));
  EXPECT_EQ(qmi::datagramKind(datagram), qmi::Kind::kRequest);
  qmi::encodeResponse({1, 0, 0, std::nullopt, std::nullopt}, &datagram);
  EXPECT_EQ(qmi::datagramKind(datagram), qmi::Kind::kResponse);
  ASSERT_TRUE(qmi::encodeReport(1, bytes("a"), &datagram));
  EXPECT_EQ(qmi::datagramKind(datagram), qmi::Kind::kIndication);
}

}  // namespace
