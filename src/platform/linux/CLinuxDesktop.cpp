#include "platform/linux/CLinuxDesktop.h"

#include <dirent.h>
#include <fcntl.h>
#include <signal.h>
#include <sys/wait.h>
#include <systemd/sd-bus.h>
#include <unistd.h>

#include <cerrno>
#include <climits>
#include <cstring>
#include <fstream>

#include "common/TavLog.h"
#include "common/TavSysErrStr.h"
#include "platform/linux/CDesktopEntries.h"

namespace {

constexpr uint32_t kFamilyVendorId = 0x7A5D;

std::string ExecutableOf(int pid_I) {
  char target[PATH_MAX + 1] = {};
  const std::string link = "/proc/" + std::to_string(pid_I) + "/exe";
  const ssize_t length = readlink(link.c_str(), target, PATH_MAX);
  if (length <= 0) return std::string();
  std::string path(target, static_cast<size_t>(length));
  // A program replaced on disk while running reads as "path (deleted)".
  const std::string deleted = " (deleted)";
  if (path.size() > deleted.size() &&
      path.compare(path.size() - deleted.size(), deleted.size(), deleted) == 0) {
    path.resize(path.size() - deleted.size());
  }
  return path;
}

bool IsZombie(int pid_I) {
  std::ifstream in("/proc/" + std::to_string(pid_I) + "/stat");
  std::string content;
  std::getline(in, content);
  const size_t close = content.rfind(')');
  return close != std::string::npos && close + 2 < content.size() && content[close + 2] == 'Z';
}

}  // namespace

CLinuxDesktop::CLinuxDesktop(std::shared_ptr<CDeviceRegistry> registry_I)
    : mRegistry(std::move(registry_I)) {}

int CLinuxDesktop::GetLaunchSenderPid() { return static_cast<int>(getppid()); }

std::string CLinuxDesktop::GetApplicationIdOfProcess(int pid_I) {
  if (pid_I <= 0) return std::string();
  const std::string executable = ExecutableOf(pid_I);
  if (executable.empty()) return std::string();
  if (auto entry = CDesktopEntries::FindByProgram(executable)) return entry->id;
  // Not an application of the desktop: its executable's name stands in.
  return executable.substr(executable.rfind('/') + 1);
}

bool CLinuxDesktop::IsApplicationProcess(int pid_I) {
  if (pid_I <= 0) return false;
  const std::string executable = ExecutableOf(pid_I);
  return !executable.empty() && CDesktopEntries::FindByProgram(executable).has_value();
}

int CLinuxDesktop::GetProcessArgumentCount() {
  std::ifstream in("/proc/self/cmdline", std::ios::binary);
  std::string content((std::istreambuf_iterator<char>(in)), std::istreambuf_iterator<char>());
  int count = 0;
  for (char c : content) count += c == '\0' ? 1 : 0;
  return count;
}

std::vector<int> CLinuxDesktop::RunningApplications(const std::string& applicationId_I) {
  std::vector<int> pids;
  const auto entry = CDesktopEntries::Find(applicationId_I);
  if (!entry || entry->program.empty()) return pids;
  DIR* proc = opendir("/proc");
  if (proc == nullptr) return pids;
  while (dirent* item = readdir(proc)) {
    char* end = nullptr;
    const long pid = std::strtol(item->d_name, &end, 10);
    if (end == item->d_name || *end != '\0' || pid <= 0) continue;
    if (ExecutableOf(static_cast<int>(pid)) == entry->program && !IsZombie(static_cast<int>(pid))) {
      pids.push_back(static_cast<int>(pid));
    }
  }
  closedir(proc);
  return pids;
}

bool CLinuxDesktop::TerminateApplication(int pid_I) {
  return pid_I > 0 && kill(pid_I, SIGTERM) == 0;
}

bool CLinuxDesktop::IsTerminated(int pid_I) {
  if (pid_I <= 0) return true;
  if (kill(pid_I, 0) != 0) return errno == ESRCH;
  return IsZombie(pid_I);
}

bool CLinuxDesktop::LaunchApplication(const std::string& applicationId_I) {
  const auto entry = CDesktopEntries::Find(applicationId_I);
  if (!entry || entry->exec.empty()) return false;

  // A pipe closed by a successful exec tells the outcome; the grandchild is
  // detached from us so that it outlives this program.
  int report[2];
  if (pipe2(report, O_CLOEXEC) != 0) return false;
  const pid_t child = fork();
  if (child < 0) {
    close(report[0]);
    close(report[1]);
    return false;
  }
  if (child == 0) {
    setsid();
    if (fork() != 0) _exit(0);
    std::vector<std::string> words = CDesktopEntries::SplitExec(entry->exec);
    std::vector<char*> argv;
    for (std::string& word : words) argv.push_back(word.data());
    argv.push_back(nullptr);
    if (!words.empty()) execvp(argv[0], argv.data());
    const int error = errno;
    (void)!write(report[1], &error, sizeof error);
    _exit(127);
  }
  close(report[1]);
  waitpid(child, nullptr, 0);
  int error = 0;
  const ssize_t got = read(report[0], &error, sizeof error);
  close(report[0]);
  if (got > 0) {
    TavLog::Error("Could not launch %s: %s\n", applicationId_I.c_str(), TavSysErrStr(error).c_str());
    return false;
  }
  return true;
}

std::string CLinuxDesktop::SignalMemberFor(const std::string& name_I) {
  std::string member = name_I;
  for (char& c : member) {
    if (c == '.') c = '_';
  }
  return member;
}

void CLinuxDesktop::PostNotification(const std::string& name_I,
                                     const std::map<std::string, std::string>& userInfo_I) {
  sd_bus* bus = nullptr;
  if (sd_bus_open_user(&bus) < 0) return;  // no session bus: nobody to tell
  sd_bus_message* signal = nullptr;
  int status = sd_bus_message_new_signal(bus, &signal, kNotificationPath, kNotificationInterface,
                                         SignalMemberFor(name_I).c_str());
  if (status >= 0) status = sd_bus_message_open_container(signal, 'a', "{sv}");
  for (const auto& [key, value] : userInfo_I) {
    if (status < 0) break;
    status = sd_bus_message_append(signal, "{sv}", key.c_str(), "s", value.c_str());
  }
  if (status >= 0) status = sd_bus_message_close_container(signal);
  if (status >= 0) status = sd_bus_send(bus, signal, nullptr);
  if (status < 0) {
    TavLog::Warning("Notification %s not sent: %s\n", name_I.c_str(), TavSysErrStr(-status).c_str());
  }
  sd_bus_message_unref(signal);
  sd_bus_flush_close_unref(bus);
}

bool CLinuxDesktop::RequestHidAccess() {
  if (!mRegistry) return true;
  for (const SHidEntry& entry : mRegistry->ListHidInterfaces(kFamilyVendorId)) {
    if (access(entry.nodePath.c_str(), R_OK | W_OK) != 0 && errno == EACCES) return false;
  }
  return true;
}
