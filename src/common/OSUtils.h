#pragma once
// Small process-wide services: main-thread dispatch, version numbers, a
// monotonic time stamp.

#include <cstdint>
#include <functional>
#include <string>

#include "common/FileVersion.h"

namespace OSUtils {

// Runs `block_I` on the main thread and returns when it has run; what the
// block throws is thrown here. On the main thread it runs at once. With no
// main loop registered (CMainThreadLoop) it also runs at once, on the
// calling thread: there is no main thread to wait for, and waiting would
// block the caller for good.
void DispatchOnMainThread(std::function<void()> block_I);

// This program's version, from the build (the project version).
FileVersion GetMainBundleVersion();
// A version from its text as a package carries it; `bIsWeb_I` marks a web
// build. An empty text gives a default FileVersion.
FileVersion GetVersionFromBundle(const std::string& versionText_I, bool bIsWeb_I);

// A four-byte version number: major in the top byte, minor and variation in
// the next two nibbles, the stage in the second-lowest byte (0x20
// development, 0x40 alpha, 0x60 beta, 0x80 final, anything else unknown)
// and the build in the low byte.
FileVersion GetVersionFromVersNumber(unsigned int number_I);

// Microseconds of the steady clock, from an arbitrary origin.
uint64_t CurrentTimeInMicroseconds();

// Whether the system log has a socket to write to. Where it has none (a
// container, say), syslog drops each line after a failed connect of its own:
// thousands of them in a scalar update. Looked for once.
bool HasSystemLog();

}  // namespace OSUtils
