// Arbitrary bytes as a binary settings document. What reads must encode to
// a document that reads back and encodes to the same bytes.
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <vector>

#include "settings/CSettingsObject.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data_I, size_t size_I) {
  const std::vector<unsigned char> bytes(data_I, data_I + size_I);
  auto tree = CSettingsObject::ReadFromASN1Binary(bytes);
  if (!tree) return 0;
  const auto first = tree->GetASN1Binary();
  auto again = CSettingsObject::ReadFromASN1Binary(first);
  if (!again || again->GetASN1Binary() != first) std::abort();
  return 0;
}
