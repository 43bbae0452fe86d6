// What VANTLE_HUB may say, and what is said when there is no hub.
#include <cstdlib>
#include <memory>
#include <string>

#include <gtest/gtest.h>
#include <sys/socket.h>

#include "ssc/Connection.h"
#include "ssc/FakeHub.h"
#include "ssc/HubServer.h"
#include "ssc/TestClient.h"

namespace {

using namespace ssctest;
using testing::internal::CaptureStderr;
using testing::internal::GetCapturedStderr;

class HubLinkTest : public testing::Test {
 protected:
  HubLinkTest() { CaptureStderr(); }
  ~HubLinkTest() override {
    GetCapturedStderr();
    ::unsetenv("VANTLE_HUB");
  }

  /// Creates a connection to what the variable (null: unset) names.
  int create(const char* hub, const ssc::EmbeddedHubFactory& factory = nullptr) {
    hub == nullptr ? ::unsetenv("VANTLE_HUB") : ::setenv("VANTLE_HUB", hub, 1);
    ssc::Connection* connection = nullptr;
    const int result = ssc::Connection::Create(&connection, factory);
    connection_.reset(connection);
    EXPECT_EQ(connection != nullptr, result == ssc::kOk);
    shown_ = GetCapturedStderr();
    CaptureStderr();
    return result;
  }
  /// Whether one level-0 line was shown that names `what` and both variables.
  [[nodiscard]] testing::AssertionResult said(const std::string& what) const {
    const auto has = [this](const std::string& part) { return shown_.find(part) != std::string::npos; };
    if (shown_.compare(0, 7, "ERROR: ") == 0 && shown_.find('\n') == shown_.size() - 1 && has(what) &&
        has("VANTLE_HUB") && has("VANTLE_ROOT"))
      return testing::AssertionSuccess();
    return testing::AssertionFailure() << "shown: " << shown_;
  }

  std::unique_ptr<ssc::Connection> connection_;
  std::string shown_;
};

TEST_F(HubLinkTest, HandsetsHubIsLookedForByDefault) {
  if (::socket(42, SOCK_DGRAM, 0) >= 0) GTEST_SKIP() << "this machine has QRTR";
  for (const char* hub : {static_cast<const char*>(nullptr), "", "qrtr"}) {
    EXPECT_EQ(create(hub), ssc::kNoHub);
    EXPECT_TRUE(said("QRTR"));
    EXPECT_TRUE(said("400"));
  }
}

TEST_F(HubLinkTest, NonsenseIsInvalidAndQuoted) {
  for (const char* hub : {"simulator", "sims", "Sim", "unix", "UNIX:/tmp/x", "qrtr:", "qrtr ", " sim", "usb",
                          ":", "\xff%s%n"}) {
    EXPECT_EQ(create(hub), ssc::kInvalid) << hub;
    EXPECT_TRUE(said(std::string("\"") + hub + "\""));
  }
}

TEST_F(HubLinkTest, SocketPathThatIsEmptyOrTooLongIsInvalid) {
  EXPECT_EQ(create("unix:"), ssc::kInvalid);
  EXPECT_TRUE(said("\"\""));
  for (const std::size_t size : {108U, 200U, 5000U}) {
    const std::string path = "/" + std::string(size - 1, 'x');
    EXPECT_EQ(create(("unix:" + path).c_str()), ssc::kInvalid);
    EXPECT_TRUE(said(path));
  }
  // The longest path that fits an address: nothing is there.
  EXPECT_EQ(create(("unix:/" + std::string(106, 'x')).c_str()), ssc::kNoHub);
}

TEST_F(HubLinkTest, SocketThatNobodyListensOnIsNoHub) {
  const SocketFolder folder;
  EXPECT_EQ(create(("unix:" + folder.socketPath()).c_str()), ssc::kNoHub);
  EXPECT_TRUE(said("\"" + folder.socketPath() + "\""));
  EXPECT_EQ(create("unix:/dev/null"), ssc::kNoHub);
  EXPECT_TRUE(said("\"/dev/null\""));
}

TEST_F(HubLinkTest, SocketOfAHubIsConnectedTo) {
  HubServer server(acceptAll);
  ASSERT_TRUE(server.listening());
  ASSERT_EQ(create(("unix:" + server.path()).c_str()), ssc::kOk);
  EXPECT_EQ(shown_, "");
  TestClient client(connection_.get());
  EXPECT_EQ(client.SendRequest(ssc::Client::MakeDisableRequest(kSensor)), ssc::kOk);
}

TEST_F(HubLinkTest, SimulatedHubIsMadeFromWhatStandsBehindSim) {
  std::string description;
  const auto factory = [&](const std::string& text, std::unique_ptr<ssc::EmbeddedHub>* hub, std::string*) {
    description = text;
    *hub = std::make_unique<FakeHub>(acceptAll, std::make_shared<Record>());
    return ssc::kOk;
  };
  for (const std::string text : {"", ":", ":o1v1", ":o1v1?seed=3&a.b=c", "?seed=3", ":/a/file.toml"}) {
    description = "none";
    EXPECT_EQ(create(("sim" + text).c_str(), factory), ssc::kOk);
    EXPECT_EQ(description, text);
    TestClient client(connection_.get());
    EXPECT_EQ(client.SendRequest(ssc::Client::MakeDisableRequest(kSensor)), ssc::kOk);
  }
}

TEST_F(HubLinkTest, SimulatedHubThatCannotBeMadeIsSaidSo) {
  const auto factory = [](const std::string&, std::unique_ptr<ssc::EmbeddedHub>*, std::string* error) {
    *error = "no such scenario";
    return ssc::kInvalid;
  };
  EXPECT_EQ(create("sim:nothing", factory), ssc::kInvalid);
  EXPECT_EQ(shown_, "ERROR: Unable to start the simulated hub: no such scenario\n");
}

TEST_F(HubLinkTest, ProgramWithoutASimulatorHasNoSimulatedHub) {
  EXPECT_EQ(create("sim"), ssc::kNoHub);
  EXPECT_TRUE(said("simulated"));
}

}  // namespace
