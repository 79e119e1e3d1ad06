#include "platform/linux/CProcFolder.h"

#include <dirent.h>
#include <unistd.h>

#include <climits>
#include <cstdlib>
#include <fstream>
#include <sstream>

CProcFolder::CProcFolder(std::string root_I) : mRoot(std::move(root_I)) {}

std::string CProcFolder::PathOf(int pid_I, const char* item_I) const {
  return mRoot + "/" + std::to_string(pid_I) + "/" + item_I;
}

std::vector<int> CProcFolder::ListPids() const {
  std::vector<int> pids;
  DIR* folder = opendir(mRoot.c_str());
  if (folder == nullptr) return pids;
  while (dirent* item = readdir(folder)) {
    char* end = nullptr;
    const long pid = std::strtol(item->d_name, &end, 10);
    if (end != item->d_name && *end == '\0' && pid > 0) pids.push_back(static_cast<int>(pid));
  }
  closedir(folder);
  return pids;
}

std::string CProcFolder::GetExecutable(int pid_I) const {
  char target[PATH_MAX + 1] = {};
  const ssize_t length = readlink(PathOf(pid_I, "exe").c_str(), target, PATH_MAX);
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

bool CProcFolder::GetRealOwner(int pid_I, uid_t& owner_O) const {
  // "Uid:" lists the real, effective, saved and file-system ids: the real
  // one is whoever started the process, whatever it has switched to since.
  std::ifstream in(PathOf(pid_I, "status"));
  std::string line;
  while (std::getline(in, line)) {
    if (line.rfind("Uid:", 0) != 0) continue;
    std::istringstream fields(line.substr(4));
    long owner = -1;
    if (!(fields >> owner) || owner < 0) return false;
    owner_O = static_cast<uid_t>(owner);
    return true;
  }
  return false;
}

bool CProcFolder::IsZombie(int pid_I) const {
  std::ifstream in(PathOf(pid_I, "stat"));
  std::string content;
  std::getline(in, content);
  const size_t close = content.rfind(')');
  return close != std::string::npos && close + 2 < content.size() && content[close + 2] == 'Z';
}
