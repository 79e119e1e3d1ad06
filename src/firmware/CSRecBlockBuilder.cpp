#include "firmware/CSRecBlockBuilder.h"

#include <malloc.h>

#include <algorithm>
#include <cstring>

#include "firmware/CBlockMergeIndex.h"

void CSRecBlockBuilder::Clear() {
  mRecords = {};
  mData.Clear();
  mAscending = true;
  mLastEnd = 0;
  mBlockOf = {};
  mBlocks = {};
}

void CSRecBlockBuilder::ReserveFor(uint64_t textBytes_I) {
  // A data record takes at least ten characters and a line feed.
  static constexpr uint64_t kShortestRecord = 11;
  static constexpr uint64_t kMostReserved = uint64_t{1} << 26;
  mRecords.reserve(static_cast<size_t>(std::min(textBytes_I / kShortestRecord, kMostReserved)));
}

void CSRecBlockBuilder::Add(uint32_t address_I, const uint8_t* data_I, size_t size_I) {
  mRecords.push_back({address_I, static_cast<uint32_t>(size_I)});
  if (size_I > 0) std::memcpy(mData.Append(size_I), data_I, size_I);
  mAscending = mAscending && size_I > 0 && address_I >= mLastEnd;
  mLastEnd = uint64_t{address_I} + size_I;
}

std::vector<SContinuousDataBlock> CSRecBlockBuilder::Build() {
  mBlockOf.assign(mRecords.size(), kDropped);
  mBlocks.clear();
  mBlocks.reserve(mRecords.size());  // address space only, as above
  std::vector<uint32_t> placeOf;
  if (mAscending) {
    JoinNeighbours({});
  } else {
    const std::vector<uint32_t> byAddress = SortByAddress();
    if (Disjoint(byAddress)) {
      JoinNeighbours(byAddress);
      placeOf = PlacesByAddress(byAddress);
    } else {
      MergeOneByOne();
    }
  }
  // The sort's buffers may have come from the heap, where freeing keeps
  // them resident; hand their pages back before the blocks are filled,
  // when memory peaks.
  malloc_trim(0);
  std::vector<SContinuousDataBlock> blocks = Fill(placeOf);
  Clear();
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
// of the addresses with the record number in the low half of each key.
std::vector<uint32_t> CSRecBlockBuilder::SortByAddress() const {
  static constexpr unsigned kDigitBits = 11;
  static constexpr size_t kDigits = size_t{1} << kDigitBits;
  const size_t count = mRecords.size();
  std::vector<uint64_t> keys(count);
  std::vector<uint64_t> sorted(count);
  for (size_t i = 0; i < count; ++i) keys[i] = uint64_t{mRecords[i].address} << 32 | i;
  for (unsigned shift = 32; shift < 64; shift += kDigitBits) {
    std::vector<size_t> starts(kDigits + 1, 0);
    for (uint64_t key : keys) ++starts[((key >> shift) & (kDigits - 1)) + 1];
    for (size_t digit = 1; digit <= kDigits; ++digit) starts[digit] += starts[digit - 1];
    for (uint64_t key : keys) sorted[starts[(key >> shift) & (kDigits - 1)]++] = key;
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

// Copies each kept record to its place in its block, in file order, so that
// the stored data is given back as it is used. A block filled from its start
// upwards grows as it fills instead of being cleared first.
std::vector<SContinuousDataBlock> CSRecBlockBuilder::Fill(const std::vector<uint32_t>& placeOf_I) {
  const auto place = [&placeOf_I](uint32_t block_I) {
    return placeOf_I.empty() ? block_I : placeOf_I[block_I];
  };
  std::vector<SContinuousDataBlock> blocks(mBlocks.size());
  for (uint32_t i = 0; i < mBlocks.size(); ++i) {
    blocks[place(i)].startAddress = static_cast<uint32_t>(mBlocks[i].start);
  }
  static constexpr size_t kAhead = 16;
  for (size_t record = 0; record < mRecords.size(); ++record) {
    // The blocks of a shuffled file are visited at random: ask for the
    // bookkeeping of a record well ahead, and for its block's data nearer.
    if (record + kAhead < mRecords.size() && mBlockOf[record + kAhead] != kDropped) {
      const uint32_t later = mBlockOf[record + kAhead];
      __builtin_prefetch(&mBlocks[later]);
      __builtin_prefetch(&blocks[place(later)]);
    }
    if (record + kAhead / 2 < mRecords.size() && mBlockOf[record + kAhead / 2] != kDropped) {
      __builtin_prefetch(blocks[place(mBlockOf[record + kAhead / 2])].data.data());
    }
    const size_t size = mRecords[record].size;
    const uint8_t* data = mData.ReadNext(size);
    const uint32_t block = mBlockOf[record];
    if (block == kDropped || size == 0) continue;
    std::vector<uint8_t>& target = blocks[place(block)].data;
    const size_t blockSize = static_cast<size_t>(mBlocks[block].end - mBlocks[block].start);
    const size_t offset = static_cast<size_t>(mRecords[record].address - mBlocks[block].start);
    if (target.capacity() == 0) target.reserve(blockSize);
    if (offset == target.size()) {
      target.insert(target.end(), data, data + size);
    } else {
      if (target.size() < blockSize) target.resize(blockSize);
      std::memcpy(target.data() + offset, data, size);
    }
  }
  return blocks;
}
