#include "qmi/Qrtr.h"

#include <gtest/gtest.h>
#include <sys/socket.h>

namespace {

using qmi::QrtrAddress;
using qmi::QrtrControl;

TEST(QrtrControlPacket, IsFiveLittleEndianNumbers) {
  const QrtrControl control{QRTR_TYPE_NEW_SERVER, 400, 0x0102, {9, 0x40506070}};
  EXPECT_EQ(
      qmi::encodeQrtrControl(control),
      (std::vector<std::uint8_t>{4, 0, 0, 0, 0x90, 1, 0, 0, 2, 1, 0, 0, 9, 0, 0, 0, 0x70, 0x60, 0x50, 0x40}));
}

TEST(QrtrControlPacket, ComesBackAsItWas) {
  const QrtrControl control{QRTR_TYPE_DEL_SERVER, 400, 1, {9, 0x4007}};
  const auto back = qmi::decodeQrtrControl(qmi::encodeQrtrControl(control));
  ASSERT_TRUE(back);
  EXPECT_EQ(back->command, control.command);
  EXPECT_EQ(back->service, control.service);
  EXPECT_EQ(back->instance, control.instance);
  EXPECT_EQ(back->server, control.server);
}

TEST(QrtrControlPacket, NamesAClientWhereAServersServiceStands) {
  EXPECT_EQ((QrtrControl{QRTR_TYPE_DEL_CLIENT, 1, 0x4003, {}}.client()), (QrtrAddress{1, 0x4003}));
}

TEST(QrtrControlPacket, ThatIsCutIsNone) {
  std::vector<std::uint8_t> packet = qmi::encodeQrtrControl({QRTR_TYPE_BYE, 3, 0, {}});
  packet.push_back(0);
  EXPECT_TRUE(qmi::decodeQrtrControl(packet));
  for (packet.resize(20); !packet.empty();) {
    packet.pop_back();
    EXPECT_FALSE(qmi::decodeQrtrControl(packet)) << packet.size();
  }
}

TEST(QrtrControlPacket, OnlyAnEmptyServerEndsTheList) {
  EXPECT_TRUE((QrtrControl{QRTR_TYPE_NEW_SERVER, 0, 0, {}}.EndsList()));
  EXPECT_FALSE((QrtrControl{QRTR_TYPE_DEL_SERVER, 0, 0, {}}.EndsList()));
  EXPECT_FALSE((QrtrControl{QRTR_TYPE_NEW_SERVER, 400, 0, {}}.EndsList()));
  EXPECT_FALSE((QrtrControl{QRTR_TYPE_NEW_SERVER, 0, 0, {1, 0}}.EndsList()));
}

TEST(QrtrSocketAddress, HasTheFamilyAndComesBackAsItWas) {
  const QrtrAddress address{3, 0x4005};
  const sockaddr_qrtr native = qmi::toSocketAddress(address);
  EXPECT_EQ(native.sq_family, AF_QIPCRTR);
  EXPECT_EQ(qmi::fromSocketAddress(native), address);
}

}  // namespace
