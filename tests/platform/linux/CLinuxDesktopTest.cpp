// Applications and the access check of the Linux desktop.
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>

#include "platform/linux/CDesktopEntries.h"
#include "platform/linux/CLinuxDesktop.h"

namespace {

namespace fs = std::filesystem;

class LinuxDesktop : public ::testing::Test {
 protected:
  void SetUp() override {
    mFolder = fs::temp_directory_path() /
              ("desktop-" + std::to_string(getpid()) + "-" +
               ::testing::UnitTest::GetInstance()->current_test_info()->name());
    fs::create_directories(mFolder / "data" / "applications");
    setenv("XDG_DATA_HOME", (mFolder / "data").c_str(), 1);
    setenv("XDG_DATA_DIRS", (mFolder / "none").c_str(), 1);
    // A program of our own, so that no other process shares its path.
    mProgram = mFolder / ("tavik-sleeper-" + std::to_string(getpid()));
    fs::copy_file("/bin/sleep", mProgram);
  }
  void TearDown() override {
    unsetenv("XDG_DATA_HOME");
    unsetenv("XDG_DATA_DIRS");
    fs::remove_all(mFolder);
  }
  void WriteEntry(const std::string& id_I, const std::string& exec_I) {
    std::ofstream(mFolder / "data" / "applications" / (id_I + ".desktop"))
        << "[Desktop Entry]\nType=Application\nName=Test\n"
        << "[Desktop Action other]\nExec=/bin/false\n"
        << "[Desktop Entry]\nExec=" << exec_I << "\n";
  }
  bool WaitFor(const std::function<bool()>& done_I) {
    for (int i = 0; i < 200; ++i) {
      if (done_I()) return true;
      usleep(10 * 1000);
    }
    return done_I();
  }

  fs::path mFolder;
  fs::path mProgram;
  CLinuxDesktop mDesktop{nullptr};
};

TEST_F(LinuxDesktop, ExecLinesSplitLikeTheDesktopEntryFormat) {
  using Words = std::vector<std::string>;
  EXPECT_EQ(CDesktopEntries::SplitExec("prog  -a \"b c\" d"), (Words{"prog", "-a", "b c", "d"}));
  EXPECT_EQ(CDesktopEntries::SplitExec("\"/opt/my app/run\" \"q\\\"x\""),
            (Words{"/opt/my app/run", "q\"x"}));
  EXPECT_EQ(CDesktopEntries::SplitExec("   "), Words{});

  WriteEntry("com.tavik.Fields", "sleep 5 %U --x=%% %f");
  const auto entry = CDesktopEntries::Find("com.tavik.Fields");
  ASSERT_TRUE(entry.has_value());
  EXPECT_EQ(entry->exec, "sleep 5  --x=%");
  EXPECT_EQ(entry->program, fs::canonical("/bin/sleep").string());
  EXPECT_FALSE(CDesktopEntries::Find("../etc/passwd").has_value());
  EXPECT_FALSE(CDesktopEntries::Find("com.tavik.Missing").has_value());
}

TEST_F(LinuxDesktop, LaunchedApplicationRunsIsNamedAndQuitsOnRequest) {
  WriteEntry("com.tavik.TestDriver", "\"" + mProgram.string() + "\" 30");
  WriteEntry("com.tavik.Broken", (mFolder / "no-such-program").string());
  EXPECT_EQ(mDesktop.LaunchApplication({"com.tavik.Broken", "", {}}), 0);
  EXPECT_EQ(mDesktop.LaunchApplication({"com.tavik.NotInstalled", "", {}}), 0);
  EXPECT_TRUE(mDesktop.RunningApplications("com.tavik.TestDriver").empty());

  ASSERT_GT(mDesktop.LaunchApplication({"com.tavik.TestDriver", "", {}}), 0);
  std::vector<int> running;
  ASSERT_TRUE(WaitFor([&] {
    running = mDesktop.RunningApplications("com.tavik.TestDriver");
    return running.size() == 1;
  }));
  EXPECT_EQ(mDesktop.GetApplicationIdOfProcess(running[0]), "com.tavik.TestDriver");
  EXPECT_TRUE(mDesktop.IsApplicationProcess(running[0]));
  // A process that is no application goes by its executable's name.
  EXPECT_FALSE(mDesktop.IsApplicationProcess(getpid()));
  EXPECT_EQ(mDesktop.GetApplicationIdOfProcess(getpid()),
            fs::read_symlink("/proc/self/exe").filename().string());
  EXPECT_FALSE(mDesktop.IsTerminated(running[0]));

  EXPECT_TRUE(mDesktop.TerminateApplication(running[0]));
  EXPECT_TRUE(WaitFor([&] { return mDesktop.IsTerminated(running[0]); }));
  EXPECT_TRUE(
      WaitFor([&] { return mDesktop.RunningApplications("com.tavik.TestDriver").empty(); }));
}

class CListRegistry : public CDeviceRegistry {
 public:
  std::vector<std::string> nodes;
  std::vector<SHidEntry> ListHidInterfaces(uint32_t) override {
    std::vector<SHidEntry> entries;
    for (const std::string& node : nodes) entries.push_back({{0x7A5D, 1, 1, 1, 0xFF00}, node});
    return entries;
  }
  std::vector<SUsbEntry> ListUsbDevices(uint32_t) override { return {}; }
  bool OpenWatch() override { return false; }
  void RunWatch(CRegistryWatcher&) override {}
  void StopWatching() override {}
};

TEST_F(LinuxDesktop, AccessIsRefusedOnlyForNodesThisUserMayNotOpen) {
  auto registry = std::make_shared<CListRegistry>();
  CLinuxDesktop desktop(registry);
  EXPECT_TRUE(desktop.RequestHidAccess());  // no tablet: nothing refused
  std::ofstream(mFolder / "hidraw0") << "";
  registry->nodes = {(mFolder / "hidraw0").string(), (mFolder / "gone").string()};
  EXPECT_TRUE(desktop.RequestHidAccess());

  // A node this user may not open. Root may open anything, so as root the
  // check runs in a child that has become an unprivileged user.
  const fs::path locked = fs::path("/tmp") / ("tavik-hid-" + std::to_string(getpid()));
  std::ofstream(locked) << "";
  chmod(locked.c_str(), 0);
  registry->nodes = {locked.string()};
  const pid_t child = fork();
  ASSERT_GE(child, 0);
  if (child == 0) {
    if (geteuid() == 0 && (setgid(65534) != 0 || setuid(65534) != 0)) _exit(2);
    _exit(desktop.RequestHidAccess() ? 1 : 0);
  }
  int status = 0;
  waitpid(child, &status, 0);
  fs::remove(locked);
  EXPECT_EQ(status, 0) << "exit 1: access was not refused; 2: could not drop privileges";
}

}  // namespace
