#pragma once
// Firmware images for lab tests, and what a lab flash must hold after they
// are programmed.

#include <cstdint>
#include <vector>

#include "firmware/SContinuousDataBlock.h"
#include "lab/CLabFlash.h"

namespace LabImages {

// `size_I` bytes from `start_I` of a pattern of `seed_I`, never 0xFF, so
// every word is written.
inline SContinuousDataBlock Record(uint32_t start_I, size_t size_I, uint32_t seed_I) {
  SContinuousDataBlock record;
  record.startAddress = start_I;
  record.data.resize(size_I);
  uint32_t state = seed_I * 747796405u + 2891336453u;
  for (uint8_t& byte : record.data) {
    state = state * 1664525u + 1013904223u;
    byte = static_cast<uint8_t>((state >> 24) % 0xFF);
  }
  return record;
}

// The content of every block after `image_I` has been programmed over
// `before_I`: blocks the image touches are erased and hold its bytes, the
// others keep what they held.
inline std::vector<std::vector<uint8_t>> Expected(
    const CLabFlash& before_I, const std::vector<SContinuousDataBlock>& image_I) {
  std::vector<std::vector<uint8_t>> blocks;
  std::vector<bool> touched(before_I.GetBlockCount(), false);
  for (uint32_t i = 0; i < before_I.GetBlockCount(); ++i) {
    blocks.push_back(before_I.GetBlockContent(i));
  }
  for (const SContinuousDataBlock& record : image_I) {
    for (size_t k = 0; k < record.data.size(); ++k) {
      const int index = before_I.BlockOf(record.startAddress + static_cast<uint32_t>(k));
      if (index < 0) continue;
      if (!touched[index]) {
        blocks[index].assign(blocks[index].size(), 0xFF);
        touched[index] = true;
      }
      blocks[index][record.startAddress + k - before_I.GetLayout().blocks[index].start] =
          record.data[k];
    }
  }
  return blocks;
}

// The image's sum as the host computes it: the blocks' 32-bit words, blank
// where unwritten, over the blocks the image touches that `summed_I`
// accepts.
template <class Predicate>
uint32_t WordSum(const std::vector<std::vector<uint8_t>>& blocks_I,
                 const std::vector<bool>& touched_I, Predicate summed_I) {
  uint32_t sum = 0;
  for (size_t i = 0; i < blocks_I.size(); ++i) {
    if (!touched_I[i] || !summed_I(i)) continue;
    for (size_t k = 0; k + 4 <= blocks_I[i].size(); k += 4) {
      sum += blocks_I[i][k] | (blocks_I[i][k + 1] << 8) | (blocks_I[i][k + 2] << 16) |
             (static_cast<uint32_t>(blocks_I[i][k + 3]) << 24);
    }
  }
  return sum;
}

inline std::vector<bool> Touched(const CLabFlash& flash_I,
                                 const std::vector<SContinuousDataBlock>& image_I) {
  std::vector<bool> touched(flash_I.GetBlockCount(), false);
  for (const SContinuousDataBlock& record : image_I) {
    for (size_t k = 0; k < record.data.size(); ++k) {
      const int index = flash_I.BlockOf(record.startAddress + static_cast<uint32_t>(k));
      if (index >= 0) touched[index] = true;
    }
  }
  return touched;
}

}  // namespace LabImages
