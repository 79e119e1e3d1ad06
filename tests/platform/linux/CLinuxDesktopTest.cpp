// Applications and the access check of the Linux desktop.
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <filesystem>
#include <fstream>

#include "host/OProcessUtils.h"
#include "host/ProcessUtils.h"
#include "platform/linux/CDesktopEntries.h"
#include "platform/linux/CLinuxDesktop.h"
#include "platform/linux/CListedRegistry.h"

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

std::string ReadLink(const fs::path& path_I) {
  std::error_code error;
  return fs::read_symlink(path_I, error).string();
}

TEST_F(LinuxDesktop, LaunchedApplicationRunsDetachedIsNamedAndQuitsOnRequest) {
  WriteEntry("com.tavik.TestDriver", "\"" + mProgram.string() + "\" 30");
  WriteEntry("com.tavik.Broken", (mFolder / "no-such-program").string());
  EXPECT_EQ(mDesktop.LaunchApplication({"com.tavik.Broken", "", {}}), 0);
  EXPECT_EQ(mDesktop.LaunchApplication({"com.tavik.NotInstalled", "", {}}), 0);
  EXPECT_TRUE(mDesktop.RunningApplications("com.tavik.TestDriver").empty());

  // A descriptor of ours that closes at no exec, like the pipe a shell reads
  // our output from.
  int held[2];
  ASSERT_EQ(pipe(held), 0);
  const int pid = mDesktop.LaunchApplication({"com.tavik.TestDriver", "", {"1"}});
  close(held[0]);
  close(held[1]);
  ASSERT_GT(pid, 0);
  ASSERT_TRUE(
      WaitFor([&] { return mDesktop.RunningApplications("com.tavik.TestDriver").size() == 1; }));
  EXPECT_EQ(mDesktop.RunningApplications("com.tavik.TestDriver"), std::vector<int>{pid});

  const fs::path proc = "/proc/" + std::to_string(pid);
  const std::vector<std::string> standard{"0:/dev/null", "1:/dev/null", "2:/dev/null"};
  std::vector<std::string> descriptors;
  // The dynamic loader holds the libraries open for a moment after exec.
  WaitFor([&] {
    descriptors.clear();
    for (const auto& fd : fs::directory_iterator(proc / "fd")) {
      descriptors.push_back(fd.path().filename().string() + ":" + ReadLink(fd.path()));
    }
    std::sort(descriptors.begin(), descriptors.end());
    return descriptors == standard;
  });
  EXPECT_EQ(descriptors, standard);
  EXPECT_NE(getsid(pid), getsid(0));
  std::ifstream cmdline(proc / "cmdline");
  std::string arguments((std::istreambuf_iterator<char>(cmdline)),
                        std::istreambuf_iterator<char>());
  EXPECT_EQ(arguments, mProgram.string() + std::string("\0"
                                                       "30\0"
                                                       "1\0",
                                                       6));

  EXPECT_EQ(mDesktop.GetApplicationIdOfProcess(pid), "com.tavik.TestDriver");
  EXPECT_TRUE(mDesktop.IsApplicationProcess(pid));
  // A process that is no application goes by its executable's name.
  EXPECT_FALSE(mDesktop.IsApplicationProcess(getpid()));
  EXPECT_EQ(mDesktop.GetApplicationIdOfProcess(getpid()),
            fs::read_symlink("/proc/self/exe").filename().string());
  EXPECT_FALSE(mDesktop.IsTerminated(pid));

  EXPECT_TRUE(mDesktop.TerminateApplication(pid));
  EXPECT_TRUE(WaitFor([&] { return mDesktop.IsTerminated(pid); }));
  EXPECT_TRUE(
      WaitFor([&] { return mDesktop.RunningApplications("com.tavik.TestDriver").empty(); }));
}

