#pragma once
// Free operations on the desktop's running applications, over the desktop
// installed in OProcessUtils. An application's identifier is its desktop
// entry's id, its path (its "bundle") the entry file. A missing identifier
// (std::nullopt) is not an empty one.

#include <optional>
#include <string>

namespace ProcessUtils {

using OptionalText = std::optional<std::string>;

// False when nothing was started, or when the application has not shown up
// as running after about one second (it may still do so afterwards). With
// `checkRunning_I` and the application running, false and nothing starts.
// `options_I` are the workspace's launch options: none of them has a
// meaning for a desktop entry's Exec line.
bool LaunchApplicationWithBundleID(const OptionalText& bundleId_I, const OptionalText& path_I,
                                   unsigned long options_I, bool checkRunning_I,
                                   const OptionalText& argument_I);
bool QuitApplicationWithBundleID(const OptionalText& bundleId_I, bool includeSelf_I);
// The last one found; 0 when none, or when it is this process and
// `includeSelf_I` is off.
int GetPIDForProcessWithBundleID(const OptionalText& bundleId_I, bool includeSelf_I);
// In spite of its name: the identifier of the last one found, not a path.
std::string GetBundlePathForProcessWithBundleID(const OptionalText& bundleId_I);
std::string GetExecutableNameForProcessWithPID(int pid_I);
bool ApplicationIsRunning(const OptionalText& bundleId_I);
std::string GetBundleIdentifierForProcessWithUnixPID(int pid_I);
int GetSelfPID();
// 0: a Linux desktop names no application in front (see SystemState).
int GetForegroundProcessPID();
std::string GetProcessIdentifier(int pid_I);
// "0.0.0": a desktop entry carries no version of its application.
std::string GetProcessVersion(int pid_I);
// A desktop entry's name is its id, so both give the entry file's path.
std::string FindPathForApplicationName(const std::string& name_I);
std::string FindPathForApplicationSecondaryID(const std::string& id_I);

}  // namespace ProcessUtils
