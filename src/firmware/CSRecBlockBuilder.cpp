#include "firmware/CSRecBlockBuilder.h"

#include <malloc.h>

#include <algorithm>
#include <cstring>
#include <memory>

#include "firmware/CBlockMergeIndex.h"

namespace {

// Gives the storage back: assigning {} would only empty the list and keep it.
template <typename T>
void Release(T& list_IO) {
  T().swap(list_IO);
}

}  // namespace

void CSRecBlockBuilder::Clear() {
  Release(mRecords);
  Release(mStaged);
  mPendingFirst = 0;
  Release(mPendingData);
  mImage.Clear();
  mImage.SetBudget(0);
  mData.Clear();
  mAscending = true;
  mLastEnd = 0;
  Release(mBlockOf);
  Release(mBlocks);
}

void CSRecBlockBuilder::ReserveFor(uint64_t textBytes_I) {
  // A data record takes at least ten characters and a line feed.
  static constexpr uint64_t kShortestRecord = 11;
  static constexpr uint64_t kMostReserved = uint64_t{1} << 26;
  mRecords.reserve(static_cast<size_t>(std::min(textBytes_I / kShortestRecord, kMostReserved)));
  static constexpr uint64_t kPartlyUsed = 2 * CStagingImage::kPageSize;
  mImage.SetBudget(textBytes_I / 2 + kPartlyUsed);
}

void CSRecBlockBuilder::Add(uint32_t address_I, const uint8_t* data_I, size_t size_I) {
  mRecords.push_back({address_I, static_cast<uint32_t>(size_I)});
  mAscending = mAscending && size_I > 0 && address_I >= mLastEnd;
  mLastEnd = uint64_t{address_I} + size_I;
  // Records in address order fill their blocks in file order as they are:
  // they are not staged.
  if (mAscending) {
    mStaged.push_back(false);
    if (size_I > 0) std::memcpy(mData.Append(size_I), data_I, size_I);
    mPendingFirst = mRecords.size();
    return;
  }
  mImage.Expect(address_I);
  mPendingData.insert(mPendingData.end(), data_I, data_I + size_I);
  if (mRecords.size() - mPendingFirst == kPendingRecords) StagePending();
}

void CSRecBlockBuilder::StagePending() {
  const uint8_t* data = mPendingData.data();
  for (size_t record = mPendingFirst; record < mRecords.size(); ++record) {
    const size_t size = mRecords[record].size;
    const bool staged = mImage.Place(mRecords[record].address, data, size);
    mStaged.push_back(staged);
    if (!staged && size > 0) std::memcpy(mData.Append(size), data, size);
    data += size;
  }
  mPendingFirst = mRecords.size();
  mPendingData.clear();
}

std::vector<SContinuousDataBlock> CSRecBlockBuilder::Build() {
  StagePending();
  mImage.ForgetStaged();
  // Sorted before the rest of the bookkeeping is made: the sort needs the
  // most room.
  std::vector<uint32_t> byAddress;
  if (!mAscending) byAddress = SortByAddress();
  mBlockOf.assign(mRecords.size(), kDropped);
  mBlocks.clear();
  mBlocks.reserve(mRecords.size());  // address space only, as above
  std::vector<uint32_t> placeOf;
  if (mAscending) {
    JoinNeighbours({});
  } else if (Disjoint(byAddress)) {
    JoinNeighbours(byAddress);
    placeOf = PlacesByAddress(byAddress);
  } else {
    MergeOneByOne();
  }
  Release(byAddress);
  // The sort's buffers may have come from the heap, where freeing keeps
  // them resident; hand their pages back before the blocks are filled,
  // when memory peaks.
  malloc_trim(0);
  std::vector<SContinuousDataBlock> blocks = Fill(placeOf, mAscending || !placeOf.empty());
  Clear();
  // The bookkeeping freed here lies below the blocks in the heap, where it
  // would stay resident for as long as the blocks live.
  Release(placeOf);
  malloc_trim(0);
  return blocks;
}

// Blocks of records that share no byte are runs in address order, so their
// places in the sorted list follow from one walk; ties cannot occur there.
std::vector<uint32_t> CSRecBlockBuilder::PlacesByAddress(
    const std::vector<uint32_t>& byAddress_I) const {
  std::vector<uint32_t> placeOf(mBlocks.size());
  uint32_t next = 0;
  for (size_t i = 0; i < byAddress_I.size(); ++i) {
    const uint32_t block = mBlockOf[byAddress_I[i]];
    if (i == 0 || block != mBlockOf[byAddress_I[i - 1]]) placeOf[block] = next++;
  }
  return placeOf;
}

