// Any text as an S-record file. A load either fails or gives blocks sorted
// by start that do not overlap; ASan and UBSan watch every read of a line.
#include <cstddef>
#include <cstdint>

#include "FuzzFirmwareFile.h"
#include "firmware/CSRec.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data_I, size_t size_I) {
  static const CFuzzFile file(".pen");
  CSRec source;
  if (!source.Load(file.Write(data_I, size_I), EHID_INTERFACE)) {
    Require(source.GetSRecDataRef().empty());
    return 0;
  }
  const auto& blocks = source.GetSRecDataRef();
  Require(!blocks.empty());
  for (size_t i = 1; i < blocks.size(); ++i) {
    Require(uint64_t{blocks[i - 1].startAddress} + blocks[i - 1].data.size() <=
            blocks[i].startAddress);
  }
  return 0;
}
