#include "settings/MathUtilities.h"

#include <stdexcept>

#include "common/StringUtilities.h"
#include "common/TavLog.h"

namespace MathUtilities {

bool IsInteger(const std::string& text_I) {
  if (text_I.empty()) return false;
  for (size_t i = 0; i < text_I.size(); ++i) {
    const char c = text_I[i];
    if (c == '-' && i == 0) continue;
    if (c < '0' || c > '9') return false;
  }
  return true;
}

int64_t StringToInteger(const std::string& text_I, int64_t default_I) {
  const std::string text = StringUtilities::Trim_Copy(text_I);
  try {
    return std::stoll(text, nullptr, 10);
  } catch (const std::exception& error) {
    TavLog::Warning("MathUtilities::StringToInteger: cannot convert \"%s\": %s\n", text.c_str(),
                    error.what());
  }
  return default_I;
}

double StringToDouble(const std::string& text_I, double default_I) {
  const std::string text = StringUtilities::Trim_Copy(text_I);
  try {
    return std::stod(text);
  } catch (const std::exception& error) {
    TavLog::Warning("MathUtilities::StringToDouble: cannot convert \"%s\": %s\n", text.c_str(),
                    error.what());
  }
  return default_I;
}

}  // namespace MathUtilities
