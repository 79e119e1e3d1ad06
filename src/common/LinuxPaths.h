#pragma once
// The well-known folders of this program on Linux, and path text
// operations. Every folder is a string without a trailing slash, or the
// empty string when the system gives none.
//
// The user's folders follow the XDG base directory rules: a variable that
// is unset, empty or not an absolute path is ignored, and the default below
// the home folder is used.

#include <string>

namespace LinuxPaths {

// $HOME, else the home folder of the current user in the password database.
std::string GetUserFolderPath();
// $XDG_CONFIG_HOME/tavik, default ~/.config/tavik. Holds fwupdater.parm
// and the persisted settings.
std::string GetConfigFolderPath();
// The folder where the user's preferences live: the config folder.
std::string GetUserPreferencesFolderPath();
// $XDG_STATE_HOME/tavik, default ~/.local/state/tavik. Holds log files.
std::string GetStateFolderPath();
// The data folder of the installed program: <prefix>/share/tavik-fwupdater
// reached from the executable's folder (<prefix>/bin, or the window
// program's <prefix>/libexec/tavik-fwupdater) when that folder exists, else
// the one fixed at build time.
std::string GetInstalledDataFolderPath();
// The same search from a given executable folder; an empty one gives the
// folder fixed at build time.
std::string FindInstalledDataFolder(const std::string& executableFolder_I);
// The folder of the running executable, from /proc/self/exe.
std::string GetExecutableFolderPath();

// Path text operations. Trailing slashes are not part of a component
// ("/a/b/" has the last component "b"), the root "/" is its own last
// component, and a leading dot does not start an extension (".profile" has
// none).
//
// "/a" + "b" gives "/a/b"; an empty path gives the component alone.
std::string AppendPathComponent(const std::string& path_I, const std::string& component_I);
// "/a/b" + "txt" gives "/a/b.txt". An empty path logs "cannot append
// extension '%s' to nothing" and gives the empty string.
std::string AppendPathExtension(const std::string& path_I, const std::string& extension_I);
// "/a/b" gives "/a", "/a" gives "/", "b" gives "".
std::string DeleteLastPathComponent(const std::string& path_I);
// "/a/b.txt" gives "/a/b"; a path without an extension comes back without
// its trailing slashes.
std::string DeletePathExtension(const std::string& path_I);
std::string LastPathComponent(const std::string& path_I);
// "txt" of "/a/b.txt"; empty when there is none.
std::string PathExtension(const std::string& path_I);

}  // namespace LinuxPaths
