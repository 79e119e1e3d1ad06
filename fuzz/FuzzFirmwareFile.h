#pragma once
// The readers take paths: each input is written to one file of the process,
// named with the extension that picks the reader.

#include <stdlib.h>
#include <sys/prctl.h>
#include <unistd.h>

#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <string>

class CFuzzFile {
 public:
  explicit CFuzzFile(const std::string& extension_I) {
    const char* base = access("/dev/shm", W_OK) == 0 ? "/dev/shm" : std::getenv("TMPDIR");
    std::string pattern =
        std::string(base != nullptr ? base : "/tmp") + "/fuzz-XXXXXX" + extension_I;
    const int fd = mkstemps(pattern.data(), static_cast<int>(extension_I.size()));
    if (fd < 0) std::abort();
    close(fd);
    mPath = pattern;
  }
  ~CFuzzFile() { unlink(mPath.c_str()); }

  const std::string& Write(const uint8_t* data_I, size_t size_I) const {
    std::FILE* file = std::fopen(mPath.c_str(), "wb");
    if (file == nullptr) std::abort();
    if (size_I > 0 && std::fwrite(data_I, 1, size_I, file) != size_I) std::abort();
    std::fclose(file);
    return mPath;
  }
  const std::string& Write(const std::string& text_I) const {
    return Write(reinterpret_cast<const uint8_t*>(text_I.data()), text_I.size());
  }

 private:
  std::string mPath;
};

// Inputs are a few KiB: clearing a 2 MiB huge page for each record staged
// was most of an S-record target's time. Huge pages change only speed.
inline const bool kHugePagesOff = prctl(PR_SET_THP_DISABLE, 1, 0, 0, 0) == 0;

inline void Require(bool condition_I) {
  if (!condition_I) std::abort();
}
