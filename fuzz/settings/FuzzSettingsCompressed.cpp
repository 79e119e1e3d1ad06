// Arbitrary bytes as a compressed settings document. What reads must
// compress to a document that reads back to the same tree.
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <vector>

#include "settings/CSettingsObject.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data_I, size_t size_I) {
  const std::vector<unsigned char> bytes(data_I, data_I + size_I);
  auto tree = CSettingsObject::ReadFromCompressedBinary(bytes);
  if (!tree) return 0;
  auto again = CSettingsObject::ReadFromCompressedBinary(tree->GetCompressedBinary());
  if (!again || again->GetASN1Binary() != tree->GetASN1Binary()) std::abort();
  return 0;
}
