#pragma once
// The AB1555's page CRC, bit by bit on a register one bit wider than the
// generator.

#include <cstdint>

#include "flash/CBluetooth_CRC.h"

class CBluetoothAB1555_CRC : public CBluetooth_CRC {
 public:
  // The generator is 2 * polynomial + 1; the chip's callers pass 0x98.
  uint8_t CRC8(const uint8_t* data_I, uint32_t length_I, uint8_t polynomial_I);
  // The index of the highest set bit; 255 for 0.
  uint8_t GetMaxBitIndexOfOne(uint64_t value_I);
  uint8_t ReverseBits(uint8_t value_I);
};
