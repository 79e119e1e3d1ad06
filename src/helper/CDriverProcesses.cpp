#include "helper/CDriverProcesses.h"

#include <fcntl.h>
#include <grp.h>
#include <pwd.h>
#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdlib>
#include <filesystem>

namespace fs = std::filesystem;

std::vector<pid_t> CDriverProcesses::Find(const std::string& executable_I) {
  std::vector<pid_t> found;
  std::error_code code;
  for (const fs::directory_entry& entry : fs::directory_iterator("/proc", code)) {
    const std::string name = entry.path().filename().string();
    if (name.find_first_not_of("0123456789") != std::string::npos) continue;
    std::error_code linkCode;
    const fs::path program = fs::read_symlink(entry.path() / "exe", linkCode);
    if (!linkCode && program == executable_I) found.push_back(std::atoi(name.c_str()));
  }
  return found;
}

int CDriverProcesses::Stop(const std::string& executable_I) {
  int stopped = 0;
  for (pid_t pid : Find(executable_I)) stopped += kill(pid, SIGTERM) == 0 ? 1 : 0;
  return stopped;
}

bool CDriverProcesses::Start(const std::string& executable_I, uid_t user_I) {
  const passwd* account = getpwuid(user_I);
  if (account == nullptr || access(executable_I.c_str(), X_OK) != 0) return false;
  const gid_t group = account->pw_gid;
  const std::string name = account->pw_name;
  const std::string home = account->pw_dir;
  const pid_t child = fork();
  if (child < 0) return false;
  if (child == 0) {
    // A grandchild, so that nothing is left for the helper to reap.
    if (fork() != 0) _exit(0);
    setsid();
    if (initgroups(name.c_str(), group) != 0 || setgid(group) != 0 || setuid(user_I) != 0) {
      _exit(126);
    }
    // Nothing of the helper's: no bus to read from or write to, the user's
    // own home.
    const int nothing = open("/dev/null", O_RDWR);
    dup2(nothing, STDIN_FILENO);
    dup2(nothing, STDOUT_FILENO);
    setenv("HOME", home.c_str(), 1);
    setenv("USER", name.c_str(), 1);
    setenv("LOGNAME", name.c_str(), 1);
    execl(executable_I.c_str(), executable_I.c_str(), static_cast<char*>(nullptr));
    _exit(127);
  }
  int status = 0;
  waitpid(child, &status, 0);
  return WIFEXITED(status) && WEXITSTATUS(status) == 0;
}
