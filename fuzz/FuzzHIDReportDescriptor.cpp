// Feeds arbitrary bytes to the report-descriptor reader. The descriptor
// comes from the device, so it is outside data: the reader must never read
// past the bytes (ASan watches that), every pair it gives stands for a
// Collection item of at least one byte, and pages are 16 bits wide. The data is copied to a buffer
// of its exact size so that an overrun lands outside the allocation.
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <memory>
#include <span>

#include "devices/HIDReportDescriptor.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data_I, size_t size_I) {
  std::unique_ptr<uint8_t[]> copy(new uint8_t[size_I]);
  for (size_t i = 0; i < size_I; ++i) copy[i] = data_I[i];
  const auto pairs =
      HIDReportDescriptor::TopLevelUsagePairs(std::span<const uint8_t>(copy.get(), size_I));
  if (pairs.size() > size_I) std::abort();
  for (const auto& pair : pairs) {
    if (pair.usagePage > 0xFFFF) std::abort();
  }
  return 0;
}
