#pragma once
// A private D-Bus daemon for one test, reachable as the system bus of this
// process, so that nothing touches the machine's own. The session
// configuration lets anyone own any name, as the stand-in services need.

#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <string>

class CPrivateBus {
 public:
  CPrivateBus() {
    int out[2];
    if (access("/usr/bin/dbus-daemon", X_OK) != 0 || pipe(out) != 0) return;
    mPid = fork();
    if (mPid == 0) {
      dup2(out[1], STDOUT_FILENO);
      close(out[0]);
      execl("/usr/bin/dbus-daemon", "dbus-daemon", "--session", "--address=unix:tmpdir=/tmp",
            "--nofork", "--print-address=1", static_cast<char*>(nullptr));
      _exit(127);
    }
    close(out[1]);
    char buffer[512] = {};
    FILE* in = fdopen(out[0], "r");
    if (in != nullptr && std::fgets(buffer, sizeof buffer, in) != nullptr) mAddress = buffer;
    if (in != nullptr) std::fclose(in);
    mAddress.erase(mAddress.find_last_not_of("\r\n") + 1);
    if (!mAddress.empty()) setenv("DBUS_SYSTEM_BUS_ADDRESS", mAddress.c_str(), 1);
  }

  ~CPrivateBus() {
    if (mPid > 0) {
      kill(mPid, SIGTERM);
      waitpid(mPid, nullptr, 0);
    }
    unsetenv("DBUS_SYSTEM_BUS_ADDRESS");
  }

  bool IsUp() const { return !mAddress.empty(); }

 private:
  pid_t mPid = -1;
  std::string mAddress;
};
