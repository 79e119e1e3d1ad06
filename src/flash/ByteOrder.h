#pragma once
// Little-endian fields in report bytes, written and read explicitly so the
// wire stays the same on any host.

#include <cstddef>
#include <cstdint>
#include <vector>

inline void PutLE16(std::vector<uint8_t>& report_IO, size_t offset_I, uint16_t value_I) {
  report_IO[offset_I] = static_cast<uint8_t>(value_I);
  report_IO[offset_I + 1] = static_cast<uint8_t>(value_I >> 8);
}

inline void PutLE32(std::vector<uint8_t>& report_IO, size_t offset_I, uint32_t value_I) {
  for (size_t i = 0; i < 4; ++i) report_IO[offset_I + i] = static_cast<uint8_t>(value_I >> (8 * i));
}

inline uint16_t GetLE16(const uint8_t* bytes_I) {
  return static_cast<uint16_t>(bytes_I[0] | (bytes_I[1] << 8));
}

inline uint32_t GetLE32(const uint8_t* bytes_I) {
  return static_cast<uint32_t>(bytes_I[0]) | (static_cast<uint32_t>(bytes_I[1]) << 8) |
         (static_cast<uint32_t>(bytes_I[2]) << 16) | (static_cast<uint32_t>(bytes_I[3]) << 24);
}
