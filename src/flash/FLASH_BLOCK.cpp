#include "flash/FLASH_BLOCK.h"

#include <algorithm>
#include <cstring>
#include <numeric>

FLASH_BLOCK::FLASH_BLOCK(uint32_t startAddr_I, uint32_t size_I, uint32_t readSize_I,
                         uint32_t writeWordSize_I, uint32_t writeBlockSize_I,
                         uint32_t writeStartOffset_I, uint32_t writeSize_I, bool protected_I)
    : mStartAddr(startAddr_I),
      mSize(size_I),
      mReadSize(readSize_I),
      mWriteWordSize(writeWordSize_I),
      mWriteBlockSize(writeBlockSize_I),
      mWriteStartOffset(writeStartOffset_I),
      mWriteSize(writeSize_I),
      mProtected(protected_I) {}

void FLASH_BLOCK::MakeBlankImage() {
  if (mBlockData.empty()) mBlockData.assign(mSize, 0xFF);
}

void FLASH_BLOCK::CopyIn(uint32_t offset_I, const uint8_t* data_I, uint32_t count_I) {
  if (count_I == 0) return;
  std::memcpy(mBlockData.data() + offset_I, data_I, count_I);
  mCopiedFrom = std::min(mCopiedFrom, offset_I);
  mCopiedTo = std::max(mCopiedTo, offset_I + count_I);
}

FLASH_BLOCK::Span FLASH_BLOCK::GetCopiedSpan() const {
  const uint32_t to = std::min<uint32_t>(mCopiedTo, static_cast<uint32_t>(mBlockData.size()));
  return {std::min(mCopiedFrom, to), to};
}

uint32_t FLASH_BLOCK::GetImageSum() const {
  const auto [from, to] = GetCopiedSpan();
  const uint32_t copied = std::accumulate(mBlockData.begin() + from, mBlockData.begin() + to,
                                          uint32_t{0});
  // Wraps as a byte-by-byte sum would.
  const uint32_t blank = static_cast<uint32_t>(mBlockData.size()) - (to - from);
  return copied + blank * 0xFFu;
}
