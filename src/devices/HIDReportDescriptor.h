#pragma once
// The usage pairs of a HID report descriptor's top-level collections: what
// tells the pen's, the touch's and the loader's interfaces of one USB device
// apart. A pure function over bytes, so the Linux registry and the lab read
// descriptors the same way.

#include <cstdint>
#include <span>
#include <vector>

namespace HIDReportDescriptor {

struct SUsagePair {
  uint32_t usage = 0;
  uint32_t usagePage = 0;

  bool operator==(const SUsagePair&) const = default;
};

// One pair per Collection item opened outside any other collection, in
// descriptor order. The usage is the first Usage (or Usage Minimum) local
// item before the collection; a four-byte usage carries its own page, a
// shorter one takes the Usage Page in force at the collection. A collection
// with no usage gives usage 0. Nested collections count for nothing; long
// items and reserved items are stepped over. Reading stops at the first item
// that runs past the end of the bytes, keeping what was found before it;
// nothing outside the span is ever read.
std::vector<SUsagePair> TopLevelUsagePairs(std::span<const uint8_t> descriptor_I);

}  // namespace HIDReportDescriptor
