#pragma once
// The image dump of the binary readers: a header line, then the bytes as two
// upper-case hexadecimal digits and a blank, 32 bytes to a log line, and a
// final empty line, all at info level.

#include <cstddef>
#include <cstdint>

namespace HexDumpLog {

void Write(const char* header_I, const uint8_t* data_I, size_t size_I);

}  // namespace HexDumpLog
