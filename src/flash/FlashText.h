#pragma once
// Number formatting for the log texts of the flash subsystem.

#include <cstdint>
#include <string>

namespace FlashText {

// Hexadecimal without prefix; `width_I` digits with fill "0" when given.
inline std::string Hex(uint32_t value_I, int width_I = 0, bool upper_I = false) {
  const char* digits = upper_I ? "0123456789ABCDEF" : "0123456789abcdef";
  // Filled from the end, then taken in one piece: the block loop logs a line
  // for every report it sends.
  char buffer[8];
  int at = 8;
  do {
    buffer[--at] = digits[value_I & 0xF];
    value_I >>= 4;
  } while (value_I != 0);
  const int count = 8 - at;
  std::string text(width_I > count ? width_I - count : 0, '0');
  text.append(buffer + at, count);
  return text;
}

// Eight upper-case digits, the form of addresses and checksums in the log.
inline std::string Hex8(uint32_t value_I) { return Hex(value_I, 8, true); }

inline std::string Dec(uint64_t value_I) { return std::to_string(value_I); }

}  // namespace FlashText
