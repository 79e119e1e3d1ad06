// Arbitrary text as the content of a property list. What reads must write
// as a property list that reads back and writes the same again.
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <string>

#include "settings/CSettingsObject.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data_I, size_t size_I) {
  const std::string text = "<plist version=\"1.0\">" +
                           std::string(reinterpret_cast<const char*>(data_I), size_I) + "</plist>";
  auto tree = CSettingsObject::ReadFromXMLBuffer(text);
  if (!tree) return 0;
  const std::string first = tree->GetPListString(true);
  auto again = CSettingsObject::ReadFromXMLBuffer(first);
  if (!again || again->GetPListString(true) != first) std::abort();
  return 0;
}
