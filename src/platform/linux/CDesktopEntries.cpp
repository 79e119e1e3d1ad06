#include "platform/linux/CDesktopEntries.h"

#include <dirent.h>
#include <limits.h>
#include <stdlib.h>
#include <unistd.h>

#include <cstdlib>
#include <fstream>

#include "common/StringUtilities.h"

namespace {

std::string EnvOr(const char* name_I, const std::string& fallback_I) {
  const char* value = std::getenv(name_I);
  return value != nullptr && value[0] != '\0' ? std::string(value) : fallback_I;
}

std::string HomeFolder() { return EnvOr("HOME", "/"); }

// Drops the field codes (%f, %U, ...) and keeps "%%" as "%".
std::string WithoutFieldCodes(const std::string& exec_I) {
  std::string result;
  for (size_t i = 0; i < exec_I.size(); ++i) {
    if (exec_I[i] == '%' && i + 1 < exec_I.size()) {
      if (exec_I[i + 1] == '%') result += '%';
      ++i;
      continue;
    }
    result += exec_I[i];
  }
  return StringUtilities::Trim_Copy(result);
}

// The canonical path, as /proc/PID/exe shows a running program.
std::string Canonical(const std::string& path_I) {
  char resolved[PATH_MAX + 1] = {};
  return realpath(path_I.c_str(), resolved) != nullptr ? std::string(resolved) : path_I;
}

std::string ResolveProgram(const std::string& word_I) {
  if (word_I.empty() || word_I[0] == '/') return Canonical(word_I);
  for (const std::string& folder :
       StringUtilities::Tokenize(EnvOr("PATH", "/usr/local/bin:/usr/bin:/bin"), ":", true)) {
    const std::string candidate = folder + "/" + word_I;
    if (access(candidate.c_str(), X_OK) == 0) return Canonical(candidate);
  }
  return word_I;
}

}  // namespace

namespace CDesktopEntries {

std::vector<std::string> SearchFolders() {
  std::vector<std::string> folders;
  folders.push_back(EnvOr("XDG_DATA_HOME", HomeFolder() + "/.local/share") + "/applications");
  for (const std::string& folder : StringUtilities::Tokenize(
           EnvOr("XDG_DATA_DIRS", "/usr/local/share:/usr/share"), ":", true)) {
    folders.push_back(folder + "/applications");
  }
  return folders;
}

std::vector<std::string> SplitExec(const std::string& exec_I) {
  std::vector<std::string> words;
  std::string word;
  bool quoted = false, inWord = false;
  for (size_t i = 0; i < exec_I.size(); ++i) {
    const char c = exec_I[i];
    if (quoted) {
      if (c == '\\' && i + 1 < exec_I.size()) {
        word += exec_I[++i];
      } else if (c == '"') {
        quoted = false;
      } else {
        word += c;
      }
    } else if (c == '"') {
      quoted = inWord = true;
    } else if (c == ' ' || c == '\t') {
      if (inWord) words.push_back(word);
      word.clear();
      inWord = false;
    } else {
      word += c;
      inWord = true;
    }
  }
  if (inWord) words.push_back(word);
  return words;
}

std::optional<SDesktopEntry> Read(const std::string& path_I) {
  std::ifstream in(path_I);
  if (!in) return std::nullopt;
  std::string line;
  bool inMainGroup = false;
  while (std::getline(in, line)) {
    const std::string trimmed = StringUtilities::Trim_Copy(line);
    if (!trimmed.empty() && trimmed[0] == '[') {
      inMainGroup = trimmed == "[Desktop Entry]";
      continue;
    }
    if (inMainGroup && trimmed.rfind("Exec=", 0) == 0) {
      SDesktopEntry entry;
      std::string name = path_I.substr(path_I.rfind('/') + 1);
      if (StringUtilities::EndsWith(name, ".desktop")) name.resize(name.size() - 8);
      entry.id = name;
      entry.path = path_I;
      entry.exec = WithoutFieldCodes(trimmed.substr(5));
      const std::vector<std::string> words = SplitExec(entry.exec);
      entry.program = words.empty() ? std::string() : ResolveProgram(words.front());
      return entry;
    }
  }
  return std::nullopt;
}

std::optional<SDesktopEntry> Find(const std::string& id_I) {
  if (id_I.empty() || id_I.find('/') != std::string::npos) return std::nullopt;
  for (const std::string& folder : SearchFolders()) {
    if (auto entry = Read(folder + "/" + id_I + ".desktop")) return entry;
  }
  return std::nullopt;
}

std::optional<SDesktopEntry> FindByProgram(const std::string& program_I) {
  for (const std::string& folder : SearchFolders()) {
    DIR* dir = opendir(folder.c_str());
    if (dir == nullptr) continue;
    std::optional<SDesktopEntry> found;
    while (dirent* item = readdir(dir)) {
      const std::string name = item->d_name;
      if (!StringUtilities::EndsWith(name, ".desktop")) continue;
      auto entry = Read(folder + "/" + name);
      if (entry && entry->program == program_I) {
        found = entry;
        break;
      }
    }
    closedir(dir);
    if (found) return found;
  }
  return std::nullopt;
}

}  // namespace CDesktopEntries
