#pragma once
// The S-record merge written the plain way, as a yardstick: every record
// walks all blocks in their order, then the blocks are sorted and checked
// for overlap. Slow, short and obviously the rule.

#include <algorithm>
#include <cstdint>
#include <vector>

#include "firmware/SContinuousDataBlock.h"

struct SReferenceMergeResult {
  std::vector<SContinuousDataBlock> blocks;  // empty when the load fails
  int overlapPair = 0;                       // 1-based pair number, 0 without overlap
};

inline SReferenceMergeResult ReferenceMerge(const std::vector<SContinuousDataBlock>& records_I) {
  std::vector<SContinuousDataBlock> blocks;
  for (const SContinuousDataBlock& record : records_I) {
    const uint64_t a = record.startAddress, n = record.data.size();
    bool taken = false;
    for (SContinuousDataBlock& block : blocks) {
      const uint64_t b = block.startAddress, m = block.data.size();
      taken = a >= b && a < b + m;  // starts inside: dropped
      if (taken) break;
      if (b + m == a) {
        block.data.insert(block.data.end(), record.data.begin(), record.data.end());
        taken = true;
      }
      if (a + n == b) {
        block.data.insert(block.data.begin(), record.data.begin(), record.data.end());
        block.startAddress = record.startAddress;
        taken = true;
      }
      if (taken) break;
    }
    if (!taken) blocks.push_back(record);
  }
  std::stable_sort(blocks.begin(), blocks.end(), [](const auto& x_I, const auto& y_I) {
    return x_I.startAddress < y_I.startAddress;
  });
  for (size_t pair = 1; pair < blocks.size(); ++pair) {
    const SContinuousDataBlock& before = blocks[pair - 1];
    if (uint64_t{before.startAddress} + before.data.size() > blocks[pair].startAddress) {
      return {{}, static_cast<int>(pair)};
    }
  }
  return {blocks, 0};
}
