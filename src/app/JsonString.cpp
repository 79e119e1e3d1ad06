#include "app/JsonString.h"

#include <cstdio>

#include "common/StringUtilities.h"

std::string JsonString(const std::string& text_I) {
  std::string out = "\"";
  for (size_t position = 0; position < text_I.size();) {
    const unsigned char byte = static_cast<unsigned char>(text_I[position]);
    if (byte >= 0x80) {
      const size_t start = position;
      uint32_t point = 0;
      const bool decoded = StringUtilities::DecodeUTF8ToUnicodePoint(text_I, position, point) &&
                           position > start && point <= 0x10FFFF &&
                           !(point >= 0xD800 && point <= 0xDFFF);
      if (decoded) {
        out.append(text_I, start, position - start);
      } else {
        out += "\\ufffd";
        position = start + 1;
      }
      continue;
    }
    if (byte == '"' || byte == '\\') {
      out += '\\';
      out += static_cast<char>(byte);
    } else if (byte < 0x20) {
      char escaped[8];
      std::snprintf(escaped, sizeof escaped, "\\u%04x", byte);
      out += escaped;
    } else {
      out += static_cast<char>(byte);
    }
    ++position;
  }
  return out + "\"";
}
