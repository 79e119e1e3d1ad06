#include "firmware/FirmwareFileCheck.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

#include "firmware/CSRec.h"

namespace FirmwareFileCheck {

std::string AcceptedExtensions() {
  return ".pen, .touch, .tav, .hex, .airoflash, .airoflash2, .bin for a scalar";
}

std::string Problem(const std::string& path_I, EINTERFACE_TYPE interfaceType_I) {
  if (path_I.empty()) return std::strerror(ENOENT);
  struct stat info {};
  if (stat(path_I.c_str(), &info) != 0) return std::strerror(errno);
  if (S_ISDIR(info.st_mode)) return std::strerror(EISDIR);
  if (!S_ISREG(info.st_mode)) return "not a regular file";
  // Opened without blocking and closed at once: only the permission is asked.
  const int descriptor = open(path_I.c_str(), O_RDONLY | O_NONBLOCK | O_CLOEXEC);
  if (descriptor < 0) return std::strerror(errno);
  close(descriptor);

  if (info.st_size == 0) return "the file is empty";
  const EDataSourceFormat format = CSRec::FormatFor(path_I, interfaceType_I);
  if (format == EDS_UNKNOWN) {
    const std::string extension = CSRec::ExtensionOf(path_I);
    return (extension.empty() ? std::string("a name without an extension")
                              : "the extension ." + extension) +
           " is not one of a firmware file (" + AcceptedExtensions() + ")";
  }
  const bool binary = format == EDS_AIROFLASH || format == EDS_AIROFLASH2 ||
                      format == EDS_SCALAR_BINARY || format == EDS_SCALAR_RTDISP;
  if (binary && static_cast<uint64_t>(info.st_size) > kMaxBinaryBytes) {
    return "a binary image of " + std::to_string(info.st_size) +
           " bytes is larger than any board takes (16 MiB)";
  }
  return std::string();
}

bool KeepsReaderAway(const std::string& path_I, EINTERFACE_TYPE interfaceType_I) {
  struct stat info {};
  if (stat(path_I.c_str(), &info) != 0) return false;
  return !Problem(path_I, interfaceType_I).empty() && access(path_I.c_str(), R_OK) == 0;
}

}  // namespace FirmwareFileCheck
