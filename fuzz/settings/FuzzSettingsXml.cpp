// Arbitrary text as an XML settings document. Whatever reads must write,
// and what we write must read back and write the same again: the first
// reading normalises (trimmed strings, six decimals), the rest is stable.
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <stdexcept>
#include <string>

#include "settings/CSettingsObject.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data_I, size_t size_I) {
  const std::string text(reinterpret_cast<const char*>(data_I), size_I);
  auto tree = CSettingsObject::ReadFromXMLBuffer(text);
  if (!tree) return 0;
  tree->GetTraceString();
  std::string first;
  try {
    first = tree->GetXMLString("");
  } catch (const std::invalid_argument&) {
    return 0;  // a key that is no XML name, from a property list
  }
  auto again = CSettingsObject::ReadFromXMLBuffer(first);
  if (!again || again->GetXMLString("") != first) std::abort();
  return 0;
}
