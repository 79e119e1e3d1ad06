#pragma once
// A private D-Bus daemon for one test, reachable as the system bus of this
// process, so that nothing touches the machine's own.

#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <string>

class CPrivateBus {
 public:
  CPrivateBus() {
    if (access("/usr/bin/dbus-daemon", X_OK) != 0) return;
    mFolder = std::filesystem::temp_directory_path() /
              ("bus-" + std::to_string(getpid()) + "-" +
               std::to_string(reinterpret_cast<uintptr_t>(this)));
    std::filesystem::create_directories(mFolder);
    const std::string config = (mFolder / "bus.conf").string();
    std::ofstream(config) << "<busconfig><type>system</type>"
                          << "<listen>unix:path=" << (mFolder / "socket").string() << "</listen>"
                          << "<auth>EXTERNAL</auth><policy context=\"default\">"
                          << "<allow user=\"*\"/><allow own=\"*\"/>"
                          << "<allow send_destination=\"*\"/><allow receive_sender=\"*\"/>"
                          << "</policy></busconfig>";
    int out[2];
    if (pipe(out) != 0) return;
    mPid = fork();
    if (mPid == 0) {
      dup2(out[1], STDOUT_FILENO);
      close(out[0]);
      execl("/usr/bin/dbus-daemon", "dbus-daemon", ("--config-file=" + config).c_str(), "--nofork",
            "--print-address=1", static_cast<char*>(nullptr));
      _exit(127);
    }
    close(out[1]);
    char buffer[512] = {};
    FILE* in = fdopen(out[0], "r");
    if (in != nullptr && std::fgets(buffer, sizeof buffer, in) != nullptr) {
      mAddress = buffer;
      while (!mAddress.empty() && (mAddress.back() == '\n' || mAddress.back() == '\r')) {
        mAddress.pop_back();
      }
    }
    if (in != nullptr) std::fclose(in);
    if (!mAddress.empty()) setenv("DBUS_SYSTEM_BUS_ADDRESS", mAddress.c_str(), 1);
  }

  ~CPrivateBus() {
    if (mPid > 0) {
      kill(mPid, SIGTERM);
      waitpid(mPid, nullptr, 0);
    }
    unsetenv("DBUS_SYSTEM_BUS_ADDRESS");
    if (!mFolder.empty()) std::filesystem::remove_all(mFolder);
  }

  bool IsUp() const { return !mAddress.empty(); }

 private:
  pid_t mPid = -1;
  std::string mAddress;
  std::filesystem::path mFolder;
};
