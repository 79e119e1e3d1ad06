#pragma once
// The image of all flash blocks of one device, in descriptor order.

#include <cstdint>
#include <vector>

#include "flash/FLASH_BLOCK.h"

class Flash {
 public:
  void Clear() {
    mBlocks.clear();
    mTotalSize = 0;
  }
  void AddBlock(const FLASH_BLOCK& block_I) { mBlocks.push_back(block_I); }
  uint32_t GetBlocksSize() const { return static_cast<uint32_t>(mBlocks.size()); }
  FLASH_BLOCK& GetBlock(uint32_t index_I) { return mBlocks[index_I]; }
  const FLASH_BLOCK& GetBlock(uint32_t index_I) const { return mBlocks[index_I]; }

  // The sum of the blocks' write sizes.
  uint32_t GetTotalSize() const { return mTotalSize; }
  void AddToTotalSize(uint32_t size_I) { mTotalSize += size_I; }

 private:
  uint32_t mTotalSize = 0;
  std::vector<FLASH_BLOCK> mBlocks;
};
