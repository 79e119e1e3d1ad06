#include "firmware/CBlockMergeIndex.h"

#include <algorithm>

namespace {

constexpr uint64_t kHashFactor = 0x9E3779B97F4A7C15ull;

}  // namespace

CBlockMergeIndex::CBlockMergeIndex(unsigned pageBits_I)
    : mPageBits(std::clamp(pageBits_I, 1u, kMostPageBits)),
      mOffsetMask((uint32_t{1} << mPageBits) - 1) {}

void CBlockMergeIndex::Clear() {
  std::vector<SSlot>().swap(mSlots);
  mUsedSlots = 0;
  mSlotBits = 0;
  mOtherStarts = {};
  std::vector<SEntry>().swap(mScratch);
  mCachedKey = UINT64_MAX;
  mCachedPage = nullptr;
  mHintPage = nullptr;
  mHintIndex = 0;
}

uint32_t CBlockMergeIndex::FirstTaker(uint64_t address_I, uint64_t size_I) const {
  return std::min(LowestCoveringBlock(address_I), StartMinAt(address_I + size_I));
}

void CBlockMergeIndex::BlockAdded(uint32_t block_I, uint64_t start_I, uint64_t size_I) {
  Paint(start_I, start_I + size_I, block_I, true);
}

void CBlockMergeIndex::BlockAppended(uint32_t block_I, uint64_t address_I, uint64_t size_I) {
  Paint(address_I, address_I + size_I, block_I, false);
}

void CBlockMergeIndex::BlockPrepended(uint32_t block_I, uint64_t address_I, uint64_t size_I) {
  // Without data the block neither grows nor moves its start.
  if (size_I == 0) return;
  Paint(address_I, address_I + size_I, block_I, true);
  RemoveStart(address_I + size_I, block_I);
}

uint32_t CBlockMergeIndex::LowestCoveringBlock(uint64_t address_I) const {
  const SPage* page = FindPage(address_I >> mPageBits);
  if (page == nullptr) return kNoBlock;
  const uint32_t offset = static_cast<uint32_t>(address_I) & mOffsetMask;
  return page->marks[EntryAtOrBefore(*page, offset)].label;
}

uint32_t CBlockMergeIndex::StartMinAt(uint64_t point_I) const {
  const SPage* page = FindPage(point_I >> mPageBits);
  if (page == nullptr) return kNoBlock;
  const uint32_t offset = static_cast<uint32_t>(point_I) & mOffsetMask;
  const size_t index = EntryAtOrBefore(*page, offset);
  return page->offsets[index] == offset ? page->marks[index].startMin : kNoBlock;
}

size_t CBlockMergeIndex::SlotOf(uint64_t key_I) const {
  const size_t mask = mSlots.size() - 1;
  size_t slot = static_cast<size_t>((key_I * kHashFactor) >> (64 - mSlotBits));
  while (mSlots[slot].key != key_I && mSlots[slot].key != kNoKey) slot = (slot + 1) & mask;
  return slot;
}

const CBlockMergeIndex::SPage* CBlockMergeIndex::FindPage(uint64_t key_I) const {
  if (key_I == mCachedKey) return mCachedPage;
  if (mSlots.empty()) return nullptr;
  const size_t slot = SlotOf(key_I);
  if (mSlots[slot].key == kNoKey) return nullptr;
  mCachedKey = key_I;
  mCachedPage = const_cast<SPage*>(&mSlots[slot].page);
  return mCachedPage;
}

CBlockMergeIndex::SPage& CBlockMergeIndex::GetPage(uint64_t key_I) {
  if (key_I == mCachedKey) return *mCachedPage;
  if ((mUsedSlots + 1) * 4 > mSlots.size() * 3) GrowSlots();
  SSlot& place = mSlots[SlotOf(key_I)];
  if (place.key == kNoKey) {
    place.key = key_I;
    place.page.offsets.push_back(0);
    place.page.marks.push_back({kNoBlock, kNoBlock});
    ++mUsedSlots;
  }
  mCachedKey = key_I;
  mCachedPage = &place.page;
  return place.page;
}

