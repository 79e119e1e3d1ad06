#pragma once
// The processes of the driver's configured executables: found by the
// program their /proc entry runs, stopped with SIGTERM, started detached
// as the user who asked.

#include <sys/types.h>

#include <string>
#include <vector>

class CDriverProcesses {
 public:
  static std::vector<pid_t> Find(const std::string& executable_I);
  // The number of processes asked to quit.
  static int Stop(const std::string& executable_I);
  // Runs the executable with no argument in a session of its own, as
  // `user_I`; false when it could not be started.
  static bool Start(const std::string& executable_I, uid_t user_I);
};
