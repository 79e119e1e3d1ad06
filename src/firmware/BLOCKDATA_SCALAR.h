#pragma once
// One block of a scalar image as the scalar takes it over HID, sent as it
// stands: where the block goes, its CRC, and 256 bytes of image.

#include <cstdint>

struct BLOCKDATA_SCALAR {
  uint8_t offset[3];  // the block's offset in the image, bits 23-16, 15-8, 7-0
  uint8_t crc;        // CRC-8 of data, all 256 bytes
  uint8_t data[256];  // image bytes, 0xFF past the image's end
};
static_assert(sizeof(BLOCKDATA_SCALAR) == 260, "a scalar block is sent byte for byte");
