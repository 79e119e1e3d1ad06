#include "common/LinuxPaths.h"

#include <limits.h>
#include <pwd.h>
#include <unistd.h>

#include <cstdlib>
#include <filesystem>
#include <system_error>
#include <vector>

#include "common/TavLog.h"

#ifndef TAV_INSTALLED_DATA_FOLDER
#error "the build defines TAV_INSTALLED_DATA_FOLDER from the install prefix"
#endif
#ifndef TAV_DATA_FOLDER_FROM_BINDIR
#error "the build defines TAV_DATA_FOLDER_FROM_BINDIR from the install layout"
#endif

namespace LinuxPaths {

namespace {

// Our folder inside the XDG base folders.
constexpr const char* kVendorFolder = "tavik";

std::string WithoutTrailingSlashes(const std::string& path_I) {
  size_t end = path_I.size();
  while (end > 1 && path_I[end - 1] == '/') --end;
  return path_I.substr(0, end);
}

std::string HomeFromPasswordDatabase() {
  long size = sysconf(_SC_GETPW_R_SIZE_MAX);
  std::vector<char> buffer(size > 0 ? static_cast<size_t>(size) : 16384);
  passwd entry{};
  passwd* found = nullptr;
  if (getpwuid_r(getuid(), &entry, buffer.data(), buffer.size(), &found) != 0 || found == nullptr ||
      found->pw_dir == nullptr) {
    return std::string();
  }
  return found->pw_dir;
}

// The XDG base folder named by `variable_I`, or `belowHome_I` in the home
// folder, followed by our vendor folder.
std::string XDGFolder(const char* variable_I, const char* belowHome_I) {
  const char* value = std::getenv(variable_I);
  std::string base;
  if (value != nullptr && value[0] == '/') {
    base = value;
  } else {
    const std::string home = GetUserFolderPath();
    if (home.empty()) return std::string();
    base = AppendPathComponent(home, belowHome_I);
  }
  return AppendPathComponent(base, kVendorFolder);
}

// Position of the dot that starts the extension of `name_I`, or npos.
size_t ExtensionDot(const std::string& name_I) {
  const size_t dot = name_I.rfind('.');
  if (dot == std::string::npos || dot == 0 || name_I == "/") return std::string::npos;
  return dot;
}

}  // namespace

std::string GetUserFolderPath() {
  const char* home = std::getenv("HOME");
  if (home != nullptr && home[0] != '\0') return WithoutTrailingSlashes(home);
  return WithoutTrailingSlashes(HomeFromPasswordDatabase());
}

std::string GetConfigFolderPath() { return XDGFolder("XDG_CONFIG_HOME", ".config"); }

std::string GetUserPreferencesFolderPath() { return GetConfigFolderPath(); }

std::string GetStateFolderPath() { return XDGFolder("XDG_STATE_HOME", ".local/state"); }

std::string GetInstalledDataFolderPath() {
  return FindInstalledDataFolder(GetExecutableFolderPath());
}

std::string FindInstalledDataFolder(const std::string& executableFolder_I) {
  if (executableFolder_I.empty()) return TAV_INSTALLED_DATA_FOLDER;
  // The program lives in the binaries' folder, the window program in a
  // folder of its own below the helper programs' folder.
  for (const char* relative : {TAV_DATA_FOLDER_FROM_BINDIR, TAV_DATA_FOLDER_FROM_WINDOW_PROGRAM}) {
    const std::filesystem::path beside =
        (std::filesystem::path(executableFolder_I) / relative).lexically_normal();
    std::error_code error;
    if (std::filesystem::is_directory(beside, error))
      return WithoutTrailingSlashes(beside.string());
  }
  return TAV_INSTALLED_DATA_FOLDER;
}

std::string GetExecutableFolderPath() {
  char target[PATH_MAX];
  const ssize_t length = readlink("/proc/self/exe", target, sizeof target - 1);
  if (length <= 0) return std::string();
  return DeleteLastPathComponent(std::string(target, static_cast<size_t>(length)));
}

std::string AppendPathComponent(const std::string& path_I, const std::string& component_I) {
  size_t start = 0;
  while (start < component_I.size() && component_I[start] == '/') ++start;
  const std::string component = component_I.substr(start);
  if (path_I.empty()) return WithoutTrailingSlashes(component_I);
  const std::string base = WithoutTrailingSlashes(path_I);
  if (component.empty()) return base;
  if (base == "/") return base + component;
  return base + "/" + WithoutTrailingSlashes(component);
}

std::string AppendPathExtension(const std::string& path_I, const std::string& extension_I) {
  if (path_I.empty()) {
    TavLog::Warning("cannot append extension '%s' to nothing", extension_I.c_str());
    return std::string();
  }
  const std::string base = WithoutTrailingSlashes(path_I);
  if (extension_I.empty()) return base;
  return base + "." + extension_I;
}

std::string DeleteLastPathComponent(const std::string& path_I) {
  const std::string path = WithoutTrailingSlashes(path_I);
  if (path.empty() || path == "/") return path;
  const size_t slash = path.rfind('/');
  if (slash == std::string::npos) return std::string();
  if (slash == 0) return "/";
  return WithoutTrailingSlashes(path.substr(0, slash));
}

std::string DeletePathExtension(const std::string& path_I) {
  const std::string path = WithoutTrailingSlashes(path_I);
  const std::string name = LastPathComponent(path);
  const size_t dot = ExtensionDot(name);
  if (dot == std::string::npos) return path;
  return path.substr(0, path.size() - (name.size() - dot));
}

std::string LastPathComponent(const std::string& path_I) {
  const std::string path = WithoutTrailingSlashes(path_I);
  if (path == "/") return path;
  const size_t slash = path.rfind('/');
  return slash == std::string::npos ? path : path.substr(slash + 1);
}

std::string PathExtension(const std::string& path_I) {
  const std::string name = LastPathComponent(path_I);
  const size_t dot = ExtensionDot(name);
  return dot == std::string::npos ? std::string() : name.substr(dot + 1);
}

}  // namespace LinuxPaths
