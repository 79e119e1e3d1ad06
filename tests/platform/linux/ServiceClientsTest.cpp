// The service clients over sd-bus, against stand-in services on a private bus.
#include <gtest/gtest.h>

#include <chrono>
#include <mutex>

#include "common/CClock.h"
#include "common/CTavException.h"
#include "common/CVirtualClock.h"
#include "host/OPersistentDataStoreClient.h"
#include "host/OUpdaterClient.h"
#include "lab/CLabDesktop.h"
#include "platform/linux/BusDictionary.h"
#include "platform/linux/CLinuxServiceDirectory.h"
#include "platform/linux/FakeBusService.h"
#include "platform/linux/FakeDataStore.h"
#include "platform/linux/PrivateBus.h"
#include "update/FLAppDelegate.h"

namespace {

using Strings = std::vector<std::string>;

// The update helper as it reads each call: "<method> <key>=<texts>...",
// where a value that came as anything but a list of texts reads "?".
class CFakeHelper {
 public:
  explicit CFakeHelper(bool answers_I)
      : mService(OUpdaterClient::kServiceName, "/com/tavik/UpdateHelper",
                 "com.tavik.UpdateHelperProtocol", kVtable, this, answers_I) {}
  bool IsReady() const { return mService.IsReady(); }
  Strings Arrived() { return mService.Records(); }

 private:
  static int OnCall(sd_bus_message* message_I, void* self_I, sd_bus_error*) {
    auto* self = static_cast<CFakeHelper*>(self_I);
    std::string call = sd_bus_message_get_member(message_I);
    const std::shared_ptr<CXPCDictionary> request = BusDictionary::Read(message_I);
    for (const auto& [key, value] : request->GetEntries()) {
      const auto* texts = std::get_if<Strings>(&value);
      call += " " + key + "=";
      for (const std::string& text : texts != nullptr ? *texts : Strings{"?"}) call += text + ",";
    }
    self->mService.Record(call);
    return sd_bus_reply_method_return(message_I, "a{sv}", 1, "Error Code", "x", int64_t{0});
  }

  static constexpr sd_bus_vtable kVtable[] = {
      SD_BUS_VTABLE_START(0),
      SD_BUS_METHOD("stopLaunchDProcess", "a{sv}", "a{sv}", &OnCall, SD_BUS_VTABLE_UNPRIVILEGED),
      SD_BUS_METHOD("stopProcess", "a{sv}", "a{sv}", &OnCall, SD_BUS_VTABLE_UNPRIVILEGED),
      SD_BUS_METHOD("startLaunchDProcess", "a{sv}", "a{sv}", &OnCall, SD_BUS_VTABLE_UNPRIVILEGED),
      SD_BUS_VTABLE_END};

  CFakeBusService mService;
};

class ServiceClients : public ::testing::Test {
 protected:
  void SetUp() override {
    if (!mBus.IsUp()) GTEST_SKIP() << "dbus-daemon is not installed";
    OXPCClient::SetServiceDirectory(OXPCClient::kPrivileged,
                                    std::make_shared<CLinuxServiceDirectory>(true));
    OXPCClient::SetServiceDirectory(0, std::make_shared<CLinuxServiceDirectory>(false));
  }
  void TearDown() override {
    OXPCClient::SetServiceDirectory(OXPCClient::kPrivileged, nullptr);
    OXPCClient::SetServiceDirectory(0, nullptr);
    CClock::Set(nullptr);
  }