// Doubles the table. Pages move, so the remembered page and search go.
void CBlockMergeIndex::GrowSlots() {
  std::vector<SSlot> old;
  old.swap(mSlots);
  mSlotBits = old.empty() ? 6 : mSlotBits + 1;
  mSlots.resize(size_t{1} << mSlotBits);
  for (SSlot& slot : old) {
    if (slot.key == kNoKey) continue;
    SSlot& place = mSlots[SlotOf(slot.key)];
    place.key = slot.key;
    place.page = std::move(slot.page);
  }
  mCachedKey = UINT64_MAX;
  mCachedPage = nullptr;
  mHintPage = nullptr;
}

size_t CBlockMergeIndex::EntryAtOrBefore(const SPage& page_I, uint32_t offset_I) const {
  static constexpr int kShortWalk = 4;
  const uint16_t* offsets = page_I.offsets.data();
  const size_t count = page_I.offsets.size();
  size_t found = count;
  if (&page_I == mHintPage) {
    size_t i = std::min(mHintIndex, count - 1);
    if (offsets[i] <= offset_I) {
      for (int step = 0; step < kShortWalk && i + 1 < count && offsets[i + 1] <= offset_I; ++step) {
        ++i;
      }
      if (i + 1 == count || offsets[i + 1] > offset_I) found = i;
    } else {
      // Walking down from an entry past the offset: the first one at or
      // before it is the answer. Entry 0 is at offset 0, so the walk ends.
      for (int step = 0; step < kShortWalk && offsets[i] > offset_I; ++step) --i;
      if (offsets[i] <= offset_I) found = i;
    }
  }
  if (found == count) {
    // Without branches on the data: a shuffled file leaves nothing to predict.
    const uint16_t* base = offsets;
    for (size_t left = count; left > 1;) {
      const size_t half = left / 2;
      base = base[half] <= offset_I ? base + half : base;
      left -= half;
    }
    found = static_cast<size_t>(base - offsets);
  }
  mHintPage = &page_I;
  mHintIndex = found;
  return found;
}

// Lowers the paint of every address from first_I to last_I, both included,
// to block_I where it is higher. With startsAtFirst_I the block also starts
// at first_I.
void CBlockMergeIndex::Paint(uint64_t first_I, uint64_t last_I, uint32_t block_I,
                             bool startsAtFirst_I) {
  const uint64_t firstKey = first_I >> mPageBits;
  const uint64_t lastKey = last_I >> mPageBits;
  for (uint64_t key = firstKey; key <= lastKey; ++key) {
    const uint32_t low = key == firstKey ? static_cast<uint32_t>(first_I) & mOffsetMask : 0;
    const uint32_t high =
        key == lastKey ? static_cast<uint32_t>(last_I) & mOffsetMask : mOffsetMask;
    PaintInPage(GetPage(key), key << mPageBits, low, high, block_I,
                startsAtFirst_I && key == firstKey);
  }
}

