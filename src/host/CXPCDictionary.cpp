#include "host/CXPCDictionary.h"

int64_t CXPCDictionary::GetInteger(const std::string& key_I, int64_t default_I) const {
  const int64_t* value = Get<int64_t>(key_I);
  return value != nullptr ? *value : default_I;
}
