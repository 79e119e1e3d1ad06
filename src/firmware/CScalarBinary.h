#pragma once
// A display scalar image for programming over HID: the whole file, kept
// beside its cut into 260-byte blocks that each carry their offset and CRC.

#include <cstdint>
#include <fstream>
#include <string>
#include <vector>

#include "firmware/BLOCKDATA_SCALAR.h"

class CScalarBinary {
 public:
  static constexpr size_t kBlockDataSize = sizeof(BLOCKDATA_SCALAR::data);

  CScalarBinary() = default;
  virtual ~CScalarBinary();
  CScalarBinary(const CScalarBinary&) = delete;
  CScalarBinary& operator=(const CScalarBinary&) = delete;

  // Cuts bytes_I into blocks; false, with no blocks, for an empty image. The
  // offset has 24 bits, so an image of 16 MiB or more repeats offsets.
  virtual bool Prepare(const std::vector<uint8_t>& bytes_I);
  virtual bool IsLoaded() const { return !mBlocks.empty(); }
  // Empties the blocks and the image; the size stays.
  virtual void Clear();

  bool Load(const std::string& path_I);
  uint32_t Size() const { return mSize; }
  unsigned long NumBlocks() const { return mBlocks.size(); }
  // Null when index_I is at or past the end.
  const BLOCKDATA_SCALAR* BlockPtr(unsigned long index_I) const;

  bool OpenFile(const std::string& path_I);
  void CloseFile();
  uint64_t FileSize();
  void DumpData() const;

  // CRC-8, polynomial 0x07, most significant bit first, no reflection and
  // no final exclusive-or, from initial_I. A length below 1 gives 0.
  static uint8_t CRC8_ATM(const uint8_t* data_I, int length_I, uint8_t initial_I);

 private:
  std::string mFileName;
  std::ifstream mStream;
  uint32_t mSize = 0;
  std::vector<uint8_t> mData;
  std::vector<BLOCKDATA_SCALAR> mBlocks;
};
