#include "firmware/HexDumpLog.h"

#include "common/TavLog.h"

namespace HexDumpLog {

void Write(const char* header_I, const uint8_t* data_I, size_t size_I) {
  static constexpr char kDigits[] = "0123456789ABCDEF";
  static constexpr size_t kBytesPerLine = 32;
  TavLog::Info("%s", header_I);
  // Built by hand, not with printf per byte: a whole image goes through here.
  char text[kBytesPerLine * 3 + 1];
  for (size_t offset = 0; offset < size_I; offset += kBytesPerLine) {
    const size_t count = size_I - offset < kBytesPerLine ? size_I - offset : kBytesPerLine;
    char* out = text;
    for (size_t i = 0; i < count; ++i) {
      const uint8_t byte = data_I[offset + i];
      *out++ = kDigits[byte >> 4];
      *out++ = kDigits[byte & 0x0F];
      *out++ = ' ';
    }
    *out = '\0';
    TavLog::Info("%s\n", text);
  }
  TavLog::Info("\n");
}

}  // namespace HexDumpLog
