// Any text as an Intel hex file. A load either fails and keeps nothing, or
// gives an image at 0x8000 in whole pages within the target's limit, with
// its signed 16-bit sum.
#include <cstddef>
#include <cstdint>

#include "FuzzFirmwareFile.h"
#include "firmware/CIntelHex.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data_I, size_t size_I) {
  static const CFuzzFile file(".hex");
  CIntelHex hex;
  if (!hex.Load(file.Write(data_I, size_I))) {
    Require(!hex.IsLoaded());
    return 0;
  }
  Require(hex.StartAddress() == CIntelHex::kRequiredStart);
  Require(hex.Size() > 0 && hex.Size() <= CIntelHex::kMaxSize && hex.Size() % 512 == 0);
  int32_t sum = 0;
  for (uint32_t i = 0; i < hex.Size(); ++i) sum += static_cast<int8_t>(hex.GetData()[i]);
  Require(hex.Checksum() == (static_cast<uint32_t>(sum) & 0xFFFF));
  return 0;
}
