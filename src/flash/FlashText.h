#pragma once
// Number formatting for the log texts of the flash subsystem.

#include <cstdint>
#include <string>

namespace FlashText {

// Hexadecimal without prefix; `width_I` digits with fill "0" when given.
inline std::string Hex(uint32_t value_I, int width_I = 0, bool upper_I = false) {
  const char* digits = upper_I ? "0123456789ABCDEF" : "0123456789abcdef";
  char buffer[8];
  int count = 0;
  do {
    buffer[count++] = digits[value_I & 0xF];
    value_I >>= 4;
  } while (value_I != 0);
  std::string text;
  for (int i = count; i < width_I; ++i) text += '0';
  while (count > 0) text += buffer[--count];
  return text;
}

// Eight upper-case digits, the form of addresses and checksums in the log.
inline std::string Hex8(uint32_t value_I) { return Hex(value_I, 8, true); }

inline std::string Dec(uint64_t value_I) { return std::to_string(value_I); }

}  // namespace FlashText
