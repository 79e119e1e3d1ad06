#include "common/TavSysErrStr.h"

#include <cstring>

std::string TavSysErrStr(int error_I) {
  char buffer[256];
  // GNU strerror_r may return a static string rather than fill the buffer.
  const char* text = strerror_r(error_I, buffer, sizeof buffer);
  return std::string(text) + " (" + std::to_string(error_I) + ")";
}
