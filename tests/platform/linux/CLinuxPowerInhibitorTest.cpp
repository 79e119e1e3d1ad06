// The logind inhibitor against a private bus with a stand-in logind.
#include <gtest/gtest.h>
#include <poll.h>
#include <systemd/sd-bus.h>

#include <vector>

#include "platform/linux/CLinuxPowerInhibitor.h"
#include "platform/linux/FakeBusService.h"
#include "platform/linux/PrivateBus.h"

namespace {

// Answers Inhibit with one end of a pipe and keeps the other, so the test
// sees when the caller lets go: the read end reports end of file.
class CFakeLogind {
 public:
  enum class EMode { kGrant, kRefuse, kRefuseShutdown };

  explicit CFakeLogind(EMode mode_I)
      : mMode(mode_I),
        mService("org.freedesktop.login1", "/org/freedesktop/login1",
                 "org.freedesktop.login1.Manager", kVtable, this) {}
  ~CFakeLogind() {
    for (int fd : mReadEnds) close(fd);
  }

  bool IsReady() const { return mService.IsReady(); }
  // Each call as "<what> <who> <why> <mode>".
  std::vector<std::string> Calls() { return mService.Records(); }
  std::vector<int> ReadEnds() const { return mReadEnds; }

 private:
  static int OnInhibit(sd_bus_message* message_I, void* self_I, sd_bus_error* error_O) {
    auto* self = static_cast<CFakeLogind*>(self_I);
    const char *what = nullptr, *who = nullptr, *why = nullptr, *mode = nullptr;
    sd_bus_message_read(message_I, "ssss", &what, &who, &why, &mode);
    self->mService.Record(std::string(what) + " " + who + " " + why + " " + mode);
    if (self->mMode == EMode::kRefuse ||
        (self->mMode == EMode::kRefuseShutdown && std::string(what) == "shutdown")) {
      return sd_bus_error_set(error_O, SD_BUS_ERROR_ACCESS_DENIED, "not for you");
    }
    int ends[2];
    if (pipe(ends) != 0) return -errno;
    self->mReadEnds.push_back(ends[0]);
    const int status = sd_bus_reply_method_return(message_I, "h", ends[1]);
    close(ends[1]);  // the reply carries its own copy
    return status;
  }

  static constexpr sd_bus_vtable kVtable[] = {
      SD_BUS_VTABLE_START(0),
      SD_BUS_METHOD("Inhibit", "ssss", "h", &CFakeLogind::OnInhibit, SD_BUS_VTABLE_UNPRIVILEGED),
      SD_BUS_VTABLE_END};

  EMode mMode;
  std::vector<int> mReadEnds;
  CFakeBusService mService;
};

TEST(LinuxPowerInhibitor, HoldsIdleAndShutdownLocksUntilTheAssertionGoesAndIsRefusedOnlyByLogind) {
  CPrivateBus bus;
  if (!bus.IsUp()) GTEST_SKIP() << "dbus-daemon is not installed";
  CLinuxPowerInhibitor inhibitor;
  {
    CFakeLogind logind(CFakeLogind::EMode::kGrant);
    ASSERT_TRUE(logind.IsReady());
    auto assertion = inhibitor.Create("Updating Tavik tablet firmware");
    ASSERT_NE(assertion, nullptr);
    // Idle sleep blocked, and a shutdown delayed until the update lets go.
    EXPECT_EQ(logind.Calls(),
              (std::vector<std::string>{
                  "idle:sleep tavik-fwupdater Updating Tavik tablet firmware block",
                  "shutdown tavik-fwupdater Updating Tavik tablet firmware delay"}));
    ASSERT_EQ(logind.ReadEnds().size(), 2u);
    for (int readEnd : logind.ReadEnds()) {
      pollfd entry{readEnd, POLLIN, 0};
      EXPECT_EQ(poll(&entry, 1, 0), 0) << "still held";
    }
    assertion.reset();
    for (int readEnd : logind.ReadEnds()) {
      pollfd entry{readEnd, POLLIN, 0};
      EXPECT_EQ(poll(&entry, 1, 2000), 1) << "let go";
    }
  }
  {
    // Without the shutdown lock the update still runs, keeping the idle one.
    CFakeLogind logind(CFakeLogind::EMode::kRefuseShutdown);
    ASSERT_TRUE(logind.IsReady());
    auto assertion = inhibitor.Create("x");
    ASSERT_NE(assertion, nullptr);
    ASSERT_EQ(logind.ReadEnds().size(), 1u);
    pollfd entry{logind.ReadEnds()[0], POLLIN, 0};
    EXPECT_EQ(poll(&entry, 1, 0), 0) << "idle lock still held";
  }
  {
    CFakeLogind logind(CFakeLogind::EMode::kRefuse);
    ASSERT_TRUE(logind.IsReady());
    EXPECT_EQ(inhibitor.Create("x"), nullptr);
  }
  // Nobody owns the logind name on this bus; then no bus at all. Neither
  // can idle the machine to sleep.
  EXPECT_NE(inhibitor.Create("x"), nullptr);
  setenv("DBUS_SYSTEM_BUS_ADDRESS", "unix:path=/nonexistent/tavik-test-bus", 1);
  EXPECT_NE(inhibitor.Create("x"), nullptr);
}

}  // namespace
