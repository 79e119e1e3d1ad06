// tavik-update-helper on a private bus, with polkit and systemd answered by
// stand-ins: what it does for whom, and what it refuses.
#include <grp.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <mutex>
#include <sstream>

#include "common/CClock.h"
#include "helper/CPolkitAuthority.h"
#include "host/OUpdaterClient.h"
#include "platform/linux/BusDictionary.h"
#include "platform/linux/CLinuxServiceConnection.h"
#include "platform/linux/CLinuxServiceDirectory.h"
#include "platform/linux/FakeBusService.h"
#include "platform/linux/PrivateBus.h"

namespace fs = std::filesystem;

namespace {

using Strings = std::vector<std::string>;

const std::string kAgent = "com.tavik.taviktablet";
const std::string kDriver = "com.tavik.TabletDriver";
const std::string kTouch = "com.tavik.TavikTouchDriver";
// The agent's two configured units, stopped and then started.
const Strings kStopAndStartJobs = {
    "StopUnit tavik-test-driver.service replace", "StopUnit tavik-test-tray.service replace",
    "StartUnit tavik-test-driver.service replace", "StartUnit tavik-test-tray.service replace"};

class CFakePolkit {
 public:
  CFakePolkit()
      : mService("org.freedesktop.PolicyKit1", "/org/freedesktop/PolicyKit1/Authority",
                 "org.freedesktop.PolicyKit1.Authority", kVtable, this) {}
  bool IsReady() const { return mService.IsReady(); }
  void SetAllow(bool allow_I) { mAllow = allow_I; }
  // Each question as "<subject kind> <action id> unique", the last word
  // saying the subject was named by its unique bus name.
  Strings Questions() { return mService.Records(); }

 private:
  static int OnCheck(sd_bus_message* message_I, void* self_I, sd_bus_error*) {
    auto* self = static_cast<CFakePolkit*>(self_I);
    const char* kind = nullptr;
    const char* action = nullptr;
    sd_bus_message_enter_container(message_I, 'r', "sa{sv}");
    sd_bus_message_read(message_I, "s", &kind);
    const auto subject = BusDictionary::Read(message_I);
    sd_bus_message_exit_container(message_I);
    sd_bus_message_read(message_I, "s", &action);
    const std::string* name = subject ? subject->Get<std::string>("name") : nullptr;
    self->mService.Record(std::string(kind) + " " + action + " " +
                          (name != nullptr && name->rfind(':', 0) == 0 ? "unique" : "?"));
    return sd_bus_reply_method_return(message_I, "(bba{ss})", static_cast<int>(self->mAllow.load()),
                                      0, 0);
  }
  static constexpr sd_bus_vtable kVtable[] = {
      SD_BUS_VTABLE_START(0),
      SD_BUS_METHOD("CheckAuthorization", "(sa{sv})sa{ss}us", "(bba{ss})", &OnCheck,
                    SD_BUS_VTABLE_UNPRIVILEGED),
      SD_BUS_VTABLE_END};

  std::atomic<bool> mAllow{true};
  CFakeBusService mService;
};

class CFakeSystemd {
 public:
  CFakeSystemd()
      : mService("org.freedesktop.systemd1", "/org/freedesktop/systemd1",
                 "org.freedesktop.systemd1.Manager", kVtable, this) {}
  bool IsReady() const { return mService.IsReady(); }
  // "<method> <unit> <mode>" for each job asked for.
  Strings Jobs() { return mService.Records(); }

 private:
  static int OnJob(sd_bus_message* message_I, void* self_I, sd_bus_error*) {
    auto* self = static_cast<CFakeSystemd*>(self_I);
    const char* unit = nullptr;
    const char* mode = nullptr;
    sd_bus_message_read(message_I, "ss", &unit, &mode);
    self->mService.Record(std::string(sd_bus_message_get_member(message_I)) + " " + unit + " " +
                          mode);
    return sd_bus_reply_method_return(message_I, "o", "/org/freedesktop/systemd1/job/1");
  }
  static constexpr sd_bus_vtable kVtable[] = {
      SD_BUS_VTABLE_START(0),
      SD_BUS_METHOD("StopUnit", "ss", "o", &OnJob, SD_BUS_VTABLE_UNPRIVILEGED),
      SD_BUS_METHOD("StartUnit", "ss", "o", &OnJob, SD_BUS_VTABLE_UNPRIVILEGED), SD_BUS_VTABLE_END};

