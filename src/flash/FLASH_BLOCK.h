#pragma once
// One flash block of the device, with the part of the image that falls in
// it. An image that is not empty always holds exactly the block's size.

#include <cstddef>
#include <cstdint>
#include <vector>

class FLASH_BLOCK {
 public:
  FLASH_BLOCK(uint32_t startAddr_I, uint32_t size_I, uint32_t readSize_I, uint32_t writeWordSize_I,
              uint32_t writeBlockSize_I, uint32_t writeStartOffset_I, uint32_t writeSize_I,
              bool protected_I);

  uint32_t GetStartAddr() const { return mStartAddr; }
  uint32_t GetSize() const { return mSize; }
  uint32_t GetReadSize() const { return mReadSize; }
  uint32_t GetWriteWordSize() const { return mWriteWordSize; }
  uint32_t GetWriteBlockSize() const { return mWriteBlockSize; }
  uint32_t GetWriteStartOffset() const { return mWriteStartOffset; }
  void SetWriteStartOffset(uint32_t offset_I) { mWriteStartOffset = offset_I; }
  uint32_t GetWriteSize() const { return mWriteSize; }
  void SetWriteSize(uint32_t size_I) { mWriteSize = size_I; }
  bool IsProtected() const { return mProtected; }

  std::vector<uint8_t> GetBlockData() const { return mBlockData; }
  // The image without a copy, for the programming loops.
  const std::vector<uint8_t>& BlockData() const { return mBlockData; }
  size_t GetBlockDataSize() const { return mBlockData.size(); }
  bool IsEmpty() const { return mBlockData.empty(); }

  // Gives an empty image the block's size, all blank (0xFF).
  void MakeBlankImage();
  // Copies `count_I` bytes to `offset_I` of the image; the image must
  // already hold the block's size and the range must lie inside it.
  void CopyIn(uint32_t offset_I, const uint8_t* data_I, uint32_t count_I);
  // The part of the image that data was copied into, [from, to); outside
  // it the image is blank. Empty while nothing was copied.
  struct Span {
    uint32_t from;
    uint32_t to;
  };
  Span GetCopiedSpan() const;
  // The 32-bit sum of the image's bytes, counting the blank rest without
  // reading it: a loader may describe blocks of many MiB.
  uint32_t GetImageSum() const;

 private:
  uint32_t mStartAddr = 0;
  uint32_t mSize = 0;
  uint32_t mReadSize = 0;
  uint32_t mWriteWordSize = 0;
  uint32_t mWriteBlockSize = 0;
  uint32_t mWriteStartOffset = 0;
  uint32_t mWriteSize = 0;
  bool mProtected = false;
  std::vector<uint8_t> mBlockData;
  uint32_t mCopiedFrom = UINT32_MAX;
  uint32_t mCopiedTo = 0;
};
