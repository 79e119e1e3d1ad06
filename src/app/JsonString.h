#pragma once
// A text as a JSON string, whatever its bytes: quotes, backslashes and
// control characters are escaped, UTF-8 passes as it is, and each byte that
// is not part of valid UTF-8 (a file name may hold any) becomes U+FFFD, so
// the report always parses.

#include <string>

std::string JsonString(const std::string& text_I);
