#include "devices/HIDReportDescriptor.h"

namespace HIDReportDescriptor {
namespace {

// The prefix byte of a long item; its size and tag follow in two bytes.
constexpr uint8_t kLongItemPrefix = 0xFE;
constexpr size_t kLongItemHeaderSize = 3;

enum EItemType : uint8_t { kMainItem = 0, kGlobalItem = 1, kLocalItem = 2 };

constexpr uint8_t kCollectionTag = 0xA;
constexpr uint8_t kEndCollectionTag = 0xC;
constexpr uint8_t kUsagePageTag = 0x0;
constexpr uint8_t kPushTag = 0xA;
constexpr uint8_t kPopTag = 0xB;
constexpr uint8_t kUsageTag = 0x0;
constexpr uint8_t kUsageMinimumTag = 0x1;

// Data sizes by the low two bits of a short item's prefix.
constexpr size_t kShortItemSizes[] = {0, 1, 2, 4};

// What the local items before the next main item said about its usage.
struct SLocalState {
  bool hasUsage = false;
  bool hasOwnPage = false;  // a four-byte usage brought its page along
  uint32_t usage = 0;
  uint32_t usagePage = 0;
};

uint32_t ReadLittleEndian(std::span<const uint8_t> bytes_I) {
  uint32_t value = 0;
  for (size_t i = bytes_I.size(); i > 0; --i) value = (value << 8) | bytes_I[i - 1];
  return value;
}

void TakeUsage(uint32_t data_I, size_t size_I, SLocalState& local_IO) {
  if (local_IO.hasUsage) return;  // the first usage names the collection
  local_IO.hasUsage = true;
  if (size_I == 4) {
    local_IO.hasOwnPage = true;
    local_IO.usagePage = data_I >> 16;
    local_IO.usage = data_I & 0xFFFF;
  } else {
    local_IO.usage = data_I;
  }
}

class CParser {
 public:
  std::vector<SUsagePair> Run(std::span<const uint8_t> descriptor_I) {
    size_t pos = 0;
    while (pos < descriptor_I.size()) {
      const size_t left = descriptor_I.size() - pos;
      const uint8_t prefix = descriptor_I[pos];
      if (prefix == kLongItemPrefix) {
        // No long item is defined; step over its data.
        if (left < kLongItemHeaderSize) break;
        const size_t dataSize = descriptor_I[pos + 1];
        if (left - kLongItemHeaderSize < dataSize) break;
        pos += kLongItemHeaderSize + dataSize;
        continue;
      }
      const size_t size = kShortItemSizes[prefix & 0x3];
      if (left - 1 < size) break;
      const uint32_t data = ReadLittleEndian(descriptor_I.subspan(pos + 1, size));
      pos += 1 + size;
      Item(static_cast<uint8_t>((prefix >> 2) & 0x3), static_cast<uint8_t>(prefix >> 4), data,
           size);
    }
    return mPairs;
  }

 private:
  void Item(uint8_t type_I, uint8_t tag_I, uint32_t data_I, size_t size_I) {
    switch (type_I) {
      case kMainItem: MainItem(tag_I); break;
      case kGlobalItem: GlobalItem(tag_I, data_I); break;
      case kLocalItem:
        if (tag_I == kUsageTag || tag_I == kUsageMinimumTag) TakeUsage(data_I, size_I, mLocal);
        break;
      default: break;  // reserved
    }
  }

  void MainItem(uint8_t tag_I) {
    if (tag_I == kCollectionTag) {
      if (mDepth == 0) {
        SUsagePair pair;
        pair.usage = mLocal.hasUsage ? mLocal.usage : 0;
        pair.usagePage = mLocal.hasOwnPage ? mLocal.usagePage : mUsagePage;
        mPairs.push_back(pair);
      }
      ++mDepth;
    } else if (tag_I == kEndCollectionTag && mDepth > 0) {
      --mDepth;
    }
    // Local items describe only the main item that follows them.
    mLocal = SLocalState();
  }

  void GlobalItem(uint8_t tag_I, uint32_t data_I) {
    if (tag_I == kUsagePageTag) {
      mUsagePage = data_I & 0xFFFF;  // pages are 16 bits wide
    } else if (tag_I == kPushTag) {
      mPushedPages.push_back(mUsagePage);
    } else if (tag_I == kPopTag && !mPushedPages.empty()) {
      mUsagePage = mPushedPages.back();
      mPushedPages.pop_back();
    }
  }

  std::vector<SUsagePair> mPairs;
  std::vector<uint32_t> mPushedPages;
  SLocalState mLocal;
  uint32_t mUsagePage = 0;
  size_t mDepth = 0;
};

}  // namespace

std::vector<SUsagePair> TopLevelUsagePairs(std::span<const uint8_t> descriptor_I) {
  return CParser().Run(descriptor_I);
}

}  // namespace HIDReportDescriptor
