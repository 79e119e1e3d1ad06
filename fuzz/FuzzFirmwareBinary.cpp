// Any bytes as each of the three binary images: every reader holds the file
// byte for byte, and the scalar blocks give the file back with their CRCs.
#include <cstddef>
#include <cstdint>
#include <vector>

#include "FuzzFirmwareFile.h"
#include "firmware/CBinaryAiroFlash.h"
#include "firmware/CScalarBinary.h"
#include "firmware/CScalarRTDISP.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data_I, size_t size_I) {
  static const CFuzzFile file(".bin");
  const std::string& path = file.Write(data_I, size_I);
  const std::vector<uint8_t> bytes(data_I, data_I + size_I);

  CBinaryAiroFlash airoFlash;
  Require(airoFlash.Load(path) == (size_I > 0));
  if (size_I > 0) {
    Require(airoFlash.Size() == size_I);
    Require(std::vector<uint8_t>(airoFlash.GetData(), airoFlash.GetData() + size_I) == bytes);
  }

  CScalarRTDISP rtdIsp;
  Require(rtdIsp.Load(path) == (size_I > 0));
  Require(rtdIsp.IsLoaded() && rtdIsp.GetData() == bytes);

  CScalarBinary scalar;
  Require(scalar.Load(path) == (size_I > 0));
  Require(scalar.NumBlocks() == (size_I + 255) / 256);
  std::vector<uint8_t> back;
  for (unsigned long i = 0; i < scalar.NumBlocks(); ++i) {
    const BLOCKDATA_SCALAR& block = *scalar.BlockPtr(i);
    Require(block.crc == CScalarBinary::CRC8_ATM(block.data, 256, 0));
    Require((uint32_t{block.offset[0]} << 16 | block.offset[1] << 8 | block.offset[2]) ==
            ((i * 256) & 0xFFFFFF));
    back.insert(back.end(), block.data, block.data + 256);
  }
  back.resize(size_I);
  Require(back == bytes);
  return 0;
}
