#include "platform/linux/CLinuxDesktop.h"

#include <fcntl.h>
#include <signal.h>
#include <sys/resource.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <systemd/sd-bus.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <fstream>

#include "common/TavLog.h"
#include "common/TavSysErrStr.h"
#include "platform/linux/CDesktopEntries.h"
#include "platform/linux/CNotificationSignal.h"

namespace {

constexpr uint32_t kFamilyVendorId = 0x7A5D;
// The listener looks at its stop flag this often (microseconds).
constexpr uint64_t kListenerWakeMicroseconds = 100 * 1000;
#ifndef CLOSE_RANGE_CLOEXEC
constexpr unsigned int CLOSE_RANGE_CLOEXEC = 1U << 2;
#endif

// In the launched child, between fork and exec: only async-signal-safe
// calls. Every descriptor above the standard three closes at the exec, so
// the child keeps nothing of ours open (a pipe our caller reads to its end
// above all).
void MarkAllCloseOnExec() {
  if (syscall(SYS_close_range, 3U, ~0U, CLOSE_RANGE_CLOEXEC) == 0) return;
  rlimit limit{};
  const rlim_t top = getrlimit(RLIMIT_NOFILE, &limit) == 0 && limit.rlim_cur != RLIM_INFINITY
                         ? limit.rlim_cur
                         : 65536;
  for (rlim_t fd = 3; fd < top; ++fd) fcntl(static_cast<int>(fd), F_SETFD, FD_CLOEXEC);
}

[[noreturn]] void ExecDetached(char* const* argv_I, int devNull_I, int report_I) {
  dup2(devNull_I, STDIN_FILENO);
  dup2(devNull_I, STDOUT_FILENO);
  dup2(devNull_I, STDERR_FILENO);
  MarkAllCloseOnExec();
  // A program with a set-id bit starts the application as the user who ran
  // it, never as the owner of the bit.
  const uid_t uid = getuid();
  const gid_t gid = getgid();
  if ((getegid() != gid && setresgid(gid, gid, gid) != 0) ||
      (geteuid() != uid && setresuid(uid, uid, uid) != 0)) {
    const int error = errno;
    (void)!write(report_I, &error, sizeof error);
    _exit(127);
  }
  execvp(argv_I[0], argv_I);
  const int error = errno;
  (void)!write(report_I, &error, sizeof error);
  _exit(127);
}

}  // namespace

CLinuxDesktop::CLinuxDesktop(std::shared_ptr<CDeviceRegistry> registry_I, CProcFolder processes_I)
    : mRegistry(std::move(registry_I)), mProcesses(std::move(processes_I)) {}

CLinuxDesktop::~CLinuxDesktop() {
  mStopListening = true;
  if (mListener.joinable()) mListener.join();
}

int CLinuxDesktop::GetLaunchSenderPid() { return static_cast<int>(getppid()); }

int CLinuxDesktop::GetOwnPid() { return static_cast<int>(getpid()); }

std::string CLinuxDesktop::GetApplicationIdOfProcess(int pid_I) {
  if (pid_I <= 0) return std::string();
  const std::string executable = mProcesses.GetExecutable(pid_I);
  if (executable.empty()) return std::string();
  if (auto entry = CDesktopEntries::FindByProgram(executable)) return entry->id;
  // Not an application of the desktop: its executable's name stands in.
  return executable.substr(executable.rfind('/') + 1);
}

std::string CLinuxDesktop::GetExecutableOfProcess(int pid_I) {
  return pid_I > 0 ? mProcesses.GetExecutable(pid_I) : std::string();
}

bool CLinuxDesktop::IsApplicationProcess(int pid_I) {
  if (pid_I <= 0) return false;
  const std::string executable = mProcesses.GetExecutable(pid_I);
  return !executable.empty() && CDesktopEntries::FindByProgram(executable).has_value();
}

int CLinuxDesktop::GetProcessArgumentCount() {
  std::ifstream in("/proc/self/cmdline", std::ios::binary);
  std::string content((std::istreambuf_iterator<char>(in)), std::istreambuf_iterator<char>());
  return static_cast<int>(std::count(content.begin(), content.end(), '\0'));
}

std::string CLinuxDesktop::GetApplicationPath(const std::string& applicationId_I) {
  const auto entry = CDesktopEntries::Find(applicationId_I);
  return entry ? entry->path : std::string();
}

bool CLinuxDesktop::IsOwn(int pid_I) const {
  uid_t owner = 0;
  return mProcesses.GetRealOwner(pid_I, owner) && owner == getuid();
}

std::vector<int> CLinuxDesktop::ProcessesOf(const std::string& program_I, bool ownOnly_I) const {
  std::vector<int> pids;
  if (program_I.empty()) return pids;
  for (int pid : mProcesses.ListPids()) {
    if (mProcesses.GetExecutable(pid) == program_I && !mProcesses.IsZombie(pid) &&
        (!ownOnly_I || IsOwn(pid))) {
      pids.push_back(pid);
    }
  }
  return pids;
}

std::vector<int> CLinuxDesktop::RunningApplications(const std::string& applicationId_I) {
  const auto entry = CDesktopEntries::Find(applicationId_I);
  return entry ? ProcessesOf(entry->program, true) : std::vector<int>();
}

