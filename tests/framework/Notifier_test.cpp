#include "framework/Notifier.h"

#include <gtest/gtest.h>

#include "ssc/Log.h"
#include "support/Capture.h"
#include "support/ScriptedHub.h"

namespace {

using std::chrono::milliseconds;
using std::chrono::seconds;

class NotifierTest : public testing::Test {
 protected:
  NotifierTest() { script->sensors = {{a, "pressure", "chipa"}, {b, "mag", "chipb"}}; }

  int notify(const std::set<ssc::SensorUid>& suids) {
    connection = connectTo(script);
    return Notifier(connection.get()).NotifyCalibrationCompleted(suids);
  }

  [[nodiscard]] milliseconds elapsed() const {
    return std::chrono::duration_cast<milliseconds>(connection->clock().now().time_since_epoch());
  }

  const ssc::SensorUid a{1, 1};
  const ssc::SensorUid b{2, 2};
  const ssc::SensorUid stranger{3, 3};
  std::shared_ptr<HubScript> script = std::make_shared<HubScript>();
  std::unique_ptr<ssc::Connection> connection;
};

TEST_F(NotifierTest, ASensorThatConfirmsIsSuccessAtOnce) {
  connection = connectTo(script);
  EXPECT_EQ(Notifier(connection.get()).NotifyCalibrationCompleted(a), 0);
  EXPECT_EQ(elapsed(), milliseconds(0));
  ASSERT_EQ(script->requests.size(), 1U);
  EXPECT_EQ(script->requests[0].msg_id(), 610U);
  EXPECT_TRUE(script->requests[0].has_request());
  EXPECT_FALSE(script->requests[0].request().has_payload());
}

TEST_F(NotifierTest, AllSensorsHaveToConfirm) {
  EXPECT_EQ(notify({a, b}), 0);
  EXPECT_EQ(script->countRequests(a, 610), 1);
  EXPECT_EQ(script->countRequests(b, 610), 1);
}

TEST_F(NotifierTest, OneOfTwoConfirmingTimesOutAfterThreeSeconds) {
  script->sensors[1].confirms = false;
  EXPECT_EQ(notify({a, b}), -110);
  EXPECT_EQ(elapsed(), seconds(3));
}

TEST_F(NotifierTest, NobodyToNotifySendsNothing) {
  EXPECT_EQ(notify({}), 0);
  EXPECT_TRUE(script->requests.empty());
}

TEST_F(NotifierTest, AConfirmationOfASensorThatWasNotAskedChangesNothing) {
  Notifier notifier((connection = connectTo(script)).get());
  script->sensors[0].confirms = false;
  script->onRequest = [&](ScriptedHub& hub, const sns_client_request_msg&) {
    hub.SendEvent(milliseconds(5), b, 1110, "");
    return false;
  };
  // Even one that this client hears, because it has asked that sensor before.
  notifier.SendRequest(ssc::Client::MakeDisableRequest(b));
  EXPECT_EQ(notifier.NotifyCalibrationCompleted(a), -110);
}

TEST_F(NotifierTest, AConfirmationBehindAnUnrelatedEventOfTheSameMessageCounts) {
  script->onRequest = [&](ScriptedHub& hub, const sns_client_request_msg& request) {
    sns_client_event_msg message;
    *message.mutable_suid() = request.suid();
    for (const std::uint32_t id : {1025U, 1110U}) {
      auto* event = message.add_events();
      event->set_msg_id(id);
      event->set_timestamp(0);
      event->set_payload("");
    }
    hub.SendMessage(milliseconds(20), message);
    return true;
  };
  EXPECT_EQ(notify({a}), 0);
  EXPECT_EQ(elapsed(), milliseconds(20));
}

TEST_F(NotifierTest, ItsHandlerIsTracedAtTheHighestLevel) {
  ssc::setLogLevel(ssc::kLogVerbose);
  const Captured captured = capture([&] { return notify({a}); });
  ssc::setLogLevel(ssc::kLogInfo);
  EXPECT_EQ(captured.result, 0);
  EXPECT_EQ(captured.out,
            "VERBOSE: virtual void Notifier::OnEvent(const sns_client_event_msg &) -->\n"
            "VERBOSE: virtual void Notifier::OnEvent(const sns_client_event_msg &) <--\n");
}

TEST_F(NotifierTest, AFailureIsLeftToTheCallerToReport) {
  script->sensors[0].confirms = false;
  const Captured captured = capture([&] { return notify({a}); });
  EXPECT_EQ(captured.result, -110);
  EXPECT_EQ(captured.out + captured.err, "");
}

TEST_F(NotifierTest, ALateConfirmationIsATimeOut) {
  script->onRequest = [&](ScriptedHub& hub, const sns_client_request_msg&) {
    hub.SendEvent(milliseconds(3001), a, 1110, "");
    return true;
  };
  EXPECT_EQ(notify({a}), -110);
}

TEST_F(NotifierTest, ARefusedRequestIsTheResult) {
  script->refuses = [&](const sns_client_request_msg& request) {
    return ssc::SensorUid(request.suid()) == b;
  };
  EXPECT_EQ(notify({a, b}), -5);
  EXPECT_EQ(elapsed(), milliseconds(0));
}

}  // namespace
