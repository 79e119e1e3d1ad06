#include "scalar/ScalarTrace.h"

namespace ScalarTrace {

void Bytes(const char* title_I, const uint8_t* bytes_I, size_t size_I) {
  ConditionalFunction(g_DebugTrace != 0)([&] {
    if (title_I != nullptr && title_I[0] != '\0') TavLog::Debug("%s\n", title_I);
    for (size_t i = 0; i < size_I; ++i) {
      TavLog::Debug("%2.2X ", bytes_I[i]);
      if (i % 16 == 15 || i + 1 == size_I) TavLog::Debug("\n");
    }
  });
}

}  // namespace ScalarTrace