  CFakeBusService mService;
};

fs::path MakeFolder() {
  char folder[] = "/tmp/tavik-helper-XXXXXX";
  return mkdtemp(folder) != nullptr ? fs::path(folder) : fs::path();
}

void WriteConfig(const fs::path& file_I, const fs::path& driver_I) {
  std::ofstream(file_I) << "# the driver of this test\n"
                        << "unit " << kAgent << " tavik-test-driver.service\n"
                        << "unit " << kAgent << " tavik-test-tray.service  # a second unit\n"
                        << "executable " << kDriver << " " << driver_I.string() << "\n"
                        << "ignore " << kTouch << "\n"
                        << "unit " << kDriver << " not-a-unit-name\n";
}

std::string ReadFile(const fs::path& file_I) {
  std::ostringstream text;
  text << std::ifstream(file_I).rdbuf();
  return text.str();
}

// The helper's answer: its dictionary or its error's user information (null
// for an error of the bus's own), and whether it was an error.
struct SAnswer {
  bool error = false;
  std::shared_ptr<CXPCDictionary> body;
  int64_t Code() const { return body ? body->GetInteger(OXPCClient::kErrorCodeKey, -1) : -1; }
};

SAnswer Ask(const std::string& message_I, const CXPCDictionary* argument_I) {
  auto connection = CLinuxServiceConnection::Open(true, OUpdaterClient::kServiceName,
                                                  OUpdaterClient::kServerProtocol, "Client");
  SAnswer answer;
  bool done = false;
  if (!connection) return answer;
  std::shared_ptr<const CXPCDictionary> argument;
  if (argument_I != nullptr) argument = std::make_shared<const CXPCDictionary>(*argument_I);
  connection->Send(message_I, argument, [&](std::shared_ptr<CXPCDictionary> body_I, bool error_I) {
    answer = SAnswer{error_I, std::move(body_I)};
    done = true;
  });
  TavPollUntil(5.0, 0.001, [&] {
    connection->Dispatch();
    return done;
  });
  return answer;
}

pid_t StartProcess(const fs::path& program_I) {
  const pid_t child = fork();
  if (child == 0) {
    execl(program_I.c_str(), program_I.c_str(), "30", static_cast<char*>(nullptr));
    _exit(127);
  }
  return child;
}

// The signal that ended the process, 0 if it did not end within 5 s.
int EndingSignal(pid_t pid_I) {
  int status = 0;
  const bool ended =
      TavPollUntil(5.0, 0.01, [&] { return waitpid(pid_I, &status, WNOHANG) == pid_I; });
  return ended && WIFSIGNALED(status) ? WTERMSIG(status) : 0;
}

class UpdateHelper : public ::testing::Test {
 protected:
  void SetUp() override {
    if (!mBus.IsUp()) GTEST_SKIP() << "dbus-daemon is not installed";
    ASSERT_TRUE(mPolkit.IsReady());
    ASSERT_TRUE(mSystemd.IsReady());
    mFolder = MakeFolder();
    fs::copy_file("/bin/sleep", mFolder / "tavik-test-driver");
    WriteConfig(mFolder / "update-helper.conf", mFolder / "tavik-test-driver");
    mHelper = fork();
    if (mHelper == 0) {
      if (std::freopen((mFolder / "helper.log").c_str(), "w", stderr) == nullptr) _exit(126);
      execl(TAV_HELPER_PATH, "tavik-update-helper", "--config",
            (mFolder / "update-helper.conf").c_str(), static_cast<char*>(nullptr));
      _exit(127);
    }
    CLinuxServiceDirectory bus(true);
    ASSERT_TRUE(
        TavPollUntil(5.0, 0.01, [&] { return bus.HasService(OUpdaterClient::kServiceName); }));
  }
  void TearDown() override {
    if (mHelper > 0) {
      kill(mHelper, SIGTERM);
      waitpid(mHelper, nullptr, 0);
    }
    std::error_code ignored;
    if (!mFolder.empty()) fs::remove_all(mFolder, ignored);
  }
  std::string Log() const { return ReadFile(mFolder / "helper.log"); }
  bool HelperRuns() const { return waitpid(mHelper, nullptr, WNOHANG) == 0; }

