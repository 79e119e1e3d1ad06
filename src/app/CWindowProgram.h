#pragma once
// The window program: this program with the Qt window linked in. A run
// that opens the window becomes that program, so that a terminal run never
// maps Qt and its libraries.

#include <string>
#include <vector>

class CWindowProgram {
 public:
  // Beside this program's executable (the build tree), else where the
  // package installs it, found from this program's folder.
  static std::string GetPath(const std::string& executableFolder_I);

  // Replaces the process with the window program, with the same argument
  // vector (program name first) and environment. Returns only when that
  // failed, with the reason.
  static std::string Exec(const std::string& path_I, const std::vector<std::string>& arguments_I);
};
