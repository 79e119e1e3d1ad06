#include "common/TavReplaceFile.h"

#include <fcntl.h>
#include <unistd.h>

#include <cstdio>

bool TavReplaceFile(const std::string& path_I,
                    const std::function<bool(const std::string& temporaryPath_I)>& write_I) {
  // The same folder, so the rename stays on one file system; the process
  // id keeps two writers of the same file apart.
  const std::string temporary = path_I + ".tmp" + std::to_string(getpid());
  bool written = write_I(temporary);
  if (written) {
    const int fd = open(temporary.c_str(), O_RDONLY | O_CLOEXEC);
    written = fd >= 0 && fsync(fd) == 0;
    if (fd >= 0) close(fd);
  }
  if (written && std::rename(temporary.c_str(), path_I.c_str()) == 0) return true;
  std::remove(temporary.c_str());
  return false;
}
