#pragma once
// Answers, for one S-record record, which block a walk over all blocks in
// their order of creation would stop at first, without walking.
//
// The walk stops at the first block that holds the record's address, ends
// exactly at it, or starts exactly where the record ends. Seen per address,
// the first two mean "the closed range [start, end] of the block holds the
// address". Blocks only ever grow, so the lowest block number whose closed
// range holds an address can be painted onto the address line once and only
// lowered afterwards. Beside that paint the index keeps, for every block
// start, the lowest block number starting there.
//
// The address line is cut into pages; a page holds a short sorted list of the
// points where the paint changes or a block starts. Every operation touches
// only the pages its range covers, so the cost of a record follows its own
// length, not the number of blocks.

#include <cstddef>
#include <cstdint>
#include <unordered_map>
#include <vector>

class CBlockMergeIndex {
 public:
  static constexpr uint32_t kNoBlock = UINT32_MAX;
  // Pages of 4 KiB keep a page's list short in a shuffled image of 32-byte
  // records (about 40 blocks a page) while the page table stays small.
  static constexpr unsigned kDefaultPageBits = 12;
  static constexpr unsigned kMostPageBits = 16;  // offsets are 16 bits

  explicit CBlockMergeIndex(unsigned pageBits_I = kDefaultPageBits);

  void Clear();

  // The lowest block number whose closed range holds address_I, or which
  // starts at address_I + size_I; kNoBlock when there is none.
  uint32_t FirstTaker(uint64_t address_I, uint64_t size_I) const;

  // Block block_I was created at start_I with size_I bytes. Block numbers are
  // handed out in increasing order.
  void BlockAdded(uint32_t block_I, uint64_t start_I, uint64_t size_I);
  // size_I bytes were appended at address_I, the block's old end.
  void BlockAppended(uint32_t block_I, uint64_t address_I, uint64_t size_I);
  // size_I bytes were put in front of the block, which now starts at address_I.
  void BlockPrepended(uint32_t block_I, uint64_t address_I, uint64_t size_I);

  // Tests look at the paint of a single address.
  uint32_t LowestCoveringBlock(uint64_t address_I) const;

 private:
  struct SMark {
    uint32_t label;     // lowest block covering [offset, next offset)
    uint32_t startMin;  // lowest block starting exactly at the offset, or kNoBlock
  };
  // Offsets apart from their marks: a search reads two bytes an entry.
  struct SPage {
    std::vector<uint16_t> offsets;  // sorted; offsets[0] is 0
    std::vector<SMark> marks;
  };
  struct SEntry {
    uint32_t offset;
    SMark mark;
  };

  const SPage* FindPage(uint64_t key_I) const;
  SPage& GetPage(uint64_t key_I);
  size_t EntryAtOrBefore(const SPage& page_I, uint32_t offset_I) const;

  void Paint(uint64_t first_I, uint64_t last_I, uint32_t block_I, bool startsAtFirst_I);
  void PaintInPage(SPage& page_I, uint64_t pageBase_I, uint32_t low_I, uint32_t high_I,
                   uint32_t block_I, bool startsAtLow_I);
  void ClaimStart(uint64_t point_I, uint32_t& startMin_IO, uint32_t block_I);
  void RemoveStart(uint64_t point_I, uint32_t block_I);
  uint32_t StartMinAt(uint64_t point_I) const;

  // Pages live in an open-addressing table: one probe finds a page, where a
  // node-based map costs two cache misses more on every record.
  struct SSlot {
    uint64_t key = kNoKey;
    SPage page;
  };
  static constexpr uint64_t kNoKey = UINT64_MAX;
  size_t SlotOf(uint64_t key_I) const;
  void GrowSlots();

  unsigned mPageBits;
  uint32_t mOffsetMask;
  std::vector<SSlot> mSlots;  // a power of two in size, at most three quarters used
  size_t mUsedSlots = 0;
  unsigned mSlotBits = 0;
  // Blocks that start at a point already claimed by a lower block; they only
  // matter when that lower block moves its start. Rare: it takes data that
  // overlaps or records without data.
  std::unordered_map<uint64_t, std::vector<uint32_t>> mOtherStarts;
  // The page touched last: sorted input stays on one page for 128 records.
  mutable uint64_t mCachedKey = UINT64_MAX;
  mutable SPage* mCachedPage = nullptr;
  // Where the last search in a page ended: the searches of one record fall
  // close together, so most are a step or two from here.
  mutable const SPage* mHintPage = nullptr;
  mutable size_t mHintIndex = 0;
  std::vector<SEntry> mScratch;  // the new entries of a painted range
};