// Builds the entries from low_I to high_I + 1 anew and puts them in place of
// the old ones in one move: the point after the range keeps its paint, the
// points in it take the lower of their paint and block_I, and entries that
// repeat the paint before them without starting a block are left out.
void CBlockMergeIndex::PaintInPage(SPage& page_I, uint64_t pageBase_I, uint32_t low_I,
                                   uint32_t high_I, uint32_t block_I, bool startsAtLow_I) {
  std::vector<uint16_t>& offsets = page_I.offsets;
  std::vector<SMark>& marks = page_I.marks;
  const size_t atLow = EntryAtOrBefore(page_I, low_I);
  const bool haveLow = offsets[atLow] == low_I;
  size_t interiorEnd = atLow + 1;
  while (interiorEnd < offsets.size() && offsets[interiorEnd] <= high_I) ++interiorEnd;
  const bool lastInPage = high_I == mOffsetMask;
  const bool haveAfter =
      !lastInPage && interiorEnd < offsets.size() && offsets[interiorEnd] == high_I + 1;

  mScratch.clear();
  SEntry first{low_I,
               {std::min(marks[atLow].label, block_I), haveLow ? marks[atLow].startMin : kNoBlock}};
  if (startsAtLow_I) ClaimStart(pageBase_I + low_I, first.mark.startMin, block_I);
  mScratch.push_back(first);
  for (size_t i = atLow + 1; i < interiorEnd; ++i) {
    mScratch.push_back({offsets[i], {std::min(marks[i].label, block_I), marks[i].startMin}});
  }
  if (!lastInPage) {
    const SMark& source = haveAfter ? marks[interiorEnd] : marks[interiorEnd - 1];
    mScratch.push_back({high_I + 1, {source.label, haveAfter ? source.startMin : kNoBlock}});
  }

  const size_t replaceBegin = haveLow ? atLow : atLow + 1;
  const size_t replaceEnd = interiorEnd + (haveAfter ? 1 : 0);
  // The entry at offset 0 stays whatever it holds.
  const bool keepFirst = replaceBegin == 0;
  uint32_t previous = keepFirst ? kNoBlock : marks[replaceBegin - 1].label;
  size_t kept = 0;
  for (size_t i = 0; i < mScratch.size(); ++i) {
    const SEntry& entry = mScratch[i];
    const bool needed =
        (i == 0 && keepFirst) || entry.mark.startMin != kNoBlock || entry.mark.label != previous;
    if (!needed) continue;
    previous = entry.mark.label;
    mScratch[kept++] = entry;
  }

  // Same count: overwrite. Otherwise one move of the rest of the page.
  const size_t oldCount = replaceEnd - replaceBegin;
  if (kept < oldCount) {
    const auto from = static_cast<ptrdiff_t>(replaceBegin + kept);
    const auto to = static_cast<ptrdiff_t>(replaceEnd);
    offsets.erase(offsets.begin() + from, offsets.begin() + to);
    marks.erase(marks.begin() + from, marks.begin() + to);
  } else if (kept > oldCount) {
    const auto at = static_cast<ptrdiff_t>(replaceEnd);
    const size_t more = kept - oldCount;
    offsets.insert(offsets.begin() + at, more, 0);
    marks.insert(marks.begin() + at, more, SMark{});
  }
  for (size_t i = 0; i < kept; ++i) {
    offsets[replaceBegin + i] = static_cast<uint16_t>(mScratch[i].offset);
    marks[replaceBegin + i] = mScratch[i].mark;
  }
  mHintPage = &page_I;
  mHintIndex = replaceBegin;
}

// Several blocks can start at one point; the entry holds the lowest.
void CBlockMergeIndex::ClaimStart(uint64_t point_I, uint32_t& startMin_IO, uint32_t block_I) {
  if (startMin_IO == kNoBlock) {
    startMin_IO = block_I;
  } else if (block_I < startMin_IO) {
    mOtherStarts[point_I].push_back(startMin_IO);
    startMin_IO = block_I;
  } else {
    mOtherStarts[point_I].push_back(block_I);
  }
}

void CBlockMergeIndex::RemoveStart(uint64_t point_I, uint32_t block_I) {
  SPage& page = GetPage(point_I >> mPageBits);
  const uint32_t offset = static_cast<uint32_t>(point_I) & mOffsetMask;
  const size_t index = EntryAtOrBefore(page, offset);
  if (page.offsets[index] != offset) return;
  SMark& mark = page.marks[index];

  auto others = mOtherStarts.empty() ? mOtherStarts.end() : mOtherStarts.find(point_I);
  if (mark.startMin == block_I) {
    mark.startMin = kNoBlock;
    if (others != mOtherStarts.end()) {
      auto lowest = std::min_element(others->second.begin(), others->second.end());
      mark.startMin = *lowest;
      others->second.erase(lowest);
    }
  } else if (others != mOtherStarts.end()) {
    std::erase(others->second, block_I);
  }
  if (others != mOtherStarts.end() && others->second.empty()) mOtherStarts.erase(others);

  const bool repeatsPaint =
      index > 0 && mark.startMin == kNoBlock && mark.label == page.marks[index - 1].label;
  if (repeatsPaint) {
    page.offsets.erase(page.offsets.begin() + static_cast<ptrdiff_t>(index));
    page.marks.erase(page.marks.begin() + static_cast<ptrdiff_t>(index));
  }
}