// Record numbers in address order, ties in file order: a stable radix sort
// of the addresses with the record number in the low half of each key. Only
// as many digits as the highest address needs, with every digit's counts
// taken in one pass.
std::vector<uint32_t> CSRecBlockBuilder::SortByAddress() const {
  static constexpr unsigned kMostDigitBits = 12;
  const size_t count = mRecords.size();
  uint32_t highest = 0;
  for (const SRecord& record : mRecords) highest = std::max(highest, record.address);
  const unsigned bits = highest == 0 ? 0 : 32 - static_cast<unsigned>(__builtin_clz(highest));
  const unsigned passes = (bits + kMostDigitBits - 1) / kMostDigitBits;
  const unsigned digitBits = passes == 0 ? 0 : (bits + passes - 1) / passes;
  const size_t digits = size_t{1} << digitBits;

  // Neither buffer needs clearing: every key is written before it is read.
  std::unique_ptr<uint64_t[]> keys(new uint64_t[count]);
  std::unique_ptr<uint64_t[]> sorted(new uint64_t[passes > 0 ? count : 0]);
  std::vector<size_t> starts(passes * digits + 1, 0);
  for (size_t i = 0; i < count; ++i) {
    keys[i] = uint64_t{mRecords[i].address} << 32 | i;
    for (unsigned pass = 0; pass < passes; ++pass) {
      ++starts[pass * digits + ((mRecords[i].address >> (pass * digitBits)) & (digits - 1))];
    }
  }
  for (unsigned pass = 0; pass < passes; ++pass) {
    size_t* start = &starts[pass * digits];
    size_t sum = 0;
    for (size_t digit = 0; digit < digits; ++digit) {
      const size_t here = start[digit];
      start[digit] = sum;
      sum += here;
    }
    const unsigned shift = 32 + pass * digitBits;
    for (size_t i = 0; i < count; ++i) {
      const uint64_t key = keys[i];
      sorted[start[(key >> shift) & (digits - 1)]++] = key;
    }
    keys.swap(sorted);
  }
  std::vector<uint32_t> byAddress(count);
  for (size_t i = 0; i < count; ++i) byAddress[i] = static_cast<uint32_t>(keys[i]);
  return byAddress;
}

// No record without data, and none reaching into the next one up.
bool CSRecBlockBuilder::Disjoint(const std::vector<uint32_t>& byAddress_I) const {
  for (size_t i = 0; i < byAddress_I.size(); ++i) {
    const SRecord& record = mRecords[byAddress_I[i]];
    if (record.size == 0) return false;
    if (i + 1 < byAddress_I.size() &&
        uint64_t{record.address} + record.size > mRecords[byAddress_I[i + 1]].address) {
      return false;
    }
  }
  return true;
}

// With records that share no byte, the only block ending where a record
// starts holds the record just below it, and the only block starting where
// it ends holds the record just above it; each is there only if that record
// came earlier in the file. The lower block number of the two takes it.
// An empty byAddress_I means the file order is the address order.
void CSRecBlockBuilder::JoinNeighbours(const std::vector<uint32_t>& byAddress_I) {
  const size_t count = mRecords.size();
  const bool inFileOrder = byAddress_I.empty();
  std::vector<uint32_t> rank;
  if (!inFileOrder) {
    rank.resize(count);
    for (size_t i = 0; i < count; ++i) rank[byAddress_I[i]] = static_cast<uint32_t>(i);
  }
  const auto recordAt = [&](size_t position_I) {
    return inFileOrder ? position_I : size_t{byAddress_I[position_I]};
  };

  static constexpr size_t kAhead = 16;
  for (size_t record = 0; record < count; ++record) {
    // In a shuffled file the neighbours lie anywhere: ask early for where
    // they are, then for what they hold.
    if (!inFileOrder && record + kAhead < count) {
      __builtin_prefetch(&byAddress_I[rank[record + kAhead]]);
    }
    if (!inFileOrder && record + kAhead / 2 < count) {
      const size_t later = rank[record + kAhead / 2];
      for (const size_t side : {later - 1, later + 1}) {
        if (side < count) {
          __builtin_prefetch(&mRecords[byAddress_I[side]]);
          __builtin_prefetch(&mBlockOf[byAddress_I[side]]);
        }
      }
    }
    const uint64_t start = mRecords[record].address;
    const uint64_t end = start + mRecords[record].size;
    const size_t position = inFileOrder ? record : rank[record];
    uint32_t below = kDropped;
    uint32_t above = kDropped;
    if (position > 0) {
      const size_t neighbour = recordAt(position - 1);
      const SRecord& other = mRecords[neighbour];
      if (neighbour < record && uint64_t{other.address} + other.size == start) {
        below = mBlockOf[neighbour];
      }
    }
    if (position + 1 < count) {
      const size_t neighbour = recordAt(position + 1);
      if (neighbour < record && mRecords[neighbour].address == end) above = mBlockOf[neighbour];
    }

    if (below == kDropped && above == kDropped) {
      mBlockOf[record] = static_cast<uint32_t>(mBlocks.size());
      mBlocks.push_back({start, end});
    } else if (below < above) {
      mBlockOf[record] = below;
      mBlocks[below].end = end;
    } else {
      mBlockOf[record] = above;
      mBlocks[above].start = start;
    }
  }
}

