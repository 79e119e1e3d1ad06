#pragma once
// Trace lines of the bridge link and the scalar layer. They are formatted
// only while g_DebugTrace is on; a normal run pays for the flag test alone.

#include <cstdint>
#include <vector>

#include "common/ConditionalFunction.h"
#include "common/TavLog.h"

// SCALAR_TRACE(Debug, "I2CRead1 read %i\n", count): TavLog::Debug(...) when
// tracing is on. A macro, so the format stays a literal the compiler checks.
#define SCALAR_TRACE(level, ...) \
  ConditionalFunction(g_DebugTrace != 0)([&] { TavLog::level(__VA_ARGS__); })

namespace ScalarTrace {

// With tracing on: the title on its own line (none when empty), then the bytes as two
// upper-case hexadecimal digits and a blank, 16 to a line.
void Bytes(const char* title_I, const uint8_t* bytes_I, size_t size_I);
inline void Bytes(const char* title_I, const std::vector<uint8_t>& bytes_I) {
  Bytes(title_I, bytes_I.data(), bytes_I.size());
}

}  // namespace ScalarTrace
