#include "common/CTavException.h"

#include <cstdio>

CTavException::CTavException(const char* file_I, int line_I, const char* message_I,
                             uint16_t status_I)
    : mFile(file_I), mLine(line_I), mMessage(message_I != nullptr ? message_I : ""),
      mStatus(status_I) {
  if (mFile != nullptr) {
    mWhat += "File: ";
    mWhat += mFile;
    mWhat += ", Line: ";
    mWhat += std::to_string(mLine);
    mWhat += ", ";
  }
  if (mStatus != 0) {
    char hex[8];
    std::snprintf(hex, sizeof hex, "%x", static_cast<unsigned>(mStatus));
    mWhat += "Status: ";
    mWhat += hex;
    mWhat += ", ";
  }
  mWhat += " \"";
  mWhat += mMessage;
  mWhat += "\"";
}

const char* CTavException::what() const noexcept { return mWhat.c_str(); }
