#pragma once
// The process table as /proc shows it. The root is a parameter so that a
// test can stand a tree of its own in for processes it cannot create (one
// of another user, when the tests do not run as root).

#include <sys/types.h>

#include <string>
#include <vector>

class CProcFolder {
 public:
  explicit CProcFolder(std::string root_I = "/proc");

  std::vector<int> ListPids() const;
  // The program's canonical path; empty when unknown.
  std::string GetExecutable(int pid_I) const;
  // The real user id, as the kernel reports it; false when unknown.
  bool GetRealOwner(int pid_I, uid_t& owner_O) const;
  bool IsZombie(int pid_I) const;

 private:
  std::string PathOf(int pid_I, const char* item_I) const;

  std::string mRoot;
};
