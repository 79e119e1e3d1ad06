// The lab's state files are read back from disk: any content must load or
// be refused, and what loads must save and load back to the same entries.
#include <unistd.h>

#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <string>

#include "lab/CLabStateFile.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data_I, size_t size_I) {
  static const std::string path = "/tmp/fuzz-lab-state-" + std::to_string(::getpid());
  FILE* file = std::fopen(path.c_str(), "wb");
  if (file == nullptr) return 0;
  std::fwrite(data_I, 1, size_I, file);
  std::fclose(file);
  CLabStateFile state;
  if (state.Load(path)) {
    if (!state.Save(path)) std::abort();
    CLabStateFile again;
    if (!again.Load(path)) std::abort();
    if (state.Has("mode") != again.Has("mode")) std::abort();
  }
  return 0;
}