TEST_F(LinuxDesktop, OnlyProcessesWhoseRealOwnerIsThisUserAreListedOrQuit) {
  // A process table of our own over children of ours: the program run by
  // us, by another user, and by another user as us (a set-id program: the
  // real id counts).
  WriteEntry("com.tavik.TestDriver", mProgram.string());
  const uid_t me = getuid(), other = me + 4242;
  std::vector<std::pair<pid_t, std::vector<uid_t>>> table = {
      {0, {me, me}}, {0, {other, other}}, {0, {other, me}}};
  for (auto& [pid, ids] : table) {
    pid = fork();
    if (pid == 0) {
      pause();
      _exit(0);
    }
    const fs::path folder = mFolder / "proc" / std::to_string(pid);
    fs::create_directories(folder);
    fs::create_symlink(mProgram, folder / "exe");
    std::ofstream(folder / "status") << "Name:\tdriver\nUid:\t" << ids[0] << "\t" << ids[1] << "\t"
                                     << ids[1] << "\t" << ids[1] << "\n";
  }
  CLinuxDesktop desktop(nullptr, CProcFolder((mFolder / "proc").string()));
  EXPECT_EQ(desktop.RunningApplications("com.tavik.TestDriver"), std::vector<int>{table[0].first});
  // Another user's process is sent nothing; and root starts no second one
  // beside another user's.
  EXPECT_FALSE(desktop.TerminateApplication(table[1].first));
  EXPECT_FALSE(desktop.TerminateApplication(table[2].first));
  if (getuid() == 0) {
    EXPECT_EQ(desktop.LaunchApplication({"com.tavik.TestDriver", "", {}}), 0);
  }
  for (const auto& [pid, ids] : table) {
    EXPECT_EQ(waitpid(pid, nullptr, WNOHANG), 0) << "process " << pid << " was ended";
    kill(pid, SIGKILL);
    waitpid(pid, nullptr, 0);
  }
}

TEST_F(LinuxDesktop, LaunchCountsOnceTheApplicationShowsWithinAboutASecond) {
  auto desktop = std::make_shared<CLinuxDesktop>(nullptr);
  OProcessUtils::SetDesktop(desktop);
  WriteEntry("com.tavik.TestDriver", "\"" + mProgram.string() + "\" 30");
  // A wrapper whose process never runs the entry's program.
  const fs::path wrapper = mFolder / "wrapper";
  std::ofstream(wrapper) << "#!/bin/sh\nexec /bin/sleep 2\n";
  fs::permissions(wrapper, fs::perms::owner_all);
  WriteEntry("com.tavik.Wrapped", wrapper.string());

  EXPECT_TRUE(ProcessUtils::LaunchApplicationWithBundleID("com.tavik.TestDriver", std::nullopt,
                                                          65536, true, std::nullopt));
  const std::vector<int> running = desktop->RunningApplications("com.tavik.TestDriver");
  ASSERT_EQ(running.size(), 1u);
  // Running already: nothing more starts, and the answer is no.
  EXPECT_FALSE(ProcessUtils::LaunchApplicationWithBundleID("com.tavik.TestDriver", std::nullopt,
                                                           65536, true, std::nullopt));
  EXPECT_EQ(desktop->RunningApplications("com.tavik.TestDriver"), running);

  const auto start = std::chrono::steady_clock::now();
  EXPECT_FALSE(ProcessUtils::LaunchApplicationWithBundleID("com.tavik.Wrapped", std::nullopt, 65536,
                                                           true, std::nullopt));
  const double waited =
      std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
  EXPECT_GE(waited, 0.9);
  EXPECT_LT(waited, 5.0);

  kill(running[0], SIGKILL);
  OProcessUtils::SetDesktop(nullptr);
}

TEST_F(LinuxDesktop, AccessIsRefusedOnlyForNodesThisUserMayNotOpen) {
  auto registry = std::make_shared<CListedRegistry>();
  CLinuxDesktop desktop(registry);
  EXPECT_TRUE(desktop.RequestHidAccess());  // no tablet: nothing refused
  std::ofstream(mFolder / "hidraw0") << "";
  const DeviceInfo tablet{0x7A5D, 1, 1, 1, 0xFF00};
  registry->hid = {{tablet, (mFolder / "hidraw0").string()}, {tablet, (mFolder / "gone").string()}};
  EXPECT_TRUE(desktop.RequestHidAccess());

  // A node this user may not open. Root may open anything, so as root the
  // check runs in a child that has become an unprivileged user.
  const fs::path locked = fs::path("/tmp") / ("tavik-hid-" + std::to_string(getpid()));
  std::ofstream(locked) << "";
  chmod(locked.c_str(), 0);
  registry->hid = {{tablet, locked.string()}};
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
