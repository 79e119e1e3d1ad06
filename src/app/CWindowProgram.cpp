#include "app/CWindowProgram.h"

#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <filesystem>

#include "common/LinuxPaths.h"

std::string CWindowProgram::GetPath(const std::string& executableFolder_I) {
  const std::string beside =
      LinuxPaths::AppendPathComponent(executableFolder_I, TAV_WINDOW_PROGRAM_NAME);
  std::error_code error;
  if (std::filesystem::exists(beside, error)) return beside;
  return std::filesystem::path(
             LinuxPaths::AppendPathComponent(executableFolder_I, TAV_WINDOW_PROGRAM_FROM_BINDIR))
      .lexically_normal()
      .string();
}

std::string CWindowProgram::Exec(const std::string& path_I,
                                 const std::vector<std::string>& arguments_I) {
  std::vector<char*> argv;
  for (const std::string& argument : arguments_I)
    argv.push_back(const_cast<char*>(argument.c_str()));
  argv.push_back(nullptr);
  // Whatever this process buffered must reach its output once, not be lost.
  std::fflush(nullptr);
  execv(path_I.c_str(), argv.data());
  return std::strerror(errno);
}