  CPrivateBus mBus;
};

TEST_F(ServiceClients, DriverRequestsTravelAsListsOfTextsAndTheHelperIsFoundOnlyWhereItRuns) {
  EXPECT_EQ(OUpdaterClient::client(), nullptr);
  CFakeHelper helper(true);
  ASSERT_TRUE(helper.IsReady());
  const std::shared_ptr<OUpdaterClient> client = OUpdaterClient::client();
  ASSERT_NE(client, nullptr);
  EXPECT_EQ(client->connectToService().code, 0);

  OUpdaterClient::Request request{{"LaunchAgents", {"com.tavik.taviktablet"}}, {"User", {"1000"}}};
  const OUpdaterClient::Reply reply = client->stopLaunchDProcess(request);
  ASSERT_NE(reply, nullptr);
  EXPECT_EQ(reply->GetInteger(OXPCClient::kErrorCodeKey, -1), 0);
  request["BundleID"] = {"com.tavik.taviktablet", "com.tavik.TavikTouchDriver"};
  client->stopProcess(request);
  client->startLaunchDProcess(request);

  const std::string agents = " LaunchAgents=com.tavik.taviktablet, User=1000,";
  const std::string all = " BundleID=com.tavik.taviktablet,com.tavik.TavikTouchDriver," + agents;
  EXPECT_EQ(helper.Arrived(), (Strings{"stopLaunchDProcess" + agents, "stopProcess" + all,
                                       "startLaunchDProcess" + all}));
}

TEST_F(ServiceClients, AHelperThatNeverAnswersCostsHalfASecondACallAndTheDriverStopGoesOn) {
  CFakeHelper helper(false);
  ASSERT_TRUE(helper.IsReady());
  const std::shared_ptr<OUpdaterClient> client = OUpdaterClient::client();
  ASSERT_NE(client, nullptr);
  client->connectToService();

  const auto start = std::chrono::steady_clock::now();
  EXPECT_EQ(client->stopProcess(OUpdaterClient::Request{{"BundleID", {"x"}}}), nullptr);
  const double waited =
      std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
  EXPECT_GE(waited, 0.5);
  EXPECT_LT(waited, 1.5);

  // Two calls of half a second, the six seconds the services get to stop,
  // then each of the three applications quit, with two seconds to go.
  auto clock = std::make_shared<CVirtualClock>();
  CClock::Set(clock);
  CLabDesktop desktop;
  FLAppDelegate::stopDriver(desktop);
  EXPECT_NEAR(clock->GetTotalSlept(), 13.0, 0.01);
  for (const char* application : CLabDesktop::kApplications) {
    EXPECT_TRUE(desktop.RunningApplications(application).empty()) << application;
  }
}

TEST_F(ServiceClients, DataStoreTakesRepliesAndErrorsUserInfoAndThrowsWhenNothingComes) {
  EXPECT_EQ(OPersistentDataStoreClient::client(), nullptr);
  const SXPCError absent = OPersistentDataStoreClient().connectToService();
  EXPECT_EQ(absent.code, 1) << "after its twenty tries";
  EXPECT_EQ(absent.userInfo.at("Error"), "Service not running?");

  CFakeDataStore store;
  ASSERT_TRUE(store.IsReady());
  const std::shared_ptr<OPersistentDataStoreClient> client = OPersistentDataStoreClient::client();
  ASSERT_NE(client, nullptr);
  EXPECT_EQ(client->connectToService().code, 0);

  for (const bool asErrors : {false, true}) {
    SCOPED_TRACE(asErrors ? "replies as errors" : "replies");
    store.SetAnswerAsErrors(asErrors);
    client->setData("v1", "plain");
    EXPECT_TRUE(client->hasKey("plain"));
    EXPECT_EQ(client->getDataForKey("plain"), std::optional<std::string>("v1"));
    EXPECT_FALSE(client->hasKey("absent"));
    EXPECT_TRUE(client->deleteKey("plain"));
    EXPECT_FALSE(client->hasKey("plain"));
  }

  try {
    client->getDataForKey("silent");
    ADD_FAILURE() << "no exception";
  } catch (const CTavException& exception) {
    EXPECT_EQ(exception.GetMessage(), "silent");
    EXPECT_EQ(exception.GetStatus(), OXPCClient::kObjectNotAvailableStatus);
  }
}

}  // namespace
