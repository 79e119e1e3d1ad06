#include "platform/linux/HidReportDescriptor.h"

namespace {

enum EItemType : uint8_t { eMain = 0, eGlobal = 1, eLocal = 2 };
constexpr uint8_t kLongItemPrefix = 0xFE;
constexpr uint8_t kTagUsagePage = 0x0;  // global
constexpr uint8_t kTagPush = 0xA;       // global
constexpr uint8_t kTagPop = 0xB;        // global
constexpr uint8_t kTagUsage = 0x0;      // local
constexpr uint8_t kTagCollection = 0xA;  // main
constexpr uint8_t kTagEndCollection = 0xC;  // main

}  // namespace

std::vector<std::pair<uint16_t, uint16_t>> HidTopLevelUsages(const uint8_t* descriptor_I,
                                                            size_t size_I) {
  std::vector<std::pair<uint16_t, uint16_t>> usages;
  std::vector<uint16_t> pageStack;
  uint16_t page = 0;
  bool haveUsage = false;
  uint32_t usage = 0;
  int depth = 0;

  size_t at = 0;
  while (at < size_I) {
    const uint8_t prefix = descriptor_I[at];
    if (prefix == kLongItemPrefix) {
      if (at + 2 >= size_I) break;
      at += 3 + descriptor_I[at + 1];
      continue;
    }
    const size_t length = (prefix & 3) == 3 ? 4 : (prefix & 3);
    if (at + 1 + length > size_I) break;
    uint32_t value = 0;
    for (size_t i = 0; i < length; ++i) value |= uint32_t{descriptor_I[at + 1 + i]} << (8 * i);
    const uint8_t type = (prefix >> 2) & 3;
    const uint8_t tag = prefix >> 4;
    at += 1 + length;

    if (type == eGlobal) {
      if (tag == kTagUsagePage) page = static_cast<uint16_t>(value);
      if (tag == kTagPush) pageStack.push_back(page);
      if (tag == kTagPop && !pageStack.empty()) {
        page = pageStack.back();
        pageStack.pop_back();
      }
    } else if (type == eLocal) {
      // The first usage names the collection that follows.
      if (tag == kTagUsage && !haveUsage) {
        usage = length == 4 ? value : (uint32_t{page} << 16) | value;
        haveUsage = true;
      }
    } else if (type == eMain) {
      if (tag == kTagCollection) {
        if (depth == 0 && haveUsage) {
          usages.emplace_back(static_cast<uint16_t>(usage >> 16), static_cast<uint16_t>(usage));
        }
        ++depth;
      } else if (tag == kTagEndCollection && depth > 0) {
        --depth;
      }
      haveUsage = false;  // local items last until the next main item
    }
  }
  return usages;
}
