#include "flash/CBluetoothAB1555_CRC.h"

uint8_t CBluetoothAB1555_CRC::GetMaxBitIndexOfOne(uint64_t value_I) {
  if (value_I == 0) return 255;
  uint8_t index = 0;
  while ((value_I >>= 1) != 0) ++index;
  return index;
}

uint8_t CBluetoothAB1555_CRC::ReverseBits(uint8_t value_I) {
  uint8_t reversed = 0;
  for (int i = 0; i < 8; ++i) {
    reversed = static_cast<uint8_t>((reversed << 1) | (value_I & 1));
    value_I >>= 1;
  }
  return reversed;
}

uint8_t CBluetoothAB1555_CRC::CRC8(const uint8_t* data_I, uint32_t length_I, uint8_t polynomial_I) {
  const uint64_t generator = 2 * uint64_t{polynomial_I} + 1;
  const uint8_t top = GetMaxBitIndexOfOne(generator);
  if (top > 8) return 0;
  const uint64_t topBit = uint64_t{1} << top;

  uint64_t reg = 0;
  for (uint32_t i = 0; i < length_I; ++i) {
    uint8_t value = ReverseBits(data_I[i]);
    for (int bit = 0; bit < 8; ++bit) {
      if ((reg & topBit) != 0) reg ^= generator;
      reg = 2 * reg + (value & 1);
      value >>= 1;
    }
  }
  if ((reg & topBit) != 0) reg ^= generator;
  // Push the register through the generator's width of zeroes.
  for (uint8_t i = 0; i < top; ++i) {
    reg = 2 * reg;
    if ((reg & topBit) != 0) reg ^= generator;
  }
  return ReverseBits(static_cast<uint8_t>(reg & 0xFF));
}