bool CLinuxDesktop::TerminateApplication(int pid_I) {
  return pid_I > 0 && IsOwn(pid_I) && kill(pid_I, SIGTERM) == 0;
}

bool CLinuxDesktop::IsTerminated(int pid_I) {
  if (pid_I <= 0) return true;
  if (kill(pid_I, 0) != 0) return errno == ESRCH;
  return mProcesses.IsZombie(pid_I);
}

int CLinuxDesktop::LaunchApplication(const SLaunchRequest& request_I) {
  const auto entry = request_I.entryPath.empty() ? CDesktopEntries::Find(request_I.applicationId)
                                                 : CDesktopEntries::Read(request_I.entryPath);
  if (!entry || entry->exec.empty()) return 0;
  if (getuid() == 0 && !ProcessesOf(entry->program, false).empty()) {
    TavLog::Warning("Not starting %s as root: another user runs it\n", entry->id.c_str());
    return 0;
  }
  // Everything the child needs is made before the fork: between fork and
  // exec a threaded program may not allocate.
  std::vector<std::string> words = CDesktopEntries::SplitExec(entry->exec);
  words.insert(words.end(), request_I.arguments.begin(), request_I.arguments.end());
  if (words.empty()) return 0;
  std::vector<char*> argv;
  for (std::string& word : words) argv.push_back(word.data());
  argv.push_back(nullptr);

  // The pipe brings the launched pid, then an exec error or, closed by a
  // successful exec, nothing.
  const int devNull = open("/dev/null", O_RDWR | O_CLOEXEC);
  int report[2];
  if (devNull < 0 || pipe2(report, O_CLOEXEC) != 0) {
    if (devNull >= 0) close(devNull);
    return 0;
  }
  const pid_t child = fork();
  if (child == 0) {
    // A session of its own, and a parent that is gone at once: the
    // application outlives us and no terminal or group of ours reaches it.
    setsid();
    const pid_t launched = fork();
    if (launched == 0) ExecDetached(argv.data(), devNull, report[1]);
    (void)!write(report[1], &launched, sizeof launched);
    _exit(0);
  }
  close(report[1]);
  close(devNull);
  if (child < 0) {
    close(report[0]);
    return 0;
  }
  waitpid(child, nullptr, 0);
  pid_t launched = -1;
  int error = 0;
  const bool gotPid = read(report[0], &launched, sizeof launched) == sizeof launched;
  const bool failed = read(report[0], &error, sizeof error) > 0;
  close(report[0]);
  if (!gotPid || launched <= 0 || failed) {
    TavLog::Error("Could not launch %s: %s\n", entry->id.c_str(),
                  failed ? TavSysErrStr(error).c_str() : "no process could be made");
    return 0;
  }
  return static_cast<int>(launched);
}

void CLinuxDesktop::PostNotification(const SNotification& notification_I) {
  sd_bus* bus = nullptr;
  if (sd_bus_open_user(&bus) < 0) return;  // no session bus: nobody to tell
  sd_bus_message* signal = nullptr;
  int status = CNotificationSignal::Make(bus, notification_I, &signal);
  if (status >= 0) status = sd_bus_send(bus, signal, nullptr);
  if (status < 0) {
    TavLog::Warning("Notification %s not sent: %s\n", notification_I.name.c_str(),
                    TavSysErrStr(-status).c_str());
  }
  sd_bus_message_unref(signal);
  sd_bus_flush_close_unref(bus);
}

bool CLinuxDesktop::ObserveNotifications(std::function<void(const SNotification&)> observer_I) {
  const bool wanted = static_cast<bool>(observer_I);
  {
    std::lock_guard<std::mutex> guard(mObserverLock);
    mObserver = std::move(observer_I);
  }
  if (!wanted || mListener.joinable()) return true;
  return StartListening();
}

bool CLinuxDesktop::StartListening() {
  sd_bus* bus = nullptr;
  if (sd_bus_open_user(&bus) < 0) return false;
  auto deliver = [](sd_bus_message* signal_I, void* self_I, sd_bus_error*) -> int {
    auto* self = static_cast<CLinuxDesktop*>(self_I);
    SNotification notification;
    if (!CNotificationSignal::Read(signal_I, notification)) return 0;
    std::lock_guard<std::mutex> guard(self->mObserverLock);
    if (self->mObserver) self->mObserver(notification);
    return 0;
  };
  const std::string rule =
      std::string("type='signal',interface='") + CNotificationSignal::kInterface + "'";
  // Added before the listener starts, so that a notification posted as soon
  // as this returns is already heard.
  if (sd_bus_add_match(bus, nullptr, rule.c_str(), deliver, this) < 0) {
    sd_bus_flush_close_unref(bus);
    return false;
  }
  mStopListening = false;
  mListener = std::thread([this, bus] {
    while (!mStopListening) {
      const int status = sd_bus_process(bus, nullptr);
      if (status < 0) break;
      if (status == 0) sd_bus_wait(bus, kListenerWakeMicroseconds);
    }
    sd_bus_flush_close_unref(bus);
  });
  return true;
}

bool CLinuxDesktop::RequestHidAccess() {
  if (!mRegistry) return true;
  for (const SHidEntry& entry : mRegistry->ListHidInterfaces(kFamilyVendorId)) {
    if (access(entry.nodePath.c_str(), R_OK | W_OK) != 0 && errno == EACCES) return false;
  }
  return true;
}
