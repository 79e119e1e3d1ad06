#pragma once
// One run of consecutive firmware bytes in the target's address space.

#include <cstdint>
#include <vector>

struct SContinuousDataBlock {
  uint32_t startAddress = 0;
  std::vector<uint8_t> data;

  bool operator==(const SContinuousDataBlock&) const = default;
};
