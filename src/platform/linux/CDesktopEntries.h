#pragma once
// Finds XDG desktop entries by id and reads their Exec line.

#include <optional>
#include <string>
#include <vector>

struct SDesktopEntry {
  std::string id;       // the file name without ".desktop"
  std::string path;     // the entry file
  std::string exec;     // the Exec line with field codes removed
  std::string program;  // the absolute path of the Exec line's program
};

namespace CDesktopEntries {

// The folders searched, in order: $XDG_DATA_HOME/applications, then each
// $XDG_DATA_DIRS entry followed by /applications (defaults as XDG defines).
std::vector<std::string> SearchFolders();
std::optional<SDesktopEntry> Find(const std::string& id_I);
// The entry whose program is `program_I`, looked for in every folder.
std::optional<SDesktopEntry> FindByProgram(const std::string& program_I);
// The Exec line's words: blanks separate, double quotes group, a backslash
// inside quotes takes the next character as it is.
std::vector<std::string> SplitExec(const std::string& exec_I);
// Reads one entry file; nothing for a file without [Desktop Entry] Exec.
std::optional<SDesktopEntry> Read(const std::string& path_I);

}  // namespace CDesktopEntries
