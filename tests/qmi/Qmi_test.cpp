#include "qmi/Qmi.h"

#include <string>

#include <gtest/gtest.h>

namespace {

std::vector<std::uint8_t> bytes(const std::string& text) { return {text.begin(), text.end()}; }

TEST(Qmi, RequestHasTheDocumentedBytes) {
  std::vector<std::uint8_t> datagram;
  ASSERT_TRUE(qmi::encodeRequest(0x0102, bytes("ab"), &datagram));
  EXPECT_EQ(datagram, (std::vector<std::uint8_t>{0, 0x02, 0x01, 0x20, 0x00, 11, 0,  // header
                                                 0x01, 4, 0, 2, 0, 'a', 'b',        // payload
                                                 0x10, 1, 0, 1}));                  // large reports accepted
}

TEST(Qmi, RequestSurvivesTheRoundTrip) {
  std::vector<std::uint8_t> datagram;
  ASSERT_TRUE(qmi::encodeRequest(65535, bytes("payload"), &datagram));
  const auto request = qmi::decodeRequest(datagram);
  ASSERT_TRUE(request.has_value());
  EXPECT_EQ(request->transactionId, 65535);
  EXPECT_EQ(request->reportType, 1);
  EXPECT_EQ(std::string(request->payload.begin(), request->payload.end()), "payload");
}

}  // namespace
