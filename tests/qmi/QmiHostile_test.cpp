// Damaged datagrams. Each is decoded from a heap block of exactly its size, so that the address sanitizer
// sees a read of one byte too many.
#include <algorithm>
#include <memory>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "qmi/Qmi.h"

namespace {

using Datagram = std::vector<std::uint8_t>;

constexpr std::size_t kHeaderSize = 7;

Datagram bytes(const std::string& text) { return {text.begin(), text.end()}; }

Datagram requestDatagram() {
  Datagram datagram;
  EXPECT_TRUE(qmi::encodeRequest(0x0304, bytes("request"), &datagram));
  return datagram;
}
Datagram responseDatagram() {
  Datagram datagram;
  qmi::encodeResponse({0x0304, 0, 0, 0x1122334455667788, 0x99aabbcc}, &datagram);
  return datagram;
}
Datagram reportDatagram() {
  Datagram datagram;
  EXPECT_TRUE(qmi::encodeReport(0x1122334455667788, bytes("report"), &datagram));
  return datagram;
}

/// How many of the decoders take the datagram. Also checks that views lie inside it.
int accepted(const Datagram& datagram) {
  const std::unique_ptr<std::uint8_t[]> exact(new std::uint8_t[datagram.size()]);
  std::copy(datagram.begin(), datagram.end(), exact.get());
  const qmi::Bytes view(exact.get(), datagram.size());
  const auto inside = [&](qmi::Bytes part) {
    return part.data() >= view.data() && part.data() + part.size() <= view.data() + view.size();
  };
  int count = 0;
  if (const auto request = qmi::decodeRequest(view)) {
    EXPECT_TRUE(inside(request->payload));
    ++count;
  }
  if (qmi::decodeResponse(view)) ++count;
  if (const auto report = qmi::decodeReport(view)) {
    EXPECT_TRUE(inside(report->payload));
    ++count;
  }
  EXPECT_TRUE(count == 0 || qmi::datagramKind(view).has_value());
  return count;
}

void setLength(Datagram* datagram) {
  const std::size_t length = datagram->size() - kHeaderSize;
  (*datagram)[5] = static_cast<std::uint8_t>(length);
  (*datagram)[6] = static_cast<std::uint8_t>(length >> 8);
}

Datagram withTlvAt(Datagram datagram, std::size_t position, const Datagram& tlv) {
  datagram.insert(datagram.begin() + static_cast<std::ptrdiff_t>(position), tlv.begin(), tlv.end());
  setLength(&datagram);
  return datagram;
}

class QmiHostile : public testing::TestWithParam<Datagram> {};

TEST_P(QmiHostile, WholeDatagramIsTakenByItsOwnDecoderOnly) { EXPECT_EQ(accepted(GetParam()), 1); }

TEST_P(QmiHostile, EveryTruncationIsRefused) {
  for (std::size_t size = 0; size < GetParam().size(); ++size) {
    EXPECT_EQ(accepted(Datagram(GetParam().begin(), GetParam().begin() + static_cast<std::ptrdiff_t>(size))),
              0)
        << size;
  }
}

TEST_P(QmiHostile, EveryOtherLengthInTheHeaderIsRefused) {
  const std::size_t right = GetParam().size() - kHeaderSize;
  for (std::size_t length = 0; length <= 0xffff; ++length) {
    if (length == right) continue;
    Datagram damaged = GetParam();
    damaged[5] = static_cast<std::uint8_t>(length);
    damaged[6] = static_cast<std::uint8_t>(length >> 8);
    ASSERT_EQ(accepted(damaged), 0) << length;
  }
}

TEST_P(QmiHostile, EveryTruncationWithAFittingHeaderLengthIsRefusedUnlessOnlyOptionalPartsAreGone) {
  for (std::size_t size = kHeaderSize; size < GetParam().size(); ++size) {
    Datagram cut(GetParam().begin(), GetParam().begin() + static_cast<std::ptrdiff_t>(size));
    setLength(&cut);
    // Ends of TLVs after which nothing mandatory is missing: the request's report type, the response's
    // optional parts.
    const bool optionalRest = (GetParam()[0] == 0 && size == GetParam().size() - 4) ||
                              (GetParam()[0] == 2 && (size == 14 || size == 25));
    EXPECT_EQ(accepted(cut), optionalRest ? 1 : 0) << size;
  }
}

TEST_P(QmiHostile, EveryChangedByteLeavesTheDecodersInBounds) {
  int refused = 0;
  for (std::size_t position = 0; position < GetParam().size(); ++position) {
    for (int value = 0; value < 256; ++value) {
      Datagram damaged = GetParam();
      damaged[position] = static_cast<std::uint8_t>(value);
      const int count = accepted(damaged);
      EXPECT_LE(count, 1);
      if (count == 0) ++refused;
    }
  }
  EXPECT_GT(refused, 255);
}

TEST_P(QmiHostile, EveryOtherLengthOfEveryTlvIsRefused) {
  std::size_t position = kHeaderSize;
  while (position < GetParam().size()) {
    const std::size_t length = GetParam()[position + 1];  // short ones all
    for (std::size_t other = 0; other <= 0xffff; ++other) {
      if (other == length) continue;
      // An optional part that swallows the next one whole is a well-formed part of another size.
      if (GetParam()[position] == 0x10 && position + 3 + other == GetParam().size()) continue;
      Datagram damaged = GetParam();
      damaged[position + 1] = static_cast<std::uint8_t>(other);
      damaged[position + 2] = static_cast<std::uint8_t>(other >> 8);
      ASSERT_EQ(accepted(damaged), 0) << "TLV at " << position << ", length " << other;
    }
    position += 3 + length;
  }
  EXPECT_EQ(position, GetParam().size());
}

TEST_P(QmiHostile, UnknownTlvsAreSkippedWhereverTheyStand) {
  std::size_t position = kHeaderSize;
  for (;;) {
    EXPECT_EQ(accepted(withTlvAt(GetParam(), position, {0x7f, 3, 0, 9, 9, 9})), 1) << position;
    EXPECT_EQ(accepted(withTlvAt(GetParam(), position, {0xff, 0, 0})), 1) << position;
    if (position == GetParam().size()) break;
    position += std::size_t{3} + GetParam()[position + 1];
  }
}

TEST_P(QmiHostile, BytesAfterTheLastTlvThatAreNoTlvAreRefused) {
  EXPECT_EQ(accepted(withTlvAt(GetParam(), GetParam().size(), {0x7f})), 0);
  EXPECT_EQ(accepted(withTlvAt(GetParam(), GetParam().size(), {0x7f, 0})), 0);
  EXPECT_EQ(accepted(withTlvAt(GetParam(), GetParam().size(), {0x7f, 1, 0})), 0);
}

TEST_P(QmiHostile, EveryOtherKindAndMessageIdIsRefused) {
  for (int kind = 0; kind < 256; ++kind) {
    if (kind == GetParam()[0]) continue;
    Datagram other = GetParam();
    other[0] = static_cast<std::uint8_t>(kind);
    // A request's TLVs make no response or report, nor the other way round.
    EXPECT_EQ(accepted(other), 0) << kind;
    EXPECT_EQ(qmi::datagramKind(other).has_value(), kind == 0 || kind == 2 || kind == 4) << kind;
  }
  for (std::size_t id = 0; id <= 0xffff; ++id) {
    Datagram other = GetParam();
    other[3] = static_cast<std::uint8_t>(id);
    other[4] = static_cast<std::uint8_t>(id >> 8);
    const bool known = GetParam()[0] == 4 ? (id == qmi::kSmallReportId || id == qmi::kLargeReportId)
                                          : id == qmi::kClientRequestId;
    ASSERT_EQ(accepted(other), known ? 1 : 0) << id;
  }
}

INSTANTIATE_TEST_SUITE_P(AllMessages, QmiHostile,
                         testing::Values(requestDatagram(), responseDatagram(), reportDatagram()));

TEST(QmiDecode, TheFirstOfDuplicateTlvsCounts) {
  const Datagram response =
      withTlvAt(responseDatagram(), responseDatagram().size(), {0x02, 4, 0, 1, 0, 9, 0});
  ASSERT_TRUE(qmi::decodeResponse(response).has_value());
  EXPECT_EQ(qmi::decodeResponse(response)->result, 0);

  const Datagram report = withTlvAt(reportDatagram(), kHeaderSize, {0x02, 3, 0, 1, 0, 'x'});
  ASSERT_TRUE(qmi::decodeReport(report).has_value());
  EXPECT_EQ(qmi::decodeReport(report)->payload.size(), 1U);
}

TEST(QmiDecode, ADamagedFirstDuplicateIsNotRepairedByTheSecond) {
  EXPECT_EQ(accepted(withTlvAt(responseDatagram(), kHeaderSize, {0x02, 1, 0, 0})), 0);
  EXPECT_EQ(accepted(withTlvAt(reportDatagram(), kHeaderSize, {0x02, 2, 0, 1, 0})), 0);
  EXPECT_EQ(accepted(withTlvAt(requestDatagram(), kHeaderSize, {0x01, 0, 0})), 0);
}

TEST(QmiDecode, OptionalPartsOfAnotherSizeAreAsGoodAsAbsent) {
  Datagram datagram;
  qmi::encodeResponse({1, 0, 0, std::nullopt, std::nullopt}, &datagram);
  datagram = withTlvAt(datagram, datagram.size(), {0x10, 4, 0, 1, 2, 3, 4, 0x11, 0, 0});
  const auto response = qmi::decodeResponse(datagram);
  ASSERT_TRUE(response.has_value());
  EXPECT_FALSE(response->clientId.has_value());
  EXPECT_FALSE(response->response.has_value());
}

TEST(QmiDecode, CountThatDoesNotFillItsTlvIsRefused) {
  for (int count = 0; count < 256; ++count) {
    Datagram damaged = reportDatagram();
    damaged[kHeaderSize + 11 + 3] = static_cast<std::uint8_t>(count);
    EXPECT_EQ(accepted(damaged), count == 6 ? 1 : 0) << count;
  }
}

TEST(QmiDecode, RequestWithoutAReportTypeAcceptsSmallReportsOnly) {
  Datagram datagram = requestDatagram();
  datagram.erase(datagram.end() - 4, datagram.end());
  setLength(&datagram);
  const auto request = qmi::decodeRequest(datagram);
  ASSERT_TRUE(request.has_value());
  EXPECT_EQ(request->reportType, 0);
}

TEST(QmiDecode, DatagramLongerThanAnyFrameIsRefused) {
  Datagram datagram;
  ASSERT_TRUE(qmi::encodeReport(1, Datagram(qmi::kMaxReportPayload), &datagram));
  datagram.push_back(0);
  EXPECT_EQ(accepted(datagram), 0);
}

}  // namespace
