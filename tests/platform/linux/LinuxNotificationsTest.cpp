// The family's notifications as D-Bus signals on a private session bus:
// their form on the bus, and the quit notices the process list listens for.
#include <gtest/gtest.h>
#include <systemd/sd-bus.h>

#include <chrono>
#include <thread>

#include "host/OProcessUtils.h"
#include "platform/linux/CLinuxDesktop.h"
#include "platform/linux/PrivateBus.h"

namespace {

bool WaitFor(const std::function<bool()>& done_I) {
  for (int i = 0; i < 500; ++i) {
    if (done_I()) return true;
    std::this_thread::sleep_for(std::chrono::milliseconds(10));
  }
  return done_I();
}

class LinuxNotifications : public ::testing::Test {
 protected:
  void SetUp() override {
    if (!mBus.IsUp()) GTEST_SKIP() << "no dbus-daemon to run a private bus";
    // The private daemon stands in for the session bus of this process.
    setenv("DBUS_SESSION_BUS_ADDRESS", std::getenv("DBUS_SYSTEM_BUS_ADDRESS"), 1);
  }
  void TearDown() override {
    OProcessUtils::SetDesktop(nullptr);
    unsetenv("DBUS_SESSION_BUS_ADDRESS");
  }

  CPrivateBus mBus;
  CLinuxDesktop mPoster{nullptr};
};

// The next signal of the family that reaches `bus_I`, or null.
sd_bus_message* NextSignal(sd_bus* bus_I) {
  for (int i = 0; i < 50; ++i) {
    sd_bus_message* message = nullptr;
    const int status = sd_bus_process(bus_I, &message);
    if (message != nullptr &&
        sd_bus_message_is_signal(message, "com.tavik.Notification", nullptr) > 0) {
      return message;
    }
    sd_bus_message_unref(message);
    if (status < 0) return nullptr;
    if (status == 0) sd_bus_wait(bus_I, 100 * 1000);
  }
  return nullptr;
}

TEST_F(LinuxNotifications, NameBecomesTheMemberAndUserInformationATypedDictionary) {
  sd_bus* bus = nullptr;
  ASSERT_GE(sd_bus_open_user(&bus), 0);
  ASSERT_GE(sd_bus_add_match(bus, nullptr, "type='signal',interface='com.tavik.Notification'",
                             nullptr, nullptr),
            0);
  mPoster.PostNotification({"TavikApplicationQuitNotification",
                            "com.tavik.TabletDriver",
                            {{"processID", 42}, {"bundleURL", "/apps/driver.desktop"}}});
  mPoster.PostNotification({"com.tavik.TFUCompleted", "", {}});

  sd_bus_message* quit = NextSignal(bus);
  ASSERT_NE(quit, nullptr);
  EXPECT_STREQ(sd_bus_message_get_member(quit), "TavikApplicationQuitNotification");
  EXPECT_STREQ(sd_bus_message_get_signature(quit, 1), "a{sv}");
  const char *url = nullptr, *urlKey = nullptr, *pidKey = nullptr;
  int32_t pid = 0;
  ASSERT_GE(sd_bus_message_read(quit, "a{sv}", 2, &urlKey, "s", &url, &pidKey, "i", &pid), 0);
  EXPECT_STREQ(urlKey, "bundleURL");
  EXPECT_STREQ(url, "/apps/driver.desktop");
  EXPECT_STREQ(pidKey, "processID");
  EXPECT_EQ(pid, 42);
  sd_bus_message_unref(quit);

  sd_bus_message* completed = NextSignal(bus);
  ASSERT_NE(completed, nullptr);
  EXPECT_STREQ(sd_bus_message_get_member(completed), "com_tavik_TFUCompleted");
  EXPECT_STREQ(sd_bus_message_get_path(completed), "/com/tavik/Notification");
  EXPECT_STREQ(sd_bus_message_get_signature(completed, 1), "a{sv}");
  sd_bus_message_unref(completed);
  sd_bus_flush_close_unref(bus);
}

TEST_F(LinuxNotifications, QuitNoticeTakesOnlyItsOwnProcessOffTheQuitList) {
  CLinuxDesktop watcher(nullptr);
  std::mutex lock;
  std::vector<SNotification> heard;
  ASSERT_TRUE(watcher.ObserveNotifications([&](const SNotification& notification_I) {
    std::lock_guard<std::mutex> guard(lock);
    heard.push_back(notification_I);
  }));
  OProcessUtils::SetDesktop(std::make_shared<CLinuxDesktop>(nullptr));
  OProcessUtils* utils = OProcessUtils::GetInstance();
  utils->setQuitProcessIDList({42, 43});

  mPoster.PostNotification(
      {"TavikApplicationQuitNotification", "com.tavik.Other", {{"processID", 99}}});
  mPoster.PostNotification(
      {"TavikApplicationQuitNotification", "com.tavik.TabletDriver", {{"processID", 42}}});
  EXPECT_TRUE(WaitFor([&] { return utils->quitProcessIDList() == std::vector<int>{43}; }));

  // Back from the bus as it was sent.
  ASSERT_TRUE(WaitFor([&] {
    std::lock_guard<std::mutex> guard(lock);
    return heard.size() == 2;
  }));
  watcher.ObserveNotifications(nullptr);
  EXPECT_EQ(heard[1].name, "TavikApplicationQuitNotification");
  EXPECT_EQ(heard[1].object, "com.tavik.TabletDriver");
  EXPECT_EQ(heard[1].userInfo.at("processID"), NotificationValue(42));
}

}  // namespace
