// Report descriptors come from devices: the top-level usage parser must
// take any bytes, and every pair it finds must come from a collection.
#include <cstdint>
#include <cstdlib>

#include "platform/linux/HidReportDescriptor.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data_I, size_t size_I) {
  const auto usages = HidTopLevelUsages(data_I, size_I);
  size_t collections = 0;
  for (size_t i = 0; i < size_I; ++i)
    collections += (data_I[i] & 0xFC) == 0xA0;  // a collection item of any length
  if (usages.size() > collections) std::abort();
  return 0;
}