  CPrivateBus mBus;
  CFakePolkit mPolkit;
  CFakeSystemd mSystemd;
  fs::path mFolder;
  pid_t mHelper = -1;
};

TEST_F(UpdateHelper, AnAuthorisedCallerStopsAndStartsTheConfiguredUnitsAndProcessesAndFindsUsers) {
  const pid_t driver = StartProcess(mFolder / "tavik-test-driver");
  const pid_t stranger = StartProcess("/bin/sleep");
  const CXPCDictionary agents{{"LaunchAgents", Strings{kAgent}}, {"User", Strings{"1000"}}};
  const CXPCDictionary processes{{"LaunchAgents", Strings{kAgent}},
                                 {"User", Strings{"1000"}},
                                 {"BundleID", Strings{kAgent, kTouch, kDriver}}};

  EXPECT_EQ(Ask("stopLaunchDProcess:withReply:", &agents).Code(), 0);
  const SAnswer found = Ask("findAllProcessesInList:withReply:", &processes);
  ASSERT_NE(found.body, nullptr);
  ASSERT_NE(found.body->Get<Strings>("Running"), nullptr);
  EXPECT_EQ(*found.body->Get<Strings>("Running"), Strings{kDriver});
  EXPECT_EQ(Ask("stopProcess:withReply:", &processes).Code(), 0);
  EXPECT_EQ(EndingSignal(driver), SIGTERM);
  EXPECT_EQ(Ask("startLaunchDProcess:withReply:", &processes).Code(), 0);

  EXPECT_EQ(mSystemd.Jobs(), kStopAndStartJobs);
  const std::string question =
      std::string("system-bus-name ") + CPolkitAuthority::kActionId + " unique";
  EXPECT_EQ(mPolkit.Questions(), Strings(3, question));
  // Only the configured program's processes were asked to quit.
  EXPECT_EQ(waitpid(stranger, nullptr, WNOHANG), 0);
  kill(stranger, SIGKILL);
  waitpid(stranger, nullptr, 0);
  EXPECT_NE(Log().find("update-helper.conf:6: not understood"), std::string::npos);

  // The users logind knows.
  Strings expected;
  std::error_code code;
  for (const auto& entry : fs::directory_iterator("/run/systemd/users", code)) {
    const std::string name = entry.path().filename().string();
    if (name.find_first_not_of("0123456789") == std::string::npos) expected.push_back(name);
  }
  const SAnswer answer = Ask("findLoggedInUsersWithReply:", nullptr);
  EXPECT_FALSE(answer.error);
  EXPECT_EQ(answer.Code(), 0);
  ASSERT_NE(answer.body, nullptr);
  ASSERT_NE(answer.body->Get<Strings>("Users"), nullptr);
  Strings users = *answer.body->Get<Strings>("Users");
  std::sort(users.begin(), users.end());
  std::sort(expected.begin(), expected.end());
  EXPECT_EQ(users, expected);
}

TEST_F(UpdateHelper, ACallerPolkitRefusesGetsAnErrorAndNothingStops) {
  mPolkit.SetAllow(false);
  const pid_t driver = StartProcess(mFolder / "tavik-test-driver");
  const CXPCDictionary request{{"LaunchAgents", Strings{kAgent}}, {"BundleID", Strings{kDriver}}};
  for (const char* message : {"stopLaunchDProcess:withReply:", "stopProcess:withReply:"}) {
    const SAnswer answer = Ask(message, &request);
    EXPECT_TRUE(answer.error) << message;
    EXPECT_EQ(answer.Code(), 4) << message;
  }
  EXPECT_TRUE(mSystemd.Jobs().empty());
  // The helper acts before it answers: nothing more is on its way.
  EXPECT_EQ(waitpid(driver, nullptr, WNOHANG), 0) << "still running";
  kill(driver, SIGKILL);
  waitpid(driver, nullptr, 0);
}

TEST_F(UpdateHelper, ForeignOrMalformedRequestsAreRefusedAndTheHelperKeepsServing) {
  auto nested = std::make_shared<CXPCDictionary>(CXPCDictionary{{"a", Strings{kAgent}}});
  const struct {
    const char* what;
    const char* message;
    CXPCDictionary request;
    int64_t code;
  } cases[] = {
      {"a unit nobody configured", "stopLaunchDProcess:", {{"LaunchAgents", Strings{"sshd"}}}, 3},
      {"a stranger among ours",
       "stopLaunchDProcess:",
       {{"LaunchAgents", Strings{kAgent, "x.y"}}},
       3},
      {"a process nobody configured", "stopProcess:", {{"BundleID", Strings{"/usr/bin/sshd"}}}, 3},
      {"a text, not a list", "stopLaunchDProcess:", {{"LaunchAgents", kAgent}}, 2},
      {"a dictionary, not a list", "stopLaunchDProcess:", {{"LaunchAgents", nested}}, 2},
      {"no list at all", "stopLaunchDProcess:", {{"User", Strings{"1000"}}}, 2},
      {"an empty list", "startLaunchDProcess:", {{"LaunchAgents", Strings{}}}, 2},
      {"a huge text",
       "stopLaunchDProcess:",
       {{"LaunchAgents", Strings{std::string(1 << 20, 'a')}}},
       2},
      {"too many entries", "stopProcess:", {{"BundleID", Strings(1000, kDriver)}}, 2},
      {"a user that is no id",
       "stopLaunchDProcess:",
       {{"LaunchAgents", Strings{kAgent}}, {"User", Strings{"root"}}},
       2},
      {"a message it does not carry out", "performInstall:withReply:", {}, 1},
  };
  for (const auto& entry : cases) {
    const SAnswer answer = Ask(entry.message, &entry.request);
    EXPECT_TRUE(answer.error) << entry.what;
    EXPECT_EQ(answer.Code(), entry.code) << entry.what;
  }
  // No dictionary where one belongs: the bus's own error, no user information.
  const SAnswer bare = Ask("stopLaunchDProcess:", nullptr);
  EXPECT_TRUE(bare.error);
  EXPECT_EQ(bare.body, nullptr);

  EXPECT_TRUE(mSystemd.Jobs().empty());
  EXPECT_TRUE(mPolkit.Questions().empty()) << "nothing worth asking about";
  EXPECT_NE(Log().find("sshd is not configured"), std::string::npos);
  ASSERT_TRUE(HelperRuns());
  const CXPCDictionary good{{"LaunchAgents", Strings{kAgent}}};
  EXPECT_EQ(Ask("stopLaunchDProcess:", &good).Code(), 0);
  EXPECT_EQ(mSystemd.Jobs().size(), 2u);
}

TEST_F(UpdateHelper, StartProcessStartsOnlyAConfiguredExecutableAndAsTheCaller) {
  if (geteuid() != 0) GTEST_SKIP() << "only root can call as another user";
  // The driver notes who runs it; the caller is another user than the helper,
  // who can reach the bus, the driver and its note.
  const fs::path started = mFolder / "started";
  std::ofstream(mFolder / "tavik-test-driver") << "#!/bin/sh\nid -u > " << started.string() << "\n";
  std::ofstream{started};
  fs::permissions(started, fs::perms(0666));
  fs::permissions(mFolder, fs::perms(0755));
  fs::permissions(mFolder / "tavik-test-driver", fs::perms(0755));
  const std::string address = std::getenv("DBUS_SYSTEM_BUS_ADDRESS");
  fs::permissions(fs::path(address.substr(address.find('/'))).parent_path(), fs::perms(0711));
  // The answer's code, from a child that has become nobody.
  const auto startAsNobody = [](const std::string& identifier_I) {
    const pid_t child = fork();
    if (child == 0) {
      if (setgroups(0, nullptr) != 0 || setgid(65534) != 0 || setuid(65534) != 0) _exit(126);
      const CXPCDictionary request{{"BundleID", Strings{identifier_I}}};
      _exit(static_cast<int>(Ask("startProcess:withReply:", &request).Code() & 0x7F));
    }
    int status = 0;
    waitpid(child, &status, 0);
    return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
  };

  EXPECT_EQ(startAsNobody("com.tavik.Other"), 3);
  EXPECT_EQ(ReadFile(started), "") << "nothing started";

  ASSERT_EQ(startAsNobody(kDriver), 0) << Log();
  EXPECT_TRUE(TavPollUntil(5.0, 0.01, [&] { return !ReadFile(started).empty(); }));
  EXPECT_EQ(ReadFile(started), "65534\n");
}

// The installed helper, started by the bus on the updater's first call.
TEST(UpdateHelperInstalled, StartedByTheBusItStopsAndRestartsTheDriverForTheClient) {
  const fs::path folder = MakeFolder();
  ASSERT_FALSE(folder.empty());
  const std::string install = "DESTDIR=" + folder.string() +
                              " \"" TAV_CMAKE_COMMAND "\" --install \"" +
                              TAV_BUILD_DIR "\" --component helper > /dev/null";
  ASSERT_EQ(std::system(install.c_str()), 0);
  const fs::path root = folder / fs::path(TAV_INSTALL_PREFIX).relative_path();
  const fs::path program = root / TAV_LIBEXEC_DIR / "tavik-update-helper";
  const fs::path serviceFile = root / TAV_DBUS_SERVICES_DIR / "com.tavik.UpdateHelper.service";
  ASSERT_TRUE(fs::exists(program));
  EXPECT_TRUE(fs::exists(folder / fs::path(TAV_SYSCONF_DIR).relative_path() /
                         "tavik/update-helper.conf.example"));
  // The bus, systemd and polkit all name the same program and action.
  const std::string installedPath =
      fs::path(TAV_INSTALL_PREFIX) / TAV_LIBEXEC_DIR / "tavik-update-helper";
  std::string service = ReadFile(serviceFile);
  EXPECT_NE(service.find("Exec=" + installedPath + "\n"), std::string::npos);
  EXPECT_NE(ReadFile(root / TAV_SYSTEMD_DIR / "tavik-update-helper.service")
                .find("ExecStart=" + installedPath),
            std::string::npos);
  EXPECT_NE(ReadFile(root / TAV_POLKIT_DIR / "com.tavik.update-helper.policy")
                .find(CPolkitAuthority::kActionId),
            std::string::npos);

  // Here the program lies in the temporary folder, with the test's configuration.
  WriteConfig(folder / "update-helper.conf", folder / "unused");
  service.replace(
      service.find("Exec=" + installedPath), ("Exec=" + installedPath).size(),
      "Exec=" + program.string() + " --config " + (folder / "update-helper.conf").string());
  std::ofstream(serviceFile) << service;

  {
    CPrivateBus bus(SPrivateBusOptions{
        (root / TAV_DBUS_SERVICES_DIR).string(),
        {(root / TAV_DBUS_POLICY_DIR / "com.tavik.UpdateHelper.conf").string()}});
    ASSERT_TRUE(bus.IsUp());
    CFakePolkit polkit;
    CFakeSystemd systemd;
    ASSERT_TRUE(polkit.IsReady() && systemd.IsReady());
    OXPCClient::SetServiceDirectory(OXPCClient::kPrivileged,
                                    std::make_shared<CLinuxServiceDirectory>(true));

    const std::shared_ptr<OUpdaterClient> client = OUpdaterClient::client();
    ASSERT_NE(client, nullptr) << "the bus can start it";
    EXPECT_EQ(client->connectToService().code, 0);
    // As an update does: the driver's services stop first, and start at the end.
    client->stopLaunchDProcess(
        OUpdaterClient::Request{{"LaunchAgents", {kAgent}}, {"User", {"1000"}}});
    client->startLaunchDProcess(OUpdaterClient::Request{
        {"LaunchAgents", {kAgent}}, {"User", {"1000"}}, {"BundleID", {kAgent, kTouch, kDriver}}});
    TavPollUntil(5.0, 0.01, [&] { return systemd.Jobs().size() >= 4; });
    EXPECT_EQ(systemd.Jobs(), kStopAndStartJobs);
    OXPCClient::SetServiceDirectory(OXPCClient::kPrivileged, nullptr);
  }
  std::error_code ignored;
  fs::remove_all(folder, ignored);
}

}  // namespace