// The rule itself, one record after the other: the first block in order of
// creation that holds the record's address, ends at it or starts where the
// record ends takes the record, or drops it when it starts inside the block.
void CSRecBlockBuilder::MergeOneByOne() {
  CBlockMergeIndex index;
  for (size_t record = 0; record < mRecords.size(); ++record) {
    const uint64_t address = mRecords[record].address;
    const uint64_t size = mRecords[record].size;
    const uint32_t taker = index.FirstTaker(address, size);
    if (taker == CBlockMergeIndex::kNoBlock) {
      mBlockOf[record] = static_cast<uint32_t>(mBlocks.size());
      index.BlockAdded(mBlockOf[record], address, size);
      mBlocks.push_back({address, address + size});
      continue;
    }
    SBounds& block = mBlocks[taker];
    // First data wins: a record starting inside the block is dropped whole,
    // even where it differs or runs past the block's end.
    if (address >= block.start && address < block.end) continue;
    mBlockOf[record] = taker;
    const uint64_t start = block.start;
    if (block.end == address) {
      block.end = address + size;
      index.BlockAppended(taker, address, size);
    }
    if (address + size == start) {
      block.start = address;
      index.BlockPrepended(taker, address, size);
    }
  }
}

// Takes each block's bytes from the staging image, then lays the records
// kept apart over them, in file order. Every byte of a block belongs to one
// of its records, and a staged record's bytes were never staged over, so
// the result is each record's own data. With the list in address order the
// blocks are filled front to back and the staging given back behind them.
std::vector<SContinuousDataBlock> CSRecBlockBuilder::Fill(const std::vector<uint32_t>& placeOf_I,
                                                          bool sorted_I) {
  const auto place = [&placeOf_I](uint32_t block_I) {
    return placeOf_I.empty() ? block_I : placeOf_I[block_I];
  };
  std::vector<SBounds> bounds(mBlocks.size());
  for (uint32_t i = 0; i < mBlocks.size(); ++i) bounds[place(i)] = mBlocks[i];
  const auto overlayOf = [&](size_t record_I) {
    const uint32_t block = mBlockOf[record_I];
    const uint32_t size = mRecords[record_I].size;
    if (block == kDropped) return SOverlay{kDropped, 0, size};
    const uint64_t offset = mRecords[record_I].address - mBlocks[block].start;
    return SOverlay{place(block), static_cast<uint32_t>(offset), size};
  };
  // Where few records were kept apart, only what they need is kept, and the
  // bookkeeping of all records goes before the blocks take their room.
  const size_t keptApart = static_cast<size_t>(std::count(mStaged.begin(), mStaged.end(), false));
  const bool anyStaged = keptApart < mStaged.size();
  const bool compact = keptApart <= mRecords.size() / 4;
  std::vector<SOverlay> overlays;
  if (compact) {
    overlays.reserve(keptApart);
    for (size_t record = 0; record < mRecords.size(); ++record) {
      if (!mStaged[record]) overlays.push_back(overlayOf(record));
    }
    Release(mRecords);
    Release(mStaged);
    Release(mBlockOf);
    Release(mBlocks);
  }

  std::vector<SContinuousDataBlock> blocks(bounds.size());
  for (size_t at = 0; at < bounds.size(); ++at) {
    SContinuousDataBlock& block = blocks[at];
    block.startAddress = static_cast<uint32_t>(bounds[at].start);
    if (sorted_I) mImage.ReleaseBelow(bounds[at].start);
    const size_t size = static_cast<size_t>(bounds[at].end - bounds[at].start);
    block.data.reserve(size);
    if (anyStaged) mImage.CopyOut(bounds[at].start, size, block.data, sorted_I);
  }
  mImage.Clear();

  const size_t count = compact ? overlays.size() : mRecords.size();
  for (size_t i = 0; i < count; ++i) {
    if (!compact && mStaged[i]) continue;
    const SOverlay overlay = compact ? overlays[i] : overlayOf(i);
    const size_t size = overlay.size;
    const uint8_t* data = mData.ReadNext(size);
    if (overlay.place == kDropped || size == 0) continue;
    std::vector<uint8_t>& target = blocks[overlay.place].data;
    const SBounds& span = bounds[overlay.place];
    const size_t blockSize = static_cast<size_t>(span.end - span.start);
    const size_t offset = overlay.offset;
    // Blocks that took nothing staged grow as they fill from their start.
    if (offset == target.size()) {
      target.insert(target.end(), data, data + size);
    } else {
      if (target.size() < blockSize) target.resize(blockSize);
      std::memcpy(target.data() + offset, data, size);
    }
  }
  return blocks;
}
