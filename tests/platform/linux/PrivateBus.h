#pragma once
// A private D-Bus daemon for one test, reachable as both the system and the
// session bus of this process and of every process it starts, so that
// nothing touches the machine's own. Its policy lets any user connect, as
// a test's caller of another user needs, and anyone own any name, as the
// stand-in services need. A test may give it a folder of services
// to start on demand, and further configuration files to include.

#include <signal.h>
#include <stdlib.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <string>
#include <vector>

struct SPrivateBusOptions {
  std::string serviceDir;
  std::vector<std::string> includes;
};

class CPrivateBus {
 public:
  explicit CPrivateBus(const SPrivateBusOptions& options_I = {}) {
    char folder[] = "/tmp/tavik-bus-XXXXXX";
    int out[2];
    if (access("/usr/bin/dbus-daemon", X_OK) != 0 || mkdtemp(folder) == nullptr || pipe(out) != 0) {
      return;
    }
    mFolder = folder;
    const std::string address = "unix:path=" + mFolder + "/bus";
    WriteConfig(options_I, address);
    // Set before the daemon starts, so that the services it starts find it too.
    Keep("DBUS_SYSTEM_BUS_ADDRESS", address);
    Keep("DBUS_SESSION_BUS_ADDRESS", address);
    mPid = fork();
    if (mPid == 0) {
      dup2(out[1], STDOUT_FILENO);
      close(out[0]);
      const std::string config = "--config-file=" + mFolder + "/bus.conf";
      execl("/usr/bin/dbus-daemon", "dbus-daemon", config.c_str(), "--nofork", "--print-address=1",
            static_cast<char*>(nullptr));
      _exit(127);
    }
    close(out[1]);
    char buffer[512] = {};
    FILE* in = fdopen(out[0], "r");
    // The daemon prints its address once it listens.
    mUp = in != nullptr && std::fgets(buffer, sizeof buffer, in) != nullptr;
    if (in != nullptr) std::fclose(in);
  }

  ~CPrivateBus() {
    if (mPid > 0) {
      kill(mPid, SIGTERM);
      waitpid(mPid, nullptr, 0);
    }
    for (const auto& [name, value] : mKept) {
      if (value.empty()) {
        unsetenv(name.c_str());
      } else {
        setenv(name.c_str(), value.c_str(), 1);
      }
    }
    std::error_code ignored;
    if (!mFolder.empty()) std::filesystem::remove_all(mFolder, ignored);
  }

  bool IsUp() const { return mUp; }

 private:
  void Keep(const char* name_I, const std::string& value_I) {
    const char* before = getenv(name_I);
    mKept.emplace_back(name_I, before != nullptr ? before : "");
    setenv(name_I, value_I.c_str(), 1);
  }

  void WriteConfig(const SPrivateBusOptions& options_I, const std::string& address_I) const {
    std::ofstream config(mFolder + "/bus.conf");
    config << "<!DOCTYPE busconfig PUBLIC \"-//freedesktop//DTD D-BUS Bus Configuration 1.0//EN\"\n"
              " \"http://www.freedesktop.org/standards/dbus/1.0/busconfig.dtd\">\n"
              "<busconfig>\n  <type>session</type>\n  <listen>"
           << address_I << "</listen>\n";
    if (!options_I.serviceDir.empty())
      config << "  <servicedir>" << options_I.serviceDir << "</servicedir>\n";
    config << "  <policy context=\"default\">\n    <allow user=\"*\"/>\n"
              "    <allow send_destination=\"*\" "
              "eavesdrop=\"true\"/>\n"
              "    <allow eavesdrop=\"true\"/>\n    <allow own=\"*\"/>\n  </policy>\n";
    for (const std::string& include : options_I.includes)
      config << "  <include>" << include << "</include>\n";
    config << "</busconfig>\n";
  }

  pid_t mPid = -1;
  bool mUp = false;
  std::string mFolder;
  std::vector<std::pair<std::string, std::string>> mKept;
};
