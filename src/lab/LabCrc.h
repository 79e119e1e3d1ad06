#pragma once
// The CRCs the emulated chips check, computed the plain bit-by-bit way, on
// purpose independent of the host's own CRC classes.

#include <cstddef>
#include <cstdint>

namespace LabCrc {

// CRC-8, most significant bit first, register from `initial_I`, no final
// exclusive-or.
inline uint8_t Crc8(const uint8_t* data_I, size_t size_I, uint8_t polynomial_I,
                    uint8_t initial_I = 0) {
  uint8_t crc = initial_I;
  for (size_t i = 0; i < size_I; ++i) {
    crc ^= data_I[i];
    for (int bit = 0; bit < 8; ++bit) {
      crc = (crc & 0x80) != 0 ? static_cast<uint8_t>((crc << 1) ^ polynomial_I)
                              : static_cast<uint8_t>(crc << 1);
    }
  }
  return crc;
}

inline uint8_t Reflect(uint8_t value_I) {
  uint8_t reflected = 0;
  for (int bit = 0; bit < 8; ++bit) {
    if ((value_I >> bit) & 1) reflected |= static_cast<uint8_t>(0x80 >> bit);
  }
  return reflected;
}

// The Bluetooth modules' page CRC: polynomial 0x31, delivered bit-reversed.
inline uint8_t BluetoothPage(const uint8_t* page_I, size_t size_I) {
  return Reflect(Crc8(page_I, size_I, 0x31));
}

// The scalar's block CRC: polynomial 0x07 from 0.
inline uint8_t ScalarBlock(const uint8_t* data_I, size_t size_I) {
  return Crc8(data_I, size_I, 0x07);
}

}  // namespace LabCrc
