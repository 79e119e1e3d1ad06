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

TEST(LinuxNotifications, TravelAsTypedSignalsAndAQuitNoticeTakesItsProcessOffTheQuitList) {
  CPrivateBus daemon;
  if (!daemon.IsUp()) GTEST_SKIP() << "no dbus-daemon to run a private bus";
  sd_bus* bus = nullptr;
  ASSERT_GE(sd_bus_open_user(&bus), 0);
  ASSERT_GE(sd_bus_add_match(bus, nullptr, "type='signal',interface='com.tavik.Notification'",
                             nullptr, nullptr),
            0);
  OProcessUtils::SetDesktop(std::make_shared<CLinuxDesktop>(nullptr));
  OProcessUtils* utils = OProcessUtils::GetInstance();
  utils->setQuitProcessIDList({42, 43});

  CLinuxDesktop poster(nullptr);
  poster.PostNotification({"TavikApplicationQuitNotification",
                           "com.tavik.TabletDriver",
                           {{"processID", 42}, {"bundleURL", "/apps/driver.desktop"}}});
  poster.PostNotification({"com.tavik.TFUCompleted", "", {}});

  sd_bus_message* quit = NextSignal(bus);
  ASSERT_NE(quit, nullptr);
  EXPECT_STREQ(sd_bus_message_get_member(quit), "TavikApplicationQuitNotification");
  EXPECT_STREQ(sd_bus_message_get_signature(quit, 1), "a{sv}");
  const char *url = nullptr, *urlKey = nullptr, *pidKey = nullptr;
  int32_t pid = 0;
  ASSERT_GE(sd_bus_message_read(quit, "a{sv}", 2, &urlKey, "s", &url, &pidKey, "i", &pid), 0);
  EXPECT_EQ(std::string(urlKey) + "=" + url + " " + pidKey + "=" + std::to_string(pid),
            "bundleURL=/apps/driver.desktop processID=42");
  sd_bus_message_unref(quit);
  sd_bus_message* completed = NextSignal(bus);
  ASSERT_NE(completed, nullptr);
  EXPECT_STREQ(sd_bus_message_get_member(completed), "com_tavik_TFUCompleted");
  EXPECT_STREQ(sd_bus_message_get_signature(completed, 1), "a{sv}");
  sd_bus_message_unref(completed);
  sd_bus_flush_close_unref(bus);

  for (int i = 0; i < 500 && utils->quitProcessIDList() != std::vector<int>{43}; ++i) {
    std::this_thread::sleep_for(std::chrono::milliseconds(10));
  }
  EXPECT_EQ(utils->quitProcessIDList(), std::vector<int>{43});
  OProcessUtils::SetDesktop(nullptr);
}

}  // namespace
